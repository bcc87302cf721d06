// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/dates.h"

#include <array>
#include <charconv>
#include <cstddef>
#include <cstdint>
#include <limits>

namespace Quorlin {

using Pelmar::System::DateTime;
using Pelmar::System::DateTimeFields;

namespace {

constexpr std::uint32_t kMicrosecondsPerMinute = 60000000;
constexpr long long kMicrosecondsPerSecond = 1000000;

// For numbers that are not negative.
void AppendPadded(std::string& text, int number, std::size_t width) {
  std::array<char, std::numeric_limits<int>::digits10 + 2> digits;
  const std::to_chars_result end = std::to_chars(digits.data(), digits.data() + digits.size(), number);
  const std::size_t count = static_cast<std::size_t>(end.ptr - digits.data());
  text.append(count < width ? width - count : 0, '0').append(digits.data(), count);
}

long long SaturatingAdd(long long a, long long b) {
  constexpr long long kLeast = std::numeric_limits<long long>::min();
  constexpr long long kMost = std::numeric_limits<long long>::max();
  if (b > 0 && a > kMost - b) {
    return kMost;
  }
  if (b < 0 && a < kLeast - b) {
    return kLeast;
  }
  return a + b;
}

long long SaturatingSecondsToMicroseconds(long long seconds) {
  constexpr long long kLeast = std::numeric_limits<long long>::min();
  constexpr long long kMost = std::numeric_limits<long long>::max();
  if (seconds > kMost / kMicrosecondsPerSecond) {
    return kMost;
  }
  if (seconds < kLeast / kMicrosecondsPerSecond) {
    return kLeast;
  }
  return seconds * kMicrosecondsPerSecond;
}

}  // namespace

std::string DateTimeFormatter(DateTime date) {
  const DateTimeFields fields = date.GetFields();
  std::string text;
  text.reserve(sizeof("2026-01-01T00:00:00.000Z"));
  AppendPadded(text, fields.century * 100 + fields.yearOfCentury, 4);
  text += '-';
  AppendPadded(text, fields.month, 2);
  text += '-';
  AppendPadded(text, fields.day, 2);
  text += 'T';
  AppendPadded(text, fields.hour, 2);
  text += ':';
  AppendPadded(text, fields.minute, 2);
  text += ':';
  AppendPadded(text, fields.second, 2);
  text += '.';
  AppendPadded(text, fields.millisecond, 3);
  return text + date.ToShortStringBias();
}

DateTime AddMinutesToDate(DateTime date, int minutes) {
  // Unsigned, because there overflow is defined: it wraps.
  const std::uint32_t product = static_cast<std::uint32_t>(minutes) * kMicrosecondsPerMinute;
  const long long microseconds = static_cast<std::int32_t>(product);
  return Pelmar::System::DateTimeFromUtc(SaturatingAdd(date.GetUtcTime(), microseconds), false);
}

DateTime AddSecondsToDate(DateTime date, long long seconds) {
  const long long microseconds = SaturatingSecondsToMicroseconds(seconds);
  return Pelmar::System::DateTimeFromUtc(SaturatingAdd(date.GetUtcTime(), microseconds), false);
}

}  // namespace Quorlin
