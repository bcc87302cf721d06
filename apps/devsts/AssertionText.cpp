// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/AssertionText.h"

#include "devsts/Clock.h"
#include "devsts/Uris.h"
#include "devsts/XmlText.h"

#include <pelmar/StringUtil.h>

namespace DevSts {

namespace {

std::string WriteNameId(const std::string& upn) {
  return std::string("<saml:NameID Format=\"") + kUpnClaim + "\">" + Escape(upn) + "</saml:NameID>";
}

std::string WriteBearerData(const AssertionContent& content) {
  return "<saml:SubjectConfirmationData NotOnOrAfter=\"" + ToDateText(content.notOnOrAfter) + "\"/>";
}

/// SAML 2.0 Profiles, section 3.1.
std::string WriteHolderOfKeyData(const AssertionContent& content) {
  return std::string("<saml:SubjectConfirmationData xmlns:xsi=\"") + kSchemaInstanceNs +
         "\" xsi:type=\"saml:KeyInfoConfirmationDataType\"><ds:KeyInfo xmlns:ds=\"" + kDigitalSignatureNs +
         "\"><ds:X509Data><ds:X509Certificate>" +
         Pelmar::StringUtil::Base64Encode(content.confirmationCertificate->GetDer()) +
         "</ds:X509Certificate></ds:X509Data></ds:KeyInfo></saml:SubjectConfirmationData>";
}

std::string WriteSubject(const AssertionContent& content) {
  const bool isBearer = !content.confirmationCertificate;
  std::string confirmation = content.delegates.empty() ? "" : WriteNameId(content.delegates.back().upn);
  confirmation += isBearer ? WriteBearerData(content) : WriteHolderOfKeyData(content);
  return "<saml:Subject>" + WriteNameId(content.upn) + "<saml:SubjectConfirmation Method=\"" +
         (isBearer ? kBearerMethod : kHolderOfKeyMethod) + "\">" + confirmation +
         "</saml:SubjectConfirmation></saml:Subject>";
}

std::string WriteAudience(const AssertionContent& content) {
  std::string audience;
  for (const std::string& address : content.audience) {
    audience += "<saml:Audience>" + Escape(address) + "</saml:Audience>";
  }
  return audience.empty() ? "" : "<saml:AudienceRestriction>" + audience + "</saml:AudienceRestriction>";
}

std::string WriteProxyRestriction(const AssertionContent& content) {
  return content.proxyCount == 0
             ? ""
             : "<saml:ProxyRestriction Count=\"" + std::to_string(content.proxyCount) + "\"/>";
}

/// The opening tag of a condition of an extension type.
std::string OpenCondition(const char* prefix, const char* typeNs, const char* type,
                          const std::string& attributes) {
  return std::string("<saml:Condition xmlns:xsi=\"") + kSchemaInstanceNs + "\" xmlns:" + prefix + "=\"" +
         typeNs + "\"" + attributes + " xsi:type=\"" + prefix + ":" + type + "\">";
}

std::string WriteRenewRestriction(const AssertionContent& content) {
  if (content.renewCount == 0) {
    return "";
  }
  const std::string count = " Count=\"" + std::to_string(content.renewCount) + "\"";
  return OpenCondition("ext", kSamlExtensionNs, "RenewRestrictionType", count) + "</saml:Condition>";
}

/// SAML 2.0 Condition for Delegation Restriction, section 2.2.
std::string WriteDelegationRestriction(const AssertionContent& content) {
  std::string delegates;
  for (const DelegateLink& link : content.delegates) {
    delegates += "<del:Delegate DelegationInstant=\"" + ToDateText(link.instant) + "\">" +
                 WriteNameId(link.upn) + "</del:Delegate>";
  }
  if (delegates.empty()) {
    return "";
  }
  return OpenCondition("del", kDelegationNs, "DelegationRestrictionType", "") + delegates +
         "</saml:Condition>";
}

std::string WriteConditions(const AssertionContent& content) {
  return "<saml:Conditions NotBefore=\"" + ToDateText(content.notBefore) + "\" NotOnOrAfter=\"" +
         ToDateText(content.notOnOrAfter) + "\">" + WriteAudience(content) + WriteProxyRestriction(content) +
         WriteRenewRestriction(content) + WriteDelegationRestriction(content) + "</saml:Conditions>";
}

/// `attributes` starts with a blank unless empty.
std::string WriteAttribute(const std::string& name, const std::string& attributes,
                           const std::vector<std::string>& values) {
  std::string text = "<saml:Attribute Name=\"" + Escape(name) + "\"" + attributes + ">";
  for (const std::string& value : values) {
    text += "<saml:AttributeValue>" + Escape(value) + "</saml:AttributeValue>";
  }
  return text + "</saml:Attribute>";
}

std::string WriteAdvice(const AssertionContent& content) {
  std::string advice;
  for (const AdviceBlock& block : content.advice) {
    advice += std::string("<ext:RSAAdvice xmlns:ext=\"") + kSamlExtensionNs + "\" AdviceSource=\"" +
              Escape(block.source) + "\">";
    for (const AdviceItem& item : block.items) {
      advice += WriteAttribute(item.name, "", item.values);
    }
    advice += "</ext:RSAAdvice>";
  }
  return advice.empty() ? "" : "<saml:Advice>" + advice + "</saml:Advice>";
}

std::string WriteAuthnStatement(const AssertionContent& content) {
  return "<saml:AuthnStatement AuthnInstant=\"" + ToDateText(content.authenticated) +
         "\"><saml:AuthnContext><saml:AuthnContextClassRef>" + Escape(content.authnContext) +
         "</saml:AuthnContextClassRef></saml:AuthnContext></saml:AuthnStatement>";
}

std::string WriteClaim(const char* name, const char* friendlyName, const std::vector<std::string>& values) {
  const std::string attributes =
      std::string(" NameFormat=\"") + kAttributeNameUri + "\" FriendlyName=\"" + friendlyName + "\"";
  return WriteAttribute(name, attributes, values);
}

std::string WriteClaimUnlessEmpty(const char* name, const char* friendlyName, const std::string& value) {
  return value.empty() ? "" : WriteClaim(name, friendlyName, {value});
}

std::string ToGroupText(const Group& group) {
  return group.form == GroupForm::SLASH ? group.name + "/" + group.domain : group.domain + "\\" + group.name;
}

std::string WriteGroups(const AssertionContent& content) {
  std::vector<std::string> values;
  for (const Group& group : content.groups) {
    values.push_back(ToGroupText(group));
  }
  return values.empty() ? "" : WriteClaim(kGroupIdentity, "Groups", values);
}

std::string WriteAttributeStatement(const AssertionContent& content) {
  return "<saml:AttributeStatement>" + WriteGroups(content) +
         WriteClaim(kIsSolution, "Solution", {content.solution ? "true" : "false"}) +
         WriteClaimUnlessEmpty(kGivenNameClaim, "GivenName", content.givenName) +
         WriteClaimUnlessEmpty(kSurnameClaim, "Surname", content.surname) + "</saml:AttributeStatement>";
}

}  // namespace

UnsignedAssertion WriteAssertion(const AssertionContent& content, const std::string& issuer) {
  UnsignedAssertion assertion;
  // An ID must not start with a digit, which a UUID may (SAML 2.0 Core, section 1.3.4).
  assertion.id = "_" + Pelmar::StringUtil::GenerateUuid();
  assertion.head = std::string("<saml:Assertion xmlns:saml=\"") + kSamlNs + "\" ID=\"" + assertion.id +
                   "\" IssueInstant=\"" + ToDateText(content.issued) +
                   "\" Version=\"2.0\"><saml:Issuer Format=\"" + kEntityFormat + "\">" + Escape(issuer) +
                   "</saml:Issuer>";
  assertion.tail = WriteSubject(content) + WriteConditions(content) + WriteAdvice(content) +
                   WriteAuthnStatement(content) + WriteAttributeStatement(content) + "</saml:Assertion>";
  return assertion;
}

}  // namespace DevSts
