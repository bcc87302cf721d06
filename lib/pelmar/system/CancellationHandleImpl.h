// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The switch that ends calls.

#ifndef PELMAR_SYSTEM_CANCELLATIONHANDLEIMPL_H
#define PELMAR_SYSTEM_CANCELLATIONHANDLEIMPL_H

#include <pelmar/system/CancellationHandle.h>

#include <condition_variable>
#include <map>
#include <mutex>

namespace Pelmar {
namespace System {

/// Items are known by their address, which cannot come to be another item's while a `Ref` holds on to it.
/// They are cancelled outside the lock: each has locks of its own.
class CancellationHandleImpl final : public CancellationHandle {
 public:
  CancellationHandleImpl() = default;

  void Cancel() override;
  bool IsCancelled() const override;
  bool Wait(long long timeoutMicroseconds) override;
  void Attach(const Ref<ScheduledItem>& item) override;
  void Detach(const Ref<ScheduledItem>& item) override;

 private:
  ~CancellationHandleImpl() override;

  mutable std::mutex _mutex;
  std::condition_variable _wake;
  // Guarded by the mutex.
  bool _isCancelled = false;
  std::map<const ScheduledItem*, Ref<ScheduledItem>> _items;
};

}  // namespace System
}  // namespace Pelmar

#endif  // PELMAR_SYSTEM_CANCELLATIONHANDLEIMPL_H
