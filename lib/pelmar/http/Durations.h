// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Durations in messages.

#ifndef PELMAR_HTTP_DURATIONS_H
#define PELMAR_HTTP_DURATIONS_H

#include <string>

namespace Pelmar {
namespace Http {

/// Seconds in decimal, with as many digits as needed: "240", "0.5". Not for negative durations.
std::string FormatSeconds(long long microseconds);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_DURATIONS_H
