// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// All that the library does, against the development token service over real TLS on loopback.

#include "support/CompletionProbe.h"
#include "support/GoldenText.h"
#include "support/Pki.h"
#include "support/RecordingLogSink.h"
#include "support/TokenFactory.h"

#include "devsts/Service.h"
#include "devsts/ToyNegotiation.h"
#include "quorlin/ToyNegotiationHandler.h"

#include <pelmar/crypto/Digest.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace {

using namespace TestSupport;
using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;
using ServicePointer = boost::shared_ptr<Quorlin::SecurityTokenService>;

constexpr const char* kRobot = "robot@example.com";
constexpr const char* kPassword = "pass-word-of-the-robot";

const Identity& Client() {
  static const Identity client = [] {
    CertificateSpec spec;
    spec.keyNumber = 3;
    return MakeSelfSigned(spec);
  }();
  return client;
}

/// A service with all its ways in, and the lines of its log.
class Sts final {
 public:
  Sts() {
    DevSts::User robot;
    robot.name = "robot";
    robot.domain = "example.com";
    robot.password = kPassword;
    robot.certificates = {Pelmar::Crypto::ToHex(Client().certificate->GetSha256())};
    DevSts::ServiceConfig config;
    config.directory = DevSts::Directory({robot});
    config.handler.negotiation = std::make_shared<DevSts::ToyMechanism>(
        DevSts::ToyOptions(), config.directory, DevSts::MakeSystemClock(0));
    config.log = [this](const std::string& line) {
      const std::lock_guard<std::mutex> lock(_mutex);
      _log += line + "\n";
    };
    _service = std::make_unique<DevSts::Service>(config);
  }

  ServicePointer Connect(bool withKey) const {
    Pelmar::Ssl::SSLContextOptions options;
    options.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(_service->GetCaCertificate());
    Quorlin::SecurityTokenServiceConfig config;
    config.stsUrl = _service->GetUrl();
    config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
    config.trustedStsCertificates =
        Pelmar::Crypto::CreateCertificatesFromPem(_service->GetSigningCertificate());
    if (withKey) {
      Quorlin::HolderOfKeyConfig holder;
      holder.privateKey = Client().GetKey();
      holder.certificate = Client().certificate;
      config.holderOfKeyConfig = holder;
    }
    return Quorlin::CreateSecurityTokenService(config);
  }

  /// All lines; the service has ended then.
  std::string TakeLog() {
    _service->Stop();
    const std::lock_guard<std::mutex> lock(_mutex);
    return _log;
  }

 private:
  std::mutex _mutex;
  std::string _log;
  std::unique_ptr<DevSts::Service> _service;
};

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  spec.renewable = true;
  spec.delegable = true;
  spec.audienceRestriction = {"urn:secret-audience"};
  spec.advice = {{"urn:secret-source", {{"secret-name", {"secret-value"}}}}};
  return spec;
}

Cli::ToyNegotiationHandler MakeHandler(const std::string& password = kPassword) {
  return Cli::ToyNegotiationHandler(DevSts::ToyOptions(), kRobot, password);
}

std::string Fail(const std::function<void()>& action) {
  try {
    action();
    return "nothing";
  } catch (const Pelmar::Exception& e) {
    return e.what();
  }
}

TEST(WholeService, WithoutAKeyDoesAllThatNeedsNone) {
  const Sts sts;
  const ServicePointer service = sts.Connect(false);
  const TokenPointer token = service->AcquireToken(kRobot, kPassword, MakeSpec());
  EXPECT_EQ(token->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_BEARER);
  Cli::ToyNegotiationHandler handler = MakeHandler();
  EXPECT_TRUE(service->AcquireTokenByGSS(MakeSpec(), handler)->GetSubject() == token->GetSubject());
  EXPECT_TRUE(service->ValidateSubject(*token));
  EXPECT_EQ(Fail([&] { service->AcquireTokenByCertificate(MakeSpec()); }),
            "No HolderOfKeyConfig provided. Unable to acquire token by certificate");
  EXPECT_EQ(Fail([&] { service->AcquireTokenByToken(*token, MakeSpec()); }),
            "No HolderOfKeyConfig provided. Unable to acquire token by token");
  EXPECT_EQ(Fail([&] { service->RenewToken(*token, 600); }),
            "No HolderOfKeyConfig provided. Unable to renew token");
}

TEST(WholeService, CompletesAnAsynchronousRenewalOfNoLifetimeWithTheMessage) {
  const Sts sts;
  const TokenPointer token = sts.Connect(true)->AcquireTokenByCertificate(MakeSpec());
  CompletionProbe<TokenPointer> probe;
  sts.Connect(true)->RenewTokenAsync(token, 0, probe.GetFunction());
  const auto calls = probe.Wait();
  ASSERT_EQ(calls.size(), 1U);
  EXPECT_EQ(calls[0].value, nullptr);
  EXPECT_EQ(calls[0].Message(), "Invalid argument : Token lifetime must be positive");
}

/// The six operations, and three that are refused. What must not be seen of their tokens is added to
/// `secrets`.
void DoEverything(const Sts& sts, std::vector<std::string>& secrets) {
  const ServicePointer keyed = sts.Connect(true);
  const TokenPointer byPassword = keyed->AcquireToken(kRobot, kPassword, MakeSpec());
  const TokenPointer byCertificate = keyed->AcquireTokenByCertificate(MakeSpec());
  const TokenPointer exchanged = keyed->AcquireTokenByToken(*byCertificate, MakeSpec());
  const TokenPointer renewed = keyed->RenewToken(*exchanged, 300);
  Cli::ToyNegotiationHandler handler = MakeHandler();
  const TokenPointer negotiated = keyed->AcquireTokenByGSS(MakeSpec(), handler);
  EXPECT_TRUE(keyed->ValidateSubject(*negotiated));
  Cli::ToyNegotiationHandler wrong = MakeHandler("wrong-pass-word");
  EXPECT_EQ(Fail([&] { keyed->AcquireTokenByGSS(MakeSpec(), wrong); }),
            "Authentication failed: Invalid user name or password");
  EXPECT_EQ(Fail([&] { keyed->AcquireToken(kRobot, "wrong-pass-word", MakeSpec()); }),
            "Authentication failed: Invalid user name or password");
  for (const TokenPointer& token : {byPassword, byCertificate, exchanged, renewed, negotiated}) {
    secrets.push_back(token->GetId());
    secrets.push_back(
        CutBetween(token->ToXml(), "<ds:SignatureValue>", "</ds:SignatureValue>").substr(0, 40));
  }
}

void ExpectNone(const std::vector<std::string>& secrets, const std::string& log) {
  for (const std::string& secret : secrets) {
    EXPECT_EQ(log.find(secret), std::string::npos) << secret;
  }
}

TEST(WholeService, LeavesNoSecretInEitherLog) {
  Sts sts;
  const LogRecording log;
  std::vector<std::string> secrets = {"pass-word",   "<saml",     "<wst",
                                      "xmlns",       "Assertion", Base64Of(Client()).substr(0, 40),
                                      "PRIVATE KEY", "urn:uuid",  "toy negotiation of"};
  DoEverything(sts, secrets);
  const std::string ofService = sts.TakeLog();
  ASSERT_NE(ofService.find("\"operation\":\"renew\""), std::string::npos);
  ExpectNone(secrets, ofService);
  ExpectNone({"secret-audience", "secret-source", "secret-name", "secret-value"}, ofService);
  const std::string ofLibrary = log.GetEverything();
  ASSERT_NE(ofLibrary.find("Successfully acquired token: "), std::string::npos);
  ExpectNone(secrets, ofLibrary);
}

}  // namespace
