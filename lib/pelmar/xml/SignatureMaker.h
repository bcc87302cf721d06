// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A signature in the making.

#ifndef PELMAR_XML_SIGNATUREMAKER_H
#define PELMAR_XML_SIGNATUREMAKER_H

#include "pelmar/xml/SignatureReferenceImpl.h"

#include <pelmar/xml/security/Signature.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

class SignatureMaker final : public Signature {
 public:
  /// Throws XmlSecurityException.
  SignatureMaker(ElementNode* context, const std::string& canonicalizationMethod,
                 const std::string& signatureMethod, const std::string& prefix);

  const std::vector<Ref<SignatureReference>>& GetReferences() const override { return _references; }
  /// Reads what was made, like anybody else's signature. Throws InvalidStateException before it is made.
  bool Verify(const KeyInfoResolver* resolver) const override;
  Ref<SignatureReference> AddReference(const std::string& uri, const std::string& digestMethod) override;
  void SetKeyInfo(const Ref<ElementNode>& content) override;
  void Sign(const Crypto::PrivateKey* key) override;
  const Ref<ElementNode>& GetElement() const override { return _element; }

 private:
  ~SignatureMaker() override;

  void RequireOpen() const;
  Ref<ElementNode> MakeElement(const char* localName) const;
  Ref<ElementNode> MakeMethod(const char* localName, const std::string& algorithm) const;
  Ref<ElementNode> MakeText(const char* localName, const std::vector<unsigned char>& bytes) const;
  Ref<ElementNode> MakeTransforms(const std::vector<std::string>& algorithms) const;
  Ref<ElementNode> MakeReference(const SignatureReference& reference) const;
  Ref<ElementNode> MakeSignedInfo() const;
  std::vector<unsigned char> MakeValue(const Crypto::PrivateKey* key, const ElementNode* signedInfo) const;

  const Ref<ElementNode> _context;
  const std::string _canonicalizationMethod;
  const std::string _signatureMethod;
  const std::string _prefix;
  Ref<ElementNode> _element;
  Ref<ElementNode> _keyInfoContent;
  std::vector<Ref<SignatureReference>> _references;
  bool _signing = false;
  bool _signed = false;
};

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SIGNATUREMAKER_H
