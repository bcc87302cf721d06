// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/MessageFormatter.h>
#include <pelmar/system/DateTime.h>

#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <vector>

namespace Pelmar {
namespace {

struct FormatCase {
  const char* format;
  std::vector<std::string> values;
  const char* text;
};

TEST(MessageFormatter, FillsPlaceholders) {
  const FormatCase cases[] = {
      {"", {}, ""},
      {"", {"a"}, ""},
      {"plain", {"a"}, "plain"},
      {"%1", {"a"}, "a"},
      {"%1", {""}, ""},
      {"<%1>", {"a"}, "<a>"},
      {"%2 %1", {"a", "b"}, "b a"},
      {"%1%1%2", {"a", "b"}, "aab"},
      {"%1%2%3%4%5%6%7%8%9", {"a", "b", "c", "d", "e", "f", "g", "h", "i"}, "abcdefghi"},
      {"%9", {"a", "b", "c", "d", "e", "f", "g", "h", "i", "j"}, "i"},
      // One digit is the whole number.
      {"%10", {"a"}, "a0"},
      // Without an argument, and every other "%".
      {"%1 %2", {"a"}, "a %2"},
      {"%1", {}, "%1"},
      {"%0", {"a"}, "%0"},
      {"100%", {"a"}, "100%"},
      {"%", {"a"}, "%"},
      {"%%1", {"a"}, "%a"},
      {"%%", {"a"}, "%%"},
      {"%2%1", {"a"}, "%2a"},
      {"%s %n", {"a"}, "%s %n"},
      // What an argument prints is never read as a format.
      {"%1 %2", {"%2", "%1"}, "%2 %1"},
      {"%1%2", {"%", "1"}, "%1"},
      {"%%1", {"1"}, "%1"},
  };
  for (const FormatCase& c : cases) {
    MessageFormatter formatter(c.format);
    for (const std::string& value : c.values) {
      formatter.AddString(value);
    }
    EXPECT_EQ(formatter.ToString(), c.text) << c.format;
  }
}

TEST(MessageFormatter, PrintsTypedValues) {
  MessageFormatter formatter("%1|%2|%3|%4|%5|%6");
  formatter.AddInteger(std::numeric_limits<long long>::min())
      .AddInteger(std::numeric_limits<long long>::max())
      .AddBoolean(true)
      .AddBoolean(false)
      .AddDate(System::DateTime("2012-03-05T07:04:09.045Z"))
      .Add(StringFormatter(std::string("a\0b", 3)));
  const std::string withNul("a\0b", 3);
  EXPECT_EQ(formatter.ToString(),
            "-9223372036854775808|9223372036854775807|true|false|2012-03-05T07:04:09.045Z|" + withNul);
}

TEST(MessageFormatter, GivesTheSameTextEachTime) {
  MessageFormatter formatter("%1-%2");
  formatter.AddInteger(1);
  EXPECT_EQ(formatter.ToString(), "1-%2");
  formatter.AddInteger(2);
  EXPECT_EQ(formatter.ToString(), "1-2");
  EXPECT_EQ(formatter.ToString(), "1-2");
}

TEST(ToStringFormatter, PrintsTheValueOrItsAbsence) {
  const System::DateTime epoch;
  EXPECT_EQ(ToStringFormatter<System::DateTime>(&epoch).Print(), "1970-01-01T00:00:00Z");
  EXPECT_EQ(ToStringFormatter<System::DateTime>(nullptr).Print(), "(null)");
}

}  // namespace
}  // namespace Pelmar
