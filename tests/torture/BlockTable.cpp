// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "torture/BlockTable.h"

#include <execinfo.h>
#include <sched.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <iterator>

namespace Torture {

std::size_t BlockTable::Home(const void* block) noexcept {
  constexpr std::uint64_t kGoldenRatio = 0x9E3779B97F4A7C15u;
  return static_cast<std::size_t>((reinterpret_cast<std::uintptr_t>(block) >> 4) * kGoldenRatio >> 32) %
         kSlots;
}

void BlockTable::Lock() noexcept {
  while (_locked.exchange(true, std::memory_order_acquire)) {
    sched_yield();
  }
}

void BlockTable::Unlock() noexcept {
  _locked.store(false, std::memory_order_release);
}

void BlockTable::Add(const void* block, const void* caller) noexcept {
  Lock();
  if (_count == kSlots / 2) {
    std::abort();  // Far more than any of these tests takes.
  }
  std::size_t slot = Home(block);
  while (_slots[slot].block != nullptr) {
    slot = Next(slot);
  }
  _slots[slot].block = block;
  _slots[slot].caller = caller;
  _slots[slot].number = ++_added;
  if (_isNotingCallers) {
    std::fill(std::begin(_slots[slot].callers), std::end(_slots[slot].callers), nullptr);
    backtrace(_slots[slot].callers, kMaxCallers);
  }
  ++_count;
  Unlock();
}

void BlockTable::Remove(const void* block) noexcept {
  Lock();
  std::size_t hole = Home(block);
  while (_slots[hole].block != nullptr && _slots[hole].block != block) {
    hole = Next(hole);
  }
  if (_slots[hole].block != nullptr) {
    --_count;
    // Those behind it move up, unless that were before their home.
    for (std::size_t slot = Next(hole); _slots[slot].block != nullptr; slot = Next(slot)) {
      const std::size_t fromHome = (slot - Home(_slots[slot].block)) % kSlots;
      const std::size_t fromHole = (slot - hole) % kSlots;
      if (fromHome >= fromHole) {
        _slots[hole] = _slots[slot];
        hole = slot;
      }
    }
    _slots[hole].block = nullptr;
  }
  Unlock();
}

std::size_t BlockTable::Count(bool (*isCounted)(const void* caller)) const {
  return static_cast<std::size_t>(std::count_if(std::begin(_slots), std::end(_slots), [&](const Slot& slot) {
    return slot.block != nullptr && isCounted(slot.caller);
  }));
}

void BlockTable::WriteCallersSince(std::size_t count) noexcept {
  for (const Slot& slot : _slots) {
    if (slot.block != nullptr && slot.number > count) {
      dprintf(STDERR_FILENO, "block held, asked for by:\n");
      const auto end = std::find(std::begin(slot.callers), std::end(slot.callers), nullptr);
      backtrace_symbols_fd(slot.callers, static_cast<int>(end - std::begin(slot.callers)), STDERR_FILENO);
    }
  }
}

}  // namespace Torture
