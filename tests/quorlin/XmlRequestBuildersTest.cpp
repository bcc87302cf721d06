// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/xmlRequestBuilders.h"

#include <pelmar/Exception.h>
#include <pelmar/system/DateTime.h>

#include <boost/make_shared.hpp>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <string>

#include "quorlin/Namespaces.h"
#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/dates.h"
#include "support/FakeSamlToken.h"
#include "support/GoldenText.h"

namespace Quorlin {
namespace {

using Pelmar::System::DateTime;
using testing::Eq;
using testing::KilledBySignal;
using TestSupport::FakeSamlToken;
using TestSupport::MaskVolatile;

constexpr SamlToken::ConfirmationType kBearer = SamlToken::CONFIRM_BEARER;
constexpr SamlToken::ConfirmationType kHolderOfKey = SamlToken::CONFIRM_HOLDER_OF_KEY;

const std::string kWstUri = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
const std::string kWsseUri =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
const std::string kWsuUri =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
const std::string kToken =
    "<saml2:Assertion xmlns:saml2=\"urn:oasis:names:tc:SAML:2.0:assertion\" ID=\"_token-1\" "
    "Version=\"2.0\"><saml2:Issuer>https://sts.example/</saml2:Issuer></saml2:Assertion>";

TokenSpec Spec(long long lifetimeSec) {
  TokenSpec spec;
  spec.tokenLifetimeSec = lifetimeSec;
  return spec;
}

std::string Text(const XMLBuilderPtr& builder) {
  return MaskVolatile(SerializeToXML(builder));
}

// The Issue body up to wst:Delegatable, and its end tag.
std::string IssueStart(const std::string& keyType, const std::string& context = "") {
  return "<wst:RequestSecurityToken xmlns:wst=\"" + kWstUri + "\"" + context +
         "><wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>"
         "<wst:RequestType>" +
         kWstUri +
         "/Issue</wst:RequestType>"
         "<wst:KeyType>" +
         kWstUri + keyType +
         "</wst:KeyType>"
         "<wst:Lifetime xmlns:wsu=\"" +
         kWsuUri +
         "\"><wsu:Created>{time}</wsu:Created>"
         "<wsu:Expires>{time + 600 s}</wsu:Expires></wst:Lifetime>"
         "<wst:Renewing Allow=\"false\" OK=\"false\"/><wst:Delegatable>false</wst:Delegatable>";
}

const std::string kIssueEnd = "</wst:RequestSecurityToken>";
const std::string kUseKey = "<wst:UseKey Sig=\"holderOfKeyProofSignature\"/>";
const std::string kDelegateToBob =
    "<wst:DelegateTo><wsse:UsernameToken xmlns:wsse=\"" + kWsseUri +
    "\"><wsse:Username>bob</wsse:Username></wsse:UsernameToken></wst:DelegateTo>";
const std::string kExchange =
    "<wst:BinaryExchange EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
    "oasis-200401-wss-soap-message-security-1.0#Base64Binary\" "
    "ValueType=\"http://schemas.xmlsoap.org/ws/2005/02/trust/spnego\">AQID</wst:BinaryExchange>";

const std::vector<unsigned char> kLeg = {1, 2, 3};

// --- Fragments ---

TEST(Lifetime, ExpiresSoManySecondsAfterItWasCreated) {
  EXPECT_EQ(
      Text(WssuLifetimeBuilder(600)),
      "<wst:Lifetime xmlns:wsu=\"" + kWsuUri +
          "\"><wsu:Created>{time}</wsu:Created><wsu:Expires>{time + 600 s}</wsu:Expires></wst:Lifetime>");
}

TEST(Lifetime, CountsInSixtyFourBits) {
  const struct {
    long long seconds;
    const char* difference;
  } cases[] = {
      {1, "{time + 1 s}"}, {0, "{time + 0 s}"}, {-5, "{time - 5 s}"}, {4294967296, "{time + 4294967296 s}"}};
  for (const auto& c : cases) {
    EXPECT_EQ(
        TestSupport::CutBetween(Text(WssuLifetimeBuilder(c.seconds)), "<wsu:Expires>", "</wsu:Expires>"),
        c.difference);
  }
}

TEST(Lifetime, BeginsNow) {
  const std::string before = DateTimeFormatter(Pelmar::System::GetUtcDateTime());
  const std::string text = SerializeToXML(WssuLifetimeBuilder(600));
  const std::string after = DateTimeFormatter(Pelmar::System::GetUtcDateTime());
  const std::string created = TestSupport::CutBetween(text, "<wsu:Created>", "</wsu:Created>");
  EXPECT_LE(before, created);
  EXPECT_LE(created, after);
}

TEST(Lifetime, ThatNoDateCanHoldEndsWithTheLastDate) {
  EXPECT_EQ(TestSupport::CutBetween(SerializeToXML(WssuLifetimeBuilder(9223372036854775807)), "<wsu:Expires>",
                                    "</wsu:Expires>"),
            "294247-01-10T04:00:54.775Z");
}

TEST(Renewing, NeverAsksForRenewalAfterExpiry) {
  EXPECT_EQ(SerializeToXML(WstRenewingBuilder(true)), "<wst:Renewing Allow=\"true\" OK=\"false\"/>");
  EXPECT_EQ(SerializeToXML(WstRenewingBuilder(false)), "<wst:Renewing Allow=\"false\" OK=\"false\"/>");
}

TEST(DelegateTo, NamesTheDelegateWithoutPassword) {
  EXPECT_EQ(SerializeToXML(WstDelegateToBuilder("bob")), kDelegateToBob);
}

TEST(UsernameToken, CarriesTheNameAndThePasswordBehindIt) {
  EXPECT_EQ(SerializeToXML(WsseUsernameTokenBuilder("alice")),
            "<wsse:UsernameToken xmlns:wsse=\"" + kWsseUri +
                "\"><wsse:Username>alice</wsse:Username></wsse:UsernameToken>");
  EXPECT_EQ(
      SerializeToXML(WsseUsernameTokenBuilder("alice", "secret")),
      "<wsse:UsernameToken xmlns:wsse=\"" + kWsseUri +
          "\"><wsse:Username>alice</wsse:Username><wsse:Password Type=\"http://docs.oasis-open.org/wss/2004/01/"
          "oasis-200401-wss-username-token-profile-1.0#PasswordText\">secret</wsse:Password>"
          "</wsse:UsernameToken>");
}

TEST(Participants, ComeInAscendingOrderAndNoneIsPrimary) {
  EXPECT_EQ(SerializeToXML(WstParticipantsBuilders({"b", "a"})),
            "<wst:Participants xmlns:wsa=\"http://www.w3.org/2005/08/addressing\">"
            "<wst:Participant><wsa:EndpointReference><wsa:Address>a</wsa:Address></wsa:EndpointReference>"
            "</wst:Participant>"
            "<wst:Participant><wsa:EndpointReference><wsa:Address>b</wsa:Address></wsa:EndpointReference>"
            "</wst:Participant></wst:Participants>");
  EXPECT_EQ(SerializeToXML(WstParticipantsBuilders({})),
            "<wst:Participants xmlns:wsa=\"http://www.w3.org/2005/08/addressing\"/>");
}

TEST(Participants, HoldOneEndpointReferenceEach) {
  EXPECT_EQ(SerializeToXML(WstParticipantBuilder("a")),
            "<wst:Participant><wsa:EndpointReference><wsa:Address>a</wsa:Address></wsa:EndpointReference>"
            "</wst:Participant>");
  EXPECT_EQ(SerializeToXML(WsaEndpointAddressReferenceBuilder("a")),
            "<wsa:EndpointReference><wsa:Address>a</wsa:Address></wsa:EndpointReference>");
}

const std::string kAdviceSetStart =
    "<rsa-advice:AdviceSet xmlns:rsa-advice=\"" QUORLIN_VENDOR_URI_BASE
    "/names/2009/12/std-ext/WS-Trust1.4/advice\" xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\" "
    "xmlns:xs=\"http://www.w3.org/2001/XMLSchema\" xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\"";

TEST(AdviceSet, DeclaresEveryPrefixIncludingTheUnusedOne) {
  EXPECT_EQ(SerializeToXML(RsaAdviceSetBuilder({})), kAdviceSetStart + "/>");
}

TEST(AdviceSet, KeepsTheOrderOfItsAdvices) {
  EXPECT_EQ(SerializeToXML(RsaAdviceSetBuilder({Advice{"urn:z", {}}, Advice{"urn:a", {}}})),
            kAdviceSetStart +
                "><rsa-advice:Advice AdviceSource=\"urn:z\"/><rsa-advice:Advice AdviceSource=\"urn:a\"/>"
                "</rsa-advice:AdviceSet>");
}

TEST(AdviceSet, WritesAttributesInOrder) {
  EXPECT_EQ(SerializeToXML(RsaAdviceBuilder(Advice{"urn:s", {{"z", {}}, {"a", {"1"}}}})),
            "<rsa-advice:Advice AdviceSource=\"urn:s\"><rsa-advice:Attribute Name=\"z\"/>"
            "<rsa-advice:Attribute Name=\"a\"><rsa-advice:AttributeValue xsi:type=\"xs:string\">1"
            "</rsa-advice:AttributeValue></rsa-advice:Attribute></rsa-advice:Advice>");
}

TEST(AdviceSet, WritesEveryValueAsAString) {
  EXPECT_EQ(
      SerializeToXML(RsaAttributeBuilder(AdviceAttribute{"n", {"2", "1"}})),
      "<rsa-advice:Attribute Name=\"n\">"
      "<rsa-advice:AttributeValue xsi:type=\"xs:string\">2</rsa-advice:AttributeValue>"
      "<rsa-advice:AttributeValue xsi:type=\"xs:string\">1</rsa-advice:AttributeValue></rsa-advice:Attribute>");
  EXPECT_EQ(SerializeToXML(RsaAttributeBuilder(AdviceAttribute{"n", {}})),
            "<rsa-advice:Attribute Name=\"n\"/>");
}

TEST(BinaryExchange, CarriesTheLegInBase64) {
  EXPECT_EQ(SerializeToXML(WstSPNegoBinExchangeBuilder(kLeg)), kExchange);
  EXPECT_EQ(SerializeToXML(WstSPNegoBinExchangeBuilder({})),
            "<wst:BinaryExchange EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
            "oasis-200401-wss-soap-message-security-1.0#Base64Binary\" "
            "ValueType=\"http://schemas.xmlsoap.org/ws/2005/02/trust/spnego\"/>");
}

// --- Bodies ---

TEST(IssueBody, ForABearerTokenHasSixChildren) {
  EXPECT_EQ(Text(CommonAcquireSecurityTokenBuilder(kBearer, Spec(600))), IssueStart("/Bearer") + kIssueEnd);
  EXPECT_EQ(Text(AcquireSecurityTokenBuilder(kBearer, Spec(600))), IssueStart("/Bearer") + kIssueEnd);
}

TEST(IssueBody, NamesTheProofSignatureForAHolderOfKeyToken) {
  EXPECT_EQ(Text(CommonAcquireSecurityTokenBuilder(kHolderOfKey, Spec(600))),
            IssueStart("/PublicKey") + kIssueEnd);
  EXPECT_EQ(Text(AcquireSecurityTokenBuilder(kHolderOfKey, Spec(600))),
            IssueStart("/PublicKey") + kUseKey + kIssueEnd);
}

TEST(IssueBody, ForADelegateNamesNoProofSignature) {
  TokenSpec spec = Spec(600);
  spec.delegateTo = std::string("bob");
  EXPECT_EQ(Text(AcquireSecurityTokenBuilder(kHolderOfKey, spec)),
            IssueStart("/PublicKey") + kDelegateToBob + kIssueEnd);
  EXPECT_EQ(Text(AcquireSecurityTokenBuilder(kBearer, spec)),
            IssueStart("/Bearer") + kDelegateToBob + kIssueEnd);
}

TEST(IssueBody, NamesADelegateWithAnEmptyNameToo) {
  TokenSpec spec = Spec(600);
  spec.delegateTo = std::string();
  EXPECT_EQ(Text(AcquireSecurityTokenBuilder(kHolderOfKey, spec)),
            IssueStart("/PublicKey") + "<wst:DelegateTo><wsse:UsernameToken xmlns:wsse=\"" + kWsseUri +
                "\"><wsse:Username/></wsse:UsernameToken></wst:DelegateTo>" + kIssueEnd);
}

TEST(IssueBody, ForAnExchangeNeverNamesAProofSignature) {
  EXPECT_EQ(Text(ExchangeSecurityTokenBuilder(kHolderOfKey, Spec(600))),
            IssueStart("/PublicKey") + kIssueEnd);
  EXPECT_EQ(Text(ExchangeSecurityTokenBuilder(kBearer, Spec(600))), IssueStart("/Bearer") + kIssueEnd);
}

class BodyDeathTest : public testing::Test {
 protected:
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(BodyDeathTest, AbortsOnAnUnknownConfirmationType) {
  const SamlToken::ConfirmationType unknown = static_cast<SamlToken::ConfirmationType>(2);
  EXPECT_EXIT(CommonAcquireSecurityTokenBuilder(unknown, Spec(600)), KilledBySignal(SIGABRT),
              Eq("Verify failed: false (lib/quorlin/xmlRequestBuilders)\n"));
}

TEST_F(BodyDeathTest, AbortsOnRenewingATokenThatIsNotHolderOfKey) {
  const FakeSamlToken token(kBearer);
  EXPECT_EXIT(RenewSecurityTokenBuilder(token, 600), KilledBySignal(SIGABRT),
              Eq("Verify failed: token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY "
                 "(lib/quorlin/xmlRequestBuilders)\n"));
}

TEST(RenewBody, CarriesLifetimeAndToken) {
  EXPECT_EQ(Text(RenewSecurityTokenBuilder(FakeSamlToken(), 600)),
            "<wst:RequestSecurityToken xmlns:wst=\"" + kWstUri +
                "\"><wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType><wst:RequestType>" +
                kWstUri + "/Renew</wst:RequestType><wst:Lifetime xmlns:wsu=\"" + kWsuUri +
                "\"><wsu:Created>{time}</wsu:Created><wsu:Expires>{time + 600 s}</wsu:Expires></wst:Lifetime>"
                "<wst:RenewTarget>" +
                kToken + "</wst:RenewTarget></wst:RequestSecurityToken>");
}

TEST(ValidateBody, CarriesTheToken) {
  const std::string expected = "<wst:RequestSecurityToken xmlns:wst=\"" + kWstUri + "\"><wst:TokenType>" +
                               kWstUri + "/RSTR/Status</wst:TokenType><wst:RequestType>" + kWstUri +
                               "/Validate</wst:RequestType><wst:ValidateTarget>" + kToken +
                               "</wst:ValidateTarget></wst:RequestSecurityToken>";
  EXPECT_EQ(Text(ValidateSecurityTokenBuilder(FakeSamlToken())), expected);
  EXPECT_EQ(Text(ValidateSecurityTokenBuilder(FakeSamlToken(kBearer))), expected);
}

TEST(InitialSpnegoBody, IsTheIssueBodyWithTheLegBehindItAndAContext) {
  const std::string context = " Context=\"urn:uuid:{uuid 1}\"";
  EXPECT_EQ(Text(boost::make_shared<XMLBodyBuilderInitialSPNego>(kBearer, Spec(600), kLeg)),
            IssueStart("/Bearer", context) + kExchange + kIssueEnd);
  EXPECT_EQ(Text(boost::make_shared<XMLBodyBuilderInitialSPNego>(kHolderOfKey, Spec(600), kLeg)),
            IssueStart("/PublicKey", context) + kUseKey + kExchange + kIssueEnd);
}

TEST(InitialSpnegoBody, HasANewContextOnEachBuild) {
  const XMLBodyBuilderInitialSPNego builder(kBearer, Spec(600), kLeg);
  std::string contexts[2];
  for (std::string& context : contexts) {
    Pelmar::Ref<Pelmar::Xml::ElementNode> element;
    builder.build(element);
    ASSERT_TRUE(element->GetAttribute("Context", context));
  }
  EXPECT_NE(contexts[0], contexts[1]);
}

TEST(InitialSpnegoBody, KeepsCopiesOfItsArguments) {
  boost::shared_ptr<XMLBodyBuilderInitialSPNego> builder;
  {
    const TokenSpec spec = Spec(600);
    const std::vector<unsigned char> leg = kLeg;
    builder = boost::make_shared<XMLBodyBuilderInitialSPNego>(kBearer, spec, leg);
  }
  EXPECT_EQ(Text(builder), IssueStart("/Bearer", " Context=\"urn:uuid:{uuid 1}\"") + kExchange + kIssueEnd);
}

TEST(ContinuedSpnegoBody, IsAResponseInTheServicesContext) {
  EXPECT_EQ(Text(boost::make_shared<XMLBodyBuilderContinuedSPNego>("urn:c<\"", kLeg)),
            "<wst:RequestSecurityTokenResponse Context=\"urn:c&lt;&quot;\">" + kExchange +
                "</wst:RequestSecurityTokenResponse>");
}

}  // namespace
}  // namespace Quorlin
