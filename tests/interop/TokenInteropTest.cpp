// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tokens that the xmlsec1 program signed, and the tests' own signer judged by it.

#include "quorlin/Namespaces.h"
#include "support/GoldenText.h"
#include "support/Process.h"
#include "support/TemporaryDirectory.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <pelmar/StringUtil.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

namespace {

using namespace Pelmar::Xml::Security;
using namespace TestSupport;

ProcessResult RunXmlsec(const std::vector<std::string>& arguments) {
  std::vector<std::string> command = {"xmlsec1"};
  command.insert(command.end(), arguments.begin(), arguments.end());
  try {
    return RunProcess(command);
  } catch (const std::system_error& error) {
    throw std::runtime_error(std::string(error.what()) + " (it comes with the Debian package xmlsec1)");
  }
}

const char* const kIdOption = "--id-attr:ID";
const char* const kIdElement = "urn:oasis:names:tc:SAML:2.0:assertion:Assertion";

/// How xmlsec1 is to sign.
struct Template {
  std::string canonicalization = kExclusiveC14n;
  std::string prefixes = "";  ///< Of InclusiveNamespaces; empty: none.
  std::string uri = std::string("#") + kTokenId;
  std::string signatureMethod = kRsaSha256;
  std::string digestMethod = kSha256;
};

std::string Method(const std::string& name, const Template& plan) {
  const std::string start = "<ds:" + name + " Algorithm=\"" + plan.canonicalization + "\"";
  return plan.prefixes.empty() ? start + "/>"
                               : start + "><ec:InclusiveNamespaces xmlns:ec=\"" + kExclusiveC14n +
                                     "\" PrefixList=\"" + plan.prefixes + "\"/></ds:" + name + ">";
}

std::string Write(const Template& plan) {
  return "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\">\n  <ds:SignedInfo>\n    " +
         Method("CanonicalizationMethod", plan) + "<ds:SignatureMethod Algorithm=\"" + plan.signatureMethod +
         "\"/><ds:Reference URI=\"" + plan.uri + "\"><ds:Transforms><ds:Transform Algorithm=\"" +
         kEnvelopedSignature + "\"/>" + Method("Transform", plan) +
         "</ds:Transforms><ds:DigestMethod Algorithm=\"" + plan.digestMethod +
         "\"/><ds:DigestValue/></ds:Reference></ds:SignedInfo><ds:SignatureValue/><ds:KeyInfo><ds:X509Data/></ds:KeyInfo>"
         "</ds:Signature>";
}

/// A token with something of everything that canonicalisation has to treat.
TokenText RichText() {
  TokenText text;
  text.prolog = "<?xml version=\"1.0\"?>\n<!-- before -->\n";
  text.declarations += " xmlns=\"urn:default\" xmlns:unused='urn:unused'";
  text.restrictions =
      ProxyRestriction("\n Count = '1' ") + RenewRestriction("RenewExpired=\"x&#9;&quot;\" Count=\"2\"");
  text.attributes = AttributeElement(Quorlin::kAttrGroupIdentity,
                                     {"D\\caf\xC3\xA9", "g &amp; h/D", "<![CDATA[D\\<raw>]]>"}) +
                    AttributeElement(Quorlin::kClaimSurname, {"line one&#13;\r\nline two\ttab &lt;&gt;"});
  text.tail = "\n<!-- at the end -->\n";
  return text;
}

/// The text of `text` signed by xmlsec1 with the first identity's key; all identities' certificates are
/// shown.
std::string SignWithXmlsec(const TokenText& text, const Template& plan,
                           const std::vector<Identity>& identities) {
  const TemporaryDirectory directory;
  std::string files = directory.WriteFile("key.pem", identities.front().GetKeyPem());
  for (std::size_t i = 0; i < identities.size(); ++i) {
    files += "," + directory.WriteFile("certificate" + std::to_string(i) + ".pem",
                                       identities[i].GetCertificatePem());
  }
  const std::string unsignedFile =
      directory.WriteFile("unsigned.xml", ReplaceOnce(text.Compose(), kSignatureMarker, Write(plan)));
  const ProcessResult result =
      RunXmlsec({"--sign", kIdOption, kIdElement, "--output", directory.GetPath("signed.xml"),
                 "--privkey-pem", files, unsignedFile});
  if (result.exitCode != 0) {
    throw std::runtime_error("xmlsec1 does not sign: " + result.standardError);
  }
  return directory.ReadFile("signed.xml");
}

Identity MakeSigner(KeyKind kind) {
  CertificateSpec spec;
  spec.keyKind = kind;
  return MakeSelfSigned(spec);
}

struct KeyCase {
  KeyKind kind;
  std::vector<const char*> methods;
};

const std::vector<KeyCase> kKeys = {{KeyKind::RSA_2048, {kRsaSha256, kRsaSha384, kRsaSha512}},
                                    {KeyKind::RSA_3072, {kRsaSha256, kRsaSha384, kRsaSha512}},
                                    {KeyKind::RSA_4096, {kRsaSha256, kRsaSha384, kRsaSha512}},
                                    {KeyKind::EC_P256, {kEcdsaSha256, kEcdsaSha384, kEcdsaSha512}},
                                    {KeyKind::EC_P384, {kEcdsaSha256, kEcdsaSha384, kEcdsaSha512}}};

TEST(TokenInterop, AcceptsEveryKeyAndMethod) {
  const TokenText text = RichText();
  const std::string meaning = MeaningOf(*ReadToken(text));
  for (const KeyCase& key : kKeys) {
    const Identity signer = MakeSigner(key.kind);
    for (const char* const method : key.methods) {
      Template plan;
      plan.signatureMethod = method;
      const std::string token = SignWithXmlsec(text, plan, {signer});
      std::string read;
      EXPECT_EQ(VerdictOf([&] { read = MeaningOf(*Quorlin::CreateSamlToken(token, Trust({signer}))); }),
                "accepted")
          << method << static_cast<int>(key.kind);
      EXPECT_EQ(read, meaning);
    }
  }
}

TEST(TokenInterop, AcceptsEveryCanonicalisationDigestAndReference) {
  const Identity signer = MakeSigner(KeyKind::EC_P256);
  for (const char* const canonicalization :
       {"http://www.w3.org/TR/2001/REC-xml-c14n-20010315",
        "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#WithComments", kExclusiveC14n,
        "http://www.w3.org/2001/10/xml-exc-c14n#WithComments"}) {
    for (const char* const digest : {kSha256, kSha384, kSha512}) {
      for (const std::string& uri : {std::string(), std::string("#") + kTokenId}) {
        Template plan;
        plan.canonicalization = canonicalization;
        plan.digestMethod = digest;
        plan.uri = uri;
        plan.signatureMethod = kEcdsaSha256;
        EXPECT_EQ(VerdictOnToken(SignWithXmlsec(RichText(), plan, {signer}), Trust({signer})), "accepted")
            << canonicalization << digest << uri;
      }
    }
  }
}

TEST(TokenInterop, AcceptsPrefixLists) {
  const Identity signer = MakeSigner(KeyKind::EC_P256);
  for (const char* const prefixes : {"xs", "xs xsi saml", "#default", "#default unused xs ds", "nowhere"}) {
    Template plan;
    plan.prefixes = prefixes;
    plan.signatureMethod = kEcdsaSha256;
    EXPECT_EQ(VerdictOnToken(SignWithXmlsec(RichText(), plan, {signer}), Trust({signer})), "accepted")
        << prefixes;
  }
}

// --- Trust ---

class TokenInteropTrust : public testing::Test {
 protected:
  static Identity MakeIntermediate(const Identity& root) {
    CertificateSpec spec;
    spec.commonName = "Interop intermediate";
    spec.keyNumber = 2;
    spec.ca = true;
    return MakeIssued(root, spec);
  }

  const Identity root = MakeCa("Interop root", 1);
  const Identity intermediate = MakeIntermediate(root);
  const Identity leaf = MakeIssued(intermediate, CertificateSpec());
  const Identity other = MakeCa("Another root", 3);
  const std::string token = SignWithXmlsec(TokenText(), Template(), {leaf, intermediate});
};

std::string Error(const std::string& reason) {
  return "Quorlin::InvalidSignatureException: Signature verification error. " + reason;
}

std::string Untrusted(const std::string& reason) {
  return Error("Certificate chain is not trusted: " + reason);
}

TEST_F(TokenInteropTrust, ComesFromLeafIntermediateOrRoot) {
  EXPECT_EQ(VerdictOnToken(token, Trust({leaf})), "accepted");
  EXPECT_EQ(VerdictOnToken(token, Trust({intermediate})), "accepted");
  EXPECT_EQ(VerdictOnToken(token, Trust({root})), "accepted");
  EXPECT_EQ(
      VerdictOnToken(SignWithXmlsec(TokenText(), Template(), {leaf, intermediate, root}), Trust({root})),
      "accepted");
}

TEST_F(TokenInteropTrust, ComesFromOneOfSeveral) {
  EXPECT_EQ(VerdictOnToken(token, Trust({other, root})), "accepted");
  TrustList withNull = Trust({other, root});
  withNull.emplace_front();
  withNull.emplace_back();
  EXPECT_EQ(VerdictOnToken(token, withNull), "accepted");
}

TEST_F(TokenInteropTrust, DoesNotComeFromNothing) {
  EXPECT_EQ(VerdictOnToken(token, TrustList()),
            Untrusted("unable to get local issuer certificate (CN=Interop intermediate)"));
  EXPECT_EQ(VerdictOnToken(token, TrustList(1)),
            Untrusted("unable to get local issuer certificate (CN=Interop intermediate)"));
  EXPECT_EQ(VerdictOnToken(token, Trust({other})),
            Untrusted("unable to get local issuer certificate (CN=Interop intermediate)"));
}

TEST_F(TokenInteropTrust, NeedsTheIntermediate) {
  EXPECT_EQ(VerdictOnToken(SignWithXmlsec(TokenText(), Template(), {leaf}), Trust({root})),
            Untrusted("unable to get local issuer certificate (CN=Test signer)"));
}

// --- The other way round ---

bool XmlsecVerifies(const std::string& token, const Identity& root) {
  const TemporaryDirectory directory;
  const ProcessResult result = RunXmlsec({"--verify", kIdOption, kIdElement, "--trusted-pem",
                                          directory.WriteFile("root.pem", root.GetCertificatePem()),
                                          directory.WriteFile("token.xml", token)});
  return result.exitCode == 0;
}

TEST(TokenInterop, AgreesOnWhatTheTestsSign) {
  const Identity root = MakeCa("Interop root", 1);
  const Identity signer = MakeIssued(root, CertificateSpec());
  for (const char* const canonicalization : {kC14n, kExclusiveC14n}) {
    for (const char* const uri : {"", "#_4f0a9c1e"}) {
      for (const std::vector<std::string>& prefixes :
           {std::vector<std::string>(), std::vector<std::string>{"#default", "xs"}}) {
        TokenSigning signing;
        signing.canonicalization = canonicalization;
        signing.references[0].canonicalization = kExclusiveC14n;
        signing.references[0].uri = uri;
        signing.references[0].inclusivePrefixes = prefixes;
        const std::string token = SignToken(RichText().Compose(), signer, signing);
        EXPECT_TRUE(XmlsecVerifies(token, root)) << canonicalization << uri;
        EXPECT_EQ(VerdictOnToken(token, Trust({root})), "accepted") << canonicalization << uri;
      }
    }
  }
}

// --- What is refused ---

const char* const kTampered =
    "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.";

struct Alteration {
  const char* from;
  std::string to;
};

TEST(TokenInterop, AgreesOnAlteredTokens) {
  const Identity root = MakeCa("Interop root", 1);
  const Identity signer = MakeIssued(root, CertificateSpec());
  TokenText text;
  text.attributes = AttributeElement(Quorlin::kAttrGroupIdentity, {"D\\users"});
  text.restrictions = ProxyRestriction("Count=\"1\"");
  const std::string token = SignToken(text.Compose(), signer);
  ASSERT_TRUE(XmlsecVerifies(token, root));
  const Alteration alterations[] = {
      {kTokenSubject, "mallory@example.com"},
      {kTokenSubject, std::string(kTokenSubject) + " "},
      {"D\\users", "D\\others"},
      {"Count=\"1\"", "Count=\"2\""},
      {"<saml:ProxyRestriction Count=\"1\"/>", ""},
      {"</saml:Subject>", "</saml:Subject>\n"},
      {"<ds:SignedInfo>", "<ds:SignedInfo Id=\"i\">"},
      {"<ds:SignedInfo>", "<ds:SignedInfo> "},
      {"<ds:DigestValue>", "<ds:DigestValue>AAAA"},
      {"<ds:SignatureValue>", "<ds:SignatureValue>AAAA"},
      {"#rsa-sha256", "#rsa-sha512"},
      {"URI=\"#_4f0a9c1e\"", "URI=\"\""},
  };
  for (const Alteration& alteration : alterations) {
    const std::string altered = ReplaceOnce(token, alteration.from, alteration.to);
    EXPECT_FALSE(XmlsecVerifies(altered, root)) << alteration.to;
    EXPECT_EQ(VerdictOnToken(altered, Trust({root})), kTampered) << alteration.to;
  }
}

using Bytes = std::vector<unsigned char>;

Bytes Part(const Bytes& bytes, std::size_t begin, std::size_t end) {
  return Bytes(bytes.begin() + static_cast<std::ptrdiff_t>(begin),
               bytes.begin() + static_cast<std::ptrdiff_t>(end));
}

Bytes Join(const Bytes& a, const Bytes& b) {
  Bytes all = a;
  all.insert(all.end(), b.begin(), b.end());
  return all;
}

/// Values of another size, without their beginning or end, and of nothing but zeros.
std::vector<Bytes> MisshapenValues(const Bytes& value) {
  const std::size_t size = value.size();
  return {Join(Bytes(1), value),
          Join(value, Bytes(1)),
          Part(value, 1, size),
          Part(value, 0, size - 1),
          Join(Part(value, size / 2, size), Part(value, 0, size / 2)),
          Bytes(size),
          Bytes(size, 0xFF)};
}

TEST(TokenInterop, AgreesOnMisshapenSignatureValues) {
  const Identity root = MakeCa("Interop root", 1);
  for (const auto& [kind, method] :
       {std::make_pair(KeyKind::RSA_2048, kRsaSha256), std::make_pair(KeyKind::EC_P256, kEcdsaSha256)}) {
    CertificateSpec spec;
    spec.keyKind = kind;
    TokenSigning signing;
    signing.signatureMethod = method;
    const std::string token = SignToken(TokenText().Compose(), MakeIssued(root, spec), signing);
    ASSERT_TRUE(XmlsecVerifies(token, root)) << method;
    const std::string base64 = CutBetween(token, "<ds:SignatureValue>", "</ds:SignatureValue>");
    for (const Bytes& value : MisshapenValues(Pelmar::StringUtil::Base64Decode(base64))) {
      const std::string altered = ReplaceOnce(token, base64, Pelmar::StringUtil::Base64Encode(value));
      EXPECT_FALSE(XmlsecVerifies(altered, root)) << method << value.size();
      EXPECT_EQ(VerdictOnToken(altered, Trust({root})), kTampered) << method << value.size();
    }
  }
}

/// A certificate that the root issued, and that must not be believed.
struct BadSigner {
  Identity signer;
  std::vector<Identity> shown;
  const char* reason;
};

std::vector<BadSigner> MakeBadSigners(const Identity& root) {
  CertificateSpec expired;
  expired.notBefore = -2 * kYear;
  expired.notAfter = -kDay;
  CertificateSpec early;
  early.notBefore = kDay;
  CertificateSpec noCa;
  noCa.commonName = "No CA";
  noCa.keyNumber = 2;
  const Identity leaf = MakeIssued(root, noCa);
  CertificateSpec foreign;
  foreign.keyNumber = 5;
  const Identity pretender = MakeCa("Interop root", 6);
  return {{MakeIssued(root, expired), {}, "certificate has expired (CN=Test signer)"},
          {MakeIssued(root, early), {}, "certificate is not yet valid (CN=Test signer)"},
          {MakeIssued(leaf, CertificateSpec()), {leaf}, "invalid CA certificate (CN=No CA)"},
          {MakeSelfSigned(foreign), {}, "self-signed certificate (CN=Test signer)"},
          {MakeIssued(pretender, CertificateSpec()), {}, "certificate signature failure (CN=Test signer)"}};
}

TEST(TokenInterop, AgreesOnCertificatesThatProveNothing) {
  const Identity root = MakeCa("Interop root", 1);
  for (const BadSigner& bad : MakeBadSigners(root)) {
    TokenSigning signing;
    signing.alsoShown = bad.shown;
    const std::string token = SignToken(TokenText().Compose(), bad.signer, signing);
    EXPECT_FALSE(XmlsecVerifies(token, root)) << bad.reason;
    EXPECT_EQ(VerdictOnToken(token, Trust({root})), Untrusted(bad.reason));
  }
}

TEST(TokenInterop, AgreesOnTokensWithoutACertificate) {
  const Identity root = MakeCa("Interop root", 1);
  const Identity signer = MakeIssued(root, CertificateSpec());
  const std::string none = Error("The signature's KeyInfo holds no certificate");
  const std::pair<const char*, std::string> keyInfos[] = {
      {"", Error("The signature has no KeyInfo")},
      {"<ds:KeyInfo/>", none},
      {"<ds:KeyInfo><ds:KeyName>k</ds:KeyName></ds:KeyInfo>", none}};
  for (const auto& [keyInfo, verdict] : keyInfos) {
    TokenSigning signing;
    signing.keyInfo = keyInfo;
    const std::string token = SignToken(TokenText().Compose(), signer, signing);
    EXPECT_FALSE(XmlsecVerifies(token, root)) << keyInfo;
    EXPECT_EQ(VerdictOnToken(token, Trust({root})), verdict) << keyInfo;
  }
}

// --- The token vectors ---

/// The names of the vectors of a folder that begin like this.
std::vector<std::string> ListVectors(const std::string& folder, const std::string& start) {
  std::vector<std::string> names;
  for (const auto& entry :
       std::filesystem::directory_iterator(QUORLIN_TEST_VECTORS_DIR "/tokens/" + folder)) {
    const std::string name = entry.path().filename().string();
    if (entry.path().extension() == ".xml" && name.compare(0, start.size(), start) == 0) {
      names.push_back(name);
    }
  }
  std::sort(names.begin(), names.end());
  return names;
}

bool XmlsecVerifiesVector(const std::string& path) {
  const std::string folder = QUORLIN_TEST_VECTORS_DIR "/tokens/";
  return RunXmlsec({"--verify", kIdOption, kIdElement, "--trusted-pem", folder + "signer.pem", folder + path})
             .exitCode == 0;
}

TEST(TokenInterop, AgreesOnTheAcceptedVectors) {
  const std::vector<std::string> names = ListVectors("accept", "");
  EXPECT_GT(names.size(), 20U);
  for (const std::string& name : names) {
    EXPECT_TRUE(XmlsecVerifiesVector("accept/" + name)) << name;
  }
}

TEST(TokenInterop, AgreesOnTheAlteredVectors) {
  const std::vector<std::string> names = ListVectors("reject", "altered-");
  EXPECT_GE(names.size(), 5U);
  for (const std::string& name : names) {
    EXPECT_FALSE(XmlsecVerifiesVector("reject/" + name)) << name;
  }
}

}  // namespace
