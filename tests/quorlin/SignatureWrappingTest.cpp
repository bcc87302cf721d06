// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Signature wrapping: a signed assertion is moved to where the signature still finds it, and a forged one put
// where the reader looks. The eight forms are those of J. Somorovsky et al., "On Breaking SAML: Be Whoever
// You Want to Be" (USENIX Security 2012), each with the forged assertion under the ID of the signed one and
// under its own.

#include "support/GoldenText.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"
#include "support/XmlText.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;

const char* const kForgedId = "_0ddba11";
const char* const kTampered =
    "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.";
const char* const kNotCovered = "Quorlin::ParseException: Token's signature must cover the entire token";
const char* const kAmbiguous =
    "Quorlin::InvalidSignatureException: Signature verification error. Reference '#_4f0a9c1e' is ambiguous: several elements "
    "have this ID";
const char* const kNoAssertion = "Quorlin::ParseException: Expected element 'Assertion' not found.";

std::string SyntaxError(const std::string& message) {
  return "Quorlin::ParseException: Signature syntax error: " + message;
}

/// A signed assertion taken apart, and the assertion to be slipped in.
struct Material {
  std::string original;   ///< As the service signed it.
  std::string signature;  ///< Its signature.
  std::string bare;       ///< Without it.
  std::string forgedId;
  std::string forged;      ///< For another subject, with the signature.
  std::string forgedBare;  ///< Without.
};

Material Prepare(const std::string& uri, bool sameId) {
  TokenSigning signing;
  signing.references[0].uri = uri;
  signing.references[0].targetId = uri.empty() ? "" : kTokenId;
  Material m;
  m.original = SignToken(TokenText().Compose(), TokenSigner(), signing);
  m.signature =
      "<ds:Signature" + CutBetween(m.original, "<ds:Signature", "</ds:Signature>") + "</ds:Signature>";
  m.bare = ReplaceOnce(m.original, m.signature, "");
  m.forgedId = sameId ? kTokenId : kForgedId;
  const std::string renamed = ReplaceOnce(m.original, kTokenSubject, "mallory@example.com");
  m.forged = ReplaceOnce(renamed, std::string(" ID=\"") + kTokenId, " ID=\"" + m.forgedId);
  m.forgedBare = ReplaceOnce(m.forged, m.signature, "");
  return m;
}

const std::string kReference = std::string("#") + kTokenId;

std::string Respond(const std::string& content) {
  return "<samlp:Response xmlns:samlp=\"urn:oasis:names:tc:SAML:2.0:protocol\">" + content +
         "</samlp:Response>";
}

/// With the signature replaced by `signature`.
std::string Resign(const Material& m, const std::string& signature) {
  return ReplaceOnce(m.forged, m.signature, signature);
}

void ExpectRefused(const Material& m, const std::string& text, const std::string& asDocument,
                   const std::string& embedded) {
  EXPECT_EQ(VerdictOnToken(text), asDocument);
  EXPECT_EQ(VerdictOnEmbedded(text, m.forgedId), embedded);
}

// The same text stands for itself and inside a message; positions then differ.
void ExpectRefusedEverywhere(const Material& m, const std::string& text, const std::string& message,
                             const std::string& part) {
  const std::string response = Respond(text);
  ExpectRefused(m, text, message + PlaceOf(text, part), message + PlaceOf(text, part));
  ExpectRefused(m, response, kNoAssertion, message + PlaceOf(response, part));
}

class SignatureWrapping : public testing::TestWithParam<bool> {
 protected:
  const Material m = Prepare(kReference, GetParam());
};

INSTANTIATE_TEST_SUITE_P(, SignatureWrapping, testing::Bool(),
                         [](const auto& parameter) { return parameter.param ? "SameId" : "OwnId"; });

TEST(SignatureWrappingMaterial, IsGood) {
  const Material m = Prepare(kReference, false);
  EXPECT_EQ(VerdictOnToken(m.original), "accepted");
  EXPECT_EQ(VerdictOnEmbedded(Respond(m.original), kTokenId), "accepted");
  EXPECT_NE(m.forged.find("mallory@example.com"), std::string::npos);
  EXPECT_EQ(m.bare.find("Signature"), std::string::npos);
}

TEST_P(SignatureWrapping, Form1OriginalInsideTheSignatureIsRefused) {
  const std::string text = Resign(m, ReplaceOnce(m.signature, "</ds:Signature>", m.bare + "</ds:Signature>"));
  const std::string inside = "</ds:KeyInfo><saml:Assertion";
  const std::string message = SyntaxError("Unexpected element 'saml:Assertion' in 'ds:Signature'");
  const std::size_t at = text.find(inside) + std::string("</ds:KeyInfo>").size();
  const std::string place = " at line 1, column " + std::to_string(at + 1);
  ExpectRefused(m, text, message + place, message + place);
}

TEST_P(SignatureWrapping, Form2OriginalBesideADetachedSignatureIsRefused) {
  const std::string message = SyntaxError("Element 'saml:Assertion' is not a signature");
  const std::string before = m.forged.substr(0, m.forged.find(m.signature));
  const std::string text = Resign(m, m.bare + m.signature);
  const std::string place = " at line 1, column " + std::to_string(before.size() + 1);
  ExpectRefused(m, text, message + place, message + place);
  // With the signature first, the original stands where the subject is expected.
  const std::string swapped = Resign(m, m.signature + m.bare);
  const std::string refused =
      GetParam() ? "Quorlin::ParseException: Expected element 'Subject' not found." : kNotCovered;
  ExpectRefused(m, swapped, refused, refused);
}

TEST_P(SignatureWrapping, Form3ForgedBeforeTheOriginalIsRefused) {
  const std::string text = Respond(m.forgedBare + m.original);
  ExpectRefused(m, text, kNoAssertion,
                SyntaxError("Element 'saml:Subject' is not a signature") + PlaceOf(text, "<saml:Subject>"));
  const std::string withCopy = Respond(m.forged + m.original);
  ExpectRefused(m, withCopy, kNoAssertion, GetParam() ? kAmbiguous : kNotCovered);
}

TEST_P(SignatureWrapping, Form4OriginalInsideTheForgedIsRefused) {
  const std::string atEnd =
      m.forgedBare.substr(0, m.forgedBare.rfind("</saml:Assertion>")) + m.original + "</saml:Assertion>";
  ExpectRefusedEverywhere(m, atEnd, SyntaxError("Element 'saml:Subject' is not a signature"),
                          "<saml:Subject>");
  const std::string signedToo =
      m.forged.substr(0, m.forged.rfind("</saml:Assertion>")) + m.original + "</saml:Assertion>";
  const std::string refused =
      GetParam() ? "Quorlin::ParseException: Unexpected elements under Assertion" : kNotCovered;
  ExpectRefused(m, signedToo, refused, refused);
}

TEST_P(SignatureWrapping, Form5BareOriginalAtTheEndOfTheMessageIsRefused) {
  ExpectRefused(m, Respond(m.forged + m.bare), kNoAssertion, GetParam() ? kAmbiguous : kNotCovered);
}

TEST_P(SignatureWrapping, Form6OriginalInTheKeyInfoOfTheForgedIsRefused) {
  const std::string text = Resign(m, ReplaceOnce(m.signature, "</ds:KeyInfo>", m.bare + "</ds:KeyInfo>"));
  const std::string refused = GetParam() ? kAmbiguous : kNotCovered;
  ExpectRefused(m, text, refused, refused);
}

TEST_P(SignatureWrapping, Form7ForgedInAnExtensionIsRefused) {
  const std::string text = Respond("<samlp:Extensions>" + m.forged + "</samlp:Extensions>" + m.original);
  ExpectRefused(m, text, kNoAssertion, GetParam() ? kAmbiguous : kNotCovered);
  // An assertion's own place for anything is its Advice.
  const std::string advice = ReplaceOnce(m.forged, "<saml:AuthnStatement",
                                         "<saml:Advice>" + m.bare + "</saml:Advice><saml:AuthnStatement");
  const std::string refused =
      GetParam() ? "Quorlin::ParseException: Expected element 'RSAAdvice' not found." : kNotCovered;
  ExpectRefused(m, advice, refused, refused);
}

TEST_P(SignatureWrapping, Form8OriginalInAnObjectOfTheSignatureIsRefused) {
  const std::string text = Resign(
      m, ReplaceOnce(m.signature, "</ds:Signature>", "<ds:Object>" + m.bare + "</ds:Object></ds:Signature>"));
  ExpectRefusedEverywhere(m, text, SyntaxError("Unexpected element 'ds:Object' in 'ds:Signature'"),
                          "<ds:Object>");
}

// --- Signatures with an empty reference cover whatever they are put into ---

TEST(SignatureWrappingOfEmptyReference, DigestsTheElementThatIsRead) {
  const Material m = Prepare("", false);
  EXPECT_EQ(VerdictOnToken(m.original), "accepted");
  EXPECT_EQ(VerdictOnToken(m.forged), kTampered);
  EXPECT_EQ(VerdictOnEmbedded(Respond(m.original), kTokenId), "accepted");
  EXPECT_EQ(VerdictOnEmbedded(Respond(m.forged), kForgedId), kTampered);
  EXPECT_EQ(VerdictOnEmbedded(Respond(m.forged + m.bare), kForgedId), kTampered);
  EXPECT_EQ(VerdictOnEmbedded(Respond(m.bare + m.forged), kForgedId), kTampered);
  EXPECT_EQ(VerdictOnToken(Resign(m, ReplaceOnce(m.signature, "</ds:KeyInfo>", m.bare + "</ds:KeyInfo>"))),
            kTampered);
}

// --- IDs ---

TEST(SignatureWrappingOfIds, RefusesASecondElementOfTheSameId) {
  const Material m = Prepare(kReference, true);
  const std::string id = std::string("=\"") + kTokenId + "\"";
  for (
      const std::string& attribute :
      {"ID" + id, "Id" + id, "id" + id, "xml:id" + id,
       "xmlns:u=\"http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd\" u:Id" +
           id}) {
    const std::string other = "<other " + attribute + "/>";
    EXPECT_EQ(
        VerdictOnEmbedded(Respond(other + m.original), kTokenId),
        "Quorlin::InvalidSignatureException: Signature verification error. Reference '#_4f0a9c1e' is ambiguous: several "
        "elements have this ID")
        << attribute;
    EXPECT_EQ(VerdictOnEmbedded(Respond(m.original + other), kTokenId), kAmbiguous) << attribute;
  }
}

TEST(SignatureWrappingOfIds, RefusesTheSameIdInsideTheAssertion) {
  TokenText text;
  text.restrictions = "<saml:AudienceRestriction ID=\"" + std::string(kTokenId) +
                      "\"><saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>";
  EXPECT_EQ(VerdictOnToken(text), kAmbiguous);
}

TEST(SignatureWrappingOfIds, ReadsTheOriginalBesideAnythingElse) {
  const Material m = Prepare(kReference, false);
  const auto document = ParseXmlText(Respond(m.forged + m.original + m.forgedBare));
  const auto token = CreateSamlTokenFromDom(
      Pelmar::Xml::AsElement(document->GetDocumentElement()->GetFirstChild()->GetNextSibling()),
      Trust({TokenSigner()}));
  EXPECT_EQ(MeaningOf(*token), MeaningOf(*ReadToken(m.original)));
}

}  // namespace
}  // namespace Quorlin
