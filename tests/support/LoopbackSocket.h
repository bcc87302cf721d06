// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the tests' own servers share: a socket on a free port of loopback.

#ifndef TESTS_SUPPORT_LOOPBACKSOCKET_H
#define TESTS_SUPPORT_LOOPBACKSOCKET_H

#include <netinet/in.h>
#include <sys/socket.h>

#include <cstdint>
#include <stdexcept>

namespace TestSupport {

inline void Require(bool condition, const char* what) {
  if (!condition) {
    throw std::runtime_error(what);
  }
}

inline sockaddr_in MakeAddress(int port) {
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = htons(static_cast<std::uint16_t>(port));
  return address;
}

/// A socket on a free port; the port goes to `port`.
inline int BindSocket(int& port) {
  const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  Require(socket >= 0, "no socket");
  sockaddr_in address = MakeAddress(0);
  socklen_t size = sizeof address;
  Require(::bind(socket, reinterpret_cast<const sockaddr*>(&address), size) == 0, "cannot bind");
  Require(::getsockname(socket, reinterpret_cast<sockaddr*>(&address), &size) == 0, "no socket name");
  port = ntohs(address.sin_port);
  return socket;
}

}  // namespace TestSupport

#endif  // TESTS_SUPPORT_LOOPBACKSOCKET_H
