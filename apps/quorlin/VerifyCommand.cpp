// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin verify: checks a token at hand.

#include "quorlin/Commands.h"
#include "quorlin/Files.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"

#include <pelmar/Reader.h>
#include <pelmar/xml/Parser.h>
#include <quorlin/SamlToken.h>

#include <memory>

namespace Cli {

namespace {

constexpr const char* kSamlNs = "urn:oasis:names:tc:SAML:2.0:assertion";

/// More than anybody's clocks differ by, and far from the end of 64 bits of microseconds.
constexpr long long kMaxClockToleranceSec = 100LL * 365 * 24 * 60 * 60;

struct VerifyArguments {
  std::string file;
  std::vector<std::string> trustFiles;
  long long clockToleranceSec = 0;
  bool embedded = false;
  OutputOptions output;
};

using Trust = std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>;

Pelmar::Ref<Pelmar::Xml::Document> Parse(const std::string& xml) {
  Pelmar::Ref<Pelmar::Object> result;
  Pelmar::Xml::CreateXMLParser(Pelmar::Xml::CreateXMLDocumentHandler())
      ->Parse(Pelmar::CreateStringReader(xml).Get(), result);
  return Pelmar::Xml::ViewAsDocument(result);
}

bool IsAssertion(const Pelmar::Xml::ElementNode& element) {
  const std::string* const uri = element.FindNamespaceUri(element.GetPrefix());
  return element.GetLocalName() == "Assertion" && uri != nullptr && *uri == kSamlNs;
}

/// The first assertion in document order; null when there is none. The parser bounds how deep this can go.
Pelmar::Xml::ElementNode* FindAssertion(Pelmar::Xml::ElementNode* element) {
  if (IsAssertion(*element)) {
    return element;
  }
  for (Pelmar::Xml::Node* child = element->GetFirstChildNode(); child != nullptr;
       child = child->GetNextSibling()) {
    Pelmar::Xml::ElementNode* const childElement = Pelmar::Xml::AsElement(child);
    Pelmar::Xml::ElementNode* const found = childElement == nullptr ? nullptr : FindAssertion(childElement);
    if (found != nullptr) {
      return found;
    }
  }
  return nullptr;
}

boost::shared_ptr<const Quorlin::SamlToken> VerifyEmbedded(const std::string& xml, const Trust& trust,
                                                           long long clockToleranceSec) {
  const Pelmar::Ref<Pelmar::Xml::Document> document = Parse(xml);
  Pelmar::Xml::ElementNode* const assertion = FindAssertion(document->GetDocumentElement());
  if (assertion == nullptr) {
    throw Quorlin::ParseException("Expected element 'Assertion' not found.");
  }
  return Quorlin::CreateSamlTokenFromDom(assertion, trust, clockToleranceSec);
}

boost::shared_ptr<const Quorlin::SamlToken> Verify(const VerifyArguments& arguments) {
  const Trust trust = ReadCertificates(arguments.trustFiles);
  // One byte more than the parser takes, so that a larger file is its error and still never read whole.
  const std::string xml = ReadFileUpTo(arguments.file, Pelmar::Xml::kMaxDocumentBytes + 1);
  return arguments.embedded ? VerifyEmbedded(xml, trust, arguments.clockToleranceSec)
                            : Quorlin::CreateSamlToken(xml, trust, arguments.clockToleranceSec);
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
      ->check(CLI::Range(0LL, kMaxClockToleranceSec))
      ->capture_default_str();
  command->add_flag("--embedded", arguments->embedded,
                    "The file is a larger document (a SOAP answer, say); take its first SAML assertion");
  AddOutputOptions(*command, arguments->output);
  AddLogOption(*command);
  command->footer(
      "Exit code 0: the token is good; 1: it is not; 2: a file or an argument cannot be used.\n\n"
      "Examples:\n"
      "  quorlin verify --trust sts.pem token.xml\n"
      "  quorlin verify --trust sts.pem --embedded --json - < answer.xml");
  return {command, [arguments] {
            return ShowToken(arguments->output, "The token is valid", EXIT_REFUSED,
                             [&] { return Verify(*arguments); });
          }};
}

}  // namespace Cli
