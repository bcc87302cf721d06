// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the assertion parser reads, element by element, before any of it is believed. Names follow SAML 2.0
// Core's schema types.

#ifndef QUORLIN_SAMLASSERTIONTYPE_H
#define QUORLIN_SAMLASSERTIONTYPE_H

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/system/DateTime.h>
#include <pelmar/xml/security/Signature.h>
#include <quorlin/SamlToken.h>

#include <boost/optional.hpp>

#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace Quorlin {

/// Format first, then the text.
typedef std::pair<std::string, std::string> NameIDType;

struct SubjectConfirmationDataType {
  Pelmar::System::DateTime NotOnOrAfter;                              ///< Bearer only.
  Pelmar::Ref<const Pelmar::Crypto::Certificate> KeyInfoCertificate;  ///< Holder-of-key only.
};

struct SubjectConfirmationType {
  SamlToken::ConfirmationType Method = SamlToken::CONFIRM_BEARER;
  boost::optional<NameIDType> DelegateId;
  SubjectConfirmationDataType SubjectConfirmationData;
};

struct SubjectType {
  NameIDType NameID;
  SubjectConfirmationType SubjectConfirmation;
};

struct AudienceRestrictionType {
  std::set<std::string> Audience;
};

struct ProxyRestrictionType {
  boost::optional<unsigned long long> Count;
};

struct RenewRestrictionType {
  boost::optional<unsigned long long> Count;
};

struct DelegateType {
  Pelmar::System::DateTime DelegationInstant;
  NameIDType NameID;
};

struct DelegationRestrictionType {
  std::vector<DelegateType> Delegate;
};

struct ConditionsType {
  Pelmar::System::DateTime NotBefore;
  Pelmar::System::DateTime NotOnOrAfter;
  boost::optional<AudienceRestrictionType> AudienceRestriction;
  boost::optional<ProxyRestrictionType> ProxyRestriction;
  boost::optional<RenewRestrictionType> RenewRestriction;
  boost::optional<DelegationRestrictionType> DelegationRestriction;
};

struct AdviceType {
  std::vector<Advice> RSAAdvice;
};

struct AuthnContextType {
  std::string AuthnContextClassRef;
};

struct AuthnStatementType {
  Pelmar::System::DateTime AuthnInstant;
  AuthnContextType AuthnContext;
};

struct AttributeType {
  std::string Name;
  std::string NameFormat;    ///< Empty when absent.
  std::string FriendlyName;  ///< Empty when absent.
  /// In the text nodes of the tree that was read, and valid as long as it lives: a token may have thousands
  /// of groups.
  std::vector<std::string_view> Values;
};

struct AttributeStatementType {
  std::vector<AttributeType> Attribute;
};

struct SamlAssertionType {
  std::string Version;
  std::string ID;
  Pelmar::System::DateTime IssueInstant;
  NameIDType Issuer;
  Pelmar::Ref<Pelmar::Xml::Security::Signature> Signature;
  SubjectType Subject;
  ConditionsType Conditions;
  boost::optional<AdviceType> Advice;
  AuthnStatementType AuthnStatement;
  boost::optional<AttributeStatementType> AttributeStatement;
};

}  // namespace Quorlin

#endif  // QUORLIN_SAMLASSERTIONTYPE_H
