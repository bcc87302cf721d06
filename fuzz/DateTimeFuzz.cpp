// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Reading a date refuses with DateFormatException and nothing else; what it accepts prints as a text that
// reads as the same instant, or, where an offset carried the instant out of the years 0001 to 9999, as one
// that is refused.

#include <pelmar/system/DateTime.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

namespace {

using Pelmar::System::DateFormatException;
using Pelmar::System::DateTime;
using Pelmar::System::DateTimeFields;

void Require(bool holds) {
  if (!holds) {
    std::abort();
  }
}

bool IsReadableYear(const DateTimeFields& fields) {
  const int year = fields.century * 100 + fields.yearOfCentury;
  return year >= 1 && year <= 9999;
}

void CheckReadingBack(const DateTime& date) {
  try {
    const DateTime again(date.ToString());
    Require(IsReadableYear(date.GetFields()) && again == date);
  } catch (const DateFormatException&) {
    Require(!IsReadableYear(date.GetFields()));
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  try {
    CheckReadingBack(DateTime(std::string(data, data + size)));
  } catch (const DateFormatException&) {
    return 0;
  }
  return 0;
}
