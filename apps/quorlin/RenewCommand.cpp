// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin renew: a token gets a new lifetime.

#include "quorlin/Commands.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/ServiceCall.h"
#include "quorlin/TokenFile.h"

#include <quorlin/SecurityTokenService.h>

#include <memory>

namespace Cli {

namespace {

struct RenewArguments {
  ServiceOptions service;
  CallOptions call;
  HolderOfKeyOptions holderOfKey;
  TokenOptions token;
  OutputOptions output;
  std::string tokenFile;
};

boost::shared_ptr<const Quorlin::SamlToken> Renew(const RenewArguments& arguments) {
  const Quorlin::SecurityTokenServiceConfig config =
      MakeServiceConfig(arguments.service, arguments.holderOfKey);
  const boost::shared_ptr<const Quorlin::SamlToken> token = ReadToken(arguments.tokenFile, config);
  return ServiceCall(config, arguments.call).Run([&](const Quorlin::SecurityTokenService& service) {
    return service.RenewToken(*token, arguments.token.lifetimeSec);
  });
}

}  // namespace

Command AddRenewCommand(CLI::App& app) {
  const auto arguments = std::make_shared<RenewArguments>();
  CLI::App* const command =
      app.add_subcommand("renew", "Get a new lifetime for a token that is bound to your key");
  AddTokenFileOption(*command, arguments->tokenFile);
  AddServiceOptions(*command, arguments->service);
  AddCallOptions(*command, arguments->call);
  AddHolderOfKeyOptions(*command, arguments->holderOfKey, true);
  AddLifetimeOption(*command, arguments->token);
  AddOutputOptions(*command, arguments->output);
  AddLogOption(*command);
  command->footer(
      "The lifetime counts from now. The token must still be valid, and must have been issued as renewable.\n\n"
      "Example:\n"
      "  quorlin renew --url https://sts.example.com/sts --sts-cert sts.pem --cert me.pem --key me.key \\\n"
      "      --token token.xml --lifetime 3600 --out token.xml");
  return {command, [arguments] {
            return ShowToken(arguments->output, "The token, renewed by " + arguments->service.url,
                             EXIT_FAILED, [&] { return Renew(*arguments); });
          }};
}

}  // namespace Cli
