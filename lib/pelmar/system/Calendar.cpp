// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/system/Calendar.h"

namespace Pelmar {
namespace System {

namespace {

// The calendar repeats every 400 years. Counting years from 1 March puts the leap day at the end of its year,
// so that the days before a month are the same in every year: (153 * months + 2) / 5 (30.6 days a month from
// March to July, and again).
constexpr long long kYearsPerCycle = 400;
constexpr long long kDaysPerCycle = 146097;
constexpr long long kDaysPerFourYears = 1461;
constexpr long long kDaysPerCentury = 36524;
constexpr long long kDaysPerYear = 365;
// From 0000-03-01, where a cycle begins, to 1970-01-01.
constexpr long long kCycleStartToEpoch = 719468;
constexpr long long kDaysPerWeek = 7;
constexpr long long kThursday = 4;  // 1970-01-01 was one.

bool IsLeapYear(long long year) {
  return year % 4 == 0 && (year % 100 != 0 || year % 400 == 0);
}

}  // namespace

int GetDaysOfMonth(long long year, int month) noexcept {
  if (month == 2) {
    return IsLeapYear(year) ? 29 : 28;
  }
  return month == 4 || month == 6 || month == 9 || month == 11 ? 30 : 31;
}

long long ToDayNumber(const CalendarDay& day) noexcept {
  const int monthsSinceMarch = (day.month + 9) % 12;
  const long long marchYear = day.month > 2 ? day.year : day.year - 1;
  const FloorDivision cycle = FloorDivide(marchYear, kYearsPerCycle);
  const long long dayOfYear = (153 * monthsSinceMarch + 2) / 5 + day.day - 1;
  const long long dayOfCycle =
      cycle.remainder * kDaysPerYear + cycle.remainder / 4 - cycle.remainder / 100 + dayOfYear;
  return cycle.quotient * kDaysPerCycle + dayOfCycle - kCycleStartToEpoch;
}

CalendarDay FromDayNumber(long long dayNumber) noexcept {
  const FloorDivision cycle = FloorDivide(dayNumber + kCycleStartToEpoch, kDaysPerCycle);
  const long long dayOfCycle = cycle.remainder;
  // Taking the leap days out first leaves years of equal length.
  const long long yearOfCycle = (dayOfCycle - dayOfCycle / (kDaysPerFourYears - 1) +
                                 dayOfCycle / kDaysPerCentury - dayOfCycle / (kDaysPerCycle - 1)) /
                                kDaysPerYear;
  const long long dayOfYear = dayOfCycle - (kDaysPerYear * yearOfCycle + yearOfCycle / 4 - yearOfCycle / 100);
  const int monthsSinceMarch = static_cast<int>((5 * dayOfYear + 2) / 153);
  const int day = static_cast<int>(dayOfYear - (153 * monthsSinceMarch + 2) / 5 + 1);
  const int month = monthsSinceMarch < 10 ? monthsSinceMarch + 3 : monthsSinceMarch - 9;
  const long long marchYear = cycle.quotient * kYearsPerCycle + yearOfCycle;
  return {month > 2 ? marchYear : marchYear + 1, month, day};
}

int GetDayOfWeek(long long dayNumber) noexcept {
  return static_cast<int>(FloorDivide(dayNumber + kThursday, kDaysPerWeek).remainder);
}

FloorDivision FloorDivide(long long dividend, long long divisor) noexcept {
  const long long quotient = dividend / divisor;
  const long long remainder = dividend % divisor;
  return remainder < 0 ? FloorDivision{quotient - 1, remainder + divisor}
                       : FloorDivision{quotient, remainder};
}

}  // namespace System
}  // namespace Pelmar
