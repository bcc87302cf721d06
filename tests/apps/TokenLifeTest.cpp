// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What becomes of tokens after they were issued: exchange, renewal, validation. The library against the
// development token service, over real TLS on loopback.

#include "support/GoldenText.h"
#include "support/Pki.h"

#include "devsts/Service.h"

#include <pelmar/crypto/Digest.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace {

using namespace TestSupport;
using Quorlin::SamlToken;
using TokenPointer = boost::shared_ptr<const SamlToken>;
using ServicePointer = boost::shared_ptr<Quorlin::SecurityTokenService>;

const Identity& Client() {
  static const Identity client = [] {
    CertificateSpec spec;
    spec.keyNumber = 3;
    return MakeSelfSigned(spec);
  }();
  return client;
}

const Identity& OtherClient() {
  static const Identity client = [] {
    CertificateSpec spec;
    spec.keyNumber = 4;
    return MakeSelfSigned(spec);
  }();
  return client;
}

DevSts::User MakeUser(const std::string& name) {
  DevSts::User user;
  user.name = name;
  user.domain = "example.com";
  user.password = "secret";
  return user;
}

/// Robot, who has the client's certificate, and some others.
std::vector<DevSts::User> MakeUsers() {
  DevSts::User robot = MakeUser("robot");
  robot.certificates = {Pelmar::Crypto::ToHex(Client().certificate->GetSha256())};
  robot.groups = {{"Machines", "example.com", DevSts::GroupForm::BACKSLASH}};
  return {robot, MakeUser("ann"), MakeUser("ben")};
}

std::unique_ptr<DevSts::Service> StartService(long long clockOffsetSec = 0,
                                              const DevSts::Identity* signer = nullptr) {
  DevSts::ServiceConfig config;
  config.directory = DevSts::Directory(MakeUsers());
  config.clockOffsetSec = clockOffsetSec;
  if (signer != nullptr) {
    config.signer = *signer;
  }
  return std::make_unique<DevSts::Service>(config);
}

DevSts::Service& Shared() {
  static const std::unique_ptr<DevSts::Service> service = StartService();
  return *service;
}

/// A client of `service` with the key of `identity`, or without one.
ServicePointer Connect(const DevSts::Service& service, const Identity* identity = &Client()) {
  Pelmar::Ssl::SSLContextOptions options;
  options.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(service.GetCaCertificate());
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = service.GetUrl();
  config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(service.GetSigningCertificate());
  if (identity != nullptr) {
    Quorlin::HolderOfKeyConfig holder;
    holder.privateKey = identity->GetKey();
    holder.certificate = identity->certificate;
    config.holderOfKeyConfig = holder;
  }
  return Quorlin::CreateSecurityTokenService(config);
}

Quorlin::TokenSpec MakeSpec(long long lifetimeSec = 600) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = lifetimeSec;
  return spec;
}

Quorlin::TokenSpec RichSpec() {
  Quorlin::TokenSpec spec = MakeSpec();
  spec.renewable = true;
  spec.delegable = true;
  spec.audienceRestriction = {"urn:one", "urn:two"};
  return spec;
}

std::string Describe(const std::vector<Quorlin::PrincipalId>& principals) {
  std::string text;
  for (const Quorlin::PrincipalId& principal : principals) {
    text += principal.name + "@" + principal.domain + ";";
  }
  return text;
}

std::string DelegatesOf(const SamlToken& token) {
  std::vector<Quorlin::Delegate> chain;
  token.GetDelegationChain(chain);
  std::vector<Quorlin::PrincipalId> principals;
  for (const Quorlin::Delegate& link : chain) {
    principals.push_back(link.principal);
  }
  return Describe(principals);
}

std::set<std::string> AudienceOf(const SamlToken& token) {
  std::set<std::string> audience;
  token.GetAudience(audience);
  return audience;
}

/// The message of the SsoException that `action` throws.
std::string Fail(const std::function<void()>& action) {
  try {
    action();
    return "nothing";
  } catch (const Quorlin::SsoException& e) {
    return e.what();
  }
}

constexpr const char* kFailed = "Unexpected SOAP fault: wst:RequestFailed; request failed.";

TEST(Exchange, GivesATokenBoundToTheSameKey) {
  const ServicePointer client = Connect(Shared());
  const TokenPointer first = client->AcquireTokenByCertificate(RichSpec());
  const TokenPointer second = client->AcquireTokenByToken(*first, MakeSpec());
  EXPECT_NE(second->GetId(), first->GetId());
  EXPECT_TRUE(second->GetSubject() == first->GetSubject());
  EXPECT_EQ(second->GetConfirmationMethod(), SamlToken::CONFIRM_HOLDER_OF_KEY);
  EXPECT_EQ(second->GetConfirmationCertificate()->GetSha256(), Client().certificate->GetSha256());
  EXPECT_EQ(AudienceOf(*second), AudienceOf(*first));
  std::vector<Quorlin::PrincipalId> groups;
  second->GetGroups(groups);
  EXPECT_EQ(Describe(groups), "Machines@example.com;");
}

TEST(Exchange, NeverOutlivesThePresentedToken) {
  const ServicePointer client = Connect(Shared());
  const TokenPointer first = client->AcquireTokenByCertificate(MakeSpec(60));
  EXPECT_EQ(client->AcquireTokenByToken(*first, MakeSpec(3600))->GetEndDate().GetUtcTime(),
            first->GetEndDate().GetUtcTime());
}

TEST(Exchange, NeverGivesMoreThanThePresentedToken) {
  const ServicePointer client = Connect(Shared());
  const TokenPointer first = client->AcquireTokenByCertificate(MakeSpec());
  const TokenPointer second = client->AcquireTokenByToken(*first, RichSpec());
  EXPECT_FALSE(second->IsRenewable());
  EXPECT_FALSE(second->IsDelegable());
}

TEST(Exchange, NarrowsTheAudienceAndNeverWidensIt) {
  const ServicePointer client = Connect(Shared());
  const TokenPointer first = client->AcquireTokenByCertificate(RichSpec());
  Quorlin::TokenSpec spec = MakeSpec();
  spec.audienceRestriction = {"urn:two"};
  EXPECT_EQ(AudienceOf(*client->AcquireTokenByToken(*first, spec)), spec.audienceRestriction);
  spec.audienceRestriction = {"urn:two", "urn:three"};
  EXPECT_EQ(Fail([&] { client->AcquireTokenByToken(*first, spec); }), kFailed);
}

TEST(Exchange, DelegatesAlongAChain) {
  const ServicePointer client = Connect(Shared());
  const TokenPointer first = client->AcquireTokenByCertificate(RichSpec());
  Quorlin::TokenSpec spec = RichSpec();
  spec.delegateTo = std::string("ann@example.com");
  const TokenPointer second = client->AcquireTokenByToken(*first, spec);
  EXPECT_EQ(DelegatesOf(*second), "ann@example.com;");
  EXPECT_EQ(second->GetConfirmationMethod(), SamlToken::CONFIRM_BEARER);
  spec.delegateTo = std::string("ben@example.com");
  spec.delegable = false;
  const TokenPointer third = client->AcquireTokenByToken(*second, spec);
  EXPECT_EQ(DelegatesOf(*third), "ann@example.com;ben@example.com;");
  EXPECT_TRUE(third->GetSubject() == Quorlin::PrincipalId("robot", "example.com"));
  EXPECT_EQ(Fail([&] { client->AcquireTokenByToken(*third, spec); }), kFailed);
}

TEST(Exchange, CountsDelegationsDown) {
  const ServicePointer client = Connect(Shared());
  Quorlin::TokenSpec spec = RichSpec();
  spec.delegateTo = std::string("ann@example.com");
  TokenPointer token = client->AcquireTokenByToken(*client->AcquireTokenByCertificate(RichSpec()), spec);
  for (int i = 2; i <= 10; ++i) {
    EXPECT_TRUE(token->IsDelegable()) << i;
    token = client->AcquireTokenByToken(*token, spec);
  }
  EXPECT_FALSE(token->IsDelegable());
  EXPECT_EQ(Fail([&] { client->AcquireTokenByToken(*token, spec); }), kFailed);
}

TEST(Exchange, OfABoundTokenNeedsItsKey) {
  const TokenPointer token = Connect(Shared())->AcquireTokenByCertificate(MakeSpec());
  EXPECT_EQ(Fail([&] { Connect(Shared(), &OtherClient())->AcquireTokenByToken(*token, MakeSpec()); }),
            "Authentication failed: The message's signature does not match the message");
}

TEST(Exchange, OfABearerTokenGivesABearerTokenOnly) {
  const TokenPointer token =
      Connect(Shared(), nullptr)->AcquireToken("ann@example.com", "secret", MakeSpec());
  const ServicePointer client = Connect(Shared());
  Quorlin::TokenSpec spec = MakeSpec();
  EXPECT_EQ(Fail([&] { client->AcquireTokenByToken(*token, spec); }), kFailed);
  spec.confirmation = Quorlin::TokenSpec::CONFIRMATION_BEARER;
  EXPECT_TRUE(client->AcquireTokenByToken(*token, spec)->GetSubject() == token->GetSubject());
}

TEST(Exchange, OfATokenOfAnotherServiceIsRefused) {
  const std::unique_ptr<DevSts::Service> other = StartService();
  const TokenPointer token = Connect(*other)->AcquireTokenByCertificate(MakeSpec());
  const std::string failure = Fail([&] { Connect(Shared())->AcquireTokenByToken(*token, MakeSpec()); });
  const std::string expected = "Authentication failed: The token is none of this service: ";
  EXPECT_EQ(failure.substr(0, expected.size()), expected);
}

/// Two services share a key; the clock of the second is ahead, so that to it the token has ended.
TEST(Exchange, OfAnExpiredTokenIsRefused) {
  const DevSts::Identity signer = DevSts::CertificateAuthority().IssueSigner();
  const std::unique_ptr<DevSts::Service> now = StartService(0, &signer);
  const std::unique_ptr<DevSts::Service> later = StartService(120, &signer);
  const TokenPointer token = Connect(*now)->AcquireTokenByCertificate(MakeSpec(60));
  EXPECT_EQ(Fail([&] { Connect(*later)->AcquireTokenByToken(*token, MakeSpec()); }),
            "Authentication failed: The token is not valid now");
}

TEST(Renewal, GivesANewLifetimeAndKeepsTheRest) {
  const ServicePointer client = Connect(Shared());
  Quorlin::TokenSpec spec = RichSpec();
  spec.advice = {{"urn:source", {{"name", {"one", "two"}}}}};
  const TokenPointer token = client->AcquireTokenByCertificate(spec);
  const TokenPointer renewed = client->RenewToken(*token, 7200);
  EXPECT_NE(renewed->GetId(), token->GetId());
  EXPECT_EQ(renewed->GetEndDate().GetUtcTime() - renewed->GetStartDate().GetUtcTime(), 7200LL * 1000000);
  EXPECT_TRUE(renewed->GetSubject() == token->GetSubject());
  EXPECT_TRUE(renewed->IsRenewable());
  EXPECT_TRUE(renewed->IsDelegable());
  EXPECT_EQ(AudienceOf(*renewed), spec.audienceRestriction);
  EXPECT_EQ(renewed->GetConfirmationCertificate()->GetSha256(), Client().certificate->GetSha256());
  std::vector<Quorlin::PrincipalId> groups;
  renewed->GetGroups(groups);
  EXPECT_EQ(Describe(groups), "Machines@example.com;");
  std::vector<Quorlin::Advice> advice;
  renewed->GetAdvice(advice);
  ASSERT_EQ(advice.size(), 1U);
  EXPECT_EQ(advice[0].attributes.at(0).values, spec.advice[0].attributes[0].values);
}

TEST(Renewal, CountsDown) {
  const ServicePointer client = Connect(Shared());
  TokenPointer token = client->AcquireTokenByCertificate(RichSpec());
  for (int i = 1; i <= 10; ++i) {
    EXPECT_TRUE(token->IsRenewable()) << i;
    token = client->RenewToken(*token, 600);
  }
  EXPECT_FALSE(token->IsRenewable());
  EXPECT_EQ(Fail([&] { client->RenewToken(*token, 600); }), kFailed);
}

TEST(Renewal, OfATokenThatIsNotRenewableIsRefused) {
  const ServicePointer client = Connect(Shared());
  const TokenPointer token = client->AcquireTokenByCertificate(MakeSpec());
  EXPECT_EQ(Fail([&] { client->RenewToken(*token, 600); }), kFailed);
}

TEST(Renewal, NeedsTheKeyThatTheTokenIsBoundTo) {
  const TokenPointer token = Connect(Shared())->AcquireTokenByCertificate(RichSpec());
  EXPECT_EQ(Fail([&] { Connect(Shared(), &OtherClient())->RenewToken(*token, 600); }),
            "Authentication failed: The token is not bound to the key that signed the message");
}

TEST(Renewal, OfAnExpiredTokenIsRefused) {
  const DevSts::Identity signer = DevSts::CertificateAuthority().IssueSigner();
  const std::unique_ptr<DevSts::Service> now = StartService(0, &signer);
  const std::unique_ptr<DevSts::Service> later = StartService(120, &signer);
  Quorlin::TokenSpec spec = RichSpec();
  spec.tokenLifetimeSec = 60;
  const TokenPointer token = Connect(*now)->AcquireTokenByCertificate(spec);
  EXPECT_EQ(Fail([&] { Connect(*later)->RenewToken(*token, 600); }),
            "Authentication failed: The token is not valid now");
}

TEST(Validation, TellsWhetherTheSubjectIsStillKnown) {
  const std::unique_ptr<DevSts::Service> service = StartService();
  const ServicePointer client = Connect(*service, nullptr);
  const TokenPointer token = client->AcquireToken("ann@example.com", "secret", RichSpec());
  EXPECT_TRUE(client->ValidateSubject(*token));
  service->SetDirectory(DevSts::Directory({MakeUser("ben")}));
  EXPECT_FALSE(client->ValidateSubject(*token));
  service->SetDirectory(DevSts::Directory(MakeUsers()));
  EXPECT_TRUE(client->ValidateSubject(*token));
}

TEST(Validation, OfATokenOfAnotherServiceSaysNo) {
  const std::unique_ptr<DevSts::Service> other = StartService();
  const TokenPointer token = Connect(*other, nullptr)->AcquireToken("ann@example.com", "secret", MakeSpec());
  EXPECT_FALSE(Connect(Shared(), nullptr)->ValidateSubject(*token));
}

TEST(Validation, OfAnExpiredTokenSaysNo) {
  const DevSts::Identity signer = DevSts::CertificateAuthority().IssueSigner();
  const std::unique_ptr<DevSts::Service> now = StartService(0, &signer);
  const std::unique_ptr<DevSts::Service> later = StartService(120, &signer);
  const TokenPointer token = Connect(*now, nullptr)->AcquireToken("ann@example.com", "secret", MakeSpec(60));
  EXPECT_FALSE(Connect(*later, nullptr)->ValidateSubject(*token));
}

TEST(Exchange, AndRenewalEndWhenTheSubjectIsForgotten) {
  const std::unique_ptr<DevSts::Service> service = StartService();
  const ServicePointer client = Connect(*service);
  const TokenPointer token = client->AcquireTokenByCertificate(RichSpec());
  service->SetDirectory(DevSts::Directory({MakeUser("ben")}));
  EXPECT_EQ(Fail([&] { client->AcquireTokenByToken(*token, MakeSpec()); }),
            "Authentication failed: The token's subject is not known");
  EXPECT_EQ(Fail([&] { client->RenewToken(*token, 600); }),
            "Authentication failed: The token's subject is not known");
}

}  // namespace
