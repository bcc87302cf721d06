// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SignatureMaker.h"

#include "pelmar/xml/SignatureProfile.h"
#include "pelmar/xml/SignatureReferenceDigest.h"
#include "pelmar/xml/SignatureReferenceTarget.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>
#include <pelmar/xml/security/Exceptions.h>

namespace Pelmar {
namespace Xml {
namespace Security {

namespace {

std::string DropFinalHash(const std::string& algorithm) {
  return algorithm == kC14n ? algorithm.substr(0, algorithm.size() - 1) : algorithm;
}

std::vector<TransformSyntax> ToSyntax(const std::vector<std::string>& algorithms) {
  std::vector<TransformSyntax> transforms;
  for (const std::string& algorithm : algorithms) {
    transforms.push_back({algorithm, {}});
  }
  return transforms;
}

// SignedInfo is signed before the caller gives the signature its place. The exclusive form is the same in
// every place; the inclusive one would take in the namespaces declared there.
void RequireExclusive(const std::string& canonicalizationMethod) {
  RequireCanonicalizationMethod(canonicalizationMethod);
  if (!IsExclusiveCanonicalization(canonicalizationMethod)) {
    throw XmlSecurityException("Canonicalization method " + QuoteForMessage(canonicalizationMethod) +
                               " cannot be used to make a signature");
  }
}

void RequireFittingKey(const Crypto::PrivateKey* key, const std::string& signatureMethod) {
  if (key == nullptr) {
    throw InvalidArgumentException("there is no key to sign with");
  }
  if (key->GetType() != RequireSignatureMethod(signatureMethod).keyType) {
    throw XmlSecurityException("Signature method " + QuoteForMessage(signatureMethod) +
                               " does not fit the key");
  }
}

}  // namespace

SignatureMaker::SignatureMaker(ElementNode* context, const std::string& canonicalizationMethod,
                               const std::string& signatureMethod, const std::string& prefix)
    : _context(context),
      _canonicalizationMethod(canonicalizationMethod),
      _signatureMethod(signatureMethod),
      _prefix(prefix) {
  RequireExclusive(canonicalizationMethod);
  RequireSignatureMethod(signatureMethod);
  _element = MakeElement("Signature");
  _element->DefineAttribute(prefix.empty() ? "xmlns" : "xmlns:" + prefix, kSignatureNamespace);
}

SignatureMaker::~SignatureMaker() = default;

bool SignatureMaker::Verify(const KeyInfoResolver* resolver) const {
  if (!_signed) {
    throw InvalidStateException("The signature has not been made yet");
  }
  Ref<Signature> made;
  CreateSignatureFromDom(_context.Get(), _element.Get(), made);
  return made->Verify(resolver);
}

Ref<SignatureReference> SignatureMaker::AddReference(const std::string& uri,
                                                     const std::string& digestMethod) {
  RequireOpen();
  RequireReferenceUri(uri);
  RequireDigestMethod(digestMethod);
  if (_references.size() == kMaxReferences) {
    throw XmlSecurityException("A signature can have " + std::to_string(kMaxReferences) +
                               " references at most");
  }
  _references.push_back(MakeRef<SignatureReferenceImpl>(uri, digestMethod));
  return _references.back();
}

void SignatureMaker::SetKeyInfo(const Ref<ElementNode>& content) {
  RequireOpen();
  _keyInfoContent = content;
}

// Whether it succeeds or not, there is no second attempt: the references may then not be what the caller
// thinks they are.
void SignatureMaker::Sign(const Crypto::PrivateKey* key) {
  RequireOpen();
  RequireFittingKey(key, _signatureMethod);
  if (_references.empty()) {
    throw XmlSecurityException("A signature needs a reference");
  }
  _signing = true;
  const Ref<ElementNode> signedInfo = MakeSignedInfo();
  // Inside ds:Signature, SignedInfo has the declaration of its prefix from there, as it will have for the
  // verifier.
  _element->AppendChild(signedInfo);
  _element->AppendChild(MakeText("SignatureValue", MakeValue(key, signedInfo.Get())));
  if (_keyInfoContent) {
    const Ref<ElementNode> keyInfo = MakeElement("KeyInfo");
    keyInfo->AppendChild(_keyInfoContent);
    _element->AppendChild(keyInfo);
  }
  _signed = true;
}

void SignatureMaker::RequireOpen() const {
  if (_signing) {
    throw InvalidStateException("The signature has been made already");
  }
}

Ref<ElementNode> SignatureMaker::MakeElement(const char* localName) const {
  Ref<ElementNode> element;
  CreateElementNode(_prefix, localName, element);
  return element;
}

Ref<ElementNode> SignatureMaker::MakeMethod(const char* localName, const std::string& algorithm) const {
  const Ref<ElementNode> element = MakeElement(localName);
  element->DefineAttribute("Algorithm", DropFinalHash(algorithm));
  return element;
}

Ref<ElementNode> SignatureMaker::MakeText(const char* localName,
                                          const std::vector<unsigned char>& bytes) const {
  const Ref<ElementNode> element = MakeElement(localName);
  Ref<TextNode> text;
  CreateTextNode(text);
  text->SetText(StringUtil::Base64Encode(bytes));
  element->AppendChild(text);
  return element;
}

Ref<ElementNode> SignatureMaker::MakeTransforms(const std::vector<std::string>& algorithms) const {
  const Ref<ElementNode> element = MakeElement("Transforms");
  for (const std::string& algorithm : algorithms) {
    element->AppendChild(MakeMethod("Transform", algorithm));
  }
  return element;
}

Ref<ElementNode> SignatureMaker::MakeReference(const SignatureReference& reference) const {
  const Ref<ElementNode> element = MakeElement("Reference");
  element->DefineAttribute("URI", reference.GetUri());
  if (!reference.GetTransforms().empty()) {
    element->AppendChild(MakeTransforms(reference.GetTransforms()));
  }
  element->AppendChild(MakeMethod("DigestMethod", reference.GetDigestMethod()));
  // An enveloped reference leaves this signature out, so its digest is the same before the signature stands
  // in the tree.
  const std::vector<unsigned char> digest = DigestReferenceTarget(
      FindReferenceTarget(_context.Get(), reference.GetUri()), ToSyntax(reference.GetTransforms()),
      RequireDigestMethod(reference.GetDigestMethod()), _element.Get());
  element->AppendChild(MakeText("DigestValue", digest));
  return element;
}

Ref<ElementNode> SignatureMaker::MakeSignedInfo() const {
  const Ref<ElementNode> element = MakeElement("SignedInfo");
  element->AppendChild(MakeMethod("CanonicalizationMethod", _canonicalizationMethod));
  element->AppendChild(MakeMethod("SignatureMethod", _signatureMethod));
  for (const Ref<SignatureReference>& reference : _references) {
    element->AppendChild(MakeReference(*reference));
  }
  return element;
}

std::vector<unsigned char> SignatureMaker::MakeValue(const Crypto::PrivateKey* key,
                                                     const ElementNode* signedInfo) const {
  const Ref<StringWriter> writer = CreateStringWriter();
  CreateCanonicalizer(_canonicalizationMethod)->Canonicalize(signedInfo, writer.Get());
  const std::string& octets = writer->GetText();
  return key->Sign(RequireSignatureMethod(_signatureMethod).digest, octets.data(), octets.size());
}

void CreateBlankSignature(ElementNode* context, const std::string& canonicalizationMethod,
                          const std::string& signatureMethod, const std::string& elementPrefix,
                          Ref<Signature>& result) {
  if (context == nullptr) {
    throw InvalidArgumentException("a signature needs a context element");
  }
  result = MakeRef<SignatureMaker>(context, canonicalizationMethod, signatureMethod, elementPrefix);
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
