// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin request: shows what the library would send, for people who look for the reason why a service does
// not like it.

#include "quorlin/Commands.h"
#include "quorlin/Failure.h"
#include "quorlin/Files.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/Password.h"
#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/TokenFile.h"
#include "quorlin/TokenOutput.h"

#include <pelmar/StringUtil.h>

#include <functional>
#include <memory>
#include <optional>

namespace Cli {

namespace {

/// Stands in the place of a password, however long that is.
constexpr const char* kMask = "********";

constexpr std::size_t kMaxLegBytes = 1024 * 1024;

/// What the requests have in common, and what only some of them have.
struct RequestArguments {
  HolderOfKeyOptions holderOfKey;
  TokenOptions token;
  std::string userName;
  PasswordOptions password;
  bool reveal = false;
  std::string presentedTokenFile;
  std::vector<std::string> stsCertificateFiles;
  std::string legFile;
  bool isLegBase64 = false;
  std::optional<std::string> contextId;
  OutputOptions output;
};

using Arguments = std::shared_ptr<RequestArguments>;

Quorlin::RequestBuilderImpl MakeBuilder(const RequestArguments& arguments) {
  return Quorlin::RequestBuilderImpl(MakeHolderOfKeyConfig(arguments.holderOfKey));
}

boost::shared_ptr<const Quorlin::SamlToken> ReadPresentedToken(const RequestArguments& arguments) {
  return ReadToken(arguments.presentedTokenFile, ReadCertificates(arguments.stsCertificateFiles));
}

// --- The requests ---

/// With the mask instead of the password the request is the same but for that one text: no signature covers
/// it. So a password is only asked for to be revealed; one that is given is tried all the same.
Quorlin::Request BuildByPassword(const RequestArguments& arguments) {
  const Quorlin::RequestBuilderImpl builder = MakeBuilder(arguments);
  const Quorlin::TokenSpec spec = MakeTokenSpec(arguments.token);
  Quorlin::Request request;
  builder.BuildUserPassTokenRequest(arguments.userName, kMask, spec, request);
  const bool isGiven = arguments.password.fromStdin || !arguments.password.file.empty();
  if (!isGiven && !arguments.reveal) {
    return request;
  }
  const Secret password = ReadPassword(arguments.password, arguments.userName);
  Quorlin::Request revealed;
  builder.BuildUserPassTokenRequest(arguments.userName, password.Reveal(), spec, revealed);
  return arguments.reveal ? revealed : request;
}

Quorlin::Request BuildByCertificate(const RequestArguments& arguments) {
  Quorlin::Request request;
  MakeBuilder(arguments).BuildCertificateTokenRequest(MakeTokenSpec(arguments.token), request);
  return request;
}

Quorlin::Request BuildExchange(const RequestArguments& arguments) {
  Quorlin::Request request;
  MakeBuilder(arguments).BuildExchangeTokenRequest(*ReadPresentedToken(arguments),
                                                   MakeTokenSpec(arguments.token), request);
  return request;
}

Quorlin::Request BuildRenewal(const RequestArguments& arguments) {
  Quorlin::Request request;
  MakeBuilder(arguments).BuildRenewRequest(*ReadPresentedToken(arguments), arguments.token.lifetimeSec,
                                           request);
  return request;
}

Quorlin::Request BuildValidation(const RequestArguments& arguments) {
  Quorlin::Request request;
  MakeBuilder(arguments).BuildValidateSubjectRequest(*ReadPresentedToken(arguments), request);
  return request;
}

std::vector<unsigned char> ReadLeg(const RequestArguments& arguments) {
  const std::string bytes = ReadFile(arguments.legFile, kMaxLegBytes);
  if (!arguments.isLegBase64) {
    return std::vector<unsigned char>(bytes.begin(), bytes.end());
  }
  try {
    return Pelmar::StringUtil::Base64Decode(bytes);
  } catch (const Pelmar::Base64FormatException&) {
    throw UsageException(arguments.legFile + " is not base64 text");
  }
}

Quorlin::Request BuildNegotiation(const RequestArguments& arguments) {
  Quorlin::Request request;
  if (arguments.contextId) {
    MakeBuilder(arguments).BuildContinuedSPNegoRequest(*arguments.contextId, ReadLeg(arguments), request);
  } else {
    MakeBuilder(arguments).BuildInitialSPNegoRequest(MakeTokenSpec(arguments.token), ReadLeg(arguments),
                                                     request);
  }
  return request;
}

// --- Output ---

std::string Describe(const Quorlin::Request& request, const OutputOptions& output) {
  if (output.json) {
    return ToText(Json{{"soapAction", request.soapAction}, {"envelope", request.body}}) + "\n";
  }
  const std::string action = "SOAPAction: \"" + request.soapAction + "\"\n";
  return output.file.empty() ? action + "\n" + request.body + "\n" : action;
}

int Show(const RequestArguments& arguments, Quorlin::Request (*build)(const RequestArguments&)) {
  try {
    std::optional<OutputFile> file;
    if (!arguments.output.file.empty()) {
      file.emplace(arguments.output.file, Readers::OWNER);
    }
    const Quorlin::Request request = build(arguments);
    if (file) {
      file->Commit(request.body);
    }
    Print(Describe(request, arguments.output));
    return EXIT_DONE;
  } catch (...) {
    return ShowFailure(arguments.output.json, EXIT_FAILED);
  }
}

// --- Flags ---

/// A command of "request", with the flags for its output.
Command MakeCommand(CLI::App* command, const Arguments& arguments,
                    Quorlin::Request (*build)(const RequestArguments&)) {
  command
      ->add_option("--out", arguments->output.file,
                   "Write the bare envelope to this file, which only you may read, and print the action only")
      ->type_name("FILE");
  command->add_flag("--json", arguments->output.json, R"(Print {"soapAction":"...","envelope":"..."})");
  return {command, [=] {
            return Show(*arguments, build);
          }};
}

void AddPresentedTokenOptions(CLI::App& command, RequestArguments& arguments) {
  AddTokenFileOption(command, arguments.presentedTokenFile);
  AddStsCertificateOption(command, arguments.stsCertificateFiles);
}

Command AddPasswordRequest(CLI::App& parent) {
  const Arguments arguments = std::make_shared<RequestArguments>();
  CLI::App* const command = parent.add_subcommand("password", "The request of acquire password");
  command->add_option("--user", arguments->userName, "The user, as name@domain")
      ->required()
      ->type_name("NAME");
  AddPasswordOptions(*command, arguments->password);
  command->add_flag("--reveal", arguments->reveal, "Show the password, also in the file of --out");
  AddHolderOfKeyOptions(*command, arguments->holderOfKey, false);
  AddTokenOptions(*command, arguments->token);
  AddBearerOption(*command, arguments->token);
  command->footer(
      "Without --reveal the password is shown as ******** and need not be given. No signature covers it.\n\n"
      "Examples:\n"
      "  quorlin request password --user alice@example.com --lifetime 3600\n"
      "  quorlin request password --user alice@example.com --password-file secret.txt --reveal --out request.xml");
  return MakeCommand(command, arguments, BuildByPassword);
}

Command AddCertificateRequest(CLI::App& parent) {
  const Arguments arguments = std::make_shared<RequestArguments>();
  CLI::App* const command = parent.add_subcommand("certificate", "The request of acquire certificate");
  AddHolderOfKeyOptions(*command, arguments->holderOfKey, true);
  AddTokenOptions(*command, arguments->token);
  command->footer(
      "Example:\n"
      "  quorlin request certificate --cert me.pem --key me.key");
  return MakeCommand(command, arguments, BuildByCertificate);
}

Command AddExchangeRequest(CLI::App& parent) {
  const Arguments arguments = std::make_shared<RequestArguments>();
  CLI::App* const command = parent.add_subcommand("exchange", "The request of acquire token");
  AddPresentedTokenOptions(*command, *arguments);
  AddHolderOfKeyOptions(*command, arguments->holderOfKey, true);
  AddTokenOptions(*command, arguments->token);
  AddBearerOption(*command, arguments->token);
  command->footer(
      "Example:\n"
      "  quorlin request exchange --token token.xml --sts-cert sts.pem --cert me.pem --key me.key \\\n"
      "      --delegate-to bob@example.com");
  return MakeCommand(command, arguments, BuildExchange);
}

Command AddRenewRequest(CLI::App& parent) {
  const Arguments arguments = std::make_shared<RequestArguments>();
  CLI::App* const command = parent.add_subcommand("renew", "The request of renew");
  AddPresentedTokenOptions(*command, *arguments);
  AddHolderOfKeyOptions(*command, arguments->holderOfKey, true);
  AddLifetimeOption(*command, arguments->token);
  command->footer(
      "Example:\n"
      "  quorlin request renew --token token.xml --sts-cert sts.pem --cert me.pem --key me.key --lifetime 3600");
  return MakeCommand(command, arguments, BuildRenewal);
}

Command AddValidateRequest(CLI::App& parent) {
  const Arguments arguments = std::make_shared<RequestArguments>();
  CLI::App* const command = parent.add_subcommand("validate", "The request of validate");
  AddPresentedTokenOptions(*command, *arguments);
  command->footer(
      "Example:\n"
      "  quorlin request validate --token token.xml --sts-cert sts.pem");
  return MakeCommand(command, arguments, BuildValidation);
}

Command AddNegotiationRequest(CLI::App& parent) {
  const Arguments arguments = std::make_shared<RequestArguments>();
  CLI::App* const command = parent.add_subcommand("spnego", "The requests of a negotiation");
  AddHolderOfKeyOptions(*command, arguments->holderOfKey, false);
  AddTokenOptions(*command, arguments->token);
  AddBearerOption(*command, arguments->token);
  const std::vector<CLI::Option*> firstLegOnly =
      command->get_options([](const CLI::Option* option) { return option->get_name() != "--help"; });
  command->add_option("--leg", arguments->legFile, "What the mechanism wants to say; - is standard input")
      ->required()
      ->type_name("FILE");
  command->add_flag("--base64", arguments->isLegBase64, "The file of --leg holds base64 text");
  CLI::Option* const context =
      command
          ->add_option("--context", arguments->contextId,
                       "Make a further leg of the negotiation to which the service gave this name")
          ->type_name("ID");
  for (CLI::Option* const option : firstLegOnly) {
    context->excludes(option);
  }
  command->footer(
      "Without --context it is the first leg, which says what the token shall be.\n\n"
      "Examples:\n"
      "  quorlin request spnego --leg first.bin --lifetime 3600\n"
      "  quorlin request spnego --leg second.b64 --base64 --context urn:uuid:6c2f0ae3");
  return MakeCommand(command, arguments, BuildNegotiation);
}

}  // namespace

std::vector<Command> AddRequestCommands(CLI::App& app) {
  CLI::App* const request =
      app.add_subcommand("request", "Show a request without sending it, to see what a service is told");
  request->require_subcommand(1);
  request->footer(
      "Prints the HTTP header SOAPAction and the SOAP envelope. A request is good for ten minutes. Whoever has one\n"
      "with a token, a signature or a negotiation's leg in it can send it: keep it to yourself.\n\n"
      "quorlin request COMMAND --help tells more about each.");
  return {AddPasswordRequest(*request), AddCertificateRequest(*request), AddExchangeRequest(*request),
          AddRenewRequest(*request),    AddValidateRequest(*request),    AddNegotiationRequest(*request)};
}

}  // namespace Cli
