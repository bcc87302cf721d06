// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/Process.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <system_error>
#include <utility>

extern char** environ;

namespace TestSupport {

namespace {

[[noreturn]] void ThrowErrno(int error, const std::string& what) {
  throw std::system_error(error, std::generic_category(), what);
}

class FileDescriptor final {
 public:
  explicit FileDescriptor(int number = -1) : _number(number) {}
  FileDescriptor(FileDescriptor&& other) noexcept : _number(std::exchange(other._number, -1)) {}
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    std::swap(_number, other._number);
    return *this;
  }
  ~FileDescriptor() { Close(); }

  int Get() const { return _number; }
  bool IsOpen() const { return _number >= 0; }
  void Close() {
    if (_number >= 0) {
      close(std::exchange(_number, -1));
    }
  }

 private:
  int _number;
};

/// Two connected ends: the first is ours, the second the program's. A socket, not a pipe, as a write to a
/// socket whose reader is gone can be told not to raise SIGPIPE.
std::pair<FileDescriptor, FileDescriptor> MakeChannel() {
  int ends[2];
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
    ThrowErrno(errno, "socketpair");
  }
  return {FileDescriptor(ends[0]), FileDescriptor(ends[1])};
}

class SpawnActions final {
 public:
  SpawnActions() { posix_spawn_file_actions_init(&_actions); }
  SpawnActions(const SpawnActions&) = delete;
  SpawnActions& operator=(const SpawnActions&) = delete;
  ~SpawnActions() { posix_spawn_file_actions_destroy(&_actions); }

  void Redirect(const FileDescriptor& from, int to) {
    posix_spawn_file_actions_adddup2(&_actions, from.Get(), to);
  }
  const posix_spawn_file_actions_t* Get() const { return &_actions; }

 private:
  posix_spawn_file_actions_t _actions;
};

pid_t Spawn(const std::vector<std::string>& arguments, const SpawnActions& actions) {
  std::vector<char*> argv;
  for (const std::string& argument : arguments) {
    argv.push_back(const_cast<char*>(argument.c_str()));
  }
  argv.push_back(nullptr);
  pid_t process = 0;
  const int error = posix_spawnp(&process, argv[0], actions.Get(), nullptr, argv.data(), environ);
  if (error != 0) {
    ThrowErrno(error, "cannot run " + arguments[0]);
  }
  return process;
}

/// Appends what is there; closes the descriptor at the end of the stream.
void ReadSome(FileDescriptor& from, std::string& text) {
  std::array<char, 65536> buffer;
  const ssize_t count = read(from.Get(), buffer.data(), buffer.size());
  if (count > 0) {
    text.append(buffer.data(), static_cast<std::size_t>(count));
  } else if (count == 0 || errno != EINTR) {
    from.Close();
  }
}

/// Sends what the program takes now; closes the descriptor when all is sent or nobody reads any more.
void WriteSome(FileDescriptor& to, const std::string& text, std::size_t& sent) {
  const ssize_t count = send(to.Get(), text.data() + sent, text.size() - sent, MSG_NOSIGNAL | MSG_DONTWAIT);
  if (count >= 0) {
    sent += static_cast<std::size_t>(count);
  }
  const bool mayGoOn = count >= 0 || errno == EAGAIN || errno == EINTR;
  if (!mayGoOn || sent == text.size()) {
    to.Close();
  }
}

void Exchange(FileDescriptor in, FileDescriptor out, FileDescriptor err, const std::string& input,
              ProcessResult& result) {
  std::size_t sent = 0;
  while (in.IsOpen() || out.IsOpen() || err.IsOpen()) {
    std::array<pollfd, 3> descriptors = {pollfd{in.Get(), POLLOUT, 0}, pollfd{out.Get(), POLLIN, 0},
                                         pollfd{err.Get(), POLLIN, 0}};
    if (poll(descriptors.data(), descriptors.size(), -1) < 0 && errno != EINTR) {
      ThrowErrno(errno, "poll");
    }
    if (descriptors[0].revents != 0) {
      WriteSome(in, input, sent);
    }
    if (descriptors[1].revents != 0) {
      ReadSome(out, result.standardOutput);
    }
    if (descriptors[2].revents != 0) {
      ReadSome(err, result.standardError);
    }
  }
}

int WaitFor(pid_t process) {
  int status = 0;
  while (waitpid(process, &status, 0) < 0) {
    if (errno != EINTR) {
      ThrowErrno(errno, "waitpid");
    }
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

}  // namespace

ProcessResult RunProcess(const std::vector<std::string>& arguments, const std::string& standardInput) {
  auto [ourIn, theirIn] = MakeChannel();
  auto [ourOut, theirOut] = MakeChannel();
  auto [ourErr, theirErr] = MakeChannel();
  SpawnActions actions;
  actions.Redirect(theirIn, STDIN_FILENO);
  actions.Redirect(theirOut, STDOUT_FILENO);
  actions.Redirect(theirErr, STDERR_FILENO);
  const pid_t process = Spawn(arguments, actions);
  theirIn.Close();
  theirOut.Close();
  theirErr.Close();

  ProcessResult result = {0, "", ""};
  Exchange(std::move(ourIn), std::move(ourOut), std::move(ourErr), standardInput, result);
  result.exitCode = WaitFor(process);
  return result;
}

}  // namespace TestSupport
