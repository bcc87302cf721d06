// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The memory of the document tree's nodes.

#ifndef PELMAR_XML_NODEMEMORY_H
#define PELMAR_XML_NODEMEMORY_H

#include <pelmar/Export.h>

#include <cstddef>

namespace Pelmar {
namespace Xml {

/// Memory for one node, or for the attributes of one, aligned for every type. Throws std::bad_alloc.
PELMAR_API void* AllocateNodeMemory(std::size_t size);

/// Gives it back, on any thread; `size` is what was asked for. Null is allowed.
PELMAR_API void FreeNodeMemory(void* memory, std::size_t size) noexcept;

/// Lets a container of a node lie where the nodes are.
template <typename T>
class NodeAllocator {
 public:
  typedef T value_type;

  NodeAllocator() noexcept {}
  template <typename U>
  NodeAllocator(const NodeAllocator<U>&) noexcept {}

  T* allocate(std::size_t count) {
    static_assert(alignof(T) <= alignof(std::max_align_t), "node memory has no larger alignment");
    return static_cast<T*>(AllocateNodeMemory(count * sizeof(T)));
  }
  void deallocate(T* memory, std::size_t count) noexcept { FreeNodeMemory(memory, count * sizeof(T)); }
};

template <typename T, typename U>
bool operator==(const NodeAllocator<T>&, const NodeAllocator<U>&) noexcept {
  return true;
}

template <typename T, typename U>
bool operator!=(const NodeAllocator<T>&, const NodeAllocator<U>&) noexcept {
  return false;
}

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_NODEMEMORY_H
