// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Password.h"

#include "quorlin/Descriptor.h"
#include "quorlin/Failure.h"
#include "quorlin/Files.h"
#include "quorlin/Terminal.h"

#include <fcntl.h>
#include <poll.h>
#include <termios.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>

namespace Cli {

namespace {

constexpr std::array<int, 4> kEndingSignals = {SIGINT, SIGTERM, SIGHUP, SIGQUIT};

volatile std::sig_atomic_t endingSignal = 0;

extern "C" void RememberEndingSignal(int number) {
  endingSignal = number;
}

/// Bytes that are overwritten when done with.
class PasswordBuffer final {
 public:
  PasswordBuffer() = default;
  PasswordBuffer(const PasswordBuffer&) = delete;
  PasswordBuffer& operator=(const PasswordBuffer&) = delete;
  ~PasswordBuffer() { Pelmar::Wipe(_bytes.data(), _bytes.size()); }

  /// Reads once; false at the end of the stream or on an error other than an interruption.
  bool ReadFrom(int descriptor) {
    if (_size == _bytes.size()) {
      throw UsageException("the password is longer than " + std::to_string(kMaxPasswordBytes) + " bytes");
    }
    const ssize_t count = read(descriptor, _bytes.data() + _size, _bytes.size() - _size);
    if (count < 0 && errno != EINTR) {
      throw UsageException(std::string("cannot read the password: ") + std::strerror(errno));
    }
    _size += count > 0 ? static_cast<std::size_t>(count) : 0;
    return count != 0;
  }

  bool HasLine() const { return _size > 0 && _bytes[_size - 1] == '\n'; }

  /// Without the line's end.
  Secret TakePassword() const {
    std::size_t size = _size;
    if (HasLine()) {
      --size;
      size -= size > 0 && _bytes[size - 1] == '\r' ? 1 : 0;
    }
    if (size == 0) {
      throw UsageException("the password is empty");
    }
    return Secret(std::string(_bytes.data(), size));
  }

 private:
  std::array<char, kMaxPasswordBytes + 2> _bytes;
  std::size_t _size = 0;
};

Secret ReadToEnd(int descriptor) {
  PasswordBuffer buffer;
  while (buffer.ReadFrom(descriptor)) {
  }
  return buffer.TakePassword();
}

/// Keeps signals that would end the program away until the terminal is itself again, except while the program
/// waits for input.
class HeldSignals final {
 public:
  HeldSignals() {
    sigset_t held;
    sigemptyset(&held);
    struct sigaction action = {};
    action.sa_handler = RememberEndingSignal;
    endingSignal = 0;
    for (std::size_t i = 0; i < kEndingSignals.size(); ++i) {
      sigaddset(&held, kEndingSignals[i]);
      sigaction(kEndingSignals[i], &action, &_actions[i]);
    }
    sigprocmask(SIG_BLOCK, &held, &_mask);
  }
  HeldSignals(const HeldSignals&) = delete;
  HeldSignals& operator=(const HeldSignals&) = delete;

  ~HeldSignals() {
    for (std::size_t i = 0; i < kEndingSignals.size(); ++i) {
      sigaction(kEndingSignals[i], &_actions[i], nullptr);
    }
    sigprocmask(SIG_SETMASK, &_mask, nullptr);
    if (endingSignal != 0) {
      std::raise(endingSignal);
    }
  }

  /// False when one of the signals came first.
  bool WaitForInput(int descriptor) const {
    pollfd wanted = {descriptor, POLLIN, 0};
    while (ppoll(&wanted, 1, nullptr, &_mask) < 0 && endingSignal == 0) {
      if (errno != EINTR) {
        throw UsageException(std::string("cannot read from the terminal: ") + std::strerror(errno));
      }
    }
    return endingSignal == 0;
  }

 private:
  sigset_t _mask;
  std::array<struct sigaction, kEndingSignals.size()> _actions;
};

class HiddenEcho final {
 public:
  explicit HiddenEcho(int terminal) : _terminal(terminal) {
    if (tcgetattr(terminal, &_settings) != 0) {
      throw UsageException(std::string("cannot switch the terminal's echo off: ") + std::strerror(errno));
    }
    termios hidden = _settings;
    hidden.c_lflag &= ~static_cast<tcflag_t>(ECHO | ECHOE | ECHOK);
    hidden.c_lflag |= static_cast<tcflag_t>(ICANON | ISIG | ECHONL);
    if (tcsetattr(terminal, TCSAFLUSH, &hidden) != 0) {
      throw UsageException(std::string("cannot switch the terminal's echo off: ") + std::strerror(errno));
    }
  }
  HiddenEcho(const HiddenEcho&) = delete;
  HiddenEcho& operator=(const HiddenEcho&) = delete;
  ~HiddenEcho() { tcsetattr(_terminal, TCSAFLUSH, &_settings); }

 private:
  int _terminal;
  termios _settings;
};

}  // namespace

void AddPasswordOptions(CLI::App& command, PasswordOptions& options) {
  CLI::Option* const file = command
                                .add_option("--password-file", options.file,
                                            "Read the password from this file (one line end is dropped)")
                                ->type_name("FILE");
  command.add_flag("--password-stdin", options.fromStdin, "Read the password from standard input")
      ->excludes(file);
  // Known only to be refused: an unknown option would be repeated in the error message together with the
  // password.
  const auto refuse = [](const std::vector<std::string>&) -> bool {
    throw CLI::ValidationError(
        "a password on the command line can be seen by every user of this machine, so it is not taken from there; "
        "use --password-file, --password-stdin or the prompt (and change that password)");
  };
  CLI::Option* const password = command.add_option("-p,--password", refuse, "");
  password->expected(0, 1)->group("");
}

Secret ReadPassword(const PasswordOptions& options, const std::string& userName) {
  if (options.fromStdin) {
    return ReadToEnd(STDIN_FILENO);
  }
  return options.file.empty()
             ? AskOnTerminal(
                   "Password of " + MakePrintable(userName),
                   "there is no terminal to ask for the password: use --password-file or --password-stdin")
             : ReadSecretFile(options.file);
}

Secret AskOnTerminal(const std::string& name, const std::string& noTerminal) {
  const Descriptor terminal(open("/dev/tty", O_RDWR | O_NOCTTY | O_CLOEXEC));
  if (terminal.Get() < 0) {
    throw UsageException(noTerminal);
  }
  PasswordBuffer buffer;
  // Destroyed in reverse: first the echo comes back, then the signals.
  const HeldSignals signals;
  const HiddenEcho echo(terminal.Get());
  const std::string prompt = name + ": ";
  if (write(terminal.Get(), prompt.data(), prompt.size()) < 0) {
    throw UsageException(std::string("cannot write to the terminal: ") + std::strerror(errno));
  }
  while (!buffer.HasLine() && signals.WaitForInput(terminal.Get()) && buffer.ReadFrom(terminal.Get())) {
  }
  return buffer.TakePassword();
}

Secret ReadSecretFile(const std::string& path) {
  const Descriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (file.Get() < 0) {
    throw UsageException("cannot read " + path + ": " + std::strerror(errno));
  }
  return ReadToEnd(file.Get());
}

Secret ReadKeyFile(const std::string& path) {
  const Pelmar::Ref<Pelmar::StringWriter> content = Pelmar::CreateSecretStringWriter();
  ReadFileInto(path, kMaxFileBytes + 1, *content);
  RequireSize(path, content->GetText().size(), kMaxFileBytes);
  return Secret(content->GetText());
}

}  // namespace Cli
