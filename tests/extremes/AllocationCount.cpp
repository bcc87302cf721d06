// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Takes the place of the C library's allocator (glibc manual, 3.2.5 "Replacing malloc"), which still does the
// work. `operator new` and every shared library end up here.

#include "extremes/AllocationCount.h"

#include <malloc.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstddef>

extern "C" {
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* memory, std::size_t size);
void* __libc_memalign(std::size_t alignment, std::size_t size);
void __libc_free(void* memory);
}

namespace {

std::atomic<std::size_t> held{0};
std::atomic<std::size_t> peak{0};
std::atomic<std::size_t> requests{0};
std::atomic<std::size_t> heldBefore{0};

void* Take(void* memory) noexcept {
  if (memory != nullptr) {
    const std::size_t now = held += malloc_usable_size(memory);
    ++requests;
    std::size_t highest = peak;
    while (highest < now && !peak.compare_exchange_weak(highest, now)) {
    }
  }
  return memory;
}

void GiveBack(void* memory) noexcept {
  if (memory != nullptr) {
    held -= malloc_usable_size(memory);
  }
}

}  // namespace

extern "C" {

void* malloc(std::size_t size) {
  return Take(__libc_malloc(size));
}

void* calloc(std::size_t count, std::size_t size) {
  return Take(__libc_calloc(count, size));
}

// While a block is moved, old and new are held at once.
void* realloc(void* memory, std::size_t size) {
  const std::size_t before = memory == nullptr ? 0 : malloc_usable_size(memory);
  void* const result = __libc_realloc(memory, size);
  if (result != nullptr) {
    Take(result);
    held -= before;
  } else if (size == 0) {
    held -= before;
  }
  return result;
}

void* memalign(std::size_t alignment, std::size_t size) {
  return Take(__libc_memalign(alignment, size));
}

void* aligned_alloc(std::size_t alignment, std::size_t size) {
  return memalign(alignment, size);
}

int posix_memalign(void** memory, std::size_t alignment, std::size_t size) {
  *memory = memalign(alignment, size);
  return *memory == nullptr ? ENOMEM : 0;
}

void free(void* memory) {
  GiveBack(memory);
  __libc_free(memory);
}

}  // extern "C"

namespace Extremes {

void StartCounting() {
  heldBefore = held.load();
  peak = held.load();
  requests = 0;
}

Cost StopCounting() {
  return {peak - heldBefore, requests, std::max(held.load(), heldBefore.load()) - heldBefore};
}

}  // namespace Extremes
