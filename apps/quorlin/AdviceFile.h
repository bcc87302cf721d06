// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Advice for a token, from a file.

#ifndef QUORLIN_CLI_ADVICEFILE_H
#define QUORLIN_CLI_ADVICEFILE_H

#include <quorlin/SamlToken.h>

#include <string>
#include <vector>

namespace Cli {

/// Reads a JSON array in the form in which tokens are described:
/// [{"source": "...", "attributes": [{"name": "...", "values": ["..."]}]}]. Throws UsageException, saying
/// where.
std::vector<Quorlin::Advice> ReadAdvice(const std::string& path);

}  // namespace Cli

#endif  // QUORLIN_CLI_ADVICEFILE_H
