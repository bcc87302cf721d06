// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Terminal.h"
#include "quorlin/XmlFile.h"
#include "quorlin/doctor/Question.h"
#include "quorlin/doctor/Steps.h"

#include <pelmar/StringUtil.h>
#include <pelmar/xml/Parser.h>

namespace Cli {
namespace Doctor {

namespace {

using Pelmar::Xml::ElementNode;

constexpr const char* kAdvice =
    "Correct --url: something else than a token service answers there, a web page or a proxy perhaps.";
constexpr const char* kSoap12Advice =
    "Look for the service's address for SOAP 1.1: this library does not speak SOAP 1.2.";

/// For texts of the answer that are shown.
constexpr std::size_t kMaxTextBytes = 300;
/// An HTML page says so early.
constexpr std::size_t kMaxHtmlSearchBytes = 1024;

std::string Shorten(const std::string& text) {
  return CutText(text, kMaxTextBytes);
}

bool IsHtml(const Findings& findings) {
  std::string type;
  findings.response->GetHeader("Content-Type", type);
  const std::string start = Pelmar::StringUtil::ToLower(findings.body.substr(0, kMaxHtmlSearchBytes));
  return Pelmar::StringUtil::ToLower(type).compare(0, 9, "text/html") == 0 ||
         start.find("<!doctype html") != std::string::npos || start.find("<html") != std::string::npos;
}

std::string GetName(const ElementNode& element) {
  const std::string* const uri = element.FindNamespaceUri(element.GetPrefix());
  return element.GetLocalName() + (uri == nullptr ? " without a namespace" : " of the namespace " + *uri);
}

void NoteTimestamp(const ElementNode& envelope, Findings& findings) {
  const ElementNode* const header = envelope.FindChildElement(kSoapNs, "Header");
  const ElementNode* const timestamp =
      header == nullptr ? nullptr : FindElement(*header, kUtilityNs, "Timestamp");
  const ElementNode* const created =
      timestamp == nullptr ? nullptr : timestamp->FindChildElement(kUtilityNs, "Created");
  if (created == nullptr) {
    return;
  }
  try {
    findings.answerCreated = Pelmar::System::DateTime(GetTrimmedText(*created)).GetUtcTime();
  } catch (const Pelmar::System::DateFormatException&) {
    // No date, no comparison.
  }
}

std::string GetChildText(const ElementNode& element, const std::string& localName) {
  const ElementNode* const child = element.FindChildElement(localName);
  return child == nullptr ? "" : Shorten(GetTrimmedText(*child));
}

Outcome DescribeBody(const ElementNode& body) {
  const ElementNode* const fault = body.FindChildElement(kSoapNs, "Fault");
  if (fault == nullptr) {
    return Pass("a SOAP answer without fault");
  }
  const std::string code = GetChildText(*fault, "faultcode");
  const std::string text = GetChildText(*fault, "faultstring");
  Outcome outcome = Pass("a SOAP fault, as it must be without credentials: " + code +
                         (text.empty() ? "" : ", \"" + text + "\""));
  outcome.data["faultcode"] = code;
  outcome.data["faultstring"] = text;
  return outcome;
}

Outcome Judge(const ElementNode& root, Findings& findings) {
  if (Is(root, kSoap12Ns, "Envelope")) {
    return Fail(EXIT_REFUSED, "the answer is SOAP 1.2", kSoap12Advice);
  }
  if (!Is(root, kSoapNs, "Envelope")) {
    return Fail(EXIT_REFUSED, "the answer is XML, but not SOAP: an element " + Shorten(GetName(root)),
                kAdvice);
  }
  const ElementNode* const body = root.FindChildElement(kSoapNs, "Body");
  if (body == nullptr) {
    return Fail(EXIT_REFUSED, "the answer is a SOAP envelope without a Body", kAdvice);
  }
  NoteTimestamp(root, findings);
  return DescribeBody(*body);
}

}  // namespace

Outcome CheckSoap(const Patient&, Findings& findings) {
  if (findings.body.empty()) {
    return Fail(EXIT_REFUSED, "the answer is empty", kAdvice);
  }
  try {
    const Pelmar::Ref<Pelmar::Xml::Document> document = ParseXml(findings.body);
    if (!IsHtml(findings)) {
      return Judge(*document->GetDocumentElement(), findings);
    }
  } catch (const Pelmar::Xml::XMLParseException& e) {
    if (!IsHtml(findings)) {
      return Fail(EXIT_REFUSED, std::string("the answer is not XML: ") + e.what(), kAdvice);
    }
  }
  return Fail(EXIT_REFUSED, "the answer is a web page (HTML), not SOAP", kAdvice);
}

}  // namespace Doctor
}  // namespace Cli
