// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin acquire: asks a token service for a token.

#include "quorlin/Commands.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/Password.h"
#include "quorlin/ServiceCall.h"
#include "quorlin/TokenFile.h"

#include <quorlin/SecurityTokenService.h>

#include <iostream>
#include <memory>

namespace Cli {

namespace {

/// What the ways to acquire a token have in common, and what only one of them has.
struct AcquireArguments {
  ServiceOptions service;
  CallOptions call;
  HolderOfKeyOptions holderOfKey;
  TokenOptions token;
  OutputOptions output;
  std::string userName;
  PasswordOptions password;
  std::string presentedTokenFile;
};

using Arguments = std::shared_ptr<AcquireArguments>;
using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;

TokenPointer AcquireByPassword(const AcquireArguments& arguments) {
  // Everything that can be wrong with the arguments comes before the question for the password.
  const ServiceCall call(MakeServiceConfig(arguments.service, arguments.holderOfKey), arguments.call);
  const Quorlin::TokenSpec spec = MakeTokenSpec(arguments.token);
  if (IsPlainHttp(arguments.service)) {
    std::cerr << "quorlin: warning: with an http: URL the password can be read on its way\n";
  }
  const Secret password = ReadPassword(arguments.password, arguments.userName);
  return call.Run([&](const Quorlin::SecurityTokenService& service) {
    return service.AcquireToken(arguments.userName, password.Reveal(), spec);
  });
}

TokenPointer AcquireByCertificate(const AcquireArguments& arguments) {
  const Quorlin::TokenSpec spec = MakeTokenSpec(arguments.token);
  const ServiceCall call(MakeServiceConfig(arguments.service, arguments.holderOfKey), arguments.call);
  return call.Run(
      [&](const Quorlin::SecurityTokenService& service) { return service.AcquireTokenByCertificate(spec); });
}

TokenPointer AcquireByToken(const AcquireArguments& arguments) {
  const Quorlin::SecurityTokenServiceConfig config =
      MakeServiceConfig(arguments.service, arguments.holderOfKey);
  const TokenPointer presented = ReadToken(arguments.presentedTokenFile, config);
  const Quorlin::TokenSpec spec = MakeTokenSpec(arguments.token);
  return ServiceCall(config, arguments.call).Run([&](const Quorlin::SecurityTokenService& service) {
    return service.AcquireTokenByToken(*presented, spec);
  });
}

/// Adds the flags that all have.
void AddCommonOptions(CLI::App& command, bool needsKey, AcquireArguments& arguments) {
  AddServiceOptions(command, arguments.service);
  AddCallOptions(command, arguments.call);
  AddHolderOfKeyOptions(command, arguments.holderOfKey, needsKey);
  AddTokenOptions(command, arguments.token);
  AddOutputOptions(command, arguments.output);
  AddLogOption(command);
}

Command MakeCommand(CLI::App* command, const Arguments& arguments,
                    TokenPointer (*acquireToken)(const AcquireArguments&)) {
  return {command, [=] {
            return ShowToken(arguments->output, "A token from " + arguments->service.url, EXIT_FAILED,
                             [&] { return acquireToken(*arguments); });
          }};
}

Command AddPasswordCommand(CLI::App& acquire) {
  const Arguments arguments = std::make_shared<AcquireArguments>();
  CLI::App* const command = acquire.add_subcommand("password", "Get a token for a user name and a password");
  command->add_option("--user", arguments->userName, "The user, as name@domain")
      ->required()
      ->type_name("NAME");
  AddPasswordOptions(*command, arguments->password);
  AddCommonOptions(*command, false, *arguments);
  AddBearerOption(*command, arguments->token);
  command->footer(
      "Without --password-file and --password-stdin the password is asked for on the terminal. The token is printed\n"
      "as a summary only: --out keeps its XML. With --cert and --key it is bound to your key.\n\n"
      "Examples:\n"
      "  quorlin acquire password --url https://sts.example.com/sts --sts-cert sts.pem --user alice@example.com\n"
      "  quorlin acquire password --url https://localhost:8443/sts --ca ca.pem --sts-cert sts.pem \\\n"
      "      --user alice@example.com --password-file secret.txt --lifetime 3600 --out token.xml --json");
  return MakeCommand(command, arguments, AcquireByPassword);
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
  return MakeCommand(command, arguments, AcquireByCertificate);
}

Command AddTokenCommand(CLI::App& acquire) {
  const Arguments arguments = std::make_shared<AcquireArguments>();
  CLI::App* const command = acquire.add_subcommand("token", "Get a token in exchange for one that you have");
  AddTokenFileOption(*command, arguments->presentedTokenFile);
  AddCommonOptions(*command, true, *arguments);
  AddBearerOption(*command, arguments->token);
  command->footer(
      "A token that is bound to a key is only exchanged for whoever signs with that key.\n\n"
      "Example:\n"
      "  quorlin acquire token --url https://sts.example.com/sts --sts-cert sts.pem --cert me.pem --key me.key \\\n"
      "      --token token.xml --delegate-to bob@example.com --out for-bob.xml");
  return MakeCommand(command, arguments, AcquireByToken);
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
