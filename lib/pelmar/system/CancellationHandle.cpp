// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/system/CancellationHandleImpl.h"

#include <pelmar/Exception.h>

#include <algorithm>
#include <chrono>

namespace Pelmar {
namespace System {

namespace {

// Longer waits are cut to this, for the clock would overflow: a hundred years.
constexpr long long kMaxWaitMicroseconds = 100LL * 365 * 24 * 60 * 60 * 1000000;

}  // namespace

CancellationHandle::~CancellationHandle() = default;

CancellationHandleImpl::~CancellationHandleImpl() = default;

void CancellationHandleImpl::Cancel() {
  std::map<const ScheduledItem*, Ref<ScheduledItem>> items;
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    _isCancelled = true;
    items.swap(_items);
  }
  _wake.notify_all();
  for (const auto& entry : items) {
    entry.second->Cancel();
  }
}

bool CancellationHandleImpl::IsCancelled() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _isCancelled;
}

bool CancellationHandleImpl::Wait(long long timeoutMicroseconds) {
  std::unique_lock<std::mutex> lock(_mutex);
  const auto isCancelled = [this] {
    return _isCancelled;
  };
  if (timeoutMicroseconds < 0) {
    _wake.wait(lock, isCancelled);
    return true;
  }
  const auto deadline = std::chrono::steady_clock::now() +
                        std::chrono::microseconds(std::min(timeoutMicroseconds, kMaxWaitMicroseconds));
  return _wake.wait_until(lock, deadline, isCancelled);
}

void CancellationHandleImpl::Attach(const Ref<ScheduledItem>& item) {
  if (!item) {
    throw InvalidArgumentException("there is no item to attach");
  }
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    if (!_isCancelled) {
      _items.emplace(item.Get(), item);
      return;
    }
  }
  item->Cancel();
}

void CancellationHandleImpl::Detach(const Ref<ScheduledItem>& item) {
  const std::lock_guard<std::mutex> lock(_mutex);
  _items.erase(item.Get());
}

Ref<CancellationHandle> CreateCancellationHandle() {
  return MakeRef<CancellationHandleImpl>();
}

}  // namespace System
}  // namespace Pelmar
