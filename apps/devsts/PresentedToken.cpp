// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/PresentedToken.h"

#include "devsts/Fault.h"
#include "devsts/Uris.h"
#include "devsts/XmlReading.h"

#include <pelmar/StringUtil.h>
#include <pelmar/xml/QName.h>
#include <pelmar/xml/security/Exceptions.h>
#include <pelmar/xml/security/KeyInfoResolver.h>
#include <pelmar/xml/security/Signature.h>

namespace DevSts {

using Pelmar::Ref;
using Pelmar::Crypto::Certificate;
using Pelmar::Xml::ElementNode;
namespace Security = Pelmar::Xml::Security;

namespace {

const ElementNode& GetSamlChild(const ElementNode& parent, const char* name) {
  return GetOnlyChild(parent, kSamlNs, name);
}

void RequireSigned(ElementNode& assertion, const Ref<const Certificate>& signer) {
  ElementNode& element = GetOnlyChild(assertion, kDigitalSignatureNs, "Signature");
  Ref<Security::Signature> signature;
  Security::CreateSignatureFromDom(&assertion, &element, signature);
  const std::string uri = "#" + GetRequiredAttribute(assertion, "ID");
  if (signature->GetReferences().size() != 1 || signature->GetReferences().front()->GetUri() != uri) {
    throw TokenException("The token's signature does not cover it");
  }
  const Ref<Security::KeyInfoResolver> resolver = Security::CreateTrustChainKeyResolver({signer});
  if (!signature->Verify(resolver.Get())) {
    throw TokenException("The token was changed");
  }
}

long long ReadInstant(const ElementNode& element, const char* name) {
  return Pelmar::System::DateTime(GetRequiredAttribute(element, name)).GetUtcTime();
}

void RequireValidNow(const AssertionContent& content, long long now) {
  if (now < content.notBefore || now >= content.notOnOrAfter) {
    throw TokenException("The token is not valid now");
  }
}

unsigned ReadCount(const ElementNode& element) {
  return static_cast<unsigned>(std::stoul(GetRequiredAttribute(element, "Count")));
}

void ReadDelegates(const ElementNode& condition, AssertionContent& content) {
  for (const ElementNode* const link : GetChildElements(condition)) {
    content.delegates.push_back(
        {GetTextOf(GetSamlChild(*link, "NameID")), ReadInstant(*link, "DelegationInstant")});
  }
}

/// The service itself wrote the type, so its local name is enough to tell the two apart.
void ReadCondition(const ElementNode& condition, AssertionContent& content) {
  std::string type;
  condition.GetAttribute(Pelmar::Xml::QName(kSchemaInstanceNs, "type"), type);
  if (type == "ext:RenewRestrictionType") {
    content.renewCount = ReadCount(condition);
  } else if (type == "del:DelegationRestrictionType") {
    ReadDelegates(condition, content);
  }
}

void ReadConditions(const ElementNode& conditions, AssertionContent& content) {
  content.notBefore = ReadInstant(conditions, "NotBefore");
  content.notOnOrAfter = ReadInstant(conditions, "NotOnOrAfter");
  for (const ElementNode* const child : GetChildElements(conditions)) {
    if (Is(*child, kSamlNs, "ProxyRestriction")) {
      content.proxyCount = ReadCount(*child);
    } else if (Is(*child, kSamlNs, "Condition")) {
      ReadCondition(*child, content);
    } else {
      for (const ElementNode* const audience : GetChildElements(*child)) {
        content.audience.push_back(GetTextOf(*audience));
      }
    }
  }
}

void ReadSubject(const ElementNode& subject, AssertionContent& content) {
  content.upn = GetTextOf(GetSamlChild(subject, "NameID"));
  const ElementNode& confirmation = GetSamlChild(subject, "SubjectConfirmation");
  if (GetRequiredAttribute(confirmation, "Method") != kHolderOfKeyMethod) {
    return;
  }
  const ElementNode& data = GetSamlChild(confirmation, "SubjectConfirmationData");
  const ElementNode& keyInfo = GetOnlyChild(data, kDigitalSignatureNs, "KeyInfo");
  const ElementNode& x509Data = GetOnlyChild(keyInfo, kDigitalSignatureNs, "X509Data");
  const ElementNode& certificate = GetOnlyChild(x509Data, kDigitalSignatureNs, "X509Certificate");
  content.confirmationCertificate =
      Pelmar::Crypto::CreateCertificateFromDer(Pelmar::StringUtil::Base64Decode(GetTextOf(certificate)));
}

void ReadAdvice(const ElementNode& advice, AssertionContent& content) {
  for (const ElementNode* const element : GetChildElements(advice)) {
    AdviceBlock block;
    block.source = GetRequiredAttribute(*element, "AdviceSource");
    for (const ElementNode* const attribute : GetChildElements(*element)) {
      AdviceItem item;
      item.name = GetRequiredAttribute(*attribute, "Name");
      for (const ElementNode* const value : GetChildElements(*attribute)) {
        item.values.push_back(GetTextOf(*value));
      }
      block.items.push_back(item);
    }
    content.advice.push_back(block);
  }
}

AssertionContent ReadContent(const ElementNode& assertion) {
  AssertionContent content;
  ReadSubject(GetSamlChild(assertion, "Subject"), content);
  ReadConditions(GetSamlChild(assertion, "Conditions"), content);
  const ElementNode* const advice = FindOnlyChild(assertion, kSamlNs, "Advice");
  if (advice != nullptr) {
    ReadAdvice(*advice, content);
  }
  const ElementNode& statement = GetSamlChild(assertion, "AuthnStatement");
  content.authenticated = ReadInstant(statement, "AuthnInstant");
  content.authnContext =
      GetTextOf(GetSamlChild(GetSamlChild(statement, "AuthnContext"), "AuthnContextClassRef"));
  return content;
}

}  // namespace

AssertionContent ReadPresentedToken(ElementNode& assertion, const Ref<const Certificate>& signer,
                                    long long now) {
  try {
    RequireSigned(assertion, signer);
    const AssertionContent content = ReadContent(assertion);
    RequireValidNow(content, now);
    return content;
  } catch (const Fault& fault) {
    throw TokenException(std::string("The token is none of this service: ") + fault.what());
  } catch (const Pelmar::Exception& e) {
    throw TokenException(std::string("The token is none of this service: ") + e.what());
  }
}

}  // namespace DevSts
