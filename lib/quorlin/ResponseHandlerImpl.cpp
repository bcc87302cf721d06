// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/ResponseHandlerImpl.h"

#include <pelmar/Exception.h>
#include <pelmar/Ref.h>
#include <pelmar/StringUtil.h>
#include <pelmar/Verify.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/QName.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>
#include <quorlin/Exceptions.h>

#include <initializer_list>

#include "quorlin/Namespaces.h"
#include "quorlin/xmlReading.h"

namespace Quorlin {

namespace Xml = Pelmar::Xml;

namespace {

constexpr const char* kSource = "lib/quorlin/ResponseHandlerImpl";

// The one message of every mismatch inside the Body.
constexpr const char* kUnexpectedFormat = "Unexpected XML format";

constexpr const char* kBody = "Body";
constexpr const char* kResponse = "RequestSecurityTokenResponse";
constexpr const char* kResponseCollection = "RequestSecurityTokenResponseCollection";
constexpr const char* kRequestedToken = "RequestedSecurityToken";
constexpr const char* kAssertion = "Assertion";

// Fault codes by which the service says that the credentials were rejected (WS-Trust 1.3, section 11;
// WS-Security 1.1, section 12).
struct FaultCode {
  const char* namespaceUri;
  const char* localName;
};
constexpr FaultCode kCredentialFaults[] = {
    {kWst, "FailedAuthentication"},
    {kWst, "InvalidSecurityToken"},
    {kWsse, "InvalidSecurityToken"},
};

[[noreturn]] void RefuseFormat() {
  throw SsoException(kUnexpectedFormat);
}

// The service is trusted for what it says, not for the namespaces it says it in: the elements are known by
// their local names. What matters, the assertion, is checked by its signature.
const Xml::ElementNode* FindDescendant(const Xml::ElementNode* element,
                                       std::initializer_list<const char*> path) {
  for (const char* localName : path) {
    if (element == nullptr) {
      return nullptr;
    }
    element = element->FindChildElement(localName);
  }
  return element;
}

const Xml::ElementNode* RequireDescendant(const Xml::ElementNode* element,
                                          std::initializer_list<const char*> path) {
  const Xml::ElementNode* const found = FindDescendant(element, path);
  if (found == nullptr) {
    RefuseFormat();
  }
  return found;
}

std::string ChildText(const Xml::ElementNode* element, const char* localName) {
  return GetText(GetTextNode(element->FindChildElement(localName)));
}

bool IsCredentialFault(const Xml::QName& code) {
  for (const FaultCode& known : kCredentialFaults) {
    if (code.GetNamespace() == known.namespaceUri && code.GetLocalName() == known.localName) {
      return true;
    }
  }
  return false;
}

[[noreturn]] void ThrowFault(const Xml::ElementNode* fault) {
  const Xml::ElementNode* const codeElement = fault->FindChildElement("faultcode");
  const Xml::TextNode* const codeText = GetTextNode(codeElement);
  if (codeText == nullptr) {
    throw SsoException("Invalid SOAP response: missing faultcode.");
  }
  Xml::QName code;
  ResolveQName(codeElement, GetText(codeText), kSoapEnv, code);
  if (!IsCredentialFault(code)) {
    throw SsoException("Unexpected SOAP fault: " + GetText(codeText) + "; request failed.");
  }
  const std::string reason = ChildText(fault, "faultstring");
  throw InvalidCredentialsException("Authentication failed" +
                                    (reason.empty() ? std::string() : ": " + reason));
}

Pelmar::Ref<Xml::Document> ParseResponse(Pelmar::Reader* response) {
  Pelmar::Ref<Xml::Document> document;
  try {
    ParseXML(response, document);
  } catch (const Xml::XMLParseException& error) {
    throw SsoException(std::string("Response is not well-formed XML: ") + error.what());
  }
  return document;
}

// What all answers have in common. A fault is looked for before the Body's content is, so that an answer with
// a fault never passes for a malformed one.
template <typename Result>
Result ProcessResponseWith(Pelmar::Reader* response, Result (*extract)(const Xml::ElementNode* body)) {
  const Pelmar::Ref<Xml::Document> document = ParseResponse(response);
  const Xml::ElementNode* const envelope = document->GetDocumentElement();
  CheckForFault(envelope);
  const Xml::ElementNode* const body = envelope->FindChildElement(kBody);
  if (body == nullptr) {
    throw SsoException("Unexpected response format: missing SAOP Body.");
  }
  return extract(body);
}

// Inclusive canonical XML takes along the namespace declarations of the envelope, so the text stands on its
// own and the assertion's enveloped signature can be checked in it.
std::string ToCanonicalText(const Xml::ElementNode* assertion) {
  const Pelmar::Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  Xml::Security::CreateCanonicalizer(Xml::Security::kC14n)->Canonicalize(assertion, writer.Get());
  return writer->GetText();
}

std::string ExtractIssuedToken(const Xml::ElementNode* body) {
  return ToCanonicalText(
      RequireDescendant(body, {kResponseCollection, kResponse, kRequestedToken, kAssertion}));
}

std::string ExtractRenewedToken(const Xml::ElementNode* body) {
  return ToCanonicalText(RequireDescendant(body, {kResponse, kRequestedToken, kAssertion}));
}

bool ExtractVerdict(const Xml::ElementNode* body) {
  const Xml::TextNode* const code = GetTextNode(RequireDescendant(body, {kResponse, "Status", "Code"}));
  if (code == nullptr) {
    RefuseFormat();
  }
  const std::string verdict = GetText(code);
  if (verdict == std::string(kWst) + "/status/valid") {
    return true;
  }
  if (verdict == std::string(kWst) + "/status/invalid") {
    return false;
  }
  RefuseFormat();
}

Leg DecodeLeg(const std::string& text) {
  try {
    return Pelmar::StringUtil::Base64Decode(text);
  } catch (const Pelmar::Base64FormatException&) {
    throw SsoException("Base64 format exception");
  }
}

std::string ExtractNegotiatedToken(const Xml::ElementNode* response) {
  const Xml::ElementNode* const assertion = RequireDescendant(response, {kRequestedToken, kAssertion});
  const std::string tokenType = ChildText(response, "TokenType");
  if (tokenType != kSaml) {
    throw SsoException("Invalid token type: " + tokenType + " (expected: " + kSaml + ")");
  }
  return ToCanonicalText(assertion);
}

// One round of a negotiation (WS-Trust 1.3, section 8): a challenge comes bare and must say something; the
// last answer comes in a collection and brings the token, perhaps with the service's last message.
SPNegoResponse ExtractRound(const Xml::ElementNode* body) {
  const Xml::ElementNode* const challenge = body->FindChildElement(kResponse);
  const bool isFinal = challenge == nullptr;
  const Xml::ElementNode* const response =
      isFinal ? RequireDescendant(body, {kResponseCollection, kResponse}) : challenge;

  SPNegoResponse round;
  if (!response->GetAttribute("Context", round.contextId)) {
    RefuseFormat();
  }
  const std::string exchange = ChildText(response, "BinaryExchange");
  if (exchange.empty() && !isFinal) {
    RefuseFormat();
  }
  if (!exchange.empty()) {
    round.leg = DecodeLeg(exchange);
  }
  if (isFinal) {
    round.token = ExtractNegotiatedToken(response);
  }
  return round;
}

}  // namespace

void ResponseHandlerImpl::HandleAcquireTokenResponse(Pelmar::Reader* response, std::string& token) const {
  token = ProcessResponseWith(response, &ExtractIssuedToken);
}

bool ResponseHandlerImpl::HandleValidateSubjectResponse(Pelmar::Reader* response) const {
  return ProcessResponseWith(response, &ExtractVerdict);
}

void ResponseHandlerImpl::HandleRenewTokenResponse(Pelmar::Reader* response, std::string& token) const {
  token = ProcessResponseWith(response, &ExtractRenewedToken);
}

void ResponseHandlerImpl::HandleSPNegoResponse(Pelmar::Reader* response, SPNegoResponse& result) const {
  result = ProcessResponseWith(response, &ExtractRound);
}

void CheckForFault(const Xml::ElementNode* rootNode) {
  Pelmar::Verify(rootNode != nullptr, "rootNode != __null", kSource);
  const Xml::ElementNode* const fault = FindDescendant(rootNode, {kBody, "Fault"});
  if (fault != nullptr) {
    ThrowFault(fault);
  }
}

}  // namespace Quorlin
