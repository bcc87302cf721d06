// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Digests what a ds:Reference refers to; the same for verifying and for signing.

#ifndef PELMAR_XML_SIGNATUREREFERENCEDIGEST_H
#define PELMAR_XML_SIGNATUREREFERENCEDIGEST_H

#include "pelmar/xml/SignatureSyntax.h"

#include <pelmar/crypto/Digest.h>
#include <pelmar/xml/Node.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

/// The digest of `node` in the canonical form that `canonicalization` asks for, without `omitted` and all
/// below it when that is not null. Throws XmlSecurityException.
std::vector<unsigned char> DigestCanonicalForm(const Node* node, const TransformSyntax& canonicalization,
                                               Crypto::DigestAlgorithm algorithm, const ElementNode* omitted);

/// The digest of `target` after `transforms`, whose order has been judged already (XML Signature 1.1,
/// section 4.4.3.2). `signature` is the ds:Signature that the enveloped-signature transform leaves out
/// (section 6.6.4). Comments are never part of it, as the target of a same-document reference has none
/// (section 4.4.3.3). Throws XmlSecurityException.
std::vector<unsigned char> DigestReferenceTarget(const Node* target,
                                                 const std::vector<TransformSyntax>& transforms,
                                                 Crypto::DigestAlgorithm algorithm,
                                                 const ElementNode* signature);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SIGNATUREREFERENCEDIGEST_H
