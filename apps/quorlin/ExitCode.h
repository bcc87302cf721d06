// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the program returns.

#ifndef QUORLIN_CLI_EXITCODE_H
#define QUORLIN_CLI_EXITCODE_H

namespace Cli {

enum ExitCode {
  EXIT_DONE = 0,
  EXIT_REFUSED = 1,      ///< The service or the token said no.
  EXIT_USAGE = 2,        ///< The arguments cannot be used.
  EXIT_UNREACHABLE = 3,  ///< The service could not be reached.
  EXIT_FAILED = 4        ///< Anything else.
};

}  // namespace Cli

#endif  // QUORLIN_CLI_EXITCODE_H
