// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The library against the development token service, over real TLS on loopback.

#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"

#include "devsts/Service.h"

#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <typeinfo>
#include <utility>
#include <vector>

namespace {

using Quorlin::SamlToken;
using TokenPointer = boost::shared_ptr<const SamlToken>;

constexpr const char* kAlice = "alice@example.com";
constexpr const char* kPassword = "secret";

/// How a client of `service` is set up. What a test wants to be wrong, it changes.
Quorlin::SecurityTokenServiceConfig MakeConfig(const std::string& url, const std::string& caPem,
                                               const std::string& signerPem) {
  Pelmar::Ssl::SSLContextOptions options;
  options.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(caPem);
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(signerPem);
  return config;
}

Quorlin::SecurityTokenServiceConfig MakeConfig(const DevSts::Service& service) {
  return MakeConfig(service.GetUrl(), service.GetCaCertificate(), service.GetSigningCertificate());
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return spec;
}

TokenPointer Acquire(const Quorlin::SecurityTokenServiceConfig& config,
                     const std::string& password = kPassword, const Quorlin::TokenSpec& spec = MakeSpec()) {
  return Quorlin::CreateSecurityTokenService(config)->AcquireToken(kAlice, password, spec);
}

/// "Class: message" of what acquiring with `config` throws, or "token".
std::string Fail(const Quorlin::SecurityTokenServiceConfig& config, const std::string& password = kPassword) {
  try {
    Acquire(config, password);
    return "token";
  } catch (const Quorlin::InvalidCredentialsException& e) {
    return std::string("InvalidCredentialsException: ") + e.what();
  } catch (const Quorlin::InvalidSignatureException& e) {
    return std::string("InvalidSignatureException: ") + e.what();
  } catch (const Quorlin::CommunicationException& e) {
    return std::string("CommunicationException: ") + e.what();
  } catch (const Quorlin::SsoException& e) {
    return (typeid(e) == typeid(Quorlin::SsoException) ? "SsoException: " : "another SsoException: ") +
           std::string(e.what());
  }
}

/// The service that most tests share.
DevSts::Service& SharedService() {
  static DevSts::Service service{DevSts::ServiceConfig()};
  return service;
}

TEST(EndToEnd, GetsATokenForTheRightPassword) {
  const TokenPointer token = Acquire(MakeConfig(SharedService()));
  ASSERT_NE(token, nullptr);
  EXPECT_TRUE(token->GetSubject() == Quorlin::PrincipalId("alice", "example.com"));
  EXPECT_EQ(token->GetEndDate().GetUtcTime() - token->GetStartDate().GetUtcTime(), 600LL * 1000000);
  EXPECT_EQ(token->GetConfirmationMethod(), SamlToken::CONFIRM_BEARER);
  EXPECT_EQ(token->GetConfirmationCertificate(), nullptr);
  EXPECT_FALSE(token->IsRenewable());
  EXPECT_FALSE(token->IsDelegable());
  EXPECT_FALSE(token->IsSolution());
  std::pair<std::string, std::string> fullName;
  token->GetFullName(fullName);
  EXPECT_EQ(fullName, (std::pair<std::string, std::string>("Alice", "Example")));
  std::vector<Quorlin::PrincipalId> groups;
  token->GetGroups(groups);
  ASSERT_EQ(groups.size(), 2U);
  EXPECT_TRUE(groups[0] == Quorlin::PrincipalId("Administrators", "example.com"));
  EXPECT_TRUE(groups[1] == Quorlin::PrincipalId("Staff", "example.com"));
}

TEST(EndToEnd, GetsEverythingThatASpecCanAskFor) {
  Quorlin::TokenSpec spec = MakeSpec();
  spec.renewable = true;
  spec.delegable = true;
  spec.delegateTo = std::string("bob@example.com");
  spec.audienceRestriction = {"urn:one", "urn:two & <three>"};
  spec.advice = {{"urn:source \"quoted\"",
                  {{"color",
                    {"red",
                     "gr\xC3\xBC"
                     "n"}},
                   {"none", {}}}}};
  const TokenPointer token = Acquire(MakeConfig(SharedService()), kPassword, spec);
  ASSERT_NE(token, nullptr);
  EXPECT_TRUE(token->IsRenewable());
  EXPECT_TRUE(token->IsDelegable());
  std::set<std::string> audience;
  token->GetAudience(audience);
  EXPECT_EQ(audience, spec.audienceRestriction);
  std::vector<Quorlin::Delegate> chain;
  token->GetDelegationChain(chain);
  ASSERT_EQ(chain.size(), 1U);
  EXPECT_TRUE(chain[0].principal == Quorlin::PrincipalId("bob", "example.com"));
  std::vector<Quorlin::Advice> advice;
  token->GetAdvice(advice);
  ASSERT_EQ(advice.size(), 1U);
  EXPECT_EQ(advice[0].source, spec.advice[0].source);
  ASSERT_EQ(advice[0].attributes.size(), 2U);
  EXPECT_EQ(advice[0].attributes[0].name, "color");
  EXPECT_EQ(advice[0].attributes[0].values, spec.advice[0].attributes[0].values);
  EXPECT_EQ(advice[0].attributes[1].name, "none");
  EXPECT_TRUE(advice[0].attributes[1].values.empty());
}

TEST(EndToEnd, GetsATokenForAServiceAccount) {
  const boost::shared_ptr<Quorlin::SecurityTokenService> client =
      Quorlin::CreateSecurityTokenService(MakeConfig(SharedService()));
  EXPECT_TRUE(client->AcquireToken("backup-service@example.com", "tape", MakeSpec())->IsSolution());
}

TEST(EndToEnd, AcceptsATokenWhoseSignersAuthorityIsTrusted) {
  Quorlin::SecurityTokenServiceConfig config = MakeConfig(SharedService());
  config.trustedStsCertificates =
      Pelmar::Crypto::CreateCertificatesFromPem(SharedService().GetCaCertificate());
  EXPECT_EQ(Fail(config), "token");
}

TEST(EndToEnd, TheTokensTextStandsOnItsOwn) {
  const TokenPointer token = Acquire(MakeConfig(SharedService()));
  const Pelmar::Ref<const Pelmar::Crypto::Certificate> signer =
      Pelmar::Crypto::CreateCertificateFromPem(SharedService().GetSigningCertificate());
  EXPECT_EQ(Quorlin::CreateSamlToken(token->ToXml(), signer.Get())->GetId(), token->GetId());
}

TEST(EndToEnd, WorksOverPlainHttp) {
  DevSts::ServiceConfig plain;
  plain.tls = false;
  const DevSts::Service service(plain);
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = service.GetUrl();
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(service.GetSigningCertificate());
  EXPECT_EQ(config.stsUrl.substr(0, 17), "http://127.0.0.1:");
  EXPECT_EQ(Fail(config), "token");
}

TEST(EndToEnd, WorksOverIpv6) {
  DevSts::ServiceConfig ipv6;
  ipv6.address = "::1";
  const DevSts::Service service(ipv6);
  EXPECT_EQ(Fail(MakeConfig(service)), "token");
}

TEST(EndToEnd, ReportsAWrongPassword) {
  EXPECT_EQ(Fail(MakeConfig(SharedService()), "guess"),
            "InvalidCredentialsException: Authentication failed: Invalid user name or password");
}

TEST(EndToEnd, RefusesAServerOfAnUnknownAuthority) {
  Quorlin::SecurityTokenServiceConfig config =
      MakeConfig(SharedService().GetUrl(), TestSupport::MakeCa().GetCertificatePem(),
                 SharedService().GetSigningCertificate());
  EXPECT_EQ(
      Fail(config),
      "CommunicationException: Certificate of 127.0.0.1 is not trusted: issuer CN=Quorlin development CA");
}

TEST(EndToEnd, RefusesAServerOfAnotherName) {
  DevSts::ServiceConfig other;
  other.serverNames = {"sts.example.com"};
  const DevSts::Service service(other);
  EXPECT_EQ(
      Fail(MakeConfig(service)),
      "CommunicationException: Certificate of 127.0.0.1 does not match the name: it is for sts.example.com");
}

TEST(EndToEnd, RefusesATokenOfAnotherSigner) {
  DevSts::CertificateAuthority another;
  Quorlin::SecurityTokenServiceConfig config = MakeConfig(
      SharedService().GetUrl(), SharedService().GetCaCertificate(), another.IssueSigner().certificate);
  EXPECT_EQ(Fail(config),
            "InvalidSignatureException: Signature verification error. Certificate chain is not trusted: "
            "self-signed certificate in certificate chain (CN=Quorlin development CA)");
}

TEST(EndToEnd, RefusesATokenThatHasExpired) {
  DevSts::ServiceConfig late;
  late.clockOffsetSec = -120;
  late.handler.lifetime.maxSec = 60;
  const DevSts::Service service(late);
  const std::string failure = Fail(MakeConfig(service));
  EXPECT_EQ(failure.substr(0, failure.rfind(' ')), "SsoException: The token has expired at:");
}

TEST(EndToEnd, RefusesATokenThatIsNotValidYet) {
  DevSts::ServiceConfig early;
  early.clockOffsetSec = 120;
  const DevSts::Service service(early);
  const std::string failure = Fail(MakeConfig(service));
  EXPECT_EQ(failure.substr(0, failure.rfind(' ')), "SsoException: Token start date is in the future:");
}

TEST(EndToEnd, ReportsClocksThatDifferTooMuch) {
  DevSts::ServiceConfig late;
  late.clockOffsetSec = -3600;
  const DevSts::Service service(late);
  EXPECT_EQ(Fail(MakeConfig(service)),
            "SsoException: Unexpected SOAP fault: wst:RequestFailed; request failed.");
}

TEST(EndToEnd, ReportsAServiceThatIsDown) {
  const TestSupport::ClosedPort port;
  Quorlin::SecurityTokenServiceConfig config = MakeConfig(SharedService());
  config.stsUrl = "https://127.0.0.1:" + std::to_string(port.GetPort()) + "/sts";
  EXPECT_EQ(Fail(config),
            "CommunicationException: Connection refused by 127.0.0.1:" + std::to_string(port.GetPort()));
}

TEST(EndToEnd, ReportsAServiceThatWasStopped) {
  DevSts::Service service{DevSts::ServiceConfig()};
  const Quorlin::SecurityTokenServiceConfig config = MakeConfig(service);
  EXPECT_EQ(Fail(config), "token");
  service.Stop();
  EXPECT_EQ(Fail(config).substr(0, 24), "CommunicationException: ");
}

/// A service over plain HTTP that gives this answer.
std::string FailOnAnswer(const std::string& answer) {
  const TestSupport::LoopbackServer server({TestSupport::AnswerEach({answer})});
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = "http://" + server.GetEndpoint() + "/sts";
  return Fail(config);
}

TEST(EndToEnd, ReportsAnAnswerThatIsNotXml) {
  EXPECT_EQ(FailOnAnswer(TestSupport::HttpAnswer("200 OK", "<html><p>Hello</html>")),
            "SsoException: Response is not well-formed XML: mismatched tag at line 1, column 17");
}

TEST(EndToEnd, ReportsAnAnswerThatIsNotSoap) {
  EXPECT_EQ(FailOnAnswer(TestSupport::HttpAnswer("200 OK", "<html><p>Hello</p></html>")),
            "SsoException: Unexpected response format: missing SAOP Body.");
}

TEST(EndToEnd, ReportsAnErrorStatus) {
  EXPECT_EQ(FailOnAnswer(TestSupport::HttpAnswer("503 Service Unavailable", "later")),
            "CommunicationException: Server returned error: 503 Service Unavailable");
}

TEST(EndToEnd, ReportsAnotherPathOfTheServer) {
  Quorlin::SecurityTokenServiceConfig config = MakeConfig(SharedService());
  config.stsUrl += "/more";
  EXPECT_EQ(Fail(config), "CommunicationException: Server returned error: 404 Not Found");
}

TEST(EndToEnd, SeveralServicesRunSideBySide) {
  const DevSts::Service first{DevSts::ServiceConfig()};
  const DevSts::Service second{DevSts::ServiceConfig()};
  EXPECT_EQ(Fail(MakeConfig(first)), "token");
  EXPECT_EQ(Fail(MakeConfig(second)), "token");
}

}  // namespace
