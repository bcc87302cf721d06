// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Runs other programs.

#ifndef QUORLIN_TESTS_SUPPORT_PROCESS_H
#define QUORLIN_TESTS_SUPPORT_PROCESS_H

#include <string>
#include <vector>

namespace TestSupport {

struct ProcessResult {
  /// What the program returned; 128 + the number of the signal that ended it.
  int exitCode;
  std::string standardOutput;
  std::string standardError;
};

/// Runs `arguments[0]` (looked up in PATH) with the rest as its arguments, without a shell, gives it
/// `standardInput`, and waits for its end. The environment is handed on. Throws std::system_error when it
/// cannot be started: a missing program is never taken for a passed check.
ProcessResult RunProcess(const std::vector<std::string>& arguments, const std::string& standardInput = "");

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_PROCESS_H
