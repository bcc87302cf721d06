// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/AssertionParser.h"

#include "quorlin/Namespaces.h"
#include "quorlin/TokenValidation.h"

#include <pelmar/StringUtil.h>
#include <pelmar/xml/security/Algorithms.h>

namespace Quorlin {

using Pelmar::Xml::ElementNode;
using Pelmar::Xml::QName;
using Pelmar::Xml::Security::kSignatureNamespace;

namespace {

typedef std::vector<std::string> Names;
typedef std::vector<QName> QNames;

// Such lists are static where they are used: each costs an allocation, and an assertion has dozens of
// elements.
const Names kNone;

const char* const kBearerMethod = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
const char* const kHolderOfKeyMethod = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";

std::string AttributeValue(const ElementNode* element, const char* name) {
  std::string value;
  element->GetAttribute(name, value);
  return value;
}

// The element under `it`, which must have this name.
ElementNode* RequireElement(const NodeFilterIterator& it, const char* localName, const char* namespaceUri) {
  ElementNode* element = IteratorToElement(it);
  RequireElementQName(element, localName, namespaceUri);
  return element;
}

void RequireEnd(const NodeFilterIterator& it, const char* complaint) {
  if (it.node != nullptr) {
    throw ParseException(complaint);
  }
}

// An element that holds nothing but text and whose attributes do not matter.
const std::string& ParseTextElement(const NodeFilterIterator& it, const char* localName,
                                    const char* namespaceUri) {
  RequireElement(it, localName, namespaceUri);
  return RequireTextualContent(it);
}

SamlToken::ConfirmationType ParseConfirmationMethod(const std::string& method) {
  if (method == kBearerMethod) {
    return SamlToken::CONFIRM_BEARER;
  }
  if (method == kHolderOfKeyMethod) {
    return SamlToken::CONFIRM_HOLDER_OF_KEY;
  }
  throw ParseException("Unknown subject confirmation method: '" + method + "'");
}

void ParseBearerConfirmationData(const NodeFilterIterator& it, SubjectConfirmationDataType& data) {
  const ElementNode* element = IteratorToElement(it);
  static const Names kRequired{"NotOnOrAfter"};
  RequireElementAttributesNames(element, kRequired, kNone);
  RequireEmptyElement(it);
  GetDateAttribute(element, "NotOnOrAfter", data.NotOnOrAfter);
}

void ParseHolderOfKeyConfirmationData(const NodeFilterIterator& it, SubjectConfirmationDataType& data) {
  const ElementNode* element = IteratorToElement(it);
  static const QNames kRequired{kXsiType};
  static const QNames kAllowed{LocalName("NotOnOrAfter")};
  RequireElementAttributesQNames(element, kRequired, kAllowed);
  if (!ElementXsiTypeIs(element, kKeyInfoConfirmationDataType)) {
    std::string type;
    element->GetAttribute(kXsiType, type);
    throw ParseException("Invalid SubjectConfirmationData type: '" + type + "'");
  }
  NodeFilterIterator child = it.GetChild();
  ParseSubjectConfirmationDataKeyInfoElement(child, data);
  RequireEnd(child.MoveToSibling(), "Unexpected elements after SubjectConfirmationData/KeyInfo");
}

void ParseX509CertificateElement(const NodeFilterIterator& it, SubjectConfirmationDataType& data) {
  RequireNoAttributes(RequireElement(it, "X509Certificate", kSignatureNamespace));
  std::string base64;
  RequireTextualContent(it, base64);
  data.KeyInfoCertificate =
      Pelmar::Crypto::CreateCertificateFromDer(Pelmar::StringUtil::Base64Decode(base64));
}

void ParseX509DataElement(const NodeFilterIterator& it, SubjectConfirmationDataType& data) {
  RequireNoAttributes(RequireElement(it, "X509Data", kSignatureNamespace));
  NodeFilterIterator child = it.GetChild();
  ParseX509CertificateElement(child, data);
  RequireEnd(child.MoveToSibling(), "Unexpected elements after X509Certificate");
}

// A condition of an extension type: its element name is the same for all, xsi:type tells them apart.
bool IsConditionOfType(const NodeFilterIterator& it, const QName& type) {
  const ElementNode* element = IteratorToElement(it);
  return ElementQNameIs(element, "Condition", kSaml) && ElementXsiTypeIs(element, type);
}

// Reads the restriction under `it`, whichever it is, and moves on. False when it is none that is still
// allowed.
bool TryParseRestriction(NodeFilterIterator& it, ConditionsType& conditions) {
  const Pelmar::Xml::Node* const before = it.node;
  if (!conditions.AudienceRestriction) {
    TryParseAudienceRestriction(it, conditions.AudienceRestriction);
  }
  if (it.node == before && !conditions.ProxyRestriction) {
    TryParseProxyRestriction(it, conditions.ProxyRestriction);
  }
  if (it.node == before && !conditions.RenewRestriction) {
    TryParseRenewRestriction(it, conditions.RenewRestriction);
  }
  if (it.node == before && !conditions.DelegationRestriction) {
    TryParseDelegationRestriction(it, conditions.DelegationRestriction);
  }
  return it.node != before;
}

[[noreturn]] void ThrowUnknownRestriction(const NodeFilterIterator& it) {
  const ElementNode* element = IteratorToElement(it);
  throw ParseException("Unknown or duplicate restriction node under Conditions" +
                       (element == nullptr ? std::string() : ": " + element->GetLocalName()));
}

AdviceAttribute ToAdviceAttribute(AttributeType&& attribute) {
  return AdviceAttribute{std::move(attribute.Name),
                         std::vector<std::string>(attribute.Values.begin(), attribute.Values.end())};
}

void ParseAdviceElement(const NodeFilterIterator& it, AdviceType& advice) {
  RequireNoAttributes(IteratorToElement(it));
  NodeFilterIterator child = it.GetChild();
  do {
    advice.RSAAdvice.emplace_back();
    ParseRsaAdviceElement(child, advice.RSAAdvice.back());
  } while (child.MoveToSibling().node != nullptr);
}

}  // namespace

// --- Assertion ---

void ParseSamlAssertionElement(NodeFilterIterator it, SamlAssertionType& assertion) {
  ElementNode* element = RequireElement(it, "Assertion", kSaml);
  static const Names kRequired{"Version", "ID", "IssueInstant"};
  RequireElementAttributesNames(element, kRequired, kNone);
  assertion.Version = AttributeValue(element, "Version");
  assertion.ID = AttributeValue(element, "ID");
  GetDateAttribute(element, "IssueInstant", assertion.IssueInstant);

  it.MoveToChild();
  ParseSamlIssuerElement(it, assertion.Issuer);
  it.MoveToSibling();
  ParseTokenSignature(it, element, assertion.Signature);
  ParseSubjectElement(it, assertion.Subject);
  it.MoveToSibling();
  ParseConditionsElement(it, assertion.Conditions);
  it.MoveToSibling();
  TryParseAdviceElement(it, assertion.Advice);
  ParseAuthnStatementElement(it, assertion.AuthnStatement);
  it.MoveToSibling();
  if (ElementQNameIs(IteratorToElement(it), "AttributeStatement", kSaml)) {
    assertion.AttributeStatement = AttributeStatementType();
    ParseAttributeStatementElement(it, *assertion.AttributeStatement);
    it.MoveToSibling();
  }
  RequireEnd(it, "Unexpected elements under Assertion");
}

void ParseSamlIssuerElement(NodeFilterIterator it, NameIDType& issuer) {
  RequireElement(it, "Issuer", kSaml);
  ParseNameIDType(it, issuer);
}

void ParseNameIDType(NodeFilterIterator it, NameIDType& nameId) {
  const ElementNode* element = IteratorToElement(it);
  static const Names kRequired{"Format"};
  RequireElementAttributesNames(element, kRequired, kNone);
  nameId.first = AttributeValue(element, "Format");
  RequireTextualContent(it, nameId.second);
}

// --- Subject ---

void ParseSubjectElement(NodeFilterIterator it, SubjectType& subject) {
  RequireNoAttributes(RequireElement(it, "Subject", kSaml));
  it.MoveToChild();
  ParseSubjectNameIdElement(it, subject.NameID);
  it.MoveToSibling();
  ParseSubjectConfirmationElement(it, subject.SubjectConfirmation);
  RequireEnd(it.MoveToSibling(), "Unexpected elements after SubjectConfirmation");
}

void ParseSubjectNameIdElement(NodeFilterIterator it, NameIDType& nameId) {
  RequireElement(it, "NameID", kSaml);
  ParseNameIDType(it, nameId);
}

void ParseSubjectConfirmationElement(NodeFilterIterator it, SubjectConfirmationType& confirmation) {
  const ElementNode* element = RequireElement(it, "SubjectConfirmation", kSaml);
  static const Names kRequired{"Method"};
  RequireElementAttributesNames(element, kRequired, kNone);
  confirmation.Method = ParseConfirmationMethod(AttributeValue(element, "Method"));

  it.MoveToChild();
  if (ElementQNameIs(IteratorToElement(it), "NameID", kSaml)) {
    confirmation.DelegateId = NameIDType();
    ParseNameIDType(it, *confirmation.DelegateId);
    it.MoveToSibling();
  }
  ParseSubjectConfirmationDataElement(it, confirmation.Method, confirmation.SubjectConfirmationData);
  RequireEnd(it.MoveToSibling(), "Unexpected elements after SubjectConfirmationData");
}

void ParseSubjectConfirmationDataElement(NodeFilterIterator it, SamlToken::ConfirmationType method,
                                         SubjectConfirmationDataType& data) {
  RequireElement(it, "SubjectConfirmationData", kSaml);
  if (method == SamlToken::CONFIRM_BEARER) {
    ParseBearerConfirmationData(it, data);
  } else {
    ParseHolderOfKeyConfirmationData(it, data);
  }
}

void ParseSubjectConfirmationDataKeyInfoElement(NodeFilterIterator it, SubjectConfirmationDataType& data) {
  RequireNoAttributes(RequireElement(it, "KeyInfo", kSignatureNamespace));
  it.MoveToChild();
  ParseX509DataElement(it, data);
  RequireEnd(it.MoveToSibling(), "Unexpected elements after X509Data");
}

// --- Conditions ---

void ParseConditionsElement(NodeFilterIterator it, ConditionsType& conditions) {
  const ElementNode* element = RequireElement(it, "Conditions", kSaml);
  static const Names kRequired{"NotBefore", "NotOnOrAfter"};
  RequireElementAttributesNames(element, kRequired, kNone);
  GetDateAttribute(element, "NotBefore", conditions.NotBefore);
  GetDateAttribute(element, "NotOnOrAfter", conditions.NotOnOrAfter);
  it.MoveToChild();
  while (it.node != nullptr) {
    if (!TryParseRestriction(it, conditions)) {
      ThrowUnknownRestriction(it);
    }
  }
}

void TryParseAudienceRestriction(NodeFilterIterator& it,
                                 boost::optional<AudienceRestrictionType>& restriction) {
  if (!ElementQNameIs(IteratorToElement(it), "AudienceRestriction", kSaml)) {
    return;
  }
  AudienceRestrictionType parsed;
  NodeFilterIterator child = it.GetChild();
  do {
    parsed.Audience.insert(ParseTextElement(child, "Audience", kSaml));
  } while (child.MoveToSibling().node != nullptr);
  restriction = parsed;
  it.MoveToSibling();
}

void TryParseProxyRestriction(NodeFilterIterator& it, boost::optional<ProxyRestrictionType>& restriction) {
  const ElementNode* element = IteratorToElement(it);
  if (!ElementQNameIs(element, "ProxyRestriction", kSaml)) {
    return;
  }
  ProxyRestrictionType parsed;
  static const Names kAllowed{"Count"};
  RequireElementAttributesNames(element, kNone, kAllowed);
  RequireEmptyElement(it);
  GetULongOptionalAttribute(element, "Count", parsed.Count);
  restriction = parsed;
  it.MoveToSibling();
}

void TryParseRenewRestriction(NodeFilterIterator& it, boost::optional<RenewRestrictionType>& restriction) {
  if (!IsConditionOfType(it, kRenewRestrictionType)) {
    return;
  }
  const ElementNode* element = IteratorToElement(it);
  RenewRestrictionType parsed;
  static const QNames kRequired{kXsiType};
  static const QNames kAllowed{LocalName("Count"), LocalName("Postdatable"), LocalName("RenewExpired")};
  RequireElementAttributesQNames(element, kRequired, kAllowed);
  GetULongOptionalAttribute(element, "Count", parsed.Count);
  RequireEmptyElement(it);
  restriction = parsed;
  it.MoveToSibling();
}

void TryParseDelegationRestriction(NodeFilterIterator& it,
                                   boost::optional<DelegationRestrictionType>& restriction) {
  if (!IsConditionOfType(it, kDelegationRestrictionType)) {
    return;
  }
  DelegationRestrictionType parsed;
  static const QNames kRequired{kXsiType};
  RequireElementAttributesQNames(IteratorToElement(it), kRequired, QNames());
  NodeFilterIterator child = it.GetChild();
  do {
    parsed.Delegate.emplace_back();
    ParseDelegate(child, parsed.Delegate.back());
  } while (child.MoveToSibling().node != nullptr);
  restriction = parsed;
  it.MoveToSibling();
}

void ParseDelegate(NodeFilterIterator it, DelegateType& delegate) {
  const ElementNode* element = RequireElement(it, "Delegate", kSamlDelegation);
  static const Names kRequired{"DelegationInstant"};
  RequireElementAttributesNames(element, kRequired, kNone);
  GetDateAttribute(element, "DelegationInstant", delegate.DelegationInstant);
  it.MoveToChild();
  RequireElement(it, "NameID", kSaml);
  ParseNameIDType(it, delegate.NameID);
  RequireEnd(it.MoveToSibling(), "Unexpected elements after NameID");
}

// --- Advice and statements ---

void TryParseAdviceElement(NodeFilterIterator& it, boost::optional<AdviceType>& advice) {
  if (!ElementQNameIs(IteratorToElement(it), "Advice", kSaml)) {
    return;
  }
  AdviceType parsed;
  ParseAdviceElement(it, parsed);
  advice = parsed;
  it.MoveToSibling();
}

void ParseRsaAdviceElement(NodeFilterIterator it, Advice& advice) {
  const ElementNode* element = RequireElement(it, "RSAAdvice", kSamlExt);
  static const Names kRequired{"AdviceSource"};
  RequireElementAttributesNames(element, kRequired, kNone);
  advice.source = AttributeValue(element, "AdviceSource");
  it.MoveToChild();
  do {
    AttributeType attribute;
    ParseAttributeElement(it, attribute);
    advice.attributes.push_back(ToAdviceAttribute(std::move(attribute)));
  } while (it.MoveToSibling().node != nullptr);
}

void ParseAuthnStatementElement(NodeFilterIterator it, AuthnStatementType& statement) {
  const ElementNode* element = RequireElement(it, "AuthnStatement", kSaml);
  static const Names kRequired{"AuthnInstant"};
  RequireElementAttributesNames(element, kRequired, kNone);
  GetDateAttribute(element, "AuthnInstant", statement.AuthnInstant);
  it.MoveToChild();
  ParseAuthnContextElement(it, statement.AuthnContext);
  RequireEnd(it.MoveToSibling(), "Unexpected elements after AuthnContext");
}

void ParseAuthnContextElement(NodeFilterIterator it, AuthnContextType& context) {
  RequireNoAttributes(RequireElement(it, "AuthnContext", kSaml));
  it.MoveToChild();
  context.AuthnContextClassRef = ParseTextElement(it, "AuthnContextClassRef", kSaml);
  RequireEnd(it.MoveToSibling(), "Unexpected elements after AuthnContextClassRef");
}

void ParseAttributeStatementElement(NodeFilterIterator it, AttributeStatementType& statement) {
  RequireNoAttributes(RequireElement(it, "AttributeStatement", kSaml));
  it.MoveToChild();
  do {
    statement.Attribute.emplace_back();
    ParseAttributeElement(it, statement.Attribute.back());
  } while (it.MoveToSibling().node != nullptr);
}

void ParseAttributeElement(NodeFilterIterator it, AttributeType& attribute) {
  const ElementNode* element = RequireElement(it, "Attribute", kSaml);
  static const Names kRequired{"Name"};
  static const Names kAllowed{"NameFormat", "FriendlyName"};
  RequireElementAttributesNames(element, kRequired, kAllowed);
  attribute.Name = AttributeValue(element, "Name");
  attribute.NameFormat = AttributeValue(element, "NameFormat");
  attribute.FriendlyName = AttributeValue(element, "FriendlyName");
  attribute.Values.reserve(
      element->GetChildCount());  // White space counts too, but values come by the thousand.
  for (it.MoveToChild(); it.node != nullptr; it.MoveToSibling()) {
    attribute.Values.emplace_back(ParseTextElement(it, "AttributeValue", kSaml));
  }
}

}  // namespace Quorlin
