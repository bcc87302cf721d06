// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/TokenValidation.h"

#include "quorlin/Namespaces.h"

#include <pelmar/StringUtil.h>
#include <pelmar/xml/security/Exceptions.h>

#include <algorithm>
#include <limits>

namespace Quorlin {

using Pelmar::Ref;
using Pelmar::System::DateTime;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Security::Signature;
using Pelmar::Xml::Security::SignatureReference;

namespace {

const long long kMicrosecondsPerSecond = 1000000;

// A tolerance beyond this (about 36,000 years) could overflow the sums below, and means "always" anyway.
const long long kMaxClockToleranceSec = std::numeric_limits<long long>::max() / kMicrosecondsPerSecond / 8;

long long ToleranceInMicroseconds(long long seconds) {
  return std::clamp(seconds, -kMaxClockToleranceSec, kMaxClockToleranceSec) * kMicrosecondsPerSecond;
}

void CheckValidityPeriod(const ConditionsType& conditions, long long clockToleranceSec) {
  const long long start = conditions.NotBefore.GetUtcTime();
  const long long end = conditions.NotOnOrAfter.GetUtcTime();
  if (start >= end) {
    throw ParseException(
        "Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.");
  }
  const long long tolerance = ToleranceInMicroseconds(clockToleranceSec);
  const long long now = Pelmar::System::GetUtcDateTime().GetUtcTime();
  if (start - tolerance > now) {
    throw ParseException("Token start date is in the future: " + conditions.NotBefore.ToString());
  }
  if (end + tolerance <= now) {
    throw ParseException("The token has expired at: " + conditions.NotOnOrAfter.ToString());
  }
}

// A bearer may not be confirmed for a shorter time than the token claims to be valid.
void CheckBearerPeriod(const SamlAssertionType& assertion) {
  const SubjectConfirmationType& confirmation = assertion.Subject.SubjectConfirmation;
  if (confirmation.Method == SamlToken::CONFIRM_BEARER &&
      confirmation.SubjectConfirmationData.NotOnOrAfter < assertion.Conditions.NotOnOrAfter) {
    throw ParseException("Invalid token subject validity");
  }
}

// Whoever presents a delegated token must be the last link of its delegation chain.
void CheckDelegation(const SamlAssertionType& assertion) {
  const boost::optional<NameIDType>& delegateId = assertion.Subject.SubjectConfirmation.DelegateId;
  const boost::optional<DelegationRestrictionType>& restriction = assertion.Conditions.DelegationRestriction;
  if (delegateId && !restriction) {
    throw ParseException(
        "Token SubjectConfirmation contains delegate id, but no delegation restriction is present");
  }
  if (!delegateId && restriction) {
    throw ParseException(
        "Token has delegation restriction, but no delegate id is present in the SubjectConfirmation");
  }
  if (delegateId && *delegateId != restriction->Delegate.back().NameID) {
    throw ParseException("The SubjectConfirmation delegate id does not match the id of the last delegate");
  }
}

Ref<Signature> ReadSignature(ElementNode* assertionElement, ElementNode* signatureElement) {
  Ref<Signature> signature;
  try {
    Pelmar::Xml::Security::CreateSignatureFromDom(assertionElement, signatureElement, signature);
  } catch (const Pelmar::Xml::Security::SignatureSyntaxException& e) {
    throw ParseException(std::string("Signature syntax error: ") + e.what());
  }
  return signature;
}

bool CoversAssertion(const Signature& signature, const std::string& id) {
  const std::vector<Ref<SignatureReference>>& references = signature.GetReferences();
  return std::any_of(references.begin(), references.end(), [&](const Ref<SignatureReference>& reference) {
    return reference->GetUri().empty() || reference->GetUri() == "#" + id;
  });
}

// Splits at `separator`; true when that gives exactly two parts and neither is empty.
bool SplitInTwo(std::string_view text, char separator, std::string_view& first, std::string_view& second) {
  const std::size_t at = text.find(separator);
  if (at == std::string_view::npos || text.find(separator, at + 1) != std::string_view::npos) {
    return false;
  }
  first = text.substr(0, at);
  second = text.substr(at + 1);
  return !first.empty() && !second.empty();
}

}  // namespace

void CheckTokenProperties(const SamlAssertionType& assertion, long long clockToleranceSec) {
  if (assertion.Version != "2.0") {
    throw ParseException("Invalid token version");
  }
  if (assertion.ID.empty() || assertion.ID.front() != '_') {
    throw ParseException("Invalid token ID");
  }
  CheckValidityPeriod(assertion.Conditions, clockToleranceSec);
  CheckBearerPeriod(assertion);
  CheckDelegation(assertion);
}

void ParseTokenSignature(NodeFilterIterator& it, ElementNode* assertionElement, Ref<Signature>& signature) {
  ElementNode* const signatureElement = IteratorToElement(it);
  if (signatureElement == nullptr) {
    throw ParseException("Expected element ds:Signature not found");
  }
  const Ref<Signature> parsed = ReadSignature(assertionElement, signatureElement);
  std::string id;
  assertionElement->GetAttribute("ID", id);
  if (!CoversAssertion(*parsed, id)) {
    throw ParseException("Token's signature must cover the entire token");
  }
  signature = parsed;
  it.MoveToSibling();
}

PrincipalId ParseSamlNameId(const NameIDType& nameId) {
  if (nameId.first != kClaimUpn) {
    throw ParseException("Invalid or unsupported NameId format '" + nameId.first + "'");
  }
  std::string_view name;
  std::string_view domain;
  if (!SplitInTwo(nameId.second, '@', name, domain)) {
    throw ParseException("Failed to parse the UPN NameID: " + nameId.second);
  }
  return PrincipalId(std::string(name), std::string(domain));
}

Delegate ParseToDelegate(const DelegateType& delegate) {
  return Delegate(ParseSamlNameId(delegate.NameID), delegate.DelegationInstant);
}

PrincipalId ParseGroupIdentity(std::string_view value) {
  const bool domainFirst = value.find('\\') != std::string_view::npos;
  std::string_view first;
  std::string_view second;
  if (!SplitInTwo(value, domainFirst ? '\\' : '/', first, second)) {
    throw ParseException("Failed to parse Group Identity value: `" + std::string(value) +
                         "'; too many/not enough separators");
  }
  if (domainFirst) {
    std::swap(first, second);
  }
  return PrincipalId(std::string(first), std::string(second));
}

bool ParseIsSolutionAttribute(const AttributeType& attribute) {
  // Thrown by pointer: handlers of existing hosts tell these two errors from all others by that.
  if (attribute.Values.empty()) {
    throw new ParseException("No value found for attribute isSolution.");
  }
  if (attribute.Values.size() > 1) {
    throw new ParseException("More than one value found for attribute isSolution.");
  }
  return Pelmar::StringUtil::ToLower(std::string(attribute.Values.front())) == "true";
}

std::string ParsePrincipalNameAttribute(const AttributeType& attribute) {
  return attribute.Values.empty() ? std::string() : std::string(attribute.Values.front());
}

bool SamlAttributeIsGroupIdentity(const AttributeType& attribute) {
  return attribute.Name == kAttrGroupIdentity;
}

bool SamlAttributeIsSolution(const AttributeType& attribute) {
  return attribute.Name == kAttrIsSolution;
}

bool SamlAttributeIsGivenName(const AttributeType& attribute) {
  return attribute.Name == kClaimGivenName;
}

bool SamlAttributeIsSurName(const AttributeType& attribute) {
  return attribute.Name == kClaimSurname;
}

}  // namespace Quorlin
