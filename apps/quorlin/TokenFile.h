// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A token that the user already has.

#ifndef QUORLIN_CLI_TOKENFILE_H
#define QUORLIN_CLI_TOKENFILE_H

#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenServiceConfig.h>

#include <CLI/CLI.hpp>

#include <boost/shared_ptr.hpp>

#include <list>
#include <string>

namespace Cli {

/// Adds --token.
void AddTokenFileOption(CLI::App& command, std::string& file);

/// Reads the token and checks it with the certificates that `config` trusts. Throws what CreateSamlToken
/// throws, and UsageException for a file that cannot be read.
boost::shared_ptr<const Quorlin::SamlToken> ReadToken(const std::string& file,
                                                      const Quorlin::SecurityTokenServiceConfig& config);
/// The same with the certificates `trusted`.
boost::shared_ptr<const Quorlin::SamlToken> ReadToken(
    const std::string& file, const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trusted);

}  // namespace Cli

#endif  // QUORLIN_CLI_TOKENFILE_H
