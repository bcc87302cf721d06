// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Instants in time, their XML Schema text and their broken-down fields.

#ifndef PELMAR_SYSTEM_DATETIME_H
#define PELMAR_SYSTEM_DATETIME_H

#include <pelmar/Exception.h>
#include <pelmar/Export.h>

#include <string>

namespace Pelmar {
namespace System {

/// A text is not a date in the accepted form.
class PELMAR_API DateFormatException : public Exception {
 public:
  explicit DateFormatException(const std::string& message);
  DateFormatException(const DateFormatException& other) noexcept;
  DateFormatException& operator=(const DateFormatException& other) = default;
  ~DateFormatException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// The fields of a date in UTC, in the proleptic Gregorian calendar. The year is century * 100 +
/// yearOfCentury, also for years before 0001 and after 9999.
struct DateTimeFields {
  int century;        ///< Hundreds of the year, rounded down: 20 for 2012.
  int yearOfCentury;  ///< 0 to 99.
  int month;          ///< 1 to 12.
  int day;            ///< 1 to 31.
  int dayOfWeek;      ///< 0 (Sunday) to 6.
  int hour;           ///< 0 to 23.
  int minute;         ///< 0 to 59.
  int second;         ///< 0 to 59.
  int millisecond;    ///< 0 to 999.
  int microsecond;    ///< 0 to 999: what is left below the millisecond.
};

/// An instant, kept as a count of microseconds since 1970-01-01T00:00:00Z. A plain value.
class PELMAR_API DateTime {
 public:
  /// 1970-01-01T00:00:00Z.
  DateTime() noexcept : _utcMicroseconds(0) {}

  /// Reads an xs:dateTime (XML Schema Part 2, 3.2.7): "YYYY-MM-DDThh:mm:ss", an optional fraction of any
  /// number of digits, of which microseconds are kept (the rest is cut off), and an optional "Z" or
  /// "+hh:mm"/"-hh:mm" up to 14:00; without one the time is taken as UTC. Years have four digits, 0001 to
  /// 9999; 24:00:00 is the end of its day; there are no leap seconds. White space is refused. An offset may
  /// carry the instant out of those years; it is kept as it is. Throws DateFormatException, whose message
  /// never repeats the text.
  explicit DateTime(const std::string& text);

  /// Microseconds since 1970-01-01T00:00:00Z.
  long long GetUtcTime() const noexcept { return _utcMicroseconds; }

  DateTimeFields GetFields() const noexcept;

  /// xs:dateTime in UTC: "2012-03-05T07:04:09.045Z". The fraction has as many digits as it needs, at most
  /// six, or is left out. An instant outside the years 0001 to 9999 prints as XML Schema 1.1 Part 2, 3.3.7,
  /// has it: with more digits ("10000-01-01T00:00:00Z"), year 0000, or a sign ("-0001-12-31T00:00:00Z"); the
  /// reading constructor refuses such texts.
  std::string ToString() const;

  /// The short text of the date's offset from UTC. Dates are kept in UTC, so this is always "Z".
  std::string ToShortStringBias() const;

 private:
  friend PELMAR_API DateTime DateTimeFromUtc(long long utcMicroseconds, bool local);
  explicit DateTime(long long utcMicroseconds) noexcept : _utcMicroseconds(utcMicroseconds) {}

  long long _utcMicroseconds;
};

/// The date of an instant given in microseconds since 1970-01-01T00:00:00Z. `local` asks for the host's time
/// zone, which this platform does not keep: it must be false (InvalidArgumentException otherwise).
PELMAR_API DateTime DateTimeFromUtc(long long utcMicroseconds, bool local);

/// Now.
PELMAR_API DateTime GetUtcDateTime();

inline bool operator==(const DateTime& a, const DateTime& b) noexcept {
  return a.GetUtcTime() == b.GetUtcTime();
}
inline bool operator!=(const DateTime& a, const DateTime& b) noexcept {
  return !(a == b);
}
inline bool operator<(const DateTime& a, const DateTime& b) noexcept {
  return a.GetUtcTime() < b.GetUtcTime();
}

}  // namespace System
}  // namespace Pelmar

#endif  // PELMAR_SYSTEM_DATETIME_H
