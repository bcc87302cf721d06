// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Clock.h"

#include <pelmar/system/DateTime.h>

#include <array>
#include <cstddef>
#include <cstdio>

namespace DevSts {

Clock MakeSystemClock(long long offsetSec) {
  return [offset = offsetSec * kMicrosecondsPerSecond] {
    return Pelmar::System::GetUtcDateTime().GetUtcTime() + offset;
  };
}

std::string ToDateText(long long utcMicroseconds) {
  return Pelmar::System::DateTimeFromUtc(utcMicroseconds, false).ToString();
}

std::string ToHttpDate(long long utcMicroseconds) {
  static constexpr std::array<const char*, 7> kDays = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
  static constexpr std::array<const char*, 12> kMonths = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                          "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
  const Pelmar::System::DateTimeFields fields =
      Pelmar::System::DateTimeFromUtc(utcMicroseconds, false).GetFields();
  std::array<char, 64> text;
  std::snprintf(text.data(), text.size(), "%s, %02d %s %02d%02d %02d:%02d:%02d GMT",
                kDays[static_cast<std::size_t>(fields.dayOfWeek)], fields.day,
                kMonths[static_cast<std::size_t>(fields.month - 1)], fields.century, fields.yearOfCentury,
                fields.hour, fields.minute, fields.second);
  return text.data();
}

}  // namespace DevSts
