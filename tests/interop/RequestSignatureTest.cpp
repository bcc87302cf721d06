// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What we sign, judged by xmlsec1; the texts in requests, read by xmllint; and tokens within requests, judged
// by xmlsec1 and by ourselves.

#include <pelmar/Exception.h>
#include <pelmar/crypto/Certificate.h>
#include <quorlin/SamlToken.h>

#include <gtest/gtest.h>

#include <cstddef>
#include <functional>
#include <list>
#include <string>
#include <utility>
#include <vector>

#include "quorlin/RequestBuilderImpl.h"
#include "support/FakeSamlToken.h"
#include "support/GoldenText.h"
#include "support/Pki.h"
#include "support/Process.h"
#include "support/TemporaryDirectory.h"

namespace Quorlin {
namespace {

using TestSupport::CutBetween;
using TestSupport::FakeSamlToken;
using TestSupport::ProcessResult;
using TestSupport::ReadVector;
using TestSupport::ReplaceAll;
using TestSupport::RunProcess;

const TestSupport::Identity& Signer() {
  static const TestSupport::Identity identity = TestSupport::MakeSelfSigned(TestSupport::CertificateSpec());
  return identity;
}

RequestBuilderImpl Builder() {
  HolderOfKeyConfig config;
  config.privateKey = Signer().GetKey();
  config.certificate = Signer().certificate;
  return RequestBuilderImpl(config);
}

// --- The judge ---

ProcessResult RunXmlsec(const std::vector<std::string>& options, const std::string& xml) {
  const TestSupport::TemporaryDirectory directory;
  std::vector<std::string> arguments = {"xmlsec1", "--verify"};
  arguments.insert(arguments.end(), options.begin(), options.end());
  arguments.push_back(directory.WriteFile("message.xml", xml));
  return RunProcess(arguments);
}

// The verdict on the message's own signature. The IDs are declared, because there is no DTD to do so; the key
// is handed over, because xmlsec1 does not know WS-Security's key references.
bool XmlsecAcceptsRequest(const std::string& request, const std::string& certificatePem) {
  const TestSupport::TemporaryDirectory directory;
  const ProcessResult result = RunXmlsec(
      {"--pubkey-cert-pem", directory.WriteFile("certificate.pem", certificatePem), "--id-attr:Id",
       "http://schemas.xmlsoap.org/soap/envelope/:Body", "--id-attr:Id",
       "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd:Timestamp",
       "--node-xpath",
       "/*[local-name()='Envelope']/*[local-name()='Header']/*[local-name()='Security']/*[local-name()='Signature']"},
      request);
  return result.exitCode == 0;
}

bool XmlsecAcceptsRequest(const std::string& request) {
  return XmlsecAcceptsRequest(request, Signer().GetCertificatePem());
}

// --- Signed requests ---

TokenSpec PlainSpec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  return spec;
}

// With texts that canonicalisation has to work on.
TokenSpec FullSpec() {
  TokenSpec spec = PlainSpec();
  spec.audienceRestriction = {"https://b.example/?a=1&b=2", " <a> \"b\" 'c'\t\r\n"};
  spec.advice = {Advice{"\t\r\n<&>\"'", {{" n ", {"\r\n", "", "\xF0\x9F\x94\x91"}}}}};
  spec.renewable = true;
  spec.delegable = true;
  return spec;
}

TokenSpec DelegatedSpec() {
  TokenSpec spec = FullSpec();
  spec.delegateTo = std::string("bob <bob@example.com>");
  return spec;
}

TokenSpec BearerSpec() {
  TokenSpec spec = FullSpec();
  spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
  return spec;
}

struct SignedCase {
  const char* description;
  std::function<void(const RequestBuilderImpl&, Request&)> build;
};

const std::vector<unsigned char> kLeg = {0x60, 0x01, 0xFF};

std::vector<SignedCase> SignedCases() {
  std::vector<SignedCase> cases;
  const std::pair<const char*, TokenSpec> specs[] = {
      {"plain", PlainSpec()}, {"full", FullSpec()}, {"delegated", DelegatedSpec()}, {"bearer", BearerSpec()}};
  for (const auto& named : specs) {
    const TokenSpec spec = named.second;
    const bool isSignedByChoice = !spec.delegateTo && spec.confirmation == TokenSpec::CONFIRMATION_DEFAULT;
    if (isSignedByChoice) {
      cases.push_back({"password", [spec](const RequestBuilderImpl& builder, Request& request) {
                         builder.BuildUserPassTokenRequest(" <alice> ", "\t&\r\n", spec, request);
                       }});
      cases.push_back({"SPNEGO", [spec](const RequestBuilderImpl& builder, Request& request) {
                         builder.BuildInitialSPNegoRequest(spec, kLeg, request);
                       }});
    }
    if (spec.confirmation == TokenSpec::CONFIRMATION_DEFAULT) {
      cases.push_back({"certificate", [spec](const RequestBuilderImpl& builder, Request& request) {
                         builder.BuildCertificateTokenRequest(spec, request);
                       }});
    }
    cases.push_back({"exchange", [spec](const RequestBuilderImpl& builder, Request& request) {
                       builder.BuildExchangeTokenRequest(FakeSamlToken(), spec, request);
                     }});
  }
  cases.push_back({"renew", [](const RequestBuilderImpl& builder, Request& request) {
                     builder.BuildRenewRequest(FakeSamlToken(), 3600, request);
                   }});
  return cases;
}

std::string Build(const SignedCase& c) {
  Request request;
  c.build(Builder(), request);
  return request.body;
}

TEST(RequestSignature, IsAcceptedByXmlsecInEverySignedVariant) {
  const std::vector<SignedCase> cases = SignedCases();
  ASSERT_EQ(cases.size(), 12u);
  for (const SignedCase& c : cases) {
    const std::string request = Build(c);
    EXPECT_TRUE(XmlsecAcceptsRequest(request)) << c.description << "\n" << request;
  }
}

TEST(RequestSignature, IsRefusedWithAnotherKey) {
  TestSupport::CertificateSpec spec;
  spec.keyNumber = 2;
  const std::string other = TestSupport::MakeSelfSigned(spec).GetCertificatePem();
  for (const SignedCase& c : SignedCases()) {
    EXPECT_FALSE(XmlsecAcceptsRequest(Build(c), other)) << c.description;
  }
}

// Finds the letters and digits of texts and attribute values, outside of references and namespace
// declarations (one that an element does not use is no part of what exclusive canonicalisation signs).
class ValueScanner final {
 public:
  /// Their positions in `xml` from `begin` to `end`, which must both lie outside of tags.
  static std::vector<std::size_t> Scan(const std::string& xml, std::size_t begin, std::size_t end) {
    ValueScanner scanner;
    for (std::size_t i = begin; i < end; ++i) {
      scanner.Take(xml[i], i);
    }
    return scanner._positions;
  }

 private:
  void Take(char c, std::size_t position) {
    if (_inTag) {
      TakeInTag(c, position);
    } else if (c == '<') {
      _inTag = true;
      _name.clear();
    } else {
      TakeValue(c, position);
    }
  }

  void TakeInTag(char c, std::size_t position) {
    if (c == '"') {
      _inValue = !_inValue;
      _isDeclaration = _name.compare(0, 5, "xmlns") == 0;
    } else if (_inValue) {
      if (!_isDeclaration) {
        TakeValue(c, position);
      }
    } else if (c == '>') {
      _inTag = false;
    } else {
      _name = c == ' ' ? std::string() : _name + c;
    }
  }

  void TakeValue(char c, std::size_t position) {
    const bool isLetterOrDigit = (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
    if (c == '&' || c == ';') {
      _inReference = c == '&';
    } else if (isLetterOrDigit && !_inReference) {
      _positions.push_back(position);
    }
  }

  bool _inTag = false;
  bool _inValue = false;
  bool _inReference = false;
  bool _isDeclaration = false;
  std::string _name;
  std::vector<std::size_t> _positions;
};

// So many bytes of each part are changed, one after the other.
constexpr std::size_t kChangesPerPart = 5;

void ExpectEveryChangeRefused(const std::string& request, const std::string& open, const std::string& close) {
  const std::size_t begin = request.rfind(open);
  const std::size_t end = request.find(close, begin);
  ASSERT_NE(end, std::string::npos) << close;
  const std::vector<std::size_t> positions = ValueScanner::Scan(request, begin, end);
  ASSERT_GE(positions.size(), kChangesPerPart);
  for (std::size_t i = 0; i < kChangesPerPart; ++i) {
    const std::size_t position = positions[i * (positions.size() - 1) / (kChangesPerPart - 1)];
    std::string changed = request;
    changed[position] = changed[position] == '1' ? '2' : '1';
    EXPECT_FALSE(XmlsecAcceptsRequest(changed)) << "changed at " << position << "\n" << changed;
  }
}

TEST(RequestSignature, IsRefusedWhenAByteOfTheBodyChanged) {
  for (const SignedCase& c : SignedCases()) {
    SCOPED_TRACE(c.description);
    ExpectEveryChangeRefused(Build(c), "<soapenv:Body", "</soapenv:Body>");
  }
}

TEST(RequestSignature, IsRefusedWhenAByteOfTheTimestampChanged) {
  for (const SignedCase& c : SignedCases()) {
    SCOPED_TRACE(c.description);
    ExpectEveryChangeRefused(Build(c), "<wsu:Timestamp", "</wsu:Timestamp>");
  }
}

TEST(RequestSignature, IsRefusedWhenAByteOfSignedInfoChanged) {
  for (const SignedCase& c : SignedCases()) {
    SCOPED_TRACE(c.description);
    ExpectEveryChangeRefused(Build(c), "<ds:SignedInfo>", "</ds:SignedInfo>");
  }
}

TEST(RequestSignature, IsRefusedWhenTheSignatureValueChanged) {
  for (const SignedCase& c : SignedCases()) {
    const std::string request = Build(c);
    const std::string value = CutBetween(request, "<ds:SignatureValue>", "</ds:SignatureValue>");
    const std::string changed = (value[0] == 'A' ? "B" : "A") + value.substr(1);
    EXPECT_FALSE(XmlsecAcceptsRequest(ReplaceAll(request, value, changed))) << c.description;
  }
}

// --- Texts of callers ---

// The string value of the first node that the XPath expression finds, by an independent parser.
std::string Evaluate(const std::string& xml, const std::string& expression) {
  const TestSupport::TemporaryDirectory directory;
  const ProcessResult result = RunProcess(
      {"xmllint", "--xpath", "string(" + expression + ")", directory.WriteFile("message.xml", xml)});
  EXPECT_EQ(result.exitCode, 0) << result.standardError;
  // xmllint ends its answer with a line feed of its own.
  EXPECT_EQ(result.standardOutput.substr(result.standardOutput.size() - 1), "\n");
  return result.standardOutput.substr(0, result.standardOutput.size() - 1);
}

TEST(CallersTexts, ReachTheOtherSideUnchanged) {
  const std::string texts[] = {
      "plain",
      " leading and trailing ",
      "<>&\"'",
      "]]>",
      "<![CDATA[x]]>",
      "<!-- x -->",
      "&amp;&#65;",
      "\t",
      "\n",
      "\r",
      "\r\n",
      "a\tb\rc\nd",
      "\xC3\xA9",
      "\xE2\x82\xAC",
      "\xF0\x9F\x94\x91",
      "\x7F\xC2\x80\xC2\x85",
      "\xE2\x80\xA8",
  };
  for (const std::string& text : texts) {
    TokenSpec spec = PlainSpec();
    spec.delegateTo = text;
    spec.audienceRestriction = {text};
    spec.advice = {Advice{text, {{text, {text}}}}};
    Request request;
    Builder().BuildUserPassTokenRequest(text, text, spec, request);
    const char* const places[] = {
        "//*[local-name()='Security']/*[local-name()='UsernameToken']/*[local-name()='Username']",
        "//*[local-name()='Password']",
        "//*[local-name()='DelegateTo']//*[local-name()='Username']",
        "//*[local-name()='Address']",
        "//*[local-name()='Advice']/@AdviceSource",
        "//*[local-name()='Attribute']/@Name",
        "//*[local-name()='AttributeValue']",
    };
    for (const char* const place : places) {
      EXPECT_EQ(Evaluate(request.body, place), text) << place;
    }
    Builder().BuildContinuedSPNegoRequest(text, kLeg, request);
    EXPECT_EQ(Evaluate(request.body, "//@Context"), text);
  }
}

// --- Tokens within requests ---

// A token that xmlsec1 signed, valid until the end of time, and its signer.
std::string IssuedToken() {
  return ReadVector("responses/tokens/valid.xml");
}

std::string TokenSignerPem() {
  return ReadVector("responses/tokens/signer.pem");
}

bool XmlsecAcceptsToken(const std::string& token) {
  const TestSupport::TemporaryDirectory directory;
  const ProcessResult result =
      RunXmlsec({"--trusted-pem", directory.WriteFile("signer.pem", TokenSignerPem()), "--id-attr:ID",
                 "urn:oasis:names:tc:SAML:2.0:assertion:Assertion"},
                token);
  return result.exitCode == 0;
}

std::string WeAcceptToken(const std::string& token) {
  const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> trusted = {
      Pelmar::Crypto::CreateCertificateFromPem(TokenSignerPem())};
  try {
    return CreateSamlToken(token, trusted)->GetSubject().ToString();
  } catch (const Pelmar::Exception& e) {
    return e.what();
  }
}

// The canonical form, exclusive and without comments, by an independent program.
std::string CanonicalForm(const std::string& xml) {
  const ProcessResult result = RunProcess({"xmllint", "--exc-c14n", "-"}, xml);
  EXPECT_EQ(result.exitCode, 0) << result.standardError;
  // xmllint keeps comments, which the signature leaves out.
  std::string text = result.standardOutput;
  for (std::size_t open; (open = text.find("<!--")) != std::string::npos;) {
    text.erase(open, text.find("-->", open) + 3 - open);
  }
  return text;
}

// The token in the request, as text.
std::string CutToken(const std::string& request) {
  const std::string open = "<saml:Assertion";
  const std::string close = "</saml:Assertion>";
  return open + CutBetween(request, open, close) + close;
}

std::vector<std::string> RequestsWith(const std::string& token) {
  const FakeSamlToken embedded("_7f5a64e2", token, SamlToken::CONFIRM_HOLDER_OF_KEY);
  std::vector<std::string> requests(3);
  Request request;
  Builder().BuildExchangeTokenRequest(embedded, PlainSpec(), request);
  requests[0] = request.body;
  Builder().BuildRenewRequest(embedded, 3600, request);
  requests[1] = request.body;
  Builder().BuildValidateSubjectRequest(embedded, request);
  requests[2] = request.body;
  return requests;
}

TEST(EmbeddedToken, InCanonicalFormComesOutByteForByte) {
  const std::string token = CanonicalForm(IssuedToken());
  ASSERT_TRUE(XmlsecAcceptsToken(token));
  for (const std::string& request : RequestsWith(token)) {
    EXPECT_EQ(CutToken(request), token);
  }
}

TEST(EmbeddedToken, AsItWasIssuedComesOutByteForByte) {
  for (const std::string& request :
       RequestsWith(ReplaceAll(IssuedToken(), "\n</saml:Assertion>", "</saml:Assertion>"))) {
    EXPECT_EQ(CutToken(request), CutToken(IssuedToken()));
  }
}

// Other ways to write the same token: each replaces every occurrence of a text.
struct Rewriting {
  const char* description;
  const char* from;
  const char* to;
};

const Rewriting kRewritings[] = {
    {"single quotes", "Version=\"2.0\"", "Version='2.0'"},
    {"other order of attributes",
     "<saml:Conditions NotBefore=\"2020-01-01T00:00:00Z\" NotOnOrAfter=\"9999-12-31T23:59:59Z\">",
     "<saml:Conditions NotOnOrAfter=\"9999-12-31T23:59:59Z\" NotBefore=\"2020-01-01T00:00:00Z\">"},
    {"white space in a tag", "<saml:Subject>", "<saml:Subject\n\t >"},
    {"white space in an end tag", "</saml:Subject>", "</saml:Subject\n>"},
    {"white space around an equals sign", "Count=\"1\"", "Count  =\n\"1\""},
    {"end tag of an empty element", "<saml:ProxyRestriction Count=\"1\"/>",
     "<saml:ProxyRestriction Count=\"1\"></saml:ProxyRestriction>"},
    {"character references in a text", "alice@", "&#97;l&#x69;ce&#64;"},
    {"character references in an attribute", "Count=\"1\"", "Count=\"&#49;\""},
    {"CDATA", "alice@example.com", "<![CDATA[alice@]]>example.com"},
    {"CDATA in the issuer", "https://sts.example/", "https:<![CDATA[//]]>sts.example/"},
    {"comment between elements", "<saml:Subject>", "<!-- who --><saml:Subject><!-- is it -->"},
    {"CRLF", "\n", "\r\n"},
    {"CR", "\n", "\r"},
    {"superfluous declaration", "<saml:Subject>",
     "<saml:Subject xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\">"},
    {"unused declaration", "<saml:Subject>", "<saml:Subject xmlns:unused=\"urn:unused\">"},
};

TEST(EmbeddedToken, KeepsItsCanonicalFormAndSignatureHoweverItIsWritten) {
  for (const Rewriting& rewriting : kRewritings) {
    SCOPED_TRACE(rewriting.description);
    const std::string token = ReplaceAll(IssuedToken(), rewriting.from, rewriting.to);
    ASSERT_NE(token, IssuedToken());
    ASSERT_TRUE(XmlsecAcceptsToken(token)) << token;
    for (const std::string& request : RequestsWith(token)) {
      const std::string cut = CutToken(request);
      EXPECT_EQ(CanonicalForm(cut), CanonicalForm(token));
      EXPECT_TRUE(XmlsecAcceptsToken(cut)) << cut;
      EXPECT_EQ(WeAcceptToken(cut), "{Name: alice; Domain:example.com}");
    }
  }
}

TEST(EmbeddedToken, DoesNotHideTheSignatureOfTheMessage) {
  const std::vector<std::string> requests = RequestsWith(IssuedToken());
  EXPECT_TRUE(XmlsecAcceptsRequest(requests[0]));
  EXPECT_TRUE(XmlsecAcceptsRequest(requests[1]));
}

}  // namespace
}  // namespace Quorlin
