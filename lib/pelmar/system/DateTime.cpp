// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/system/DateTime.h>

#include "pelmar/system/Calendar.h"

#include <chrono>
#include <cstddef>

namespace Pelmar {
namespace System {

namespace {

constexpr long long kMicrosecondsPerMillisecond = 1000;
constexpr long long kMicrosecondsPerSecond = 1000000;
constexpr long long kSecondsPerMinute = 60;
constexpr long long kSecondsPerHour = 3600;
constexpr long long kSecondsPerDay = 86400;
constexpr long long kMicrosecondsPerDay = kSecondsPerDay * kMicrosecondsPerSecond;
constexpr std::size_t kFractionDigits = 6;
constexpr int kMaxOffsetHours = 14;

bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

/// Reads the lexical form of xs:dateTime (XML Schema Part 2, 3.2.7.1) from front to back.
class DateTimeReader {
 public:
  explicit DateTimeReader(const std::string& text) : _text(text) {}

  long long Read() {
    const long long dayNumber = ReadDate();
    Require('T');
    const long long timeOfDay = ReadTimeOfDay();
    const long long offset = ReadOffset();
    if (_position != _text.size()) {
      throw DateFormatException("Invalid date: unexpected characters at the end");
    }
    return dayNumber * kMicrosecondsPerDay + timeOfDay - offset;
  }

 private:
  long long ReadDate() {
    const int year = ReadNumber(4);
    Require('-');
    const int month = ReadNumber(2);
    Require('-');
    const int day = ReadNumber(2);
    if (year == 0 || month == 0 || month > 12 || day == 0 || day > GetDaysOfMonth(year, month)) {
      throw DateFormatException("Invalid date: no such day");
    }
    return ToDayNumber({year, month, day});
  }

  long long ReadTimeOfDay() {
    const int hour = ReadNumber(2);
    Require(':');
    const int minute = ReadNumber(2);
    Require(':');
    const int second = ReadNumber(2);
    const Fraction fraction = ReadFraction();
    // 24:00:00 names the end of the day, and nothing beyond it.
    const bool endOfDay = hour == 24 && minute == 0 && second == 0 && fraction.isZero;
    if ((hour > 23 && !endOfDay) || minute > 59 || second > 59) {
      throw DateFormatException("Invalid date: no such time of day");
    }
    const long long seconds = hour * kSecondsPerHour + minute * kSecondsPerMinute + second;
    return seconds * kMicrosecondsPerSecond + fraction.microseconds;
  }

  struct Fraction {
    long long microseconds;
    bool isZero;  // In every digit, those below the microsecond too.
  };

  Fraction ReadFraction() {
    Fraction fraction = {0, true};
    if (!Skip('.')) {
      return fraction;
    }
    std::size_t count = 0;
    for (; _position < _text.size() && IsDigit(_text[_position]); ++_position, ++count) {
      const int digit = _text[_position] - '0';
      fraction.isZero = fraction.isZero && digit == 0;
      if (count < kFractionDigits) {
        fraction.microseconds = fraction.microseconds * 10 + digit;
      }
    }
    if (count == 0) {
      throw DateFormatException("Invalid date: a fraction without digits");
    }
    for (; count < kFractionDigits; ++count) {
      fraction.microseconds *= 10;
    }
    return fraction;
  }

  /// How far the written time is ahead of UTC, in microseconds.
  long long ReadOffset() {
    if (_position == _text.size() || Skip('Z')) {
      return 0;
    }
    const bool behind = Skip('-');
    if (!behind) {
      Require('+');
    }
    const int hours = ReadNumber(2);
    Require(':');
    const int minutes = ReadNumber(2);
    if (hours > kMaxOffsetHours || minutes > 59 || (hours == kMaxOffsetHours && minutes != 0)) {
      throw DateFormatException("Invalid date: no such offset from UTC");
    }
    const long long offset = (hours * kSecondsPerHour + minutes * kSecondsPerMinute) * kMicrosecondsPerSecond;
    return behind ? -offset : offset;
  }

  int ReadNumber(std::size_t digits) {
    int number = 0;
    for (std::size_t i = 0; i < digits; ++i, ++_position) {
      if (_position == _text.size() || !IsDigit(_text[_position])) {
        throw DateFormatException("Invalid date: digit expected");
      }
      number = number * 10 + (_text[_position] - '0');
    }
    return number;
  }

  bool Skip(char expected) {
    if (_position == _text.size() || _text[_position] != expected) {
      return false;
    }
    ++_position;
    return true;
  }

  void Require(char expected) {
    if (!Skip(expected)) {
      throw DateFormatException(std::string("Invalid date: '") + expected + "' expected");
    }
  }

  const std::string& _text;
  std::size_t _position = 0;
};

void AppendNumber(std::string& text, int number, std::size_t width) {
  const std::string digits = std::to_string(number);
  text.append(width > digits.size() ? width - digits.size() : 0, '0').append(digits);
}

void AppendYear(std::string& text, int year) {
  if (year < 0) {
    text += '-';
  }
  AppendNumber(text, year < 0 ? -year : year, 4);
}

void AppendFraction(std::string& text, int microseconds) {
  if (microseconds == 0) {
    return;
  }
  text += '.';
  AppendNumber(text, microseconds, kFractionDigits);
  text.erase(text.find_last_not_of('0') + 1);
}

}  // namespace

DateFormatException::DateFormatException(const std::string& message) : Exception(message) {}

DateFormatException::DateFormatException(const DateFormatException& other) noexcept = default;

DateFormatException::~DateFormatException() noexcept = default;

Exception* DateFormatException::Clone() const {
  return new DateFormatException(*this);
}

void DateFormatException::Throw() const {
  throw DateFormatException(*this);
}

DateTime::DateTime(const std::string& text) : _utcMicroseconds(DateTimeReader(text).Read()) {}

DateTimeFields DateTime::GetFields() const noexcept {
  const FloorDivision days = FloorDivide(_utcMicroseconds, kMicrosecondsPerDay);
  const CalendarDay day = FromDayNumber(days.quotient);
  const FloorDivision century = FloorDivide(day.year, 100);
  const long long second = days.remainder / kMicrosecondsPerSecond;
  const long long fraction = days.remainder % kMicrosecondsPerSecond;
  DateTimeFields fields = {};
  fields.century = static_cast<int>(century.quotient);
  fields.yearOfCentury = static_cast<int>(century.remainder);
  fields.month = day.month;
  fields.day = day.day;
  fields.dayOfWeek = GetDayOfWeek(days.quotient);
  fields.hour = static_cast<int>(second / kSecondsPerHour);
  fields.minute = static_cast<int>(second % kSecondsPerHour / kSecondsPerMinute);
  fields.second = static_cast<int>(second % kSecondsPerMinute);
  fields.millisecond = static_cast<int>(fraction / kMicrosecondsPerMillisecond);
  fields.microsecond = static_cast<int>(fraction % kMicrosecondsPerMillisecond);
  return fields;
}

std::string DateTime::ToString() const {
  const DateTimeFields fields = GetFields();
  std::string text;
  AppendYear(text, fields.century * 100 + fields.yearOfCentury);
  text += '-';
  AppendNumber(text, fields.month, 2);
  text += '-';
  AppendNumber(text, fields.day, 2);
  text += 'T';
  AppendNumber(text, fields.hour, 2);
  text += ':';
  AppendNumber(text, fields.minute, 2);
  text += ':';
  AppendNumber(text, fields.second, 2);
  AppendFraction(text, fields.millisecond * 1000 + fields.microsecond);
  return text + ToShortStringBias();
}

std::string DateTime::ToShortStringBias() const {
  return "Z";
}

DateTime DateTimeFromUtc(long long utcMicroseconds, bool local) {
  if (local) {
    throw InvalidArgumentException("local time is not supported");
  }
  return DateTime(utcMicroseconds);
}

DateTime GetUtcDateTime() {
  const auto sinceEpoch = std::chrono::system_clock::now().time_since_epoch();
  return DateTimeFromUtc(std::chrono::duration_cast<std::chrono::microseconds>(sinceEpoch).count(), false);
}

}  // namespace System
}  // namespace Pelmar
