// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The proleptic Gregorian calendar in integers: days since 1970-01-01 and their year, month and day.

#ifndef PELMAR_SYSTEM_CALENDAR_H
#define PELMAR_SYSTEM_CALENDAR_H

namespace Pelmar {
namespace System {

/// A day of the calendar. Years count on through 0 (the year before 0001) into negative ones.
struct CalendarDay {
  long long year;
  int month;  ///< 1 to 12.
  int day;    ///< 1 to 31.
};

/// How many days the month has. `month` is 1 to 12.
int GetDaysOfMonth(long long year, int month) noexcept;

/// Days from 1970-01-01 to the given valid day; negative before it.
long long ToDayNumber(const CalendarDay& day) noexcept;

/// The inverse of `ToDayNumber`.
CalendarDay FromDayNumber(long long dayNumber) noexcept;

/// The day of the week of a day number, 0 for Sunday.
int GetDayOfWeek(long long dayNumber) noexcept;

/// A quotient rounded towards negative infinity, and the remainder that belongs to it: 0 to `divisor` - 1.
struct FloorDivision {
  long long quotient;
  long long remainder;
};

/// Divides by a positive number. Exact for every dividend, the most negative one included.
FloorDivision FloorDivide(long long dividend, long long divisor) noexcept;

}  // namespace System
}  // namespace Pelmar

#endif  // PELMAR_SYSTEM_CALENDAR_H
