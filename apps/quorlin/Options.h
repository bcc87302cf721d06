// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Groups of flags that several commands share.

#ifndef QUORLIN_CLI_OPTIONS_H
#define QUORLIN_CLI_OPTIONS_H

#include <quorlin/SecurityTokenServiceConfig.h>
#include <quorlin/TokenSpec.h>

#include <CLI/CLI.hpp>

#include <string>
#include <vector>

namespace Cli {

/// Which service, and what to trust.
struct ServiceOptions {
  std::string url;
  std::vector<std::string> caFiles;
  std::vector<std::string> stsCertificateFiles;
};

void AddServiceOptions(CLI::App& command, ServiceOptions& options);

/// Reads the files. An https: URL without --ca trusts what the operating system trusts. Throws
/// UsageException.
Quorlin::SecurityTokenServiceConfig MakeServiceConfig(const ServiceOptions& options);

/// Whether what is sent can be read on the way.
bool IsPlainHttp(const ServiceOptions& options);

/// What the token shall be.
struct TokenOptions {
  long long lifetimeSec = 600;
  bool renewable = false;
  bool delegable = false;
  std::string delegateTo;
  std::vector<std::string> audience;
};

void AddTokenOptions(CLI::App& command, TokenOptions& options);
Quorlin::TokenSpec MakeTokenSpec(const TokenOptions& options);

/// Where the outcome goes.
struct OutputOptions {
  std::string file;
  bool json = false;
};

void AddOutputOptions(CLI::App& command, OutputOptions& options);

/// Adds --log, which takes effect at once.
void AddLogOption(CLI::App& command);

/// An option that takes one value each time it is given.
CLI::Option* AddRepeatable(CLI::App& command, const std::string& name, std::vector<std::string>& values,
                           const std::string& description);

}  // namespace Cli

#endif  // QUORLIN_CLI_OPTIONS_H
