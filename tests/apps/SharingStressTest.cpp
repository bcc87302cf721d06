// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Everything at once that the documentation allows to be shared, against the development token service over
// TLS: one service object, its tokens, its trust lists and one log by many threads, blocking and
// asynchronous. Made for the thread sanitizer; elsewhere it shows that each call gets its own result.

#include "support/CompletionProbe.h"
#include "support/Pki.h"

#include "devsts/Service.h"
#include "devsts/ToyNegotiation.h"
#include "quorlin/ToyNegotiationHandler.h"

#include <pelmar/crypto/Digest.h>
#include <pelmar/service/Logger.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <atomic>
#include <functional>
#include <list>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace TestSupport;
using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;
using ServicePointer = boost::shared_ptr<Quorlin::SecurityTokenService>;

constexpr int kThreads = 6;
constexpr int kRounds = 6;
const char* const kUser = "robot@example.com";
const char* const kPassword = "pass-word";

class CountingSink final : public Pelmar::Service::LogSink {
 public:
  void Write(const Pelmar::Service::LogRecord& record) override { characters += record.text.size(); }

  std::atomic<std::size_t> characters{0};

 private:
  ~CountingSink() override = default;
};

Pelmar::Service::LogManager& Log() {
  return *Pelmar::Service::GetApp()->GetLogManager();
}

class Shared final {
 public:
  Shared() : _client(MakeClient()), _service(MakeServiceConfig(_client)), service(Connect()) {
    token = service->AcquireTokenByCertificate(Spec());
  }

  static Quorlin::TokenSpec Spec() {
    Quorlin::TokenSpec spec;
    spec.tokenLifetimeSec = 600;
    spec.renewable = true;
    spec.delegable = true;
    return spec;
  }

  static Cli::ToyNegotiationHandler MakeHandler() {
    return Cli::ToyNegotiationHandler(DevSts::ToyOptions(), kUser, kPassword);
  }

 private:
  static Identity MakeClient() {
    CertificateSpec spec;
    spec.keyNumber = 3;
    return MakeSelfSigned(spec);
  }

  static DevSts::ServiceConfig MakeServiceConfig(const Identity& client) {
    DevSts::User robot;
    robot.name = "robot";
    robot.domain = "example.com";
    robot.password = kPassword;
    robot.certificates = {Pelmar::Crypto::ToHex(client.certificate->GetSha256())};
    DevSts::ServiceConfig config;
    config.directory = DevSts::Directory({robot});
    config.handler.negotiation = std::make_shared<DevSts::ToyMechanism>(
        DevSts::ToyOptions(), config.directory, DevSts::MakeSystemClock(0));
    return config;
  }

  ServicePointer Connect() {
    trusted = Pelmar::Crypto::CreateCertificatesFromPem(_service.GetSigningCertificate());
    Pelmar::Ssl::SSLContextOptions options;
    options.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(_service.GetCaCertificate());
    Quorlin::SecurityTokenServiceConfig config;
    config.stsUrl = _service.GetUrl();
    config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
    config.trustedStsCertificates = trusted;
    Quorlin::HolderOfKeyConfig holder;
    holder.privateKey = _client.GetKey();
    holder.certificate = _client.certificate;
    config.holderOfKeyConfig = holder;
    return Quorlin::CreateSecurityTokenService(config);
  }

  const Identity _client;
  DevSts::Service _service;

 public:
  std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> trusted;
  const ServicePointer service;
  TokenPointer token;
};

/// The six operations on what all threads share.
void CallBlocking(const Shared& shared) {
  const Quorlin::TokenSpec spec = Shared::Spec();
  EXPECT_TRUE(shared.service->AcquireToken(kUser, kPassword, spec)->GetSubject() ==
              shared.token->GetSubject());
  EXPECT_NE(shared.service->AcquireTokenByCertificate(spec)->GetId(), shared.token->GetId());
  EXPECT_TRUE(shared.service->AcquireTokenByToken(*shared.token, spec)->IsDelegable());
  EXPECT_TRUE(shared.service->ValidateSubject(*shared.token));
  EXPECT_NE(shared.service->RenewToken(*shared.token, 300)->GetId(), shared.token->GetId());
  Cli::ToyNegotiationHandler handler = Shared::MakeHandler();
  EXPECT_TRUE(shared.service->AcquireTokenByGSS(spec, handler)->GetSubject() == shared.token->GetSubject());
}

void ExpectToken(CompletionProbe<TokenPointer>& probe) {
  const auto calls = probe.Wait();
  ASSERT_EQ(calls.size(), 1u);
  EXPECT_EQ(calls[0].Message(), "no error");
}

void CallAsynchronously(const Shared& shared) {
  const Quorlin::TokenSpec spec = Shared::Spec();
  CompletionProbe<TokenPointer> probes[5];
  CompletionProbe<boost::optional<bool>> validation;
  shared.service->AcquireTokenAsync(kUser, kPassword, spec, probes[0].GetFunction());
  shared.service->AcquireTokenByCertificateAsync(spec, probes[1].GetFunction());
  shared.service->AcquireTokenByTokenAsync(shared.token, spec, probes[2].GetFunction());
  shared.service->RenewTokenAsync(shared.token, 300, probes[3].GetFunction());
  shared.service->AcquireTokenByGssAsync(
      spec, boost::make_shared<Cli::ToyNegotiationHandler>(Shared::MakeHandler()), probes[4].GetFunction());
  shared.service->ValidateSubjectAsync(shared.token, validation.GetFunction());
  for (CompletionProbe<TokenPointer>& probe : probes) {
    ExpectToken(probe);
  }
  EXPECT_EQ(validation.Wait().size(), 1u);
}

/// Reads of one token, and its text judged by one trust list.
void ReadToken(const Shared& shared) {
  std::vector<Quorlin::PrincipalId> groups;
  shared.token->GetGroups(groups);
  std::set<std::string> audience;
  shared.token->GetAudience(audience);
  EXPECT_EQ(Quorlin::CreateSamlToken(shared.token->ToXml(), shared.trusted)->GetId(), shared.token->GetId());
  EXPECT_NE(shared.token->GetConfirmationCertificate(), nullptr);
}

/// The host may change the sink and the levels while lines are written.
void ChangeLog() {
  Log().SetSink(Pelmar::Ref<Pelmar::Service::LogSink>(new CountingSink()));
  Log().SetEnabledLevels(Pelmar::Service::kAllLogLevels);
}

TEST(SharingStress, OfAllThatMayBeSharedGivesEachCallItsResult) {
  const int levels = Log().GetEnabledLevels();
  ChangeLog();
  const Shared shared;
  const std::vector<std::function<void()>> parts = {[&] { CallBlocking(shared); },
                                                    [&] { CallAsynchronously(shared); },
                                                    [&] { ReadToken(shared); }, ChangeLog};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < kThreads; ++thread) {
    threads.emplace_back([&, thread] {
      for (int round = 0; round < kRounds; ++round) {
        for (std::size_t part = 0; part < parts.size(); ++part) {
          parts[(part + static_cast<std::size_t>(thread)) % parts.size()]();
        }
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  Log().SetSink(nullptr);
  Log().SetEnabledLevels(levels);
}

}  // namespace
