// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "provider/HandTime.h"

#include <algorithm>
#include <stdexcept>

namespace TestSupport {

unsigned long long HandScheduler::Schedule(long long delayMicroseconds, const Work& work) {
  if (_refuses) {
    throw std::runtime_error("no thread to be had");
  }
  const std::lock_guard<std::mutex> lock(_mutex);
  _items.push_back({++_lastNumber, delayMicroseconds, work});
  return _lastNumber;
}

void HandScheduler::Cancel(unsigned long long number) {
  const std::lock_guard<std::mutex> lock(_mutex);
  const auto isIt = [number](const Item& item) {
    return item.number == number;
  };
  _items.erase(std::remove_if(_items.begin(), _items.end(), isIt), _items.end());
}

bool HandScheduler::Take(bool isTimer, Work& work) {
  const std::lock_guard<std::mutex> lock(_mutex);
  const auto found = std::find_if(_items.begin(), _items.end(),
                                  [isTimer](const Item& item) { return (item.delay > 0) == isTimer; });
  if (found == _items.end()) {
    return false;
  }
  work = found->work;
  _items.erase(found);
  return true;
}

int HandScheduler::RunAtOnce() {
  int count = 0;
  for (Work work; Take(false, work); ++count) {
    work();
  }
  return count;
}

bool HandScheduler::RunTimer() {
  Work work;
  if (!Take(true, work)) {
    return false;
  }
  work();
  return true;
}

std::vector<long long> HandScheduler::GetDelays() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  std::vector<long long> delays;
  for (const Item& item : _items) {
    if (item.delay > 0) {
      delays.push_back(item.delay);
    }
  }
  return delays;
}

std::size_t HandScheduler::Count() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _items.size();
}

}  // namespace TestSupport
