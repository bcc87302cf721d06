// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// How long operations may take, which messages are sent again, and what else the options decide.

#include <quorlin/quorlin.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <chrono>
#include <cstdlib>
#include <functional>
#include <limits>
#include <memory>
#include <string>
#include <thread>
#include <typeinfo>
#include <vector>

#include "quorlin/OptionsTransport.h"
#include "support/FakeSamlToken.h"
#include "support/HttpScripts.h"
#include "support/LogAction.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"
#include "support/RecordingMetrics.h"
#include "support/ServiceAnswers.h"

namespace Quorlin {
namespace {

using TestSupport::AnswerEach;
using TestSupport::HttpAnswer;
using TestSupport::LoopbackServer;
using TestSupport::ServerConnection;
using TestSupport::SignedToken;

/// Short enough to wait for.
constexpr long long kSoon = 50 * 1000;

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 300;
  return spec;
}

std::string Token() {
  return HttpAnswer("200 OK", TestSupport::IssueAnswer(SignedToken("valid")));
}

SecurityTokenServiceConfig ConfigFor(const std::string& url) {
  SecurityTokenServiceConfig config;
  config.stsUrl = url;
  config.trustedStsCertificates = TestSupport::TrustedSigner();
  return config;
}

SecurityTokenServiceConfig ConfigFor(const LoopbackServer& server) {
  return ConfigFor("http://" + server.GetEndpoint() + "/sts");
}

std::string Outcome(const std::function<std::string()>& call) {
  try {
    return call();
  } catch (const CommunicationException& error) {
    return std::string("CommunicationException: ") + error.what();
  } catch (const Pelmar::InvalidArgumentException& error) {
    return error.what();
  } catch (const Pelmar::Exception& error) {
    return std::string(typeid(error).name()) + ": " + error.what();
  }
}

std::string Acquire(const SecurityTokenServiceConfig& config, const ServiceOptions& options) {
  return Outcome([&] {
    return CreateSecurityTokenService(config, options)->AcquireToken("alice", "pass-word", Spec())->GetId();
  });
}

std::string Replace(std::string text, const std::string& what, const std::string& by) {
  const std::size_t start = text.find(what);
  return start == std::string::npos ? text : text.replace(start, what.size(), by);
}

// ---- The options themselves ----

TEST(ServiceOptions, StandForAServiceWithoutOptions) {
  const ServiceOptions options;
  EXPECT_EQ(240000000, options.timeoutMicroseconds);
  EXPECT_EQ(240000000, options.connectTimeoutMicroseconds);
  EXPECT_FALSE(options.cancellation);
  EXPECT_EQ(0, options.maxRetries);
  EXPECT_EQ(200000, options.retryDelayMicroseconds);
  EXPECT_EQ(5000000, options.maxRetryDelayMicroseconds);
  EXPECT_EQ("", options.proxyUrl + options.proxyUser + options.proxyPassword + options.userAgent);
}

TEST(ServiceOptions, AreCopied) {
  ServiceOptions original;
  original.timeoutMicroseconds = 1;
  original.connectTimeoutMicroseconds = 2;
  original.cancellation = Pelmar::System::CreateCancellationHandle();
  original.maxRetries = 3;
  original.retryDelayMicroseconds = 4;
  original.maxRetryDelayMicroseconds = 5;
  original.proxyUrl = "http://proxy.test";
  original.proxyUser = "alice";
  original.proxyPassword = "pass-word";
  original.userAgent = "a/1";
  const ServiceOptions copy(original);
  ServiceOptions assigned;
  assigned = copy;
  const ServiceOptions& same = assigned;
  assigned = same;
  for (const ServiceOptions* options : {&copy, &same}) {
    EXPECT_EQ(1, options->timeoutMicroseconds);
    EXPECT_EQ(2, options->connectTimeoutMicroseconds);
    EXPECT_EQ(original.cancellation, options->cancellation);
    EXPECT_EQ(3, options->maxRetries);
    EXPECT_EQ(4, options->retryDelayMicroseconds);
    EXPECT_EQ(5, options->maxRetryDelayMicroseconds);
    EXPECT_EQ("http://proxy.test", options->proxyUrl);
    EXPECT_EQ("alice", options->proxyUser);
    EXPECT_EQ("pass-word", options->proxyPassword);
    EXPECT_EQ("a/1", options->userAgent);
  }
}

TEST(ServiceOptions, SendWhatAServiceWithoutThemSends) {
  LoopbackServer server({AnswerEach({Token()})});
  const auto withoutTimes = [](std::string received) {
    return received.substr(0, received.find("\r\n\r\n"));
  };
  CreateSecurityTokenService(ConfigFor(server))->AcquireToken("alice", "pass-word", Spec());
  EXPECT_EQ("_7f5a64e2", Acquire(ConfigFor(server), ServiceOptions()));
  EXPECT_EQ(withoutTimes(server.GetRecord(0).received), withoutTimes(server.GetRecord(1).received));
}

TEST(ServiceOptions, HaveBounds) {
  const std::string longest = " is not from 1 to 86400000000 microseconds";
  const std::string timeout = "Invalid argument : the operations' time-out" + longest;
  const std::string connect = "Invalid argument : the connect time-out" + longest;
  const std::string retries = "Invalid argument : the number of retries is not from 0 to 10";
  const std::string pause =
      "Invalid argument : the pause before the first retry is not from 1 microsecond to the longest pause";
  const std::string longestPause = "Invalid argument : the longest pause before a retry" + longest;
  const struct {
    std::string outcome;
    std::function<void(ServiceOptions&)> change;
  } cases[] = {
      {timeout,
       [](ServiceOptions& o) {
         o.timeoutMicroseconds = 0;
       }},
      {timeout,
       [](ServiceOptions& o) {
         o.timeoutMicroseconds = -1;
       }},
      {timeout,
       [](ServiceOptions& o) {
         o.timeoutMicroseconds = 86400000001;
       }},
      {"accepted",
       [](ServiceOptions& o) {
         o.timeoutMicroseconds = 86400000000;
       }},
      {"accepted",
       [](ServiceOptions& o) {
         o.timeoutMicroseconds = 1;
       }},
      {connect,
       [](ServiceOptions& o) {
         o.connectTimeoutMicroseconds = 0;
       }},
      {retries,
       [](ServiceOptions& o) {
         o.maxRetries = -1;
       }},
      {retries,
       [](ServiceOptions& o) {
         o.maxRetries = 11;
       }},
      {"accepted",
       [](ServiceOptions& o) {
         o.maxRetries = 10;
       }},
      {pause,
       [](ServiceOptions& o) {
         o.retryDelayMicroseconds = 0;
       }},
      {pause,
       [](ServiceOptions& o) {
         o.retryDelayMicroseconds = 5000001;
       }},
      {"accepted",
       [](ServiceOptions& o) {
         o.retryDelayMicroseconds = 5000000;
       }},
      {longestPause,
       [](ServiceOptions& o) {
         o.maxRetryDelayMicroseconds = 0;
       }},
      {longestPause,
       [](ServiceOptions& o) {
         o.maxRetryDelayMicroseconds = 86400000001;
       }},
      {"accepted",
       [](ServiceOptions& o) {
         o.maxRetryDelayMicroseconds = 86400000000;
       }},
      {"Invalid argument : the proxy's URL is not http:",
       [](ServiceOptions& o) {
         o.proxyUrl = "https://proxy.test";
       }},
      {"Invalid argument : the proxy's user has no proxy",
       [](ServiceOptions& o) {
         o.proxyUser = "alice";
       }},
      {"Invalid argument : the proxy's password has no user",
       [](ServiceOptions& o) {
         o.proxyPassword = "pass-word";
       }},
      {"Invalid argument : the user agent's text has a control character or is not ASCII",
       [](ServiceOptions& o) {
         o.userAgent = "a\r\nInjected: b";
       }},
  };
  for (const auto& c : cases) {
    ServiceOptions options;
    c.change(options);
    EXPECT_EQ(c.outcome, Outcome([&] {
                CreateSecurityTokenService(ConfigFor("http://127.0.0.1:1"), options);
                return "accepted";
              }));
  }
}

TEST(ServiceOptions, DoNotReplaceTheChecksOfTheConfiguration) {
  EXPECT_EQ("Invalid argument : HTTPS connection requested but no SSLContext provided.",
            Acquire(ConfigFor("https://127.0.0.1:1"), ServiceOptions()));
}

TEST(ServiceOptions, TellTheServiceTheUserAgent) {
  LoopbackServer server({AnswerEach({Token()})});
  ServiceOptions options;
  options.userAgent = "Example Portal/2.1";
  EXPECT_EQ("_7f5a64e2", Acquire(ConfigFor(server), options));
  EXPECT_NE(std::string::npos, server.GetRecord(0).received.find("\r\nUser-Agent: Example Portal/2.1\r\n"));
}

TEST(ServiceOptions, GoThroughTheProxyWhateverTheEnvironmentSays) {
  LoopbackServer proxy({AnswerEach({Token()})});
  ServiceOptions options;
  options.proxyUrl = "http://" + proxy.GetEndpoint();
  ::setenv("NO_PROXY", "*", 1);
  ::setenv("http_proxy", "http://127.0.0.1:1", 1);
  const std::string outcome = Acquire(ConfigFor("http://sts.test/sts"), options);
  ::unsetenv("NO_PROXY");
  ::unsetenv("http_proxy");
  EXPECT_EQ("_7f5a64e2", outcome);
  EXPECT_EQ(0U, proxy.GetRecord(0).received.find("POST http://sts.test:80/sts HTTP/1.1\r\n"));
}

// ---- Time-outs ----

TEST(ServiceTimeout, EndsAnOperationThatGetsNoAnswer) {
  LoopbackServer server({&TestSupport::StaySilent});
  ServiceOptions options;
  options.timeoutMicroseconds = kSoon;
  EXPECT_EQ("CommunicationException: The operation took longer than 0.05 s.",
            Acquire(ConfigFor(server), options));
  server.AwaitEnd(0);
}

TEST(ServiceTimeout, IsToldInSeconds) {
  const TestSupport::FullListener listener;
  const struct {
    long long timeout;
    std::string text;
  } cases[] = {{1, "0.000001"}, {1000, "0.001"}, {10200, "0.0102"}};
  for (const auto& c : cases) {
    ServiceOptions options;
    options.timeoutMicroseconds = c.timeout;
    EXPECT_EQ("CommunicationException: The operation took longer than " + c.text + " s.",
              Acquire(ConfigFor("http://127.0.0.1:" + std::to_string(listener.GetPort())), options));
  }
}

/// Sends two messages, and does something between them.
class TwoLegs final : public NegotiationHandler {
 public:
  explicit TwoLegs(const std::function<void()>& between) : _between(between) {}

  boost::shared_ptr<Leg> Negotiate(const Leg& serverLeg) override {
    if (!serverLeg.empty()) {
      _between();
    }
    return boost::make_shared<Leg>(Leg{1});
  }

 private:
  const std::function<void()> _between;
};

std::string Negotiate(const LoopbackServer& server, const ServiceOptions& options,
                      const std::function<void()>& between) {
  TwoLegs handler(between);
  return Outcome([&] {
    return CreateSecurityTokenService(ConfigFor(server), options)
        ->AcquireTokenByGSS(Spec(), handler)
        ->GetId();
  });
}

LoopbackServer::Script AnswerFirstLeg() {
  return [](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send(HttpAnswer("200 OK", TestSupport::ChallengeAnswer("ctx", "challenge")));
    TestSupport::StaySilent(connection);
  };
}

TEST(ServiceTimeout, IsThatOfAllMessagesTogether) {
  LoopbackServer server({AnswerFirstLeg()});
  ServiceOptions options;
  options.timeoutMicroseconds = kSoon;
  EXPECT_EQ("CommunicationException: The operation took longer than 0.05 s.",
            Negotiate(server, options, [] {}));
  server.AwaitEnd(0);
}

TEST(ServiceTimeout, CountsTheTimeOfTheHandler) {
  LoopbackServer server({AnswerFirstLeg()});
  ServiceOptions options;
  options.timeoutMicroseconds = 20 * kSoon;
  EXPECT_EQ("CommunicationException: The operation took longer than 1 s.", Negotiate(server, options, [&] {
              // What the handler does takes all the time there was, and the operation began before it.
              const auto start = std::chrono::steady_clock::now();
              while (std::chrono::steady_clock::now() - start < std::chrono::seconds(1)) {
                std::this_thread::yield();
              }
            }));
  server.AwaitEnd(0);
  EXPECT_EQ(1U, server.GetRecord(0).requests) << "a message was sent after the time";
}

TEST(ServiceTimeout, HasOneForConnecting) {
  const TestSupport::FullListener listener;
  const std::string endpoint = "127.0.0.1:" + std::to_string(listener.GetPort());
  ServiceOptions options;
  options.connectTimeoutMicroseconds = kSoon;
  EXPECT_EQ("CommunicationException: No connection to " + endpoint + " within 0.05 s",
            Acquire(ConfigFor("http://" + endpoint), options));
}

// ---- Retries ----

ServiceOptions Retrying(int maxRetries) {
  ServiceOptions options;
  options.maxRetries = maxRetries;
  options.retryDelayMicroseconds = 1;
  options.maxRetryDelayMicroseconds = 1;
  return options;
}

const TestSupport::Identity& GetCa() {
  static const TestSupport::Identity ca = TestSupport::MakeCa();
  return ca;
}

TestSupport::TlsServerSettings TlsSettings() {
  TestSupport::CertificateSpec spec;
  spec.commonName = "Test server";
  spec.subjectAlternativeName = "IP:127.0.0.1";
  TestSupport::TlsServerSettings settings(TestSupport::MakeIssued(GetCa(), spec));
  settings.startsByScript = true;
  return settings;
}

SecurityTokenServiceConfig TlsConfigFor(
    const LoopbackServer& server,
    const Pelmar::Ssl::SSLContextOptions& identity = Pelmar::Ssl::SSLContextOptions()) {
  SecurityTokenServiceConfig config = ConfigFor("https://" + server.GetEndpoint() + "/sts");
  Pelmar::Ssl::SSLContextOptions tls = identity;
  tls.trustAnchors = TestSupport::Trust({GetCa()});
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  return config;
}

void BreakOff(ServerConnection& connection) {
  connection.ReadSome();
  connection.Reset();
}

void AnswerOverTls(ServerConnection& connection) {
  connection.StartTls();
  AnswerEach({Token()})(connection);
}

TEST(ServiceRetries, AreOffUnlessAskedFor) {
  LoopbackServer server(TlsSettings(), {BreakOff, AnswerOverTls});
  EXPECT_EQ("CommunicationException: PEER reset the connection during the TLS handshake",
            Replace(Acquire(TlsConfigFor(server), ServiceOptions()), server.GetEndpoint(), "PEER"));
  EXPECT_EQ(1U, server.CountConnections());
}

TEST(ServiceRetries, FollowHandshakesThatAreBrokenOff) {
  const TestSupport::LogAction log("Nothing was sent: ", [] {});
  LoopbackServer server(TlsSettings(), {BreakOff, BreakOff, AnswerOverTls});
  EXPECT_EQ("_7f5a64e2", Acquire(TlsConfigFor(server), Retrying(2)));
  EXPECT_EQ(3U, server.CountConnections());
  const std::string line = "64 Nothing was sent: " + server.GetEndpoint() +
                           " reset the connection during the TLS handshake; retry ";
  EXPECT_EQ(std::vector<std::string>({line + "1 follows", line + "2 follows"}), log.GetLines());
}

TEST(ServiceRetries, FollowHandshakesThatTakeTooLong) {
  LoopbackServer server(TlsSettings(),
                        {[](ServerConnection& connection) { connection.AwaitPeerEnd(); }, AnswerOverTls});
  ServiceOptions options = Retrying(1);
  // For the second handshake, which is done in earnest, it must be enough.
  options.connectTimeoutMicroseconds = 20 * kSoon;
  EXPECT_EQ("_7f5a64e2", Acquire(TlsConfigFor(server), options));
  EXPECT_EQ(2U, server.CountConnections());
}

TEST(ServiceRetries, FollowRefusedConnections) {
  TestSupport::ClosedPort port;
  std::unique_ptr<LoopbackServer> server;
  const TestSupport::LogAction log("Nothing was sent: ", [&] {
    if (!server) {
      server =
          std::make_unique<LoopbackServer>(port, std::vector<LoopbackServer::Script>{AnswerEach({Token()})});
    }
  });
  const std::string endpoint = "127.0.0.1:" + std::to_string(port.GetPort());
  EXPECT_EQ("_7f5a64e2", Acquire(ConfigFor("http://" + endpoint), Retrying(10)));
  EXPECT_EQ(std::vector<std::string>{"64 Nothing was sent: Connection refused by " + endpoint +
                                     "; retry 1 follows"},
            log.GetLines());
  EXPECT_EQ(1U, server->CountConnections());
}

TEST(ServiceRetries, HaveAnEnd) {
  LoopbackServer server(TlsSettings(), {BreakOff});
  EXPECT_EQ("CommunicationException: PEER reset the connection during the TLS handshake",
            Replace(Acquire(TlsConfigFor(server), Retrying(10)), server.GetEndpoint(), "PEER"));
  EXPECT_EQ(11U, server.CountConnections());
}

TEST(ServiceRetries, FollowNothingThatMayHaveBeenProcessed) {
  const LoopbackServer::Script scripts[] = {
      [](ServerConnection& connection) {
        connection.StartTls();
        connection.ReadRequest();
        connection.Reset();
      },
      [](ServerConnection& connection) {
        connection.StartTls();
        connection.Close();
      },
      [](ServerConnection& connection) {
        connection.StartTls();
        AnswerEach({HttpAnswer("503 Service Unavailable", "")})(connection);
      },
      [](ServerConnection& connection) {
        connection.StartTls();
        connection.ReadRequest();
        connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\n<a");
        connection.Close();
      },
  };
  for (const LoopbackServer::Script& script : scripts) {
    LoopbackServer server(TlsSettings(), {script});
    const std::string outcome = Acquire(TlsConfigFor(server), Retrying(10));
    EXPECT_EQ(0U, outcome.find("CommunicationException: ")) << outcome;
    EXPECT_EQ(1U, server.CountConnections()) << outcome;
  }
}

TEST(ServiceRetries, FollowNoServerThatIsNotTrusted) {
  LoopbackServer server(TlsSettings(), {AnswerOverTls});
  SecurityTokenServiceConfig config = TlsConfigFor(server);
  config.sslContext = Pelmar::Ssl::CreateSSLContext(Pelmar::Ssl::SSLContextOptions());
  EXPECT_EQ("CommunicationException: Certificate of 127.0.0.1 is not trusted: issuer CN=Test CA",
            Acquire(config, Retrying(10)));
  EXPECT_EQ(1U, server.CountConnections());
}

TEST(ServiceRetries, AreNotWaitedForBeyondTheTimeOut) {
  const TestSupport::ClosedPort port;
  const std::string endpoint = "127.0.0.1:" + std::to_string(port.GetPort());
  const TestSupport::LogAction log("Nothing was sent: ", [] {});
  ServiceOptions options;
  options.maxRetries = 10;
  options.retryDelayMicroseconds = options.timeoutMicroseconds;
  options.maxRetryDelayMicroseconds = options.timeoutMicroseconds;
  EXPECT_EQ("CommunicationException: Connection refused by " + endpoint,
            Acquire(ConfigFor("http://" + endpoint), options));
  EXPECT_TRUE(log.GetLines().empty());
}

TEST(ServiceRetries, HappenInTheMiddleOfANegotiation) {
  const std::string first =
      HttpAnswer("200 OK", TestSupport::ChallengeAnswer("ctx", "challenge"), "Connection: close\r\n");
  const std::string last = HttpAnswer("200 OK", TestSupport::FinalAnswer("ctx", "", SignedToken("valid")));
  LoopbackServer server(TlsSettings(), {[&](ServerConnection& connection) {
                                          connection.StartTls();
                                          AnswerEach({first})(connection);
                                        },
                                        BreakOff,
                                        [&](ServerConnection& connection) {
                                          connection.StartTls();
                                          AnswerEach({last})(connection);
                                        }});
  int legs = 0;
  TwoLegs handler([&] { ++legs; });
  const TestSupport::MetricsRecording recording;
  EXPECT_EQ("_7f5a64e2", Outcome([&] {
              return CreateSecurityTokenService(TlsConfigFor(server), Retrying(1))
                  ->AcquireTokenByGSS(Spec(), handler)
                  ->GetId();
            }));
  EXPECT_EQ(1, legs) << "the handler is not asked again for a message that is sent again";
  EXPECT_EQ(std::vector<std::string>{"AcquireTokenByGSS success 2"}, recording.metrics->GetLines());
  EXPECT_EQ(3U, server.CountConnections());
}

TEST(ServiceRetries, AreCountedAsAttemptsOfTheOperation) {
  const TestSupport::MetricsRecording recording;
  LoopbackServer broken(TlsSettings(), {BreakOff});
  Acquire(TlsConfigFor(broken), Retrying(2));
  LoopbackServer late(TlsSettings(), {BreakOff, AnswerOverTls});
  Acquire(TlsConfigFor(late), Retrying(2));
  LoopbackServer prompt(TlsSettings(), {AnswerOverTls});
  Acquire(TlsConfigFor(prompt), Retrying(2));
  EXPECT_EQ(std::vector<std::string>(
                {"AcquireToken communication 3", "AcquireToken success 2", "AcquireToken success 1"}),
            recording.metrics->GetLines());
}

TEST(ServiceRetries, PauseLongerEachTimeUpToALimit) {
  SessionSettings settings = {};
  settings.retryDelayMicroseconds = 200000;
  settings.maxRetryDelayMicroseconds = 5000000;
  const std::vector<long long> expected = {200000, 400000, 800000, 1600000, 3200000, 5000000, 5000000};
  for (std::size_t i = 0; i < expected.size(); ++i) {
    EXPECT_EQ(expected[i], GetRetryDelay(settings, static_cast<int>(i)));
  }
  EXPECT_EQ(5000000, GetRetryDelay(settings, std::numeric_limits<int>::max()));
  settings.retryDelayMicroseconds = kMaxOperationMicroseconds;
  settings.maxRetryDelayMicroseconds = kMaxOperationMicroseconds;
  EXPECT_EQ(kMaxOperationMicroseconds, GetRetryDelay(settings, kMaxRetries));
}

// ---- Mutual TLS ----

TestSupport::Identity MakeClient(const TestSupport::Identity& issuer) {
  TestSupport::CertificateSpec spec;
  spec.commonName = "Client";
  spec.extendedKeyUsage = "clientAuth";
  return TestSupport::MakeIssued(issuer, spec);
}

Pelmar::Ssl::SSLContextOptions As(const TestSupport::Identity& client) {
  Pelmar::Ssl::SSLContextOptions options;
  options.clientKey = client.GetKey();
  options.clientCertificate = client.certificate;
  return options;
}

TEST(ServiceMutualTls, ShowsTheCertificateOfTheSslContext) {
  TestSupport::TlsServerSettings settings = TlsSettings();
  settings.clientCa = GetCa();
  LoopbackServer server(settings, {AnswerOverTls});
  EXPECT_EQ("_7f5a64e2", Acquire(TlsConfigFor(server, As(MakeClient(GetCa()))), ServiceOptions()));
}

TEST(ServiceMutualTls, TellsThatTheServiceDemandsACertificate) {
  TestSupport::TlsServerSettings settings = TlsSettings();
  settings.clientCa = GetCa();
  LoopbackServer server(settings, {AnswerOverTls});
  // Retries do not help, and are not tried.
  EXPECT_EQ("CommunicationException: PEER demands a client certificate",
            Replace(Acquire(TlsConfigFor(server), Retrying(10)), server.GetEndpoint(), "PEER"));
  EXPECT_EQ(1U, server.CountConnections());
}

TEST(ServiceMutualTls, TellsThatTheServiceRefusesTheCertificate) {
  TestSupport::TlsServerSettings settings = TlsSettings();
  settings.clientCa = GetCa();
  LoopbackServer server(settings, {AnswerOverTls});
  const TestSupport::Identity stranger = MakeClient(TestSupport::MakeCa("Another CA", 2));
  EXPECT_EQ(
      "CommunicationException: PEER refused the client certificate: unknown CA",
      Replace(Acquire(TlsConfigFor(server, As(stranger)), ServiceOptions()), server.GetEndpoint(), "PEER"));
}

TEST(ServiceMutualTls, GoesThroughAProxy) {
  TestSupport::TlsServerSettings settings = TlsSettings();
  settings.clientCa = GetCa();
  LoopbackServer proxy(settings, {[](ServerConnection& connection) {
                         connection.ReadRequest();
                         connection.Send("HTTP/1.1 200 Connection established\r\n\r\n");
                         AnswerOverTls(connection);
                       }});
  ServiceOptions options;
  options.proxyUrl = "http://" + proxy.GetEndpoint();
  SecurityTokenServiceConfig config = TlsConfigFor(proxy, As(MakeClient(GetCa())));
  config.stsUrl = "https://127.0.0.1:1/sts";
  EXPECT_EQ("_7f5a64e2", Acquire(config, options));
}

}  // namespace
}  // namespace Quorlin
