// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/TimerScheduler.h"

#include <pelmar/system/ThreadPool.h>

namespace Quorlin {

namespace {

constexpr std::chrono::seconds kOfferAgainAfter(1);

void RunOnPool(const TokenProviderScheduler::Work& work) {
  Pelmar::System::GetThreadPool()->Queue(work);
}

/// Ends the timer thread when the process exits or unloads the library.
class StopAtExit final {
 public:
  explicit StopAtExit(TimerScheduler* scheduler) : _scheduler(scheduler) {}
  StopAtExit(const StopAtExit&) = delete;
  StopAtExit& operator=(const StopAtExit&) = delete;
  ~StopAtExit() { _scheduler->Stop(); }

 private:
  TimerScheduler* const _scheduler;
};

}  // namespace

TimerScheduler::TimerScheduler(const Runner& run, std::chrono::microseconds offerAgainAfter)
    : _run(run), _offerAgainAfter(offerAgainAfter) {}

TimerScheduler::~TimerScheduler() {
  Stop();
}

unsigned long long TimerScheduler::Schedule(long long delayMicroseconds, const Work& work) {
  if (delayMicroseconds <= 0) {
    _run(work);
    return 0;
  }
  const Instant due = std::chrono::steady_clock::now() + std::chrono::microseconds(delayMicroseconds);
  const std::lock_guard<std::mutex> lock(_mutex);
  if (_stopped) {
    return 0;
  }
  if (!_thread.joinable()) {
    _thread = std::thread([this] { Wait(); });
  }
  const unsigned long long number = ++_lastNumber;
  const auto queued = _queue.emplace(std::make_pair(due, number), work).first;
  try {
    _due.emplace(number, due);
  } catch (...) {
    _queue.erase(queued);
    throw;
  }
  _changed.notify_one();
  return number;
}

void TimerScheduler::Cancel(unsigned long long number) {
  Queue::node_type forgotten;  // Destroyed after the lock: work may own anything.
  const std::lock_guard<std::mutex> lock(_mutex);
  const auto found = _due.find(number);
  if (found != _due.end()) {
    forgotten = _queue.extract(std::make_pair(found->second, number));
    _due.erase(found);
  }
}

void TimerScheduler::Stop() {
  Queue forgotten;
  std::thread thread;
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    _stopped = true;
    forgotten.swap(_queue);
    _due.clear();
    thread.swap(_thread);
  }
  _changed.notify_one();
  if (thread.joinable()) {
    thread.join();
  }
}

void TimerScheduler::Wait() {
  std::unique_lock<std::mutex> lock(_mutex);
  while (!_stopped) {
    if (_queue.empty()) {
      _changed.wait(lock);
    } else if (std::chrono::steady_clock::now() < _queue.begin()->first.first) {
      const Instant due = _queue.begin()->first.first;
      _changed.wait_until(lock, due);
    } else {
      RunFirst(lock);
    }
  }
}

void TimerScheduler::RunFirst(std::unique_lock<std::mutex>& lock) {
  Queue::node_type first = _queue.extract(_queue.begin());
  _due.erase(first.key().second);
  lock.unlock();
  bool isTaken = true;
  try {
    _run(first.mapped());
    first = Queue::node_type();
  } catch (...) {
    isTaken = false;
  }
  lock.lock();
  if (isTaken) {
    return;
  }
  // Putting the node back allocates nothing. Nobody can cancel it any more: to its owner it has begun. After
  // Stop nobody will run it either.
  first.key().first = std::chrono::steady_clock::now() + _offerAgainAfter;
  _queue.insert(std::move(first));
}

boost::shared_ptr<TokenProviderScheduler> GetProcessScheduler() {
  // The pool is made first, and so ends after the timer, which hands work to it. Never destroyed: objects
  // that end with the process may still schedule.
  static Pelmar::System::ThreadPool* const pool = Pelmar::System::GetThreadPool();
  static_cast<void>(pool);
  static const boost::shared_ptr<TimerScheduler>* const scheduler =
      new boost::shared_ptr<TimerScheduler>(new TimerScheduler(RunOnPool, kOfferAgainAfter));
  static const StopAtExit stopAtExit(scheduler->get());
  return *scheduler;
}

}  // namespace Quorlin
