// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Signals.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <system_error>

namespace Cli {

namespace {

[[noreturn]] void ThrowErrno(const char* what) {
  throw std::system_error(errno, std::generic_category(), what);
}

/// As if the program had never held it back.
void TakeEffect(int number) {
  sigset_t one;
  sigemptyset(&one);
  sigaddset(&one, number);
  signal(number, SIG_DFL);
  pthread_sigmask(SIG_UNBLOCK, &one, nullptr);
  raise(number);
}

}  // namespace

StopSignals::StopSignals() {
  sigemptyset(&_signals);
  for (const int number : {SIGINT, SIGTERM, SIGHUP}) {
    sigaddset(&_signals, number);
  }
  pthread_sigmask(SIG_BLOCK, &_signals, &_before);
}

StopSignals::~StopSignals() {
  pthread_sigmask(SIG_SETMASK, &_before, nullptr);
}

void StopSignals::Wait() const {
  int number = 0;
  sigwait(&_signals, &number);
}

StopWatch::StopWatch(const StopSignals& signals, const std::function<void()>& cleanUp)
    : _signals(signalfd(-1, &signals.Get(), SFD_CLOEXEC)), _end(eventfd(0, EFD_CLOEXEC)), _cleanUp(cleanUp) {
  if (_signals < 0 || _end < 0) {
    ThrowErrno("cannot wait for signals");
  }
  _thread = std::thread([this] { Watch(); });
}

StopWatch::~StopWatch() {
  const std::uint64_t one = 1;
  if (write(_end, &one, sizeof(one)) == sizeof(one)) {
    _thread.join();
  } else {
    _thread.detach();
  }
  close(_signals);
  close(_end);
}

void StopWatch::Watch() const {
  std::array<pollfd, 2> wanted = {pollfd{_signals, POLLIN, 0}, pollfd{_end, POLLIN, 0}};
  while (poll(wanted.data(), wanted.size(), -1) < 0 && errno == EINTR) {
  }
  signalfd_siginfo info;
  if (wanted[1].revents == 0 && read(_signals, &info, sizeof(info)) == sizeof(info)) {
    _cleanUp();
    TakeEffect(static_cast<int>(info.ssi_signo));
  }
}

}  // namespace Cli
