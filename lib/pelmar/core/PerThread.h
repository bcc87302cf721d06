// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// An object that each thread has one of.

#ifndef PELMAR_CORE_PERTHREAD_H
#define PELMAR_CORE_PERTHREAD_H

namespace Pelmar {

/// The calling thread's `T`, made when it is first asked for and destroyed when the thread ends.
///
/// A host may well call us from what runs even later, the destructors of its own thread-local and static
/// objects: there is no `T` any more then, and Get gives null.
template <typename T>
class PerThread {
 public:
  static T* Get() { return _object != nullptr ? _object : Make(); }

 private:
  struct Holder {
    T value;
    ~Holder() {
      _object = nullptr;
      _isGone = true;
    }
  };

  static T* Make() {
    if (_isGone) {
      return nullptr;
    }
    thread_local Holder holder;
    _object = &holder.value;
    return _object;
  }

  // Without destructors, so they can be read as long as the thread runs.
  static inline thread_local T* _object = nullptr;
  static inline thread_local bool _isGone = false;
};

}  // namespace Pelmar

#endif  // PELMAR_CORE_PERTHREAD_H
