// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The library negotiates with the development token service, over real TLS on loopback.

#include "support/Pki.h"
#include "support/RecordingLogSink.h"

#include "devsts/Service.h"
#include "devsts/ToyNegotiation.h"
#include "quorlin/ToyNegotiationHandler.h"

#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace {

using namespace TestSupport;
using Cli::ToyNegotiationHandler;
using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;

constexpr const char* kAlice = "alice@example.com";

DevSts::ToyOptions Legs(unsigned legs, bool provesBack = true) {
  DevSts::ToyOptions options;
  options.legs = legs;
  options.provesBack = provesBack;
  return options;
}

std::unique_ptr<DevSts::Service> StartService(const DevSts::ToyOptions& options) {
  DevSts::ServiceConfig config;
  config.handler.negotiation =
      std::make_shared<DevSts::ToyMechanism>(options, config.directory, DevSts::MakeSystemClock(0));
  return std::make_unique<DevSts::Service>(config);
}

const DevSts::Service& Shared() {
  static const std::unique_ptr<DevSts::Service> service = StartService(Legs(3));
  return *service;
}

Quorlin::SecurityTokenServiceConfig MakeConfig(const DevSts::Service& service) {
  Pelmar::Ssl::SSLContextOptions options;
  options.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(service.GetCaCertificate());
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = service.GetUrl();
  config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(service.GetSigningCertificate());
  return config;
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return spec;
}

TEST(NegotiationEndToEnd, GetsATokenInSeveralLegs) {
  ToyNegotiationHandler handler(Legs(3), kAlice, "secret");
  const TokenPointer token =
      Quorlin::CreateSecurityTokenService(MakeConfig(Shared()))->AcquireTokenByGSS(MakeSpec(), handler);
  EXPECT_TRUE(token->GetSubject() == Quorlin::PrincipalId("alice", "example.com"));
}

TEST(NegotiationEndToEnd, GetsATokenInOneLegWithoutAProofOfTheService) {
  const std::unique_ptr<DevSts::Service> service = StartService(Legs(1, false));
  ToyNegotiationHandler handler(Legs(1, false), kAlice, "secret");
  const TokenPointer token =
      Quorlin::CreateSecurityTokenService(MakeConfig(*service))->AcquireTokenByGSS(MakeSpec(), handler);
  EXPECT_TRUE(token->GetSubject() == Quorlin::PrincipalId("alice", "example.com"));
}

TEST(NegotiationEndToEnd, GetsATokenBoundToAKey) {
  CertificateSpec spec;
  spec.keyNumber = 3;
  const Identity identity = MakeSelfSigned(spec);
  Quorlin::SecurityTokenServiceConfig config = MakeConfig(Shared());
  Quorlin::HolderOfKeyConfig holder;
  holder.privateKey = identity.GetKey();
  holder.certificate = identity.certificate;
  config.holderOfKeyConfig = holder;
  ToyNegotiationHandler handler(Legs(3), kAlice, "secret");
  const TokenPointer token =
      Quorlin::CreateSecurityTokenService(config)->AcquireTokenByGSS(MakeSpec(), handler);
  EXPECT_EQ(token->GetConfirmationCertificate()->GetSha256(), identity.certificate->GetSha256());
}

/// The library keeps one session for a whole negotiation, cookies included.
TEST(NegotiationEndToEnd, BringsTheServicesCookieBack) {
  for (const bool tls : {true, false}) {
    DevSts::ServiceConfig config;
    config.tls = tls;
    config.handler.cookie = true;
    std::vector<std::string> lines;
    std::mutex mutex;
    config.log = [&](const std::string& line) {
      const std::lock_guard<std::mutex> lock(mutex);
      lines.push_back(line);
    };
    config.handler.negotiation =
        std::make_shared<DevSts::ToyMechanism>(Legs(3), config.directory, DevSts::MakeSystemClock(0));
    DevSts::Service service(config);
    ToyNegotiationHandler handler(Legs(3), kAlice, "secret");
    EXPECT_NE(
        Quorlin::CreateSecurityTokenService(MakeConfig(service))->AcquireTokenByGSS(MakeSpec(), handler),
        nullptr);
    service.Stop();
    ASSERT_EQ(lines.size(), 3U);
    for (const std::size_t i : {1U, 2U}) {
      EXPECT_NE(lines[i].find("\"passed\":[\"timestamp\",\"cookie\""), std::string::npos) << lines[i];
    }
  }
}

TEST(NegotiationEndToEnd, ReportsAWrongProof) {
  ToyNegotiationHandler handler(Legs(3), kAlice, "guess");
  try {
    Quorlin::CreateSecurityTokenService(MakeConfig(Shared()))->AcquireTokenByGSS(MakeSpec(), handler);
    ADD_FAILURE();
  } catch (const Quorlin::InvalidCredentialsException& e) {
    EXPECT_STREQ(e.what(), "Authentication failed: Invalid user name or password");
  }
}

TEST(NegotiationEndToEnd, ReportsAServiceThatDoesNotNegotiate) {
  const DevSts::Service service{DevSts::ServiceConfig()};
  ToyNegotiationHandler handler(Legs(3), kAlice, "secret");
  try {
    Quorlin::CreateSecurityTokenService(MakeConfig(service))->AcquireTokenByGSS(MakeSpec(), handler);
    ADD_FAILURE();
  } catch (const Quorlin::SsoException& e) {
    EXPECT_STREQ(e.what(), "Unexpected SOAP fault: wst:RequestFailed; request failed.");
  }
}

TEST(NegotiationEndToEnd, GetsATokenAsynchronously) {
  std::promise<TokenPointer> outcome;
  Quorlin::CreateSecurityTokenService(MakeConfig(Shared()))
      ->AcquireTokenByGssAsync(
          MakeSpec(), boost::make_shared<ToyNegotiationHandler>(Legs(3), kAlice, "secret"),
          [&](const TokenPointer& token, const Pelmar::Exception*) { outcome.set_value(token); });
  const TokenPointer token = outcome.get_future().get();
  ASSERT_NE(token, nullptr);
  EXPECT_TRUE(token->GetSubject() == Quorlin::PrincipalId("alice", "example.com"));
}

TEST(NegotiationEndToEnd, GetsATokenWhenTheCallerKeepsTheInitiative) {
  const auto context = Quorlin::InternalApi::CreateGssNegotiationContext(MakeConfig(Shared()), MakeSpec());
  DevSts::ToyClient client(Legs(3), kAlice, "secret", DevSts::MakeSystemClock(0));
  Quorlin::InternalApi::NegotiationResult result = context->NegotiateToken(client.Answer({}));
  EXPECT_EQ(result.second, nullptr);
  result = context->NegotiateToken(client.Answer(*result.first));
  EXPECT_EQ(result.second, nullptr);
  result = context->NegotiateToken(client.Answer(*result.first));
  ASSERT_NE(result.second, nullptr);
  EXPECT_TRUE(result.second->GetSubject() == Quorlin::PrincipalId("alice", "example.com"));
  const DevSts::NegotiationLeg done = client.Answer(*result.first);
  EXPECT_EQ(std::string(done.begin(), done.end()), "done\n");
}

}  // namespace
