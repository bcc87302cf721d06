// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SignatureVerifier.h"

#include "pelmar/crypto/SignatureValue.h"
#include "pelmar/xml/SignatureProfile.h"
#include "pelmar/xml/SignatureReferenceDigest.h"
#include "pelmar/xml/SignatureReferenceImpl.h"
#include "pelmar/xml/SignatureReferenceTarget.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>

#include <algorithm>

namespace Pelmar {
namespace Xml {
namespace Security {

namespace {

std::vector<std::string> GetAlgorithms(const std::vector<TransformSyntax>& transforms) {
  std::vector<std::string> algorithms;
  for (const TransformSyntax& transform : transforms) {
    algorithms.push_back(transform.algorithm);
  }
  return algorithms;
}

bool IsEnveloped(const ReferenceSyntax& reference) {
  return !reference.transforms.empty() && reference.transforms.front().algorithm == kEnvelopedSignature;
}

// XML Signature 1.1, section 6.6.4: the transform is for a signature within what is signed. A signature that
// is itself the target would leave nothing to digest.
void RequireInside(const ElementNode* signature, const Node* target, const std::string& uri) {
  if (!IsWithin(signature->GetParent(), target)) {
    throw XmlSecurityException("Reference " + QuoteForMessage(uri) +
                               " is enveloped, but the signature is not inside it");
  }
}

void RequireKeyType(const Crypto::Certificate* signer, const std::string& signatureMethod) {
  if (Crypto::GetSignatureKeyType(signer) != RequireSignatureMethod(signatureMethod).keyType) {
    throw XmlSecurityException("Signature method " + QuoteForMessage(signatureMethod) +
                               " does not fit the signer's key");
  }
}

[[noreturn]] void ThrowExists() {
  throw InvalidStateException("The signature exists already; nothing can be added to it");
}

}  // namespace

Signature::~Signature() = default;

SignatureVerifier::SignatureVerifier(ElementNode* context, ElementNode* signatureElement)
    : _context(context), _element(signatureElement), _syntax(ReadSignatureSyntax(signatureElement)) {
  for (const ReferenceSyntax& syntax : _syntax.references) {
    const Ref<SignatureReferenceImpl> reference =
        MakeRef<SignatureReferenceImpl>(syntax.uri, syntax.digestMethod);
    reference->Close(GetAlgorithms(syntax.transforms));
    _references.push_back(reference);
  }
}

SignatureVerifier::~SignatureVerifier() = default;

bool SignatureVerifier::Verify(const KeyInfoResolver* resolver) const {
  if (resolver == nullptr) {
    throw InvalidArgumentException("there is no key info resolver");
  }
  RequireProfile();
  const Ref<const Crypto::Certificate> signer = resolver->ResolveSigner(_syntax.keyInfo);
  return IsSignedInfoAuthentic(signer.Get()) && AreReferencesIntact();
}

void SignatureVerifier::RequireProfile() const {
  RequireCanonicalizationMethod(_syntax.canonicalization.algorithm);
  RequireSignatureMethod(_syntax.signatureMethod);
  for (const ReferenceSyntax& reference : _syntax.references) {
    RequireReferenceUri(reference.uri);
    RequireTransforms(GetAlgorithms(reference.transforms));
    RequireDigestMethod(reference.digestMethod);
  }
}

bool SignatureVerifier::IsSignedInfoAuthentic(const Crypto::Certificate* signer) const {
  const Crypto::DigestAlgorithm digest = RequireSignatureMethod(_syntax.signatureMethod).digest;
  try {
    RequireKeyType(signer, _syntax.signatureMethod);
    return Crypto::VerifySignatureValue(
        signer, digest, DigestCanonicalForm(_syntax.signedInfo, _syntax.canonicalization, digest, nullptr),
        _syntax.signatureValue);
  } catch (const Crypto::CryptoException& error) {
    throw XmlSecurityException(error.what());
  }
}

bool SignatureVerifier::IsReferenceIntact(const ReferenceSyntax& reference) const {
  const Node* const target = FindReferenceTarget(_context.Get(), reference.uri);
  if (IsEnveloped(reference)) {
    RequireInside(_element.Get(), target, reference.uri);
  }
  return DigestReferenceTarget(target, reference.transforms, RequireDigestMethod(reference.digestMethod),
                               _element.Get()) == reference.digestValue;
}

bool SignatureVerifier::AreReferencesIntact() const {
  return std::all_of(_syntax.references.begin(), _syntax.references.end(),
                     [this](const ReferenceSyntax& reference) { return IsReferenceIntact(reference); });
}

Ref<SignatureReference> SignatureVerifier::AddReference(const std::string& /*uri*/,
                                                        const std::string& /*digestMethod*/) {
  ThrowExists();
}

void SignatureVerifier::SetKeyInfo(const Ref<ElementNode>& /*content*/) {
  ThrowExists();
}

void SignatureVerifier::Sign(const Crypto::PrivateKey* /*key*/) {
  ThrowExists();
}

void CreateSignatureFromDom(ElementNode* context, ElementNode* signatureElement, Ref<Signature>& result) {
  if (context == nullptr || signatureElement == nullptr) {
    throw InvalidArgumentException("a signature needs a context element and a signature element");
  }
  result = MakeRef<SignatureVerifier>(context, signatureElement);
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
