// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Two promises about signatures, for any document:
// - what verifies under the trusted signer has the content that this signer signed. The seeds are one
//   document, signed by the xmlsec1 program with the key of SignatureFuzzKey.h in the ways of the profile, so
//   there is one content that may ever come out;
// - what we sign verifies, in the tree and after writing and parsing.

#include "SignatureFuzzKey.h"

#include <pelmar/Reader.h>
#include <pelmar/StringUtil.h>
#include <pelmar/Writer.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>
#include <pelmar/xml/security/Exceptions.h>
#include <pelmar/xml/security/KeyInfoResolver.h>
#include <pelmar/xml/security/Signature.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <string>

namespace {

using namespace Pelmar::Xml;
using namespace Pelmar::Xml::Security;
using Pelmar::Ref;

constexpr const char* kSignedContent =
    "<a:Assertion xmlns:a=\"urn:a\" xmlns:b=\"urn:b\" ID=\"_1\" y=\"&lt;&#xA;\" b:x=\"1\">"
    "<a:Subject>user@example</a:Subject><c "
    "xmlns=\"urn:c\"><a:v xmlns:a=\"urn:d\">text &amp; &#xD;</a:v></c></a:Assertion>";

[[noreturn]] void Fail(const char* promise) {
  std::cerr << "broken: " << promise << std::endl;
  std::abort();
}

Ref<Document> Parse(const std::string& text) {
  Ref<Pelmar::Object> result;
  const Ref<Pelmar::Reader> reader = Pelmar::CreateStringReader(text);
  CreateXMLParser(CreateXMLDocumentHandler())->Parse(reader.Get(), result);
  return ViewAsDocument(result);
}

const Ref<const Pelmar::Crypto::Certificate>& GetSigner() {
  static const Ref<const Pelmar::Crypto::Certificate> signer =
      Pelmar::Crypto::CreateCertificateFromPem(kFuzzCertificatePem);
  return signer;
}

const Ref<const Pelmar::Crypto::PrivateKey>& GetKey() {
  static const Ref<const Pelmar::Crypto::PrivateKey> key =
      Pelmar::Crypto::CreatePrivateKeyFromPem(kFuzzKeyPem);
  return key;
}

const KeyInfoResolver* GetResolver() {
  static const Ref<KeyInfoResolver> resolver = CreateTrustChainKeyResolver({GetSigner()});
  return resolver.Get();
}

/// Leaves KeyInfo aside.
class FixedResolver final : public KeyInfoResolver {
 public:
  Ref<const Pelmar::Crypto::Certificate> ResolveSigner(const ElementNode* /*keyInfo*/) const override {
    return GetSigner();
  }
};

bool Covers(const Signature& signature, const ElementNode& root) {
  std::string id;
  root.GetAttribute("ID", id);
  for (const Ref<SignatureReference>& reference : signature.GetReferences()) {
    if (reference->GetUri().empty() || reference->GetUri() == "#" + id) {
      return true;
    }
  }
  return false;
}

void RequireSignedContent(const ElementNode* root, const ElementNode* signature) {
  const Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  CreateCanonicalizer(kExclusiveC14n)->Canonicalize(root, writer.Get(), signature);
  if (writer->GetText() != kSignedContent) {
    Fail("a verified document has other content than the signed one");
  }
}

void CheckForgery(const std::string& text) {
  const Ref<Document> document = Parse(text);
  ElementNode* const root = document->GetDocumentElement();
  ElementNode* const element = root->FindChildElement(kSignatureNamespace, "Signature");
  if (element == nullptr) {
    return;
  }
  Ref<Signature> signature;
  CreateSignatureFromDom(root, element, signature);
  if (Covers(*signature, *root) && signature->Verify(GetResolver())) {
    RequireSignedContent(root, element);
  }
}

bool Verifies(ElementNode* root, ElementNode* element) {
  const Ref<FixedResolver> resolver = Pelmar::MakeRef<FixedResolver>();
  Ref<Signature> signature;
  CreateSignatureFromDom(root, element, signature);
  return signature->Verify(resolver.Get());
}

void CheckSigning(const std::string& text, const char* canonicalization) {
  const Ref<Document> document = Parse(text);
  ElementNode* const root = document->GetDocumentElement();
  Ref<Signature> signature;
  CreateBlankSignature(root, kExclusiveC14n, kEcdsaSha256, "ds", signature);
  const Ref<SignatureReference> reference = signature->AddReference("", kSha256);
  reference->AddTransform(kEnvelopedSignature);
  reference->AddTransform(canonicalization);
  signature->Sign(GetKey().Get());
  root->AppendChild(signature->GetElement());
  if (!Verifies(root, signature->GetElement().Get())) {
    Fail("what was signed verifies");
  }
  // What stands around the document element is not written, but it is signed.
  if (document->GetChildCount() != 1) {
    return;
  }
  const Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  root->WriteXml(writer.Get());
  const Ref<Document> again = Parse(writer->GetText());
  if (!Verifies(again->GetDocumentElement(), AsElement(again->GetDocumentElement()->GetLastChildNode()))) {
    Fail("what was signed and written verifies");
  }
}

/// Signs the content and asks the resolver that the forgeries meet: a target whose signer is not trusted
/// would prove nothing.
void RequireTrustedSigner() {
  const Ref<Document> document = Parse(kSignedContent);
  ElementNode* const root = document->GetDocumentElement();
  Ref<Signature> signature;
  CreateBlankSignature(root, kExclusiveC14n, kEcdsaSha256, "ds", signature);
  signature->AddReference("#_1", kSha256)->AddTransform(kEnvelopedSignature);
  const Ref<Document> keyInfo =
      Parse(std::string("<ds:X509Data xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"><ds:X509Certificate>") +
            Pelmar::StringUtil::Base64Encode(GetSigner()->GetDer()) + "</ds:X509Certificate></ds:X509Data>");
  signature->SetKeyInfo(keyInfo->GetDocumentElement());
  signature->Sign(GetKey().Get());
  root->AppendChild(signature->GetElement());
  if (!signature->Verify(GetResolver())) {
    Fail("the trusted signer is believed");
  }
}

template <typename Check>
void Try(Check check) {
  try {
    check();
  } catch (const XMLParseException&) {
  } catch (const XmlSecurityException&) {
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const bool selfChecked = (RequireTrustedSigner(), true);
  static_cast<void>(selfChecked);
  const std::string text(reinterpret_cast<const char*>(data), size);
  Try([&text] { CheckForgery(text); });
  Try([&text] { CheckSigning(text, kExclusiveC14n); });
  Try([&text] { CheckSigning(text, kC14n); });
  return 0;
}
