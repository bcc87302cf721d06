// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/KeyInfoCertificates.h"

#include "pelmar/xml/SignatureChildren.h"

#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>

#include <string>

namespace Pelmar {
namespace Xml {
namespace Security {

namespace {

using Encodings = std::vector<std::vector<unsigned char>>;

void ReadX509Data(const ElementNode& x509Data, Encodings& certificates) {
  for (const Node* node = x509Data.GetFirstChildNode(); node != nullptr; node = node->GetNextSibling()) {
    const ElementNode* const element = AsElement(node);
    if (element == nullptr || !IsElementOf(*element, kSignatureNamespace, "X509Certificate")) {
      continue;
    }
    if (certificates.size() == kMaxKeyInfoCertificates) {
      throw XmlSecurityException("The signature's KeyInfo holds more than " +
                                 std::to_string(kMaxKeyInfoCertificates) + " certificates");
    }
    certificates.push_back(RequireBase64Content(*element));
  }
}

}  // namespace

Encodings ReadKeyInfoCertificates(const ElementNode* keyInfo) {
  if (keyInfo == nullptr) {
    throw XmlSecurityException("The signature has no KeyInfo");
  }
  Encodings certificates;
  for (const Node* node = keyInfo->GetFirstChildNode(); node != nullptr; node = node->GetNextSibling()) {
    const ElementNode* const element = AsElement(node);
    if (element != nullptr && IsElementOf(*element, kSignatureNamespace, "X509Data")) {
      ReadX509Data(*element, certificates);
    }
  }
  if (certificates.empty()) {
    throw XmlSecurityException("The signature's KeyInfo holds no certificate");
  }
  return certificates;
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
