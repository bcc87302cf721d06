// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Where nodes and their lists of attributes lie: one after the other, in blocks.
//
// A tree is thousands of small objects that are made in one go and mostly go away together. Taking each from
// malloc and giving each back was a tenth of the validation of a token (in multiples of the benchmark's
// floor: 5 groups 1.65 -> 1.57, 5000 groups 2.43 -> 2.27). A block counts what lies in it; the last object to
// go, on whatever thread, frees it.

#include <pelmar/xml/NodeMemory.h>

#include "pelmar/core/PerThread.h"

#include <atomic>
#include <cstdint>
#include <cstdlib>
#include <new>

namespace Pelmar {
namespace Xml {

namespace {

// The address sanitizer shall see each node: g++ tells of it by a macro, clang++ by a feature.
#if defined(__SANITIZE_ADDRESS__)
constexpr bool kUsesBlocks = false;
#elif !defined(__has_feature)
constexpr bool kUsesBlocks = true;
#elif __has_feature(address_sanitizer)
constexpr bool kUsesBlocks = false;
#else
constexpr bool kUsesBlocks = true;
#endif

constexpr std::size_t kBlockBytes = 16 * 1024;
// What is larger would leave too much of a block unused.
constexpr std::size_t kMaxBytesInBlock = kBlockBytes / 16;
constexpr std::size_t kAlignment = alignof(std::max_align_t);

// While a thread fills a block it owes it this many objects more than lie in it, so that making one costs no
// atomic instruction, and nobody frees the block below it.
constexpr std::size_t kOwed = kBlockBytes;

// The head of a block, which begins at a multiple of kBlockBytes.
struct alignas(kAlignment) Block {
  std::atomic<std::size_t> count{kOwed};
};

void TakeFrom(Block* block, std::size_t objects) noexcept {
  if (block->count.fetch_sub(objects, std::memory_order_acq_rel) == objects) {
    block->~Block();
    std::free(block);
  }
}

Block* BlockOf(void* object) noexcept {
  const std::uintptr_t inBlock = reinterpret_cast<std::uintptr_t>(object) % kBlockBytes;
  return reinterpret_cast<Block*>(static_cast<char*>(object) - inBlock);
}

// The block that this thread fills.
class Filling final {
 public:
  Filling() = default;
  Filling(const Filling&) = delete;
  Filling& operator=(const Filling&) = delete;
  ~Filling() { Leave(); }

  void* Allocate(std::size_t size) {
    if (_block == nullptr || size > kBlockBytes - _used) {
      Advance();
    } else if (IsEmpty()) {
      Restart();
    }
    void* const object = reinterpret_cast<char*>(_block) + _used;
    _used += size;
    ++_objects;
    return object;
  }

 private:
  // Everything that was made here is gone: the next tree lies where the last one lay, in the processor's
  // caches.
  bool IsEmpty() const noexcept {
    return _objects != 0 && _block->count.load(std::memory_order_acquire) == kOwed - _objects;
  }

  void Restart() noexcept {
    _block->count.store(kOwed, std::memory_order_relaxed);
    _used = sizeof(Block);
    _objects = 0;
  }

  void Advance() {
    void* const memory = std::aligned_alloc(kBlockBytes, kBlockBytes);
    if (memory == nullptr) {
      throw std::bad_alloc();
    }
    Leave();
    _block = new (memory) Block();
    _used = sizeof(Block);
    _objects = 0;
  }

  void Leave() noexcept {
    if (_block != nullptr) {
      TakeFrom(_block, kOwed - _objects);
      _block = nullptr;
    }
  }

  Block* _block = nullptr;
  std::size_t _used = 0;
  std::size_t _objects = 0;
};

bool LiesInBlock(std::size_t size) noexcept {
  return kUsesBlocks && size <= kMaxBytesInBlock;
}

}  // namespace

void* AllocateNodeMemory(std::size_t size) {
  if (!LiesInBlock(size)) {
    return ::operator new(size);
  }
  const std::size_t aligned = (size + kAlignment - 1) / kAlignment * kAlignment;
  Filling* const filling = PerThread<Filling>::Get();
  return filling != nullptr ? filling->Allocate(aligned) : Filling().Allocate(aligned);
}

void FreeNodeMemory(void* memory, std::size_t size) noexcept {
  if (!LiesInBlock(size)) {
    ::operator delete(memory);
  } else if (memory != nullptr) {
    TakeFrom(BlockOf(memory), 1);
  }
}

}  // namespace Xml
}  // namespace Pelmar
