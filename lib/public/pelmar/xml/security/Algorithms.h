// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The algorithm identifiers of XML Signature that the platform knows. There are no others: the list is
// closed.

#ifndef PELMAR_XML_SECURITY_ALGORITHMS_H
#define PELMAR_XML_SECURITY_ALGORITHMS_H

namespace Pelmar {
namespace Xml {
namespace Security {

/// XML Signature's own namespace.
constexpr const char* kSignatureNamespace = "http://www.w3.org/2000/09/xmldsig#";

/// Canonical XML 1.0. The API and the wire know it with and without the final "#"; signatures made here are
/// written without.
constexpr const char* kC14n = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#";
constexpr const char* kC14nWithComments = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#WithComments";
/// Exclusive XML Canonicalization 1.0.
constexpr const char* kExclusiveC14n = "http://www.w3.org/2001/10/xml-exc-c14n#";
constexpr const char* kExclusiveC14nWithComments = "http://www.w3.org/2001/10/xml-exc-c14n#WithComments";

constexpr const char* kEnvelopedSignature = "http://www.w3.org/2000/09/xmldsig#enveloped-signature";

constexpr const char* kSha256 = "http://www.w3.org/2001/04/xmlenc#sha256";
constexpr const char* kSha384 = "http://www.w3.org/2001/04/xmldsig-more#sha384";
constexpr const char* kSha512 = "http://www.w3.org/2001/04/xmlenc#sha512";

constexpr const char* kRsaSha256 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
constexpr const char* kRsaSha384 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha384";
constexpr const char* kRsaSha512 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha512";
constexpr const char* kEcdsaSha256 = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256";
constexpr const char* kEcdsaSha384 = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha384";
constexpr const char* kEcdsaSha512 = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha512";

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SECURITY_ALGORITHMS_H
