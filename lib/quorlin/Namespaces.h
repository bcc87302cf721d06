// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Every URI that the protocol knows, except those of XML Signature itself (pelmar/xml/security/Algorithms.h).
// URIs are compared as whole strings, so each is written down once, here.

#ifndef QUORLIN_NAMESPACES_H
#define QUORLIN_NAMESPACES_H

#ifndef QUORLIN_VENDOR_URI_BASE
#error \
    "QUORLIN_VENDOR_URI_BASE must be defined: scheme and host of the vendor URIs that the token service uses"
#endif

namespace Quorlin {

// Only literals can be joined at compile time; this one is gone again at the end of the header.
#define QUORLIN_WST_URI "http://docs.oasis-open.org/ws-sx/ws-trust/200512"
#define QUORLIN_WSS_URI "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-"

/// SOAP 1.1, section 3.
constexpr const char* kSoapEnv = "http://schemas.xmlsoap.org/soap/envelope/";
/// WS-Addressing 1.0, section 1.3.
constexpr const char* kWsa = "http://www.w3.org/2005/08/addressing";

/// WS-Trust 1.3, section 1.2, and the URIs formed from it.
constexpr const char* kWst = QUORLIN_WST_URI;
constexpr const char* kWstIssue = QUORLIN_WST_URI "/Issue";
constexpr const char* kWstRenew = QUORLIN_WST_URI "/Renew";
constexpr const char* kWstValidate = QUORLIN_WST_URI "/Validate";
constexpr const char* kWstBearer = QUORLIN_WST_URI "/Bearer";
constexpr const char* kWstPublicKey = QUORLIN_WST_URI "/PublicKey";
constexpr const char* kWstStatusTokenType = QUORLIN_WST_URI "/RSTR/Status";
/// The SOAP actions of WS-Trust 1.3, sections 4 to 8.
constexpr const char* kWstIssueAction = QUORLIN_WST_URI "/RST/Issue";
constexpr const char* kWstRenewAction = QUORLIN_WST_URI "/RST/Renew";
constexpr const char* kWstValidateAction = QUORLIN_WST_URI "/RST/Validate";
constexpr const char* kWstChallengeAction = QUORLIN_WST_URI "/RSTR/Issue";
/// The value type of a SPNEGO message in a wst:BinaryExchange.
constexpr const char* kSpnegoType = "http://schemas.xmlsoap.org/ws/2005/02/trust/spnego";

/// WS-Security 1.0, section 2, and its token profiles.
constexpr const char* kWsse = QUORLIN_WSS_URI "wssecurity-secext-1.0.xsd";
constexpr const char* kWsu = QUORLIN_WSS_URI "wssecurity-utility-1.0.xsd";
constexpr const char* kWssPasswordText = QUORLIN_WSS_URI "username-token-profile-1.0#PasswordText";
constexpr const char* kWssBase64 = QUORLIN_WSS_URI "soap-message-security-1.0#Base64Binary";
constexpr const char* kWssX509v3 = QUORLIN_WSS_URI "x509-token-profile-1.0#X509v3";
/// WS-Security 1.1. The first two differ from the later published standard; the token services in the field
/// expect them as they are.
constexpr const char* kWsse11 = QUORLIN_WSS_URI "wssecurity-secext-1.1.xsd";
constexpr const char* kWssSamlV2 = "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";
constexpr const char* kWssSamlId = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID";

/// XML Schema.
constexpr const char* kXs = "http://www.w3.org/2001/XMLSchema";
constexpr const char* kXsi = "http://www.w3.org/2001/XMLSchema-instance";

/// SAML 2.0 Core, section 1.1; the namespace is also the type of the tokens that are asked for.
constexpr const char* kSaml = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr const char* kSamlTokenType = kSaml;
/// SAML 2.0 Condition for Delegation Restriction, section 2.2.
constexpr const char* kSamlDelegation = "urn:oasis:names:tc:SAML:2.0:conditions:delegation";

/// Types of claims, used as attribute and name formats.
constexpr const char* kClaimGivenName = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname";
constexpr const char* kClaimSurname = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname";
constexpr const char* kClaimUpn = "http://schemas.xmlsoap.org/claims/UPN";

/// The token service's own.
constexpr const char* kAdviceNs = QUORLIN_VENDOR_URI_BASE "/names/2009/12/std-ext/WS-Trust1.4/advice";
constexpr const char* kSamlExt = QUORLIN_VENDOR_URI_BASE "/names/2009/12/std-ext/SAML2.0";
constexpr const char* kAttrGroupIdentity =
    QUORLIN_VENDOR_URI_BASE "/schemas/attr-names/2009/01/GroupIdentity";
constexpr const char* kAttrIsSolution = QUORLIN_VENDOR_URI_BASE "/schemas/attr-names/2011/07/isSolution";

#undef QUORLIN_WST_URI
#undef QUORLIN_WSS_URI

}  // namespace Quorlin

#endif  // QUORLIN_NAMESPACES_H
