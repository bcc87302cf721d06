// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The sockets of a user agent's connections, so that a kept one can be looked at before it is used again.

#ifndef PELMAR_HTTP_OPENSOCKETS_H
#define PELMAR_HTTP_OPENSOCKETS_H

#include <curl/curl.h>

#include <vector>

namespace Pelmar {
namespace Http {

/// Lives on the HTTP loop's thread, and longer than the connections.
class OpenSockets final {
 public:
  /// Whether the peer has ended the connection that comes from `localPort`, though nothing may have read that
  /// yet. False when there is no such connection.
  bool HasPeerEnded(int localPort) const noexcept;

  /// For the HTTP engine, with this object as its first argument.
  static curl_socket_t OnOpen(void* sockets, curlsocktype purpose, curl_sockaddr* address) noexcept;
  static int OnClose(void* sockets, curl_socket_t socket) noexcept;

 private:
  std::vector<curl_socket_t> _sockets;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_OPENSOCKETS_H
