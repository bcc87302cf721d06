// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The one thread that does all HTTP of the process.

#ifndef PELMAR_HTTP_HTTPLOOP_H
#define PELMAR_HTTP_HTTPLOOP_H

#include "pelmar/http/Exchange.h"
#include "pelmar/http/LaneSet.h"
#include "pelmar/http/LoopCommand.h"
#include "pelmar/http/Poller.h"

#include <boost/function.hpp>

#include <sys/types.h>

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <thread>

namespace Pelmar {
namespace Http {

/// Starts with the first request. Every libcurl object lives on its thread; other threads leave commands in a
/// queue. It runs no code of a caller: completion functors go to the thread pool. When the process exits,
/// requests still pending end with an HttpException, and so do those sent later. A forked child has no such
/// thread: there requests are refused, and the rest is passed over without touching what the parent's threads
/// may have locked.
class HttpLoop final {
 public:
  /// Hands work to the thread pool; throws when the pool cannot take it now.
  using QueueFunction = std::function<void(const boost::function<void()>&)>;

  explicit HttpLoop(QueueFunction queue);
  /// With a clock of its own for the age of TLS sessions.
  HttpLoop(QueueFunction queue, LaneSet::GetTimeFunction getTime);
  HttpLoop(const HttpLoop&) = delete;
  HttpLoop& operator=(const HttpLoop&) = delete;
  /// Shuts down.
  ~HttpLoop();

  /// The process's loop. Never destroyed: objects that end with the process may still call it.
  static HttpLoop& Get();

  /// Starts the exchange. Throws HttpException when the loop cannot be started, or in a forked child.
  void Submit(const Ref<Exchange>& exchange);
  /// Closes the connection of an exchange that was settled elsewhere. Once for each exchange.
  void Abandon(const Ref<Exchange>& exchange) noexcept;
  /// To be made with the agent or spec, and given back when it is gone: for an agent to close its
  /// connections, for a spec, whose agents are gone by then, to forget its TLS sessions.
  static LoopCommands MakeFarewell(LoopVerb verb, std::uint64_t id);
  void TakeFarewell(LoopCommands& farewell) noexcept;

  /// Queues work on the thread pool. If the pool cannot take it now, the loop tries again until it can. Work
  /// that comes after the shutdown is destroyed.
  void Deliver(Work work);

  /// Ends the thread. A second call does nothing.
  void Shutdown();

 private:
  bool Post(LoopCommands& command) noexcept;
  void StartThread();
  bool IsInForkedChild() const noexcept;
  void Run() noexcept;
  bool TakeCommands(LoopCommands& commands);
  static void Obey(const LoopCommand& command, LaneSet& lanes);
  /// Whether something is left to deliver.
  bool Redeliver();

  const QueueFunction _queue;
  const LaneSet::GetTimeFunction _getTime;
  std::atomic<pid_t> _process{0};  // Where the thread was started.
  std::mutex _mutex;
  // All below are guarded by the mutex.
  LoopCommands _commands;
  Work _undelivered;
  std::unique_ptr<Poller> _poller;  // Made once; the loop's thread waits on it without the mutex.
  std::thread _thread;
  bool _stopped = false;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_HTTPLOOP_H
