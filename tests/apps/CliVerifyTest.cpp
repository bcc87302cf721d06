// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin verify.

#include "apps/Cli.h"
#include "support/TokenFactory.h"

#include <nlohmann/json.hpp>

#include <gtest/gtest.h>

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

TEST(CliVerify, AcceptsAGoodToken) {
  const ProcessResult result = Verify(SignToken(TokenText()));
  EXPECT_EQ(result.exitCode, 0);
  const Json json = Json::parse(result.standardOutput);
  EXPECT_TRUE(json.at("valid").get<bool>());
  EXPECT_EQ(json.at("token").at("id"), kTokenId);
}

TEST(CliVerify, PrintsASummaryForPeople) {
  const ProcessResult result = Verify(SignToken(TokenText()), {});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardOutput.substr(0, result.standardOutput.find("  groups")),
            "The token is valid\n"
            "  subject       alice@example.com\n");
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
  EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("type"), "InvalidSignatureException");
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
  EXPECT_EQ(DescribeError(result).substr(0, 17), "CryptoException: ");
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
  EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("type"), "XMLParseException");
}

}  // namespace
