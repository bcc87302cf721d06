// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a parsed assertion must satisfy before it becomes a token, and what its values mean.

#ifndef QUORLIN_TOKENVALIDATION_H
#define QUORLIN_TOKENVALIDATION_H

#include "quorlin/SamlAssertionType.h"
#include "quorlin/xmlReading.h"

#include <quorlin/PrincipalId.h>
#include <quorlin/SamlToken.h>

#include <string>

namespace Quorlin {

/// Checks version, ID, validity period (against the current time, widened by the tolerance on both sides),
/// bearer confirmation period and delegation, in this order. Throws ParseException for the first rule that
/// fails.
void CheckTokenProperties(const SamlAssertionType& assertion, long long clockToleranceSec);

/// Reads the signature element under `it` and moves on to the next significant sibling. The signature must
/// have a reference to the whole assertion: an empty URI or "#" and the assertion's ID. Throws
/// ParseException. Nothing is verified yet.
void ParseTokenSignature(NodeFilterIterator& it, Pelmar::Xml::ElementNode* assertionElement,
                         Pelmar::Ref<Pelmar::Xml::Security::Signature>& signature);

/// The principal that a user principal name ("alice@example.com") stands for. No other name format is
/// accepted. Throws ParseException.
PrincipalId ParseSamlNameId(const NameIDType& nameId);
Delegate ParseToDelegate(const DelegateType& delegate);

/// The group that "DOMAIN\name" or "name/domain" stands for: mind the order. Throws ParseException.
PrincipalId ParseGroupIdentity(std::string_view value);

/// Whether the attribute's one value says "true". Throws a *pointer* to a new ParseException when there is
/// not exactly one value; callers that handle these errors must catch the pointer and delete it.
bool ParseIsSolutionAttribute(const AttributeType& attribute);

/// The first value; empty when there is none.
std::string ParsePrincipalNameAttribute(const AttributeType& attribute);

bool SamlAttributeIsGroupIdentity(const AttributeType& attribute);
bool SamlAttributeIsSolution(const AttributeType& attribute);
bool SamlAttributeIsGivenName(const AttributeType& attribute);
bool SamlAttributeIsSurName(const AttributeType& attribute);

}  // namespace Quorlin

#endif  // QUORLIN_TOKENVALIDATION_H
