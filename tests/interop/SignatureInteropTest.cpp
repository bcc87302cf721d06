// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A second opinion on signatures: what the xmlsec1 program signs we verify, what we sign it verifies, and
// what was altered both refuse.

#include "support/Pki.h"
#include "support/Process.h"
#include "support/SignatureDocuments.h"
#include "support/TemporaryDirectory.h"

#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>
#include <pelmar/xml/security/Signature.h>

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <system_error>
#include <vector>

namespace {

using namespace Pelmar::Xml;
using namespace Pelmar::Xml::Security;
using namespace TestSupport;
using Pelmar::Ref;

constexpr const char* kUtilityNamespace =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";

ProcessResult RunXmlsec(const std::vector<std::string>& arguments) {
  std::vector<std::string> command = {"xmlsec1"};
  command.insert(command.end(), arguments.begin(), arguments.end());
  try {
    return RunProcess(command);
  } catch (const std::system_error& error) {
    throw std::runtime_error(std::string(error.what()) + " (it comes with the Debian package xmlsec1)");
  }
}

/// root -> intermediate -> leaf with a key of the given kind.
struct Chain {
  explicit Chain(KeyKind kind)
      : root(MakeCa("Interop root", 1)),
        intermediate(Issue(root, true)),
        leaf(Issue(intermediate, false, kind)) {}

  static Identity Issue(const Identity& issuer, bool ca, KeyKind kind = KeyKind::RSA_2048) {
    CertificateSpec spec;
    spec.commonName = ca ? "Interop intermediate" : "Interop signer";
    spec.keyKind = kind;
    spec.keyNumber = ca ? 2 : 0;
    spec.ca = ca;
    return MakeIssued(issuer, spec);
  }

  Identity root;
  Identity intermediate;
  Identity leaf;
};

struct KeyCase {
  KeyKind kind;
  const char* name;
  bool rsa;
};

const KeyCase kKeys[] = {{KeyKind::RSA_2048, "RSA 2048", true},
                         {KeyKind::RSA_3072, "RSA 3072", true},
                         {KeyKind::RSA_4096, "RSA 4096", true},
                         {KeyKind::EC_P256, "P-256", false},
                         {KeyKind::EC_P384, "P-384", false}};

struct HashCase {
  const char* digest;
  const char* rsa;
  const char* ecdsa;
};

const HashCase kHashes[] = {{kSha256, kRsaSha256, kEcdsaSha256},
                            {kSha384, kRsaSha384, kEcdsaSha384},
                            {kSha512, kRsaSha512, kEcdsaSha512}};

/// Content with much that canonicalisation has to treat: unused, shadowed and undeclared namespaces,
/// attribute order, references.
std::string MakeAssertion(const std::string& signature) {
  return "<saml:Assertion xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\" xmlns=\"urn:default\" "
         "xmlns:xs=\"http://www.w3.org/2001/XMLSchema\" "
         "xmlns:unused=\"urn:unused\" Version=\"2.0\" ID=\"_1\" xml:lang=\"en\" b=\"2\" a=\"1\">\n"
         "  <saml:Issuer  Format='x' >an issuer &amp; more</saml:Issuer>" +
         signature +
         "<saml:Value xmlns:saml='urn:oasis:names:tc:SAML:2.0:assertion' xmlns:xsi="
         "\"http://www.w3.org/2001/XMLSchema-instance\" "
         "xsi:type=\"xs:string\"><!-- a comment -->text &lt; &#13; \xC3\xA4 <![CDATA[<raw>]]></saml:Value>"
         "<plain xmlns=\"\" z=\"&#9;&quot;\" y='\"'/><?target data?><deep><deeper xmlns=\"urn:other\"><d "
         "xmlns=\"urn:default\"/></deeper></deep>\n"
         "</saml:Assertion>";
}

std::string MakeTransform(const std::string& algorithm, const std::string& prefixes) {
  if (prefixes.empty()) {
    return "<ds:Transform Algorithm=\"" + algorithm + "\"/>";
  }
  return "<ds:Transform Algorithm=\"" + algorithm +
         "\"><ec:InclusiveNamespaces xmlns:ec=\"http://www.w3.org/2001/10/xml-exc-c14n#\" PrefixList=\"" +
         prefixes + "\"/></ds:Transform>";
}

struct TemplatePlan {
  std::string canonicalization;
  std::string prefixes;
  std::string uri;
  std::string signatureMethod;
  std::string digestMethod;
};

std::string MakeTemplate(const TemplatePlan& plan) {
  return "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\">\n<ds:SignedInfo>\n"
         "<ds:CanonicalizationMethod Algorithm=\"" +
         plan.canonicalization + "\"/>\n<ds:SignatureMethod Algorithm=\"" + plan.signatureMethod +
         "\"/>\n<ds:Reference URI=\"" + plan.uri +
         "\"><ds:Transforms><ds:Transform Algorithm="
         "\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\"/>" +
         MakeTransform(plan.canonicalization, plan.prefixes) +
         "</ds:Transforms><ds:DigestMethod Algorithm=\"" + plan.digestMethod +
         "\"/><ds:DigestValue/></ds:Reference></ds:SignedInfo><ds:SignatureValue/><ds:KeyInfo>"
         "<ds:X509Data/></ds:KeyInfo></ds:Signature>";
}

const char* const kAssertionId[] = {"--id-attr:ID", "urn:oasis:names:tc:SAML:2.0:assertion:Assertion"};

std::string SignWithXmlsec(const TemporaryDirectory& directory, const TemplatePlan& plan,
                           const std::vector<Identity>& identities) {
  std::string files = directory.WriteFile("key.pem", identities.front().GetKeyPem());
  for (std::size_t i = 0; i < identities.size(); ++i) {
    files += "," + directory.WriteFile("certificate" + std::to_string(i) + ".pem",
                                       identities[i].GetCertificatePem());
  }
  const std::string file = directory.WriteFile("template.xml", MakeAssertion(MakeTemplate(plan)));
  const ProcessResult result =
      RunXmlsec({"--sign", kAssertionId[0], kAssertionId[1], "--privkey-pem", files, file});
  if (result.exitCode != 0) {
    throw std::runtime_error("xmlsec1 does not sign: " + result.standardError);
  }
  return result.standardOutput;
}

/// Whether xmlsec1 accepts `text` with this root.
bool XmlsecAccepts(const TemporaryDirectory& directory, const std::string& text, const Identity& root) {
  const std::string ca = directory.WriteFile("root.pem", root.GetCertificatePem());
  const std::string file = directory.WriteFile("signed.xml", text);
  return RunXmlsec({"--verify", kAssertionId[0], kAssertionId[1], "--trusted-pem", ca, file}).exitCode == 0;
}

std::string Replace(const std::string& text, const std::string& from, const std::string& to) {
  const std::size_t position = text.find(from);
  if (position == std::string::npos) {
    throw std::logic_error("the text to replace is not there: " + from);
  }
  return text.substr(0, position) + to + text.substr(position + from.size());
}

TEST(SignatureInterop, VerifiesWhatXmlsecSigned) {
  const TemporaryDirectory directory;
  const std::pair<const char*, const char*> canonicalizations[] = {
      {"http://www.w3.org/TR/2001/REC-xml-c14n-20010315", ""},
      {kExclusiveC14n, ""},
      {kExclusiveC14n, "xs #default"}};
  for (const KeyCase& key : kKeys) {
    const Chain chain(key.kind);
    for (const HashCase& hash : kHashes) {
      for (const auto& [canonicalization, prefixes] : canonicalizations) {
        for (const char* const uri : {"", "#_1"}) {
          const TemplatePlan plan = {canonicalization, prefixes, uri, key.rsa ? hash.rsa : hash.ecdsa,
                                     hash.digest};
          const std::string where = std::string(key.name) + " " + hash.digest + " " + canonicalization +
                                    " '" + prefixes + "' '" + uri + "'";
          const std::string shown = SignWithXmlsec(directory, plan, {chain.leaf, chain.intermediate});
          EXPECT_EQ(VerifyDocument(shown, Trust({chain.root})), "verified") << where;
          EXPECT_EQ(VerifyDocument(shown, Trust({chain.leaf})), "verified") << where;
          EXPECT_EQ(VerifyDocument(Replace(shown, "an issuer", "An issuer"), Trust({chain.root})), "refused")
              << where;
          const std::string alone = SignWithXmlsec(directory, plan, {chain.leaf});
          EXPECT_EQ(VerifyDocument(alone, Trust({chain.intermediate})), "verified") << where;
          EXPECT_EQ(VerifyDocument(alone, Trust({chain.root})),
                    "XmlSecurityException: Certificate chain is not trusted: unable to get local issuer "
                    "certificate (CN=Interop signer)")
              << where;
        }
      }
    }
  }
}

TEST(SignatureInterop, XmlsecVerifiesWhatWeSigned) {
  const TemporaryDirectory directory;
  const std::vector<std::vector<std::string>> transformLists = {
      {kEnvelopedSignature}, {kEnvelopedSignature, kC14n}, {kEnvelopedSignature, kExclusiveC14n}};
  for (const KeyCase& key : kKeys) {
    const Chain chain(key.kind);
    for (const HashCase& hash : kHashes) {
      for (const std::vector<std::string>& transforms : transformLists) {
        for (const char* const uri : {"", "#_1"}) {
          SigningPlan plan;
          plan.uri = uri;
          plan.transforms = transforms;
          plan.digestMethod = hash.digest;
          plan.signatureMethod = key.rsa ? hash.rsa : hash.ecdsa;
          plan.alsoShown = {chain.intermediate};
          const std::string text = SignDocument(MakeAssertion(""), chain.leaf, plan);
          EXPECT_TRUE(XmlsecAccepts(directory, text, chain.root))
              << key.name << " " << hash.digest << " " << transforms.back() << " '" << uri << "'";
        }
      }
    }
  }
}

TEST(SignatureInterop, BothRefuseWhatWasAltered) {
  const TemporaryDirectory directory;
  const Chain chain(KeyKind::RSA_2048);
  SigningPlan plan;
  plan.alsoShown = {chain.intermediate};
  const std::string good = SignDocument(MakeAssertion(""), chain.leaf, plan);
  ASSERT_TRUE(XmlsecAccepts(directory, good, chain.root));
  ASSERT_EQ(VerifyDocument(good, Trust({chain.root})), "verified");
  const std::pair<const char*, const char*> alterations[] = {
      {"an issuer", "another issuer"},
      {"Version=\"2.0\"", "Version=\"2.1\""},
      {"<?target data?>", ""},
      {"&#xD;", ""},
      {"xmlns=\"urn:other\"", "xmlns=\"urn:more\""},
      {"<plain ", "<plain x=\"\" "},
      {"<ds:DigestValue>", "<ds:DigestValue>AAAA"},
      {"<ds:SignatureValue>", "<ds:SignatureValue>AAAA"},
      {"<ds:Reference URI", "<ds:Reference Id=\"i\" URI"}};
  for (const auto& [from, to] : alterations) {
    const std::string altered = Replace(good, from, to);
    EXPECT_FALSE(XmlsecAccepts(directory, altered, chain.root)) << from;
    EXPECT_EQ(VerifyDocument(altered, Trust({chain.root})), "refused") << from;
  }
}

TEST(SignatureInterop, BothRefuseAnotherRoot) {
  const TemporaryDirectory directory;
  const Chain chain(KeyKind::EC_P256);
  const Identity other = MakeCa("Other root", 5);
  SigningPlan plan;
  plan.signatureMethod = kEcdsaSha256;
  plan.alsoShown = {chain.intermediate};
  const std::string text = SignDocument(MakeAssertion(""), chain.leaf, plan);
  EXPECT_FALSE(XmlsecAccepts(directory, text, other));
  EXPECT_EQ(VerifyDocument(text, Trust({other})),
            "XmlSecurityException: Certificate chain is not trusted: unable to get local issuer certificate "
            "(CN=Interop intermediate)");
}

/// An envelope signed as requests are: two elements named by their wsu:Id, the signature in the header.
std::string SignMessage(const Identity& signer) {
  const Ref<Document> document = ParseDocument(
      "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\"><soapenv:Header>"
      "<wsu:Timestamp xmlns:wsu=\"" +
      std::string(kUtilityNamespace) +
      "\" wsu:Id=\"Timestamp1\"><wsu:Created>2012-01-01T00:00:00Z</wsu:Created></wsu:Timestamp>"
      "</soapenv:Header><soapenv:Body xmlns:wst=\"urn:unused\" xmlns:wsu=\"" +
      kUtilityNamespace + "\" wsu:Id=\"Body1\"><a>content</a></soapenv:Body></soapenv:Envelope>");
  ElementNode* const envelope = document->GetDocumentElement();
  Ref<Signature> signature;
  CreateBlankSignature(envelope, kExclusiveC14n, kRsaSha256, "ds", signature);
  signature->AddReference("#Body1", kSha256)->AddTransform(kExclusiveC14n);
  signature->AddReference("#Timestamp1", kSha256)->AddTransform(kExclusiveC14n);
  Ref<ElementNode> keyInfo;
  CreateElementNode("wsse", "SecurityTokenReference", keyInfo);
  keyInfo->DefineAttribute("xmlns:wsse", "urn:wsse");
  signature->SetKeyInfo(keyInfo);
  signature->Sign(signer.GetKey().Get());
  signature->GetElement()->DefineAttribute("Id", "theSignature");
  envelope->FindChildElement("Header")->AppendChild(signature->GetElement());
  return WriteDocument(*document);
}

TEST(SignatureInterop, XmlsecVerifiesSignedMessages) {
  const TemporaryDirectory directory;
  const Identity signer = MakeSelfSigned(CertificateSpec());
  const std::string certificate = directory.WriteFile("certificate.pem", signer.GetCertificatePem());
  const auto accepts = [&](const std::string& text) {
    const std::string file = directory.WriteFile("message.xml", text);
    return RunXmlsec({"--verify", "--id-attr:Id", "http://schemas.xmlsoap.org/soap/envelope/:Body",
                      "--id-attr:Id", std::string(kUtilityNamespace) + ":Timestamp", "--pubkey-cert-pem",
                      certificate, file})
               .exitCode == 0;
  };
  const std::string text = SignMessage(signer);
  EXPECT_TRUE(accepts(text));
  EXPECT_FALSE(accepts(Replace(text, "content", "Content")));
  EXPECT_FALSE(accepts(Replace(text, "2012-01-01", "2013-01-01")));
}

}  // namespace
