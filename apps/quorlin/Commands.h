// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The program's commands. Each adds itself and its flags to the command line, and gives back what to run when
// it is chosen.

#ifndef QUORLIN_CLI_COMMANDS_H
#define QUORLIN_CLI_COMMANDS_H

#include <CLI/CLI.hpp>

#include <functional>
#include <vector>

namespace Cli {

/// A command of the command line and what it does. `run` returns the exit code and is called after the
/// arguments were read.
struct Command {
  CLI::App* app;
  std::function<int()> run;
};

/// acquire password, acquire certificate, acquire token, acquire gss
std::vector<Command> AddAcquireCommands(CLI::App& app);
/// acquire gss alone, a command of `acquire`
Command AddAcquireGssCommand(CLI::App& acquire);
/// renew
Command AddRenewCommand(CLI::App& app);
/// get-token
Command AddGetTokenCommand(CLI::App& app);
/// validate
Command AddValidateCommand(CLI::App& app);
/// verify
Command AddVerifyCommand(CLI::App& app);
/// inspect
Command AddInspectCommand(CLI::App& app);
/// doctor
Command AddDoctorCommand(CLI::App& app);
/// request password, request certificate, request exchange, request renew, request validate, request spnego
std::vector<Command> AddRequestCommands(CLI::App& app);
/// sts
Command AddStsCommand(CLI::App& app);
/// demo
Command AddDemoCommand(CLI::App& app);
/// generate (hidden)
Command AddGenerateCommand(CLI::App& app);

}  // namespace Cli

#endif  // QUORLIN_CLI_COMMANDS_H
