// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Waits for sockets, a wake-up from another thread, or time to pass (Linux: epoll and eventfd).

#ifndef PELMAR_HTTP_POLLER_H
#define PELMAR_HTTP_POLLER_H

#include <vector>

namespace Pelmar {
namespace Http {

struct SocketEvent {
  int socket;
  bool isReadable;  ///< Also when it has failed or ended, which the next read will tell.
  bool isWritable;
};

class Poller final {
 public:
  /// Throws HttpException when the system gives no descriptors.
  Poller();
  Poller(const Poller&) = delete;
  Poller& operator=(const Poller&) = delete;
  ~Poller();

  /// Watches `socket`, or changes what it is watched for. False when the system refuses.
  bool Watch(int socket, bool forReading, bool forWriting);
  void Forget(int socket);

  /// Blocks until something happened or `timeoutMilliseconds` passed (negative: no limit). The events are
  /// valid until the next call.
  const std::vector<SocketEvent>& Wait(int timeoutMilliseconds);

  /// Makes `Wait` return, now or when it is called next. For any thread.
  void Wake() noexcept;

 private:
  void Drain();

  int _epoll = -1;
  int _wake = -1;
  std::vector<SocketEvent> _events;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_POLLER_H
