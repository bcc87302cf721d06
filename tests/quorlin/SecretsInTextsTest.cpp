// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Passwords, legs, pass phrases, keys and tokens are in no line of the log, at its lowest threshold and
// whatever its logger, and in no text of an exception, whatever an operation comes to.

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/http/Url.h>
#include <pelmar/service/Logger.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>

#include <functional>
#include <mutex>
#include <string>
#include <vector>

#include "support/CompletionProbe.h"
#include "support/FakeSamlToken.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"
#include "support/ScriptedNegotiationHandler.h"
#include "support/ServiceAnswers.h"

namespace Quorlin {
namespace {

using TestSupport::AnswerEach;
using TestSupport::HttpAnswer;
using TestSupport::LoopbackServer;
using TestSupport::ServerConnection;
using TestSupport::SignedToken;

const char* const kPassword = "marker-pass-word";
const char* const kLeg = "marker-leg";
const char* const kLegText = "bWFya2VyLWxlZw==";
const char* const kPassPhrase = "marker-pass-phrase";

/// Everything that is logged as long as it lives.
class WholeLog final {
 public:
  WholeLog() : _levelsBefore(Manager()->GetEnabledLevels()), _sink(Pelmar::MakeRef<Sink>()) {
    Manager()->SetSink(_sink);
    Manager()->SetEnabledLevels(Pelmar::Service::kAllLogLevels);
  }
  WholeLog(const WholeLog&) = delete;
  WholeLog& operator=(const WholeLog&) = delete;
  ~WholeLog() {
    Manager()->SetEnabledLevels(_levelsBefore);
    Manager()->SetSink(nullptr);
  }

  std::string GetText() const { return _sink->GetText(); }

 private:
  class Sink final : public Pelmar::Service::LogSink {
   public:
    void Write(const Pelmar::Service::LogRecord& record) override {
      const std::lock_guard<std::mutex> lock(_mutex);
      _text += record.logger + ": " + record.text + "\n";
    }
    std::string GetText() const {
      const std::lock_guard<std::mutex> lock(_mutex);
      return _text;
    }

   private:
    mutable std::mutex _mutex;
    std::string _text;
  };

  static Pelmar::Service::LogManager* Manager() { return Pelmar::Service::GetApp()->GetLogManager(); }

  const int _levelsBefore;
  const Pelmar::Ref<Sink> _sink;
};

/// All that an exception says of itself; empty when there was none.
std::string TextOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const Pelmar::Exception& error) {
    return error.Dump() + "\n" + error.Where() + "\n" + error.what() + "\n";
  }
  return std::string();
}

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 300;
  return spec;
}

const TestSupport::Identity& Client() {
  static const TestSupport::Identity client = TestSupport::MakeSelfSigned(TestSupport::CertificateSpec());
  return client;
}

SecurityTokenServiceConfig ConfigFor(const std::string& url) {
  SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.trustedStsCertificates = TestSupport::TrustedSigner();
  config.holderOfKeyConfig = HolderOfKeyConfig{Client().GetKey(), Client().certificate};
  return config;
}

using Operation = std::function<void(const SecurityTokenService&)>;

std::vector<Operation> Operations() {
  return {
      [](const SecurityTokenService& s) { s.AcquireToken("alice", kPassword, Spec()); },
      [](const SecurityTokenService& s) { s.AcquireToken("alice", std::string(kPassword) + "\x01", Spec()); },
      [](const SecurityTokenService& s) { s.AcquireToken("\xff", kPassword, Spec()); },
      [](const SecurityTokenService& s) { s.AcquireToken("alice", kPassword, TokenSpec()); },
      [](const SecurityTokenService& s) { s.AcquireTokenByCertificate(Spec()); },
      [](const SecurityTokenService& s) { s.AcquireTokenByToken(TestSupport::FakeSamlToken(), Spec()); },
      [](const SecurityTokenService& s) { s.ValidateSubject(TestSupport::FakeSamlToken()); },
      [](const SecurityTokenService& s) { s.RenewToken(TestSupport::FakeSamlToken(), 600); },
      [](const SecurityTokenService& s) {
        TestSupport::ScriptedNegotiationHandler handler;
        handler.Plan(kLeg);
        handler.Plan(kLeg);
        handler.PlanNull();
        s.AcquireTokenByGSS(Spec(), handler);
      },
      [](const SecurityTokenService& s) {
        TestSupport::CompletionProbe<boost::shared_ptr<const SamlToken>> probe;
        s.AcquireTokenAsync("alice", kPassword, Spec(), probe.GetFunction());
        const auto calls = probe.Wait();
        if (calls.at(0).error) {
          calls[0].error->Throw();
        }
      },
  };
}

std::vector<LoopbackServer::Script> Endings() {
  const std::string valid = SignedToken("valid");
  std::vector<LoopbackServer::Script> endings;
  for (const std::string& answer :
       {HttpAnswer("200 OK", TestSupport::IssueAnswer(valid)),
        HttpAnswer("200 OK", TestSupport::RenewAnswer(valid)),
        HttpAnswer("200 OK", TestSupport::IssueAnswer(SignedToken("tampered"))),
        HttpAnswer("200 OK", TestSupport::IssueAnswer(SignedToken("expired"))),
        HttpAnswer("200 OK", TestSupport::FinalAnswer("ctx", "bye", valid)),
        HttpAnswer("200 OK", TestSupport::ChallengeAnswer("ctx", "challenge")),
        HttpAnswer("200 OK", TestSupport::ValidateAnswer(false)),
        HttpAnswer("500 Internal Server Error", TestSupport::FaultAnswer("wst:FailedAuthentication", "No")),
        HttpAnswer("500 Internal Server Error", TestSupport::FaultAnswer("soapenv:Server", kPassword)),
        HttpAnswer("503 Service Unavailable", kPassword),
        HttpAnswer("200 OK", std::string("<a>") + kPassword), HttpAnswer("200 OK", "<a/>"),
        std::string("HTTP/2 200\r\n\r\n") + kPassword}) {
    endings.push_back(AnswerEach({answer}));
  }
  endings.push_back([](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Reset();
  });
  return endings;
}

/// The markers, and what stands in every token of these tests and every key.
const std::vector<std::string> kSecrets = {kPassword,      kLeg,        kLegText,      kPassPhrase, "<saml",
                                           "SignatureVal", "_7f5a64e2", "PRIVATE KEY", "MII"};

void ExpectNoSecret(const std::string& text) {
  for (const std::string& secret : kSecrets) {
    EXPECT_EQ(text.find(secret), std::string::npos) << secret << " is in:\n" << text;
  }
}

TEST(SecretsInTexts, AreInNoLogAndNoExceptionOfAnyOperation) {
  const WholeLog log;
  std::string exceptions;
  for (const Operation& operation : Operations()) {
    for (const LoopbackServer::Script& ending : Endings()) {
      const LoopbackServer server({ending});
      const auto service = CreateSecurityTokenService(ConfigFor("http://" + server.GetEndpoint() + "/sts"));
      exceptions += TextOf([&] { operation(*service); });
    }
  }
  ASSERT_NE(exceptions.find("Authentication failed: No"), std::string::npos);
  ASSERT_NE(exceptions.find("is not XML text"), std::string::npos);
  ExpectNoSecret(exceptions);
  ASSERT_NE(log.GetText().find("Quorlin: Successfully acquired token: "), std::string::npos);
  ExpectNoSecret(log.GetText());
}

TEST(SecretsInTexts, AreInNoExceptionOfAUrl) {
  const std::string url = std::string("https://alice:") + kPassword + "@sts.example.com/sts";
  const std::string text = TextOf([&] { CreateSecurityTokenService(ConfigFor(url)); });
  ASSERT_NE(text, "");
  ExpectNoSecret(text);
}

TEST(SecretsInTexts, AreInNoExceptionOfAKey) {
  const WholeLog log;
  const TestSupport::KeyPair key = TestSupport::KeyPair::Get(TestSupport::KeyKind::RSA_2048);
  const TestSupport::KeyPair weak = TestSupport::KeyPair::Get(TestSupport::KeyKind::RSA_1024);
  std::string damaged = key.ToPem();
  damaged[200] = '!';
  std::string exceptions;
  for (const std::string& pem : {key.ToEncryptedPem("right"), key.ToTraditionalPem("right"), weak.ToPem(),
                                 damaged, std::string(kPassPhrase)}) {
    const std::string text = TextOf([&] { Pelmar::Crypto::CreatePrivateKeyFromPem(pem, kPassPhrase); });
    EXPECT_NE(text, "") << pem.substr(0, 40);
    exceptions += text + TextOf([&] { Pelmar::Crypto::CreateCertificateFromPem(pem); });
  }
  exceptions +=
      TextOf([&] { Pelmar::Crypto::CreatePrivateKeyFromDer(key.ToEncryptedDer("right"), kPassPhrase); });
  ExpectNoSecret(exceptions);
  ExpectNoSecret(log.GetText());
}

}  // namespace
}  // namespace Quorlin
