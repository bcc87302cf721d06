// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Which blocks of memory are held, for an allocator: needs no memory but its own.

#ifndef QUORLIN_TESTS_TORTURE_BLOCKTABLE_H
#define QUORLIN_TESTS_TORTURE_BLOCKTABLE_H

#include <atomic>
#include <cstddef>

namespace Torture {

/// Addresses in a table of fixed size, found by their hash and a search from there. All zero at the start of
/// the process, so it is ready before any constructor has run.
class BlockTable final {
 public:
  /// Asked for by the code at `caller`.
  void Add(const void* block, const void* caller) noexcept;
  /// From now on each block is noted with the calls that led to it, which is slow.
  void NoteCallers() noexcept { _isNotingCallers = true; }
  /// Those that were never added are ignored.
  void Remove(const void* block) noexcept;
  std::size_t Count() const noexcept { return _count; }

  /// How many there are of callers that `isCounted` tells.
  std::size_t Count(bool (*isCounted)(const void* caller)) const;
  std::size_t CountAdded() const noexcept { return _added; }
  /// Writes the noted callers of every block held that was added after `count` calls of `Add` to standard
  /// error.
  void WriteCallersSince(std::size_t count) noexcept;

 private:
  static constexpr std::size_t kSlots = std::size_t(1) << 17;
  static constexpr int kMaxCallers = 24;

  struct Slot {
    const void* block;
    const void* caller;
    std::size_t number;
    void* callers[kMaxCallers];
  };

  static std::size_t Home(const void* block) noexcept;
  static std::size_t Next(std::size_t slot) noexcept { return (slot + 1) % kSlots; }
  void Lock() noexcept;
  void Unlock() noexcept;

  std::atomic<bool> _locked;
  std::atomic<bool> _isNotingCallers;
  std::atomic<std::size_t> _count;
  std::size_t _added;
  Slot _slots[kSlots];
};

}  // namespace Torture

#endif  // QUORLIN_TESTS_TORTURE_BLOCKTABLE_H
