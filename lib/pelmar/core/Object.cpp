// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Object.h>

namespace Pelmar {

Object::Object() noexcept : _owners(0) {}

Object::~Object() = default;

void Object::AddRef() const noexcept {
  _owners.fetch_add(1, std::memory_order_relaxed);
}

void Object::Release() const noexcept {
  // Release orders this owner's last use before the deletion, acquire makes the last owner see everybody's.
  if (_owners.fetch_sub(1, std::memory_order_acq_rel) == 1) {
    delete this;
  }
}

}  // namespace Pelmar
