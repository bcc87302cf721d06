// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/Durations.h"

namespace Pelmar {
namespace Http {

std::string FormatSeconds(long long microseconds) {
  constexpr long long kMicrosecondsPerSecond = 1000000;
  std::string text = std::to_string(microseconds / kMicrosecondsPerSecond);
  const long long fraction = microseconds % kMicrosecondsPerSecond;
  if (fraction != 0) {
    // The leading one keeps the zeros after the point.
    std::string digits = std::to_string(kMicrosecondsPerSecond + fraction).substr(1);
    digits.erase(digits.find_last_not_of('0') + 1);
    text += "." + digits;
  }
  return text;
}

}  // namespace Http
}  // namespace Pelmar
