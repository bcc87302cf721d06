// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The scheduler that providers use when their host brings none.

#ifndef QUORLIN_PROVIDER_TIMERSCHEDULER_H
#define QUORLIN_PROVIDER_TIMERSCHEDULER_H

#include <quorlin/TokenProviderOptions.h>

#include <boost/shared_ptr.hpp>

#include <chrono>
#include <condition_variable>
#include <map>
#include <mutex>
#include <thread>
#include <utility>

namespace Quorlin {

/// Waits on one thread, which starts with the first work that is not due at once, and hands work that is due
/// to `run`. Time is the steady clock's. Safe to use from any thread.
class TimerScheduler final : public TokenProviderScheduler {
 public:
  typedef boost::function<void(const Work&)> Runner;

  /// `run` takes work at once and runs it elsewhere. When it throws, the work is offered again after
  /// `offerAgainAfter`.
  TimerScheduler(const Runner& run, std::chrono::microseconds offerAgainAfter);
  /// Stops. Must not be called by work.
  ~TimerScheduler();

  unsigned long long Schedule(long long delayMicroseconds, const Work& work) override;
  void Cancel(unsigned long long number) override;

  /// Forgets all work and ends the thread; later work is forgotten at once. A second call does nothing.
  void Stop();

 private:
  typedef std::chrono::steady_clock::time_point Instant;
  typedef std::map<std::pair<Instant, unsigned long long>, Work> Queue;

  void Wait();
  void RunFirst(std::unique_lock<std::mutex>& lock);

  const Runner _run;
  const std::chrono::microseconds _offerAgainAfter;
  std::mutex _mutex;
  std::condition_variable _changed;
  // All below are guarded by the mutex.
  Queue _queue;
  std::map<unsigned long long, Instant> _due;  // When each of the queue is due.
  unsigned long long _lastNumber = 0;
  bool _stopped = false;
  std::thread _thread;
};

/// The process's scheduler: work runs on the platform's thread pool. Never null. It ends with the process;
/// what is not due by then is forgotten.
boost::shared_ptr<TokenProviderScheduler> GetProcessScheduler();

}  // namespace Quorlin

#endif  // QUORLIN_PROVIDER_TIMERSCHEDULER_H
