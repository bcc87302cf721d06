// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/SpareFailures.h"

namespace Pelmar {
namespace Http {

const SpareFailures& GetSpareFailures() {
  // Never destroyed: requests end with them while the process does.
  static const SpareFailures* const failures =
      new SpareFailures{std::make_shared<const HttpException>("Out of memory"),
                        std::make_shared<const HttpException>("The HTTP engine broke down"),
                        std::make_shared<const HttpException>("Request was cancelled: the process ends")};
  return *failures;
}

}  // namespace Http
}  // namespace Pelmar
