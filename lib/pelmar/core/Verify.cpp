// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Verify.h>

#include <cstdio>
#include <cstdlib>

namespace Pelmar {

void VerifyFailed(const char* condition, const char* source) noexcept {
  std::fprintf(stderr, "Verify failed: %s (%s)\n", condition, source);
  std::abort();
}

void PanicNotReached(const char* source) noexcept {
  VerifyFailed("not reached", source);
}

}  // namespace Pelmar
