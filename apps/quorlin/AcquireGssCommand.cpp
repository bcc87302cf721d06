// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin acquire gss: asks a token service for a token by a Kerberos ticket.

#include "quorlin/Acquisition.h"
#include "quorlin/Commands.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"

#include <memory>

namespace Cli {

namespace {

struct GssArguments {
  Acquisition acquisition;
  OutputOptions output;
};

}  // namespace

Command AddAcquireGssCommand(CLI::App& acquire) {
  const auto arguments = std::make_shared<GssArguments>();
  arguments->output.credentialsAdvice =
      "Look at your Kerberos tickets with klist, and get a new one with kinit.";
  CLI::App* const command =
      acquire.add_subcommand("gss", "Get a token for the owner of a Kerberos ticket (SPNEGO)");
  AddKerberosOptions(*command, arguments->acquisition.kerberos);
  AddServiceOptions(*command, arguments->acquisition.service);
  AddCallOptions(*command, arguments->acquisition.call);
  AddHolderOfKeyOptions(*command, arguments->acquisition.holderOfKey, false);
  AddTokenOptions(*command, arguments->acquisition.token);
  AddOutputOptions(*command, arguments->output);
  AddLogOption(*command);
  AddBearerOption(*command, arguments->acquisition.token);
  command->footer(
      "The service has to prove its identity by Kerberos, too. With --cert and --key the token is bound to your key.\n\n"
      "Examples:\n"
      "  kinit alice@EXAMPLE.COM\n"
      "  quorlin acquire gss --url https://sts.example.com/sts --sts-cert sts.pem\n"
      "  quorlin acquire gss --url https://localhost:8443/sts --ca ca.pem --sts-cert sts.pem \\\n"
      "      --target HTTP@sts.example.com --ccache FILE:/tmp/alice --out token.xml --json");
  return {command, [=] {
            return ShowToken(arguments->output, "A token from " + arguments->acquisition.service.url,
                             EXIT_FAILED, [&] { return AcquireByGss(arguments->acquisition); });
          }};
}

}  // namespace Cli
