// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The order of an interface's virtual operations, which is part of its binary form.

#ifndef QUORLIN_TESTS_SUPPORT_VIRTUALSLOT_H
#define QUORLIN_TESTS_SUPPORT_VIRTUALSLOT_H

#include <cstddef>
#include <cstring>

namespace TestSupport {

/// Where a virtual operation stands in its class's table: a member pointer holds 1 + the offset (Itanium C++
/// ABI, 2.3).
template <typename Member>
std::ptrdiff_t SlotOf(Member member) {
  std::ptrdiff_t offset = 0;
  static_assert(sizeof member >= sizeof offset, "a member pointer starts with its offset");
  std::memcpy(&offset, &member, sizeof offset);
  return (offset - 1) / static_cast<std::ptrdiff_t>(sizeof(void*));
}

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_VIRTUALSLOT_H
