// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/ServiceAnswers.h"

#include <gtest/gtest.h>

#include <stdexcept>

namespace TestSupport {
namespace {

const std::string kStart =
    "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\" "
    "xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\"><soapenv:Body>";
const std::string kEnd = "</soapenv:Body></soapenv:Envelope>";

TEST(ServiceAnswers, MissingDataFileIsAnError) {
  EXPECT_THROW(ReadResponseVector("tokens/missing.xml"), std::runtime_error);
}

TEST(ServiceAnswers, SignedTokensAreElementsWithoutLinesAround) {
  for (const char* name : {"valid", "expired", "tampered"}) {
    const std::string token = SignedToken(name);
    EXPECT_EQ("<saml:Assertion ", token.substr(0, 16)) << name;
    EXPECT_EQ("</saml:Assertion>", token.substr(token.size() - 17)) << name;
  }
}

TEST(ServiceAnswers, AreWholeEnvelopes) {
  const std::string type = "<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>";
  EXPECT_EQ(
      kStart + "<wst:RequestSecurityTokenResponseCollection><wst:RequestSecurityTokenResponse>" + type +
          "<wst:RequestedSecurityToken><t/></wst:RequestedSecurityToken></wst:RequestSecurityTokenResponse>"
          "</wst:RequestSecurityTokenResponseCollection>" +
          kEnd,
      IssueAnswer("<t/>"));
  EXPECT_EQ(
      kStart + "<wst:RequestSecurityTokenResponse>" + type +
          "<wst:RequestedSecurityToken><t/></wst:RequestedSecurityToken></wst:RequestSecurityTokenResponse>" +
          kEnd,
      RenewAnswer("<t/>"));
  EXPECT_EQ(kStart +
                "<wst:RequestSecurityTokenResponse><wst:Status><wst:Code>"
                "http://docs.oasis-open.org/ws-sx/ws-trust/200512/status/invalid</wst:Code></wst:Status>"
                "</wst:RequestSecurityTokenResponse>" +
                kEnd,
            ValidateAnswer(false));
  EXPECT_EQ(
      kStart +
          "<wst:RequestSecurityTokenResponse Context=\"c\"><wst:BinaryExchange>bGVn</wst:BinaryExchange>"
          "</wst:RequestSecurityTokenResponse>" +
          kEnd,
      ChallengeAnswer("c", "leg"));
  EXPECT_EQ(
      kStart +
          "<wst:RequestSecurityTokenResponseCollection><wst:RequestSecurityTokenResponse Context=\"c\">" +
          type +
          "<wst:RequestedSecurityToken><t/></wst:RequestedSecurityToken></wst:RequestSecurityTokenResponse>"
          "</wst:RequestSecurityTokenResponseCollection>" +
          kEnd,
      FinalAnswer("c", "", "<t/>"));
  EXPECT_EQ(
      kStart + "<soapenv:Fault><faultcode>a:b</faultcode><faultstring>c</faultstring></soapenv:Fault>" + kEnd,
      FaultAnswer("a:b", "c"));
}

}  // namespace
}  // namespace TestSupport
