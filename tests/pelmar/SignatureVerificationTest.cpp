// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Judging signatures: what is altered, which algorithms are accepted, what a reference covers.

#include "pelmar/SignatureSamples.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

namespace {

using namespace SignatureSamples;

// ---- Judging ----

TEST(Signature, IsNotVerifiedWhenAnyByteIsAltered) {
  const std::string& good = SignedDocument();
  ASSERT_EQ(VerdictOf(good), "verified");
  std::size_t refused = 0;
  for (std::size_t i = 0; i < good.size(); ++i) {
    std::string altered = good;
    altered[i] = static_cast<char>(altered[i] ^ 1);
    const std::string verdict = VerdictOf(altered);
    EXPECT_NE(verdict, "verified") << i;
    refused += verdict == "refused" ? 1 : 0;
  }
  // Texts, attribute values, digest, value: most alterations leave a document that can be judged.
  EXPECT_GT(refused, 300u);
}

TEST(Signature, WithAlteredContentIsRefused) {
  const std::pair<const char*, const char*> alterations[] = {
      {"some", "Some"},
      {"some &amp; text", "some &amp; text "},
      {"<a:Empty></a:Empty>", ""},
      {"<a:Empty></a:Empty>", "<a:Empty></a:Empty><?pi?>"},
      {"a:x=\"&lt;&#xA;\"", "a:x=\"&lt; \""},
      {"a:x=\"&lt;&#xA;\"", ""},
      {"ID=\"_1\"", "ID=\"_1\" b=\"\""},
      {"<a:Text>", "<a:Text xmlns:a=\"urn:b\">"},
      {"<ds:DigestValue>", "<ds:DigestValue>AAAA"},
      {"<ds:SignatureValue>", "<ds:SignatureValue>AAAA"},
      {"<ds:SignedInfo>", "<ds:SignedInfo Id=\"i\">"},
      {"<ds:Reference ", "<ds:Reference Type=\"urn:t\" "},
      {"<ds:Reference ", " <ds:Reference "},
  };
  for (const auto& [from, to] : alterations) {
    EXPECT_EQ(VerdictOf(Replace(SignedDocument(), from, to)), "refused") << from << " -> " << to;
  }
}

// Exclusive canonicalisation sees neither of these.
TEST(Signature, StaysGoodUnderAnotherSpelling) {
  const std::pair<const char*, const char*> alterations[] = {
      {"<a:Empty></a:Empty>", "<a:Empty/>"},         {"some", "<![CDATA[some]]>"}, {"some", "so<!-- c -->me"},
      {"ID=\"_1\"", "ID='_1' xmlns:unused='urn:u'"}, {"&#xA;", "&#10;"},
  };
  for (const auto& [from, to] : alterations) {
    EXPECT_EQ(VerdictOf(Replace(SignedDocument(), from, to)), "verified") << from << " -> " << to;
  }
}

TEST(Signature, LeavesCommentsOutEvenWhenATransformWantsThem) {
  for (const char* const transform : {kC14nWithComments, kExclusiveC14nWithComments}) {
    SigningPlan plan;
    plan.transforms = {kEnvelopedSignature, transform};
    const std::string text = SignDocument(Replace(kPlain, "some", "<!-- one -->some"), Signer(), plan);
    EXPECT_EQ(VerdictOf(Replace(text, "<!-- one -->", "<!-- two -->")), "verified");
    EXPECT_EQ(VerdictOf(Replace(text, "<!-- one -->", "")), "verified");
  }
}

struct AlgorithmCase {
  const char* from;
  std::string to;
  const char* message;
};

TEST(Signature, RefusesWhatIsNotInTheProfileByName) {
  const std::string enveloped =
      "<ds:Transform Algorithm=\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\"/>";
  const std::string exclusive = "<ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>";
  const AlgorithmCase cases[] = {
      {"http://www.w3.org/2001/10/xml-exc-c14n#\"/><ds:SignatureMethod",
       "http://www.w3.org/2006/12/xml-c14n11\"/><ds:SignatureMethod",
       "Canonicalization method 'http://www.w3.org/2006/12/xml-c14n11' is not accepted"},
      {"http://www.w3.org/2001/10/xml-exc-c14n#\"/><ds:SignatureMethod",
       "http://www.w3.org/2000/09/xmldsig#enveloped-signature\"/><ds:SignatureMethod",
       "Canonicalization method 'http://www.w3.org/2000/09/xmldsig#enveloped-signature' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", "http://www.w3.org/2000/09/xmldsig#rsa-sha1",
       "Signature method 'http://www.w3.org/2000/09/xmldsig#rsa-sha1' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", "http://www.w3.org/2001/04/xmldsig-more#rsa-md5",
       "Signature method 'http://www.w3.org/2001/04/xmldsig-more#rsa-md5' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", "http://www.w3.org/2000/09/xmldsig#dsa-sha1",
       "Signature method 'http://www.w3.org/2000/09/xmldsig#dsa-sha1' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256",
       "http://www.w3.org/2001/04/xmldsig-more#hmac-sha256",
       "Signature method 'http://www.w3.org/2001/04/xmldsig-more#hmac-sha256' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/>",
       "http://www.w3.org/2000/09/xmldsig#hmac-sha1\"><ds:HMACOutputLength>0</ds:HMACOutputLength>"
       "</ds:SignatureMethod>",
       "Signature method 'http://www.w3.org/2000/09/xmldsig#hmac-sha1' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", "http://www.w3.org/2007/05/xmldsig-more#rsa-pss",
       "Signature method 'http://www.w3.org/2007/05/xmldsig-more#rsa-pss' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256",
       "HTTP://www.w3.org/2001/04/xmldsig-more#rsa-sha256",
       "Signature method 'HTTP://www.w3.org/2001/04/xmldsig-more#rsa-sha256' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256", "", "Signature method '' is not accepted"},
      {"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256",
       "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256",
       "Signature method 'http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256' does not fit the signer's "
       "key"},
      {"http://www.w3.org/2001/04/xmlenc#sha256", "http://www.w3.org/2000/09/xmldsig#sha1",
       "Digest method 'http://www.w3.org/2000/09/xmldsig#sha1' is not accepted"},
      {"http://www.w3.org/2001/04/xmlenc#sha256\"/>",
       "http://www.w3.org/2000/09/xmldsig#sha1\"><x/></ds:DigestMethod>",
       "Digest method 'http://www.w3.org/2000/09/xmldsig#sha1' is not accepted"},
      {"http://www.w3.org/2001/04/xmlenc#sha256", "http://www.w3.org/2001/04/xmldsig-more#md5",
       "Digest method 'http://www.w3.org/2001/04/xmldsig-more#md5' is not accepted"},
      {"URI=\"#_1\"", "URI=\"#\"", "Reference URI '#' is not accepted"},
      {"URI=\"#_1\"", "URI=\"http://example.org/#_1\"",
       "Reference URI 'http://example.org/#_1' is not accepted"},
      {"URI=\"#_1\"", "URI=\"file:///etc/passwd\"", "Reference URI 'file:///etc/passwd' is not accepted"},
      {"URI=\"#_1\"", "URI=\"_1\"", "Reference URI '_1' is not accepted"},
      {"<ds:Transforms>",
       "<ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/TR/1999/REC-xpath-19991116\">"
       "<ds:XPath>true()</ds:XPath></ds:Transform>",
       "Transform 'http://www.w3.org/TR/1999/REC-xpath-19991116' is not accepted"},
      {"<ds:Transforms>",
       "<ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/TR/1999/REC-xslt-19991116\"><x xmlns="
       "\"urn:x\"/></ds:Transform>",
       "Transform 'http://www.w3.org/TR/1999/REC-xslt-19991116' is not accepted"},
      {"<ds:Transforms>",
       "<ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/2000/09/xmldsig#base64\"/>",
       "Transform 'http://www.w3.org/2000/09/xmldsig#base64' is not accepted"},
      {"<ds:Transforms>",
       "<ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/2002/06/xmldsig-filter2\"/>",
       "Transform 'http://www.w3.org/2002/06/xmldsig-filter2' is not accepted"},
      {enveloped.c_str(), enveloped + enveloped,
       "Transform 'http://www.w3.org/2000/09/xmldsig#enveloped-signature' is repeated or stands in the "
       "wrong order"},
      {exclusive.c_str(), exclusive + exclusive,
       "Transform 'http://www.w3.org/2001/10/xml-exc-c14n#' is repeated or stands in the wrong order"},
      {"<ds:Transforms>", "<ds:Transforms>" + exclusive,
       "Transform 'http://www.w3.org/2000/09/xmldsig#enveloped-signature' is repeated or stands in the "
       "wrong order"},
  };
  for (const AlgorithmCase& c : cases) {
    EXPECT_EQ(VerdictOf(Replace(SignedDocument(), c.from, c.to)),
              std::string("XmlSecurityException: ") + c.message);
  }
}

TEST(Signature, CutsLongIdentifiersShortInMessages) {
  const std::string text = Replace(SignedDocument(), "http://www.w3.org/2001/04/xmlenc#sha256",
                                   std::string(199, 'x') + "\xC3\xA4yz");
  EXPECT_EQ(VerdictOf(text),
            "XmlSecurityException: Digest method '" + std::string(199, 'x') + "...' is not accepted");
  EXPECT_EQ(VerdictOf(Replace(SignedDocument(), kSha256, std::string(200, 'x'))),
            "XmlSecurityException: Digest method '" + std::string(200, 'x') + "' is not accepted");
}

TEST(Signature, WithAMethodOfAnotherHashIsRefused) {
  EXPECT_EQ(VerdictOf(Replace(SignedDocument(), "rsa-sha256", "rsa-sha512")), "refused");
}

// ---- References ----

TEST(Signature, OverTheWholeDocumentCoversTopLevelProcessingInstructions) {
  SigningPlan plan;
  plan.uri = "";
  const std::string text = SignDocument(kPlain, Signer(), plan);
  EXPECT_EQ(VerdictOf(text), "verified");
  EXPECT_EQ(VerdictOf("<!-- c -->" + text + "<!-- c -->\n"), "verified");
  EXPECT_EQ(VerdictOf("<?pi?>" + text), "refused");
  EXPECT_EQ(VerdictOf(text + "<?pi?>"), "refused");
}

TEST(Signature, OverTheContextDoesNotCoverWhatIsAround) {
  EXPECT_EQ(VerdictOf("<?pi?>" + SignedDocument()), "verified");
  SigningPlan plan;
  plan.uri = "";
  for (const std::string& text : {SignedDocument(), SignDocument(kPlain, Signer(), plan)}) {
    const Ref<Document> around =
        ParseDocument("<e:Envelope xmlns:e=\"urn:e\"><?pi?>" + text + "text</e:Envelope>");
    EXPECT_EQ(VerifyElement(around->GetDocumentElement()->FindChildElement("Assertion"), Trust({Signer()})),
              "verified");
  }
}

TEST(Signature, RefusesASecondElementOfTheSameId) {
  const char* const duplicates[] = {"ID=\"_1\"",     "Id=\"_1\"",     "id=\"_1\"",    "iD=\"_1\"",
                                    "xml:id=\"_1\"", "wsu:Id=\"_1\"", "wsu:ID=\"_1\""};
  const std::string start =
      "<e:Envelope xmlns:e=\"urn:e\" xmlns:wsu="
      "\"http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd\">";
  for (const std::string duplicate : duplicates) {
    const std::string texts[] = {
        start + "<x " + duplicate + "/>" + SignedDocument() + "</e:Envelope>",
        start + SignedDocument() + "<x><y " + duplicate + "/></x></e:Envelope>",
        Replace(start, " ", " " + duplicate + " ") + SignedDocument() + "</e:Envelope>",
    };
    for (const std::string& text : texts) {
      const Ref<Document> document = ParseDocument(text);
      EXPECT_EQ(
          VerifyElement(document->GetDocumentElement()->FindChildElement("Assertion"), Trust({Signer()})),
          "XmlSecurityException: Reference '#_1' is ambiguous: several elements have this ID")
          << duplicate;
    }
  }
}

TEST(Signature, IsNotConfusedByOtherAttributesOfTheSameValue) {
  SigningPlan plan;
  plan.uri = "#urn:x";
  const std::string text = SignDocument(Replace(kPlain, "\"_1\"", "\"urn:x\""), Signer(), plan);
  const Ref<Document> document = ParseDocument(
      "<e:Envelope xmlns:e=\"urn:e\" xmlns:id=\"urn:x\"><x InResponseTo=\"urn:x\" d=\"urn:x\" ad=\"urn:x\" is=\"urn:x\" grid="
      "\"urn:x\"/>" +
      text + "</e:Envelope>");
  EXPECT_EQ(VerifyElement(document->GetDocumentElement()->FindChildElement("Assertion"), Trust({Signer()})),
            "verified");
}

constexpr const char* kMessage =
    "<e:Envelope xmlns:e=\"urn:e\" "
    "xmlns:u=\"http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd\">"
    "<e:Body u:Id=\"body\" xmlns:used-in-content=\"urn:q\">content</e:Body><u:Timestamp u:Id=\"time\">now"
    "</u:Timestamp><e:Other "
    "ID=\"other\">o</e:Other><e:Plain Id=\"plain\"/></e:Envelope>";

std::string SignMessage(const std::vector<std::string>& uris, const std::vector<std::string>& transforms) {
  const Ref<Document> document = ParseDocument(kMessage);
  ElementNode* const envelope = document->GetDocumentElement();
  const Ref<Signature> signature = MakeBlank(envelope);
  for (const std::string& uri : uris) {
    const Ref<SignatureReference> reference = signature->AddReference(uri, kSha256);
    for (const std::string& transform : transforms) {
      reference->AddTransform(transform);
    }
  }
  signature->SetKeyInfo(MakeX509Data({Signer()}));
  signature->Sign(Signer().GetKey().Get());
  envelope->AppendChild(signature->GetElement());
  return WriteDocument(*document);
}

TEST(Signature, OfAMessageCoversTheElementsItNames) {
  for (const std::vector<std::string>& transforms :
       {std::vector<std::string>{}, std::vector<std::string>{kExclusiveC14n},
        std::vector<std::string>{kC14n}}) {
    const std::string text = SignMessage({"#body", "#time", "#other"}, transforms);
    EXPECT_EQ(VerdictOf(text), "verified");
    EXPECT_EQ(VerdictOf(Replace(text, "content<", "changed<")), "refused");
    EXPECT_EQ(VerdictOf(Replace(text, ">now<", ">later<")), "refused");
    EXPECT_EQ(VerdictOf(Replace(text, ">o<", ">p<")), "refused");
    EXPECT_EQ(VerdictOf(Replace(text, "<e:Plain Id=\"plain\"/>", "")), "verified");
  }
}

// Without a canonicalisation transform, Canonical XML 1.0 applies (XML Signature 1.1, section 4.4.3.2): all
// namespaces in scope count.
TEST(Signature, WithoutCanonicalizationTransformTakesInclusiveForm) {
  const std::string inclusive = SignMessage({"#body"}, {});
  EXPECT_EQ(VerdictOf(Replace(inclusive, "<e:Envelope ", "<e:Envelope xmlns:new=\"urn:new\" ")), "refused");
  const std::string exclusive = SignMessage({"#body"}, {kExclusiveC14n});
  EXPECT_EQ(VerdictOf(Replace(exclusive, "<e:Envelope ", "<e:Envelope xmlns:new=\"urn:new\" ")), "verified");
}

TEST(Signature, TakesOnlyIdsThatCount) {
  const std::string expected =
      "XmlSecurityException: Reference '#plain' refers to no element that could be signed";
  EXPECT_EQ(RefusalOf([] { SignMessage({"#plain"}, {}); }), expected);
  // Beside another ID that counts, either.
  const std::string refusal =
      "XmlSecurityException: Reference '#_1' refers to no element that could be signed";
  EXPECT_EQ(RefusalOf([] { SignDocument("<a ID=\"_2\" Id=\"_1\"/>", Signer()); }), refusal);
  // WS-Security's is for parts of a message, not for what is signed as a whole.
  const std::string start =
      "<a xmlns:u=\"http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd\"";
  for (const std::string rest : {" u:Id=\"_1\"/>", "><b Id=\"_1\" u:Id=\"_2\"/></a>"}) {
    EXPECT_EQ(RefusalOf([&] { SignDocument(start + rest, Signer()); }), refusal) << rest;
  }
}

TEST(Signature, DoesNotFindElementsOutsideItsContext) {
  const std::string text = SignMessage({"#body"}, {kExclusiveC14n});
  const std::size_t signature = text.find("<ds:Signature");
  const std::string moved =
      Replace(text.substr(0, signature) + "</e:Envelope>", "<e:Other ID=\"other\">",
              "<e:Other ID=\"other\">" + text.substr(signature, text.rfind("</e:Envelope>") - signature));
  const Ref<Document> document = ParseDocument(moved);
  EXPECT_EQ(VerifyElement(document->GetDocumentElement()->FindChildElement("Other"), Trust({Signer()})),
            "XmlSecurityException: Reference '#body' refers to no element that could be signed");
}

TEST(Signature, IsOnlyEnvelopedBySomethingAroundIt) {
  EXPECT_EQ(VerdictOf(SignMessage({"#body"}, {kEnvelopedSignature})),
            "XmlSecurityException: Reference '#body' is enveloped, but the signature is not inside it");
}

TEST(Signature, WithinWhatItCoversNeedsTheEnvelopedTransform) {
  SigningPlan plan;
  plan.transforms = {kExclusiveC14n};
  EXPECT_EQ(VerdictOf(SignDocument(kPlain, Signer(), plan)), "refused");
}

// The transform takes this very signature out, not all that look like one.
TEST(Signature, LeavesOtherSignaturesInWhatItCovers) {
  const std::string twice = SignDocument(SignedDocument(), Signer());
  const Ref<Document> document = ParseDocument(twice);
  ElementNode* const root = document->GetDocumentElement();
  ElementNode* const first = FindSignature(*root);
  ElementNode* const second = AsElement(root->GetLastChildNode());
  ASSERT_NE(first, second);
  const Ref<KeyInfoResolver> resolver = CreateTrustChainKeyResolver(Trust({Signer()}));
  Ref<Signature> signature;
  CreateSignatureFromDom(root, second, signature);
  EXPECT_TRUE(signature->Verify(resolver.Get()));
  CreateSignatureFromDom(root, first, signature);
  EXPECT_FALSE(signature->Verify(resolver.Get()));
}

TEST(Signature, RefusesAnUndeclaredPrefixInWhatItCovers) {
  const std::string verdict =
      VerdictOf(Replace(SignedDocument(), "<a:Empty></a:Empty>", "<q:Empty></q:Empty>"));
  EXPECT_EQ(verdict, "XmlSecurityException: Undeclared namespace prefix 'q' on element 'q:Empty'");
}

TEST(Signature, IsJudgedBySignerFirstAndContentLast) {
  const Identity stranger = MakeSelfSigned(CertificateSpec());
  const std::string text = Replace(SignDocument(kPlain, stranger), "some", "Some");
  EXPECT_EQ(
      VerdictOf(text),
      "XmlSecurityException: Certificate chain is not trusted: self-signed certificate (CN=Test signer)");
  EXPECT_EQ(VerifyDocument(text, Trust({stranger})), "refused");
  // Algorithms come before the signer.
  EXPECT_EQ(VerdictOf(Replace(text, kRsaSha256, "urn:method")),
            "XmlSecurityException: Signature method 'urn:method' is not accepted");
}

TEST(Signature, RefusesAResolverThatFindsNobody) {
  class Silent final : public KeyInfoResolver {
   public:
    Ref<const Pelmar::Crypto::Certificate> ResolveSigner(const ElementNode* /*keyInfo*/) const override {
      return nullptr;
    }
  };
  const Ref<Document> document = ParseDocument(SignedDocument());
  ElementNode* const root = document->GetDocumentElement();
  Ref<Signature> signature;
  CreateSignatureFromDom(root, FindSignature(*root), signature);
  const Ref<Silent> resolver = Pelmar::MakeRef<Silent>();
  try {
    signature->Verify(resolver.Get());
    FAIL() << "verified";
  } catch (const XmlSecurityException& error) {
    EXPECT_STREQ("There is no certificate", error.what());
  }
}

TEST(Signature, ThatStandsInNoTextIsRefusedWithoutAPlace) {
  const Ref<Document> document = ParseDocument(kPlain);
  Ref<ElementNode> element;
  CreateElementNode("ds", "Signature", element);
  element->DefineAttribute("xmlns:ds", kSignatureNamespace);
  document->GetDocumentElement()->AppendChild(element);
  Ref<Signature> signature;
  try {
    CreateSignatureFromDom(document->GetDocumentElement(), element.Get(), signature);
    FAIL() << "read";
  } catch (const SignatureSyntaxException& error) {
    EXPECT_STREQ("Element 'SignedInfo' is missing in 'ds:Signature'", error.what());
  }
}

TEST(Signature, OfAnotherKeyUnderATrustedCertificateIsRefused) {
  CertificateSpec spec;
  spec.keyNumber = 7;
  const Identity other = MakeSelfSigned(spec);
  const std::string forged = SignDocument(kPlain, other);
  const std::string base64 = forged.substr(forged.find("<ds:KeyInfo>"),
                                           forged.find("</ds:Signature>") - forged.find("<ds:KeyInfo>"));
  const std::string& good = SignedDocument();
  const std::string genuine =
      good.substr(good.find("<ds:KeyInfo>"), good.find("</ds:Signature>") - good.find("<ds:KeyInfo>"));
  EXPECT_EQ(VerdictOf(Replace(forged, base64, genuine)), "refused");
}

}  // namespace
