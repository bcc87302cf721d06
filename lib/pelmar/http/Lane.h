// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The connections and running exchanges of one user agent.

#ifndef PELMAR_HTTP_LANE_H
#define PELMAR_HTTP_LANE_H

#include "pelmar/http/CurlHandles.h"
#include "pelmar/http/Exchange.h"
#include "pelmar/http/OpenSockets.h"
#include "pelmar/http/Poller.h"
#include "pelmar/http/Transfer.h"

#include <chrono>
#include <map>
#include <memory>
#include <optional>
#include <unordered_map>

namespace Pelmar {
namespace Http {

class Lane;

/// Which lane a watched socket belongs to.
using SocketOwners = std::unordered_map<int, Lane*>;

/// One libcurl multi handle: connections are reused within it and never outside. Lives on the HTTP loop's
/// thread.
class Lane final {
 public:
  using Clock = std::chrono::steady_clock;

  /// Throws HttpException when the engine cannot be set up.
  Lane(Poller& poller, SocketOwners& owners);
  Lane(const Lane&) = delete;
  Lane& operator=(const Lane&) = delete;
  /// Settles what still runs, as cancelled.
  ~Lane();

  /// Throws HttpException when the exchange cannot be started.
  void Start(const Ref<Exchange>& exchange, const SharedState& shared);
  /// Ends the exchange and closes its connection. Unknown ones are ignored.
  void Abandon(const Exchange* exchange);

  void OnSocket(const SocketEvent& event);
  void OnDeadline();
  /// When `OnDeadline` is to be called, if at all.
  const std::optional<Clock::time_point>& GetDeadline() const { return _deadline; }

  bool IsIdle() const { return _transfers.empty(); }

 private:
  static int OnWatch(CURL* easy, curl_socket_t socket, int what, void* lane, void*) noexcept;
  static int OnTimer(CURLM* multi, long timeoutMilliseconds, void* lane) noexcept;

  void Act(curl_socket_t socket, int what);
  void FailAll(const std::shared_ptr<const HttpException>& failure);
  void CollectFinished();
  void Finish(CURL* easy, CURLcode code);
  void Remove(std::map<CURL*, std::unique_ptr<Transfer>>::iterator transfer);

  Poller& _poller;
  SocketOwners& _owners;
  std::optional<Clock::time_point> _deadline;
  OpenSockets _sockets;
  MultiHandle _multi;  // Closes the sockets when it goes.
  std::map<CURL*, std::unique_ptr<Transfer>> _transfers;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_LANE_H
