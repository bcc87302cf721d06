// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/PeerProcess.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <ctime>
#include <stdexcept>
#include <system_error>

#include <spawn.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Bench {

namespace {

[[noreturn]] void Fail(int error, const std::string& what) {
  throw std::system_error(error, std::generic_category(), what);
}

/// Gives what posix_spawn does: 0, or the number of an error.
int Start(const std::vector<std::string>& command, int channel, pid_t& process) {
  std::vector<char*> arguments;
  for (const std::string& argument : command) {
    arguments.push_back(const_cast<char*>(argument.c_str()));
  }
  arguments.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, channel, STDIN_FILENO);
  posix_spawn_file_actions_adddup2(&actions, channel, STDOUT_FILENO);
  const int error = posix_spawn(&process, arguments[0], &actions, nullptr, arguments.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  return error;
}

}  // namespace

PeerProcess::Child::Child(const std::vector<std::string>& command) {
  std::array<int, 2> ends = {};
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) != 0) {
    Fail(errno, "socketpair");
  }
  const int error = Start(command, ends[1], process);
  close(ends[1]);
  if (error != 0) {
    close(ends[0]);
    Fail(error, "cannot start " + command[0]);
  }
  channel = ends[0];
}

PeerProcess::Child::~Child() {
  close(channel);
  // The end of its standard input, which another child of this process may hold open, is not enough.
  kill(process, SIGKILL);
  waitpid(process, nullptr, 0);
}

PeerProcess::PeerProcess(const std::vector<std::string>& command) : _child(command), _name(command[0]) {
  static const std::string kReady = "ready ";
  const std::string line = ReadLine();
  if (line.compare(0, kReady.size(), kReady) != 0) {
    throw std::runtime_error(_name + " is not ready: " + line);
  }
  _name = line.substr(kReady.size());
}

std::string PeerProcess::Check(std::size_t token, const std::string& path) {
  return Ask("check " + std::to_string(token) + " " + path);
}

void PeerProcess::Run(std::size_t token, std::size_t calls) {
  const std::string answer = Ask("run " + std::to_string(token) + " " + std::to_string(calls));
  if (answer != "done") {
    throw std::runtime_error(_name + " fails: " + answer);
  }
}

double PeerProcess::Time(std::size_t token, std::size_t calls) {
  Run(token, 1);
  const double start = ReadMicroseconds();
  Run(token, calls);
  return (ReadMicroseconds() - start) / static_cast<double>(calls);
}

std::string PeerProcess::Ask(const std::string& order) {
  const std::string line = order + "\n";
  if (send(_child.channel, line.data(), line.size(), MSG_NOSIGNAL) != static_cast<ssize_t>(line.size())) {
    Fail(errno, _name + " does not listen any more");
  }
  return ReadLine();
}

std::string PeerProcess::ReadLine() {
  std::size_t end = _unread.find('\n');
  while (end == std::string::npos) {
    std::array<char, 4096> buffer;
    const ssize_t count = read(_child.channel, buffer.data(), buffer.size());
    if (count <= 0) {
      throw std::runtime_error("a program to compare with has ended early: " + _name);
    }
    _unread.append(buffer.data(), static_cast<std::size_t>(count));
    end = _unread.find('\n');
  }
  const std::string line = _unread.substr(0, end);
  _unread.erase(0, end + 1);
  return line;
}

double PeerProcess::ReadMicroseconds() const {
  clockid_t clock = 0;
  timespec now = {};
  if (clock_getcpuclockid(_child.process, &clock) != 0 || clock_gettime(clock, &now) != 0) {
    throw std::runtime_error("this system does not measure another process's processor time");
  }
  return static_cast<double>(now.tv_sec) * 1e6 + static_cast<double>(now.tv_nsec) / 1e3;
}

}  // namespace Bench
