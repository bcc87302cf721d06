// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/HttpLoop.h"

#include "pelmar/http/CurlMemory.h"

#include <pelmar/http/HttpException.h>
#include <pelmar/system/ThreadPool.h>

#include <curl/curl.h>
#include <pthread.h>

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
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    if (!_stopped && !_thread.joinable()) {
      StartThread();
    }
  }
  if (!Post({Verb::SUBMIT, exchange, 0})) {
    exchange->Settle(std::make_shared<const HttpException>("Request was cancelled: the process ends"),
                     nullptr);
  }
}

void HttpLoop::Abandon(const Ref<Exchange>& exchange) {
  Post({Verb::ABANDON, exchange, 0});
}

void HttpLoop::DropAgent(std::uint64_t agent) noexcept {
  try {
    Post({Verb::DROP_AGENT, nullptr, agent});
  } catch (const std::exception&) {
    // Out of memory: its idle connections stay until their servers close them.
  }
}

void HttpLoop::DropSpec(std::uint64_t spec) noexcept {
  try {
    Post({Verb::DROP_SPEC, nullptr, spec});
  } catch (const std::exception&) {
    // Out of memory: its TLS sessions stay until the process ends.
  }
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

/// False when there is no thread to obey.
bool HttpLoop::Post(Command command) {
  const std::lock_guard<std::mutex> lock(_mutex);
  if (_stopped || !_thread.joinable()) {
    return false;
  }
  _commands.push_back(std::move(command));
  _poller->Wake();
  return true;
}

/// Called with the lock held.
void HttpLoop::StartThread() {
  if (!InitializeCurl()) {
    throw HttpException("The HTTP engine cannot be set up");
  }
  try {
    if (!_poller) {
      _poller = std::make_unique<Poller>();
    }
    const SignalBlock block;
    _thread = std::thread([this] { Run(); });
  } catch (const std::system_error& e) {
    curl_global_cleanup();
    throw HttpException(std::string("The HTTP client cannot start a thread: ") + e.what());
  } catch (...) {
    curl_global_cleanup();
    throw;
  }
}

void HttpLoop::Run() {
  {
    LaneSet lanes(*_poller, _getTime);
    std::vector<Command> commands;
    while (TakeCommands(commands)) {
      for (const Command& command : commands) {
        Obey(command, lanes);
      }
      // Released before the wait: a command holds what it is about.
      commands.clear();
      lanes.Turn(Redeliver() ? kRedeliverMilliseconds : kNoLimit);
    }
    // Those that came too late to be started end like those that run.
    for (const Command& command : commands) {
      if (command.verb == Verb::SUBMIT) {
        command.exchange->Settle(
            std::make_shared<const HttpException>("Request was cancelled: the process ends"), nullptr);
      }
    }
  }
  curl_global_cleanup();
}

/// False when the loop is to end.
bool HttpLoop::TakeCommands(std::vector<Command>& commands) {
  const std::lock_guard<std::mutex> lock(_mutex);
  commands.swap(_commands);
  return !_stopped;
}

void HttpLoop::Obey(const Command& command, LaneSet& lanes) {
  switch (command.verb) {
    case Verb::SUBMIT:
      lanes.Submit(command.exchange);
      break;
    case Verb::ABANDON:
      lanes.Abandon(*command.exchange);
      break;
    case Verb::DROP_AGENT:
      lanes.DropAgent(command.id);
      break;
    case Verb::DROP_SPEC:
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
