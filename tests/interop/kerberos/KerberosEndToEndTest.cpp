// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The library acquires tokens by Kerberos from the development token service, over real TLS on loopback.

#include "interop/kerberos/KerberosRealm.h"
#include "interop/kerberos/Outcome.h"
#include "support/Pki.h"
#include "support/RecordingLogSink.h"

#include "devsts/Service.h"

#include <quorlin-gssapi/GssapiNegotiation.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <future>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace KerberosTests;
using DevSts::NegotiationLeg;
using DevSts::NegotiationStep;
using Quorlin::GssapiOptions;
using Quorlin::PrincipalId;

using Handler = boost::shared_ptr<Quorlin::GssapiNegotiationHandler>;
using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;
using Mechanism = std::shared_ptr<const DevSts::NegotiationMechanism>;

const KerberosRealm& Realm() {
  return KerberosRealm::Shared();
}

Mechanism MakeMechanism() {
  return std::make_shared<DevSts::KerberosMechanism>(DevSts::KerberosOptions{Realm().GetKeytab(), ""});
}

/// Kerberos, but what the service answers is changed on its way.
class ChangedMechanism final : public DevSts::NegotiationMechanism {
 public:
  using Change = std::function<void(NegotiationStep& step)>;

  explicit ChangedMechanism(Change change) : _change(std::move(change)) {}

  std::unique_ptr<DevSts::Negotiation> Begin() const override {
    return std::make_unique<Changed>(_kerberos->Begin(), _change);
  }

 private:
  class Changed final : public DevSts::Negotiation {
   public:
    Changed(std::unique_ptr<DevSts::Negotiation> inner, Change change)
        : _inner(std::move(inner)), _change(std::move(change)) {}
    NegotiationStep Accept(const NegotiationLeg& leg) override {
      NegotiationStep step = _inner->Accept(leg);
      _change(step);
      return step;
    }

   private:
    std::unique_ptr<DevSts::Negotiation> _inner;
    Change _change;
  };

  Mechanism _kerberos = MakeMechanism();
  Change _change;
};

std::unique_ptr<DevSts::Service> StartService(const Mechanism& mechanism = MakeMechanism()) {
  DevSts::ServiceConfig config;
  config.handler.negotiation = mechanism;
  return std::make_unique<DevSts::Service>(config);
}

std::unique_ptr<DevSts::Service> StartService(const ChangedMechanism::Change& change) {
  return StartService(std::make_shared<ChangedMechanism>(change));
}

const DevSts::Service& Shared() {
  static const std::unique_ptr<DevSts::Service> service = StartService();
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

boost::shared_ptr<Quorlin::SecurityTokenService> MakeClient(const DevSts::Service& service) {
  return Quorlin::CreateSecurityTokenService(MakeConfig(service));
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return spec;
}

Handler MakeHandler(const std::string& cache = "") {
  Realm();
  GssapiOptions options;
  options.targetService = "HTTP@localhost";
  options.credentialCache = cache;
  return Quorlin::CreateGssapiNegotiationHandler(options);
}

std::string OutcomeOfAcquiring(const DevSts::Service& service, const Handler& handler = MakeHandler()) {
  return OutcomeOf([&] { MakeClient(service)->AcquireTokenByGSS(MakeSpec(), *handler); });
}

TEST(KerberosEndToEnd, GetsATokenForTheTicketsOwner) {
  const Handler handler = MakeHandler();
  const TokenPointer token = MakeClient(Shared())->AcquireTokenByGSS(MakeSpec(), *handler);
  handler->RequireComplete();
  EXPECT_TRUE(token->GetSubject() == PrincipalId("alice", "example.com"));
  EXPECT_EQ(token->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_BEARER);
}

TEST(KerberosEndToEnd, GetsATokenBoundToAKey) {
  const TestSupport::Identity identity = TestSupport::MakeSelfSigned(TestSupport::CertificateSpec());
  Quorlin::SecurityTokenServiceConfig config = MakeConfig(Shared());
  Quorlin::HolderOfKeyConfig holderOfKey;
  holderOfKey.certificate = identity.certificate;
  holderOfKey.privateKey = identity.GetKey();
  config.holderOfKeyConfig = holderOfKey;
  const Handler handler = MakeHandler();
  const TokenPointer token =
      Quorlin::CreateSecurityTokenService(config)->AcquireTokenByGSS(MakeSpec(), *handler);
  ASSERT_NE(token->GetConfirmationCertificate(), nullptr);
  EXPECT_EQ(token->GetConfirmationCertificate()->GetSha256(), identity.certificate->GetSha256());
}

TEST(KerberosEndToEnd, GetsATokenAsynchronously) {
  std::promise<std::string> outcome;
  const Handler handler = MakeHandler();
  MakeClient(Shared())->AcquireTokenByGssAsync(
      MakeSpec(), handler, [&](const TokenPointer& token, const Pelmar::Exception* error) {
        outcome.set_value(token ? token->GetSubject().ToString() : error->what());
      });
  EXPECT_EQ(outcome.get_future().get(), "{Name: alice; Domain:example.com}");
  EXPECT_TRUE(handler->IsComplete());
}

TEST(KerberosEndToEnd, GetsATokenLegByLeg) {
  const Handler handler = MakeHandler();
  const auto context = Quorlin::InternalApi::CreateGssNegotiationContext(MakeConfig(Shared()), MakeSpec());
  const Quorlin::InternalApi::NegotiationResult result =
      context->NegotiateToken(*handler->Negotiate(Quorlin::Leg()));
  ASSERT_NE(result.second, nullptr);
  EXPECT_TRUE(result.second->GetSubject() == PrincipalId("alice", "example.com"));
  EXPECT_EQ(handler->Negotiate(*result.first), nullptr);
  EXPECT_TRUE(handler->IsComplete());
}

TEST(KerberosEndToEnd, LogsTheOneWarningThatAMissingLastLegOfTheClientBrings) {
  const TestSupport::LogRecording log(Pelmar::Service::LOG_WARNING);
  EXPECT_EQ(OutcomeOfAcquiring(Shared()), "done");
  EXPECT_EQ(
      log.GetLines(),
      (std::vector<std::string>{"8 GSS contract error: non-empty user leg after negotiation is complete"}));
}

// ---- Who is refused ----

TEST(KerberosEndToEnd, RefusesAPrincipalThatTheDirectoryDoesNotKnow) {
  const Handler handler = MakeHandler(Realm().LogIn("carol", "carol's", "carols"));
  EXPECT_EQ(OutcomeOfAcquiring(Shared(), handler),
            "InvalidCredentialsException: Authentication failed: The principal is not known");
}

TEST(KerberosEndToEnd, AsksTheServiceForNothingWithoutATicket) {
  std::atomic<int> requests{0};
  DevSts::ServiceConfig config;
  config.handler.negotiation = MakeMechanism();
  config.log = [&](const std::string&) {
    ++requests;
  };
  const DevSts::Service service(config);
  EXPECT_EQ(OutcomeOfAcquiring(service, MakeHandler(Realm().MakeCacheName("none"))),
            std::string("InvalidCredentialsException: Kerberos credentials cannot be used: ") +
                kNoCredentials + "No credentials cache found");
  EXPECT_EQ(requests, 0);
}

TEST(KerberosEndToEnd, ReportsAServiceThatHasAnotherKey) {
  const auto service = StartService(std::make_shared<DevSts::KerberosMechanism>(
      DevSts::KerberosOptions{Realm().GetKeytabOfElsewhere(), ""}));
  EXPECT_EQ(OutcomeOfAcquiring(*service),
            std::string("InvalidCredentialsException: Authentication failed: Kerberos: ") + kUnspecified +
                "Request ticket server HTTP/localhost@EXAMPLE.COM not found in keytab (ticket kvno 2)");
}

TEST(KerberosEndToEnd, ReportsAServiceThatDoesNotNegotiate) {
  EXPECT_EQ(OutcomeOfAcquiring(*StartService(Mechanism())),
            "SsoException: Unexpected SOAP fault: wst:RequestFailed; request failed.");
}

// ---- Services that cheat ----

TEST(KerberosEndToEnd, NoticesAServiceThatDoesNotProveItsIdentity) {
  const auto service = StartService([](NegotiationStep& step) { step.leg.clear(); });
  const Handler handler = MakeHandler();
  EXPECT_EQ(OutcomeOfAcquiring(*service, handler), "done") << "the library has no leg to hand over";
  EXPECT_EQ(
      OutcomeOf([&] { handler->RequireComplete(); }),
      "SsoException: Kerberos negotiation with 'HTTP@localhost' is not complete: the service did not prove "
      "its identity");
}

TEST(KerberosEndToEnd, RefusesAChangedProofOfTheService) {
  const auto service = StartService([](NegotiationStep& step) { step.leg.back() ^= 1; });
  EXPECT_EQ(OutcomeOfAcquiring(*service),
            std::string("SsoException: Kerberos negotiation with 'HTTP@localhost' failed: ") + kUnspecified +
                "Decrypt integrity check failed");
}

TEST(KerberosEndToEnd, EndsANegotiationThatTheServiceWillNotLetEnd) {
  const auto service = StartService([](NegotiationStep& step) { step.principal.reset(); });
  const Handler handler = MakeHandler();
  EXPECT_EQ(
      OutcomeOfAcquiring(*service, handler),
      "InvalidArgumentException: Invalid argument : Invalid NegotiationHandler: the returned leg may not be "
      "NULL");
  EXPECT_TRUE(handler->IsComplete());
}

}  // namespace
