// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Memory that runs out at every point of a validation, a request and an acquisition: an exception, nothing
// lost, and the next call works. Every request for memory of the client's threads is failed in turn: our own,
// OpenSSL's, expat's and libcurl's.

#include "torture/AllocationSweep.h"
#include "torture/HostFaults.h"

#include "quorlin/RequestBuilderImpl.h"
#include "support/FakeSamlToken.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"
#include "support/ScriptedNegotiationHandler.h"
#include "support/ServiceAnswers.h"
#include "support/TokenFactory.h"

#include <quorlin/quorlin.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <functional>
#include <memory>
#include <string>
#include <tuple>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using namespace Torture;

const char* const kTokenOfAnswers = "_7f5a64e2";

const HolderOfKeyConfig& Client() {
  static const HolderOfKeyConfig client = [] {
    const Identity identity = MakeSelfSigned(CertificateSpec());
    HolderOfKeyConfig made;
    made.privateKey = identity.GetKey();
    made.certificate = identity.certificate;
    return made;
  }();
  return client;
}

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 300;
  spec.renewable = true;
  spec.audienceRestriction = {"urn:audience"};
  spec.advice = {{"urn:source", {{"name", {"value"}}}}};
  return spec;
}

/// How many requests may be followed by a loss inside libcurl or OpenSSL. (Measured with libcurl 7.88 and
/// OpenSSL 3.0; ours may lose nothing at all.)
constexpr std::size_t kMaxLossesBelow = 8;

/// Every outcome is the result, std::bad_alloc or an exception of ours already. None may pass for a verdict
/// on the token.
void ExpectCleanOutcomes(const Sweep& sweep) {
  EXPECT_GT(sweep.allocations, 100u);
  EXPECT_LE(sweep.lostBelow, kMaxLossesBelow);
  EXPECT_GT(sweep.outcomes.count("std::bad_alloc"), 0u);
  for (const auto& outcome : sweep.outcomes) {
    testing::Test::RecordProperty(outcome.first, std::to_string(outcome.second));
    EXPECT_EQ(outcome.first.find("tampered"), std::string::npos) << outcome.first;
  }
}

// --- Validation ---

/// A holder-of-key token and its signer's certificate; no two alike.
struct Issued {
  std::string token;
  std::string signer;
};

Issued Issue(unsigned number) {
  CertificateSpec spec;
  spec.keyKind = KeyKind::EC_P256;
  spec.keyNumber = number;
  const Identity signer = MakeSelfSigned(spec);
  TokenText text;
  text.HoldKey(signer);
  text.restrictions = ProxyRestriction("Count=\"5\"") + RenewRestriction("Count=\"5\"");
  TokenSigning signing;
  signing.signatureMethod = "http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha256";
  return {SignToken(text.Compose(), signer, signing), signer.GetCertificatePem()};
}

class AllocationFailures : public testing::TestWithParam<Extent> {};

INSTANTIATE_TEST_SUITE_P(From, AllocationFailures, testing::Values(Extent::ONE, Extent::ALL_FROM_THEN),
                         [](const auto& parameter) {
                           return std::string(parameter.param == Extent::ONE ? "Once" : "ThenOn");
                         });

TEST_P(AllocationFailures, OfAValidationAreCleanAndTheNextWorks) {
  // More than the caches remember, so that each run starts without its certificates and chain in them.
  constexpr unsigned kMoreThanRemembered = 70;
  std::vector<Issued> issued;
  for (unsigned i = 0; i < kMoreThanRemembered; ++i) {
    issued.push_back(Issue(i));
  }
  const Sweep sweep = FailEachAllocation(GetParam(), kTokenId, [&](std::size_t round) {
    const Issued& next = issued[round % issued.size()];
    return CreateSamlToken(next.token, Pelmar::Crypto::CreateCertificatesFromPem(next.signer))->GetId();
  });
  ExpectCleanOutcomes(sweep);
}

TEST_P(AllocationFailures, OfASignedRequestAreCleanAndTheNextWorks) {
  const FakeSamlToken token;
  const Sweep sweep = FailEachAllocation(GetParam(), "signed", [&](std::size_t) {
    Request request;
    RequestBuilderImpl(Client()).BuildExchangeTokenRequest(token, Spec(), request);
    return std::string(request.body.find("<ds:SignatureValue>") != std::string::npos ? "signed" : "unsigned");
  });
  ExpectCleanOutcomes(sweep);
}

// --- Operations ---

/// A service whose answers are prepared, on threads that never lack memory.
class PreparedService final {
 public:
  PreparedService(const std::vector<std::string>& answers, bool isTls) {
    const ServerScope scope;
    std::vector<std::string> messages;
    for (const std::string& answer : answers) {
      messages.push_back(HttpAnswer("200 OK", answer, "Content-Type: text/xml\r\n"));
    }
    const std::vector<LoopbackServer::Script> scripts = {AnswerEach(messages)};
    if (isTls) {
      const Identity ca = MakeCa();
      CertificateSpec spec;
      spec.keyKind = KeyKind::EC_P256;
      spec.subjectAlternativeName = "IP:127.0.0.1";
      _ca = ca.GetCertificatePem();
      _server = std::make_unique<LoopbackServer>(TlsServerSettings(MakeIssued(ca, spec)), scripts);
    } else {
      _server = std::make_unique<LoopbackServer>(scripts);
    }
  }
  PreparedService(const PreparedService&) = delete;
  PreparedService& operator=(const PreparedService&) = delete;
  ~PreparedService() {
    const ServerScope scope;
    _server.reset();
  }

  boost::shared_ptr<SecurityTokenService> Connect() const {
    SecurityTokenServiceConfig config;
    config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(_signer);
    config.holderOfKeyConfig = Client();
    config.stsUrl = (_ca.empty() ? "http://" : "https://") + _server->GetEndpoint() + "/sts";
    if (!_ca.empty()) {
      Pelmar::Ssl::SSLContextOptions options;
      options.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(_ca);
      config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
    }
    return CreateSecurityTokenService(config);
  }

 private:
  const std::string _signer = ReadResponseVector("tokens/signer.pem");
  std::string _ca;
  std::unique_ptr<LoopbackServer> _server;
};

struct Operation {
  const char* name;
  std::function<std::string(const SecurityTokenService&)> call;
  std::vector<std::string> answers;
};

std::vector<Operation> Operations() {
  const std::string token = SignedToken("valid");
  return {
      {"AcquireToken",
       [](const SecurityTokenService& s) {
         return s.AcquireToken("alice@example.com", "pass-word", Spec())->GetId();
       },
       {IssueAnswer(token)}},
      {"AcquireTokenByCertificate",
       [](const SecurityTokenService& s) { return s.AcquireTokenByCertificate(Spec())->GetId(); },
       {IssueAnswer(token)}},
      {"AcquireTokenByToken",
       [](const SecurityTokenService& s) { return s.AcquireTokenByToken(FakeSamlToken(), Spec())->GetId(); },
       {IssueAnswer(token)}},
      {"ValidateSubject",
       [](const SecurityTokenService& s) {
         return std::string(s.ValidateSubject(FakeSamlToken()) ? kTokenOfAnswers : "invalid");
       },
       {ValidateAnswer(true)}},
      {"RenewToken",
       [](const SecurityTokenService& s) { return s.RenewToken(FakeSamlToken(), 600)->GetId(); },
       {RenewAnswer(token)}},
      {"AcquireTokenByGSS",
       [](const SecurityTokenService& s) {
         ScriptedNegotiationHandler handler;
         handler.Plan("hello");
         handler.Plan("proof");
         return s.AcquireTokenByGSS(Spec(), handler)->GetId();
       },
       {ChallengeAnswer("ctx", "challenge"), FinalAnswer("ctx", "", token)}},
  };
}

class OperationAllocationFailures : public testing::TestWithParam<std::tuple<std::size_t, Extent>> {};

INSTANTIATE_TEST_SUITE_P(Of, OperationAllocationFailures,
                         testing::Combine(testing::Range(std::size_t(0), std::size_t(6)),
                                          testing::Values(Extent::ONE, Extent::ALL_FROM_THEN)),
                         [](const auto& parameter) {
                           return std::string(Operations()[std::get<0>(parameter.param)].name) +
                                  (std::get<1>(parameter.param) == Extent::ONE ? "Once" : "ThenOn");
                         });

TEST_P(OperationAllocationFailures, AreCleanAndTheNextWorks) {
  const Operation operation = Operations()[std::get<0>(GetParam())];
  const PreparedService server(operation.answers, false);
  const Sweep sweep = FailEachAllocation(std::get<1>(GetParam()), kTokenOfAnswers,
                                         [&](std::size_t) { return operation.call(*server.Connect()); });
  ExpectCleanOutcomes(sweep);
}

// A handshake asks for memory thousands of times, most of them inside OpenSSL and much alike.
TEST_P(AllocationFailures, OfEveryEleventhRequestOfAnAcquisitionOverTlsAreCleanAndTheNextWorks) {
  constexpr std::size_t kStep = 11;
  const Operation operation = Operations().front();
  const PreparedService server(operation.answers, true);
  const Sweep sweep = FailEachAllocation(
      GetParam(), kTokenOfAnswers, [&](std::size_t) { return operation.call(*server.Connect()); }, kStep);
  ExpectCleanOutcomes(sweep);
}

}  // namespace
}  // namespace Quorlin
