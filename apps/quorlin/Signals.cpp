// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Signals.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/signalfd.h>
#include <unistd.h>

#include <array>
#include <atomic>
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

/// The signal that came to an Interruption; 0: none.
std::atomic<int> interruptedBy(0);

/// Waits for a signal; its number, or 0 when `end` was written to.
int WaitForSignal(int signals, int end) {
  std::array<pollfd, 2> wanted = {pollfd{signals, POLLIN, 0}, pollfd{end, POLLIN, 0}};
  while (poll(wanted.data(), wanted.size(), -1) < 0 && errno == EINTR) {
  }
  signalfd_siginfo info;
  const bool hasSignal = wanted[1].revents == 0 && read(signals, &info, sizeof(info)) == sizeof(info);
  return hasSignal ? static_cast<int>(info.ssi_signo) : 0;
}

/// Has the thread that waits at `end` come back.
void EndThread(int end, std::thread& thread) {
  const std::uint64_t one = 1;
  if (write(end, &one, sizeof(one)) == sizeof(one)) {
    thread.join();
  } else {
    thread.detach();
  }
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
  EndThread(_end, _thread);
  close(_signals);
  close(_end);
}

void StopWatch::Watch() const {
  if (const int number = WaitForSignal(_signals, _end)) {
    _cleanUp();
    TakeEffect(number);
  }
}

Interruption::Interruption(const std::function<void()>& cancel)
    : _signals(signalfd(-1, &_held.Get(), SFD_CLOEXEC)), _end(eventfd(0, EFD_CLOEXEC)), _cancel(cancel) {
  if (_signals < 0 || _end < 0) {
    ThrowErrno("cannot wait for signals");
  }
  _thread = std::thread([this] { Watch(); });
}

Interruption::~Interruption() {
  EndThread(_end, _thread);
  close(_signals);
  close(_end);
}

void Interruption::Watch() const {
  const int first = WaitForSignal(_signals, _end);
  if (first == 0) {
    return;
  }
  interruptedBy = first;
  _cancel();
  if (const int second = WaitForSignal(_signals, _end)) {
    TakeEffect(second);
  }
}

void EndByInterruption() {
  if (interruptedBy != 0) {
    TakeEffect(interruptedBy);
  }
}

}  // namespace Cli
