// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Stands between a client and a server and does one thing to one byte of what they say to each other.

#ifndef QUORLIN_TESTS_SUPPORT_FAULTPROXY_H
#define QUORLIN_TESTS_SUPPORT_FAULTPROXY_H

#include <atomic>
#include <cstddef>
#include <thread>

namespace TestSupport {

enum class Fault {
  NONE,
  CUT,        ///< Nothing from that byte on: both connections are closed.
  RESET,      ///< The same by a TCP reset of both.
  FLIP,       ///< One bit of the byte is turned over; which one depends on the place.
  DUPLICATE,  ///< The byte comes twice.
  HOLD,       ///< The byte and all after it come only when the receiver's system has taken what came before.
  SINGLE_BYTES,  ///< From that byte on each one is sent on its own.
};

struct FaultPlan {
  Fault fault = Fault::NONE;
  bool isTowardsClient = false;
  std::size_t offset = 0;
};

/// Serves one connection to 127.0.0.1, as it is planned, and connects to `serverPort` for it. The destructor
/// breaks off what is left.
class FaultProxy final {
 public:
  FaultProxy(int serverPort, const FaultPlan& plan);
  FaultProxy(const FaultProxy&) = delete;
  FaultProxy& operator=(const FaultProxy&) = delete;
  ~FaultProxy();

  int GetPort() const { return _port; }
  /// The bytes that came from either side so far.
  std::size_t CountFromClient() const { return _fromClient; }
  std::size_t CountFromServer() const { return _fromServer; }

 private:
  void Serve();
  void Relay(int client, int server);
  bool Pass(int from, int to, bool isTowardsClient);
  bool SendWithFault(int to, const char* data, std::size_t size, std::size_t place);

  const FaultPlan _plan;
  const int _serverPort;
  int _port = 0;
  int _listener;
  int _end[2];  // Closing the second end wakes the thread.
  std::atomic<std::size_t> _fromClient{0};
  std::atomic<std::size_t> _fromServer{0};
  std::thread _thread;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_FAULTPROXY_H
