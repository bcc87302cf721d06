// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Which algorithms and reference forms signatures may use. What is not listed here is not accepted.

#ifndef PELMAR_XML_SIGNATUREPROFILE_H
#define PELMAR_XML_SIGNATUREPROFILE_H

#include <pelmar/crypto/Digest.h>
#include <pelmar/crypto/PrivateKey.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

struct SignatureMethod {
  Crypto::KeyType keyType;
  Crypto::DigestAlgorithm digest;
};

bool IsCanonicalization(const std::string& algorithm);
bool IsExclusiveCanonicalization(const std::string& algorithm);
bool IsDigestMethod(const std::string& algorithm);
bool IsSignatureMethod(const std::string& algorithm);
/// Whether `algorithm` may be a ds:Transform.
bool IsTransform(const std::string& algorithm);
/// "" or "#" and an ID.
bool IsReferenceUri(const std::string& uri);

/// What the algorithm's identifier stands for. Throws XmlSecurityException, naming it, when it is not
/// accepted.
Crypto::DigestAlgorithm RequireDigestMethod(const std::string& algorithm);
SignatureMethod RequireSignatureMethod(const std::string& algorithm);

/// Throw XmlSecurityException, naming the culprit.
void RequireCanonicalizationMethod(const std::string& algorithm);
void RequireReferenceUri(const std::string& uri);
/// The enveloped-signature transform, then one canonicalisation; each may be missing.
void RequireTransforms(const std::vector<std::string>& algorithms);

/// The form of a canonicalisation algorithm that leaves comments out.
std::string WithoutComments(const std::string& canonicalization);

/// `text` in apostrophes for a message, cut short when somebody made it long.
std::string QuoteForMessage(const std::string& text);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SIGNATUREPROFILE_H
