// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/doctor/HttpDate.h"

#include <pelmar/system/DateTime.h>

#include <algorithm>
#include <array>
#include <cstddef>

namespace Cli {
namespace Doctor {

namespace {

// 0 stands for a digit, a for any letter.
constexpr const char* kForm = "aaa, 00 aaa 0000 00:00:00 GMT";

bool HasForm(const std::string& text) {
  const std::string form = kForm;
  return text.size() == form.size() && std::equal(text.begin(), text.end(), form.begin(), [](char c, char f) {
           return f == '0'   ? c >= '0' && c <= '9'
                  : f == 'a' ? (c | 0x20) >= 'a' && (c | 0x20) <= 'z'
                             : c == f;
         });
}

/// "01" to "12"; empty when it is no month.
std::string ReadMonth(const std::string& name) {
  static constexpr std::array<const char*, 12> kMonths = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                          "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
  for (std::size_t i = 0; i < kMonths.size(); ++i) {
    if (name == kMonths[i]) {
      return (i < 9 ? "0" : "") + std::to_string(i + 1);
    }
  }
  return "";
}

}  // namespace

std::optional<long long> ReadHttpDate(const std::string& text) {
  if (!HasForm(text)) {
    return std::nullopt;
  }
  try {
    return Pelmar::System::DateTime(text.substr(12, 4) + "-" + ReadMonth(text.substr(8, 3)) + "-" +
                                    text.substr(5, 2) + "T" + text.substr(17, 8) + "Z")
        .GetUtcTime();
  } catch (const Pelmar::System::DateFormatException&) {
    return std::nullopt;
  }
}

}  // namespace Doctor
}  // namespace Cli
