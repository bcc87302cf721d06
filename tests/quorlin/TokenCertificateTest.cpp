// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What stands in a signature's KeyInfo, and chains that an authority would never make (RFC 5280, section 6).

#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <pelmar/StringUtil.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;

std::string Error(const std::string& reason) {
  return "Quorlin::InvalidSignatureException: Signature verification error. " + reason;
}

std::string Untrusted(const std::string& reason) {
  return Error("Certificate chain is not trusted: " + reason);
}

const Identity& Root() {
  static const Identity root = MakeCa("Test root", 1);
  return root;
}

CertificateSpec CaSpec(const std::string& commonName, unsigned keyNumber) {
  CertificateSpec spec;
  spec.commonName = commonName;
  spec.keyNumber = keyNumber;
  spec.ca = true;
  return spec;
}

std::string X509Certificate(const Identity& identity) {
  return "<ds:X509Certificate>" + Base64Of(identity) + "</ds:X509Certificate>";
}

/// The verdict on a token of `signer`, whose signature shows `shown` after the signer's certificate.
std::string Judge(const Identity& signer, const std::vector<Identity>& shown, const TrustList& trusted) {
  TokenSigning signing;
  signing.alsoShown = shown;
  return VerdictOnToken(SignToken(TokenText().Compose(), signer, signing), trusted);
}

/// The same with `content` as all that the signature's KeyInfo holds.
std::string JudgeKeyInfo(const Identity& signer, const std::string& content, const TrustList& trusted) {
  TokenSigning signing;
  signing.keyInfo = "<ds:KeyInfo>" + content + "</ds:KeyInfo>";
  return VerdictOnToken(SignToken(TokenText().Compose(), signer, signing), trusted);
}

// --- Chains ---

TEST(CertificateChainOfAToken, KeepsToThePathLengthOfItsAuthorities) {
  CertificateSpec spec = CaSpec("Last authority", 2);
  spec.pathLength = 0;
  const Identity last = MakeIssued(Root(), spec);
  const Identity beyond = MakeIssued(last, CaSpec("One too many", 3));
  EXPECT_EQ(Judge(MakeIssued(last, CertificateSpec()), {last}, Trust({Root()})), "accepted");
  EXPECT_EQ(Judge(MakeIssued(beyond, CertificateSpec()), {beyond, last}, Trust({Root()})),
            Untrusted("path length constraint exceeded (CN=Last authority)"));
}

TEST(CertificateChainOfAToken, KeepsToTheNamesThatItsAuthoritiesAreFor) {
  CertificateSpec spec = CaSpec("Authority of example.com", 2);
  spec.nameConstraints = "permitted;DNS:example.com";
  const Identity authority = MakeIssued(Root(), spec);
  CertificateSpec inside;
  inside.subjectAlternativeName = "DNS:sts.example.com";
  CertificateSpec outside;
  outside.subjectAlternativeName = "DNS:sts.example.org";
  EXPECT_EQ(Judge(MakeIssued(authority, inside), {authority}, Trust({Root()})), "accepted");
  EXPECT_EQ(Judge(MakeIssued(authority, outside), {authority}, Trust({Root()})),
            Untrusted("permitted subtree violation (CN=Test signer)"));
}

TEST(CertificateChainOfAToken, KeepsToTheNamesThatItsAuthoritiesAreNotFor) {
  CertificateSpec spec = CaSpec("Authority of others", 2);
  spec.nameConstraints = "excluded;DNS:example.com";
  const Identity authority = MakeIssued(Root(), spec);
  CertificateSpec signer;
  signer.subjectAlternativeName = "DNS:sts.example.com";
  EXPECT_EQ(Judge(MakeIssued(authority, signer), {authority}, Trust({Root()})),
            Untrusted("excluded subtree violation (CN=Test signer)"));
}

TEST(CertificateChainOfAToken, NeedsAuthoritiesThatMaySignCertificates) {
  CertificateSpec spec = CaSpec("Signs no certificates", 2);
  spec.keyUsage = "digitalSignature,cRLSign";
  const Identity authority = MakeIssued(Root(), spec);
  EXPECT_EQ(Judge(MakeIssued(authority, CertificateSpec()), {authority}, Trust({Root()})),
            Untrusted("invalid CA certificate (CN=Signs no certificates)"));
}

TEST(CertificateChainOfAToken, IsRefusedForAnUnknownCriticalExtensionOfAnAuthority) {
  CertificateSpec spec = CaSpec("Critical authority", 2);
  spec.unknownCriticalExtension = true;
  const Identity authority = MakeIssued(Root(), spec);
  EXPECT_EQ(Judge(MakeIssued(authority, CertificateSpec()), {authority}, Trust({Root()})),
            Untrusted("unhandled critical extension (CN=Critical authority)"));
}

TEST(CertificateChainOfAToken, IsRefusedForAWeakAuthority) {
  CertificateSpec shortKey = CaSpec("Short key", 0);
  shortKey.keyKind = KeyKind::RSA_1024;
  const Identity weak = MakeIssued(Root(), shortKey);
  EXPECT_EQ(Judge(MakeIssued(weak, CertificateSpec()), {weak}, Trust({Root()})),
            Untrusted("CA certificate key too weak (CN=Short key)"));
  CertificateSpec oldDigest = CaSpec("Old digest", 2);
  oldDigest.digest = "SHA1";
  const Identity old = MakeIssued(Root(), oldDigest);
  EXPECT_EQ(Judge(MakeIssued(old, CertificateSpec()), {old}, Trust({Root()})),
            Untrusted("CA signature digest algorithm too weak (CN=Old digest)"));
}

// What a certificate is for beside signing (servers, mail) has no say here: the trust list has.
TEST(CertificateChainOfAToken, MayEndInASignerOfAnyExtendedUsage) {
  for (const char* const usage : {"serverAuth", "critical,clientAuth", "codeSigning"}) {
    CertificateSpec spec;
    spec.extendedKeyUsage = usage;
    EXPECT_EQ(Judge(MakeIssued(Root(), spec), {}, Trust({Root()})), "accepted") << usage;
  }
}

/// `count` authorities below the root, each issued by the one before.
std::vector<Identity> MakeLadder(unsigned count) {
  std::vector<Identity> ladder = {Root()};
  for (unsigned i = 1; i <= count; ++i) {
    ladder.push_back(MakeIssued(ladder.back(), CaSpec("Step " + std::to_string(i), 2 + i % 2)));
  }
  return ladder;
}

TEST(CertificateChainOfAToken, HasABoundedNumberOfIssuers) {
  const auto judge = [](unsigned intermediates) {
    std::vector<Identity> ladder = MakeLadder(intermediates);
    const Identity leaf = MakeIssued(ladder.back(), CertificateSpec());
    ladder.erase(ladder.begin());
    return Judge(leaf, ladder, Trust({Root()}));
  };
  EXPECT_EQ(judge(8), "accepted");
  EXPECT_EQ(judge(9), Untrusted("certificate chain too long (CN=Step 1)"));
}

// Two authorities that vouch for each other lead nowhere, and end.
TEST(CertificateChainOfAToken, EndsWhenAuthoritiesVouchForEachOther) {
  const Identity a = MakeCa("Authority A", 2);
  const Identity b = MakeCa("Authority B", 3);
  const Identity aByB = MakeIssued(b, CaSpec("Authority A", 2));
  const Identity bByA = MakeIssued(a, CaSpec("Authority B", 3));
  const Identity leaf = MakeIssued(a, CertificateSpec());
  EXPECT_EQ(Judge(leaf, {aByB, bByA}, Trust({Root()})),
            Untrusted("unable to get local issuer certificate (CN=Authority B)"));
  // With one of them trusted either way leads to it.
  EXPECT_EQ(Judge(leaf, {aByB, bByA}, Trust({b})), "accepted");
  EXPECT_EQ(Judge(leaf, {bByA, aByB}, Trust({a})), "accepted");
}

TEST(CertificateChainOfAToken, IsFoundPastAuthoritiesOfTheSameName) {
  const Identity genuine = MakeIssued(Root(), CaSpec("Intermediate", 2));
  const Identity pretender = MakeIssued(MakeCa("Test root", 6), CaSpec("Intermediate", 7));
  const Identity leaf = MakeIssued(genuine, CertificateSpec());
  EXPECT_EQ(Judge(leaf, {genuine}, Trust({Root()})), "accepted");
  // A pretender shown beside it may only make the chain fail, never succeed.
  EXPECT_EQ(Judge(MakeIssued(pretender, CertificateSpec()), {pretender, genuine}, Trust({Root()})),
            Untrusted("certificate signature failure (CN=Intermediate)"));
}

// --- The signature's KeyInfo ---

TEST(KeyInfoOfAToken, ShowsItsCertificatesInAnyOrder) {
  const Identity intermediate = MakeIssued(Root(), CaSpec("Intermediate", 2));
  const Identity leaf = MakeIssued(intermediate, CertificateSpec());
  std::vector<std::string> order = {X509Certificate(leaf), X509Certificate(intermediate),
                                    X509Certificate(Root())};
  std::sort(order.begin(), order.end());
  do {
    EXPECT_EQ(JudgeKeyInfo(leaf, "<ds:X509Data>" + order[0] + order[1] + order[2] + "</ds:X509Data>",
                           Trust({Root()})),
              "accepted");
    EXPECT_EQ(JudgeKeyInfo(leaf,
                           "<ds:X509Data>" + order[0] + "</ds:X509Data><ds:X509Data>" + order[1] +
                               "</ds:X509Data><ds:X509Data>" + order[2] + "</ds:X509Data>",
                           Trust({Root()})),
              "accepted");
  } while (std::next_permutation(order.begin(), order.end()));
}

// Names, serial numbers, key identifiers and revocation lists beside a certificate are claims of whoever
// sends the token: they neither help nor harm.
TEST(KeyInfoOfAToken, MayTellMoreOfItsCertificate) {
  const std::string certificate = X509Certificate(TokenSigner());
  for (const char* const more :
       {"<ds:X509IssuerSerial><ds:X509IssuerName>CN=Mallory</ds:X509IssuerName><ds:X509SerialNumber>1"
        "</ds:X509SerialNumber></ds:X509IssuerSerial>",
        "<ds:X509SKI>AAAA</ds:X509SKI>", "<ds:X509SubjectName>CN=Mallory</ds:X509SubjectName>",
        "<ds:X509CRL>AAAA</ds:X509CRL>", "<x:Other xmlns:x=\"urn:x\"/>", "text", "<!-- c -->"}) {
    for (const std::string& content : {more + certificate, certificate + more}) {
      EXPECT_EQ(
          JudgeKeyInfo(TokenSigner(), "<ds:X509Data>" + content + "</ds:X509Data>", Trust({TokenSigner()})),
          "accepted")
          << more;
    }
  }
}

TEST(KeyInfoOfAToken, IsNotBelievedForTheKeysItNames) {
  CertificateSpec spec;
  spec.commonName = "Mallory";
  spec.keyNumber = 5;
  const Identity mallory = MakeSelfSigned(spec);
  const std::string trusted = "<ds:X509Data>" + X509Certificate(TokenSigner()) + "</ds:X509Data>";
  const std::string tampered =
      "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.";
  for (const std::string& first :
       {std::string("<ds:KeyName>CN=Mallory</ds:KeyName>"),
        std::string(
            "<ds:KeyValue><ds:RSAKeyValue><ds:Modulus>AQAB</ds:Modulus><ds:Exponent>AQAB</ds:Exponent>"
            "</ds:RSAKeyValue></ds:KeyValue>"),
        std::string("<ds:RetrievalMethod URI=\"http://127.0.0.1:1/\"/>"),
        "<x:X509Data xmlns:x=\"urn:x\">" + X509Certificate(mallory) + "</x:X509Data>",
        "<ds:Other>" + X509Certificate(mallory) + "</ds:Other>", X509Certificate(mallory)}) {
    EXPECT_EQ(JudgeKeyInfo(mallory, first + trusted, Trust({TokenSigner()})), tampered) << first;
    EXPECT_EQ(JudgeKeyInfo(mallory, trusted + first, Trust({TokenSigner()})), tampered) << first;
  }
}

TEST(KeyInfoOfAToken, HoldsABoundedNumberOfCertificates) {
  const auto judge = [](int count) {
    std::string content;
    for (int i = 0; i < count; ++i) {
      content += X509Certificate(TokenSigner());
    }
    return JudgeKeyInfo(TokenSigner(), "<ds:X509Data>" + content + "</ds:X509Data>", Trust({TokenSigner()}));
  };
  EXPECT_EQ(judge(10), "accepted");
  EXPECT_EQ(judge(11), Error("The signature's KeyInfo holds more than 10 certificates"));
}

TEST(KeyInfoOfAToken, HoldsCertificatesOfABoundedSize) {
  const std::vector<unsigned char> tooLarge(64 * 1024 + 1);
  EXPECT_EQ(JudgeKeyInfo(TokenSigner(),
                         "<ds:X509Data><ds:X509Certificate>" + Pelmar::StringUtil::Base64Encode(tooLarge) +
                             "</ds:X509Certificate></ds:X509Data>",
                         Trust({TokenSigner()})),
            Error("The certificate is larger than 65536 bytes"));
}

// KeyInfo is not signed, so it may carry an ID of its own; the assertion's it may not.
TEST(KeyInfoOfAToken, MayHaveAnIdOfItsOwn) {
  const std::string content =
      "<ds:X509Data>" + X509Certificate(TokenSigner()) + "</ds:X509Data></ds:KeyInfo>";
  const auto judge = [&](const std::string& start) {
    TokenSigning signing;
    signing.keyInfo = start + content;
    return VerdictOnToken(SignToken(TokenText().Compose(), TokenSigner(), signing));
  };
  EXPECT_EQ(judge("<ds:KeyInfo Id=\"k\">"), "accepted");
  EXPECT_EQ(judge(std::string("<ds:KeyInfo Id=\"") + kTokenId + "\">"),
            Error("Reference '#_4f0a9c1e' is ambiguous: several elements have this ID"));
}

// --- The confirmation certificate: told to the host, not trusted ---

TEST(ConfirmationCertificate, MayBeAnyCertificate) {
  CertificateSpec spec;
  spec.commonName = "Holder";
  spec.keyNumber = 5;
  spec.notBefore = -2 * kYear;
  spec.notAfter = -kDay;
  const Identity holder = MakeSelfSigned(spec);
  TokenText text;
  text.HoldKey(holder);
  EXPECT_EQ(ReadToken(text)->GetConfirmationCertificate()->GetDer(), holder.certificate->GetDer());
}

TEST(ConfirmationCertificate, DoesNotMakeItsHolderASigner) {
  CertificateSpec spec;
  spec.commonName = "Holder";
  spec.keyNumber = 5;
  const Identity holder = MakeSelfSigned(spec);
  TokenText text;
  text.HoldKey(holder);
  EXPECT_EQ(VerdictOnToken(SignToken(text.Compose(), holder), Trust({TokenSigner()})),
            Untrusted("self-signed certificate (CN=Holder)"));
}

}  // namespace
}  // namespace Quorlin
