// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The service's idea of now.

#ifndef QUORLIN_DEVSTS_CLOCK_H
#define QUORLIN_DEVSTS_CLOCK_H

#include <functional>
#include <string>

namespace DevSts {

constexpr long long kMicrosecondsPerSecond = 1000000;

/// Gives microseconds since 1970-01-01T00:00:00Z. Called from several threads at once.
using Clock = std::function<long long()>;

/// The system's clock, `offsetSec` seconds ahead (negative: behind).
Clock MakeSystemClock(long long offsetSec);

/// An instant as xs:dateTime with "Z".
std::string ToDateText(long long utcMicroseconds);

/// An instant as the HTTP header Date has it (RFC 9110, section 5.6.7): "Sun, 06 Nov 1994 08:49:37 GMT".
std::string ToHttpDate(long long utcMicroseconds);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_CLOCK_H
