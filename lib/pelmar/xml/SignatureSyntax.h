// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Reads the elements of a ds:Signature into plain records. What they mean is judged elsewhere.

#ifndef PELMAR_XML_SIGNATURESYNTAX_H
#define PELMAR_XML_SIGNATURESYNTAX_H

#include <pelmar/xml/Node.h>

#include <cstddef>
#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

/// An assertion needs one, a signed message a handful.
constexpr std::size_t kMaxReferences = 16;
/// Prefixes of an InclusiveNamespaces list.
constexpr std::size_t kMaxInclusivePrefixes = 64;

/// ds:CanonicalizationMethod or ds:Transform.
struct TransformSyntax {
  std::string algorithm;
  /// Exclusive XML Canonicalization 1.0, section 3: the PrefixList of InclusiveNamespaces.
  std::vector<std::string> inclusivePrefixes;
};

/// ds:Reference.
struct ReferenceSyntax {
  std::string uri;
  std::vector<TransformSyntax> transforms;
  std::string digestMethod;
  std::vector<unsigned char> digestValue;
};

/// ds:Signature. The elements belong to the tree that was read.
struct SignatureSyntax {
  const ElementNode* signedInfo;
  TransformSyntax canonicalization;
  std::string signatureMethod;
  std::vector<ReferenceSyntax> references;
  std::vector<unsigned char> signatureValue;
  const ElementNode* keyInfo;  ///< Null when there is none.
};

/// Reads `signature` by XML Signature 1.1, section 4, without ds:Object and all it brings: an Object would be
/// content that nobody reads. White space and comments between elements are passed over. The parameters of
/// algorithms that are not accepted anyway are not looked at, so that the verifier can name the algorithm.
/// Throws SignatureSyntaxException.
SignatureSyntax ReadSignatureSyntax(const ElementNode* signature);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SIGNATURESYNTAX_H
