// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/SamlTokenImpl.h"

#include "quorlin/AssertionParser.h"
#include "quorlin/TokenValidation.h"
#include "quorlin/xmlReading.h"

#include <pelmar/StringUtil.h>
#include <pelmar/Verify.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>
#include <pelmar/xml/security/Exceptions.h>

#include <boost/make_shared.hpp>

namespace Quorlin {

using Pelmar::Ref;
using Pelmar::Crypto::Certificate;
using Pelmar::System::DateTime;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Security::KeyInfoResolver;
using Pelmar::Xml::Security::Signature;

namespace {

typedef std::list<Ref<const Certificate>> CertificateList;

const char* const kSource = "lib/quorlin/SamlTokenImpl";

// Owned by nobody: the iterators are copied for every element, and counting owners would cost more than the
// copies.
boost::shared_ptr<const NodeFilter> GetSignificanceFilter() {
  static const SkipWsAndCommentsFilter filter;
  return boost::shared_ptr<const NodeFilter>(boost::shared_ptr<const NodeFilter>(), &filter);
}

std::string CanonicalText(const ElementNode* element) {
  const Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  Pelmar::Xml::Security::CreateCanonicalizer(Pelmar::Xml::Security::kC14n)
      ->Canonicalize(element, writer.Get());
  return writer->GetText();
}

// A use that may be repeated at least once more. A restriction without a count, or with a count of 0, permits
// none.
template <typename Restriction>
bool PermitsFurtherUse(const boost::optional<Restriction>& restriction) {
  return restriction && restriction->Count && *restriction->Count != 0;
}

}  // namespace

// --- Value types ---

PrincipalId::PrincipalId(const std::string& principalName, const std::string& principalDomain)
    : name(principalName), domain(principalDomain) {
  Pelmar::Verify(!name.empty(), "!name.empty()", kSource);
  Pelmar::Verify(!domain.empty(), "!domain.empty()", kSource);
}

PrincipalId::PrincipalId(std::string&& principalName, std::string&& principalDomain)
    : name(std::move(principalName)), domain(std::move(principalDomain)) {
  Pelmar::Verify(!name.empty(), "!name.empty()", kSource);
  Pelmar::Verify(!domain.empty(), "!domain.empty()", kSource);
}

bool operator==(const PrincipalId& a, const PrincipalId& b) {
  using Pelmar::StringUtil::ToUpper;
  return &a == &b || (ToUpper(a.name) == ToUpper(b.name) && ToUpper(a.domain) == ToUpper(b.domain));
}

bool operator!=(const PrincipalId& a, const PrincipalId& b) {
  return !(a == b);
}

Delegate::Delegate(const PrincipalId& delegate, const DateTime& instant)
    : principal(delegate), delegationInstant(instant) {}

// --- Construction ---

SamlTokenImpl::SamlTokenImpl(const std::string& xml, const KeyInfoResolver* resolver,
                             long long clockToleranceSec)
    : _xml(xml) {
  Ref<Pelmar::Xml::Document> document;
  ParseXML(_xml, document);
  InitializeFromDom(document->GetDocumentElement(), resolver, clockToleranceSec);
  Pelmar::Verify(_subject.get() != nullptr, "_subject", kSource);
}

SamlTokenImpl::SamlTokenImpl(ElementNode* element, const KeyInfoResolver* resolver,
                             long long clockToleranceSec)
    : _xml(CanonicalText(element)) {
  InitializeFromDom(element, resolver, clockToleranceSec);
  Pelmar::Verify(_subject.get() != nullptr, "_subject", kSource);
}

// The cheap checks come first, so a token that is out of date costs no public-key operation. Nothing that the
// assertion says is interpreted before its signature held.
void SamlTokenImpl::InitializeFromDom(ElementNode* element, const KeyInfoResolver* resolver,
                                      long long clockToleranceSec) {
  SamlAssertionType assertion;
  ParseSamlAssertionElement(NodeFilterIterator(element, GetSignificanceFilter()), assertion);
  CheckTokenProperties(assertion, clockToleranceSec);
  ValidateSignature(assertion.Signature.Get(), resolver);
  PopulateFrom(assertion);
}

void SamlTokenImpl::ValidateSignature(const Signature* signature, const KeyInfoResolver* resolver) const {
  bool verified = false;
  try {
    verified = signature->Verify(resolver);
  } catch (const Pelmar::Xml::Security::XmlSecurityException& e) {
    throw InvalidSignatureException(std::string("Signature verification error. ") + e.what());
  }
  if (!verified) {
    throw InvalidSignatureException("Failed to verify signature: token might have been tampered with.");
  }
}

void SamlTokenImpl::PopulateFrom(const SamlAssertionType& assertion) {
  const ConditionsType& conditions = assertion.Conditions;
  const SubjectConfirmationType& confirmation = assertion.Subject.SubjectConfirmation;
  _id = assertion.ID;
  _subject.reset(new PrincipalId(ParseSamlNameId(assertion.Subject.NameID)));
  _startDate = conditions.NotBefore;
  _endDate = conditions.NotOnOrAfter;
  _confirmationMethod = confirmation.Method;
  _confirmationCertificate = confirmation.SubjectConfirmationData.KeyInfoCertificate;
  _renewable = PermitsFurtherUse(conditions.RenewRestriction);
  _delegable = PermitsFurtherUse(conditions.ProxyRestriction);
  if (assertion.Advice) {
    _advice = assertion.Advice->RSAAdvice;
  }
  if (assertion.AttributeStatement) {
    for (const AttributeType& attribute : assertion.AttributeStatement->Attribute) {
      PopulateTokenAttribute(attribute);
    }
  }
  if (conditions.DelegationRestriction) {
    for (const DelegateType& delegate : conditions.DelegationRestriction->Delegate) {
      _delegationChain.push_back(ParseToDelegate(delegate));
    }
  }
  if (conditions.AudienceRestriction) {
    _audience = conditions.AudienceRestriction->Audience;
  }
}

void SamlTokenImpl::PopulateTokenAttribute(const AttributeType& attribute) {
  if (SamlAttributeIsGroupIdentity(attribute)) {
    _groups.reserve(_groups.size() + attribute.Values.size());
    for (const std::string_view value : attribute.Values) {
      _groups.push_back(ParseGroupIdentity(value));
    }
  } else if (SamlAttributeIsSolution(attribute)) {
    _isSolution = ParseIsSolutionAttribute(attribute);
  } else if (SamlAttributeIsGivenName(attribute)) {
    _fullName.first = ParsePrincipalNameAttribute(attribute);
  } else if (SamlAttributeIsSurName(attribute)) {
    _fullName.second = ParsePrincipalNameAttribute(attribute);
  }
}

// --- Reading ---

const std::string& SamlTokenImpl::GetId() const {
  return _id;
}

const DateTime& SamlTokenImpl::GetStartDate() const {
  return _startDate;
}

const DateTime& SamlTokenImpl::GetEndDate() const {
  return _endDate;
}

const PrincipalId& SamlTokenImpl::GetSubject() const {
  return *_subject;
}

bool SamlTokenImpl::IsRenewable() const {
  return _renewable;
}

bool SamlTokenImpl::IsDelegable() const {
  return _delegable;
}

bool SamlTokenImpl::IsSolution() const {
  return _isSolution;
}

SamlToken::ConfirmationType SamlTokenImpl::GetConfirmationMethod() const {
  return _confirmationMethod;
}

void SamlTokenImpl::GetFullName(std::pair<std::string, std::string>& fullName) const {
  fullName = _fullName;
}

void SamlTokenImpl::GetGroups(std::vector<PrincipalId>& groups) const {
  groups = _groups;
}

void SamlTokenImpl::GetDelegationChain(std::vector<Delegate>& delegationChain) const {
  delegationChain = _delegationChain;
}

void SamlTokenImpl::GetAudience(std::set<std::string>& audience) const {
  audience = _audience;
}

void SamlTokenImpl::GetAdvice(std::vector<Advice>& advice) const {
  advice = _advice;
}

const Certificate* SamlTokenImpl::GetConfirmationCertificate() const {
  return _confirmationCertificate.Get();
}

const std::string& SamlTokenImpl::ToXml() const {
  return _xml;
}

// --- Creation ---

boost::shared_ptr<SamlToken> CreateSamlToken(const std::string& xml,
                                             const CertificateList& trustedCertificates,
                                             long long clockToleranceSec) {
  const Ref<KeyInfoResolver> resolver =
      Pelmar::Xml::Security::CreateTrustChainKeyResolver(trustedCertificates);
  return boost::make_shared<SamlTokenImpl>(xml, resolver.Get(), clockToleranceSec);
}

boost::shared_ptr<SamlToken> CreateSamlToken(const std::string& xml,
                                             const CertificateList& trustedCertificates) {
  return CreateSamlToken(xml, trustedCertificates, 0);
}

boost::shared_ptr<SamlToken> CreateSamlToken(const std::string& xml, const Certificate* trustedCertificate) {
  return CreateSamlToken(xml, CertificateList(1, Ref<const Certificate>(trustedCertificate)));
}

boost::shared_ptr<SamlToken> CreateSamlTokenFromDom(ElementNode* assertion,
                                                    const CertificateList& trustedCertificates,
                                                    long long clockToleranceSec) {
  const Ref<KeyInfoResolver> resolver =
      Pelmar::Xml::Security::CreateTrustChainKeyResolver(trustedCertificates);
  return boost::make_shared<SamlTokenImpl>(assertion, resolver.Get(), clockToleranceSec);
}

boost::shared_ptr<SamlToken> CreateSamlTokenFromDom(ElementNode* assertion,
                                                    const CertificateList& trustedCertificates) {
  return CreateSamlTokenFromDom(assertion, trustedCertificates, 0);
}

}  // namespace Quorlin
