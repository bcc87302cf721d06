// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/OpenSockets.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <exception>

namespace Pelmar {
namespace Http {

namespace {

/// 0 for what has none.
int GetLocalPort(curl_socket_t socket) noexcept {
  sockaddr_storage address = {};
  socklen_t size = sizeof address;
  if (::getsockname(socket, reinterpret_cast<sockaddr*>(&address), &size) != 0) {
    return 0;
  }
  switch (address.ss_family) {
    case AF_INET:
      return ntohs(reinterpret_cast<const sockaddr_in*>(&address)->sin_port);
    case AF_INET6:
      return ntohs(reinterpret_cast<const sockaddr_in6*>(&address)->sin6_port);
    default:
      return 0;
  }
}

// Asks the system, which knows of the end when it has come; what came before, such as TLS's close_notify, may
// still be unread.
bool HasEnded(curl_socket_t socket) noexcept {
  pollfd state = {socket, POLLRDHUP, 0};
  return ::poll(&state, 1, 0) == 1 && (state.revents & (POLLRDHUP | POLLHUP | POLLERR)) != 0;
}

}  // namespace

bool OpenSockets::HasPeerEnded(int localPort) const noexcept {
  const auto socket = std::find_if(_sockets.begin(), _sockets.end(), [localPort](curl_socket_t candidate) {
    return GetLocalPort(candidate) == localPort;
  });
  return socket != _sockets.end() && HasEnded(*socket);
}

curl_socket_t OpenSockets::OnOpen(void* sockets, curlsocktype, curl_sockaddr* address) noexcept {
  auto& opened = static_cast<OpenSockets*>(sockets)->_sockets;
  try {
    opened.push_back(CURL_SOCKET_BAD);
  } catch (const std::exception&) {
    return CURL_SOCKET_BAD;
  }
  opened.back() = ::socket(address->family, address->socktype | SOCK_CLOEXEC, address->protocol);
  const curl_socket_t socket = opened.back();
  if (socket == CURL_SOCKET_BAD) {
    opened.pop_back();
  }
  return socket;
}

int OpenSockets::OnClose(void* sockets, curl_socket_t socket) noexcept {
  auto& opened = static_cast<OpenSockets*>(sockets)->_sockets;
  opened.erase(std::remove(opened.begin(), opened.end(), socket), opened.end());
  return ::close(socket);
}

}  // namespace Http
}  // namespace Pelmar
