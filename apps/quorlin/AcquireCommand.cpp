// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin acquire: asks a token service for a token.

#include "quorlin/Acquisition.h"
#include "quorlin/Commands.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/ServiceCall.h"
#include "quorlin/TokenFile.h"

#include <quorlin/SecurityTokenService.h>

#include <memory>

namespace Cli {

namespace {

/// What the ways to acquire a token have in common, and what only one of them has.
struct AcquireArguments {
  Acquisition acquisition;
  OutputOptions output;
  std::string presentedTokenFile;
};

using Arguments = std::shared_ptr<AcquireArguments>;
using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;

TokenPointer AcquireByToken(const AcquireArguments& arguments) {
  const Quorlin::SecurityTokenServiceConfig config =
      MakeServiceConfig(arguments.acquisition.service, arguments.acquisition.holderOfKey);
  const TokenPointer presented = ReadToken(arguments.presentedTokenFile, config);
  const Quorlin::TokenSpec spec = MakeTokenSpec(arguments.acquisition.token);
  return ServiceCall(config, arguments.acquisition.call)
      .Run([&](const Quorlin::SecurityTokenService& service) {
        return service.AcquireTokenByToken(*presented, spec);
      });
}

/// Adds the flags that all have.
void AddCommonOptions(CLI::App& command, bool needsKey, AcquireArguments& arguments) {
  AddServiceOptions(command, arguments.acquisition.service);
  AddCallOptions(command, arguments.acquisition.call);
  AddHolderOfKeyOptions(command, arguments.acquisition.holderOfKey, needsKey);
  AddTokenOptions(command, arguments.acquisition.token);
  AddOutputOptions(command, arguments.output);
  AddLogOption(command);
}

Command MakeCommand(CLI::App* command, const Arguments& arguments, const TokenSource& acquireToken) {
  return {command, [=] {
            return ShowToken(arguments->output, "A token from " + arguments->acquisition.service.url,
                             EXIT_FAILED, acquireToken);
          }};
}

Command AddPasswordCommand(CLI::App& acquire) {
  const Arguments arguments = std::make_shared<AcquireArguments>();
  CLI::App* const command = acquire.add_subcommand("password", "Get a token for a user name and a password");
  command->add_option("--user", arguments->acquisition.userName, "The user, as name@domain")
      ->required()
      ->type_name("NAME");
  AddPasswordOptions(*command, arguments->acquisition.password);
  AddCommonOptions(*command, false, *arguments);
  AddBearerOption(*command, arguments->acquisition.token);
  command->footer(
      "Without --password-file and --password-stdin the password is asked for on the terminal. The token is printed\n"
      "as a summary only: --out keeps its XML. With --cert and --key it is bound to your key.\n\n"
      "Examples:\n"
      "  quorlin acquire password --url https://sts.example.com/sts --sts-cert sts.pem --user alice@example.com\n"
      "  quorlin acquire password --url https://localhost:8443/sts --ca ca.pem --sts-cert sts.pem \\\n"
      "      --user alice@example.com --password-file secret.txt --lifetime 3600 --out token.xml --json");
  return MakeCommand(command, arguments, [arguments] { return AcquireByPassword(arguments->acquisition); });
}

Command AddCertificateCommand(CLI::App& acquire) {
  const Arguments arguments = std::make_shared<AcquireArguments>();
  CLI::App* const command =
      acquire.add_subcommand("certificate", "Get a token for the owner of a certificate");
  AddCommonOptions(*command, true, *arguments);
  command->footer(
      "The key is a PEM file, an object in a PKCS #11 token or part of a PKCS #12 file. The PIN or the pass phrase is\n"
      "asked for on the terminal unless --key-password-file holds it.\n\n"
      "Examples:\n"
      "  quorlin acquire certificate --url https://sts.example.com/sts --sts-cert sts.pem \\\n"
      "      --cert me.pem --key me.key --out token.xml\n"
      "  quorlin acquire certificate --url https://sts.example.com/sts --sts-cert sts.pem \\\n"
      "      --cert me.pem --key 'pkcs11:token=mine;object=sign' --out token.xml\n"
      "  quorlin acquire certificate --url https://sts.example.com/sts --sts-cert sts.pem \\\n"
      "      --pkcs12 me.p12 --out token.xml");
  return MakeCommand(command, arguments,
                     [arguments] { return AcquireByCertificate(arguments->acquisition); });
}

Command AddTokenCommand(CLI::App& acquire) {
  const Arguments arguments = std::make_shared<AcquireArguments>();
  CLI::App* const command = acquire.add_subcommand("token", "Get a token in exchange for one that you have");
  AddTokenFileOption(*command, arguments->presentedTokenFile);
  AddCommonOptions(*command, true, *arguments);
  AddBearerOption(*command, arguments->acquisition.token);
  command->footer(
      "A token that is bound to a key is only exchanged for whoever signs with that key.\n\n"
      "Example:\n"
      "  quorlin acquire token --url https://sts.example.com/sts --sts-cert sts.pem --cert me.pem --key me.key \\\n"
      "      --token token.xml --delegate-to bob@example.com --out for-bob.xml");
  return MakeCommand(command, arguments, [arguments] { return AcquireByToken(*arguments); });
}

}  // namespace

std::vector<Command> AddAcquireCommands(CLI::App& app) {
  CLI::App* const acquire = app.add_subcommand("acquire", "Get a token from a token service");
  acquire->require_subcommand(1);
  acquire->footer("quorlin acquire COMMAND --help tells more about each way.");
  return {AddPasswordCommand(*acquire), AddCertificateCommand(*acquire), AddTokenCommand(*acquire),
          AddAcquireGssCommand(*acquire)};
}

}  // namespace Cli
