// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Dates as the messages carry them.

#ifndef QUORLIN_DATES_H
#define QUORLIN_DATES_H

#include <pelmar/system/DateTime.h>

#include <string>

namespace Quorlin {

/// The xs:dateTime text of a date (XML Schema Part 2, 3.2.7), in UTC and always with three digits of
/// milliseconds, whatever the process's locale: "2012-03-05T07:04:09.045Z".
std::string DateTimeFormatter(Pelmar::System::DateTime date);

/// The date `minutes` later. Exact from -35 to 35 minutes only: the microseconds are counted in 32 bits,
/// which wrap beyond.
Pelmar::System::DateTime AddMinutesToDate(Pelmar::System::DateTime date, int minutes);

/// The date `seconds` later. One that lies beyond what a date can hold (the year 294247) becomes the last or
/// first that it can.
Pelmar::System::DateTime AddSecondsToDate(Pelmar::System::DateTime date, long long seconds);

}  // namespace Quorlin

#endif  // QUORLIN_DATES_H
