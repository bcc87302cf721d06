// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// How a command ends.

#ifndef QUORLIN_CLI_OUTCOME_H
#define QUORLIN_CLI_OUTCOME_H

#include "quorlin/Failure.h"
#include "quorlin/Options.h"

#include <quorlin/SamlToken.h>

#include <boost/shared_ptr.hpp>

#include <functional>
#include <string>

namespace Cli {

/// Gets a token, or throws.
using TokenSource = std::function<boost::shared_ptr<const Quorlin::SamlToken>()>;

/// Shows the token that `source` gives, as `options` ask: a summary under `heading` or a JSON object on
/// standard output, the XML in a file. Errors are shown too; `otherwise` is for those that
/// DescribeCurrentException cannot place. Returns the program's exit code.
int ShowToken(const OutputOptions& options, const std::string& heading, ExitCode otherwise,
              const TokenSource& source);

/// Shows a failure: as a JSON object on standard output, or to a person. Returns the program's exit code.
/// Call it from a catch (...) block.
int ShowFailure(bool json, ExitCode otherwise);

/// Writes to standard output. Throws UsageException when that is a full disk or a closed pipe.
void Print(const std::string& text);

/// Tells a person about a failure, on standard error.
void PrintFailure(const Failure& failure);

/// Runs `command`, reports what it throws, and returns the program's exit code.
int RunReporting(const std::function<void()>& command);

}  // namespace Cli

#endif  // QUORLIN_CLI_OUTCOME_H
