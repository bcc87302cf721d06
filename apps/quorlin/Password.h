// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Getting a password without showing it to anybody.

#ifndef QUORLIN_CLI_PASSWORD_H
#define QUORLIN_CLI_PASSWORD_H

#include "devsts/Secret.h"

#include <CLI/CLI.hpp>

#include <cstddef>
#include <string>

namespace Cli {

using DevSts::Secret;

constexpr std::size_t kMaxPasswordBytes = 4096;

/// Where a password comes from: a file, standard input, or else the terminal.
struct PasswordOptions {
  std::string file;
  bool fromStdin = false;
};

/// Adds --password-file and --password-stdin, and refuses --password in words that say why.
void AddPasswordOptions(CLI::App& command, PasswordOptions& options);

/// Reads the password of `userName`. From a file or from standard input all bytes count but one line feed (or
/// carriage return and line feed) at the end. On a terminal it is asked for (AskOnTerminal). Throws
/// UsageException when there is none, or no way to ask for it.
Secret ReadPassword(const PasswordOptions& options, const std::string& userName);

/// Asks on the terminal, without echo, for what `name` says, which must be printable ("PIN of the token");
/// the terminal's settings are restored also when a signal ends the program. Throws UsageException: without a
/// terminal with the message `noTerminal`.
Secret AskOnTerminal(const std::string& name, const std::string& noTerminal);

/// A password or pass phrase from a file, without one line end. Throws UsageException.
Secret ReadSecretFile(const std::string& path);

/// A file with a private key in it; "-" is standard input. Throws what ReadFile throws.
Secret ReadKeyFile(const std::string& path);

}  // namespace Cli

#endif  // QUORLIN_CLI_PASSWORD_H
