// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a token's signature refers to and how that is canonicalised, and signatures where none belongs.

#include "quorlin/Namespaces.h"
#include "support/GoldenText.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using namespace Pelmar::Xml::Security;

const char* const kTampered =
    "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.";
const char* const kNotCovered = "Quorlin::ParseException: Token's signature must cover the entire token";

std::string Parse(const std::string& message) {
  return "Quorlin::ParseException: " + message;
}

std::string Error(const std::string& reason) {
  return "Quorlin::InvalidSignatureException: Signature verification error. " + reason;
}

std::string SignedWith(const TokenSigning& signing, const TokenText& text = TokenText()) {
  return SignToken(text.Compose(), TokenSigner(), signing);
}

/// A reference whose URI attribute is written so, over the assertion all the same.
ReferencePlan Referring(const std::string& uri) {
  ReferencePlan plan;
  plan.uri = uri;
  plan.targetId = kTokenId;
  return plan;
}

// --- URIs: compared as they are written ---

const char* const kOtherUris[] = {
    "#_4F0A9C1E",          "#%5f4f0a9c1e",      "#_4f0a9c1e ",  " #_4f0a9c1e",
    "#_4f0a9c1",           "#_4f0a9c1e#",       "#xpointer(/)", "#xpointer(id('_4f0a9c1e'))",
    "#element(_4f0a9c1e)", "#xpointer(//*[1])",
};

TEST(ReferenceOfAToken, CoversTheTokenOnlyByItsExactId) {
  for (const char* const uri : kOtherUris) {
    TokenSigning signing;
    signing.references = {Referring(uri)};
    EXPECT_EQ(VerdictOnToken(SignedWith(signing)), kNotCovered) << uri;
  }
}

TEST(ReferenceOfAToken, IsRefusedForAnotherSpellingBesideTheRightOne) {
  for (const std::string uri : kOtherUris) {
    TokenSigning signing;
    signing.references = {ReferencePlan(), Referring(uri)};
    const std::string refused =
        uri[0] == '#' ? "' refers to no element that could be signed" : "' is not accepted";
    EXPECT_EQ(VerdictOnToken(SignedWith(signing)),
              Error((uri[0] == '#' ? "Reference '" : "Reference URI '") + uri + refused));
  }
}

TEST(ReferenceOfAToken, MeansTheSameInCharacterReferences) {
  TokenSigning signing;
  signing.references = {Referring("&#35;&#x5F;4f0a9c1e")};
  EXPECT_EQ(VerdictOnToken(SignedWith(signing)), "accepted");
}

TEST(ReferenceOfAToken, NeedsTheAttributeCalledId) {
  const std::string id = std::string(" ID=\"") + kTokenId + "\"";
  for (const char* const name : {"Id", "id", "xml:id", "AssertionID"}) {
    const std::string text =
        ReplaceOnce(TokenText().Compose(), id, std::string(" ") + name + "=\"" + kTokenId + "\"");
    TokenSigning signing;
    signing.references[0].uri = "";
    EXPECT_EQ(VerdictOnToken(SignToken(text, TokenSigner(), signing)),
              Parse("Node 'Assertion is missing required attribute 'ID'"))
        << name;
  }
}

TEST(ReferenceOfAToken, IsRefusedWithASecondIdOnTheAssertion) {
  for (const char* const name : {"Id", "id", "xml:id"}) {
    TokenText text;
    text.furtherAttributes = std::string(" ") + name + "=\"_other\"";
    EXPECT_EQ(VerdictOnToken(text), Parse("Unexpected attributes on element 'Assertion'")) << name;
  }
}

// Type is a hint for applications (XML Signature 1.1, section 4.4.3): a manifest's entries are not followed.
TEST(ReferenceOfAToken, IsJudgedTheSameWhateverItsType) {
  for (const char* const type : {"http://www.w3.org/2000/09/xmldsig#Manifest",
                                 "http://www.w3.org/2000/09/xmldsig#Object", "urn:whatever", ""}) {
    TokenSigning signing;
    signing.references = {Referring(std::string("#") + kTokenId + "\" Type=\"" + type + "\" Id=\"r")};
    const std::string good = SignedWith(signing);
    EXPECT_EQ(VerdictOnToken(good), "accepted") << type;
    EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, kTokenSubject, "mallory@example.com")), kTampered) << type;
  }
}

// What a manifest lists is not what was signed.
TEST(ReferenceOfAToken, IsNotFollowedThroughAManifest) {
  TokenSigning signing;
  const std::string manifest = std::string("<ds:Object><ds:Manifest Id=\"_manifest\"><ds:Reference URI=\"#") +
                               kTokenId + "\"/></ds:Manifest></ds:Object>";
  ReferencePlan plan = Referring("#_manifest");
  plan.enveloped = false;
  plan.targetId = "_manifest";
  signing.references = {plan};
  signing.keyInfo = "<ds:KeyInfo><ds:X509Data><ds:X509Certificate>" + Base64Of(TokenSigner()) +
                    "</ds:X509Certificate></ds:X509Data></ds:KeyInfo>" + manifest;
  const std::string text = SignedWith(signing);
  EXPECT_EQ(VerdictOnToken(text),
            Parse("Signature syntax error: Unexpected element 'ds:Object' in 'ds:Signature'" +
                  PlaceOf(text, "<ds:Object>")));
  // In a place where anything may stand it is found, and covers no token.
  signing.keyInfo = ReplaceOnce(*signing.keyInfo, "</ds:KeyInfo>" + manifest, manifest + "</ds:KeyInfo>");
  EXPECT_EQ(VerdictOnToken(SignedWith(signing)), kNotCovered);
}

// --- Canonicalisation ---

TEST(CanonicalFormOfAToken, MayDifferFromThatOfItsSignature) {
  const std::vector<std::string> forms = {kC14n, kC14nWithComments, kExclusiveC14n,
                                          kExclusiveC14nWithComments};
  for (const std::string& ofSignature : forms) {
    for (const char* const ofToken : {kC14n, kExclusiveC14n}) {
      TokenSigning signing;
      signing.canonicalization = ofSignature;
      signing.references[0].canonicalization = ofToken;
      const std::string good = SignedWith(signing);
      EXPECT_EQ(VerdictOnToken(good), "accepted") << ofSignature << ofToken;
      EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, kTokenSubject, "mallory@example.com")), kTampered);
    }
  }
}

// Exclusive XML Canonicalization 1.0, section 3: what is listed and not there is no matter.
TEST(CanonicalFormOfAToken, TakesAnyPrefixList) {
  const std::vector<std::vector<std::string>> lists = {{"#default"},
                                                       {"nowhere"},
                                                       {"saml", "saml"},
                                                       {"#default", "xs", "xsi", "nowhere", "xs", "#default"},
                                                       {"xml"}};
  for (const std::vector<std::string>& list : lists) {
    TokenText text;
    text.declarations += " xmlns=\"urn:default\"";
    TokenSigning signing;
    signing.inclusivePrefixes = list;
    signing.references[0].inclusivePrefixes = list;
    EXPECT_EQ(VerdictOnToken(SignedWith(signing, text)), "accepted") << list.front();
  }
}

TEST(CanonicalFormOfAToken, DependsOnTheDefaultNamespaceOnlyWhenListed) {
  TokenText text;
  text.declarations += " xmlns=\"urn:default\"";
  TokenSigning signing;
  const std::string change = "xmlns=\"urn:other\"";
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(SignedWith(signing, text), "xmlns=\"urn:default\"", change)),
            "accepted");
  signing.references[0].inclusivePrefixes = {"#default"};
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(SignedWith(signing, text), "xmlns=\"urn:default\"", change)),
            kTampered);
}

TEST(CanonicalFormOfAToken, TakesAnEmptyPrefixListForNone) {
  TokenSigning signing;
  signing.references[0].transforms = std::string("<ds:Transforms><ds:Transform Algorithm=\"") +
                                     kEnvelopedSignature + "\"/><ds:Transform Algorithm=\"" + kExclusiveC14n +
                                     "\"><ec:InclusiveNamespaces xmlns:ec=\"" + kExclusiveC14n +
                                     "\" PrefixList=\" \"/></ds:Transform></ds:Transforms>";
  EXPECT_EQ(VerdictOnToken(SignedWith(signing)), "accepted");
}

TEST(CanonicalFormOfAToken, IsTheSameWhereTheDefaultNamespaceIsTakenBack) {
  for (const char* const form : {kC14n, kExclusiveC14n}) {
    TokenText text;
    text.declarations += " xmlns=\"urn:default\"";
    text.nameId = ReplaceOnce(text.nameId, "<saml:NameID ", "<saml:NameID xmlns=\"\" ");
    text.attributes = ReplaceOnce(AttributeElement(kAttrGroupIdentity, {"D\\users"}), "<saml:Attribute ",
                                  "<saml:Attribute xmlns=\"\" ");
    TokenSigning signing;
    signing.references[0].canonicalization = form;
    const std::string good = SignedWith(signing, text);
    EXPECT_EQ(VerdictOnToken(good), "accepted") << form;
    EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "D\\users", "D\\others")), kTampered) << form;
  }
}

TEST(CanonicalFormOfAToken, HasNoPrefixTakenBack) {
  const std::string bad =
      ReplaceOnce(SignToken(TokenText()), "<saml:Subject>", "<saml:Subject xmlns:xs=\"\">");
  EXPECT_EQ(VerdictOnToken(bad), "Pelmar::Xml::XMLParseException: a prefix is declared without a namespace" +
                                     PlaceOf(bad, "<saml:Subject"));
}

// --- Huge numbers of things: refused before any of them costs anything ---

std::string Repeat(const std::string& text, std::size_t times) {
  std::string all;
  all.reserve(text.size() * times);
  for (std::size_t i = 0; i < times; ++i) {
    all += text;
  }
  return all;
}

TEST(SignatureOfAToken, HasABoundedNumberOfReferences) {
  TokenSigning signing;
  const std::string good = SignedWith(signing);
  const std::string reference =
      "<ds:Reference " + CutBetween(good, "<ds:Reference ", "</ds:Reference>") + "</ds:Reference>";
  const std::string bad = ReplaceOnce(good, reference, Repeat(reference, 10000));
  const std::size_t seventeenth = bad.find(reference) + 16 * reference.size();
  EXPECT_EQ(VerdictOnToken(bad),
            Parse("Signature syntax error: The signature has more than 16 references at line 1, "
                  "column " +
                  std::to_string(seventeenth + 1)));
}

TEST(SignatureOfAToken, HasABoundedNumberOfTransforms) {
  const std::string transform = std::string("<ds:Transform Algorithm=\"") + kExclusiveC14n + "\"/>";
  TokenSigning signing;
  signing.references[0].transforms = "<ds:Transforms>" + Repeat(transform, 50000) + "</ds:Transforms>";
  EXPECT_EQ(VerdictOnToken(SignedWith(signing)), Error(std::string("Transform '") + kExclusiveC14n +
                                                       "' is repeated or stands in the wrong order"));
}

TEST(SignatureOfAToken, HasABoundedNumberOfListedPrefixes) {
  TokenSigning signing;
  signing.references[0].inclusivePrefixes.assign(64, "saml");
  EXPECT_EQ(VerdictOnToken(SignedWith(signing)), "accepted");
  signing.references[0].inclusivePrefixes.assign(65, "saml");
  const std::string bad = SignedWith(signing);
  EXPECT_EQ(VerdictOnToken(bad), Parse("Signature syntax error: PrefixList holds more than 64 prefixes" +
                                       PlaceOf(bad, "<ec:InclusiveNamespaces")));
}

// --- Signatures where none belongs ---

std::string SignatureIn(const std::string& token) {
  return "<ds:Signature" + CutBetween(token, "<ds:Signature", "</ds:Signature>") + "</ds:Signature>";
}

TEST(SignatureOfAToken, DoesNotStandInAName) {
  const std::string good = SignToken(TokenText());
  const std::string moved = ReplaceOnce(good, SignatureIn(good), "");
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(moved, kTokenSubject, kTokenSubject + SignatureIn(good))),
            Parse("Signature syntax error: Element 'saml:Subject' is not a signature" +
                  PlaceOf(moved, "<saml:Subject>")));
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, kTokenSubject, kTokenSubject + SignatureIn(good))),
            Parse("Element 'NameID' must only have textual content"));
}

TEST(SignatureOfAToken, DoesNotStandInAdvice) {
  const std::string good = SignToken(TokenText());
  const std::string start = "<saml:AuthnStatement";
  const std::string advice = "<saml:Advice>" + SignatureIn(good) + "</saml:Advice>";
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, start, advice + start)),
            Parse("Expected element 'RSAAdvice' not found."));
  const std::string inside = "<saml:Advice><ext:RSAAdvice AdviceSource=\"s\">" + SignatureIn(good) +
                             "</ext:RSAAdvice></saml:Advice>";
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, start, inside + start)),
            Parse("Expected element 'Attribute' not found."));
}

TEST(SignatureOfAToken, DoesNotStandInConfirmationData) {
  TokenText text;
  text.HoldKey(TokenSigner());
  const std::string good = SignToken(text);
  const std::string end = "</ds:KeyInfo></saml:SubjectConfirmationData>";
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, end, SignatureIn(good) + end)),
            Parse("Unexpected elements after X509Data"));
}

// KeyInfo may hold anything; of a signature in it nothing is read.
TEST(SignatureOfAToken, IsTheOuterOneOfTwo) {
  CertificateSpec spec;
  spec.commonName = "Mallory";
  spec.keyNumber = 5;
  const std::string foreign = SignatureIn(SignToken(TokenText().Compose(), MakeSelfSigned(spec)));
  const std::string good = SignToken(TokenText());
  const std::string end = "</ds:KeyInfo></ds:Signature>";
  const std::string nested = ReplaceOnce(good, end, foreign + end);
  EXPECT_EQ(MeaningOf(*ReadToken(nested)), MeaningOf(*ReadToken(good)));
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(nested, kTokenSubject, "mallory@example.com")), kTampered);
  // The other way round it is Mallory's.
  const std::string swapped =
      ReplaceOnce(good, SignatureIn(good), ReplaceOnce(foreign, end, SignatureIn(good) + end));
  EXPECT_EQ(VerdictOnToken(swapped),
            Error("Certificate chain is not trusted: self-signed certificate (CN=Mallory)"));
}

}  // namespace
}  // namespace Quorlin
