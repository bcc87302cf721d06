// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SignatureReferenceDigest.h"

#include "pelmar/crypto/DigestWriter.h"
#include "pelmar/xml/SignatureProfile.h"

#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>

namespace Pelmar {
namespace Xml {
namespace Security {

std::vector<unsigned char> DigestCanonicalForm(const Node* node, const TransformSyntax& canonicalization,
                                               Crypto::DigestAlgorithm algorithm,
                                               const ElementNode* omitted) {
  // Without a list the plain form is asked for, as a list, even an empty one, is only for the exclusive
  // algorithms.
  const Ref<Canonicalizer> canonicalizer =
      canonicalization.inclusivePrefixes.empty()
          ? CreateCanonicalizer(canonicalization.algorithm)
          : CreateCanonicalizer(canonicalization.algorithm, canonicalization.inclusivePrefixes);
  const Ref<Crypto::DigestWriter> writer = MakeRef<Crypto::DigestWriter>(algorithm);
  canonicalizer->Canonicalize(node, writer.Get(), omitted);
  return writer->Finish();
}

std::vector<unsigned char> DigestReferenceTarget(const Node* target,
                                                 const std::vector<TransformSyntax>& transforms,
                                                 Crypto::DigestAlgorithm algorithm,
                                                 const ElementNode* signature) {
  const ElementNode* omitted = nullptr;
  TransformSyntax canonicalization = {kC14n, {}};
  for (const TransformSyntax& transform : transforms) {
    if (transform.algorithm == kEnvelopedSignature) {
      omitted = signature;
    } else {
      canonicalization = {WithoutComments(transform.algorithm), transform.inclusivePrefixes};
    }
  }
  return DigestCanonicalForm(target, canonicalization, algorithm, omitted);
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
