// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Programs that a test talks to while they run.

#ifndef QUORLIN_TESTS_APPS_CHILDPROCESS_H
#define QUORLIN_TESTS_APPS_CHILDPROCESS_H

#include <string>
#include <vector>

#include <sys/types.h>

namespace StsTests {

/// A running program. Killed with its owner unless it has ended.
class ChildProcess final {
 public:
  enum class Terminal {
    NONE,  ///< Standard input is empty, standard output a pipe, standard error /dev/null; no terminal
           ///< controls the program.
    OWN    ///< All three are a new terminal, which controls the program.
  };

  /// Starts `arguments[0]`, a path. With a `pendingSignal` the program starts with that signal blocked and
  /// already sent. Throws std::system_error.
  ChildProcess(const std::vector<std::string>& arguments, Terminal terminal, int pendingSignal = 0);
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;
  ~ChildProcess();

  pid_t GetId() const { return _process; }
  /// Whether nobody has waited for its end yet.
  bool IsRunning() const { return _process > 0; }

  /// All output so far, as soon as `text` is in it. Throws std::runtime_error when the output ends before.
  std::string ReadUntil(const std::string& text);
  /// All output, when it has ended.
  std::string ReadAll();

  /// Types on the terminal.
  void Type(const std::string& text);
  /// Whether the terminal shows what is typed.
  bool HasEcho() const;

  void Signal(int number);
  /// What it returned, or 128 + the number of the signal that ended it.
  int Wait();

 private:
  bool ReadSome();

  pid_t _process = -1;
  int _channel = -1;
  std::string _output;
};

}  // namespace StsTests

#endif  // QUORLIN_TESTS_APPS_CHILDPROCESS_H
