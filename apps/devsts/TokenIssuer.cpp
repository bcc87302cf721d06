// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/TokenIssuer.h"

#include "devsts/AssertionText.h"
#include "devsts/XmlReading.h"

#include <pelmar/StringUtil.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Signature.h>

namespace DevSts {

using Pelmar::Ref;
using Pelmar::Xml::ElementNode;
namespace Security = Pelmar::Xml::Security;

namespace {

/// ds:X509Data with the signer's certificate first (XML Signature 1.1, section 4.5.4).
Ref<ElementNode> MakeX509Data(const std::vector<Ref<const Pelmar::Crypto::Certificate>>& certificates) {
  Ref<ElementNode> data;
  Pelmar::Xml::CreateElementNode("ds", "X509Data", data);
  for (const auto& certificate : certificates) {
    Ref<Pelmar::Xml::TextNode> text;
    Pelmar::Xml::CreateTextNode(text);
    text->SetText(Pelmar::StringUtil::Base64Encode(certificate->GetDer()));
    Ref<ElementNode> element;
    Pelmar::Xml::CreateElementNode("ds", "X509Certificate", element);
    element->AppendChild(text);
    data->AppendChild(element);
  }
  return data;
}

std::string ToText(const ElementNode& element) {
  const Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  element.WriteXml(writer.Get());
  return writer->GetText();
}

}  // namespace

TokenIssuer::TokenIssuer(const Identity& signer, const std::string& name)
    : _name(name), _key(signer.GetSigningKey()) {
  _certificates.push_back(Pelmar::Crypto::CreateCertificateFromPem(signer.certificate));
  for (const std::string& issuer : signer.issuers) {
    _certificates.push_back(Pelmar::Crypto::CreateCertificateFromPem(issuer));
  }
}

std::string TokenIssuer::Issue(const AssertionContent& content) const {
  const UnsignedAssertion assertion = WriteAssertion(content, _name);
  const Ref<Pelmar::Xml::Document> document = ParseMessage(assertion.head + assertion.tail);
  Ref<Security::Signature> signature;
  Security::CreateBlankSignature(document->GetDocumentElement(), Security::kExclusiveC14n,
                                 Security::kRsaSha256, "ds", signature);
  const Ref<Security::SignatureReference> reference =
      signature->AddReference("#" + assertion.id, Security::kSha256);
  reference->AddTransform(Security::kEnvelopedSignature);
  reference->AddTransform(Security::kExclusiveC14n);
  signature->SetKeyInfo(MakeX509Data(_certificates));
  signature->Sign(_key.Get());
  return assertion.head + ToText(*signature->GetElement()) + assertion.tail;
}

}  // namespace DevSts
