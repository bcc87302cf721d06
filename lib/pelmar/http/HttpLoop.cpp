// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/HttpLoop.h"

#include "pelmar/http/CurlMemory.h"
#include "pelmar/http/SpareFailures.h"

#include <pelmar/http/HttpException.h>
#include <pelmar/system/ThreadPool.h>

#include <curl/curl.h>
#include <pthread.h>
#include <unistd.h>

#include <csignal>
#include <ctime>
#include <exception>
#include <system_error>
#include <utility>

namespace Pelmar {
namespace Http {

namespace {

constexpr int kNoLimit = -1;
constexpr int kRedeliverMilliseconds = 100;

/// Blocks all signals on this thread, and so on the threads it starts meanwhile: the host's signal handlers
/// are not to run on ours, and a broken connection shall not raise SIGPIPE.
class SignalBlock final {
 public:
  SignalBlock() {
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &_before);
  }
  SignalBlock(const SignalBlock&) = delete;
  SignalBlock& operator=(const SignalBlock&) = delete;
  ~SignalBlock() { pthread_sigmask(SIG_SETMASK, &_before, nullptr); }

 private:
  sigset_t _before;
};

class ShutdownAtExit final {
 public:
  explicit ShutdownAtExit(HttpLoop* loop) : _loop(loop) {}
  ShutdownAtExit(const ShutdownAtExit&) = delete;
  ShutdownAtExit& operator=(const ShutdownAtExit&) = delete;
  ~ShutdownAtExit() { _loop->Shutdown(); }

 private:
  HttpLoop* const _loop;
};

}  // namespace

HttpLoop& HttpLoop::Get() {
  // The pool comes first, so that at exit it goes last: what waits for us on its threads is released by our
  // end.
  static System::ThreadPool* const pool = System::GetThreadPool();
  static HttpLoop* const loop = new HttpLoop([](const boost::function<void()>& work) { pool->Queue(work); });
  static const ShutdownAtExit shutdownAtExit(loop);
  return *loop;
}

HttpLoop::HttpLoop(QueueFunction queue)
    : HttpLoop(std::move(queue), [] { return static_cast<Seconds>(std::time(nullptr)); }) {}

HttpLoop::HttpLoop(QueueFunction queue, LaneSet::GetTimeFunction getTime)
    : _queue(std::move(queue)), _getTime(std::move(getTime)) {}

HttpLoop::~HttpLoop() {
  Shutdown();
}

void HttpLoop::Submit(const Ref<Exchange>& exchange) {
  if (IsInForkedChild()) {
    throw HttpException(
        "The HTTP client was started before this process was forked, and works in the parent only");
  }
  LoopCommands command(1, LoopCommand{LoopVerb::SUBMIT, exchange, 0});
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    if (!_stopped && !_thread.joinable()) {
      StartThread();
    }
  }
  if (!Post(command)) {
    exchange->Settle(GetSpareFailures().processEnds, nullptr);
  }
}

void HttpLoop::Abandon(const Ref<Exchange>& exchange) noexcept {
  LoopCommands command = exchange->TakeAbandonment();
  command.front().exchange = exchange;
  Post(command);
}

LoopCommands HttpLoop::MakeFarewell(LoopVerb verb, std::uint64_t id) {
  return LoopCommands(1, LoopCommand{verb, nullptr, id});
}

void HttpLoop::TakeFarewell(LoopCommands& farewell) noexcept {
  Post(farewell);
}

void HttpLoop::Deliver(Work work) {
  try {
    _queue(work.front());
    return;
  } catch (const std::exception&) {
    // No thread, or no memory; there will be.
  }
  const std::lock_guard<std::mutex> lock(_mutex);
  if (!_stopped && _poller) {
    _undelivered.splice(_undelivered.end(), work);
    _poller->Wake();
  }
}

void HttpLoop::Shutdown() {
  if (IsInForkedChild()) {
    return;
  }
  std::thread thread;
  Work dropped;
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    _stopped = true;
    dropped.swap(_undelivered);
    thread.swap(_thread);
    if (_poller) {
      _poller->Wake();
    }
  }
  if (thread.joinable()) {
    thread.join();
  }
}

/// False, and the command still with the caller, when there is no thread to obey.
bool HttpLoop::Post(LoopCommands& command) noexcept {
  if (IsInForkedChild()) {
    return false;
  }
  const std::lock_guard<std::mutex> lock(_mutex);
  if (_stopped || !_thread.joinable()) {
    return false;
  }
  _commands.splice(_commands.end(), command);
  _poller->Wake();
  return true;
}

/// Called with the lock held.
void HttpLoop::StartThread() {
  GetSpareFailures();
  if (!InitializeCurl()) {
    throw HttpException("The HTTP engine cannot be set up");
  }
  try {
    if (!_poller) {
      _poller = std::make_unique<Poller>();
    }
    const SignalBlock block;
    _thread = std::thread([this] { Run(); });
    _process = ::getpid();
  } catch (const std::system_error& e) {
    curl_global_cleanup();
    throw HttpException(std::string("The HTTP client cannot start a thread: ") + e.what());
  } catch (...) {
    curl_global_cleanup();
    throw;
  }
}

bool HttpLoop::IsInForkedChild() const noexcept {
  const pid_t process = _process;
  return process != 0 && process != ::getpid();
}

void HttpLoop::Run() noexcept {
  {
    LaneSet lanes(*_poller, _getTime);
    LoopCommands commands;
    while (TakeCommands(commands)) {
      for (const LoopCommand& command : commands) {
        Obey(command, lanes);
      }
      // Released before the wait: a command holds what it is about.
      commands.clear();
      lanes.Turn(Redeliver() ? kRedeliverMilliseconds : kNoLimit);
    }
    // Those that came too late to be started end like those that run.
    for (const LoopCommand& command : commands) {
      if (command.verb == LoopVerb::SUBMIT) {
        command.exchange->Settle(GetSpareFailures().processEnds, nullptr);
      }
    }
  }
  curl_global_cleanup();
}

/// False when the loop is to end.
bool HttpLoop::TakeCommands(LoopCommands& commands) {
  const std::lock_guard<std::mutex> lock(_mutex);
  commands.swap(_commands);
  return !_stopped;
}

void HttpLoop::Obey(const LoopCommand& command, LaneSet& lanes) {
  switch (command.verb) {
    case LoopVerb::SUBMIT:
      lanes.Submit(command.exchange);
      break;
    case LoopVerb::ABANDON:
      lanes.Abandon(*command.exchange);
      break;
    case LoopVerb::DROP_AGENT:
      lanes.DropAgent(command.id);
      break;
    case LoopVerb::DROP_SPEC:
      lanes.DropSpec(command.id);
      break;
  }
}

bool HttpLoop::Redeliver() {
  Work work;
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    work.swap(_undelivered);
  }
  while (!work.empty()) {
    Work next;
    next.splice(next.end(), work, work.begin());
    Deliver(std::move(next));
  }
  const std::lock_guard<std::mutex> lock(_mutex);
  return !_undelivered.empty();
}

}  // namespace Http
}  // namespace Pelmar
