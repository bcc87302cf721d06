// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin acquire gss: asks a token service for a token by a Kerberos ticket.

#include "quorlin/Commands.h"
#include "quorlin/Kerberos.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/ServiceCall.h"

#include <pelmar/http/Url.h>
#include <quorlin/SecurityTokenService.h>

#include <memory>

namespace Cli {

namespace {

struct GssArguments {
  ServiceOptions service;
  CallOptions call;
  HolderOfKeyOptions holderOfKey;
  TokenOptions token;
  OutputOptions output;
  KerberosOptions kerberos;
};

KerberosOptions MakeKerberosOptions(const GssArguments& arguments) {
  KerberosOptions options = arguments.kerberos;
  if (options.target.empty()) {
    options.target = "HTTP@" + Pelmar::Http::ParseHttpURL(arguments.service.url).host;
  }
  return options;
}

boost::shared_ptr<const Quorlin::SamlToken> AcquireByGss(const GssArguments& arguments) {
  RequireKerberos();
  const ServiceCall call(MakeServiceConfig(arguments.service, arguments.holderOfKey), arguments.call);
  const Quorlin::TokenSpec spec = MakeTokenSpec(arguments.token);
  const KerberosOptions kerberos = MakeKerberosOptions(arguments);
  return call.Run([&](const Quorlin::SecurityTokenService& service) {
    return AcquireByKerberos(service, spec, kerberos);
  });
}

void AddKerberosOptions(CLI::App& command, KerberosOptions& options) {
  command
      .add_option("--target", options.target,
                  "The Kerberos service to negotiate with; without it, HTTP@ and the host of --url")
      ->type_name("SERVICE@HOST");
  command
      .add_option("--principal", options.principal,
                  "Act as this Kerberos principal; without it, as the one your ticket is for")
      ->type_name("NAME");
  command.add_option("--ccache", options.cache, "Take the ticket from this credential cache")
      ->type_name("NAME");
}

}  // namespace

Command AddAcquireGssCommand(CLI::App& acquire) {
  const auto arguments = std::make_shared<GssArguments>();
  arguments->output.credentialsAdvice =
      "Look at your Kerberos tickets with klist, and get a new one with kinit.";
  CLI::App* const command =
      acquire.add_subcommand("gss", "Get a token for the owner of a Kerberos ticket (SPNEGO)");
  AddKerberosOptions(*command, arguments->kerberos);
  AddServiceOptions(*command, arguments->service);
  AddCallOptions(*command, arguments->call);
  AddHolderOfKeyOptions(*command, arguments->holderOfKey, false);
  AddTokenOptions(*command, arguments->token);
  AddOutputOptions(*command, arguments->output);
  AddLogOption(*command);
  AddBearerOption(*command, arguments->token);
  command->footer(
      "The service has to prove its identity by Kerberos, too. With --cert and --key the token is bound to your key.\n\n"
      "Examples:\n"
      "  kinit alice@EXAMPLE.COM\n"
      "  quorlin acquire gss --url https://sts.example.com/sts --sts-cert sts.pem\n"
      "  quorlin acquire gss --url https://localhost:8443/sts --ca ca.pem --sts-cert sts.pem \\\n"
      "      --target HTTP@sts.example.com --ccache FILE:/tmp/alice --out token.xml --json");
  return {command, [=] {
            return ShowToken(arguments->output, "A token from " + arguments->service.url, EXIT_FAILED,
                             [&] { return AcquireByGss(*arguments); });
          }};
}

}  // namespace Cli
