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
  void AddRef() const noexcept;
  void Release() const noexcept;

 protected:
  Object() noexcept;
  virtual ~Object();

 private:
  Object(const Object&) = delete;
  Object& operator=(const Object&) = delete;

  mutable std::atomic<long> _owners;
};

}  // namespace Pelmar

#endif  // PELMAR_OBJECT_H
