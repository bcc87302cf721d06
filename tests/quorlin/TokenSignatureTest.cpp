// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Which signatures and which certificates make a token believed.

#include "support/TokenFactory.h"
#include "support/Verdict.h"
#include "support/XmlText.h"

#include <pelmar/xml/security/Signature.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using namespace Pelmar::Xml::Security;

const char* const kTampered =
    "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.";

std::string Error(const std::string& reason) {
  return "Quorlin::InvalidSignatureException: Signature verification error. " + reason;
}

std::string Untrusted(const std::string& reason) {
  return Error("Certificate chain is not trusted: " + reason);
}

std::string SignedBy(const Identity& signer, const TokenSigning& signing = TokenSigning()) {
  return SignToken(TokenText().Compose(), signer, signing);
}

// --- The whole accepted profile ---

struct MethodCase {
  KeyKind key;
  const char* method;
};

TEST(TokenSignature, VerifiesWithEveryKeyAndMethod) {
  const std::vector<MethodCase> cases = {
      {KeyKind::RSA_2048, kRsaSha256},  {KeyKind::RSA_2048, kRsaSha384},  {KeyKind::RSA_2048, kRsaSha512},
      {KeyKind::RSA_3072, kRsaSha256},  {KeyKind::RSA_4096, kRsaSha512},  {KeyKind::EC_P256, kEcdsaSha256},
      {KeyKind::EC_P256, kEcdsaSha512}, {KeyKind::EC_P384, kEcdsaSha384}, {KeyKind::EC_P521, kEcdsaSha512}};
  for (const MethodCase& c : cases) {
    CertificateSpec spec;
    spec.keyKind = c.key;
    const Identity signer = MakeSelfSigned(spec);
    TokenSigning signing;
    signing.signatureMethod = c.method;
    EXPECT_EQ(VerdictOnToken(SignedBy(signer, signing), Trust({signer})), "accepted") << c.method;
  }
}

TEST(TokenSignature, VerifiesWithEveryDigestCanonicalisationAndReference) {
  for (const char* const digest : {kSha256, kSha384, kSha512}) {
    for (const char* const canonicalization :
         {kC14n, kC14nWithComments, kExclusiveC14n, kExclusiveC14nWithComments}) {
      for (const std::string& uri : {std::string(), std::string("#") + kTokenId}) {
        TokenSigning signing;
        signing.canonicalization = canonicalization;
        signing.references[0].digestMethod = digest;
        signing.references[0].canonicalization =
            canonicalization == std::string(kC14nWithComments) ? kC14n : canonicalization;
        signing.references[0].uri = uri;
        EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner(), signing)), "accepted")
            << digest << canonicalization << uri;
      }
    }
  }
}

TEST(TokenSignature, VerifiesWithInclusiveNamespaces) {
  for (const std::vector<std::string>& prefixes :
       {std::vector<std::string>{"xs"}, std::vector<std::string>{"xs", "saml", "xsi"},
        std::vector<std::string>{"#default", "ext"}}) {
    TokenSigning signing;
    signing.inclusivePrefixes = prefixes;
    signing.references[0].inclusivePrefixes = prefixes;
    EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner(), signing)), "accepted") << prefixes.front();
  }
}

TEST(TokenSignature, ProtectsTheMeaningOfPrefixesThatAreListedAsInclusive) {
  TokenSigning signing;
  signing.references[0].inclusivePrefixes = {"xs"};
  const std::string text = SignedBy(TokenSigner(), signing);
  EXPECT_EQ(VerdictOnToken(
                ReplaceOnce(text, "xmlns:xs=\"http://www.w3.org/2001/XMLSchema\"", "xmlns:xs=\"urn:other\"")),
            kTampered);
}

TEST(TokenSignature, VerifiesWithoutNamedCanonicalisation) {
  TokenSigning signing;
  signing.references[0].canonicalization.clear();
  EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner(), signing)), "accepted");
}

TEST(TokenSignature, VerifiesUnderAnyPrefix) {
  for (const char* const prefix : {"", "ds", "dsig", "saml2"}) {
    TokenSigning signing;
    signing.prefix = prefix;
    EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner(), signing)), "accepted") << prefix;
  }
}

TEST(TokenSignature, VerifiesWithSeveralReferences) {
  TokenSigning signing;
  ReferencePlan whole;
  whole.uri = "";
  whole.digestMethod = kSha512;
  signing.references.push_back(whole);
  EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner(), signing)), "accepted");
}

TEST(TokenSignature, IsRefusedWhenAnyOfItsReferencesFails) {
  TokenSigning signing;
  ReferencePlan nowhere;
  nowhere.uri = "#_nowhere";
  nowhere.targetId = kTokenId;
  signing.references.push_back(nowhere);
  EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner(), signing)),
            Error("Reference '#_nowhere' refers to no element that could be signed"));
  signing.references[1].uri = "";
  signing.references[1].digestMethod = kSha384;
  signing.references[1].targetId.clear();
  const std::string text = SignedBy(TokenSigner(), signing);
  const std::string digestMethod =
      std::string("<ds:DigestMethod Algorithm=\"") + kSha384 + "\"/><ds:DigestValue>";
  const std::size_t at = text.find(digestMethod) + digestMethod.size();
  std::string altered = text;
  altered[at] = altered[at] == 'A' ? 'B' : 'A';
  EXPECT_EQ(VerdictOnToken(altered), kTampered);
}

TEST(TokenSignature, VerifiesWhenThePlatformMadeIt) {
  const std::string text = TokenText().Compose();
  const auto document = ParseXmlText(text);
  Pelmar::Ref<Signature> signature;
  CreateBlankSignature(document->GetDocumentElement(), kExclusiveC14n, kRsaSha256, "ds", signature);
  const Pelmar::Ref<SignatureReference> reference =
      signature->AddReference(std::string("#") + kTokenId, kSha256);
  reference->AddTransform(kEnvelopedSignature);
  reference->AddTransform(kExclusiveC14n);
  const std::string certificate =
      "<ds:X509Data xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"><ds:X509Certificate>" +
      Base64Of(TokenSigner()) + "</ds:X509Certificate></ds:X509Data>";
  const auto keyInfo = ParseXmlText(certificate);
  signature->SetKeyInfo(Pelmar::Ref<Pelmar::Xml::ElementNode>(keyInfo->GetDocumentElement()));
  signature->Sign(TokenSigner().GetKey().Get());
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(text, kSignatureMarker, WriteXmlText(signature->GetElement().Get()))),
            "accepted");
}

// --- Certificates ---

const Identity& Root() {
  static const Identity root = MakeCa("Test root", 1);
  return root;
}

Identity IssuedBy(const Identity& issuer, const CertificateSpec& spec = CertificateSpec()) {
  return MakeIssued(issuer, spec);
}

Identity IntermediateCa() {
  CertificateSpec spec;
  spec.commonName = "Test intermediate";
  spec.keyNumber = 2;
  spec.ca = true;
  return MakeIssued(Root(), spec);
}

TEST(TokenSignature, IsTrustedThroughTheLeafItself) {
  const Identity leaf = IssuedBy(Root());
  EXPECT_EQ(VerdictOnToken(SignedBy(leaf), Trust({leaf})), "accepted");
}

TEST(TokenSignature, IsTrustedThroughTheRoot) {
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(Root())), Trust({Root()})), "accepted");
}

TEST(TokenSignature, IsTrustedThroughIntermediatesInKeyInfoInAnyOrder) {
  const Identity intermediate = IntermediateCa();
  const Identity leaf = IssuedBy(intermediate);
  TokenSigning signing;
  signing.alsoShown = {intermediate};
  EXPECT_EQ(VerdictOnToken(SignedBy(leaf, signing), Trust({Root()})), "accepted");
  signing.keyInfo = "<ds:KeyInfo><ds:X509Data><ds:X509Certificate>" + Base64Of(Root()) +
                    "</ds:X509Certificate><ds:X509Certificate>" + Base64Of(intermediate) +
                    "</ds:X509Certificate></ds:X509Data><ds:X509Data><ds:X509Certificate>" + Base64Of(leaf) +
                    "</ds:X509Certificate></ds:X509Data></ds:KeyInfo>";
  EXPECT_EQ(VerdictOnToken(SignedBy(leaf, signing), Trust({Root()})), "accepted");
  EXPECT_EQ(VerdictOnToken(SignedBy(leaf, signing), Trust({intermediate})), "accepted");
}

TEST(TokenSignature, IsNotTrustedWithoutTheIntermediate) {
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(IntermediateCa())), Trust({Root()})),
            Untrusted("unable to get local issuer certificate (CN=Test signer)"));
}

TEST(TokenSignature, IsTrustedThroughOneOfSeveralCertificates) {
  CertificateSpec otherSpec;
  otherSpec.commonName = "Another";
  otherSpec.keyNumber = 3;
  const Identity other = MakeSelfSigned(otherSpec);
  EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner()), Trust({other, Root(), TokenSigner()})), "accepted");
  EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner()), Trust({other, Root()})),
            Untrusted("self-signed certificate (CN=Test signer)"));
}

TEST(TokenSignature, IsTrustedThroughTwoCertificatesOfOneName) {
  CertificateSpec renewed;
  renewed.keyNumber = 4;
  const Identity other = MakeSelfSigned(renewed);
  EXPECT_EQ(VerdictOnToken(SignedBy(TokenSigner()), Trust({other, TokenSigner()})), "accepted");
  EXPECT_EQ(VerdictOnToken(SignedBy(other), Trust({TokenSigner(), other})), "accepted");
}

TEST(TokenSignature, IsNotTrustedForAForeignSelfSignedCertificate) {
  CertificateSpec spec;
  spec.commonName = "Mallory";
  spec.keyNumber = 5;
  EXPECT_EQ(VerdictOnToken(SignedBy(MakeSelfSigned(spec))),
            Untrusted("self-signed certificate (CN=Mallory)"));
}

TEST(TokenSignature, IsNotTrustedForTheTrustedNameWithAnotherKey) {
  CertificateSpec spec;
  spec.keyNumber = 5;
  EXPECT_EQ(VerdictOnToken(SignedBy(MakeSelfSigned(spec))),
            Untrusted("self-signed certificate (CN=Test signer)"));
}

TEST(TokenSignature, IsNotTrustedForACertificateThatClaimsTheRootAsItsIssuer) {
  const Identity pretender = MakeCa("Test root", 6);
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(pretender)), Trust({Root()})),
            Untrusted("certificate signature failure (CN=Test signer)"));
}

TEST(TokenSignature, IsRefusedWhenTheTrustedCertificateIsShownForAnotherKey) {
  CertificateSpec spec;
  spec.keyNumber = 5;
  const Identity mallory = MakeSelfSigned(spec);
  TokenSigning signing;
  signing.keyInfo = "<ds:KeyInfo><ds:X509Data><ds:X509Certificate>" + Base64Of(TokenSigner()) +
                    "</ds:X509Certificate></ds:X509Data></ds:KeyInfo>";
  EXPECT_EQ(VerdictOnToken(SignedBy(mallory, signing)), kTampered);
}

TEST(TokenSignature, IsRefusedWhenATrustedCertificateIsShownBesideAForeignOne) {
  CertificateSpec spec;
  spec.commonName = "Mallory";
  spec.keyNumber = 5;
  const Identity mallory = MakeSelfSigned(spec);
  TokenSigning signing;
  signing.alsoShown = {TokenSigner()};
  EXPECT_EQ(VerdictOnToken(SignedBy(mallory, signing)), Untrusted("self-signed certificate (CN=Mallory)"));
}

TEST(TokenSignature, IsNotTrustedOutsideTheCertificatesPeriod) {
  CertificateSpec expired;
  expired.notBefore = -2 * kYear;
  expired.notAfter = -kDay;
  CertificateSpec early;
  early.notBefore = kDay;
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(Root(), expired)), Trust({Root()})),
            Untrusted("certificate has expired (CN=Test signer)"));
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(Root(), early)), Trust({Root()})),
            Untrusted("certificate is not yet valid (CN=Test signer)"));
  const Identity trusted = MakeSelfSigned(expired);
  EXPECT_EQ(VerdictOnToken(SignedBy(trusted), Trust({trusted})),
            Untrusted("certificate has expired (CN=Test signer)"));
}

TEST(TokenSignature, IsNotTrustedWhenItsIssuerHasExpired) {
  CertificateSpec spec;
  spec.commonName = "Old CA";
  spec.keyNumber = 2;
  spec.ca = true;
  spec.notBefore = -2 * kYear;
  spec.notAfter = -kDay;
  const Identity old = MakeIssued(Root(), spec);
  TokenSigning signing;
  signing.alsoShown = {old};
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(old), signing), Trust({Root()})),
            Untrusted("certificate has expired (CN=Old CA)"));
}

TEST(TokenSignature, IsNotTrustedForALeafIssuedByANonCa) {
  CertificateSpec spec;
  spec.commonName = "No CA";
  spec.keyNumber = 2;
  const Identity leaf = MakeIssued(Root(), spec);
  TokenSigning signing;
  signing.alsoShown = {leaf};
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(leaf), signing), Trust({Root()})),
            Untrusted("invalid CA certificate (CN=No CA)"));
}

TEST(TokenSignature, IsNotTrustedForALeafIssuedByATrustedSigner) {
  CertificateSpec spec;
  spec.commonName = "Mallory";
  spec.keyNumber = 2;
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(TokenSigner(), spec))),
            Untrusted("invalid CA certificate (CN=Test signer)"));
}

TEST(TokenSignature, IsRefusedForAKeyThatMustNotSign) {
  CertificateSpec spec;
  spec.keyUsage = "keyEncipherment";
  const Identity signer = MakeSelfSigned(spec);
  EXPECT_EQ(VerdictOnToken(SignedBy(signer), Trust({signer})),
            Error("The certificate's key usage does not allow signatures (CN=Test signer)"));
}

TEST(TokenSignature, IsRefusedForAnUnknownCriticalExtension) {
  CertificateSpec spec;
  spec.unknownCriticalExtension = true;
  EXPECT_EQ(VerdictOnToken(SignedBy(IssuedBy(Root(), spec)), Trust({Root()})),
            Untrusted("unhandled critical extension (CN=Test signer)"));
}

TEST(TokenSignature, IsRefusedWhenMethodAndKeyDoNotFit) {
  const std::string text = SignedBy(TokenSigner());
  EXPECT_EQ(
      VerdictOnToken(ReplaceOnce(text, kRsaSha256, kEcdsaSha256)),
      Error(
          "Signature method 'http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256' does not fit the signer's key"));
}

// --- KeyInfo ---

std::string WithKeyInfo(const std::string& keyInfo) {
  TokenSigning signing;
  signing.keyInfo = keyInfo;
  return SignedBy(TokenSigner(), signing);
}

TEST(TokenSignature, IsRefusedWithoutACertificate) {
  const std::string none = Error("The signature's KeyInfo holds no certificate");
  EXPECT_EQ(VerdictOnToken(WithKeyInfo("")), Error("The signature has no KeyInfo"));
  EXPECT_EQ(VerdictOnToken(WithKeyInfo("<ds:KeyInfo/>")), none);
  EXPECT_EQ(VerdictOnToken(WithKeyInfo("<ds:KeyInfo><ds:KeyName>CN=Test signer</ds:KeyName></ds:KeyInfo>")),
            none);
  EXPECT_EQ(VerdictOnToken(
                WithKeyInfo("<ds:KeyInfo><ds:X509Data><ds:X509SubjectName>CN=Test signer</ds:X509SubjectName>"
                            "</ds:X509Data></ds:KeyInfo>")),
            none);
  EXPECT_EQ(
      VerdictOnToken(WithKeyInfo("<ds:KeyInfo><ds:RetrievalMethod URI=\"http://127.0.0.1/\"/></ds:KeyInfo>")),
      none);
  EXPECT_EQ(VerdictOnToken(WithKeyInfo(
                "<ds:KeyInfo><ds:KeyValue><ds:RSAKeyValue><ds:Modulus>AQAB</ds:Modulus><ds:Exponent>AQAB"
                "</ds:Exponent></ds:RSAKeyValue></ds:KeyValue></ds:KeyInfo>")),
            none);
  EXPECT_EQ(
      VerdictOnToken(WithKeyInfo("<ds:KeyInfo xmlns:o=\"urn:o\"><o:X509Data><o:X509Certificate>" +
                                 Base64Of(TokenSigner()) + "</o:X509Certificate></o:X509Data></ds:KeyInfo>")),
      none);
}

TEST(TokenSignature, IsAcceptedWithOtherThingsBesideTheCertificate) {
  EXPECT_EQ(
      VerdictOnToken(WithKeyInfo(
          "<ds:KeyInfo><ds:KeyName>k</ds:KeyName><ds:X509Data><ds:X509SubjectName>CN=x</ds:X509SubjectName>"
          "<ds:X509Certificate>\n" +
          Base64Of(TokenSigner()) +
          "\n</ds:X509Certificate></ds:X509Data>"
          "</ds:KeyInfo>")),
      "accepted");
}

TEST(TokenSignature, IsRefusedForACertificateThatCannotBeRead) {
  const auto certificate = [](const std::string& content) {
    return WithKeyInfo("<ds:KeyInfo><ds:X509Data><ds:X509Certificate>" + content +
                       "</ds:X509Certificate></ds:X509Data></ds:KeyInfo>");
  };
  EXPECT_EQ(VerdictOnToken(certificate("AAAA")), Error("The certificate cannot be read: wrong tag"));
  const std::string notBase64 = certificate("****");
  EXPECT_EQ(VerdictOnToken(notBase64), Error("Element 'ds:X509Certificate' must hold base64 text" +
                                             PlaceOf(notBase64, "<ds:X509Certificate>")));
  const std::string empty = certificate("");
  EXPECT_EQ(VerdictOnToken(empty), Error("Element 'ds:X509Certificate' must hold one text" +
                                         PlaceOf(empty, "<ds:X509Certificate>")));
}

}  // namespace
}  // namespace Quorlin
