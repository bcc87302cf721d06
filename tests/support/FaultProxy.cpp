// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/FaultProxy.h"

#include "support/LoopbackSocket.h"

#include <linux/sockios.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sched.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdint>

namespace TestSupport {

namespace {

int Listen(int& port) {
  const int socket = BindSocket(port);
  Require(::listen(socket, 1) == 0, "cannot listen");
  return socket;
}

int Connect(int port) {
  const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  const sockaddr_in address = MakeAddress(port);
  if (socket >= 0 && ::connect(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
    ::close(socket);
    return -1;
  }
  return socket;
}

void SendAtOnce(int socket) {
  const int on = 1;
  ::setsockopt(socket, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
}

bool SendAll(int socket, const char* data, std::size_t size) {
  while (size > 0) {
    const ssize_t sent = ::send(socket, data, size, MSG_NOSIGNAL);
    if (sent <= 0) {
      return false;
    }
    data += sent;
    size -= static_cast<std::size_t>(sent);
  }
  return true;
}

bool SendSingly(int socket, const char* data, std::size_t size) {
  for (; size > 0; --size) {
    if (!SendAll(socket, data++, 1)) {
      return false;
    }
  }
  return true;
}

void AwaitTaken(int socket) {
  int unsent = 0;
  while (::ioctl(socket, SIOCOUTQ, &unsent) == 0 && unsent > 0) {
    sched_yield();
  }
}

char Flip(char byte, std::size_t place) {
  return static_cast<char>(static_cast<unsigned char>(byte) ^ (1u << (place % 8)));
}

void Close(int socket, bool hard) {
  if (socket >= 0) {
    const linger now = {1, 0};
    if (hard) {
      ::setsockopt(socket, SOL_SOCKET, SO_LINGER, &now, sizeof now);
    }
    ::close(socket);
  }
}

}  // namespace

FaultProxy::FaultProxy(int serverPort, const FaultPlan& plan)
    : _plan(plan), _serverPort(serverPort), _listener(Listen(_port)) {
  Require(::pipe(_end) == 0, "no pipe");
  _thread = std::thread([this] { Serve(); });
}

FaultProxy::~FaultProxy() {
  ::close(_end[1]);
  _thread.join();
  ::close(_end[0]);
  ::close(_listener);
}

void FaultProxy::Serve() {
  pollfd watched[] = {{_listener, POLLIN, 0}, {_end[0], POLLIN, 0}};
  while (::poll(watched, 2, -1) < 0) {
  }
  if ((watched[0].revents & POLLIN) == 0) {
    return;
  }
  const int client = ::accept4(_listener, nullptr, nullptr, SOCK_CLOEXEC);
  const int server = Connect(_serverPort);
  if (client >= 0 && server >= 0) {
    SendAtOnce(client);
    SendAtOnce(server);
    Relay(client, server);
  }
  Close(client, _plan.fault == Fault::RESET);
  // Hard, as what is left of a proper end would occupy a port for a minute, and these are thousands.
  Close(server, true);
}

void FaultProxy::Relay(int client, int server) {
  pollfd watched[] = {{client, POLLIN, 0}, {server, POLLIN, 0}, {_end[0], POLLIN, 0}};
  for (;;) {
    if (::poll(watched, 3, -1) < 0) {
      continue;
    }
    if (watched[2].revents != 0 || (watched[0].revents != 0 && !Pass(client, server, false)) ||
        (watched[1].revents != 0 && !Pass(server, client, true))) {
      return;
    }
  }
}

/// False when nothing more is to be passed on: one of the two is gone, or the plan says so.
bool FaultProxy::Pass(int from, int to, bool isTowardsClient) {
  char buffer[16384];
  const ssize_t got = ::recv(from, buffer, sizeof buffer, MSG_DONTWAIT);
  if (got <= 0) {
    return false;
  }
  const auto size = static_cast<std::size_t>(got);
  std::atomic<std::size_t>& passed = isTowardsClient ? _fromServer : _fromClient;
  const std::size_t start = passed;
  passed += size;
  const bool isHit =
      _plan.fault != Fault::NONE && isTowardsClient == _plan.isTowardsClient && _plan.offset < start + size;
  if (!isHit || (_plan.offset < start && _plan.fault != Fault::SINGLE_BYTES)) {
    return SendAll(to, buffer, size);
  }
  return SendWithFault(to, buffer, size, _plan.offset < start ? 0 : _plan.offset - start);
}

bool FaultProxy::SendWithFault(int to, const char* data, std::size_t size, std::size_t place) {
  if (!SendAll(to, data, place)) {
    return false;
  }
  const char flipped = Flip(data[place], _plan.offset);
  switch (_plan.fault) {
    case Fault::FLIP:
      return SendAll(to, &flipped, 1) && SendAll(to, data + place + 1, size - place - 1);
    case Fault::DUPLICATE:
      return SendAll(to, data + place, 1) && SendAll(to, data + place, size - place);
    case Fault::HOLD:
      AwaitTaken(to);
      return SendAll(to, data + place, size - place);
    case Fault::SINGLE_BYTES:
      return SendSingly(to, data + place, size - place);
    case Fault::NONE:
    case Fault::CUT:
    case Fault::RESET:
      break;
  }
  return false;
}

}  // namespace TestSupport
