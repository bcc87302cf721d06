// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Dates of HTTP.

#ifndef QUORLIN_CLI_DOCTOR_HTTPDATE_H
#define QUORLIN_CLI_DOCTOR_HTTPDATE_H

#include <optional>
#include <string>

namespace Cli {
namespace Doctor {

/// The instant of an IMF-fixdate (RFC 9110, section 5.6.7), "Sun, 06 Nov 1994 08:49:37 GMT", in microseconds
/// since 1970-01-01T00:00:00Z. Absent for everything else: the obsolete forms are not read.
std::optional<long long> ReadHttpDate(const std::string& text);

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_HTTPDATE_H
