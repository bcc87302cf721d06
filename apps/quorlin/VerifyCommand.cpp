// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin verify: checks a token at hand.

#include "quorlin/Commands.h"
#include "quorlin/Files.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/XmlFile.h"
#include "quorlin/explain/ElementTrail.h"
#include "quorlin/explain/Explanation.h"

#include <pelmar/xml/Parser.h>
#include <quorlin/SamlToken.h>

#include <memory>

namespace Cli {

namespace {

/// More than anybody's clocks differ by, and far from the end of 64 bits of microseconds.
constexpr long long kMaxClockToleranceSec = 100LL * 365 * 24 * 60 * 60;

struct VerifyArguments {
  std::string file;
  std::vector<std::string> trustFiles;
  long long clockToleranceSec = 0;
  bool embedded = false;
  bool explain = false;
  OutputOptions output;
};

std::string ReadDocument(const VerifyArguments& arguments) {
  // One byte more than the parser takes, so that a larger file is its error and still never read whole.
  return ReadFileUpTo(arguments.file, Pelmar::Xml::kMaxDocumentBytes + 1);
}

boost::shared_ptr<const Quorlin::SamlToken> VerifyEmbedded(const std::string& xml, const Trust& trust,
                                                           long long clockToleranceSec) {
  const Pelmar::Ref<Pelmar::Xml::Document> document = ParseXml(xml);
  Pelmar::Xml::ElementNode* const assertion = FindAssertion(document->GetDocumentElement());
  if (assertion == nullptr) {
    throw Quorlin::ParseException("Expected element 'Assertion' not found.");
  }
  return Quorlin::CreateSamlTokenFromDom(assertion, trust, clockToleranceSec);
}

boost::shared_ptr<const Quorlin::SamlToken> Verify(const VerifyArguments& arguments) {
  const Trust trust = ReadCertificates(arguments.trustFiles);
  const std::string xml = ReadDocument(arguments);
  return arguments.embedded ? VerifyEmbedded(xml, trust, arguments.clockToleranceSec)
                            : Quorlin::CreateSamlToken(xml, trust, arguments.clockToleranceSec);
}

int ShowExplanation(const VerifyArguments& arguments) {
  try {
    const Explanation explanation = Explain({ReadDocument(arguments), ReadCertificates(arguments.trustFiles),
                                             arguments.clockToleranceSec, arguments.embedded});
    Print(arguments.output.json ? ToText(ToJson(explanation)) + "\n" : DescribeExplanation(explanation));
    return explanation.failure ? explanation.failure->exitCode : EXIT_DONE;
  } catch (...) {
    return ShowFailure(arguments.output.json, EXIT_FAILED);
  }
}

}  // namespace

Command AddVerifyCommand(CLI::App& app) {
  const auto arguments = std::make_shared<VerifyArguments>();
  CLI::App* const command = app.add_subcommand("verify", "Check a token's form, dates and signature");
  command->add_option("file", arguments->file, "The token's XML; - is standard input")
      ->required()
      ->type_name("FILE");
  AddRepeatable(
      *command, "--trust", arguments->trustFiles,
      "Accept tokens signed with these certificates or by their authorities; without it, none. May be repeated")
      ->type_name("PEM");
  command
      ->add_option("--clock-tolerance", arguments->clockToleranceSec,
                   "Accept tokens that start this many seconds later or ended this many ago")
      ->type_name("SEC")
      ->check(CLI::Range(0LL, kMaxClockToleranceSec).description(""))
      ->capture_default_str();
  command->add_flag("--embedded", arguments->embedded,
                    "The file is a larger document (a SOAP answer, say); take its first SAML assertion");
  CLI::Option* const explain =
      command->add_flag("--explain", arguments->explain,
                        "Show every check, how it went, where in the file, and what to do about it");
  AddOutputOptions(*command, arguments->output);
  // An explanation is for reading; whoever wants the token's XML asks for the verdict alone.
  command->get_option("--out")->excludes(explain);
  AddLogOption(*command);
  command->footer(
      "Exit code 0: the token is good; 1: it is not; 2: a file or an argument cannot be used.\n\n"
      "Examples:\n"
      "  quorlin verify --trust sts.pem token.xml\n"
      "  quorlin verify --trust sts.pem --explain token.xml\n"
      "  quorlin verify --trust sts.pem --embedded --json - < answer.xml");
  return {command, [arguments] {
            if (arguments->explain) {
              return ShowExplanation(*arguments);
            }
            return ShowToken(arguments->output, "The token is valid", EXIT_REFUSED,
                             [&] { return Verify(*arguments); });
          }};
}

}  // namespace Cli
