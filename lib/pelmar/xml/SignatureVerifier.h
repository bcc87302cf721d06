// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A signature that was read from a document.

#ifndef PELMAR_XML_SIGNATUREVERIFIER_H
#define PELMAR_XML_SIGNATUREVERIFIER_H

#include "pelmar/xml/SignatureSyntax.h"

#include <pelmar/xml/security/Signature.h>

#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

class SignatureVerifier final : public Signature {
 public:
  /// Throws SignatureSyntaxException.
  SignatureVerifier(ElementNode* context, ElementNode* signatureElement);

  const std::vector<Ref<SignatureReference>>& GetReferences() const override { return _references; }

  /// Judges in this order, so that a stranger's signature costs little, and nothing is looked up or digested
  /// on its word (XML Signature Best Practices, 2.1): algorithms and reference forms; the signer's
  /// certificate; the signature value over SignedInfo; then the references.
  bool Verify(const KeyInfoResolver* resolver) const override;

  /// These throw InvalidStateException: the signature is there already.
  Ref<SignatureReference> AddReference(const std::string& uri, const std::string& digestMethod) override;
  void SetKeyInfo(const Ref<ElementNode>& content) override;
  void Sign(const Crypto::PrivateKey* key) override;

  const Ref<ElementNode>& GetElement() const override { return _element; }

 private:
  ~SignatureVerifier() override;

  void RequireProfile() const;
  bool IsSignedInfoAuthentic(const Crypto::Certificate* signer) const;
  bool IsReferenceIntact(const ReferenceSyntax& reference) const;
  bool AreReferencesIntact() const;

  const Ref<ElementNode> _context;
  const Ref<ElementNode> _element;
  const SignatureSyntax _syntax;
  std::vector<Ref<SignatureReference>> _references;
};

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SIGNATUREVERIFIER_H
