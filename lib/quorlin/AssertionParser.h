// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The strict reader of the SAML 2.0 assertion subset that the token service issues (SAML 2.0 Core, section
// 2).
//
// Elements stand in a fixed order, in their namespaces, with exactly the listed attributes; white space and
// comments between them are ignored; everything else is a ParseException. Every function is given the
// iterator on the element that it reads.

#ifndef QUORLIN_ASSERTIONPARSER_H
#define QUORLIN_ASSERTIONPARSER_H

#include "quorlin/SamlAssertionType.h"
#include "quorlin/xmlReading.h"

#include <boost/optional.hpp>

#include <string>

namespace Quorlin {

void ParseSamlAssertionElement(NodeFilterIterator it, SamlAssertionType& assertion);
void ParseSamlIssuerElement(NodeFilterIterator it, NameIDType& issuer);
void ParseNameIDType(NodeFilterIterator it, NameIDType& nameId);

void ParseSubjectElement(NodeFilterIterator it, SubjectType& subject);
void ParseSubjectNameIdElement(NodeFilterIterator it, NameIDType& nameId);
void ParseSubjectConfirmationElement(NodeFilterIterator it, SubjectConfirmationType& confirmation);
void ParseSubjectConfirmationDataElement(NodeFilterIterator it, SamlToken::ConfirmationType method,
                                         SubjectConfirmationDataType& data);
void ParseSubjectConfirmationDataKeyInfoElement(NodeFilterIterator it, SubjectConfirmationDataType& data);

void ParseConditionsElement(NodeFilterIterator it, ConditionsType& conditions);
void ParseDelegate(NodeFilterIterator it, DelegateType& delegate);

void ParseAuthnStatementElement(NodeFilterIterator it, AuthnStatementType& statement);
void ParseAuthnContextElement(NodeFilterIterator it, AuthnContextType& context);
void ParseAttributeStatementElement(NodeFilterIterator it, AttributeStatementType& statement);
void ParseAttributeElement(NodeFilterIterator it, AttributeType& attribute);
void ParseRsaAdviceElement(NodeFilterIterator it, Advice& advice);

/// Optional elements: when the current one is theirs, they fill the record and move on to the next
/// significant sibling; otherwise the record stays empty and the iterator where it is.
void TryParseAudienceRestriction(NodeFilterIterator& it,
                                 boost::optional<AudienceRestrictionType>& restriction);
void TryParseProxyRestriction(NodeFilterIterator& it, boost::optional<ProxyRestrictionType>& restriction);
void TryParseRenewRestriction(NodeFilterIterator& it, boost::optional<RenewRestrictionType>& restriction);
void TryParseDelegationRestriction(NodeFilterIterator& it,
                                   boost::optional<DelegationRestrictionType>& restriction);
void TryParseAdviceElement(NodeFilterIterator& it, boost::optional<AdviceType>& advice);

}  // namespace Quorlin

#endif  // QUORLIN_ASSERTIONPARSER_H
