// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin verify.

#include "apps/Cli.h"
#include "support/TokenFactory.h"

#include <pelmar/crypto/Digest.h>
#include <pelmar/xml/security/Algorithms.h>

#include "support/XmlText.h"

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

#include <filesystem>
#include <regex>
#include <string>
#include <vector>

namespace {

using namespace StsTests;
using namespace TestSupport;
using Json = nlohmann::json;

/// Runs "verify" on `xml` with the token service's certificate trusted.
ProcessResult Verify(const std::string& xml, const std::vector<std::string>& more = {"--json"}) {
  const TemporaryDirectory files;
  std::vector<std::string> arguments = {"verify", "--trust",
                                        files.WriteFile("sts.pem", TokenSigner().GetCertificatePem()),
                                        files.WriteFile("token.xml", xml)};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return RunCli(arguments);
}

/// "TYPE: message", with " by pointer" after the type where the output says so.
std::string DescribeError(const ProcessResult& result) {
  const Json json = Json::parse(result.standardOutput);
  const Json& error = json.at("error");
  const bool byPointer = error.contains("byPointer") && error.at("byPointer").get<bool>();
  return error.at("type").get<std::string>() + (byPointer ? " by pointer" : "") + ": " +
         error.at("message").get<std::string>();
}

std::string Sha256Of(const std::string& text) {
  return Pelmar::Crypto::ToHex(
      Pelmar::Crypto::ComputeDigest(Pelmar::Crypto::DIGEST_SHA256, text.data(), text.size()));
}

/// A token with something in every part of the description.
TokenText FullText() {
  const std::string vendor = QUORLIN_VENDOR_URI_BASE;
  TokenText text;
  text.notBefore = "2020-01-01T00:00:00Z";
  text.notOnOrAfter = "9999-12-31T23:59:59.5Z";
  text.HoldKey(TokenSigner());
  text.delegateId = NameIdElement("proxy@example.com");
  text.restrictions =
      "<saml:AudienceRestriction><saml:Audience>urn:b</saml:Audience><saml:Audience>urn:a</saml:Audience>"
      "</saml:AudienceRestriction>" +
      ProxyRestriction("Count=\"1\"") + RenewRestriction("Count=\"2\"") +
      DelegationRestriction(DelegateElement("2020-01-02T03:04:05.25Z", NameIdElement("proxy@example.com")));
  text.advice = "<saml:Advice><ext:RSAAdvice AdviceSource=\"urn:source\">" +
                AttributeElement("n", {"v", "w"}) + AttributeElement("empty", {}) +
                "</ext:RSAAdvice></saml:Advice>";
  text.attributes =
      AttributeElement(vendor + "/schemas/attr-names/2009/01/GroupIdentity", {"D\\users", "staff/E"}) +
      AttributeElement(vendor + "/schemas/attr-names/2011/07/isSolution", {"true"}) +
      AttributeElement("http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname", {"Al\xC3\xAF"
                                                                                           "ce"}) +
      AttributeElement("http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname", {"\"<&\n"});
  return text;
}

TEST(CliVerify, DescribesAllOfAGoodToken) {
  TokenText text = FullText();
  text.attributes = ReplaceOnce(text.attributes, "\"<&\n", "\"&lt;&amp;\n");
  const std::string xml = SignToken(text);
  const ProcessResult result = Verify(xml);
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(
      result.standardOutput,
      "{\"valid\":true,\"token\":{\"id\":\"_4f0a9c1e\","
      "\"subject\":{\"name\":\"alice\",\"domain\":\"example.com\"},"
      "\"startDate\":\"2020-01-01T00:00:00Z\",\"endDate\":\"9999-12-31T23:59:59.5Z\","
      "\"renewable\":true,\"delegable\":true,\"isSolution\":true,\"confirmation\":\"holder-of-key\","
      "\"givenName\":\"Al\xC3\xAF"
      "ce\",\"surname\":\"\\\"<&\\n\","
      "\"groups\":[{\"name\":\"users\",\"domain\":\"D\"},{\"name\":\"staff\",\"domain\":\"E\"}],"
      "\"delegationChain\":[{\"principal\":{\"name\":\"proxy\",\"domain\":\"example.com\"},"
      "\"instant\":\"2020-01-02T03:04:05.25Z\"}],"
      "\"audience\":[\"urn:a\",\"urn:b\"],"
      "\"advice\":[{\"source\":\"urn:source\",\"attributes\":[{\"name\":\"n\",\"values\":[\"v\",\"w\"]},"
      "{\"name\":\"empty\",\"values\":[]}]}],"
      "\"confirmationCertificateSha256\":\"" +
          Pelmar::Crypto::ToHex(TokenSigner().certificate->GetSha256()) + "\",\"xmlSha256\":\"" +
          Sha256Of(xml) + "\"}}\n");
}

TEST(CliVerify, PrintsASummaryForPeople) {
  TokenText text;
  text.notBefore = "2020-01-01T00:00:00Z";
  const ProcessResult result = Verify(SignToken(text), {});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(std::regex_replace(result.standardOutput, std::regex(" \\(.* left\\)"), " (... left)"),
            "The token is valid\n"
            "  subject       alice@example.com\n"
            "  groups        none\n"
            "  valid from    2020-01-01T00:00:00Z\n"
            "  valid until   " +
                text.notOnOrAfter +
                " (... left)\n"
                "  flags         not renewable, not delegable\n"
                "  confirmation  bearer: whoever holds it may use it\n"
                "  id            _4f0a9c1e\n");
}

TEST(CliVerify, ReadsStandardInput) {
  const TemporaryDirectory files;
  const ProcessResult result =
      RunCli({"verify", "--trust", files.WriteFile("sts.pem", TokenSigner().GetCertificatePem()), "-"},
             SignToken(TokenText()));
  EXPECT_EQ(result.exitCode, 0);
}

TEST(CliVerify, TakesAllCertificatesOfATrustFile) {
  const TemporaryDirectory files;
  const std::string two = MakeCa("Somebody else").GetCertificatePem() + TokenSigner().GetCertificatePem();
  const ProcessResult result = RunCli({"verify", "--trust", files.WriteFile("two.pem", two),
                                       files.WriteFile("token.xml", SignToken(TokenText()))});
  EXPECT_EQ(result.exitCode, 0);
}

TEST(CliVerify, TrustsNothingUnlessToldSo) {
  const TemporaryDirectory files;
  const ProcessResult result =
      RunCli({"verify", "--json", files.WriteFile("token.xml", SignToken(TokenText()))});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(
      result.standardOutput,
      "{\"valid\":false,\"error\":{\"type\":\"InvalidSignatureException\",\"message\":\"Signature verification error. "
      "Certificate chain is not trusted: self-signed certificate (CN=Test signer)\"}}\n");
}

TEST(CliVerify, TellsPeopleWhatATokenIsSignedWith) {
  const TemporaryDirectory files;
  const ProcessResult result = RunCli({"verify", files.WriteFile("token.xml", SignToken(TokenText()))});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(
      result.standardError,
      "quorlin: Signature verification error. Certificate chain is not trusted: self-signed certificate (CN=Test "
      "signer) (InvalidSignatureException)\n"
      "The token must be signed with a certificate that --sts-cert or --trust names, or that chains to one of "
      "them, and must not have been changed on its way.\n");
}

TEST(CliVerify, HandsTheBytesOverUnchanged) {
  TokenText text;
  text.prolog = "<?xml version=\"1.0\"?>\r\n<!-- \xC3\xA9 -->\r\n";
  text.attributes = AttributeElement("x", {"\xE2\x82\xAC"});
  const std::string xml = SignToken(text) + "\r\n";
  const TemporaryDirectory files;
  const ProcessResult result = Verify(xml, {"--json", "--out", files.GetPath("out.xml")});
  EXPECT_EQ(result.exitCode, 0) << result.standardOutput;
  EXPECT_EQ(files.ReadFile("out.xml"), xml);
}

TEST(CliVerify, ReportsAChangedToken) {
  const ProcessResult result =
      Verify(ReplaceOnce(SignToken(TokenText()), kTokenSubject, "mallory@example.com"));
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(DescribeError(result),
            "InvalidSignatureException: Failed to verify signature: token might have been tampered with.");
}

TEST(CliVerify, ReportsWhatIsNotXml) {
  const ProcessResult result = Verify("<saml:Assertion>");
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(DescribeError(result), "XMLParseException: no element found at line 1, column 17");
}

TEST(CliVerify, ReportsErrorsThatAreThrownByPointer) {
  TokenText text;
  text.attributes =
      AttributeElement(std::string(QUORLIN_VENDOR_URI_BASE) + "/schemas/attr-names/2011/07/isSolution", {});
  const ProcessResult result = Verify(SignToken(text));
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(
      result.standardOutput,
      "{\"valid\":false,\"error\":{\"type\":\"ParseException\",\"message\":\"No value found for attribute "
      "isSolution.\",\"byPointer\":true}}\n");
}

TEST(CliVerify, ReportsATokenCertificateThatIsNone) {
  TokenText text;
  text.HoldKey(TokenSigner());
  const std::string broken = ReplaceOnce(text.Compose(), Base64Of(TokenSigner()), "AAAA");
  const ProcessResult result = Verify(SignToken(broken));
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(DescribeError(result), "CryptoException: The certificate cannot be read: wrong tag");
}

TEST(CliVerify, ReportsATokenCertificateThatIsNoBase64) {
  TokenText text;
  text.HoldKey(TokenSigner());
  const std::string broken = ReplaceOnce(text.Compose(), Base64Of(TokenSigner()), "AAA");
  const ProcessResult result = Verify(SignToken(broken));
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(
      result.standardOutput,
      "{\"valid\":false,\"error\":{\"type\":\"Base64FormatException\",\"message\":\"Invalid base64 text: the "
      "length is not a multiple of four\"}}\n");
}

// An embedded token is put into its canonical form first, which such an element does not have.
TEST(CliVerify, ReportsAnUndeclaredPrefixUnderThePlatformsClass) {
  const std::string token =
      ReplaceOnce(SignToken(TokenText()), "<saml:Subject>", "<saml:Subject what:x=\"\">");
  const std::string message = "Undeclared namespace prefix 'what' on element 'saml:Subject'";
  const ProcessResult result = Verify("<a>" + token + "</a>", {"--json", "--embedded"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(
      result.standardOutput,
      "{\"valid\":false,\"error\":{\"type\":\"XmlSecurityException\",\"message\":\"" + message + "\"}}\n");
  const ProcessResult text = Verify("<a>" + token + "</a>", {"--embedded"});
  EXPECT_EQ(text.exitCode, 1);
  EXPECT_EQ(text.standardError, "quorlin: " + message + " (XmlSecurityException)\n");
}

TEST(CliVerify, AllowsForClocksThatDifferOnlyWhenAsked) {
  TokenText text;
  text.notBefore = SecondsFromNow(-7200);
  text.notOnOrAfter = SecondsFromNow(-3600);
  const std::string xml = SignToken(text);
  EXPECT_EQ(DescribeError(Verify(xml)), "ParseException: The token has expired at: " + text.notOnOrAfter);
  EXPECT_EQ(Verify(xml, {"--json", "--clock-tolerance", "7200"}).exitCode, 0);
}

TEST(CliVerify, FindsTheFirstAssertionOfALargerDocument) {
  const std::string answer = "<e:Envelope xmlns:e=\"urn:e\"><e:Body><Assertion/>" + SignToken(TokenText()) +
                             "<x/></e:Body></e:Envelope>";
  EXPECT_EQ(Verify(answer, {"--json", "--embedded"}).exitCode, 0);
  EXPECT_EQ(DescribeError(Verify(answer)), "ParseException: Expected element 'Assertion' not found.");
}

TEST(CliVerify, FindsAnAssertionThatIsTheWholeDocument) {
  EXPECT_EQ(Verify(SignToken(TokenText()), {"--embedded"}).exitCode, 0);
}

TEST(CliVerify, ReportsALargerDocumentWithoutAssertion) {
  const ProcessResult result = Verify("<a><Assertion/></a>", {"--json", "--embedded"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(DescribeError(result), "ParseException: Expected element 'Assertion' not found.");
}

TEST(CliVerify, ShowsNothingThatWouldSteerTheTerminal) {
  TokenText text;
  text.attributes =
      AttributeElement(std::string(QUORLIN_VENDOR_URI_BASE) + "/schemas/attr-names/2009/01/GroupIdentity",
                       {"\xE2\x80\xAEgroup\xC2\x9B"
                        "1m/example.com"});
  const ProcessResult result = Verify(SignToken(text), {});
  EXPECT_EQ(result.exitCode, 0);
  const std::size_t groups = result.standardOutput.find("  groups");
  EXPECT_EQ(result.standardOutput.substr(groups, result.standardOutput.find('\n', groups) - groups),
            "  groups        <U+202E>group<U+009B>1m@example.com");
}

TEST(CliVerify, ReportsFilesThatCannotBeRead) {
  const ProcessResult token = RunCli({"verify", "/nonexistent/token.xml"});
  EXPECT_EQ(token.exitCode, 2);
  EXPECT_EQ(token.standardError,
            "quorlin: cannot read /nonexistent/token.xml: No such file or directory (UsageException)\n");
  const ProcessResult trust = RunCli({"verify", "--trust", "/nonexistent/sts.pem", "-"});
  EXPECT_EQ(trust.exitCode, 2);
  EXPECT_EQ(trust.standardError,
            "quorlin: cannot read /nonexistent/sts.pem: No such file or directory (UsageException)\n");
}

TEST(CliVerify, RefusesANegativeClockTolerance) {
  const ProcessResult result = RunCli({"verify", "--clock-tolerance", "-1", "-"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardError,
            "quorlin: --clock-tolerance: Value -1 not in range 0 to 3153600000\nTry quorlin verify --help\n");
}

TEST(CliVerify, RefusesAFileThatIsLargerThanAnyTokenWithoutReadingItAll) {
  // An endless file: the test ends only because reading does.
  const ProcessResult result = RunCli({"verify", "--json", "/dev/zero"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(DescribeError(result), "XMLParseException: more than 16777216 bytes at line 1, column 1");
}

/// Standard error of verifying a good token with such a trust file, with its path made short.
std::string TrustFileRefusal(const std::string& content) {
  const TemporaryDirectory files;
  const std::string path = files.WriteFile("trust", content);
  const ProcessResult result =
      RunCli({"verify", "--trust", path, files.WriteFile("token.xml", SignToken(TokenText()))});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  return ReplaceOnce(result.standardError, path, "FILE");
}

TEST(CliVerify, TellsWhatATrustFileIsInsteadOfCertificates) {
  const std::string none = "quorlin: cannot use the certificates in FILE: The PEM text holds no certificate";
  const std::vector<unsigned char>& der = TokenSigner().certificate->GetDer();
  EXPECT_EQ(
      TrustFileRefusal(std::string(der.begin(), der.end())),
      none +
          " (that looks like DER; PEM is what \"openssl x509 -inform der\" makes of it) (UsageException)\n");
  EXPECT_EQ(TrustFileRefusal(TokenSigner().GetKeyPem()),
            none + " (there is a private key in it, which is not needed here) (UsageException)\n");
  EXPECT_EQ(TrustFileRefusal(""), none + " (the file is empty) (UsageException)\n");
  EXPECT_EQ(TrustFileRefusal("0 no certificate\n"), none + " (UsageException)\n");
}

TEST(CliVerify, PassesOverAPrivateKeyBesideACertificate) {
  const TemporaryDirectory files;
  const std::string both = TokenSigner().GetKeyPem() + TokenSigner().GetCertificatePem();
  EXPECT_EQ(RunCli({"verify", "--trust", files.WriteFile("both.pem", both),
                    files.WriteFile("token.xml", SignToken(TokenText()))})
                .exitCode,
            0);
}

TEST(CliVerify, TakesSeveralTrustFiles) {
  const TemporaryDirectory files;
  const ProcessResult result =
      RunCli({"verify", "--trust", files.WriteFile("one.pem", MakeCa("Somebody else").GetCertificatePem()),
              "--trust", files.WriteFile("two.pem", TokenSigner().GetCertificatePem()),
              files.WriteFile("token.xml", SignToken(TokenText()))});
  EXPECT_EQ(result.exitCode, 0) << result.standardError;
}

TEST(CliVerify, ReportsWhatIsNoFile) {
  const TemporaryDirectory files;
  const std::string directory = files.GetPath();
  const ProcessResult token = RunCli({"verify", directory});
  EXPECT_EQ(token.exitCode, 2);
  EXPECT_EQ(token.standardError, "quorlin: cannot read " + directory + ": Is a directory (UsageException)\n");
  const ProcessResult json = RunCli({"verify", "--json", directory});
  EXPECT_EQ(json.exitCode, 2);
  EXPECT_EQ(json.standardOutput,
            "{\"valid\":false,\"error\":{\"type\":\"UsageException\",\"message\":\"cannot read " + directory +
                ": Is a directory\"}}\n");
  const ProcessResult trust = RunCli({"verify", "--trust", directory, "-"});
  EXPECT_EQ(trust.exitCode, 2);
  EXPECT_EQ(trust.standardError, "quorlin: cannot read " + directory + ": Is a directory (UsageException)\n");
}

TEST(CliVerify, TellsPeopleWhatIsNotXml) {
  const std::string advice = "That is not the XML of a token, which is one document in UTF-8.\n";
  const ProcessResult empty = Verify("", {});
  EXPECT_EQ(empty.exitCode, 1);
  EXPECT_EQ(empty.standardError,
            "quorlin: no element found at line 1, column 1 (XMLParseException)\n" + advice);
  const ProcessResult text = Verify("token", {});
  EXPECT_EQ(text.exitCode, 1);
  EXPECT_EQ(text.standardError, "quorlin: syntax error at line 1, column 1 (XMLParseException)\n" + advice);
  EXPECT_EQ(RunCli({"verify", "-"}).standardError, empty.standardError);
}

TEST(CliVerify, TellsPeopleOfEmbeddedWhenTheDocumentIsNoAssertion) {
  const ProcessResult result = Verify("<a>" + SignToken(TokenText()) + "</a>", {});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(
      result.standardError,
      "quorlin: Expected element 'Assertion' not found. (ParseException)\n"
      "The document is no SAML 2.0 assertion. If it holds one, as a SOAP answer does, quorlin verify --embedded "
      "finds it.\n");
}

// The bytes reach the parser as they are: it alone says what they mean.
TEST(CliVerify, ReadsBytesThatAreNoText) {
  const std::string good = SignToken(TokenText());
  const std::string withNul = ReplaceOnce(good, "alice@", std::string("al\0ice@", 8));
  EXPECT_EQ(DescribeError(Verify(withNul)),
            "XMLParseException: not well-formed (invalid token)" + PlaceOf(good, "ice@"));
  EXPECT_EQ(DescribeError(Verify("\xFF\xFE" + good)),
            "XMLParseException: only UTF-8 is accepted at line 1, column 1");
  const std::string marked = "\xEF\xBB\xBF" + good + "\r\n";
  const ProcessResult result = Verify(marked);
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(Json::parse(result.standardOutput).at("token").at("xmlSha256"), Sha256Of(marked));
}

TEST(CliVerify, DescribesAnEmbeddedTokenInItsCanonicalForm) {
  TokenText text;
  text.issuer += "<!-- left out -->";
  const std::string answer =
      "<e:Envelope xmlns:e=\"urn:e\"><e:Body>" + SignToken(text) + "</e:Body></e:Envelope>";
  const auto document = ParseXmlText(answer);
  const std::string canonical = CanonicalText(
      document->GetDocumentElement()->GetFirstChild()->GetFirstChild(), Pelmar::Xml::Security::kC14n);
  const TemporaryDirectory files;
  const ProcessResult result = Verify(answer, {"--json", "--embedded", "--out", files.GetPath("out.xml")});
  EXPECT_EQ(result.exitCode, 0) << result.standardOutput;
  EXPECT_EQ(Json::parse(result.standardOutput).at("token").at("xmlSha256"), Sha256Of(canonical));
  EXPECT_EQ(files.ReadFile("out.xml"), canonical);
}

TEST(CliVerify, TakesTheFirstOfSeveralAssertions) {
  TokenText first;
  first.id = "_first";
  TokenSigning signing;
  signing.references[0].uri = "#_first";
  const std::string both = "<a><b>" + SignToken(first.Compose(), TokenSigner(), signing) + "</b>" +
                           SignToken(TokenText()) + "</a>";
  EXPECT_EQ(Json::parse(Verify(both, {"--json", "--embedded"}).standardOutput).at("token").at("id"),
            "_first");
}

std::size_t CountFiles(const std::string& directory) {
  const std::filesystem::directory_iterator entries(directory);
  return static_cast<std::size_t>(std::distance(begin(entries), end(entries)));
}

TEST(CliVerify, LeavesNothingBehindWhenTheTokenIsRefused) {
  const TemporaryDirectory files;
  const std::string old = files.WriteFile("out.xml", "as it was");
  const std::string bad = ReplaceOnce(SignToken(TokenText()), kTokenSubject, "mallory@example.com");
  EXPECT_EQ(Verify(bad, {"--out", old}).exitCode, 1);
  EXPECT_EQ(Verify(bad, {"--out", files.GetPath("new.xml")}).exitCode, 1);
  EXPECT_EQ(files.ReadFile("out.xml"), "as it was");
  EXPECT_EQ(CountFiles(files.GetPath()), 1U);
}

TEST(CliVerify, ReportsAnOutputFileThatCannotBeWritten) {
  const TemporaryDirectory files;
  const std::string good = SignToken(TokenText());
  const ProcessResult nowhere = Verify(good, {"--out", "/nonexistent/out.xml"});
  EXPECT_EQ(nowhere.exitCode, 2);
  EXPECT_EQ(nowhere.standardOutput, "");
  EXPECT_EQ(nowhere.standardError,
            "quorlin: cannot write /nonexistent/out.xml: No such file or directory (UsageException)\n");
  const std::string directory = files.GetPath();
  const ProcessResult isDirectory = Verify(good, {"--json", "--out", directory});
  EXPECT_EQ(isDirectory.exitCode, 2);
  EXPECT_EQ(isDirectory.standardOutput,
            "{\"valid\":false,\"error\":{\"type\":\"UsageException\",\"message\":\"cannot write " +
                directory + ": Is a directory\"}}\n");
  EXPECT_EQ(CountFiles(directory), 0U);
}

}  // namespace
