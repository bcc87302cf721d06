// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/CommandTree.h"
#include "quorlin/Commands.h"
#include "quorlin/CoreDumps.h"
#include "quorlin/ExitCode.h"
#include "quorlin/Signals.h"
#include "quorlin/Terminal.h"

#include <CLI/CLI.hpp>

#include <exception>
#include <iostream>
#include <string>
#include <vector>

namespace {

constexpr const char* kFooter =
    "Exit codes: 0 done; 1 the service or the token said no; 2 wrong usage; 3 the service could not be reached;\n"
    "4 anything else.\n\n"
    "Examples:\n"
    "  quorlin demo\n"
    "  quorlin sts --port 8443 --write-certs certs\n"
    "  quorlin acquire password --url https://127.0.0.1:8443/sts --ca certs/ca.pem --sts-cert certs/sts.pem \\\n"
    "      --user alice@example.com --out token.xml\n"
    "  quorlin verify --trust certs/sts.pem token.xml\n\n"
    "quorlin COMMAND --help tells more about a command.";

/// Names the flags among what was not expected. Values are left out: one may be a password that went astray.
std::string DescribeUnexpected(const std::vector<std::string>& arguments) {
  std::string text;
  for (const std::string& argument : arguments) {
    const bool isFlag = argument.size() > 2 && argument.compare(0, 2, "--") == 0;
    text += (text.empty() ? "" : ", ") +
            (isFlag ? argument.substr(0, argument.find('=')) : std::string("a value without a flag"));
  }
  return "not expected: " + text;
}

/// The command as far as it was understood: the last of the commands that stand one below the other.
const CLI::App& FindParsed(const CLI::App& app) {
  const CLI::App* parsed = &app;
  while (!parsed->get_subcommands().empty()) {
    parsed = parsed->get_subcommands().front();
  }
  return *parsed;
}

/// What could have stood where no command did. The word that did is not repeated: see above.
std::string DescribeMissingCommand(const CLI::App& app) {
  std::string names;
  for (const Cli::CommandHelp& command : Cli::ReadCommandTree(FindParsed(app)).subcommands) {
    names += (names.empty() ? "" : ", ") + command.name;
  }
  return "there has to be one of these commands: " + names;
}

int ReportUsage(const CLI::App& app, const std::string& what) {
  std::string command = app.get_name();
  for (const CLI::App* parsed = &app; !parsed->get_subcommands().empty();) {
    parsed = parsed->get_subcommands().front();
    command += " " + parsed->get_name();
  }
  std::cerr << "quorlin: " << Cli::MakePrintable(what) << "\nTry " << command << " --help\n";
  return Cli::EXIT_USAGE;
}

std::vector<Cli::Command> AddCommands(CLI::App& app) {
  std::vector<Cli::Command> commands = Cli::AddAcquireCommands(app);
  commands.push_back(Cli::AddRenewCommand(app));
  commands.push_back(Cli::AddGetTokenCommand(app));
  commands.push_back(Cli::AddValidateCommand(app));
  commands.push_back(Cli::AddVerifyCommand(app));
  commands.push_back(Cli::AddInspectCommand(app));
  commands.push_back(Cli::AddDoctorCommand(app));
  for (const Cli::Command& command : Cli::AddRequestCommands(app)) {
    commands.push_back(command);
  }
  commands.push_back(Cli::AddStsCommand(app));
  commands.push_back(Cli::AddDemoCommand(app));
  commands.push_back(Cli::AddGenerateCommand(app));
  return commands;
}

int Run(int argumentCount, char** arguments) {
  CLI::App app("Asks WS-Trust token services for SAML 2.0 tokens, and checks tokens.", "quorlin");
  app.require_subcommand(1);
  app.set_version_flag("--version", std::string("quorlin ") + QUORLIN_VERSION);
  app.footer(kFooter);
  const std::vector<Cli::Command> commands = AddCommands(app);
  try {
    app.parse(argumentCount, arguments);
  } catch (const CLI::Success& e) {
    return app.exit(e);
  } catch (const CLI::ExtrasError&) {
    return ReportUsage(app, DescribeUnexpected(app.remaining(true)));
  } catch (const CLI::ParseError& e) {
    const bool lacksCommand = e.get_exit_code() == static_cast<int>(CLI::ExitCodes::RequiredError) &&
                              !Cli::ReadCommandTree(FindParsed(app)).subcommands.empty();
    return ReportUsage(app, lacksCommand ? DescribeMissingCommand(app) : e.what());
  }
  for (const Cli::Command& command : commands) {
    if (command.app->parsed()) {
      return command.run();
    }
  }
  return Cli::EXIT_USAGE;
}

}  // namespace

int main(int argumentCount, char** arguments) {
  int exitCode = Cli::EXIT_FAILED;
  try {
    if (!Cli::ForbidCoreDumps()) {
      // Said, but no reason to do nothing at all.
      std::cerr << "quorlin: warning: core dumps cannot be switched off, and would hold passwords and keys\n";
    }
    exitCode = Run(argumentCount, arguments);
  } catch (const std::exception& e) {
    std::cerr << "quorlin: " << Cli::MakePrintable(e.what()) << "\n";
  }
  Cli::EndByInterruption();
  return exitCode;
}
