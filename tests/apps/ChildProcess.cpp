// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "apps/ChildProcess.h"

#include <fcntl.h>
#include <pty.h>
#include <signal.h>
#include <sys/wait.h>
#include <termios.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <stdexcept>
#include <system_error>

namespace StsTests {

namespace {

[[noreturn]] void ThrowErrno(const char* what) {
  throw std::system_error(errno, std::generic_category(), what);
}

/// Only calls that are safe after a fork in a program with threads.
void BecomeDetached(int output) {
  setsid();
  const int nothing = open("/dev/null", O_RDWR);
  dup2(nothing, STDIN_FILENO);
  dup2(output, STDOUT_FILENO);
  dup2(nothing, STDERR_FILENO);
}

/// Blocked signals stay pending across exec.
void SendToSelf(int number) {
  sigset_t one;
  sigemptyset(&one);
  sigaddset(&one, number);
  sigprocmask(SIG_BLOCK, &one, nullptr);
  kill(getpid(), number);
}

// Whoever runs the tests in the background may have them ignored.
void TakeSignalsAsUsual() {
  for (const int number : {SIGHUP, SIGINT, SIGQUIT, SIGTERM}) {
    signal(number, SIG_DFL);
  }
}

pid_t ForkDetached(int& channel) {
  std::array<int, 2> pipeEnds;
  if (pipe2(pipeEnds.data(), O_CLOEXEC) != 0) {
    ThrowErrno("pipe2");
  }
  const pid_t process = fork();
  if (process == 0) {
    BecomeDetached(pipeEnds[1]);
  } else {
    close(pipeEnds[1]);
    channel = pipeEnds[0];
  }
  return process;
}

}  // namespace

ChildProcess::ChildProcess(const std::vector<std::string>& arguments, Terminal terminal, int pendingSignal) {
  std::vector<char*> argv;
  for (const std::string& argument : arguments) {
    argv.push_back(const_cast<char*>(argument.c_str()));
  }
  argv.push_back(nullptr);
  _process =
      terminal == Terminal::OWN ? forkpty(&_channel, nullptr, nullptr, nullptr) : ForkDetached(_channel);
  if (_process < 0) {
    ThrowErrno("cannot start a process");
  }
  if (_process == 0) {
    TakeSignalsAsUsual();
    if (pendingSignal != 0) {
      SendToSelf(pendingSignal);
    }
    execv(argv[0], argv.data());
    _exit(127);
  }
}

ChildProcess::~ChildProcess() {
  if (_process > 0) {
    kill(_process, SIGKILL);
    waitpid(_process, nullptr, 0);
  }
  close(_channel);
}

bool ChildProcess::ReadSome() {
  std::array<char, 4096> buffer;
  const ssize_t count = read(_channel, buffer.data(), buffer.size());
  if (count > 0) {
    _output.append(buffer.data(), static_cast<std::size_t>(count));
  }
  // A terminal whose program has ended reports EIO.
  return count > 0 || (count < 0 && errno == EINTR);
}

std::string ChildProcess::ReadUntil(const std::string& text) {
  while (_output.find(text) == std::string::npos) {
    if (!ReadSome()) {
      throw std::runtime_error("the program ended without \"" + text + "\" but with: " + _output);
    }
  }
  return _output;
}

std::string ChildProcess::ReadAll() {
  while (ReadSome()) {
  }
  return _output;
}

void ChildProcess::Type(const std::string& text) {
  if (write(_channel, text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
    ThrowErrno("cannot type");
  }
}

bool ChildProcess::HasEcho() const {
  termios settings;
  if (tcgetattr(_channel, &settings) != 0) {
    ThrowErrno("tcgetattr");
  }
  return (settings.c_lflag & static_cast<tcflag_t>(ECHO)) != 0;
}

void ChildProcess::Signal(int number) {
  kill(_process, number);
}

int ChildProcess::Wait() {
  int status = 0;
  while (waitpid(_process, &status, 0) < 0) {
    if (errno != EINTR) {
      ThrowErrno("waitpid");
    }
  }
  _process = -1;
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

}  // namespace StsTests
