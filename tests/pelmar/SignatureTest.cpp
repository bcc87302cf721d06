// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Making signatures, and reading their structure (XML Signature 1.1, section 4).

#include "pelmar/SignatureSamples.h"
#include "pelmar/xml/SignatureSyntax.h"

#include <pelmar/crypto/CryptoException.h>

#include <gtest/gtest.h>

#include <regex>
#include <string>
#include <vector>

namespace {

using namespace SignatureSamples;

// ---- Making ----

TEST(Signature, HasTheStandardLayoutWithoutWhiteSpace) {
  const std::string values =
      std::regex_replace(SignedDocument(), std::regex(">[A-Za-z0-9+/=]{40,}<"), ">...<");
  EXPECT_EQ(values,
            "<a:Assertion xmlns:a=\"urn:a\" ID=\"_1\" a:x=\"&lt;&#xA;\"><a:Text>some &amp; text</a:Text>"
            "<a:Empty></a:Empty>"
            "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"><ds:SignedInfo>"
            "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
            "<ds:SignatureMethod Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/>"
            "<ds:Reference URI=\"#_1\"><ds:Transforms>"
            "<ds:Transform Algorithm=\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\"/>"
            "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/></ds:Transforms>"
            "<ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
            "<ds:DigestValue>...</ds:DigestValue></ds:Reference></ds:SignedInfo>"
            "<ds:SignatureValue>...</ds:SignatureValue>"
            "<ds:KeyInfo><ds:X509Data><ds:X509Certificate>...</ds:X509Certificate></ds:X509Data></ds:KeyInfo>"
            "</ds:Signature></a:Assertion>");
}

struct MethodCase {
  KeyKind kind;
  const char* method;
};

const MethodCase kMethods[] = {{KeyKind::RSA_2048, kRsaSha256},  {KeyKind::RSA_2048, kRsaSha384},
                               {KeyKind::RSA_2048, kRsaSha512},  {KeyKind::EC_P256, kEcdsaSha256},
                               {KeyKind::EC_P384, kEcdsaSha384}, {KeyKind::EC_P521, kEcdsaSha512},
                               {KeyKind::EC_P256, kEcdsaSha512}};

TEST(Signature, VerifiesWithEveryMethodDigestAndTransform) {
  const std::vector<std::vector<std::string>> transformLists = {
      {kEnvelopedSignature},
      {kEnvelopedSignature, kC14n},
      {kEnvelopedSignature, kC14nWithComments},
      {kEnvelopedSignature, kExclusiveC14n},
      {kEnvelopedSignature, kExclusiveC14nWithComments},
  };
  for (const MethodCase& method : kMethods) {
    CertificateSpec spec;
    spec.keyKind = method.kind;
    const Identity signer = MakeSelfSigned(spec);
    SigningPlan plan;
    plan.signatureMethod = method.method;
    for (const char* const digest : {kSha256, kSha384, kSha512}) {
      plan.digestMethod = digest;
      for (const std::vector<std::string>& transforms : transformLists) {
        plan.transforms = transforms;
        for (const char* const uri : {"", "#_1"}) {
          plan.uri = uri;
          EXPECT_EQ(VerifyDocument(SignDocument(kPlain, signer, plan), Trust({signer})), "verified")
              << method.method << " " << digest << " " << transforms.back() << " " << uri;
        }
      }
    }
  }
}

TEST(Signature, WritesInclusiveCanonicalizationWithoutTheFinalHash) {
  SigningPlan plan;
  plan.transforms = {kEnvelopedSignature, kC14n};
  const std::string text = SignDocument(kPlain, Signer(), plan);
  EXPECT_NE(text.find("<ds:Transform Algorithm=\"http://www.w3.org/TR/2001/REC-xml-c14n-20010315\"/>"),
            std::string::npos);
}

TEST(Signature, UsesThePrefixItIsGiven) {
  SigningPlan plan;
  for (const char* const prefix : {"", "sig"}) {
    plan.prefix = prefix;
    const std::string text = SignDocument(kPlain, Signer(), plan);
    const std::string start = plan.prefix.empty() ? "<Signature xmlns=\"" : "<sig:Signature xmlns:sig=\"";
    EXPECT_NE(text.find(start + kSignatureNamespace + "\">"), std::string::npos) << text;
    EXPECT_EQ(VerdictOf(text), "verified");
  }
}

TEST(Signature, IsTheSameWhereverItIsPutAfterwards) {
  const Ref<Document> document = ParseDocument(
      "<e:Envelope xmlns:e=\"urn:e\" xmlns:x=\"urn:x\" xml:lang=\"en\"><e:Head xmlns=\"urn:default\"/>"
      "<e:Body ID=\"b\">t</e:Body></e:Envelope>");
  ElementNode* const envelope = document->GetDocumentElement();
  const Ref<Signature> signature = MakeBlank(envelope);
  signature->AddReference("#b", kSha256)->AddTransform(kExclusiveC14n);
  signature->SetKeyInfo(MakeX509Data({Signer()}));
  signature->Sign(Signer().GetKey().Get());
  const Ref<KeyInfoResolver> resolver = CreateTrustChainKeyResolver(Trust({Signer()}));
  EXPECT_TRUE(signature->Verify(resolver.Get()));

  envelope->FindChildElement("Head")->AppendChild(signature->GetElement());
  EXPECT_TRUE(signature->Verify(resolver.Get()));
  const Ref<Document> again = ParseDocument(WriteDocument(*document));
  Ref<Signature> read;
  CreateSignatureFromDom(again->GetDocumentElement(),
                         FindSignature(*again->GetDocumentElement()->FindChildElement("Head")), read);
  EXPECT_TRUE(read->Verify(resolver.Get()));
}

TEST(Signature, ThatWasMadeHereIsRefusedOnceTheElementChanges) {
  const Ref<Document> document = ParseDocument("<a ID=\"b\">t</a>");
  const Ref<Signature> signature = MakeBlank(document->GetDocumentElement());
  signature->AddReference("#b", kSha256)->AddTransform(kExclusiveC14n);
  signature->SetKeyInfo(MakeX509Data({Signer()}));
  signature->Sign(Signer().GetKey().Get());
  const Ref<KeyInfoResolver> resolver = CreateTrustChainKeyResolver(Trust({Signer()}));
  EXPECT_TRUE(signature->Verify(resolver.Get()));
  document->GetDocumentElement()->DefineAttribute("changed", "");
  EXPECT_FALSE(signature->Verify(resolver.Get()));
}

TEST(Signature, OverAnElementOfNoDocumentCoversTheElement) {
  Ref<ElementNode> element;
  CreateElementNode("", "detached", element);
  const Ref<Signature> signature = MakeBlank(element.Get());
  signature->AddReference("", kSha256)->AddTransform(kEnvelopedSignature);
  signature->SetKeyInfo(MakeX509Data({Signer()}));
  signature->Sign(Signer().GetKey().Get());
  element->AppendChild(signature->GetElement());
  EXPECT_EQ(VerifyElement(element.Get(), Trust({Signer()})), "verified");
  element->DefineAttribute("changed", "");
  EXPECT_EQ(VerifyElement(element.Get(), Trust({Signer()})), "refused");
}

TEST(Signature, WithoutKeyInfoIsMadeWithoutTheElement) {
  const Ref<Document> document = ParseDocument(kPlain);
  const Ref<Signature> signature = MakeBlank(document->GetDocumentElement());
  signature->AddReference("", kSha256);
  signature->Sign(Signer().GetKey().Get());
  EXPECT_EQ(signature->GetElement()->GetChildCount(), 2u);
}

TEST(Signature, RefusesToBeMadeWithWhatIsNotAccepted) {
  const Ref<Document> document = ParseDocument(kPlain);
  ElementNode* const root = document->GetDocumentElement();
  const auto blank = [root](const char* canonicalization, const char* method) {
    return RefusalOf([=] {
      Ref<Signature> signature;
      CreateBlankSignature(root, canonicalization, method, "ds", signature);
    });
  };
  EXPECT_EQ(blank("urn:c", kRsaSha256),
            "XmlSecurityException: Canonicalization method 'urn:c' is not accepted");
  EXPECT_EQ(
      blank(kC14n, kRsaSha256),
      "XmlSecurityException: Canonicalization method 'http://www.w3.org/TR/2001/REC-xml-c14n-20010315#' "
      "cannot be used to "
      "make a signature");
  EXPECT_EQ(
      blank(kExclusiveC14n, "http://www.w3.org/2000/09/xmldsig#rsa-sha1"),
      "XmlSecurityException: Signature method 'http://www.w3.org/2000/09/xmldsig#rsa-sha1' is not accepted");
  EXPECT_EQ(RefusalOf([] {
              Ref<Signature> signature;
              CreateBlankSignature(nullptr, kExclusiveC14n, kRsaSha256, "ds", signature);
            }),
            "InvalidArgumentException: Invalid argument : a signature needs a context element");

  const Ref<Signature> signature = MakeBlank(root);
  EXPECT_EQ(RefusalOf([&] { signature->AddReference("http://example.org/", kSha256); }),
            "XmlSecurityException: Reference URI 'http://example.org/' is not accepted");
  EXPECT_EQ(RefusalOf([&] { signature->AddReference("#", kSha256); }),
            "XmlSecurityException: Reference URI '#' is not accepted");
  EXPECT_EQ(RefusalOf([&] { signature->AddReference("", "http://www.w3.org/2000/09/xmldsig#sha1"); }),
            "XmlSecurityException: Digest method 'http://www.w3.org/2000/09/xmldsig#sha1' is not accepted");
  EXPECT_TRUE(signature->GetReferences().empty());
}

TEST(Signature, RefusesTransformsOutOfOrder) {
  const Ref<Document> document = ParseDocument(kPlain);
  const Ref<SignatureReference> reference =
      MakeBlank(document->GetDocumentElement())->AddReference("", kSha256);
  reference->AddTransform(kEnvelopedSignature);
  reference->AddTransform(kExclusiveC14n);
  const auto refusal = [&reference](const char* algorithm) {
    return RefusalOf([&] { reference->AddTransform(algorithm); });
  };
  EXPECT_EQ(refusal("urn:t"), "XmlSecurityException: Transform 'urn:t' is not accepted");
  EXPECT_EQ(
      refusal(kC14n),
      "XmlSecurityException: Transform 'http://www.w3.org/TR/2001/REC-xml-c14n-20010315#' is repeated or "
      "stands "
      "in the wrong order");
  EXPECT_EQ(refusal(kEnvelopedSignature),
            "XmlSecurityException: Transform 'http://www.w3.org/2000/09/xmldsig#enveloped-signature' is "
            "repeated or stands in the wrong order");
  EXPECT_EQ(reference->GetTransforms(), (std::vector<std::string>{kEnvelopedSignature, kExclusiveC14n}));
}

TEST(Signature, RefusesToBeMadeWithoutWhatItNeeds) {
  const Ref<Document> document = ParseDocument(kPlain);
  const Ref<Signature> signature = MakeBlank(document->GetDocumentElement());
  const auto key = Signer().GetKey();
  EXPECT_EQ(RefusalOf([&] { signature->Sign(key.Get()); }),
            "XmlSecurityException: A signature needs a reference");
  signature->AddReference("#nobody", kSha256);
  EXPECT_EQ(RefusalOf([&] { signature->Sign(nullptr); }),
            "InvalidArgumentException: Invalid argument : there is no key to sign with");
  CertificateSpec spec;
  spec.keyKind = KeyKind::EC_P256;
  const Identity other = MakeSelfSigned(spec);
  EXPECT_EQ(RefusalOf([&] { signature->Sign(other.GetKey().Get()); }),
            "XmlSecurityException: Signature method 'http://www.w3.org/2001/04/xmldsig-more#rsa-sha256' does "
            "not fit the key");
  EXPECT_EQ(RefusalOf([&] { signature->Sign(key.Get()); }),
            "XmlSecurityException: Reference '#nobody' refers to no element that could be signed");
}

TEST(Signature, IsMadeOnceAndThenStaysAsItIs) {
  const Ref<Document> document = ParseDocument(kPlain);
  const Ref<KeyInfoResolver> resolver = CreateTrustChainKeyResolver(Trust({Signer()}));
  const Ref<Signature> signature = MakeBlank(document->GetDocumentElement());
  EXPECT_EQ(RefusalOf([&] { signature->Verify(resolver.Get()); }),
            "InvalidStateException: The signature has not been made yet");
  signature->AddReference("", kSha256);
  signature->Sign(Signer().GetKey().Get());
  const std::string expected = "InvalidStateException: The signature has been made already";
  EXPECT_EQ(RefusalOf([&] { signature->Sign(Signer().GetKey().Get()); }), expected);
  EXPECT_EQ(RefusalOf([&] { signature->AddReference("", kSha256); }), expected);
  EXPECT_EQ(RefusalOf([&] { signature->SetKeyInfo(nullptr); }), expected);
}

TEST(Signature, HasBoundedReferences) {
  const Ref<Document> document = ParseDocument(kPlain);
  const Ref<Signature> signature = MakeBlank(document->GetDocumentElement());
  for (std::size_t i = 0; i < kMaxReferences; ++i) {
    signature->AddReference("#_1", kSha256)->AddTransform(kEnvelopedSignature);
  }
  EXPECT_EQ(RefusalOf([&] { signature->AddReference("#_1", kSha256); }),
            "XmlSecurityException: A signature can have 16 references at most");
  signature->SetKeyInfo(MakeX509Data({Signer()}));
  signature->Sign(Signer().GetKey().Get());
  document->GetDocumentElement()->AppendChild(signature->GetElement());
  const std::string text = WriteDocument(*document);
  EXPECT_EQ(VerdictOf(text), "verified");
  const std::size_t begin = text.find("<ds:Reference ");
  const std::size_t end = text.find("</ds:Reference>") + 15;
  const std::string one = text.substr(begin, end - begin);
  EXPECT_EQ(
      VerdictOf(Replace(text, one, one + one))
          .rfind("SignatureSyntaxException: The signature has more than 16 references at line 1, column ", 0),
      0u);
}

// ---- Reading ----

TEST(Signature, TellsWhatItRefersTo) {
  const Ref<Document> document = ParseDocument(SignedDocument());
  ElementNode* const root = document->GetDocumentElement();
  Ref<Signature> signature;
  CreateSignatureFromDom(root, FindSignature(*root), signature);
  ASSERT_EQ(signature->GetReferences().size(), 1u);
  const SignatureReference& reference = *signature->GetReferences().front();
  EXPECT_EQ(reference.GetUri(), "#_1");
  EXPECT_EQ(reference.GetDigestMethod(), kSha256);
  EXPECT_EQ(reference.GetTransforms(), (std::vector<std::string>{kEnvelopedSignature, kExclusiveC14n}));
  EXPECT_EQ(signature->GetElement().Get(), FindSignature(*root));
}

TEST(Signature, ThatWasReadCannotBeChanged) {
  const Ref<Document> document = ParseDocument(SignedDocument());
  ElementNode* const root = document->GetDocumentElement();
  Ref<Signature> signature;
  CreateSignatureFromDom(root, FindSignature(*root), signature);
  const std::string expected =
      "InvalidStateException: The signature exists already; nothing can be added to it";
  EXPECT_EQ(RefusalOf([&] { signature->AddReference("", kSha256); }), expected);
  EXPECT_EQ(RefusalOf([&] { signature->SetKeyInfo(nullptr); }), expected);
  EXPECT_EQ(RefusalOf([&] { signature->Sign(Signer().GetKey().Get()); }), expected);
  EXPECT_EQ(RefusalOf([&] { signature->GetReferences().front()->AddTransform(kC14n); }),
            "InvalidStateException: The signature exists already; nothing can be added to its references");
}

TEST(Signature, RefusesNullArguments) {
  const Ref<Document> document = ParseDocument(SignedDocument());
  ElementNode* const root = document->GetDocumentElement();
  Ref<Signature> signature;
  const std::string expected =
      "InvalidArgumentException: Invalid argument : a signature needs a context element and a signature "
      "element";
  EXPECT_EQ(RefusalOf([&] { CreateSignatureFromDom(nullptr, FindSignature(*root), signature); }), expected);
  EXPECT_EQ(RefusalOf([&] { CreateSignatureFromDom(root, nullptr, signature); }), expected);
  CreateSignatureFromDom(root, FindSignature(*root), signature);
  EXPECT_EQ(RefusalOf([&] { signature->Verify(nullptr); }),
            "InvalidArgumentException: Invalid argument : there is no key info resolver");
}

struct SyntaxCase {
  const char* from;
  std::string to;
  /// The message without the position.
  const char* message;
  /// The text that the position points at: its first occurrence in the altered document.
  const char* culprit;
};

const char kDigestEnd[] = "</ds:DigestValue></ds:Reference>";

TEST(Signature, RefusesEveryOtherStructure) {
  const std::string references = "<ds:Reference URI=\"\"/>";
  const SyntaxCase cases[] = {
      {"<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\">",
       "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\" Foo=\"1\">",
       "Unexpected attribute 'Foo' in 'ds:Signature'", "<ds:Signature "},
      {"<ds:SignedInfo>", "<ds:Object/><ds:SignedInfo>", "Unexpected element 'ds:Object' in 'ds:Signature'",
       "<ds:Object/>"},
      {"<ds:SignedInfo>", "text<ds:SignedInfo>", "Unexpected text in 'ds:Signature'", "<ds:Signature "},
      {"<ds:SignedInfo>", "<?p?><ds:SignedInfo>", "Unexpected processing instruction in 'ds:Signature'",
       "<ds:Signature "},
      {"<ds:SignedInfo>", "<ds:SignedInfo Foo=\"1\">", "Unexpected attribute 'Foo' in 'ds:SignedInfo'",
       "<ds:SignedInfo "},
      {"<ds:SignedInfo>", "<SignedInfo xmlns=\"urn:x\"/><ds:SignedInfo>",
       "Unexpected element 'SignedInfo' in 'ds:Signature'", "<SignedInfo "},
      {"<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>", "",
       "Unexpected element 'ds:SignatureMethod' in 'ds:SignedInfo'", "<ds:SignatureMethod"},
      {"<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>",
       "<ds:CanonicalizationMethod/>", "Attribute 'Algorithm' is missing in 'ds:CanonicalizationMethod'",
       "<ds:CanonicalizationMethod"},
      {"<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>",
       "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\" x=\"\"/>",
       "Unexpected attribute 'x' in 'ds:CanonicalizationMethod'", "<ds:CanonicalizationMethod"},
      {"<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>",
       "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"><x/>"
       "</ds:CanonicalizationMethod>",
       "Unexpected element 'x' in 'ds:CanonicalizationMethod'", "<x/>"},
      {"rsa-sha256\"/>", "rsa-sha256\">9</ds:SignatureMethod>", "Unexpected text in 'ds:SignatureMethod'",
       "<ds:SignatureMethod"},
      {"<ds:SignatureMethod", "<ds:SignatureMethod Id=\"i\"",
       "Unexpected attribute 'Id' in 'ds:SignatureMethod'", "<ds:SignatureMethod"},
      {"<ds:Reference URI=\"#_1\">", "<ds:Reference>", "Attribute 'URI' is missing in 'ds:Reference'",
       "<ds:Reference>"},
      {"<ds:Reference URI=\"#_1\">", "<ds:Reference URI=\"#_1\" wsu:Id=\"r\">",
       "Unexpected attribute 'wsu:Id' in 'ds:Reference'", "<ds:Reference "},
      {"<ds:Transforms>", "<ds:Transforms>t", "Unexpected text in 'ds:Transforms'", "<ds:Transforms>"},
      {"<ds:Transforms>", "<ds:Transforms/><ds:Transforms>",
       "Element 'Transform' is missing in 'ds:Transforms'", "<ds:Transforms/>"},
      {"<ds:Transforms>", "<ds:Transforms><x/>", "Unexpected element 'x' in 'ds:Transforms'", "<x/>"},
      {"enveloped-signature\"/>", "enveloped-signature\"><ds:XPath>1</ds:XPath></ds:Transform>",
       "Unexpected element 'ds:XPath' in 'ds:Transform'", "<ds:XPath>"},
      {"xml-exc-c14n#\"/></ds:Transforms>",
       "xml-exc-c14n#\"><ec:InclusiveNamespaces xmlns:ec=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
       "</ds:Transform></ds:Transforms>",
       "Attribute 'PrefixList' is missing in 'ec:InclusiveNamespaces'", "<ec:InclusiveNamespaces"},
      {"xml-exc-c14n#\"/></ds:Transforms>",
       "xml-exc-c14n#\"><ec:InclusiveNamespaces xmlns:ec=\"http://www.w3.org/2001/10/xml-exc-c14n#\" PrefixList="
       "\"a\" x=\"\"/></ds:Transform></ds:Transforms>",
       "Unexpected attribute 'x' in 'ec:InclusiveNamespaces'", "<ec:InclusiveNamespaces"},
      {"xml-exc-c14n#\"/></ds:Transforms>",
       "xml-exc-c14n#\"><ec:InclusiveNamespaces xmlns:ec=\"http://www.w3.org/2001/10/xml-exc-c14n#\" PrefixList="
       "\"a\"><x/></ec:InclusiveNamespaces></ds:Transform></ds:Transforms>",
       "Unexpected element 'x' in 'ec:InclusiveNamespaces'", "<x/>"},
      {"</ds:Transforms>", "<x/></ds:Transforms>", "Unexpected element 'x' in 'ds:Transforms'", "<x/>"},
      {"<ds:Transforms>", "<ds:Transforms x=\"\">", "Unexpected attribute 'x' in 'ds:Transforms'",
       "<ds:Transforms "},
      {"<ds:DigestMethod ", "<ds:DigestMethod x=\"\" ", "Unexpected attribute 'x' in 'ds:DigestMethod'",
       "<ds:DigestMethod "},
      {"<ds:SignatureValue>", "<ds:SignatureValue x=\"\">", "Unexpected attribute 'x' in 'ds:SignatureValue'",
       "<ds:SignatureValue "},
      {"enveloped-signature\"/>",
       "enveloped-signature\"/><ds:Transform Algorithm=\"http://www.w3.org/TR/2001/REC-xml-c14n-20010315"
       "\"><ec:InclusiveNamespaces xmlns:ec=\"http://www.w3.org/2001/10/xml-exc-c14n#\" PrefixList="
       "\"a\"/></ds:Transform>",
       "Unexpected element 'ec:InclusiveNamespaces' in 'ds:Transform'", "<ec:InclusiveNamespaces"},
      {"sha256\"/><ds:DigestValue>", "sha256\">x</ds:DigestMethod><ds:DigestValue>",
       "Unexpected text in 'ds:DigestMethod'", "<ds:DigestMethod"},
      {"<ds:DigestValue>", "<ds:DigestValue><!-- -->", "Element 'ds:DigestValue' must hold one text",
       "<ds:DigestValue>"},
      {"<ds:DigestValue>", "<ds:DigestValue><x/></ds:DigestValue><ds:DigestValue>",
       "Element 'ds:DigestValue' must hold one text", "<ds:DigestValue>"},
      {"<ds:DigestValue>", "<ds:DigestValue>=", "Element 'ds:DigestValue' must hold base64 text",
       "<ds:DigestValue>"},
      {"<ds:DigestValue>", "<ds:DigestValue x=\"\">", "Unexpected attribute 'x' in 'ds:DigestValue'",
       "<ds:DigestValue "},
      {"<ds:DigestValue>", "<ds:DigestValue/><ds:DigestValue>", "Element 'ds:DigestValue' must hold one text",
       "<ds:DigestValue/>"},
      {kDigestEnd, "</ds:DigestValue><ds:Extra/></ds:Reference>",
       "Unexpected element 'ds:Extra' in 'ds:Reference'", "<ds:Extra/>"},
      {kDigestEnd, std::string(kDigestEnd) + "<ds:Extra/>",
       "Unexpected element 'ds:Extra' in 'ds:SignedInfo'", "<ds:Extra/>"},
      {"<ds:SignatureValue>", "<ds:SignatureValue><?p?>", "Element 'ds:SignatureValue' must hold one text",
       "<ds:SignatureValue>"},
      {"<ds:SignatureValue>", "<ds:SignatureValue>!", "Element 'ds:SignatureValue' must hold base64 text",
       "<ds:SignatureValue>"},
      {"<ds:SignatureValue>", "<ds:KeyInfo/><ds:SignatureValue>",
       "Unexpected element 'ds:KeyInfo' in 'ds:Signature'", "<ds:KeyInfo/>"},
      {"</ds:Signature>", "<ds:KeyInfo></ds:KeyInfo></ds:Signature>",
       "Unexpected element 'ds:KeyInfo' in 'ds:Signature'", "<ds:KeyInfo></ds:KeyInfo>"},
      {"</ds:Signature>", "<ds:Object/></ds:Signature>", "Unexpected element 'ds:Object' in 'ds:Signature'",
       "<ds:Object/>"},
      {"</ds:Signature>", "<x/></ds:Signature>", "Unexpected element 'x' in 'ds:Signature'", "<x/>"},
  };
  for (const SyntaxCase& c : cases) {
    const std::string text = Replace(
        Replace(SignedDocument(), "<a:Assertion", "<a:Assertion xmlns:wsu=\"urn:wsu\""), c.from, c.to);
    EXPECT_EQ(VerdictOf(text), std::string("SignatureSyntaxException: ") + c.message + " at line 1, column " +
                                   std::to_string(text.find(c.culprit) + 1));
  }
}

TEST(Signature, RefusesAnElementThatIsNone) {
  const Ref<Document> document = ParseDocument("<ds:Signature xmlns:ds=\"urn:other\"/>");
  ElementNode* const root = document->GetDocumentElement();
  Ref<Signature> signature;
  EXPECT_EQ(RefusalOf([&] { CreateSignatureFromDom(root, root, signature); }),
            "XmlSecurityException: Element 'ds:Signature' is not a signature at line 1, column 1");
}

TEST(Signature, RefusesTooManyInclusivePrefixes) {
  const auto verdict = [](std::size_t count) {
    return VerdictOf(
        Replace(SignedDocument(), "xml-exc-c14n#\"/></ds:Transforms>",
                "xml-exc-c14n#\"><e:InclusiveNamespaces xmlns:e=\"http://www.w3.org/2001/10/xml-exc-c14n#\" "
                "PrefixList=\"" +
                    Repeat("p ", count) + "\"/></ds:Transform></ds:Transforms>"));
  };
  EXPECT_EQ(verdict(kMaxInclusivePrefixes), "refused");
  EXPECT_EQ(
      verdict(kMaxInclusivePrefixes + 1)
          .rfind("SignatureSyntaxException: PrefixList holds more than 64 prefixes at line 1, column ", 0),
      0u);
}

TEST(Signature, PassesOverWhiteSpaceAndCommentsBetweenElements) {
  std::string text = Replace(SignedDocument(), "<ds:SignatureValue>", "\n <!-- c --> <ds:SignatureValue>");
  text = Replace(text, "<ds:KeyInfo>", "<!-- c -->\t<ds:KeyInfo>");
  // A comment is no part of SignedInfo's canonical form either.
  text = Replace(text, "<ds:Reference ", "<!-- c --><ds:Reference ");
  EXPECT_EQ(VerdictOf(text), "verified");
}

TEST(Signature, ToleratesLineBreaksInBase64) {
  std::string text = Replace(SignedDocument(), "<ds:SignatureValue>", "<ds:SignatureValue>\n");
  text = Replace(text, "</ds:SignatureValue>", "\r\n \t</ds:SignatureValue>");
  text = Replace(text, "<ds:X509Certificate>", "<ds:X509Certificate>\n");
  EXPECT_EQ(VerdictOf(text), "verified");
}

}  // namespace
