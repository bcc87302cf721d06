// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the development token service makes of signed requests, as the library sends them and as an attacker
// changes them.

#include "apps/StsRequests.h"
#include "support/GoldenText.h"
#include "support/Pki.h"
#include "support/TokenFactory.h"

#include "devsts/RequestHandler.h"

#include <pelmar/crypto/Digest.h>
#include <quorlin/SamlToken.h>

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "quorlin/RequestBuilderImpl.h"

namespace {

using namespace StsTests;
using namespace TestSupport;

DevSts::TokenIssuer& Issuer() {
  static DevSts::TokenIssuer issuer(DevSts::CertificateAuthority().IssueSigner(), "urn:test:sts");
  return issuer;
}

Identity MakeClient(unsigned keyNumber, long long notAfter = kYear) {
  CertificateSpec spec;
  spec.commonName = "Client";
  spec.keyNumber = keyNumber;
  spec.notAfter = notAfter;
  return MakeSelfSigned(spec);
}

/// The client whose certificate the directory knows.
const Identity& KnownClient() {
  static const Identity client = MakeClient(3);
  return client;
}

const Identity& ExpiredClient() {
  static const Identity client = MakeClient(3, -60);
  return client;
}

DevSts::Directory MakeDirectory() {
  DevSts::User robot;
  robot.name = "robot";
  robot.domain = "example.com";
  robot.password = "oil";
  robot.solution = true;
  for (const Identity& client : {KnownClient(), ExpiredClient()}) {
    robot.certificates.push_back(Pelmar::Crypto::ToHex(client.certificate->GetSha256()));
  }
  return DevSts::Directory({robot});
}

class Handler final {
 public:
  Handler()
      : _handler(DevSts::HandlerOptions(), MakeDirectory(), Issuer(), DevSts::MakeSystemClock(0),
                 DevSts::LogSink()) {}

  /// "issued" and the answer's body in `body`, or the fault: "code: text".
  std::string Handle(const std::string& request, const std::string& action = kIssueAction) {
    body = _handler.HandleRequest(action, kXml, request).body;
    if (body.find("<soapenv:Fault>") == std::string::npos) {
      return "issued";
    }
    const std::string code = CutBetween(body, "<faultcode", "</faultcode>");
    return code.substr(code.rfind('>') + 1) + ": " + CutBetween(body, "<faultstring>", "</faultstring>");
  }

  std::string body;

 private:
  DevSts::RequestHandler _handler;
};

Quorlin::RequestBuilderImpl MakeBuilder(const Identity& client) {
  Quorlin::HolderOfKeyConfig config;
  config.privateKey = client.GetKey();
  config.certificate = client.certificate;
  return Quorlin::RequestBuilderImpl(config);
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return spec;
}

std::string CertificateRequest(const Identity& client = KnownClient()) {
  Quorlin::Request request;
  MakeBuilder(client).BuildCertificateTokenRequest(MakeSpec(), request);
  return request.body;
}

std::string SignedPasswordRequest(const std::string& password, const Quorlin::TokenSpec& spec = MakeSpec()) {
  Quorlin::Request request;
  MakeBuilder(KnownClient()).BuildUserPassTokenRequest("robot@example.com", password, spec, request);
  return request.body;
}

/// The token in an answer.
boost::shared_ptr<Quorlin::SamlToken> ReadToken(const std::string& body) {
  const std::string xml = CutBetween(body, "<wst:RequestedSecurityToken>", "</wst:RequestedSecurityToken>");
  return Quorlin::CreateSamlToken(xml, Issuer().GetCertificate().Get());
}

TEST(MessageSignature, BindsATokenToTheCertificateThatSignedTheRequest) {
  Handler handler;
  ASSERT_EQ(handler.Handle(CertificateRequest()), "issued");
  const auto token = ReadToken(handler.body);
  EXPECT_TRUE(token->GetSubject() == Quorlin::PrincipalId("robot", "example.com"));
  EXPECT_EQ(token->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_HOLDER_OF_KEY);
  EXPECT_EQ(token->GetConfirmationCertificate()->GetSha256(), KnownClient().certificate->GetSha256());
}

TEST(MessageSignature, BindsATokenGotByPasswordToTheKey) {
  Handler handler;
  ASSERT_EQ(handler.Handle(SignedPasswordRequest("oil")), "issued");
  EXPECT_EQ(ReadToken(handler.body)->GetConfirmationCertificate()->GetSha256(),
            KnownClient().certificate->GetSha256());
}

TEST(MessageSignature, StandsInForNoPassword) {
  Handler handler;
  EXPECT_EQ(handler.Handle(SignedPasswordRequest("rust")),
            "wst:FailedAuthentication: Invalid user name or password");
}

TEST(MessageSignature, GivesABearerTokenWhenOneIsAskedFor) {
  Quorlin::TokenSpec spec = MakeSpec();
  spec.confirmation = Quorlin::TokenSpec::CONFIRMATION_BEARER;
  Handler handler;
  ASSERT_EQ(handler.Handle(SignedPasswordRequest("oil", spec)), "issued");
  EXPECT_EQ(ReadToken(handler.body)->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_BEARER);
}

/// The client then asks for a holder-of-key token in a message that it does not sign.
TEST(MessageSignature, IsNotNeededForATokenThatIsDelegated) {
  Quorlin::TokenSpec spec = MakeSpec();
  spec.delegateTo = std::string("robot@example.com");
  Handler handler;
  ASSERT_EQ(handler.Handle(SignedPasswordRequest("oil", spec)), "issued");
  EXPECT_EQ(ReadToken(handler.body)->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_BEARER);
}

TEST(MessageSignature, CountsOnce) {
  Handler handler;
  const std::string request = CertificateRequest();
  EXPECT_EQ(handler.Handle(request), "issued");
  EXPECT_EQ(handler.Handle(request), "wst:FailedAuthentication: The message was sent before");
  const std::string respaced = ReplaceOnce(request, "<ds:SignatureValue>", "<ds:SignatureValue>\n");
  EXPECT_EQ(handler.Handle(respaced), "wst:FailedAuthentication: The message was sent before");
}

TEST(MessageSignature, OfAnUnknownCertificateIsRefused) {
  Handler handler;
  EXPECT_EQ(handler.Handle(CertificateRequest(MakeClient(4))),
            "wst:FailedAuthentication: The certificate belongs to no known user");
}

TEST(MessageSignature, OfAnExpiredCertificateIsRefused) {
  Handler handler;
  EXPECT_EQ(handler.Handle(CertificateRequest(ExpiredClient())),
            "wst:FailedAuthentication: The certificate is not valid now");
}

/// A change to the certificate request, and what the service says to it.
struct Attack {
  const char* name;
  std::string from;
  std::string to;
  const char* verdict;
};

class MessageSignatureAttack : public testing::TestWithParam<Attack> {};

TEST_P(MessageSignatureAttack, IsRefused) {
  Handler handler;
  EXPECT_EQ(handler.Handle(ReplaceOnce(CertificateRequest(), GetParam().from, GetParam().to)),
            GetParam().verdict);
}

constexpr const char* kTampered =
    "wst:FailedAuthentication: The message's signature does not match the message";

const Attack kAttacks[] = {
    {"ChangedBody", "Allow=\"false\"", "Allow=\"true\"", kTampered},
    {"AddedToBody", "</wst:RequestSecurityToken>",
     "<wst:DelegateTo><wsse:UsernameToken xmlns:wsse=\"http://docs.oasis-open.org/wss/2004/01/"
     "oasis-200401-wss-wssecurity-secext-1.0.xsd\"><wsse:Username>robot</wsse:Username></wsse:UsernameToken>"
     "</wst:DelegateTo></wst:RequestSecurityToken>",
     kTampered},
    {"OtherUseKey", "<wst:UseKey Sig=\"holderOfKeyProofSignature\"", "<wst:UseKey Sig=\"other\"", kTampered},
    {"BodyWithoutId", "<soapenv:Body", "<soapenv:Body xmlns:z=\"urn:z\" z:x=\"\"", kTampered},
    {"OtherCertificateReference", "URI=\"#holderOfKeyCertificate\"", "URI=\"#other\"",
     "wst:FailedAuthentication: The message's signature does not refer to the message's certificate"},
    {"CertificateWithoutId", "wsu:Id=\"holderOfKeyCertificate\"", "wsu:Id=\"elsewhere\"",
     "wst:FailedAuthentication: The message's signature does not refer to the message's certificate"},
    {"OtherSignatureMethod", "xmldsig-more#rsa-sha256\"", "xmldsig-more#rsa-sha512\"",
     "wst:FailedAuthentication: The message's signature uses unexpected algorithms"},
    {"OtherElementCovered", "URI=\"#Body", "URI=\"#other",
     "wst:FailedAuthentication: The message's signature covers something else than Body and Timestamp"},
    {"OtherCertificateType", "#X509v3\" wsu:Id", "#PKCS7\" wsu:Id",
     "wsse:InvalidSecurityToken: Only X.509 v3 certificates in base64 are accepted"},
    {"SecondSignature", "</wsse:Security>",
     "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"/></wsse:Security>",
     "soapenv:Client: The security header holds an unknown or repeated Signature"},
};

INSTANTIATE_TEST_SUITE_P(Table, MessageSignatureAttack, testing::ValuesIn(kAttacks),
                         [](const auto& test) { return std::string(test.param.name); });

/// `text` without the part from the first `open` to the end of the next `close`.
std::string CutOut(const std::string& text, const std::string& open, const std::string& close) {
  const std::string inner = CutBetween(text, open, close);
  return ReplaceOnce(text, open + inner + close, "");
}

TEST(MessageSignature, MustBeThereWithACertificate) {
  Handler handler;
  EXPECT_EQ(handler.Handle(CutOut(CertificateRequest(), "<ds:Signature ", "</ds:Signature>")),
            "wsse:InvalidSecurityToken: The message must carry a certificate and be signed with its key");
}

TEST(MessageSignature, MustComeWithACertificate) {
  Handler handler;
  EXPECT_EQ(handler.Handle(
                CutOut(CertificateRequest(), "<wsse:BinarySecurityToken", "</wsse:BinarySecurityToken>")),
            "wsse:InvalidSecurityToken: The message must carry a certificate and be signed with its key");
}

TEST(MessageSignature, OfAnotherKeyThanTheCertificatesIsRefused) {
  const Identity attacker = MakeClient(4);
  Handler handler;
  EXPECT_EQ(
      handler.Handle(ReplaceOnce(CertificateRequest(attacker), Base64Of(attacker), Base64Of(KnownClient()))),
      kTampered);
}

TEST(MessageSignature, WithACertificateThatIsNoneIsRefused) {
  Handler handler;
  EXPECT_EQ(handler.Handle(ReplaceOnce(CertificateRequest(), Base64Of(KnownClient()), "AAAA")),
            "wsse:InvalidSecurityToken: The BinarySecurityToken holds no certificate");
}

TEST(MessageSignature, MustCoverBodyAndTimestamp) {
  Handler handler;
  EXPECT_EQ(handler.Handle(CutOut(CertificateRequest(), "<ds:Reference ", "</ds:Reference>")),
            "wst:FailedAuthentication: The message's signature does not cover Body and Timestamp");
}

TEST(MessageSignature, UsesOneDigestOnly) {
  Handler handler;
  EXPECT_EQ(handler.Handle(ReplaceAll(CertificateRequest(), "xmlenc#sha256\"", "xmlenc#sha512\"")),
            "wst:FailedAuthentication: The message's signature has a reference with unexpected algorithms");
}

/// The Id of a signature is not signed.
TEST(MessageSignature, IsTheOneThatUseKeyNames) {
  Handler handler;
  EXPECT_EQ(
      handler.Handle(ReplaceOnce(CertificateRequest(), " Id=\"holderOfKeyProofSignature\"", " Id=\"x\"")),
      "wst:RequestFailed: UseKey does not name the message's signature");
}

// ---- Tokens that are presented ----

constexpr const char* kRenewAction = "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Renew\"";
constexpr const char* kValidateAction = "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Validate\"";
constexpr const char* kChallengeAction = "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue\"";

boost::shared_ptr<Quorlin::SamlToken> AcquireToken(Handler& handler, const Quorlin::TokenSpec& spec) {
  Quorlin::Request request;
  MakeBuilder(KnownClient()).BuildCertificateTokenRequest(spec, request);
  EXPECT_EQ(handler.Handle(request.body), "issued");
  return ReadToken(handler.body);
}

std::string ExchangeRequest(const Quorlin::SamlToken& token, const Quorlin::TokenSpec& spec = MakeSpec()) {
  Quorlin::Request request;
  MakeBuilder(KnownClient()).BuildExchangeTokenRequest(token, spec, request);
  return request.body;
}

std::string RenewRequest(const Quorlin::SamlToken& token, const Identity& client = KnownClient()) {
  Quorlin::Request request;
  MakeBuilder(client).BuildRenewRequest(token, 600, request);
  return request.body;
}

TEST(PresentedToken, IsExchangedWithProofOfItsKeyOnly) {
  Handler handler;
  const auto token = AcquireToken(handler, MakeSpec());
  const std::string request = ExchangeRequest(*token);
  const std::size_t start = request.rfind("<ds:Signature ");
  const std::string close = "</ds:Signature>";
  const std::string isUnsigned =
      request.substr(0, start) + request.substr(request.rfind(close) + close.size());
  EXPECT_EQ(handler.Handle(isUnsigned),
            "wst:FailedAuthentication: The message must be signed with the key that the token is bound to");
  EXPECT_EQ(handler.Handle(ReplaceOnce(request, "saml-token-profile-1.1#SAMLID", "saml-token-profile-1.1#X")),
            "wst:FailedAuthentication: The message's signature does not refer to the message's assertion");
  EXPECT_EQ(handler.Handle(request), "issued");
  EXPECT_EQ(handler.Handle(request), "wst:FailedAuthentication: The message was sent before");
}

TEST(PresentedToken, StandsAlone) {
  Handler handler;
  const auto token = AcquireToken(handler, MakeSpec());
  EXPECT_EQ(
      handler.Handle(ReplaceOnce(ExchangeRequest(*token), "</wsse:Security>",
                                 "<wsse:UsernameToken><wsse:Username>robot</wsse:Username><wsse:Password "
                                 "Type=\"http://docs.oasis-open.org/wss/2004/01/"
                                 "oasis-200401-wss-username-token-profile-1.0#PasswordText\">oil"
                                 "</wsse:Password></wsse:UsernameToken></wsse:Security>")),
      "wsse:InvalidSecurityToken: The security header holds several credentials");
}

TEST(PresentedToken, MustBeAsTheServiceSignedIt) {
  Handler handler;
  const auto token = AcquireToken(handler, MakeSpec());
  EXPECT_EQ(
      handler.Handle(ReplaceOnce(ExchangeRequest(*token), ">robot@example.com<", ">admin@example.com<")),
      "wsse:InvalidSecurityToken: The token was changed");
  const std::string uri = "<ds:Reference URI=\"#" + token->GetId() + "\"";
  EXPECT_EQ(handler.Handle(ReplaceOnce(ExchangeRequest(*token), uri, "<ds:Reference URI=\"\"")),
            "wsse:InvalidSecurityToken: The token's signature does not cover it");
}

TEST(PresentedToken, GivesNoWiderAudienceAndNoFurtherDelegation) {
  Handler handler;
  Quorlin::TokenSpec narrow = MakeSpec();
  narrow.audienceRestriction = {"urn:one"};
  const auto token = AcquireToken(handler, narrow);
  Quorlin::TokenSpec wide = MakeSpec();
  wide.audienceRestriction = {"urn:two"};
  EXPECT_EQ(handler.Handle(ExchangeRequest(*token, wide)),
            "wst:RequestFailed: The audience is wider than that of the presented token");
  Quorlin::TokenSpec delegated = MakeSpec();
  delegated.delegateTo = std::string("robot@example.com");
  EXPECT_EQ(handler.Handle(ExchangeRequest(*token, delegated)),
            "wst:RequestFailed: The identity may not be delegated any further");
}

TEST(PresentedToken, IsRenewedWhenItIsRenewableAndGood) {
  Handler handler;
  EXPECT_EQ(handler.Handle(RenewRequest(*AcquireToken(handler, MakeSpec())), kRenewAction),
            "wst:RequestFailed: The token may not be renewed");
  Quorlin::TokenSpec renewable = MakeSpec();
  renewable.renewable = true;
  const auto token = AcquireToken(handler, renewable);
  EXPECT_EQ(handler.Handle(RenewRequest(*token, MakeClient(4)), kRenewAction),
            "wst:InvalidSecurityToken: The token is not bound to the key that signed the message");
  const std::string request = RenewRequest(*token);
  EXPECT_EQ(handler.Handle(request, kRenewAction), "issued");
  EXPECT_EQ(handler.Handle(request, kRenewAction), "wst:FailedAuthentication: The message was sent before");
}

TEST(PresentedToken, MustBeThereToBeWorkedOn) {
  Handler handler;
  const std::string trust = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
  const std::string now = DevSts::ToDateText(DevSts::MakeSystemClock(0)());
  const std::string soon = DevSts::ToDateText(DevSts::MakeSystemClock(60)());
  const std::string timestamp = "<wsu:Timestamp><wsu:Created>" + now + "</wsu:Created><wsu:Expires>" + soon +
                                "</wsu:Expires></wsu:Timestamp>";
  EXPECT_EQ(handler.Handle(Envelope(timestamp, "<wst:RequestSecurityToken><wst:TokenType>" + trust +
                                                   "/RSTR/Status</wst:TokenType><wst:RequestType>" + trust +
                                                   "/Validate</wst:RequestType></wst:RequestSecurityToken>"),
                           kValidateAction),
            "soapenv:Client: The request names no token to work on");
  EXPECT_EQ(handler.Handle(Envelope(timestamp, "<wst:RequestSecurityToken/>"), kChallengeAction),
            "soapenv:Client: The body must hold a RequestSecurityTokenResponse");
}

/// The signed Body is moved out of the way, and another one put into its place.
std::string WrapBody(const std::string& request, const std::string& newBodyTag) {
  const std::string open = "<soapenv:Body ";
  const std::string body = open + CutBetween(request, open, "</soapenv:Body>") + "</soapenv:Body>";
  const std::string content = body.substr(body.find('>') + 1);
  const std::string evil = newBodyTag + ReplaceOnce(content, "Allow=\"false\"", "Allow=\"true\"");
  return ReplaceOnce(ReplaceOnce(request, body, evil), "</soapenv:Header>",
                     "<x>" + body + "</x></soapenv:Header>");
}

TEST(MessageSignature, CoversTheBodyThatIsReadAndNoOther) {
  Handler handler;
  EXPECT_EQ(handler.Handle(
                WrapBody(CertificateRequest(),
                         "<soapenv:Body xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\">")),
            "wst:FailedAuthentication: The message's signature does not cover Body");
}

TEST(MessageSignature, CoversNoBodyOfTheSameId) {
  Handler handler;
  const std::string request = CertificateRequest();
  const std::string tag = "<soapenv:Body " + CutBetween(request, "<soapenv:Body ", ">") + ">";
  EXPECT_EQ(
      MaskVolatile(handler.Handle(WrapBody(request, tag))),
      "wst:FailedAuthentication: The message's signature cannot be verified: Reference '#Body{uuid 1}' is "
      "ambiguous: several elements have this ID");
}

}  // namespace
