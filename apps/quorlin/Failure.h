// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// One view of everything that can go wrong.

#ifndef QUORLIN_CLI_FAILURE_H
#define QUORLIN_CLI_FAILURE_H

#include "quorlin/ExitCode.h"

#include <stdexcept>
#include <string>

namespace Cli {

/// The user's arguments, or the files they name, cannot be used.
class UsageException final : public std::runtime_error {
 public:
  explicit UsageException(const std::string& message) : std::runtime_error(message) {}
};

struct Failure {
  std::string type;     ///< The exception's class without its namespaces.
  std::string message;  ///< Its exact what() text.
  bool byPointer;       ///< Thrown as a pointer.
  ExitCode exitCode;
  std::string advice;  ///< What to do next; empty when there is nothing to say.
};

/// Describes the exception that is being handled; call it from a catch (...) block. A platform exception that
/// speaks neither of arguments nor of the service has the code `otherwise`: while a token is read it is the
/// token's fault (EXIT_REFUSED), else nobody's (EXIT_FAILED).
Failure DescribeCurrentException(ExitCode otherwise);

}  // namespace Cli

#endif  // QUORLIN_CLI_FAILURE_H
