// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin acquire: asks a token service for a token.

#include "quorlin/Commands.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/Password.h"

#include <quorlin/SecurityTokenService.h>

#include <iostream>
#include <memory>

namespace Cli {

namespace {

struct PasswordArguments {
  ServiceOptions service;
  std::string userName;
  PasswordOptions password;
  TokenOptions token;
  OutputOptions output;
};

boost::shared_ptr<const Quorlin::SamlToken> AcquireByPassword(const PasswordArguments& arguments) {
  // Everything that can be wrong with the arguments comes before the question for the password.
  const boost::shared_ptr<Quorlin::SecurityTokenService> service =
      Quorlin::CreateSecurityTokenService(MakeServiceConfig(arguments.service));
  const Quorlin::TokenSpec spec = MakeTokenSpec(arguments.token);
  if (IsPlainHttp(arguments.service)) {
    std::cerr << "quorlin: warning: with an http: URL the password can be read on its way\n";
  }
  const Secret password = ReadPassword(arguments.password, arguments.userName);
  return service->AcquireToken(arguments.userName, password.Reveal(), spec);
}

Command AddPasswordCommand(CLI::App& acquire) {
  const auto arguments = std::make_shared<PasswordArguments>();
  CLI::App* const command = acquire.add_subcommand("password", "Get a token for a user name and a password");
  AddServiceOptions(*command, arguments->service);
  command->add_option("--user", arguments->userName, "The user, as name@domain")
      ->required()
      ->type_name("NAME");
  AddPasswordOptions(*command, arguments->password);
  AddTokenOptions(*command, arguments->token);
  AddOutputOptions(*command, arguments->output);
  AddLogOption(*command);
  command->footer(
      "Without --password-file and --password-stdin the password is asked for on the terminal. The token is printed\n"
      "as a summary only: --out keeps its XML.\n\n"
      "Examples:\n"
      "  quorlin acquire password --url https://sts.example.com/sts --user alice@example.com --sts-cert sts.pem\n"
      "  quorlin acquire password --url https://localhost:8443/sts --ca ca.pem --sts-cert sts.pem \\\n"
      "      --user alice@example.com --password-file secret.txt --lifetime 3600 --out token.xml --json");
  return {command, [arguments] {
            return ShowToken(arguments->output, "A token from " + arguments->service.url, EXIT_FAILED,
                             [&] { return AcquireByPassword(*arguments); });
          }};
}

}  // namespace

std::vector<Command> AddAcquireCommands(CLI::App& app) {
  CLI::App* const acquire = app.add_subcommand("acquire", "Get a token from a token service");
  acquire->require_subcommand(1);
  acquire->footer("Try quorlin acquire password --help.");
  return {AddPasswordCommand(*acquire)};
}

}  // namespace Cli
