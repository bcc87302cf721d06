// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/system/ThreadPoolImpl.h"

#include <pelmar/Exception.h>

#include "pelmar/system/EscapedException.h"

#include <unistd.h>

#include <exception>
#include <system_error>
#include <utility>

namespace Pelmar {
namespace System {

namespace {

void JoinAll(std::list<std::thread>& threads) {
  for (std::thread& thread : threads) {
    if (thread.get_id() == std::this_thread::get_id()) {
      thread.detach();
    } else {
      thread.join();
    }
  }
}

}  // namespace

std::thread StartThread(std::function<void()> run) {
  return std::thread(std::move(run));
}

ThreadPoolImpl::ThreadPoolImpl(ThreadPoolSettings settings) : _settings(std::move(settings)) {}

ThreadPoolImpl::~ThreadPoolImpl() {
  Shutdown();
}

void ThreadPoolImpl::Queue(const boost::function<void()>& work) {
  if (work.empty()) {
    throw InvalidArgumentException("the work item is empty");
  }
  if (IsInForkedChild()) {
    throw Exception(
        "The thread pool was started before this process was forked, and works in the parent only");
  }
  // Copied before the lock and, where it is dropped, destroyed after it.
  Works item(1, work);
  const std::lock_guard<std::mutex> lock(_mutex);
  if (_stopped) {
    return;
  }
  const auto queued = item.begin();
  _queue.splice(_queue.end(), item);
  try {
    StartThreadIfNeeded();
  } catch (const std::exception&) {
    item.splice(item.end(), _queue, queued);
    throw;
  }
  _wake.notify_one();
}

void ThreadPoolImpl::Shutdown() {
  if (IsInForkedChild()) {
    return;
  }
  Works dropped;
  Threads threads;
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    _stopped = true;
    dropped.splice(dropped.end(), _queue);
    threads.splice(threads.end(), _threads);
    threads.splice(threads.end(), _retired);
  }
  _wake.notify_all();
  dropped.clear();
  JoinAll(threads);
}

// Asked before the lock, which a thread of the parent may have held at the fork.
bool ThreadPoolImpl::IsInForkedChild() const noexcept {
  const pid_t process = _process;
  return process != 0 && process != ::getpid();
}

std::size_t ThreadPoolImpl::CountThreads() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _threads.size();
}

std::size_t ThreadPoolImpl::CountBusyThreads() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _busy;
}

// Called with the lock held. Threads that are not busy are idle or on their way to the queue; each takes one
// item.
void ThreadPoolImpl::StartThreadIfNeeded() {
  const std::size_t available = _threads.size() - _busy;
  if (_queue.size() <= available || _threads.size() >= _settings.maxThreads) {
    return;
  }
  std::string failure;
  if (!TryStartThread(failure) && _threads.empty()) {
    throw Exception("Unable to start a thread: " + failure);
  }
}

bool ThreadPoolImpl::TryStartThread(std::string& failure) {
  const auto self = _threads.emplace(_threads.end());
  try {
    *self = _settings.startThread([this, self] { Run(self); });
    _process = ::getpid();
    return true;
  } catch (const std::exception& e) {
    failure = e.what();
    _threads.erase(self);
    return false;
  }
}

void ThreadPoolImpl::Run(Threads::iterator self) noexcept {
  std::unique_lock<std::mutex> lock(_mutex);
  while (AwaitWork(lock)) {
    Works item;
    item.splice(item.end(), _queue, _queue.begin());
    ++_busy;
    lock.unlock();
    RunItem(item.front());
    item.clear();
    lock.lock();
    --_busy;
  }
  Retire(self, lock);
}

/// False when there is nothing left for this thread to do.
bool ThreadPoolImpl::AwaitWork(std::unique_lock<std::mutex>& lock) {
  _wake.wait_for(lock, _settings.idleTime, [this] { return _stopped || !_queue.empty(); });
  return !_queue.empty();
}

void ThreadPoolImpl::RunItem(Work& work) noexcept {
  try {
    work();
  } catch (...) {
    try {
      _settings.reportEscaped(DescribeEscapedException());
    } catch (...) {
      // Nothing to tell it to; the pool lives on.
    }
  }
}

// A thread cannot join itself, so each joins those that retired before it, and the last is left to Shutdown.
// They are past their last use of the pool, so this does not wait for work.
void ThreadPoolImpl::Retire(Threads::iterator self, std::unique_lock<std::mutex>& lock) {
  if (_stopped) {
    return;  // Shutdown has taken the threads, this one too.
  }
  Threads predecessors;
  predecessors.splice(predecessors.end(), _retired);
  _retired.splice(_retired.end(), _threads, self);
  lock.unlock();
  JoinAll(predecessors);
}

}  // namespace System
}  // namespace Pelmar
