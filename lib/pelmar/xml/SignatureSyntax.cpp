// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SignatureSyntax.h"

#include "pelmar/xml/SignatureChildren.h"
#include "pelmar/xml/SignatureProfile.h"

#include <pelmar/xml/security/Algorithms.h>

#include <algorithm>

namespace Pelmar {
namespace Xml {
namespace Security {

namespace {

void RequireEmpty(const ElementNode& element) {
  SignatureChildren(element).RequireEnd();
}

/// The words of a list as XML Schema separates them: by white space.
std::vector<std::string> SplitList(const std::string& text) {
  constexpr const char* kWhiteSpace = " \t\r\n";
  std::vector<std::string> words;
  std::size_t begin = text.find_first_not_of(kWhiteSpace);
  while (begin != std::string::npos) {
    const std::size_t end = std::min(text.find_first_of(kWhiteSpace, begin), text.size());
    words.push_back(text.substr(begin, end - begin));
    begin = text.find_first_not_of(kWhiteSpace, end);
  }
  return words;
}

std::vector<std::string> ReadInclusivePrefixes(const ElementNode& element) {
  RequireAttributes(element, {"PrefixList"});
  RequireEmpty(element);
  std::vector<std::string> prefixes = SplitList(RequireAttribute(element, "PrefixList"));
  if (prefixes.size() > kMaxInclusivePrefixes) {
    ThrowSignatureSyntax("PrefixList holds more than " + std::to_string(kMaxInclusivePrefixes) + " prefixes",
                         element);
  }
  return prefixes;
}

/// The parameters of a canonicalisation or transform that is accepted.
void ReadParameters(const ElementNode& element, TransformSyntax& transform) {
  SignatureChildren children(element);
  if (IsExclusiveCanonicalization(transform.algorithm)) {
    if (const ElementNode* const list = children.TakeIf(kExclusiveC14n, "InclusiveNamespaces")) {
      transform.inclusivePrefixes = ReadInclusivePrefixes(*list);
    }
  }
  children.RequireEnd();
}

TransformSyntax ReadTransform(const ElementNode& element) {
  RequireAttributes(element, {"Algorithm"});
  TransformSyntax transform = {RequireAttribute(element, "Algorithm"), {}};
  if (IsTransform(transform.algorithm)) {
    ReadParameters(element, transform);
  }
  return transform;
}

std::string ReadSignatureMethod(const ElementNode& element) {
  RequireAttributes(element, {"Algorithm"});
  const std::string algorithm = RequireAttribute(element, "Algorithm");
  if (IsSignatureMethod(algorithm)) {
    RequireEmpty(element);
  }
  return algorithm;
}

std::string ReadDigestMethod(const ElementNode& element) {
  RequireAttributes(element, {"Algorithm"});
  const std::string algorithm = RequireAttribute(element, "Algorithm");
  if (IsDigestMethod(algorithm)) {
    RequireEmpty(element);
  }
  return algorithm;
}

std::vector<TransformSyntax> ReadTransforms(const ElementNode& element) {
  RequireAttributes(element, {});
  SignatureChildren children(element);
  std::vector<TransformSyntax> transforms;
  do {
    transforms.push_back(ReadTransform(children.Require("Transform")));
  } while (children.IsNext("Transform"));
  children.RequireEnd();
  return transforms;
}

std::vector<unsigned char> ReadDigestValue(const ElementNode& element) {
  RequireAttributes(element, {});
  return RequireBase64Content(element);
}

ReferenceSyntax ReadReference(const ElementNode& element) {
  // Type is a hint for applications (XML Signature 1.1, section 4.4.3); nothing here depends on it.
  RequireAttributes(element, {"Id", "URI", "Type"});
  ReferenceSyntax reference;
  reference.uri = RequireAttribute(element, "URI");
  SignatureChildren children(element);
  if (const ElementNode* const transforms = children.TakeIf("Transforms")) {
    reference.transforms = ReadTransforms(*transforms);
  }
  reference.digestMethod = ReadDigestMethod(children.Require("DigestMethod"));
  reference.digestValue = ReadDigestValue(children.Require("DigestValue"));
  children.RequireEnd();
  return reference;
}

void ReadReferences(SignatureChildren& children, SignatureSyntax& signature) {
  do {
    const ElementNode& element = children.Require("Reference");
    if (signature.references.size() == kMaxReferences) {
      ThrowSignatureSyntax("The signature has more than " + std::to_string(kMaxReferences) + " references",
                           element);
    }
    signature.references.push_back(ReadReference(element));
  } while (children.IsNext("Reference"));
}

void ReadSignedInfo(const ElementNode& element, SignatureSyntax& signature) {
  RequireAttributes(element, {"Id"});
  SignatureChildren children(element);
  signature.signedInfo = &element;
  signature.canonicalization = ReadTransform(children.Require("CanonicalizationMethod"));
  signature.signatureMethod = ReadSignatureMethod(children.Require("SignatureMethod"));
  ReadReferences(children, signature);
  children.RequireEnd();
}

std::vector<unsigned char> ReadSignatureValue(const ElementNode& element) {
  RequireAttributes(element, {"Id"});
  return RequireBase64Content(element);
}

}  // namespace

SignatureSyntax ReadSignatureSyntax(const ElementNode* element) {
  if (!IsElementOf(*element, kSignatureNamespace, "Signature")) {
    ThrowSignatureSyntax("Element " + QuoteForMessage(element->GetQualifiedName()) + " is not a signature",
                         *element);
  }
  RequireAttributes(*element, {"Id"});
  SignatureChildren children(*element);
  SignatureSyntax signature;
  ReadSignedInfo(children.Require("SignedInfo"), signature);
  signature.signatureValue = ReadSignatureValue(children.Require("SignatureValue"));
  signature.keyInfo = children.TakeIf("KeyInfo");
  children.RequireEnd();
  return signature;
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
