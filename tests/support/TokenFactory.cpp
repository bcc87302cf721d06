// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/TokenFactory.h"

#include "quorlin/Namespaces.h"
#include "support/Verdict.h"
#include "support/XmlText.h"

#include <pelmar/StringUtil.h>

#include <algorithm>
#include <stdexcept>

namespace TestSupport {

using Pelmar::Xml::ElementNode;

// --- Composing ---

namespace {

// What Compose declares anyway when a test leaves the declarations alone.
std::string Declaration(const char* prefix, const char* uri) {
  return std::string(" xmlns:") + prefix + "=\"" + uri + "\"";
}

}  // namespace

TokenText::TokenText()
    : declarations(Declaration("saml", Quorlin::kSaml) + Declaration("xs", Quorlin::kXs) +
                   Declaration("xsi", Quorlin::kXsi) + Declaration("del", Quorlin::kSamlDelegation) +
                   Declaration("ext", Quorlin::kSamlExt)),
      issueInstant(SecondsFromNow(-60)),
      issuer(
          "<saml:Issuer Format=\"urn:oasis:names:tc:SAML:2.0:nameid-format:entity\">https://sts.example/</saml:Issuer>"),
      nameId(NameIdElement(kTokenSubject)),
      method("urn:oasis:names:tc:SAML:2.0:cm:bearer"),
      notBefore(issueInstant),
      notOnOrAfter(SecondsFromNow(3600)),
      authnStatement("<saml:AuthnStatement AuthnInstant=\"" + issueInstant +
                     "\"><saml:AuthnContext><saml:AuthnContextClassRef>"
                     "urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport"
                     "</saml:AuthnContextClassRef></saml:AuthnContext></saml:AuthnStatement>") {}

void TokenText::HoldKey(const Identity& holder) {
  method = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";
  confirmationData = HolderOfKeyData(holder);
}

std::string TokenText::Compose() const {
  const std::string& bearerEnd = confirmationEnd.empty() ? notOnOrAfter : confirmationEnd;
  const std::string bearerData = "<saml:SubjectConfirmationData NotOnOrAfter=\"" + bearerEnd + "\"/>";
  return prolog + "<saml:Assertion" + declarations + " Version=\"" + version + "\" ID=\"" + id +
         "\" IssueInstant=\"" + issueInstant + "\"" + furtherAttributes + ">" + issuer + signature +
         "<saml:Subject>" + nameId + "<saml:SubjectConfirmation Method=\"" + method + "\">" + delegateId +
         (confirmationData.empty() ? bearerData : confirmationData) +
         "</saml:SubjectConfirmation></saml:Subject>" + "<saml:Conditions NotBefore=\"" + notBefore +
         "\" NotOnOrAfter=\"" + notOnOrAfter + "\">" + restrictions + "</saml:Conditions>" + advice +
         authnStatement +
         (attributes.empty() ? "" : "<saml:AttributeStatement>" + attributes + "</saml:AttributeStatement>") +
         tail + "</saml:Assertion>";
}

std::string SecondsFromNow(long long seconds) {
  constexpr long long kMicrosecondsPerSecond = 1000000;
  const long long now = Pelmar::System::GetUtcDateTime().GetUtcTime();
  return Pelmar::System::DateTimeFromUtc(now + seconds * kMicrosecondsPerSecond, false).ToString();
}

std::string NameIdElement(const std::string& content) {
  return NameIdElement(Quorlin::kClaimUpn, content);
}

std::string NameIdElement(const std::string& format, const std::string& content) {
  return "<saml:NameID Format=\"" + format + "\">" + content + "</saml:NameID>";
}

std::string AttributeElement(const std::string& name, const std::vector<std::string>& values) {
  std::string text = "<saml:Attribute Name=\"" + name + "\">";
  for (const std::string& value : values) {
    text += "<saml:AttributeValue xsi:type=\"xs:string\">" + value + "</saml:AttributeValue>";
  }
  return text + "</saml:Attribute>";
}

std::string ProxyRestriction(const std::string& attributes) {
  return "<saml:ProxyRestriction " + attributes + "/>";
}

std::string RenewRestriction(const std::string& attributes) {
  return "<saml:Condition xsi:type=\"ext:RenewRestrictionType\" " + attributes + "/>";
}

std::string DelegationRestriction(const std::string& delegates) {
  return "<saml:Condition xsi:type=\"del:DelegationRestrictionType\">" + delegates + "</saml:Condition>";
}

std::string DelegateElement(const std::string& instant, const std::string& nameId) {
  return "<del:Delegate DelegationInstant=\"" + instant + "\">" + nameId + "</del:Delegate>";
}

std::string HolderOfKeyData(const Identity& holder) {
  return "<saml:SubjectConfirmationData xsi:type=\"saml:KeyInfoConfirmationDataType\">"
         "<ds:KeyInfo xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"><ds:X509Data><ds:X509Certificate>" +
         Base64Of(holder) + "</ds:X509Certificate></ds:X509Data></ds:KeyInfo></saml:SubjectConfirmationData>";
}

std::string Base64Of(const Identity& identity) {
  return Pelmar::StringUtil::Base64Encode(identity.certificate->GetDer());
}

std::string ReplaceOnce(const std::string& text, const std::string& from, const std::string& to) {
  const std::size_t at = text.find(from);
  if (at == std::string::npos || text.find(from, at + 1) != std::string::npos) {
    throw std::runtime_error("not exactly once in the text: " + from);
  }
  return text.substr(0, at) + to + text.substr(at + from.size());
}

std::string PlaceOf(const std::string& text, const std::string& part) {
  const std::size_t at = text.find(part);
  if (at == std::string::npos) {
    throw std::runtime_error("not in the text: " + part);
  }
  const std::string before = text.substr(0, at);
  const std::size_t lineStart = before.rfind('\n') + 1;  // npos + 1 is 0: the first line.
  const auto line = 1 + std::count(before.begin(), before.end(), '\n');
  return " at line " + std::to_string(line) + ", column " + std::to_string(at - lineStart + 1);
}

// --- Reading ---

const Identity& TokenSigner() {
  static const Identity signer = MakeSelfSigned(CertificateSpec());
  return signer;
}

std::string SignToken(const std::string& text) {
  return SignToken(text, TokenSigner());
}

std::string SignToken(const TokenText& text) {
  return SignToken(text.Compose());
}

boost::shared_ptr<Quorlin::SamlToken> ReadToken(const std::string& text) {
  return Quorlin::CreateSamlToken(text, Trust({TokenSigner()}));
}

boost::shared_ptr<Quorlin::SamlToken> ReadToken(const TokenText& text) {
  return ReadToken(SignToken(text));
}

std::string VerdictOnToken(const std::string& text) {
  return VerdictOnToken(text, Trust({TokenSigner()}));
}

std::string VerdictOnToken(const TokenText& text) {
  return VerdictOnToken(SignToken(text));
}

std::string VerdictOnToken(const std::string& text, const TrustList& trusted) {
  return VerdictOf([&] { Quorlin::CreateSamlToken(text, trusted); });
}

namespace {

Pelmar::Xml::Node* NextInDocumentOrder(Pelmar::Xml::Node* node) {
  if (node->GetFirstChild() != nullptr) {
    return node->GetFirstChild();
  }
  while (node != nullptr && node->GetNextSibling() == nullptr) {
    node = node->GetParent();
  }
  return node == nullptr ? nullptr : node->GetNextSibling();
}

template <typename Predicate>
ElementNode* FindElement(const Pelmar::Xml::Document& document, Predicate predicate) {
  Pelmar::Xml::Node* node = document.GetDocumentElement();
  while (node != nullptr) {
    ElementNode* const element = Pelmar::Xml::AsElement(node);
    if (element != nullptr && predicate(*element)) {
      return element;
    }
    node = NextInDocumentOrder(node);
  }
  return nullptr;
}

bool HasId(const ElementNode& element, const std::string& id) {
  std::string value;
  return element.GetAttribute("ID", value) && value == id;
}

bool IsAssertion(const ElementNode& element) {
  const std::string* const uri = element.FindNamespaceUri(element.GetPrefix());
  return element.GetLocalName() == "Assertion" && uri != nullptr && *uri == Quorlin::kSaml;
}

}  // namespace

std::string VerdictOnEmbedded(const std::string& text, const std::string& id) {
  return VerdictOf([&] {
    const Pelmar::Ref<Pelmar::Xml::Document> document = ParseXmlText(text);
    ElementNode* assertion = FindElement(
        *document, [&](const ElementNode& element) { return IsAssertion(element) && HasId(element, id); });
    if (assertion == nullptr) {
      assertion = FindElement(*document, IsAssertion);
    }
    Quorlin::CreateSamlTokenFromDom(assertion, Trust({TokenSigner()}));
  });
}

}  // namespace TestSupport
