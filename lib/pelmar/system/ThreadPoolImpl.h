// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A pool of threads with bounds of its own; the process's pool is one of these.

#ifndef PELMAR_SYSTEM_THREADPOOLIMPL_H
#define PELMAR_SYSTEM_THREADPOOLIMPL_H

#include <pelmar/system/ThreadPool.h>

#include <sys/types.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <functional>
#include <list>
#include <mutex>
#include <string>
#include <thread>

namespace Pelmar {
namespace System {

struct ThreadPoolSettings {
  std::size_t maxThreads;              ///< At least 1.
  std::chrono::microseconds idleTime;  ///< How long a thread waits for work before it ends.
  /// Told of each exception that escapes an item: its class, and what it says of itself if it says anything.
  /// Called on the thread that ran the item; what it throws is lost.
  std::function<void(const std::string& description)> reportEscaped;
  /// Starts a thread; throws std::system_error when there is none to be had.
  std::function<std::thread(std::function<void()> run)> startThread;
};

/// Starts `run` on an ordinary thread.
std::thread StartThread(std::function<void()> run);

/// Work waits in one queue, first come first served. A thread is started for an item that no idle thread is
/// there to take, up to `maxThreads`; a thread that found nothing to do for `idleTime` ends. No code of an
/// item (running, copying, destroying it) is ever called under the pool's lock, so items may use the pool as
/// they like.
class ThreadPoolImpl final : public ThreadPool {
 public:
  explicit ThreadPoolImpl(ThreadPoolSettings settings);
  /// Shuts down. Must not be called by one of the pool's own items.
  ~ThreadPoolImpl();

  /// After `Shutdown` the item is destroyed without being run. Throws Pelmar::Exception when the pool has no
  /// thread and none can be started; while it has one, the item waits for that. Throws it too in a forked
  /// child of the process that started the first thread, for there are none of them.
  void Queue(const boost::function<void()>& work) override;

  /// Destroys what is queued without running it and waits for what runs. On a thread of the pool (an item
  /// that ends the process) it waits for the other items only. A second call does nothing, nor does one in a
  /// forked child.
  void Shutdown();

  /// How many threads there are now, busy and idle.
  std::size_t CountThreads() const;
  /// How many of them are running or destroying an item.
  std::size_t CountBusyThreads() const;

 private:
  using Work = boost::function<void()>;
  using Works = std::list<Work>;
  using Threads = std::list<std::thread>;

  bool IsInForkedChild() const noexcept;
  void StartThreadIfNeeded();
  bool TryStartThread(std::string& failure);
  void Run(Threads::iterator self) noexcept;
  bool AwaitWork(std::unique_lock<std::mutex>& lock);
  void RunItem(Work& work) noexcept;
  void Retire(Threads::iterator self, std::unique_lock<std::mutex>& lock);

  const ThreadPoolSettings _settings;
  std::atomic<pid_t> _process{0};  // Where the first thread was started.
  mutable std::mutex _mutex;
  std::condition_variable _wake;
  // All below are guarded by the mutex.
  Works _queue;
  Threads _threads;
  Threads _retired;  // Ended or about to, no longer in `_threads`; joined by the next that retires.
  std::size_t _busy = 0;
  bool _stopped = false;
};

}  // namespace System
}  // namespace Pelmar

#endif  // PELMAR_SYSTEM_THREADPOOLIMPL_H
