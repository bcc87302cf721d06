// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/SignatureDocuments.h"

#include <pelmar/Exception.h>
#include <pelmar/Reader.h>
#include <pelmar/StringUtil.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>
#include <pelmar/xml/security/KeyInfoResolver.h>
#include <pelmar/xml/security/Signature.h>

namespace TestSupport {

using namespace Pelmar::Xml;
using namespace Pelmar::Xml::Security;
using Pelmar::Ref;

Ref<Document> ParseDocument(const std::string& text) {
  Ref<Pelmar::Object> result;
  const Ref<Pelmar::Reader> reader = Pelmar::CreateStringReader(text);
  CreateXMLParser(CreateXMLDocumentHandler())->Parse(reader.Get(), result);
  return ViewAsDocument(result);
}

std::string WriteDocument(const Document& document) {
  const Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  document.GetDocumentElement()->WriteXml(writer.Get());
  return writer->GetText();
}

ElementNode* FindSignature(const ElementNode& element) {
  return element.FindChildElement(kSignatureNamespace, "Signature");
}

Ref<ElementNode> MakeX509Data(const std::vector<Identity>& identities) {
  Ref<ElementNode> data;
  CreateElementNode("ds", "X509Data", data);
  for (const Identity& identity : identities) {
    Ref<ElementNode> element;
    CreateElementNode("ds", "X509Certificate", element);
    Ref<TextNode> text;
    CreateTextNode(text);
    text->SetText(Pelmar::StringUtil::Base64Encode(identity.certificate->GetDer()));
    element->AppendChild(text);
    data->AppendChild(element);
  }
  return data;
}

std::string SignDocument(const std::string& text, const Identity& signer, const SigningPlan& plan) {
  const Ref<Document> document = ParseDocument(text);
  ElementNode* const root = document->GetDocumentElement();
  Ref<Signature> signature;
  CreateBlankSignature(root, kExclusiveC14n, plan.signatureMethod, plan.prefix, signature);
  const Ref<SignatureReference> reference = signature->AddReference(plan.uri, plan.digestMethod);
  for (const std::string& transform : plan.transforms) {
    reference->AddTransform(transform);
  }
  std::vector<Identity> shown = {signer};
  shown.insert(shown.end(), plan.alsoShown.begin(), plan.alsoShown.end());
  const Ref<ElementNode> x509Data = MakeX509Data(shown);
  if (plan.prefix != "ds") {
    x509Data->DefineAttribute("xmlns:ds", kSignatureNamespace);
  }
  signature->SetKeyInfo(x509Data);
  signature->Sign(signer.GetKey().Get());
  root->AppendChild(signature->GetElement());
  return WriteDocument(*document);
}

std::string VerifyElement(ElementNode* context,
                          const std::list<Ref<const Pelmar::Crypto::Certificate>>& trusted) {
  ElementNode* const element = FindSignature(*context);
  if (element == nullptr) {
    return "unsigned";
  }
  try {
    Ref<Signature> signature;
    CreateSignatureFromDom(context, element, signature);
    return signature->Verify(CreateTrustChainKeyResolver(trusted).Get()) ? "verified" : "refused";
  } catch (const SignatureSyntaxException& error) {
    return std::string("SignatureSyntaxException: ") + error.what();
  } catch (const XmlSecurityException& error) {
    return std::string("XmlSecurityException: ") + error.what();
  }
}

std::string VerifyDocument(const std::string& text,
                           const std::list<Ref<const Pelmar::Crypto::Certificate>>& trusted) {
  Ref<Document> document;
  try {
    document = ParseDocument(text);
  } catch (const XMLParseException& error) {
    return std::string("XMLParseException: ") + error.what();
  }
  return VerifyElement(document->GetDocumentElement(), trusted);
}

}  // namespace TestSupport
