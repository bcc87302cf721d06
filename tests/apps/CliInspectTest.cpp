// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin inspect.

#include "apps/Cli.h"
#include "support/GoldenText.h"
#include "support/TokenFactory.h"

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

constexpr const char* kFirstLine =
    "NOT VERIFIED: what follows is what the document claims; nobody has checked it.\n";
constexpr const char* kLastLine =
    "NOT VERIFIED: anybody can write such a document. quorlin verify tells whether the token is good.\n";

ProcessResult Inspect(const std::string& xml, const std::vector<std::string>& more = {}) {
  std::vector<std::string> arguments = {"inspect", "-"};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return RunCli(arguments, xml);
}

Json InspectAsJson(const std::string& xml) {
  const ProcessResult result = Inspect(xml, {"--json"});
  EXPECT_EQ(result.exitCode, 0) << result.standardOutput;
  EXPECT_EQ(result.standardError, "");
  return Json::parse(result.standardOutput);
}

/// `text` with how far dates are from now as "AGO".
std::string MaskDistances(const std::string& text) {
  static const std::regex kDistance("\\((in )?[0-9]+ (d|h|min|s)( [0-9]+ (h|min|s))?( ago)?\\)");
  return std::regex_replace(text, kDistance, "(AGO)");
}

TEST(CliInspect, ShowsWhatATokenClaims) {
  const ProcessResult result =
      RunCli({"inspect", std::string(QUORLIN_TEST_VECTORS_DIR) + "/tokens/accept/holder-of-key.xml"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(MaskDistances(result.standardOutput), std::string(kFirstLine) + R"(Assertion at line 1, column 1
  id             _5f3d
  version        2.0
  issue instant  2020-01-01T00:00:00Z (AGO)
  issuers
    - value   https://sts.example/
      format  urn:oasis:names:tc:SAML:2.0:nameid-format:entity
  signatures
    - canonicalization method  http://www.w3.org/2001/10/xml-exc-c14n#
      signature method         http://www.w3.org/2001/04/xmldsig-more#rsa-sha256
      references
        - uri            #_5f3d
          transforms
            - http://www.w3.org/2000/09/xmldsig#enveloped-signature
            - http://www.w3.org/2001/10/xml-exc-c14n#
          digest method  http://www.w3.org/2001/04/xmlenc#sha256
          digest value   dpFYGLOfqfAzS4siTjtoq8pj88ljO4FApP1fCrhl1+8=
      certificates
        - subject     CN=Token vectors
          issuer      CN=Token vectors
          not before  2000-01-01T00:00:00Z (AGO)
          not after   9999-12-31T23:59:59Z (AGO)
          sha256      b925e8842f2fa38be2589f88b5fca097386fb8ade7f96c02d317d6315c9408ca
  subjects
    - name ids
        - value   alice@example.com
          format  http://schemas.xmlsoap.org/claims/UPN
      confirmations
        - method  urn:oasis:names:tc:SAML:2.0:cm:holder-of-key
          data
            - certificates
                - subject     CN=Token vectors
                  issuer      CN=Token vectors
                  not before  2000-01-01T00:00:00Z (AGO)
                  not after   9999-12-31T23:59:59Z (AGO)
                  sha256      b925e8842f2fa38be2589f88b5fca097386fb8ade7f96c02d317d6315c9408ca
  conditions
    - not before       2020-01-01T00:00:00Z (AGO)
      not on or after  9999-12-31T23:59:59Z (AGO)
  authentication
    - instant        2020-01-01T00:00:00Z (AGO)
      context class  urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport
)" + kLastLine);
}

/// An assertion with one of everything that the summary above lacks.
constexpr const char* kRichAssertion = R"(<?xml version="1.0"?>
<!-- first --> <s:Assertion xmlns:s="urn:oasis:names:tc:SAML:2.0:assertion" ID="_1"
  xmlns:del="urn:oasis:names:tc:SAML:2.0:conditions:delegation" xmlns:i="http://www.w3.org/2001/XMLSchema-instance">
<s:Subject><s:SubjectConfirmation Method="m"><s:NameID NameQualifier="q">bob</s:NameID>
<s:SubjectConfirmationData NotBefore="soon" Recipient="r" InResponseTo="x" Address="a"/></s:SubjectConfirmation></s:Subject>
<s:Conditions><s:AudienceRestriction><s:Audience>urn:a</s:Audience><s:Audience>urn:b</s:Audience></s:AudienceRestriction>
<s:OneTimeUse/><s:ProxyRestriction Count="2"><s:Audience>urn:p</s:Audience></s:ProxyRestriction>
<s:Condition i:type="del:T" Count="7"><del:Delegate DelegationInstant="t"><s:NameID>carol</s:NameID></del:Delegate></s:Condition>
<other xmlns="urn:o"/></s:Conditions>
<s:Advice><Advice xmlns="urn:adv" AdviceSource="src"><Attribute Name="n" FriendlyName="f"><V>1</V><V>2</V></Attribute></Advice></s:Advice>
<s:AuthnStatement AuthnInstant="then" SessionIndex="9" SessionNotOnOrAfter="later"/>
<s:AttributeStatement><s:Attribute Name="g"><s:AttributeValue> <b>a</b>b </s:AttributeValue></s:Attribute></s:AttributeStatement>
</s:Assertion>)";

TEST(CliInspect, ShowsTheSameAsData) {
  const ProcessResult result = Inspect(kRichAssertion, {"--json"});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(
      result.standardOutput,
      R"({"verified":false,"line":2,"column":16,"claims":{"id":"_1",)"
      R"("subjects":[{"confirmations":[{"method":"m","delegateNameIds":[{"value":"bob","nameQualifier":"q"}],)"
      R"("data":[{"notBefore":"soon","recipient":"r","inResponseTo":"x","address":"a"}]}]}],)"
      R"("conditions":[{"audienceRestrictions":[{"audiences":["urn:a","urn:b"]}],"oneTimeUse":[true],)"
      R"("proxyRestrictions":[{"count":"2","audiences":["urn:p"]}],)"
      R"("typedConditions":[{"type":"del:T","count":"7","delegates":[{"instant":"t","nameIds":[{"value":"carol"}]}]}],)"
      R"("otherElements":["{urn:o}other"]}],)"
      R"("advice":[{"elements":[{"name":"{urn:adv}Advice","source":"src",)"
      R"("attributes":[{"name":"n","friendlyName":"f","values":["1","2"]}]}]}],)"
      R"("authentication":[{"instant":"then","sessionNotOnOrAfter":"later","sessionIndex":"9"}],)"
      R"("attributeStatements":[{"attributes":[{"name":"g","values":["ab"]}]}]}})"
      "\n");
}

TEST(CliInspect, FindsTheFirstAssertionOfAnAnswer) {
  const Json json = InspectAsJson("<e:Envelope xmlns:e=\"urn:e\"><Assertion/>\n" + SignToken(TokenText()) +
                                  "</e:Envelope>");
  EXPECT_EQ(json.at("verified"), false);
  EXPECT_EQ(json.at("line"), 2);
  EXPECT_EQ(json.at("claims").at("id"), kTokenId);
}

TEST(CliInspect, ShowsATokenThatIsRefused) {
  const Json altered = InspectAsJson(ReadVector("tokens/reject/altered-subject.xml"));
  EXPECT_EQ(altered.at("verified"), false);
  EXPECT_EQ(altered.at("claims").at("subjects").size(), 1U);
  EXPECT_EQ(
      InspectAsJson(ReadVector("tokens/reject/signature-twice.xml")).at("claims").at("signatures").size(),
      2U);
  EXPECT_FALSE(
      InspectAsJson(ReadVector("tokens/reject/subject-missing.xml")).at("claims").contains("subjects"));
}

/// Whatever is wrong with a token, its claims are shown as claims, or there is no assertion at all.
TEST(CliInspect, GivesNoVerdictOnAnyRefusedToken) {
  const std::string folder = std::string(QUORLIN_TEST_VECTORS_DIR) + "/tokens/reject";
  std::size_t shown = 0;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) {
    if (entry.path().extension() != ".xml") {
      continue;
    }
    const ProcessResult result = RunCli({"inspect", entry.path().string()});
    if (result.exitCode == 1) {
      EXPECT_EQ(result.standardOutput, "") << entry.path();
      continue;
    }
    ++shown;
    EXPECT_EQ(result.exitCode, 0) << entry.path();
    EXPECT_EQ(result.standardOutput.compare(0, std::string(kFirstLine).size(), kFirstLine), 0)
        << entry.path();
    const std::size_t end = result.standardOutput.size() - std::string(kLastLine).size();
    EXPECT_EQ(result.standardOutput.substr(end), kLastLine) << entry.path();
  }
  EXPECT_GT(shown, 100U);
}

TEST(CliInspect, ShowsNothingThatWouldSteerTheTerminalOrLookLikeALineOfItsOwn) {
  const ProcessResult result = Inspect(
      "<Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\" ID=\"a&#10;VERIFIED\"><Issuer>\xC2\x9B"
      "1m&#x202E;x&#13;\ny</Issuer></Assertion>");
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_EQ(result.standardOutput, std::string(kFirstLine) +
                                       "Assertion at line 1, column 1\n"
                                       "  id  a<U+000A>VERIFIED\n"
                                       "  issuers\n"
                                       "    - value  <U+009B>1m<U+202E>x<U+000D><U+000A>y\n" +
                                       kLastLine);
  EXPECT_EQ(
      Inspect("<Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\" ID=\"\xC2\x9B\"/>", {"--json"})
          .standardOutput,
      "{\"verified\":false,\"line\":1,\"column\":1,\"claims\":{\"id\":\"\\u009b\"}}\n");
}

TEST(CliInspect, ShowsAnAssertionThatClaimsNothing) {
  EXPECT_EQ(Inspect("<Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\"><Subject/></Assertion>")
                .standardOutput,
            std::string(kFirstLine) +
                "Assertion at line 1, column 1\n"
                "  subjects\n"
                "    - (nothing)\n" +
                kLastLine);
}

TEST(CliInspect, ShowsACertificateThatIsNone) {
  const Json json = InspectAsJson(
      "<Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\"><Signature "
      "xmlns=\"http://www.w3.org/2000/09/xmldsig#\"><KeyInfo><X509Data><X509Certificate>?</X509Certificate>"
      "</X509Data></KeyInfo></Signature></Assertion>");
  EXPECT_TRUE(json.at("claims").at("signatures").at(0).at("certificates").at(0).contains("unreadable"));
}

TEST(CliInspect, BoundsWhatItShows) {
  std::string values;
  for (int i = 0; i < 5000; ++i) {
    values += "<AttributeValue>" + std::string(2000, 'x') + "</AttributeValue>";
  }
  const Json json = InspectAsJson(
      "<Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\"><AttributeStatement><Attribute Name=\"a\">" +
      values + "</Attribute><Attribute Name=\"b\"/></AttributeStatement></Assertion>");
  const Json& statement = json.at("claims").at("attributeStatements").at(0);
  const Json& attribute = statement.at("attributes").at(0);
  // One entry for the statement, one for the attribute, and then values.
  EXPECT_EQ(attribute.at("values").size(), 298U);
  EXPECT_EQ(attribute.at("valuesOmitted"), 4702);
  EXPECT_EQ(attribute.at("values").at(0), std::string(1000, 'x') + "...");
  EXPECT_EQ(statement.at("attributesOmitted"), 1);
}

/// A document without an assertion.
struct NoAssertion {
  const char* name;
  std::string xml;
  const char* type;
  const char* message;
};

class CliInspectFindsNothing : public testing::TestWithParam<NoAssertion> {};

TEST_P(CliInspectFindsNothing, AndSaysWhy) {
  const ProcessResult result = Inspect(GetParam().xml);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError, std::string("quorlin: ") + GetParam().message + " (" + GetParam().type +
                                      ")\nGive a token, or an answer that holds one, as XML in UTF-8.\n");
}

TEST_P(CliInspectFindsNothing, AndSaysWhyAsData) {
  const ProcessResult result = Inspect(GetParam().xml, {"--json"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.standardError, "");
  EXPECT_EQ(result.standardOutput, std::string(R"({"verified":false,"error":{"type":")") + GetParam().type +
                                       R"(","message":")" + GetParam().message + "\"}}\n");
}

const NoAssertion kNoAssertions[] = {
    {"Rubbish", "rubbish", "XMLParseException", "syntax error at line 1, column 1"},
    {"Nothing", "", "XMLParseException", "no element found at line 1, column 1"},
    {"CutOff", "<Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\">", "XMLParseException",
     "no element found at line 1, column 58"},
    {"OtherXml", "<a><Assertion/></a>", "ParseException", "the document holds no SAML 2.0 assertion"},
    {"Saml11", "<Assertion xmlns=\"urn:oasis:names:tc:SAML:1.0:assertion\"/>", "ParseException",
     "the document holds no SAML 2.0 assertion"},
    {"Encrypted", "<a><EncryptedAssertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\"/></a>",
     "ParseException", "the document holds no SAML 2.0 assertion but an encrypted one"},
};

INSTANTIATE_TEST_SUITE_P(Table, CliInspectFindsNothing, testing::ValuesIn(kNoAssertions),
                         [](const auto& test) { return std::string(test.param.name); });

TEST(CliInspect, RefusesADoctype) {
  EXPECT_EQ(Inspect("<!DOCTYPE a><Assertion xmlns=\"urn:oasis:names:tc:SAML:2.0:assertion\"/>").exitCode, 1);
}

TEST(CliInspect, ReportsAFileThatCannotBeRead) {
  const ProcessResult result = RunCli({"inspect", "/nonexistent/token.xml"});
  EXPECT_EQ(result.exitCode, 2);
  EXPECT_EQ(result.standardOutput, "");
  EXPECT_EQ(result.standardError,
            "quorlin: cannot read /nonexistent/token.xml: No such file or directory (UsageException)\n");
}

TEST(CliInspect, RefusesAFileThatIsLargerThanAnyTokenWithoutReadingItAll) {
  // An endless file: the test ends only because reading does.
  const ProcessResult result = RunCli({"inspect", "--json", "/dev/zero"});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(Json::parse(result.standardOutput).at("error").at("type"), "XMLParseException");
}

}  // namespace
