// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/Secret.h"

namespace Quorlin {

void Wipe(char* bytes, std::size_t count) noexcept {
  // A volatile access is an effect that the compiler has to keep.
  volatile char* const place = bytes;
  for (std::size_t i = 0; i < count; ++i) {
    place[i] = '\0';
  }
}

}  // namespace Quorlin
