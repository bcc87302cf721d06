// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Clock.h"

#include <pelmar/system/DateTime.h>

namespace DevSts {

Clock MakeSystemClock(long long offsetSec) {
  return [offset = offsetSec * kMicrosecondsPerSecond] {
    return Pelmar::System::GetUtcDateTime().GetUtcTime() + offset;
  };
}

std::string ToDateText(long long utcMicroseconds) {
  return Pelmar::System::DateTimeFromUtc(utcMicroseconds, false).ToString();
}

}  // namespace DevSts
