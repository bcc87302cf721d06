// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A second opinion on tokens: what the development token service issues the xmlsec1 program verifies, and
// what xmlsec1 signs the library accepts as a token.

#include "support/Pki.h"
#include "support/Process.h"
#include "support/TemporaryDirectory.h"
#include "support/TokenFactory.h"

#include "devsts/Clock.h"
#include "devsts/TokenIssuer.h"

#include <quorlin/SamlToken.h>

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <system_error>
#include <vector>

namespace {

using namespace TestSupport;

constexpr const char* kAssertion = "urn:oasis:names:tc:SAML:2.0:assertion:Assertion";

ProcessResult RunXmlsec(const std::vector<std::string>& arguments) {
  std::vector<std::string> command = {"xmlsec1"};
  command.insert(command.end(), arguments.begin(), arguments.end());
  try {
    return RunProcess(command);
  } catch (const std::system_error& error) {
    throw std::runtime_error(std::string(error.what()) + " (it comes with the Debian package xmlsec1)");
  }
}

/// A token service's keys, and a token that uses everything a token can hold.
class IssuedToken final {
 public:
  IssuedToken()
      : signer(authority.IssueSigner()),
        xml(DevSts::TokenIssuer(signer, "urn:interop").Issue(MakeContent())) {}

  static DevSts::AssertionContent MakeContent() {
    DevSts::AssertionContent content;
    content.upn = "alice@example.com";
    content.givenName = "Al\xC3\xADs & <co>";
    content.groups = {{"Staff", "example.com", DevSts::GroupForm::SLASH}};
    content.issued = DevSts::MakeSystemClock(0)();
    content.notBefore = content.issued;
    content.notOnOrAfter = content.issued + 600 * DevSts::kMicrosecondsPerSecond;
    content.authenticated = content.issued;
    content.authnContext = DevSts::kPasswordContext;
    content.renewCount = 3;
    content.proxyCount = 2;
    content.audience = {"urn:audience"};
    content.advice = {{"urn:source", {{"name", {"line\r\nbreak", "tab\there"}}}}};
    content.delegates = {{"bob@example.com", content.issued}};
    content.confirmationCertificate = TokenSigner().certificate;
    return content;
  }

  DevSts::CertificateAuthority authority;
  DevSts::Identity signer;
  std::string xml;
};

/// Whether xmlsec1 finds that `xml` is signed under `authorityPem`.
bool VerifiesWithXmlsec(const std::string& xml, const std::string& authorityPem) {
  const TemporaryDirectory files;
  return RunXmlsec({"--verify", "--enabled-key-data", "x509", "--trusted-pem",
                    files.WriteFile("ca.pem", authorityPem), "--id-attr:ID", kAssertion,
                    files.WriteFile("token.xml", xml)})
             .exitCode == 0;
}

TEST(DevStsInterop, XmlsecVerifiesAnIssuedToken) {
  const IssuedToken token;
  EXPECT_TRUE(VerifiesWithXmlsec(token.xml, token.authority.GetCertificate()));
}

TEST(DevStsInterop, XmlsecVerifiesAnIssuedTokenInsideALargerDocument) {
  const IssuedToken token;
  const std::string document =
      "<a:x xmlns:a=\"urn:a\" xmlns:saml=\"urn:b\" xmlns=\"urn:c\">\n" + token.xml + "\n</a:x>";
  EXPECT_TRUE(VerifiesWithXmlsec(document, token.authority.GetCertificate()));
}

TEST(DevStsInterop, XmlsecAndTheLibraryRefuseAChangedToken) {
  const IssuedToken token;
  const std::string changed = ReplaceOnce(token.xml, "Staff/example.com", "Admin/example.com");
  EXPECT_FALSE(VerifiesWithXmlsec(changed, token.authority.GetCertificate()));
  EXPECT_THROW(Quorlin::CreateSamlToken(
                   changed, Pelmar::Crypto::CreateCertificateFromPem(token.signer.certificate).Get()),
               Quorlin::InvalidSignatureException);
}

TEST(DevStsInterop, XmlsecRefusesATokenOfAnotherAuthority) {
  const IssuedToken token;
  EXPECT_FALSE(VerifiesWithXmlsec(token.xml, DevSts::CertificateAuthority().GetCertificate()));
}

TEST(DevStsInterop, TheLibraryReadsBackAllOfAnIssuedToken) {
  const IssuedToken token;
  const auto read = Quorlin::CreateSamlToken(
      token.xml, Pelmar::Crypto::CreateCertificateFromPem(token.signer.certificate).Get());
  EXPECT_EQ(read->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_HOLDER_OF_KEY);
  ASSERT_NE(read->GetConfirmationCertificate(), nullptr);
  EXPECT_EQ(read->GetConfirmationCertificate()->GetSha256(), TokenSigner().certificate->GetSha256());
  std::pair<std::string, std::string> fullName;
  read->GetFullName(fullName);
  EXPECT_EQ(fullName.first, "Al\xC3\xADs & <co>");
  std::vector<Quorlin::Advice> advice;
  read->GetAdvice(advice);
  ASSERT_EQ(advice.size(), 1U);
  ASSERT_EQ(advice[0].attributes.size(), 1U);
  EXPECT_EQ(advice[0].attributes[0].values, (std::vector<std::string>{"line\r\nbreak", "tab\there"}));
  EXPECT_TRUE(read->IsRenewable());
  EXPECT_TRUE(read->IsDelegable());
}

/// An empty signature for xmlsec1 to fill in.
std::string SignatureTemplate(const std::string& canonicalization) {
  return "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"><ds:SignedInfo>"
         "<ds:CanonicalizationMethod Algorithm=\"" +
         canonicalization +
         "\"/><ds:SignatureMethod Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/>"
         "<ds:Reference URI=\"#" +
         std::string(kTokenId) +
         "\"><ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/2000/09/xmldsig#enveloped-signature\"/>"
         "<ds:Transform Algorithm=\"" +
         canonicalization +
         "\"/></ds:Transforms><ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
         "<ds:DigestValue/></ds:Reference></ds:SignedInfo><ds:SignatureValue/><ds:KeyInfo><ds:X509Data/></ds:KeyInfo>"
         "</ds:Signature>";
}

/// A token whose signature xmlsec1 made.
std::string SignWithXmlsec(const TokenText& text, const Identity& signer,
                           const std::string& canonicalization) {
  const TemporaryDirectory files;
  const std::string xml = ReplaceOnce(text.Compose(), kSignatureMarker, SignatureTemplate(canonicalization));
  const std::string keys = files.WriteFile("key.pem", signer.GetKeyPem()) + "," +
                           files.WriteFile("cert.pem", signer.GetCertificatePem());
  const ProcessResult result =
      RunXmlsec({"--sign", "--privkey-pem", keys, "--id-attr:ID", kAssertion, "--output",
                 files.GetPath("signed.xml"), files.WriteFile("template.xml", xml)});
  if (result.exitCode != 0) {
    throw std::runtime_error("xmlsec1 could not sign: " + result.standardError);
  }
  return files.ReadFile("signed.xml");
}

class XmlsecToken : public testing::TestWithParam<const char*> {};

TEST_P(XmlsecToken, IsAcceptedByTheLibrary) {
  TokenText text;
  text.restrictions = ProxyRestriction("Count=\"2\"") + RenewRestriction("Count=\"1\"");
  text.attributes = AttributeElement("note", {"\xC3\xA4 &amp; b"});
  const std::string xml = SignWithXmlsec(text, TokenSigner(), GetParam());
  const auto token = Quorlin::CreateSamlToken(xml, TokenSigner().certificate.Get());
  EXPECT_EQ(token->GetId(), kTokenId);
  EXPECT_EQ(token->ToXml(), xml);
  EXPECT_TRUE(token->IsRenewable());
}

TEST_P(XmlsecToken, IsRefusedByTheLibraryOnceChanged) {
  const std::string xml = SignWithXmlsec(TokenText(), TokenSigner(), GetParam());
  EXPECT_THROW(Quorlin::CreateSamlToken(ReplaceOnce(xml, kTokenSubject, "mallory@example.com"),
                                        TokenSigner().certificate.Get()),
               Quorlin::InvalidSignatureException);
}

INSTANTIATE_TEST_SUITE_P(Canonicalizations, XmlsecToken,
                         testing::Values("http://www.w3.org/2001/10/xml-exc-c14n#",
                                         "http://www.w3.org/TR/2001/REC-xml-c14n-20010315"),
                         [](const auto& test) { return test.index == 0 ? "Exclusive" : "Inclusive"; });

}  // namespace
