// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// The whole library, as the factories put it together, against a scripted server.

#include <pelmar/ssl/SSLContext.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>
#include <boost/optional/optional_io.hpp>

#include <functional>
#include <string>
#include <typeinfo>
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
using TestSupport::SignedToken;

const char* const kIssue = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue";
const char* const kChallenge = "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue";

std::string Ok(const std::string& envelope) {
  return HttpAnswer("200 OK", envelope, "Content-Type: text/xml\r\n");
}

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 300;
  return spec;
}

// A client of `server` that trusts the signer of the test tokens and signs with a key of its own.
SecurityTokenServiceConfig ConfigFor(const LoopbackServer& server) {
  TestSupport::CertificateSpec certificate;
  certificate.commonName = "Client";
  const TestSupport::Identity client = TestSupport::MakeSelfSigned(certificate);
  SecurityTokenServiceConfig config;
  config.stsUrl = "http://" + server.GetEndpoint() + "/sts";
  config.trustedStsCertificates = TestSupport::TrustedSigner();
  config.holderOfKeyConfig = HolderOfKeyConfig{client.GetKey(), client.certificate};
  return config;
}

// The value of the header in the `number`-th (from 1) of the requests received.
std::string HeaderOf(const std::string& received, const std::string& header, int number = 1) {
  std::size_t begin = 0;
  const std::string start = "\r\n" + header + ": ";
  for (int i = 0; i < number; ++i) {
    begin = received.find(start, begin);
    if (begin == std::string::npos) {
      return "no such header";
    }
    begin += start.size();
  }
  return received.substr(begin, received.find("\r\n", begin) - begin);
}

struct OperationCase {
  const char* name;
  std::function<std::string(const SecurityTokenService&)> call;  // Returns the token's id, or the verdict.
  std::string answer;
  std::string result;
  std::string soapAction;
};

std::vector<OperationCase> Operations() {
  const std::string valid = SignedToken("valid");
  const std::string trust = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
  return {
      {"AcquireToken",
       [](const SecurityTokenService& s) {
         return s.AcquireToken("alice@example.com", "pass-word", Spec())->GetId();
       },
       TestSupport::IssueAnswer(valid), "_7f5a64e2", trust + "/RST/Issue"},
      {"AcquireTokenByCertificate",
       [](const SecurityTokenService& s) { return s.AcquireTokenByCertificate(Spec())->GetId(); },
       TestSupport::IssueAnswer(valid), "_7f5a64e2", trust + "/RST/Issue"},
      {"AcquireTokenByToken",
       [](const SecurityTokenService& s) {
         return s.AcquireTokenByToken(TestSupport::FakeSamlToken(), Spec())->GetId();
       },
       TestSupport::IssueAnswer(valid), "_7f5a64e2", trust + "/RST/Issue"},
      {"ValidateSubject",
       [](const SecurityTokenService& s) {
         return std::string(s.ValidateSubject(TestSupport::FakeSamlToken()) ? "valid" : "invalid");
       },
       TestSupport::ValidateAnswer(false), "invalid", trust + "/RST/Validate"},
      {"RenewToken",
       [](const SecurityTokenService& s) { return s.RenewToken(TestSupport::FakeSamlToken(), 600)->GetId(); },
       TestSupport::RenewAnswer(valid), "_7f5a64e2", trust + "/RST/Renew"},
      {"AcquireTokenByGSS",
       [](const SecurityTokenService& s) {
         TestSupport::ScriptedNegotiationHandler handler;
         handler.Plan("hello");
         return s.AcquireTokenByGSS(Spec(), handler)->GetId();
       },
       TestSupport::FinalAnswer("ctx", "", valid), "_7f5a64e2", trust + "/RST/Issue"},
  };
}

TEST(ServiceOverHttp, CarriesOutEveryOperation) {
  for (const OperationCase& operation : Operations()) {
    LoopbackServer server({AnswerEach({Ok(operation.answer)})});
    const boost::shared_ptr<SecurityTokenService> service = CreateSecurityTokenService(ConfigFor(server));
    EXPECT_EQ(operation.result, operation.call(*service)) << operation.name;
    EXPECT_EQ("\"" + operation.soapAction + "\"", HeaderOf(server.GetRecord(0).received, "SOAPAction"))
        << operation.name;
    EXPECT_EQ(1u, server.GetRecord(0).requests) << operation.name;
  }
}

struct FailureCase {
  const char* name;
  std::string answer;
  const std::type_info& type;
  const char* message;
};

std::vector<FailureCase> Failures() {
  return {
      {"fault with 500",
       HttpAnswer("500 Internal Server Error", TestSupport::FaultAnswer("wst:FailedAuthentication", "No")),
       typeid(InvalidCredentialsException), "Authentication failed: No"},
      {"fault with 200", HttpAnswer("200 OK", TestSupport::FaultAnswer("soapenv:Server", "No")),
       typeid(SsoException), "Unexpected SOAP fault: soapenv:Server; request failed."},
      {"500 without a fault", HttpAnswer("500 Internal Server Error", "<a/>"), typeid(SsoException),
       "Unexpected response format: missing SAOP Body."},
      {"503 with a page", HttpAnswer("503 Service Unavailable", "<html><body>Out of order<br></html>"),
       typeid(CommunicationException), "Server returned error: 503 Service Unavailable"},
      {"401", HttpAnswer("401 Unauthorized", ""), typeid(CommunicationException),
       "Server returned error: 401 Unauthorized"},
      {"redirection", HttpAnswer("302 Found", "", "Location: /elsewhere\r\n"), typeid(CommunicationException),
       "Server returned error: 302 Found"},
  };
}

TEST(ServiceOverHttp, ReportsFailuresOfEveryOperationByClassAndMessage) {
  for (const OperationCase& operation : Operations()) {
    for (const FailureCase& failure : Failures()) {
      SCOPED_TRACE(std::string(operation.name) + ", " + failure.name);
      const LoopbackServer server({AnswerEach({failure.answer})});
      const boost::shared_ptr<SecurityTokenService> service = CreateSecurityTokenService(ConfigFor(server));
      try {
        ADD_FAILURE() << "result: " << operation.call(*service);
      } catch (const Pelmar::Exception& error) {
        EXPECT_EQ(failure.type, typeid(error));
        EXPECT_STREQ(failure.message, error.what());
      }
    }
  }
}

TEST(ServiceOverHttp, ReportsARefusedConnection) {
  const TestSupport::ClosedPort port;
  SecurityTokenServiceConfig config;
  config.stsUrl = "http://127.0.0.1:" + std::to_string(port.GetPort()) + "/sts";
  const boost::shared_ptr<SecurityTokenService> service = CreateSecurityTokenService(config);
  try {
    service->AcquireToken("alice", "pass-word", Spec());
    FAIL() << "nobody listens, yet a token came";
  } catch (const CommunicationException& error) {
    EXPECT_EQ("Connection refused by 127.0.0.1:" + std::to_string(port.GetPort()), error.what());
  }
}

TEST(ServiceOverHttp, TrustsNobodyWithoutTrustedCertificates) {
  const LoopbackServer server({AnswerEach({Ok(TestSupport::IssueAnswer(SignedToken("valid")))})});
  SecurityTokenServiceConfig config = ConfigFor(server);
  config.trustedStsCertificates.clear();
  EXPECT_THROW(CreateSecurityTokenService(config)->AcquireToken("alice", "pass-word", Spec()),
               InvalidSignatureException);
}

TEST(ServiceOverHttp, NegotiatesOverOneConnectionWithItsCookies) {
  LoopbackServer server({AnswerEach(
      {HttpAnswer("200 OK", TestSupport::ChallengeAnswer("ctx", "challenge"), "Set-Cookie: round=1\r\n"),
       HttpAnswer("200 OK", TestSupport::FinalAnswer("ctx", "bye", SignedToken("valid")))})});
  const boost::shared_ptr<SecurityTokenService> service = CreateSecurityTokenService(ConfigFor(server));
  TestSupport::ScriptedNegotiationHandler handler;
  handler.Plan("hello");
  handler.Plan("proof");
  handler.Plan("unsent");
  EXPECT_EQ("_7f5a64e2", service->AcquireTokenByGSS(Spec(), handler)->GetId());
  EXPECT_EQ(std::vector<std::string>({"", "challenge", "bye"}), handler.GetServerLegs());
  ASSERT_EQ(1u, server.CountConnections());
  const std::string received = server.GetRecord(0).received;
  EXPECT_EQ("\"" + std::string(kIssue) + "\"", HeaderOf(received, "SOAPAction", 1));
  EXPECT_EQ("\"" + std::string(kChallenge) + "\"", HeaderOf(received, "SOAPAction", 2));
  EXPECT_EQ("round=1", HeaderOf(received, "Cookie", 1));
  EXPECT_EQ("no such header", HeaderOf(received, "Cookie", 2));
}

TEST(ServiceOverHttp, ContextOfACallersNegotiationUsesOneConnectionWithItsCookies) {
  LoopbackServer server({AnswerEach(
      {HttpAnswer("200 OK", TestSupport::ChallengeAnswer("ctx", "challenge"), "Set-Cookie: round=1\r\n"),
       HttpAnswer("200 OK", TestSupport::FinalAnswer("ctx", "", SignedToken("valid")))})});
  const boost::shared_ptr<InternalApi::GssNegotiationContext> context =
      InternalApi::CreateGssNegotiationContext(ConfigFor(server), Spec());
  EXPECT_FALSE(context->NegotiateToken({1}).second);
  const InternalApi::NegotiationResult last = context->NegotiateToken({2});
  EXPECT_TRUE(last.first->empty());
  ASSERT_TRUE(last.second);
  EXPECT_EQ("_7f5a64e2", last.second->GetId());
  ASSERT_EQ(1u, server.CountConnections());
  const std::string received = server.GetRecord(0).received;
  EXPECT_EQ("\"" + std::string(kIssue) + "\"", HeaderOf(received, "SOAPAction", 1));
  EXPECT_EQ("\"" + std::string(kChallenge) + "\"", HeaderOf(received, "SOAPAction", 2));
  EXPECT_EQ("round=1", HeaderOf(received, "Cookie", 1));
}

TEST(ServiceOverHttp, OperationsShareNoCookies) {
  LoopbackServer server(
      {AnswerEach({HttpAnswer("200 OK", TestSupport::ValidateAnswer(true), "Set-Cookie: round=1\r\n")})});
  const boost::shared_ptr<SecurityTokenService> service = CreateSecurityTokenService(ConfigFor(server));
  EXPECT_TRUE(service->ValidateSubject(TestSupport::FakeSamlToken()));
  EXPECT_TRUE(service->ValidateSubject(TestSupport::FakeSamlToken()));
  ASSERT_EQ(2u, server.CountConnections());
  EXPECT_EQ("no such header", HeaderOf(server.GetRecord(1).received, "Cookie"));
}

TEST(ServiceOverHttp, OperationsOfOneServiceResumeTls) {
  const TestSupport::Identity ca = TestSupport::MakeCa();
  TestSupport::CertificateSpec spec;
  spec.commonName = "Test server";
  spec.subjectAlternativeName = "IP:127.0.0.1";
  const TestSupport::Identity identity = TestSupport::MakeIssued(ca, spec);
  LoopbackServer server(TestSupport::TlsServerSettings(identity),
                        {AnswerEach({Ok(TestSupport::ValidateAnswer(true))})});
  Pelmar::Ssl::SSLContextOptions options;
  options.trustAnchors = TestSupport::Trust({ca});
  SecurityTokenServiceConfig config;
  config.stsUrl = "https://" + server.GetEndpoint() + "/sts";
  config.sslContext = Pelmar::Ssl::CreateSSLContext(options);
  const boost::shared_ptr<SecurityTokenService> service = CreateSecurityTokenService(config);
  for (int i = 0; i < 3; ++i) {
    EXPECT_TRUE(service->ValidateSubject(TestSupport::FakeSamlToken()));
  }
  ASSERT_EQ(3u, server.CountConnections());
  EXPECT_FALSE(server.GetRecord(0).wasResumed);
  EXPECT_TRUE(server.GetRecord(1).wasResumed);
  EXPECT_TRUE(server.GetRecord(2).wasResumed);
}

TEST(ServiceOverHttp, AsynchronousOperationsRunAtOnceAndOutliveTheService) {
  constexpr std::size_t kOperations = 20;
  LoopbackServer server({[](TestSupport::ServerConnection& connection) {
    connection.ReadRequest();
    connection.AwaitRelease();
    connection.Send(Ok(TestSupport::IssueAnswer(SignedToken("valid"))));
    connection.Close();
  }});
  boost::shared_ptr<SecurityTokenService> service = CreateSecurityTokenService(ConfigFor(server));
  std::vector<TestSupport::CompletionProbe<boost::shared_ptr<const SamlToken>>> probes(kOperations);
  for (auto& probe : probes) {
    service->AcquireTokenByCertificateAsync(Spec(), probe.GetFunction());
  }
  service.reset();
  server.AwaitRequests(kOperations);
  server.Release();
  for (auto& probe : probes) {
    const auto calls = probe.Wait();
    ASSERT_EQ(1u, calls.size());
    EXPECT_EQ("no error", calls[0].Message());
    EXPECT_EQ("_7f5a64e2", calls[0].value->GetId());
  }
}

}  // namespace
}  // namespace Quorlin
