// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/system/DateTime.h>

#include "pelmar/system/Calendar.h"

#include <gtest/gtest.h>

#include <chrono>
#include <ctime>
#include <limits>
#include <string>

namespace Pelmar {
namespace System {
namespace {

constexpr long long kSecond = 1000000;
constexpr long long kDay = 86400 * kSecond;

DateTime FromUtc(long long microseconds) {
  return DateTimeFromUtc(microseconds, false);
}

std::string ParseFailure(const std::string& text) {
  try {
    const DateTime date(text);
    return "accepted";
  } catch (const DateFormatException& e) {
    return e.what();
  }
}

struct ReadCase {
  const char* text;
  long long instant;
};

// Instants checked with "date -u -d <text> +%s".
const ReadCase kReadCases[] = {
    {"1970-01-01T00:00:00Z", 0},
    {"1970-01-01T00:00:00", 0},
    {"1970-01-01T00:00:01Z", kSecond},
    {"1969-12-31T23:59:59Z", -kSecond},
    {"2012-03-05T07:04:09.045Z", 1330931049045000},
    {"2000-02-29T12:00:00Z", 951825600 * kSecond},
    {"2000-03-01T00:00:00Z", 951868800 * kSecond},
    {"2004-02-29T23:59:59Z", 1078099199 * kSecond},
    {"1900-02-28T23:59:59Z", -2203891201 * kSecond},
    {"1900-03-01T00:00:00Z", -2203891200 * kSecond},
    {"2038-01-19T03:14:08Z", 2147483648 * kSecond},
    {"0001-01-01T00:00:00Z", -62135596800 * kSecond},
    {"0004-02-29T00:00:00Z", -62035891200 * kSecond},
    {"9999-12-31T23:59:59.999999Z", 253402300799999999},
    // The end of the day.
    {"1970-01-01T24:00:00Z", kDay},
    {"1970-01-01T24:00:00.000Z", kDay},
    {"1999-12-31T24:00:00Z", 946684800 * kSecond},
    {"2000-02-28T24:00:00Z", 951782400 * kSecond},
    {"9999-12-31T24:00:00Z", 253402300800 * kSecond},
    // Fractions are cut off, not rounded.
    {"1970-01-01T00:00:00.1Z", 100000},
    {"1970-01-01T00:00:00.12Z", 120000},
    {"1970-01-01T00:00:00.123Z", 123000},
    {"1970-01-01T00:00:00.1234Z", 123400},
    {"1970-01-01T00:00:00.12345Z", 123450},
    {"1970-01-01T00:00:00.123456Z", 123456},
    {"1970-01-01T00:00:00.1234567Z", 123456},
    {"1970-01-01T00:00:00.123456999999999999999999999999Z", 123456},
    {"1970-01-01T00:00:00.000000999Z", 0},
    {"1970-01-01T00:00:00.999999999", 999999},
    {"1970-01-01T00:00:00.5+00:00", 500000},
    {"1969-12-31T23:59:59.5Z", -500000},
    {"1969-12-31T23:59:59.999999Z", -1},
    {"1969-12-31T23:59:59.9999999Z", -1},
    // Offsets, also across days, years and the calendar's ends.
    {"1970-01-01T00:00:00+00:00", 0},
    {"1970-01-01T00:00:00-00:00", 0},
    {"1970-01-01T01:00:00+01:00", 0},
    {"1969-12-31T23:00:00-01:00", 0},
    {"1970-01-01T05:45:00+05:45", 0},
    {"1970-01-01T14:00:00+14:00", 0},
    {"1969-12-31T10:00:00-14:00", 0},
    {"2000-02-29T00:30:00+01:00", 951780600 * kSecond},
    {"2000-12-31T23:30:00-01:00", 978309000 * kSecond},
    {"1970-01-01T24:00:00+13:59", 36060 * kSecond},
    {"0001-01-01T00:00:00+14:00", -62135647200 * kSecond},
    {"9999-12-31T23:59:59-14:00", 253402351199 * kSecond},
};

TEST(DateTime, ReadsXmlSchemaDates) {
  for (const ReadCase& c : kReadCases) {
    EXPECT_EQ(DateTime(std::string(c.text)).GetUtcTime(), c.instant) << c.text;
  }
}

TEST(DateTime, ReadsFractionsOfAnyLength) {
  std::string fraction;
  for (int digits = 1; digits <= 30; ++digits) {
    fraction += static_cast<char>('0' + digits % 10);
    const std::string kept = (fraction + "000000").substr(0, 6);
    const DateTime date("1970-01-01T00:00:00." + fraction + "Z");
    EXPECT_EQ(date.GetUtcTime(), std::stoll(kept)) << fraction;
  }
}

TEST(DateTime, KnowsTheDaysOfEachMonth) {
  const int days[] = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  const struct {
    const char* year;
    int february;
  } years[] = {{"2023", 28}, {"2024", 29}, {"1900", 28}, {"2000", 29},
               {"2100", 28}, {"0004", 29}, {"0100", 28}};
  for (const auto& year : years) {
    for (int month = 1; month <= 12; ++month) {
      const int last = month == 2 ? year.february : days[month - 1];
      const std::string prefix =
          std::string(year.year) + "-" + (month < 10 ? "0" : "") + std::to_string(month) + "-";
      EXPECT_EQ(ParseFailure(prefix + std::to_string(last) + "T00:00:00Z"), "accepted") << prefix;
      EXPECT_EQ(ParseFailure(prefix + std::to_string(last + 1) + "T00:00:00Z"), "Invalid date: no such day")
          << prefix;
    }
  }
}

struct RefusedCase {
  std::string text;
  const char* message;
};

TEST(DateTime, RefusesMalformedDates) {
  const char kDigit[] = "Invalid date: digit expected";
  const char kDash[] = "Invalid date: '-' expected";
  const char kColon[] = "Invalid date: ':' expected";
  const char kT[] = "Invalid date: 'T' expected";
  const char kPlus[] = "Invalid date: '+' expected";
  const char kNoDay[] = "Invalid date: no such day";
  const char kNoTime[] = "Invalid date: no such time of day";
  const char kNoOffset[] = "Invalid date: no such offset from UTC";
  const char kNoFraction[] = "Invalid date: a fraction without digits";
  const char kRest[] = "Invalid date: unexpected characters at the end";
  const RefusedCase cases[] = {
      {"", kDigit},
      {" ", kDigit},
      {"now", kDigit},
      // Every piece missing in turn.
      {"2012", kDash},
      {"2012-", kDigit},
      {"2012-03", kDash},
      {"2012-03-05", kT},
      {"2012-03-05T", kDigit},
      {"2012-03-05T07", kColon},
      {"2012-03-05T07:04", kColon},
      {"2012-03-05T07:04:", kDigit},
      {"2012-03-05T07:04Z", kColon},
      {"07:04:09Z", kDigit},
      // Too few or too many digits, signs.
      {"12-03-05T07:04:09Z", kDigit},
      {"02012-03-05T07:04:09Z", kDash},
      {"12012-03-05T07:04:09Z", kDash},
      {"-2012-03-05T07:04:09Z", kDigit},
      {"+2012-03-05T07:04:09Z", kDigit},
      {"2012-3-05T07:04:09Z", kDigit},
      {"2012-003-05T07:04:09Z", kDash},
      {"2012-03-5T07:04:09Z", kDigit},
      {"2012-03-05T7:04:09Z", kDigit},
      {"2012-03-05T07:4:09Z", kDigit},
      {"2012-03-05T07:04:9Z", kDigit},
      {"2012-03-05T07:04:009Z", kPlus},
      // Other separators and shapes.
      {"2012/03/05T07:04:09Z", kDash},
      {"20120305T070409Z", kDash},
      {"2012-03-05 07:04:09Z", kT},
      {"2012-03-05t07:04:09Z", kT},
      {"2012-03-05T07.04.09Z", kColon},
      {"2012-W10-1T07:04:09Z", kDigit},
      // No such day or time.
      {"0000-01-01T00:00:00Z", kNoDay},
      {"2012-00-05T07:04:09Z", kNoDay},
      {"2012-13-05T07:04:09Z", kNoDay},
      {"2012-03-00T07:04:09Z", kNoDay},
      {"2012-03-32T07:04:09Z", kNoDay},
      {"2012-03-05T25:00:00Z", kNoTime},
      {"2012-03-05T24:00:01Z", kNoTime},
      {"2012-03-05T24:01:00Z", kNoTime},
      {"2012-03-05T24:00:00.1Z", kNoTime},
      {"2012-03-05T24:00:00.0000001Z", kNoTime},
      {"2012-03-05T07:60:09Z", kNoTime},
      {"2012-03-05T07:04:60Z", kNoTime},
      {"2012-06-30T23:59:60Z", kNoTime},
      // Fractions.
      {"2012-03-05T07:04:09.Z", kNoFraction},
      {"2012-03-05T07:04:09.", kNoFraction},
      {"2012-03-05T07:04:09.+01:00", kNoFraction},
      {"2012-03-05T07:04:09,5Z", kPlus},
      {"2012-03-05T07:04:09.5.5Z", kPlus},
      // Offsets.
      {"2012-03-05T07:04:09z", kPlus},
      {"2012-03-05T07:04:09UTC", kPlus},
      {"2012-03-05T07:04:09+", kDigit},
      {"2012-03-05T07:04:09+1", kDigit},
      {"2012-03-05T07:04:09+01", kColon},
      {"2012-03-05T07:04:09+0100", kColon},
      {"2012-03-05T07:04:09+1:00", kDigit},
      {"2012-03-05T07:04:09+01:0", kDigit},
      {"2012-03-05T07:04:09+01:60", kNoOffset},
      {"2012-03-05T07:04:09+14:01", kNoOffset},
      {"2012-03-05T07:04:09-14:01", kNoOffset},
      {"2012-03-05T07:04:09+15:00", kNoOffset},
      {"2012-03-05T07:04:09-+01:00", kDigit},
      // Anything around.
      {" 2012-03-05T07:04:09Z", kDigit},
      {"2012-03-05T07:04:09Z ", kRest},
      {"2012-03-05T07:04:09 Z", kPlus},
      {"2012-03-05T07:04:09Z\n", kRest},
      {"2012-03-05T07:04:09ZZ", kRest},
      {"2012-03-05T07:04:09Z+01:00", kRest},
      {"2012-03-05T07:04:09+01:00Z", kRest},
      {"2012-03-05T07:04:09+01:000", kRest},
      {std::string("2012-03-05T07:04:09Z\0", 21), kRest},
      {std::string("2012-03-05T07:04:09\0Z", 21), kPlus},
      {std::string("\0", 1), kDigit},
      {"\xEF\xBB\xBF"
       "2012-03-05T07:04:09Z",
       kDigit},
      {"\xD9\xA2\xD9\xA0\xD9\xA1\xD9\xA2-03-05T07:04:09Z", kDigit},
  };
  for (const RefusedCase& c : cases) {
    EXPECT_EQ(ParseFailure(c.text), c.message) << c.text;
  }
}

struct PrintCase {
  long long instant;
  const char* text;
};

const PrintCase kPrintCases[] = {
    {0, "1970-01-01T00:00:00Z"},
    {1, "1970-01-01T00:00:00.000001Z"},
    {-1, "1969-12-31T23:59:59.999999Z"},
    {-500000, "1969-12-31T23:59:59.5Z"},
    {120000, "1970-01-01T00:00:00.12Z"},
    {1330931049045000, "2012-03-05T07:04:09.045Z"},
    {-62135596800000000, "0001-01-01T00:00:00Z"},
    {253402300799999999, "9999-12-31T23:59:59.999999Z"},
};

TEST(DateTime, PrintsUtcWithTheDigitsItNeeds) {
  for (const PrintCase& c : kPrintCases) {
    EXPECT_EQ(FromUtc(c.instant).ToString(), c.text);
    EXPECT_EQ(DateTime(std::string(c.text)).GetUtcTime(), c.instant) << c.text;
  }
}

TEST(DateTime, PrintsYearsBeyondFourDigitsInTheExtendedForm) {
  const PrintCase cases[] = {
      {253402300800000000, "10000-01-01T00:00:00Z"},
      {-62135596800000001, "0000-12-31T23:59:59.999999Z"},
      {-62167219200000000, "0000-01-01T00:00:00Z"},
      {-62167219200000001, "-0001-12-31T23:59:59.999999Z"},
      // Checked with "date -u -d @9223372036854" and "date -u -d @-9223372036855".
      {std::numeric_limits<long long>::max(), "294247-01-10T04:00:54.775807Z"},
      {std::numeric_limits<long long>::min(), "-290308-12-21T19:59:05.224192Z"},
  };
  for (const PrintCase& c : cases) {
    EXPECT_EQ(FromUtc(c.instant).ToString(), c.text);
    EXPECT_NE(ParseFailure(c.text), "accepted") << c.text;
  }
}

TEST(DateTime, KeepsInstantsThatAnOffsetCarriesOutOfTheYears) {
  EXPECT_EQ(DateTime("0001-01-01T00:00:00+14:00").ToString(), "0000-12-31T10:00:00Z");
  EXPECT_EQ(DateTime("9999-12-31T23:59:59-14:00").ToString(), "10000-01-01T13:59:59Z");
  EXPECT_EQ(DateTime("9999-12-31T24:00:00Z").ToString(), "10000-01-01T00:00:00Z");
}

TEST(DateTime, BreaksAnInstantDown) {
  const DateTimeFields fields = DateTime("2012-03-05T07:04:09.045678Z").GetFields();
  EXPECT_EQ(fields.century, 20);
  EXPECT_EQ(fields.yearOfCentury, 12);
  EXPECT_EQ(fields.month, 3);
  EXPECT_EQ(fields.day, 5);
  EXPECT_EQ(fields.dayOfWeek, 1);
  EXPECT_EQ(fields.hour, 7);
  EXPECT_EQ(fields.minute, 4);
  EXPECT_EQ(fields.second, 9);
  EXPECT_EQ(fields.millisecond, 45);
  EXPECT_EQ(fields.microsecond, 678);
}

TEST(DateTime, BreaksInstantsBeforeTheEpochDown) {
  const DateTimeFields fields = FromUtc(-1).GetFields();
  EXPECT_EQ(fields.century, 19);
  EXPECT_EQ(fields.yearOfCentury, 69);
  EXPECT_EQ(fields.month, 12);
  EXPECT_EQ(fields.day, 31);
  EXPECT_EQ(fields.dayOfWeek, 3);
  EXPECT_EQ(fields.hour, 23);
  EXPECT_EQ(fields.minute, 59);
  EXPECT_EQ(fields.second, 59);
  EXPECT_EQ(fields.millisecond, 999);
  EXPECT_EQ(fields.microsecond, 999);
}

TEST(DateTime, RoundsTheCenturyDownForYearsBeforeTheFirst) {
  const DateTimeFields fields = FromUtc(std::numeric_limits<long long>::min()).GetFields();
  EXPECT_EQ(fields.century * 100 + fields.yearOfCentury, -290308);
  EXPECT_EQ(fields.yearOfCentury, 92);
}

TEST(DateTime, NamesItsOffsetAsUtc) {
  EXPECT_EQ(DateTime().ToShortStringBias(), "Z");
  EXPECT_EQ(DateTime("2012-03-05T07:04:09+01:00").ToShortStringBias(), "Z");
}

TEST(DateTime, ComparesInstants) {
  const DateTime noon("2012-03-05T12:00:00Z");
  EXPECT_TRUE(noon == DateTime("2012-03-05T13:00:00+01:00"));
  EXPECT_FALSE(noon != DateTime("2012-03-05T13:00:00+01:00"));
  EXPECT_TRUE(noon != DateTime("2012-03-05T12:00:00.000001Z"));
  EXPECT_TRUE(noon < DateTime("2012-03-05T12:00:00.000001Z"));
  EXPECT_FALSE(noon < noon);
}

TEST(DateTime, KeepsNoLocalTime) {
  try {
    DateTimeFromUtc(0, true);
    FAIL() << "no exception";
  } catch (const InvalidArgumentException& e) {
    EXPECT_STREQ(e.what(), "Invalid argument : local time is not supported");
  }
}

TEST(DateTime, ReadsTheClockOfTheSystem) {
  using std::chrono::duration_cast;
  using std::chrono::microseconds;
  using std::chrono::system_clock;
  const long long before = duration_cast<microseconds>(system_clock::now().time_since_epoch()).count();
  const long long now = GetUtcDateTime().GetUtcTime();
  const long long after = duration_cast<microseconds>(system_clock::now().time_since_epoch()).count();
  EXPECT_LE(before, now);
  EXPECT_LE(now, after);
}

TEST(Calendar, AgreesWithTheSystemLibraryOnEveryDay) {
  const long long first = ToDayNumber({1, 1, 1});
  const long long last = ToDayNumber({9999, 12, 31});
  EXPECT_EQ(first, -719162);
  EXPECT_EQ(last, 2932896);
  for (long long number = first; number <= last; ++number) {
    const CalendarDay day = FromDayNumber(number);
    const std::time_t seconds = number * 86400;
    std::tm expected = {};
    gmtime_r(&seconds, &expected);
    const bool same = day.year == expected.tm_year + 1900LL && day.month == expected.tm_mon + 1 &&
                      day.day == expected.tm_mday && GetDayOfWeek(number) == expected.tm_wday &&
                      ToDayNumber(day) == number;
    ASSERT_TRUE(same) << number;
  }
}

TEST(FloorDivide, RoundsTowardsNegativeInfinity) {
  const struct {
    long long dividend, divisor, quotient, remainder;
  } cases[] = {
      {7, 3, 2, 1},
      {6, 3, 2, 0},
      {0, 3, 0, 0},
      {-1, 3, -1, 2},
      {-3, 3, -1, 0},
      {-4, 3, -2, 2},
      {std::numeric_limits<long long>::min(), kDay, -106751992, 71945224192},
      {std::numeric_limits<long long>::min(), 1, std::numeric_limits<long long>::min(), 0},
      {std::numeric_limits<long long>::max(), 2, 4611686018427387903, 1},
  };
  for (const auto& c : cases) {
    const FloorDivision division = FloorDivide(c.dividend, c.divisor);
    EXPECT_EQ(division.quotient, c.quotient) << c.dividend;
    EXPECT_EQ(division.remainder, c.remainder) << c.dividend;
  }
}

}  // namespace
}  // namespace System
}  // namespace Pelmar
