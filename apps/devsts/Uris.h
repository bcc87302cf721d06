// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The URIs of the protocol as this service reads them in the standards. They are deliberately not shared with
// the client library: a wrong URI on either side shows when the two talk to each other.

#ifndef QUORLIN_DEVSTS_URIS_H
#define QUORLIN_DEVSTS_URIS_H

#ifndef QUORLIN_VENDOR_URI_BASE
#error "QUORLIN_VENDOR_URI_BASE must be defined: scheme and host of the vendor URIs"
#endif

namespace DevSts {

/// SOAP 1.1, section 3.
constexpr const char* kSoapNs = "http://schemas.xmlsoap.org/soap/envelope/";

/// WS-Trust 1.3, sections 1.2, 3 and 4.
constexpr const char* kTrustNs = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";

/// WS-Security 1.0 and its profiles.
constexpr const char* kSecextNs =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr const char* kUtilityNs =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
constexpr const char* kPasswordText =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-username-token-profile-1.0#PasswordText";
constexpr const char* kBase64Binary =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-soap-message-security-1.0#Base64Binary";
constexpr const char* kX509v3 =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-x509-token-profile-1.0#X509v3";

/// WS-Security 1.1, as the clients in the field write it: both differ from the later published text.
constexpr const char* kSecext11Ns =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.1.xsd";
constexpr const char* kSamlTokenProfileType =
    "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";
constexpr const char* kSamlIdType = "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID";

/// WS-Addressing 1.0.
constexpr const char* kAddressingNs = "http://www.w3.org/2005/08/addressing";

constexpr const char* kSchemaInstanceNs = "http://www.w3.org/2001/XMLSchema-instance";
constexpr const char* kDigitalSignatureNs = "http://www.w3.org/2000/09/xmldsig#";

/// SAML 2.0 Core and Profiles.
constexpr const char* kSamlNs = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr const char* kDelegationNs = "urn:oasis:names:tc:SAML:2.0:conditions:delegation";
constexpr const char* kBearerMethod = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
constexpr const char* kHolderOfKeyMethod = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";
constexpr const char* kEntityFormat = "urn:oasis:names:tc:SAML:2.0:nameid-format:entity";
constexpr const char* kAttributeNameUri = "urn:oasis:names:tc:SAML:2.0:attrname-format:uri";

/// Kinds of claims.
constexpr const char* kUpnClaim = "http://schemas.xmlsoap.org/claims/UPN";
constexpr const char* kGivenNameClaim = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname";
constexpr const char* kSurnameClaim = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname";
constexpr const char* kSpnegoValueType = "http://schemas.xmlsoap.org/ws/2005/02/trust/spnego";

/// The vendor's extensions.
constexpr const char* kAdviceNs = QUORLIN_VENDOR_URI_BASE "/names/2009/12/std-ext/WS-Trust1.4/advice";
constexpr const char* kSamlExtensionNs = QUORLIN_VENDOR_URI_BASE "/names/2009/12/std-ext/SAML2.0";
constexpr const char* kGroupIdentity = QUORLIN_VENDOR_URI_BASE "/schemas/attr-names/2009/01/GroupIdentity";
constexpr const char* kIsSolution = QUORLIN_VENDOR_URI_BASE "/schemas/attr-names/2011/07/isSolution";

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_URIS_H
