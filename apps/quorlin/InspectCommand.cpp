// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin inspect: shows what an assertion claims, for people who look at a token that is refused. It gives
// no verdict.

#include "quorlin/Commands.h"
#include "quorlin/Files.h"
#include "quorlin/Outcome.h"
#include "quorlin/XmlFile.h"
#include "quorlin/inspect/Claims.h"
#include "quorlin/inspect/ClaimsText.h"

#include <pelmar/xml/Parser.h>
#include <quorlin/Exceptions.h>

#include <iostream>
#include <memory>

namespace Cli {

namespace {

using Pelmar::Xml::ElementNode;

constexpr const char* kFirstLine =
    "NOT VERIFIED: what follows is what the document claims; nobody has checked it.\n";
constexpr const char* kLastLine =
    "NOT VERIFIED: anybody can write such a document. quorlin verify tells whether the token is good.\n";

constexpr const char* kAdvice = "Give a token, or an answer that holds one, as XML in UTF-8.";

struct InspectArguments {
  std::string file;
  bool json = false;
};

const ElementNode& FindAssertion(const ElementNode& root) {
  if (const ElementNode* const assertion = FindElement(root, Inspect::kSamlNs, "Assertion")) {
    return *assertion;
  }
  const bool isEncrypted = FindElement(root, Inspect::kSamlNs, "EncryptedAssertion") != nullptr;
  throw Quorlin::ParseException(isEncrypted ? "the document holds no SAML 2.0 assertion but an encrypted one"
                                            : "the document holds no SAML 2.0 assertion");
}

void Show(const InspectArguments& arguments) {
  // One byte more than the parser takes, so that a larger file is its error and still never read whole.
  const std::string xml = ReadFileUpTo(arguments.file, Pelmar::Xml::kMaxDocumentBytes + 1);
  const Pelmar::Ref<Pelmar::Xml::Document> document = ParseXml(xml);
  const ElementNode& assertion = FindAssertion(*document->GetDocumentElement());
  const Json claims = Inspect::ReadClaims(assertion);
  if (arguments.json) {
    Print(ToAsciiText({{"verified", false},
                       {"line", assertion.GetLine()},
                       {"column", assertion.GetColumn()},
                       {"claims", claims}}) +
          "\n");
    return;
  }
  Print(kFirstLine + ("Assertion at line " + std::to_string(assertion.GetLine())) + ", column " +
        std::to_string(assertion.GetColumn()) + "\n" +
        Inspect::PrintClaims(claims, Pelmar::System::GetUtcDateTime()) + kLastLine);
}

/// Not as other commands do: "valid" would look like a verdict here.
int ReportFailure(bool json) {
  Failure failure = DescribeCurrentException(EXIT_REFUSED);
  if (failure.exitCode == EXIT_REFUSED) {
    failure.advice = kAdvice;
  }
  if (json) {
    Print(ToAsciiText(
              {{"verified", false}, {"error", {{"type", failure.type}, {"message", failure.message}}}}) +
          "\n");
  } else {
    PrintFailure(failure);
  }
  return failure.exitCode;
}

int Run(const InspectArguments& arguments) {
  try {
    Show(arguments);
    return EXIT_DONE;
  } catch (...) {
    return ReportFailure(arguments.json);
  }
}

}  // namespace

Command AddInspectCommand(CLI::App& app) {
  const auto arguments = std::make_shared<InspectArguments>();
  CLI::App* const command =
      app.add_subcommand("inspect", "Show what a token claims, without checking any of it");
  command
      ->add_option(
          "file", arguments->file,
          "XML with a SAML 2.0 assertion anywhere in it, the first of which is shown; - is standard input")
      ->required()
      ->type_name("FILE");
  command->add_flag("--json", arguments->json, "Print one JSON object instead of lines");
  command->footer(
      "Nothing shown is verified, not even that there is a signature: use quorlin verify for that.\n\n"
      "Exit code 0: an assertion was shown; 1: there is none, or the document is no XML; 2: the file cannot be read.\n\n"
      "Examples:\n"
      "  quorlin inspect token.xml\n"
      "  quorlin inspect --json - < answer.xml");
  return {command, [arguments] {
            return Run(*arguments);
          }};
}

}  // namespace Cli
