// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/Poller.h"

#include <pelmar/http/HttpException.h>

#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <cstdint>

namespace Pelmar {
namespace Http {

namespace {

constexpr int kMaxEventsPerWait = 64;

}  // namespace

Poller::Poller() {
  // Taken now, as there may be none when events come.
  _events.reserve(kMaxEventsPerWait);
  _epoll = ::epoll_create1(EPOLL_CLOEXEC);
  _wake = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
  if (_epoll < 0 || _wake < 0 || !Watch(_wake, true, false)) {
    ::close(_epoll);
    ::close(_wake);
    throw HttpException("The HTTP client cannot start: the system gives no descriptors");
  }
}

Poller::~Poller() {
  ::close(_epoll);
  ::close(_wake);
}

bool Poller::Watch(int socket, bool forReading, bool forWriting) {
  epoll_event event = {};
  event.events = (forReading ? static_cast<std::uint32_t>(EPOLLIN) : 0U) |
                 (forWriting ? static_cast<std::uint32_t>(EPOLLOUT) : 0U);
  event.data.fd = socket;
  return ::epoll_ctl(_epoll, EPOLL_CTL_ADD, socket, &event) == 0 ||
         ::epoll_ctl(_epoll, EPOLL_CTL_MOD, socket, &event) == 0;
}

void Poller::Forget(int socket) {
  ::epoll_ctl(_epoll, EPOLL_CTL_DEL, socket, nullptr);
}

const std::vector<SocketEvent>& Poller::Wait(int timeoutMilliseconds) {
  epoll_event events[kMaxEventsPerWait];
  _events.clear();
  const int count = ::epoll_wait(_epoll, events, kMaxEventsPerWait, timeoutMilliseconds);
  for (int i = 0; i < count; ++i) {
    if (events[i].data.fd == _wake) {
      Drain();
      continue;
    }
    const std::uint32_t what = events[i].events;
    _events.push_back({events[i].data.fd, (what & (EPOLLIN | EPOLLHUP | EPOLLERR)) != 0,
                       (what & (EPOLLOUT | EPOLLERR)) != 0});
  }
  return _events;
}

void Poller::Wake() noexcept {
  const std::uint64_t one = 1;
  // It can only fail when it is far above zero already, and then the waiter wakes all the same.
  const ssize_t written = ::write(_wake, &one, sizeof one);
  static_cast<void>(written);
}

void Poller::Drain() {
  std::uint64_t count = 0;
  const ssize_t taken = ::read(_wake, &count, sizeof count);
  static_cast<void>(taken);
}

}  // namespace Http
}  // namespace Pelmar
