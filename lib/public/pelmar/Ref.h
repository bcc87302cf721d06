// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The intrusive reference: shares the ownership of an `Object`.

#ifndef PELMAR_REF_H
#define PELMAR_REF_H

#include <pelmar/Object.h>

#include <cstddef>
#include <utility>

namespace Pelmar {

/// Owning pointer to an `Object`, possibly null. Copies share the object. Never throws.
template <typename T>
class Ref {
 public:
  Ref() noexcept : _object(nullptr) {}
  Ref(std::nullptr_t) noexcept : _object(nullptr) {}
  Ref(T* object) noexcept : _object(object) { Acquire(); }
  Ref(const Ref& other) noexcept : _object(other._object) { Acquire(); }
  Ref(Ref&& other) noexcept : _object(other._object) { other._object = nullptr; }

  /// From a reference to a derived or less constant type.
  template <typename U>
  Ref(const Ref<U>& other) noexcept : _object(other.Get()) {
    Acquire();
  }

  ~Ref() {
    if (_object != nullptr) {
      _object->Release();
    }
  }

  Ref& operator=(Ref other) noexcept {
    Swap(other);
    return *this;
  }

  T* Get() const noexcept { return _object; }
  T* operator->() const noexcept { return _object; }
  T& operator*() const noexcept { return *_object; }
  explicit operator bool() const noexcept { return _object != nullptr; }

  void Swap(Ref& other) noexcept { std::swap(_object, other._object); }

 private:
  void Acquire() const noexcept {
    if (_object != nullptr) {
      _object->AddRef();
    }
  }

  T* _object;
};

template <typename T, typename U>
bool operator==(const Ref<T>& a, const Ref<U>& b) noexcept {
  return a.Get() == b.Get();
}

template <typename T, typename U>
bool operator!=(const Ref<T>& a, const Ref<U>& b) noexcept {
  return a.Get() != b.Get();
}

/// Creates a `T` that is owned from its first moment.
template <typename T, typename... Args>
Ref<T> MakeRef(Args&&... args) {
  return Ref<T>(new T(std::forward<Args>(args)...));
}

}  // namespace Pelmar

#endif  // PELMAR_REF_H
