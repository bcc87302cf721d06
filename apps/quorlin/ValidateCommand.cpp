// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin validate: asks whether a token's subject is still known.

#include "quorlin/Commands.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/ServiceCall.h"
#include "quorlin/Terminal.h"
#include "quorlin/TokenFile.h"
#include "quorlin/TokenOutput.h"

#include <quorlin/SecurityTokenService.h>

#include <memory>

namespace Cli {

namespace {

struct ValidateArguments {
  ServiceOptions service;
  CallOptions call;
  std::string tokenFile;
  bool json = false;
};

std::string DescribeVerdict(const Quorlin::SamlToken& token, bool isValid, bool json) {
  if (json) {
    return ToText(Json{{"subjectValid", isValid}}) + "\n";
  }
  const Quorlin::PrincipalId& subject = token.GetSubject();
  return MakePrintable(subject.name + "@" + subject.domain) +
         (isValid ? " is a valid subject\n" : " is no longer a valid subject\n");
}

int Validate(const ValidateArguments& arguments) {
  try {
    const Quorlin::SecurityTokenServiceConfig config = MakeServiceConfig(arguments.service);
    const boost::shared_ptr<const Quorlin::SamlToken> token = ReadToken(arguments.tokenFile, config);
    const bool isValid =
        ServiceCall(config, arguments.call).Run([&](const Quorlin::SecurityTokenService& service) {
          return service.ValidateSubject(*token);
        });
    Print(DescribeVerdict(*token, isValid, arguments.json));
    return isValid ? EXIT_DONE : EXIT_REFUSED;
  } catch (...) {
    return ShowFailure(arguments.json, EXIT_FAILED);
  }
}

}  // namespace

Command AddValidateCommand(CLI::App& app) {
  const auto arguments = std::make_shared<ValidateArguments>();
  CLI::App* const command =
      app.add_subcommand("validate", "Ask the token service whether a token's subject is still a valid one");
  AddTokenFileOption(*command, arguments->tokenFile);
  AddServiceOptions(*command, arguments->service);
  AddCallOptions(*command, arguments->call);
  command->add_flag("--json", arguments->json, "Print {\"subjectValid\":true} or {\"subjectValid\":false}");
  AddLogOption(*command);
  command->footer(
      "Exit code 0: the subject is valid; 1: it is not, or the token is not good.\n\n"
      "Example:\n"
      "  quorlin validate --url https://sts.example.com/sts --sts-cert sts.pem --token token.xml");
  return {command, [arguments] {
            return Validate(*arguments);
          }};
}

}  // namespace Cli
