// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/dates.h"

#include <gtest/gtest.h>

#include <limits>
#include <locale>
#include <string>

namespace Quorlin {
namespace {

using Pelmar::System::DateTime;
using Pelmar::System::DateTimeFromUtc;

constexpr long long kMinute = 60000000;
constexpr long long kSecond = 1000000;
constexpr long long kMost = std::numeric_limits<long long>::max();
constexpr long long kLeast = std::numeric_limits<long long>::min();

long long AddMinutes(long long instant, int minutes) {
  return AddMinutesToDate(DateTimeFromUtc(instant, false), minutes).GetUtcTime();
}

long long AddSeconds(long long instant, long long seconds) {
  return AddSecondsToDate(DateTimeFromUtc(instant, false), seconds).GetUtcTime();
}

// --- DateTimeFormatter ---

TEST(DateTimeFormatter, PadsEveryFieldAndAlwaysGivesMilliseconds) {
  const struct {
    const char* date;
    const char* text;
  } cases[] = {
      {"2012-03-05T07:04:09.045Z", "2012-03-05T07:04:09.045Z"},
      {"2012-01-01T00:00:00.007Z", "2012-01-01T00:00:00.007Z"},
      {"2012-12-31T23:59:59.999Z", "2012-12-31T23:59:59.999Z"},
      {"2012-03-05T07:04:09Z", "2012-03-05T07:04:09.000Z"},
      {"2012-03-05T07:04:09.5Z", "2012-03-05T07:04:09.500Z"},
      {"2012-03-05T07:04:09.045999Z", "2012-03-05T07:04:09.045Z"},
      {"2012-03-05T09:04:09.045+02:00", "2012-03-05T07:04:09.045Z"},
      {"2000-02-29T00:00:00Z", "2000-02-29T00:00:00.000Z"},
      {"2100-01-01T00:00:00Z", "2100-01-01T00:00:00.000Z"},
      {"1969-12-31T23:59:59.999Z", "1969-12-31T23:59:59.999Z"},
      {"0987-06-05T04:03:02.001Z", "0987-06-05T04:03:02.001Z"},
      {"0001-01-01T00:00:00Z", "0001-01-01T00:00:00.000Z"},
      {"9999-12-31T23:59:59.999Z", "9999-12-31T23:59:59.999Z"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(DateTimeFormatter(DateTime(std::string(c.date))), c.text);
  }
}

TEST(DateTimeFormatter, GivesLongYearsInFull) {
  EXPECT_EQ(DateTimeFormatter(DateTimeFromUtc(253402300800 * kSecond, false)), "10000-01-01T00:00:00.000Z");
}

TEST(DateTimeFormatter, EndsInThePlatformsOffsetText) {
  const DateTime date = DateTimeFromUtc(0, false);
  EXPECT_EQ(DateTimeFormatter(date), "1970-01-01T00:00:00.000" + date.ToShortStringBias());
}

// Writes numbers in groups of two digits.
class Grouping final : public std::numpunct<char> {
 protected:
  std::string do_grouping() const override { return "\2"; }
  char do_thousands_sep() const override { return '\''; }
};

class GlobalLocale final {
 public:
  explicit GlobalLocale(const std::locale& locale) : _before(std::locale::global(locale)) {}
  ~GlobalLocale() { std::locale::global(_before); }

 private:
  std::locale _before;
};

TEST(DateTimeFormatter, DoesNotFollowTheProcessLocale) {
  const GlobalLocale grouped(std::locale(std::locale::classic(), new Grouping));
  EXPECT_EQ(DateTimeFormatter(DateTimeFromUtc(1330931049045000, false)), "2012-03-05T07:04:09.045Z");
}

// --- AddMinutesToDate ---

TEST(AddMinutesToDate, IsExactUpToThirtyFiveMinutes) {
  for (int minutes = -35; minutes <= 35; ++minutes) {
    EXPECT_EQ(AddMinutes(1330931049045678, minutes), 1330931049045678 + minutes * kMinute) << minutes;
  }
}

TEST(AddMinutesToDate, WrapsAtThirtySixMinutes) {
  EXPECT_EQ(AddMinutes(0, 36), 36 * kMinute - 4294967296);
  EXPECT_LT(AddMinutes(0, 36), 0);
  EXPECT_EQ(AddMinutes(0, -36), -36 * kMinute + 4294967296);
  EXPECT_GT(AddMinutes(0, -36), 0);
}

TEST(AddMinutesToDate, KeepsTheLowThirtyTwoBitsOfTheProduct) {
  const struct {
    int minutes;
    long long microseconds;
  } cases[] = {
      {60, -694967296},
      {71, -34967296},
      {72, 25032704},
      {1440, 500654080},
      {std::numeric_limits<int>::max(), -60000000},
      {std::numeric_limits<int>::min(), 0},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(AddMinutes(0, c.minutes), c.microseconds) << c.minutes;
  }
}

TEST(AddMinutesToDate, StaysWithinWhatADateCanHold) {
  EXPECT_EQ(AddMinutes(kMost - 1, 35), kMost);
  EXPECT_EQ(AddMinutes(kLeast + 1, -35), kLeast);
}

// --- AddSecondsToDate ---

TEST(AddSecondsToDate, AddsSixtyFourBitsOfSeconds) {
  EXPECT_EQ(AddSeconds(45, 0), 45);
  EXPECT_EQ(AddSeconds(45, 600), 600 * kSecond + 45);
  EXPECT_EQ(AddSeconds(45, -1), -kSecond + 45);
  EXPECT_EQ(AddSeconds(45, 4294967296), 4294967296 * kSecond + 45);
}

TEST(AddSecondsToDate, StaysWithinWhatADateCanHold) {
  EXPECT_EQ(AddSeconds(0, kMost / kSecond), kMost / kSecond * kSecond);
  EXPECT_EQ(AddSeconds(0, kMost / kSecond + 1), kMost);
  EXPECT_EQ(AddSeconds(kSecond, kMost / kSecond), kMost);
  EXPECT_EQ(AddSeconds(0, kMost), kMost);
  EXPECT_EQ(AddSeconds(0, kLeast / kSecond - 1), kLeast);
  EXPECT_EQ(AddSeconds(-kSecond, kLeast / kSecond), kLeast);
  EXPECT_EQ(AddSeconds(0, kLeast), kLeast);
}

}  // namespace
}  // namespace Quorlin
