// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What forgers try beside moving things around (SignatureWrappingTest.cpp) and showing certificates
// (TokenSignatureTest.cpp).

#include "quorlin/Namespaces.h"
#include "support/GoldenText.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"
#include "support/XmlText.h"

#include <pelmar/xml/Parser.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using namespace Pelmar::Xml::Security;

const char* const kTampered =
    "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.";

std::string Parse(const std::string& message) {
  return "Quorlin::ParseException: " + message;
}

std::string SyntaxError(const std::string& message) {
  return Parse("Signature syntax error: " + message);
}

std::string Error(const std::string& reason) {
  return "Quorlin::InvalidSignatureException: Signature verification error. " + reason;
}

std::string Malformed(const std::string& message) {
  return "Pelmar::Xml::XMLParseException: " + message;
}

std::string Signed() {
  return SignToken(TokenText());
}

std::string SignedWith(const TokenSigning& signing) {
  return SignToken(TokenText().Compose(), TokenSigner(), signing);
}

std::string VerdictWithTransforms(const std::string& transforms) {
  TokenSigning signing;
  signing.references[0].transforms = transforms;
  return VerdictOnToken(SignedWith(signing));
}

/// The first character after `start` changed into another that base64 has.
std::string AlterAfter(const std::string& text, const std::string& start) {
  const std::size_t at = text.find(start) + start.size();
  std::string altered = text;
  altered[at] = altered[at] == 'A' ? 'B' : 'A';
  return altered;
}

// --- Altered content ---

TEST(TokenAttack, AlteredContentIsRefused) {
  TokenText text;
  text.attributes = AttributeElement(kAttrGroupIdentity, {"D\\users"});
  text.restrictions = ProxyRestriction("Count=\"1\"");
  const std::string good = SignToken(text);
  ASSERT_EQ(VerdictOnToken(good), "accepted");
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "alice@", "mallory@")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "D\\users", "D\\administrators")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "Count=\"1\"", "Count=\"2\"")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "<saml:ProxyRestriction Count=\"1\"/>", "")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "D\\users", "D\\users ")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "</saml:Subject>", "</saml:Subject>\n")), kTampered);
  EXPECT_EQ(
      VerdictOnToken(ReplaceOnce(good, "</saml:AttributeStatement>",
                                 AttributeElement(kAttrIsSolution, {"true"}) + "</saml:AttributeStatement>")),
      kTampered);
}

TEST(TokenAttack, AlteredDigestIsRefused) {
  EXPECT_EQ(VerdictOnToken(AlterAfter(Signed(), "<ds:DigestValue>")), kTampered);
}

TEST(TokenAttack, RecomputedDigestIsRefused) {
  const std::string good = Signed();
  TokenText text;
  text.nameId = NameIdElement("mallory@example.com");
  const std::string forged = SignToken(text);
  const std::string digest = CutBetween(forged, "<ds:DigestValue>", "</ds:DigestValue>");
  const std::string withDigest =
      ReplaceOnce(good, CutBetween(good, "<ds:DigestValue>", "</ds:DigestValue>"), digest);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(withDigest, "alice@", "mallory@")), kTampered);
}

TEST(TokenAttack, AlteredSignedInfoIsRefused) {
  const std::string good = Signed();
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "<ds:SignedInfo>", "<ds:SignedInfo Id=\"i\">")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "<ds:SignedInfo>", "<ds:SignedInfo> ")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "URI=\"#_4f0a9c1e\"", "URI=\"\"")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, kRsaSha256, kRsaSha512)), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "\"http://www.w3.org/2001/04/xmlenc#sha256\"",
                                       "\"http://www.w3.org/2001/04/xmlenc#sha512\"")),
            kTampered);
}

TEST(TokenAttack, AlteredSignatureValueIsRefused) {
  const std::string good = Signed();
  EXPECT_EQ(VerdictOnToken(AlterAfter(good, "<ds:SignatureValue>")), kTampered);
  const std::string value = CutBetween(good, "<ds:SignatureValue>", "</ds:SignatureValue>");
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, value, "AAAA")), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, value, value.substr(4))), kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, value, "AAAA" + value)), kTampered);
}

TEST(TokenAttack, SignatureOfAnotherTokenIsRefused) {
  const std::string good = Signed();
  TokenText other;
  other.nameId = NameIdElement("mallory@example.com");
  const std::string forged = SignToken(other.Compose(), TokenSigner());
  const std::string mine = CutBetween(good, "<ds:Signature", "</ds:Signature>");
  const std::string theirs = CutBetween(forged, "<ds:Signature", "</ds:Signature>");
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(forged, theirs, mine)), kTampered);
}

// --- The signature's structure ---

TEST(TokenAttack, NoSignatureIsRefused) {
  TokenText text;
  text.signature.clear();
  const std::string xml = text.Compose();
  EXPECT_EQ(VerdictOnToken(xml),
            SyntaxError("Element 'saml:Subject' is not a signature" + PlaceOf(xml, "<saml:Subject>")));
}

TEST(TokenAttack, SecondSignatureIsRefused) {
  const std::string good = Signed();
  const std::string signature =
      "<ds:Signature" + CutBetween(good, "<ds:Signature", "</ds:Signature>") + "</ds:Signature>";
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, signature, signature + signature)),
            Parse("Expected element 'Subject' not found."));
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "<saml:Issuer", signature + "<saml:Issuer")),
            Parse("Expected element 'Issuer' not found."));
  const std::string end = "</saml:Assertion>";
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, end, signature + end)),
            Parse("Unexpected elements under Assertion"));
}

TEST(TokenAttack, SignatureOverAnotherElementIsRefused) {
  TokenText text;
  text.restrictions =
      "<saml:AudienceRestriction ID=\"_part\"><saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>";
  TokenSigning signing;
  signing.references[0].uri = "#_part";
  signing.references[0].enveloped = false;
  EXPECT_EQ(VerdictOnToken(SignToken(text.Compose(), TokenSigner(), signing)),
            Parse("Token's signature must cover the entire token"));
}

TEST(TokenAttack, SignatureElementOfAnotherNamespaceIsRefused) {
  const std::string good = Signed();
  const std::string text = ReplaceOnce(good, "xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"",
                                       "xmlns:ds=\"http://www.w3.org/2000/09/xmldsig\"");
  EXPECT_EQ(VerdictOnToken(text),
            SyntaxError("Element 'ds:Signature' is not a signature" + PlaceOf(text, "<ds:Signature")));
}

struct StructureCase {
  const char* from;
  const char* to;
  const char* message;
  const char* place;  // Where the message says it is.
};

TEST(TokenAttack, MalformedSignaturesAreRefused) {
  const std::string good = Signed();
  const std::vector<StructureCase> cases = {
      {"<ds:SignedInfo>", "<ds:Object/><ds:SignedInfo>", "Unexpected element 'ds:Object' in 'ds:Signature'",
       "<ds:Object"},
      {"</ds:KeyInfo>", "</ds:KeyInfo><ds:KeyInfo/>", "Unexpected element 'ds:KeyInfo' in 'ds:Signature'",
       "<ds:KeyInfo/>"},
      {"</ds:KeyInfo>", "</ds:KeyInfo>x", "Unexpected text in 'ds:Signature'", "<ds:Signature "},
      {"</ds:KeyInfo>", "</ds:KeyInfo><?p?>", "Unexpected processing instruction in 'ds:Signature'",
       "<ds:Signature "},
      {"<ds:SignedInfo>", "<ds:SignedInfo x=\"\">", "Unexpected attribute 'x' in 'ds:SignedInfo'",
       "<ds:SignedInfo"},
      {"<ds:Signature ", "<ds:Signature x=\"\" ", "Unexpected attribute 'x' in 'ds:Signature'",
       "<ds:Signature"},
      {" URI=\"#_4f0a9c1e\"", "", "Attribute 'URI' is missing in 'ds:Reference'", "<ds:Reference"},
      {"<ds:DigestValue>", "<ds:DigestValue>*", "Element 'ds:DigestValue' must hold base64 text",
       "<ds:DigestValue"},
      {"<ds:DigestValue>", "<ds:DigestValue><!---->", "Element 'ds:DigestValue' must hold one text",
       "<ds:DigestValue"},
      {"<ds:SignatureValue>", "<ds:SignatureValue>A", "Element 'ds:SignatureValue' must hold base64 text",
       "<ds:SignatureValue"},
      {"<ds:SignatureValue>", "<ds:SignatureValue>\xC3\xA4",
       "Element 'ds:SignatureValue' must hold base64 text", "<ds:SignatureValue"},
      {"<ds:SignatureValue>", "<ds:SignatureValue><a/>", "Element 'ds:SignatureValue' must hold one text",
       "<ds:SignatureValue"},
      {"<ds:SignatureMethod Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/>", "",
       "Unexpected element 'ds:Reference' in 'ds:SignedInfo'", "<ds:Reference"}};
  for (const StructureCase& c : cases) {
    const std::string text = ReplaceOnce(good, c.from, c.to);
    EXPECT_EQ(VerdictOnToken(text), SyntaxError(c.message + PlaceOf(text, c.place))) << c.to;
  }
}

TEST(TokenAttack, SignatureWithoutAReferenceIsRefused) {
  TokenSigning signing;
  signing.references.clear();
  const std::string text = SignedWith(signing);
  EXPECT_EQ(VerdictOnToken(text), SyntaxError("Element 'Reference' is missing in 'ds:SignedInfo'" +
                                              PlaceOf(text, "<ds:SignedInfo")));
}

TEST(TokenAttack, MoreReferencesThanAnyoneNeedsAreRefused) {
  TokenSigning signing;
  signing.references.resize(17);
  const std::string text = SignedWith(signing);
  const std::string last = text.substr(text.rfind("<ds:Reference "));
  EXPECT_EQ(VerdictOnToken(text),
            SyntaxError("The signature has more than 16 references" + PlaceOf(text, last)));
  signing.references.resize(16);
  EXPECT_EQ(VerdictOnToken(SignedWith(signing)), "accepted");
}

// --- Algorithms: each is used as named, so that nothing but the closed list is in the way ---

TEST(TokenAttack, MessageAuthenticationWithThePublicKeyIsRefused) {
  TokenSigning signing;
  signing.signatureMethod = "http://www.w3.org/2001/04/xmldsig-more#hmac-sha256";
  EXPECT_EQ(VerdictOnToken(SignedWith(signing)),
            Error("Signature method 'http://www.w3.org/2001/04/xmldsig-more#hmac-sha256' is not accepted"));
}

TEST(TokenAttack, Sha1AndMd5AreRefused) {
  for (const char* const method :
       {"http://www.w3.org/2000/09/xmldsig#rsa-sha1", "http://www.w3.org/2001/04/xmldsig-more#rsa-md5"}) {
    TokenSigning signing;
    signing.signatureMethod = method;
    EXPECT_EQ(VerdictOnToken(SignedWith(signing)),
              Error(std::string("Signature method '") + method + "' is not accepted"));
  }
  for (const char* const digest :
       {"http://www.w3.org/2000/09/xmldsig#sha1", "http://www.w3.org/2001/04/xmldsig-more#md5"}) {
    TokenSigning signing;
    signing.references[0].digestMethod = digest;
    EXPECT_EQ(VerdictOnToken(SignedWith(signing)),
              Error(std::string("Digest method '") + digest + "' is not accepted"));
  }
}

TEST(TokenAttack, UnknownCanonicalisationsAreRefused) {
  const std::string good = Signed();
  for (const char* const algorithm : {"http://www.w3.org/2006/12/xml-c14n11", "urn:none", ""}) {
    const std::string text = ReplaceOnce(
        good, "<ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>",
        std::string("<ds:CanonicalizationMethod Algorithm=\"") + algorithm + "\"/>");
    EXPECT_EQ(VerdictOnToken(text),
              Error(std::string("Canonicalization method '") + algorithm + "' is not accepted"));
  }
}

TEST(TokenAttack, OtherTransformsAreRefused) {
  for (const char* const algorithm :
       {"http://www.w3.org/TR/1999/REC-xpath-19991116", "http://www.w3.org/2002/06/xmldsig-filter2",
        "http://www.w3.org/TR/1999/REC-xslt-19991116", "http://www.w3.org/2000/09/xmldsig#base64",
        "http://www.w3.org/2006/12/xml-c14n11",
        "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-soap-message-security-1.0#STR-Transform",
        "urn:unknown", ""}) {
    const std::string refused = Error(std::string("Transform '") + algorithm + "' is not accepted");
    const std::string transform = std::string("<ds:Transform Algorithm=\"") + algorithm +
                                  "\"><ds:XPath>not(self::node())</ds:XPath></ds:Transform>";
    EXPECT_EQ(VerdictWithTransforms("<ds:Transforms>" + transform + "</ds:Transforms>"), refused);
    EXPECT_EQ(
        VerdictWithTransforms("<ds:Transforms><ds:Transform Algorithm=\"" + std::string(kEnvelopedSignature) +
                              "\"/>" + transform + "</ds:Transforms>"),
        refused);
  }
}

TEST(TokenAttack, RepeatedOrReorderedTransformsAreRefused) {
  const auto transforms = [](const std::vector<std::string>& algorithms) {
    std::string text;
    for (const std::string& algorithm : algorithms) {
      text += "<ds:Transform Algorithm=\"" + algorithm + "\"/>";
    }
    return VerdictWithTransforms("<ds:Transforms>" + text + "</ds:Transforms>");
  };
  const auto misplaced = [](const std::string& algorithm) {
    return Error("Transform '" + algorithm + "' is repeated or stands in the wrong order");
  };
  EXPECT_EQ(transforms({kEnvelopedSignature, kEnvelopedSignature}), misplaced(kEnvelopedSignature));
  EXPECT_EQ(transforms({kEnvelopedSignature, kExclusiveC14n, kExclusiveC14n}), misplaced(kExclusiveC14n));
  EXPECT_EQ(transforms({kEnvelopedSignature, kExclusiveC14n, kC14nWithComments}),
            misplaced(kC14nWithComments));
  EXPECT_EQ(transforms({kExclusiveC14n, kEnvelopedSignature}), misplaced(kEnvelopedSignature));
  EXPECT_EQ(transforms({kExclusiveC14n, kEnvelopedSignature, kExclusiveC14n}),
            misplaced(kEnvelopedSignature));
}

TEST(TokenAttack, EmptyTransformsAreRefused) {
  TokenSigning signing;
  signing.references[0].transforms = "<ds:Transforms/>";
  const std::string text = SignedWith(signing);
  EXPECT_EQ(VerdictOnToken(text), SyntaxError("Element 'Transform' is missing in 'ds:Transforms'" +
                                              PlaceOf(text, "<ds:Transforms/>")));
}

TEST(TokenAttack, ReferenceThatWouldLeaveNothingToDigestIsRefused) {
  TokenSigning signing;
  ReferencePlan nothing;
  nothing.uri = "#_signature";
  nothing.targetId = kTokenId;
  signing.references.push_back(nothing);
  const std::string text =
      ReplaceOnce(SignedWith(signing), "<ds:Signature ", "<ds:Signature Id=\"_signature\" ");
  EXPECT_EQ(VerdictOnToken(text), Error("Reference '#_signature' refers to no element that could be signed"));
}

TEST(TokenAttack, SignatureThatDoesNotLeaveItselfOutIsRefused) {
  TokenSigning signing;
  signing.references[0].transforms =
      std::string("<ds:Transforms><ds:Transform Algorithm=\"") + kExclusiveC14n + "\"/></ds:Transforms>";
  EXPECT_EQ(VerdictOnToken(SignedWith(signing)), kTampered);
}

TEST(TokenAttack, ExternalReferencesAreRefused) {
  TokenSigning signing;
  ReferencePlan external;
  external.targetId = kTokenId;
  signing.references.push_back(external);
  for (const char* const uri :
       {"http://127.0.0.1:1/x", "file:///etc/passwd", "x.xml", "_4f0a9c1e", "cid:a", "#"}) {
    signing.references[1].uri = uri;
    EXPECT_EQ(VerdictOnToken(SignedWith(signing)),
              Error(std::string("Reference URI '") + uri + "' is not accepted"));
  }
}

// --- Prefixes ---

TEST(TokenAttack, UndeclaredPrefixInSignedContentIsRefused) {
  TokenText text;
  text.restrictions =
      "<saml:AudienceRestriction><saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>";
  const std::string good = SignToken(text);
  const std::string bad =
      ReplaceOnce(good, "<saml:AudienceRestriction>", "<saml:AudienceRestriction what:x=\"\">");
  const std::string message = "Undeclared namespace prefix 'what' on element 'saml:AudienceRestriction'";
  EXPECT_EQ(VerdictOnToken(bad), Error(message));
  EXPECT_EQ(VerdictOnEmbedded(bad, kTokenId), "Pelmar::Xml::Security::XmlSecurityException: " + message);
}

TEST(TokenAttack, RelativeNamespaceInSignedContentIsRefused) {
  const std::string bad =
      ReplaceOnce(Signed(), "<saml:Conditions ", "<saml:Conditions xmlns:x=\"relative\" ");
  EXPECT_EQ(VerdictOnToken(bad), Error("Relative namespace URI on element 'saml:Conditions'"));
}

TEST(TokenAttack, UndeclaredPrefixOfAnElementIsRefused) {
  const std::string bad = ReplaceOnce(ReplaceOnce(Signed(), "<saml:NameID ", "<what:NameID "),
                                      "</saml:NameID>", "</what:NameID>");
  EXPECT_EQ(VerdictOnToken(bad), Parse("Element 'NameID' has unexpected namespace"));
}

// The types of conditions are prefixed names in attribute values, which exclusive canonicalisation does not
// see: such a declaration can be changed without breaking the signature. The reader goes by what it means
// after the change.
TEST(TokenAttack, ReboundPrefixOfAConditionTypeIsRefused) {
  TokenText text;
  text.restrictions = RenewRestriction("Count=\"1\"");
  const std::string good = SignToken(text);
  const std::string declaration = std::string(" xmlns:ext=\"") + kSamlExt + "\"";
  const std::string unknown = Parse("Unknown or duplicate restriction node under Conditions: Condition");
  EXPECT_EQ(
      VerdictOnToken(ReplaceOnce(good, declaration, std::string(" xmlns:ext=\"") + kSamlDelegation + "\"")),
      unknown);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, declaration, " xmlns:ext=\"urn:other\"")), unknown);
  const std::string undeclared = ReplaceOnce(good, declaration, "");
  const std::string place =
      PlaceOf(undeclared, "<saml:Condition xsi").substr(std::string(" at line 1, column ").size());
  EXPECT_EQ(VerdictOnToken(undeclared),
            Parse("Element Conditionat 1," + place + " uses undefined prefix: `ext'"));
}

TEST(TokenAttack, ReboundPrefixOfADelegationIsRefused) {
  TokenText text;
  text.delegateId = NameIdElement("proxy@example.com");
  text.restrictions =
      DelegationRestriction(DelegateElement("2020-01-01T00:00:00Z", NameIdElement("proxy@example.com")));
  const std::string good = SignToken(text);
  ASSERT_EQ(VerdictOnToken(good), "accepted");
  const std::string condition = "<saml:Condition xsi:type=\"del:DelegationRestrictionType\">";
  EXPECT_EQ(
      VerdictOnToken(ReplaceOnce(
          good, condition, ReplaceOnce(condition, " ", std::string(" xmlns:del=\"") + kSamlExt + "\" "))),
      Parse("Unknown or duplicate restriction node under Conditions: Condition"));
}

TEST(TokenAttack, ReboundPrefixOfAConfirmationTypeIsRefused) {
  TokenText text;
  text.HoldKey(TokenSigner());
  const std::string good = SignToken(ReplaceOnce(text.Compose(), "xsi:type=\"saml:Key",
                                                 std::string("xmlns:t=\"") + kSaml + "\" xsi:type=\"t:Key"));
  ASSERT_EQ(VerdictOnToken(good), "accepted");
  EXPECT_EQ(
      VerdictOnToken(ReplaceOnce(good, std::string("xmlns:t=\"") + kSaml + "\"", "xmlns:t=\"urn:other\"")),
      Parse("Invalid SubjectConfirmationData type: 't:KeyInfoConfirmationDataType'"));
}

TEST(TokenAttack, ReboundPrefixOfTheTypeAttributeIsRefused) {
  TokenText text;
  text.HoldKey(TokenSigner());
  const std::string good = SignToken(text);
  EXPECT_EQ(VerdictOnToken(
                ReplaceOnce(good, std::string(" xmlns:xsi=\"") + kXsi + "\"", " xmlns:xsi=\"urn:other\"")),
            Parse("Unexpected attribute 'urn:other:type' on element 'SubjectConfirmationData'"));
}

// --- Values that are split or written otherwise ---

TokenText WithGroup() {
  TokenText text;
  text.attributes = AttributeElement(kAttrGroupIdentity, {"D\\users.staff"});
  return text;
}

TEST(TokenAttack, CommentThatSplitsAValueIsRefused) {
  const std::string good = SignToken(WithGroup());
  const std::string name = Parse("Element 'NameID' must only have textual content");
  const std::string value = Parse("Element 'AttributeValue' must only have textual content");
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "alice@example.com", "alice@example<!---->.com")), name);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "alice@example.com", "alice<!-- c -->@example.com")), name);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "D\\users.staff", "D\\users<!---->.staff")), value);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "https://sts.example/", "https://sts.<!---->example/")),
            Parse("Element 'Issuer' must only have textual content"));
}

TEST(TokenAttack, CommentsAroundAValueChangeNothing) {
  const std::string good = SignToken(WithGroup());
  const std::string commented =
      ReplaceOnce(ReplaceOnce(good, "alice@example.com", "<!--a-->alice@example.com<!--b-->"),
                  "D\\users.staff", "<!--a--><!--b-->D\\users.staff");
  EXPECT_EQ(MeaningOf(*ReadToken(commented)), MeaningOf(*ReadToken(good)));
}

TEST(TokenAttack, InstructionInAValueIsRefused) {
  const std::string good = SignToken(WithGroup());
  for (const char* const name :
       {"alice@example<?p?>.com", "<?p?>alice@example.com", "alice@example.com<?p?>"}) {
    EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "alice@example.com", name)),
              Parse("Element 'NameID' must only have textual content"))
        << name;
  }
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "D\\users.staff", "D\\users<?p?>.staff")),
            Parse("Element 'AttributeValue' must only have textual content"));
}

TEST(TokenAttack, CDataAndReferencesMeanTheirCharacters) {
  const std::string good = SignToken(WithGroup());
  const std::string meaning = MeaningOf(*ReadToken(good));
  for (const char* const name :
       {"<![CDATA[alice@example.com]]>", "alice@<![CDATA[example]]>.com", "alice@example<![CDATA[]]>.com",
        "&#97;lice@example.com", "alice&#x40;example.com"}) {
    EXPECT_EQ(MeaningOf(*ReadToken(ReplaceOnce(good, "alice@example.com", name))), meaning) << name;
  }
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "alice@example.com", "alice@example.com<![CDATA[.evil]]>")),
            kTampered);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, "alice@", "alice&amp;@")), kTampered);
}

TEST(TokenAttack, UndefinedEntityIsRefused) {
  const std::string bad = ReplaceOnce(Signed(), "alice@", "&alice;@");
  EXPECT_EQ(VerdictOnToken(bad), Malformed("undefined entity" + PlaceOf(bad, "&alice;")));
}

// --- Document type declarations ---

TEST(TokenAttack, EveryDocumentTypeDeclarationIsRefused) {
  const std::string good = Signed();
  for (
      const char* const doctype :
      {"<!DOCTYPE saml:Assertion>", "<!DOCTYPE saml:Assertion []>",
       "<!DOCTYPE x SYSTEM \"http://127.0.0.1:1/x.dtd\">",
       "<!DOCTYPE x PUBLIC \"-//x\" \"file:///etc/passwd\">", "<!DOCTYPE x [<!ENTITY e \"alice\">]>",
       "<!DOCTYPE x [<!ENTITY e SYSTEM \"file:///etc/passwd\">]>",
       "<!DOCTYPE x [<!ENTITY % e SYSTEM \"http://127.0.0.1:1/\"> %e;]>",
       "<!DOCTYPE x [<!ENTITY a \"aaaaaaaaaa\"><!ENTITY b \"&a;&a;&a;&a;&a;\"><!ENTITY c \"&b;&b;&b;&b;&b;\">]>",
       "<!DOCTYPE x [<!ATTLIST saml:Assertion Version CDATA \"2.0\">]>", "<!DOCTYPE x [<!ELEMENT x ANY>]>"}) {
    const std::string text = std::string("<?xml version=\"1.0\"?>\n") + doctype + good;
    EXPECT_EQ(VerdictOnToken(text), Malformed("DOCTYPE is not allowed" + PlaceOf(text, "<!DOCTYPE")))
        << doctype;
  }
}

// --- Bytes ---

TEST(TokenAttack, InvalidUtf8IsRefused) {
  for (const char* const bytes :
       {"\x80", "\xC0\xAF", "\xE0\x80\xAF", "\xED\xA0\x80", "\xF4\x90\x80\x80", "\xFF", "\xC3"}) {
    const std::string bad = ReplaceOnce(Signed(), "alice@", std::string("al") + bytes + "ice@");
    EXPECT_EQ(VerdictOnToken(bad), Malformed("not well-formed (invalid token)" + PlaceOf(bad, bytes)));
  }
}

TEST(TokenAttack, CharactersThatXmlDoesNotHaveAreRefused) {
  for (const std::string& bytes :
       {std::string(1, '\0'), std::string("\x01"), std::string("\x1F"), std::string("\xEF\xBF\xBE")}) {
    const std::string bad = ReplaceOnce(Signed(), "alice@", "al" + bytes + "ice@");
    EXPECT_EQ(VerdictOnToken(bad), Malformed("not well-formed (invalid token)" + PlaceOf(bad, bytes)));
  }
  for (const char* const reference : {"&#0;", "&#1;", "&#xFFFE;", "&#xD800;", "&#x110000;"}) {
    const std::string bad = ReplaceOnce(Signed(), "alice@", std::string("al") + reference + "ice@");
    EXPECT_EQ(VerdictOnToken(bad),
              Malformed("reference to invalid character number" + PlaceOf(bad, reference)))
        << reference;
  }
}

TEST(TokenAttack, DuplicateAttributesAreRefused) {
  const std::string twice = ReplaceOnce(Signed(), " Version=\"2.0\"", " Version=\"2.0\" Version=\"2.0\"");
  EXPECT_EQ(VerdictOnToken(twice), Malformed("duplicate attribute" + PlaceOf(twice, "Version=\"2.0\" ID")));
}

TEST(TokenAttack, DuplicateAttributesUnderTwoPrefixesAreRefused) {
  TokenText text;
  text.restrictions = RenewRestriction("Count=\"1\"");
  const std::string bad =
      ReplaceOnce(SignToken(text), "<saml:Condition xsi:type=",
                  std::string("<saml:Condition xmlns:i=\"") + kXsi + "\" i:type=\"saml:x\" xsi:type=");
  EXPECT_EQ(VerdictOnToken(bad), Malformed("duplicate attribute" + PlaceOf(bad, "<saml:Condition ")));
}

TEST(TokenAttack, ContentAfterTheAssertionIsRefused) {
  const std::string good = Signed();
  const std::string end = "</saml:Assertion>";
  EXPECT_EQ(VerdictOnToken(good + "<a/>"),
            Malformed("junk after document element" + PlaceOf(good + "<a/>", "<a/>")));
  EXPECT_EQ(VerdictOnToken(good + "x"),
            Malformed("junk after document element at line 1, column " + std::to_string(good.size() + 1)));
  EXPECT_EQ(VerdictOnToken(good + good),
            Malformed("junk after document element at line 1, column " + std::to_string(good.size() + 1)));
  EXPECT_EQ(
      VerdictOnToken(good + std::string(1, '\0')),
      Malformed("not well-formed (invalid token) at line 1, column " + std::to_string(good.size() + 1)));
  EXPECT_EQ(VerdictOnToken(good + "\n<!-- c --><?p?> "), "accepted");
}

// The whole document is what an empty reference covers.
TEST(TokenAttack, InstructionAroundAnAssertionIsCoveredByAnEmptyReference) {
  TokenSigning signing;
  signing.references[0].uri = "";
  const std::string good = SignedWith(signing);
  EXPECT_EQ(VerdictOnToken(good + "<!-- c -->"), "accepted");
  EXPECT_EQ(VerdictOnToken(good + "<?p?>"), kTampered);
  EXPECT_EQ(VerdictOnToken("<?p?>" + good), kTampered);
}

std::string ToUtf16(const std::string& ascii, bool bigEndian) {
  std::string wide = bigEndian ? "\xFE\xFF" : "\xFF\xFE";
  for (const char c : ascii) {
    wide += bigEndian ? std::string{'\0', c} : std::string{c, '\0'};
  }
  return wide;
}

TEST(TokenAttack, OtherEncodingsAreRefused) {
  const std::string good = Signed();
  const std::string notUtf8 = Malformed("only UTF-8 is accepted at line 1, column 1");
  EXPECT_EQ(VerdictOnToken(ToUtf16(good, true)), notUtf8);
  EXPECT_EQ(VerdictOnToken(ToUtf16(good, false)), notUtf8);
  EXPECT_EQ(VerdictOnToken(ToUtf16(good, true).substr(2)), notUtf8);
  EXPECT_EQ(VerdictOnToken(ToUtf16(good, false).substr(2)), notUtf8);
  for (const char* const encoding : {"ISO-8859-1", "UTF-16", "US-ASCII", "UTF-7", "windows-1252", "utf8"}) {
    EXPECT_EQ(VerdictOnToken(std::string("<?xml version=\"1.0\" encoding=\"") + encoding + "\"?>" + good),
              notUtf8)
        << encoding;
  }
  EXPECT_EQ(VerdictOnToken("<?xml version=\"1.0\" encoding=\"utf-8\"?>" + good), "accepted");
  EXPECT_EQ(VerdictOnToken("<?xml version=\"1.1\"?>" + good),
            Malformed("only XML 1.0 is accepted at line 1, column 1"));
}

TEST(TokenAttack, OneByteOrderMarkIsAccepted) {
  const std::string good = Signed();
  EXPECT_EQ(VerdictOnToken("\xEF\xBB\xBF" + good), "accepted");
  EXPECT_EQ(VerdictOnToken("\xEF\xBB\xBF\xEF\xBB\xBF" + good),
            Malformed("only UTF-8 is accepted at line 1, column 1"));
  EXPECT_EQ(VerdictOnToken(" \xEF\xBB\xBF" + good),
            Malformed("not well-formed (invalid token) at line 1, column 2"));
  EXPECT_EQ(VerdictOnToken("\xEF\xBB\xBF"), Malformed("no element found at line 1, column 1"));
}

// --- Extremes ---

std::string Repeat(const std::string& text, std::size_t times) {
  std::string all;
  all.reserve(text.size() * times);
  for (std::size_t i = 0; i < times; ++i) {
    all += text;
  }
  return all;
}

TEST(TokenAttack, DeepNestingIsRefused) {
  // Two levels stand outside, the last "<a>" is the one too many.
  const std::string bad = ReplaceOnce(Signed(), "alice@", Repeat("<a>", 100000) + "alice@");
  const std::size_t outside = 3;
  const std::size_t column = bad.find("<a>") + 3 * (Pelmar::Xml::kMaxElementDepth - outside) + 1;
  EXPECT_EQ(VerdictOnToken(bad), Malformed("more than 256 elements inside each other at line 1, column " +
                                           std::to_string(column)));
}

TEST(TokenAttack, ManyAttributesAreRefused) {
  std::string attributes;
  for (int i = 0; i < 20000; ++i) {
    attributes += " a" + std::to_string(i) + "=\"\"";
  }
  const std::string bad = ReplaceOnce(Signed(), "<saml:Subject>", "<saml:Subject" + attributes + ">");
  EXPECT_EQ(VerdictOnToken(bad),
            Malformed("more than 256 attributes on one element" + PlaceOf(bad, "<saml:Subject")));
}

TEST(TokenAttack, ManyNamespaceDeclarationsAreRefused) {
  std::string declarations;
  for (int i = 0; i < 252; ++i) {
    declarations += " xmlns:p" + std::to_string(i) + "=\"urn:p\"";
  }
  const std::string bad = ReplaceOnce(Signed(), "<saml:Subject>", "<saml:Subject" + declarations + ">");
  EXPECT_EQ(VerdictOnToken(bad),
            Malformed("more than 256 namespace declarations in scope" + PlaceOf(bad, "<saml:Subject")));
}

TEST(TokenAttack, UnusedNamespaceDeclarationsWithinTheLimitChangeNothing) {
  std::string declarations;
  for (int i = 0; i < 200; ++i) {
    declarations += " xmlns:p" + std::to_string(i) + "=\"urn:p\"";
  }
  const std::string good = Signed();
  EXPECT_EQ(MeaningOf(*ReadToken(ReplaceOnce(good, "<saml:Subject>", "<saml:Subject" + declarations + ">"))),
            MeaningOf(*ReadToken(good)));
}

TEST(TokenAttack, HugeTextIsRefused) {
  const std::string bad = Signed() + std::string(Pelmar::Xml::kMaxDocumentBytes, ' ');
  EXPECT_EQ(VerdictOnToken(bad), Malformed("more than 16777216 bytes at line 1, column 1"));
}

TEST(TokenAttack, ManyNodesAreRefused) {
  const std::string bad =
      ReplaceOnce(Signed(), "<saml:Subject>", Repeat("<a/>", Pelmar::Xml::kMaxNodes) + "<saml:Subject>");
  const std::size_t nodesBefore = 32;  // Elements and attributes up to the subject.
  const std::size_t column = bad.find("<a/>") + 4 * (Pelmar::Xml::kMaxNodes - nodesBefore) + 1;
  EXPECT_EQ(VerdictOnToken(bad),
            Malformed("more than 262144 nodes at line 1, column " + std::to_string(column)));
}

TEST(TokenAttack, LargeTokensWithinTheLimitsAreRead) {
  TokenText text;
  text.attributes = AttributeElement(kAttrGroupIdentity, std::vector<std::string>(5000, "D\\g")) +
                    AttributeElement(kClaimSurname, {std::string(4 * 1024 * 1024, 'x')});
  const auto token = ReadToken(text);
  std::vector<PrincipalId> groups;
  token->GetGroups(groups);
  EXPECT_EQ(groups.size(), 5000U);
  std::pair<std::string, std::string> name;
  token->GetFullName(name);
  EXPECT_EQ(name.second.size(), 4U * 1024 * 1024);
}

}  // namespace
}  // namespace Quorlin
