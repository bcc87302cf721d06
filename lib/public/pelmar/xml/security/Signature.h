// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// XML Signature over the platform's own tree: a small closed profile.

#ifndef PELMAR_XML_SECURITY_SIGNATURE_H
#define PELMAR_XML_SECURITY_SIGNATURE_H

#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Ref.h>
#include <pelmar/crypto/PrivateKey.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/security/KeyInfoResolver.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

/// One ds:Reference of a signature.
class PELMAR_API SignatureReference : public Object {
 public:
  /// The URI attribute: empty, or "#" and an ID. Nothing else is accepted.
  virtual const std::string& GetUri() const = 0;
  virtual const std::string& GetDigestMethod() const = 0;
  /// The transforms' algorithms in order.
  virtual const std::vector<std::string>& GetTransforms() const = 0;
  /// Adds a transform to a reference of a signature that is being made. Throws XmlSecurityException for an
  /// unknown or repeated algorithm or a wrong order (enveloped-signature, then one canonicalisation).
  virtual void AddTransform(const std::string& algorithm) = 0;

 protected:
  ~SignatureReference() override;
};

/// A ds:Signature and the context element that its references are resolved in. Belongs to one thread.
///
/// Accepted: canonicalisation by Canonical XML 1.0 or its exclusive form; the transforms enveloped-signature
/// and canonicalisation, each at most once and in this order; digests SHA-256/384/512; RSA (PKCS #1 v1.5) and
/// ECDSA with the same hashes. Inside ds:Signature stand exactly SignedInfo, SignatureValue and at most one
/// KeyInfo. At most 16 references.
class PELMAR_API Signature : public Object {
 public:
  /// In document order.
  virtual const std::vector<Ref<SignatureReference>>& GetReferences() const = 0;

  /// True when every reference's digest matches and the signature value was made by the key that `resolver`
  /// accepts; false when a digest or the value does not match. Throws XmlSecurityException, saying which, for
  /// whatever cannot be judged: an algorithm that is not accepted, an unacceptable key or chain, a reference
  /// that resolves to nothing or not to exactly one element, a canonicalisation failure. Judged in this
  /// order: algorithms, signer's certificate, signature value, references; the first that fails decides.
  /// Throws InvalidArgumentException for null, InvalidStateException for a signature that has not been made
  /// yet.
  virtual bool Verify(const KeyInfoResolver* resolver) const = 0;

  /// Adds a reference to a signature that is being made. Throws XmlSecurityException for a URI or digest that
  /// is not accepted. Like the next two, it throws InvalidStateException for a signature that was read, and
  /// after Sign.
  virtual Ref<SignatureReference> AddReference(const std::string& uri, const std::string& digestMethod) = 0;
  /// Makes `content` the content of ds:KeyInfo; null: no ds:KeyInfo.
  virtual void SetKeyInfo(const Ref<ElementNode>& content) = 0;
  /// Computes the digests and the signature value. Must be called once, when all references and the key info
  /// are set and the signed elements stand in their place. Throws XmlSecurityException when there is no
  /// reference, a reference resolves to nothing or not to exactly one element, or the key is of another type
  /// than the signature method; CryptoException when the key fails; InvalidArgumentException for null.
  virtual void Sign(const Crypto::PrivateKey* key) = 0;

  /// The ds:Signature element. For a signature that is being made it has no parent until the caller appends
  /// it somewhere.
  virtual const Ref<ElementNode>& GetElement() const = 0;

 protected:
  ~Signature() override;
};

/// Reads the structure of `signatureElement`. References are resolved against `context` itself: "" and "#" +
/// the value of its "ID" attribute; or against the one element below `context` that carries the wsu:Id or ID
/// asked for. Both elements, and the tree around them, must stay alive and unchanged while the signature is
/// used. Algorithms are judged by `Verify`. Throws SignatureSyntaxException; InvalidArgumentException for
/// null.
PELMAR_API void CreateSignatureFromDom(ElementNode* context, ElementNode* signatureElement,
                                       Ref<Signature>& result);

/// A new signature over `context`, which has no references yet. Its elements use `elementPrefix`, declared on
/// ds:Signature. The canonicalisation method must be an exclusive one: the signature is made before it has
/// its place, and only the exclusive form is the same in every place. Throws XmlSecurityException for an
/// algorithm that is not accepted.
PELMAR_API void CreateBlankSignature(ElementNode* context, const std::string& canonicalizationMethod,
                                     const std::string& signatureMethod, const std::string& elementPrefix,
                                     Ref<Signature>& result);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SECURITY_SIGNATURE_H
