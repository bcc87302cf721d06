// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// Operations that are cancelled, at every stage that they can be in.

#include <pelmar/system/CancellationHandle.h>
#include <quorlin/quorlin.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <cstddef>
#include <filesystem>
#include <functional>
#include <future>
#include <iterator>
#include <string>
#include <typeinfo>
#include <vector>

#include "quorlin/OptionsTransport.h"
#include "support/CompletionProbe.h"
#include "support/FakeSamlToken.h"
#include "support/FakeService.h"
#include "support/HttpScripts.h"
#include "support/LogAction.h"
#include "support/LoopbackServer.h"
#include "support/Pki.h"
#include "support/ScriptedNegotiationHandler.h"
#include "support/ServiceAnswers.h"
#include "support/SlowResolver.h"

namespace Quorlin {
namespace {

using Pelmar::Ref;
using Pelmar::System::CancellationHandle;
using Pelmar::System::CreateCancellationHandle;
using TestSupport::AnswerEach;
using TestSupport::HttpAnswer;
using TestSupport::LoopbackServer;
using TestSupport::ServerConnection;
using TestSupport::SignedToken;

const std::string kCancelled = "CommunicationException: The operation was cancelled.";

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 300;
  return spec;
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

SecurityTokenServiceConfig TlsConfigFor(const std::string& endpoint) {
  SecurityTokenServiceConfig config = ConfigFor("https://" + endpoint + "/sts");
  config.sslContext = Pelmar::Ssl::CreateSSLContext(Pelmar::Ssl::SSLContextOptions());
  return config;
}

ServiceOptions OptionsWith(const Ref<CancellationHandle>& cancellation) {
  ServiceOptions options;
  options.cancellation = cancellation;
  return options;
}

std::string Outcome(const std::function<std::string()>& call) {
  try {
    return call();
  } catch (const CommunicationException& error) {
    return std::string("CommunicationException: ") + error.what();
  } catch (const Pelmar::Exception& error) {
    return std::string(typeid(error).name()) + ": " + error.what();
  }
}

std::string Acquire(const SecurityTokenService& service, const std::string& password = "pass-word") {
  return Outcome([&] { return service.AcquireToken("alice", password, Spec())->GetId(); });
}

/// A call on a thread of its own, and the handle that ends it.
class RunningCall final {
 public:
  RunningCall(const SecurityTokenServiceConfig& config, ServiceOptions options = ServiceOptions(),
              const std::string& password = "pass-word")
      : _handle(CreateCancellationHandle()) {
    options.cancellation = _handle;
    const boost::shared_ptr<SecurityTokenService> service = CreateSecurityTokenService(config, options);
    _outcome = std::async(std::launch::async, [service, password] { return Acquire(*service, password); });
  }

  std::string CancelAndWait() {
    _handle->Cancel();
    return _outcome.get();
  }

 private:
  const Ref<CancellationHandle> _handle;
  std::future<std::string> _outcome;
};

/// Something that happens once, and that others wait for.
class Event final {
 public:
  Event() : _happened(_promise.get_future()) {}
  void Happen() { _promise.set_value(); }
  void Await() { _happened.wait(); }

 private:
  std::promise<void> _promise;
  std::future<void> _happened;
};

// ---- Before anything is sent ----

TEST(ServiceCancellation, EndsEveryOperationBeforeItStarts) {
  LoopbackServer server({AnswerEach({})});
  TestSupport::CertificateSpec certificate;
  certificate.commonName = "Client";
  const TestSupport::Identity client = TestSupport::MakeSelfSigned(certificate);
  SecurityTokenServiceConfig config = ConfigFor(server);
  config.holderOfKeyConfig = HolderOfKeyConfig{client.GetKey(), client.certificate};
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(config, OptionsWith(handle));
  handle->Cancel();

  const TestSupport::FakeSamlToken token;
  TestSupport::ScriptedNegotiationHandler handler;
  const std::function<void()> calls[] = {
      [&] { service->AcquireToken("alice", "pass-word", Spec()); },
      [&] { service->AcquireTokenByGSS(Spec(), handler); },
      [&] { service->AcquireTokenByCertificate(Spec()); },
      [&] { service->AcquireTokenByToken(token, Spec()); },
      [&] { service->ValidateSubject(token); },
      [&] { service->RenewToken(token, 600); },
  };
  for (const std::function<void()>& call : calls) {
    EXPECT_EQ(kCancelled, Outcome([&call] {
                call();
                return "it succeeded";
              }));
  }
  EXPECT_TRUE(handler.GetServerLegs().empty()) << "the handler was asked for a message";
  EXPECT_EQ(0U, server.CountConnections());
}

TEST(ServiceCancellation, LeavesErrorsOfTheArgumentsAsTheyAre) {
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  handle->Cancel();
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor("http://127.0.0.1:1"), OptionsWith(handle));
  EXPECT_THROW(service->AcquireToken("alice", "pass-word", TokenSpec()), Pelmar::InvalidArgumentException);
}

// ---- On the way ----

TEST(ServiceCancellation, EndsTheNameLookUp) {
  TestSupport::SlowResolver resolver;
  RunningCall call(ConfigFor("http://" + std::string(TestSupport::kSlowHost) + "/sts"));
  resolver.AwaitLookUp();
  EXPECT_EQ(kCancelled, call.CancelAndWait());
  // The look-up itself goes on, and holds up nobody else.
  const TestSupport::ClosedPort port;
  const std::string endpoint = "127.0.0.1:" + std::to_string(port.GetPort());
  EXPECT_EQ("CommunicationException: Connection refused by " + endpoint,
            Acquire(*CreateSecurityTokenService(ConfigFor("http://" + endpoint + "/sts"))));
}

TEST(ServiceCancellation, EndsConnecting) {
  TestSupport::FullListener listener;
  RunningCall call(ConfigFor("http://127.0.0.1:" + std::to_string(listener.GetPort()) + "/sts"));
  listener.AwaitAttempt();
  EXPECT_EQ(kCancelled, call.CancelAndWait());
}

TEST(ServiceCancellation, EndsTheTlsHandshake) {
  Event greeted;
  LoopbackServer server({[&](ServerConnection& connection) {
    connection.ReadSome();
    greeted.Happen();
    connection.AwaitPeerEnd();
  }});
  RunningCall call(TlsConfigFor(server.GetEndpoint()));
  greeted.Await();
  EXPECT_EQ(kCancelled, call.CancelAndWait());
  server.AwaitEnd(0);
}

TEST(ServiceCancellation, EndsTheWaitForTheProxy) {
  LoopbackServer proxy({&TestSupport::StaySilent});
  ServiceOptions options;
  options.proxyUrl = "http://" + proxy.GetEndpoint();
  RunningCall call(TlsConfigFor("sts.test"), options);
  proxy.AwaitRequests(1);
  EXPECT_EQ(kCancelled, call.CancelAndWait());
  proxy.AwaitEnd(0);
}

TEST(ServiceCancellation, EndsSending) {
  // More than the buffers between the two take.
  constexpr std::size_t kBytes = 24 * 1024 * 1024;
  Event started;
  LoopbackServer server({[&](ServerConnection& connection) {
    connection.ReadSome();
    started.Happen();
    connection.AwaitRelease();
    connection.AwaitPeerEnd();
  }});
  RunningCall call(ConfigFor(server), ServiceOptions(), std::string(kBytes, 'x'));
  started.Await();
  EXPECT_EQ(kCancelled, call.CancelAndWait());
  server.Release();
  server.AwaitEnd(0);
  EXPECT_LT(server.GetRecord(0).received.size(), kBytes);
}

TEST(ServiceCancellation, EndsTheWaitForTheAnswer) {
  LoopbackServer server({&TestSupport::StaySilent});
  RunningCall call(ConfigFor(server));
  server.AwaitRequests(1);
  EXPECT_EQ(kCancelled, call.CancelAndWait());
  server.AwaitEnd(0);
}

TEST(ServiceCancellation, EndsInsideTheHead) {
  Event begun;
  LoopbackServer server({[&](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n");
    begun.Happen();
    connection.AwaitPeerEnd();
  }});
  RunningCall call(ConfigFor(server));
  begun.Await();
  EXPECT_EQ(kCancelled, call.CancelAndWait());
  server.AwaitEnd(0);
}

TEST(ServiceCancellation, EndsInsideTheBody) {
  Event begun;
  LoopbackServer server({[&](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\n<a");
    begun.Happen();
    connection.AwaitPeerEnd();
  }});
  RunningCall call(ConfigFor(server));
  begun.Await();
  EXPECT_EQ(kCancelled, call.CancelAndWait());
  server.AwaitEnd(0);
}

// ---- Negotiations ----

/// Does something of the test's when it is asked for its second message.
class InterruptingHandler final : public NegotiationHandler {
 public:
  explicit InterruptingHandler(const std::function<void()>& interrupt) : _interrupt(interrupt) {}

  boost::shared_ptr<Leg> Negotiate(const Leg& serverLeg) override {
    if (!serverLeg.empty()) {
      _interrupt();
    }
    return boost::make_shared<Leg>(Leg{1});
  }

 private:
  const std::function<void()> _interrupt;
};

std::string Negotiate(const SecurityTokenService& service, const std::function<void()>& interrupt) {
  InterruptingHandler handler(interrupt);
  return Outcome([&] { return service.AcquireTokenByGSS(Spec(), handler)->GetId(); });
}

LoopbackServer::Script AnswerFirstLeg() {
  return [](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send(HttpAnswer("200 OK", TestSupport::ChallengeAnswer("ctx", "challenge")));
    TestSupport::StaySilent(connection);
  };
}

TEST(ServiceCancellation, EndsANegotiationBetweenItsMessages) {
  LoopbackServer server({AnswerFirstLeg()});
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor(server), OptionsWith(handle));
  EXPECT_EQ(kCancelled, Negotiate(*service, [&] { handle->Cancel(); }));
  server.AwaitEnd(0);
  EXPECT_EQ(1U, server.GetRecord(0).requests);
}

TEST(ServiceCancellation, EndsTheWaitForALaterMessage) {
  LoopbackServer server({AnswerFirstLeg()});
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor(server), OptionsWith(handle));
  std::future<std::string> outcome =
      std::async(std::launch::async, [&] { return Negotiate(*service, [] {}); });
  server.AwaitRequests(2);
  handle->Cancel();
  EXPECT_EQ(kCancelled, outcome.get());
  server.AwaitEnd(0);
}

// ---- Before a retry ----

ServiceOptions PatientOptions() {
  ServiceOptions options;
  options.timeoutMicroseconds = kMaxOperationMicroseconds;
  options.maxRetries = 1;
  options.retryDelayMicroseconds = kMaxOperationMicroseconds / 2;
  options.maxRetryDelayMicroseconds = kMaxOperationMicroseconds;
  return options;
}

TEST(ServiceCancellation, EndsThePauseBeforeARetry) {
  const TestSupport::ClosedPort port;
  Event paused;
  const TestSupport::LogAction action("Nothing was sent: ", [&] { paused.Happen(); });
  RunningCall call(ConfigFor("http://127.0.0.1:" + std::to_string(port.GetPort())), PatientOptions());
  paused.Await();
  EXPECT_EQ(kCancelled, call.CancelAndWait());
  EXPECT_EQ(1U, action.GetLines().size());
}

TEST(ServiceCancellation, EndsThePauseBeforeItHasBegun) {
  const TestSupport::ClosedPort port;
  ServiceOptions options = PatientOptions();
  options.cancellation = CreateCancellationHandle();
  const TestSupport::LogAction action("Nothing was sent: ", [&] { options.cancellation->Cancel(); });
  EXPECT_EQ(kCancelled, Acquire(*CreateSecurityTokenService(
                            ConfigFor("http://127.0.0.1:" + std::to_string(port.GetPort())), options)));
}

// ---- One handle, many calls ----

TEST(ServiceCancellation, EndsAllCallsAndThoseThatComeLater) {
  constexpr std::size_t kCalls = 32;
  LoopbackServer server({&TestSupport::StaySilent});
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor(server), OptionsWith(handle));
  std::vector<std::future<std::string>> outcomes;
  for (std::size_t i = 0; i < kCalls; ++i) {
    outcomes.push_back(std::async(std::launch::async, [&] { return Acquire(*service); }));
  }
  server.AwaitRequests(kCalls);
  handle->Cancel();
  for (std::future<std::string>& outcome : outcomes) {
    EXPECT_EQ(kCancelled, outcome.get());
  }
  EXPECT_EQ(kCancelled, Acquire(*service));
  EXPECT_EQ(kCalls, server.CountConnections());
}

TEST(ServiceCancellation, LeavesNoDescriptorOpen) {
  constexpr std::ptrdiff_t kCalls = 32;
  // The loop closes what it needs for a session beside the connection a moment after that.
  constexpr std::ptrdiff_t kStillClosing = 16;
  LoopbackServer server({&TestSupport::StaySilent});
  const auto run = [&server](std::ptrdiff_t calls) {
    const std::size_t before = server.CountConnections();
    for (std::size_t i = before; i < before + static_cast<std::size_t>(calls); ++i) {
      RunningCall call(ConfigFor(server));
      server.AwaitRequests(i + 1);
      EXPECT_EQ(kCancelled, call.CancelAndWait());
      server.AwaitEnd(i);
    }
    const std::filesystem::directory_iterator descriptors("/proc/self/fd");
    return std::distance(begin(descriptors), end(descriptors));
  };
  const auto first = run(1);  // What stays open from now on belongs to the platform's threads.
  EXPECT_LT(run(kCalls), first + kStillClosing);
}

TEST(ServiceCancellation, LeavesACallAloneThatIsOver) {
  LoopbackServer server({AnswerEach({HttpAnswer("200 OK", TestSupport::IssueAnswer(SignedToken("valid")))})});
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor(server), OptionsWith(handle));
  EXPECT_EQ("_7f5a64e2", Acquire(*service));
  service.reset();
  handle->Cancel();
}

TEST(ServiceCancellation, MayBeReleasedWhileCallsRun) {
  LoopbackServer server({[](ServerConnection& connection) {
    connection.ReadRequest();
    connection.AwaitRelease();
    connection.Send(HttpAnswer("200 OK", TestSupport::IssueAnswer(SignedToken("valid"))));
    connection.Close();
  }});
  Ref<CancellationHandle> handle = CreateCancellationHandle();
  boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor(server), OptionsWith(handle));
  TestSupport::CompletionProbe<boost::shared_ptr<const SamlToken>> probe;
  service->AcquireTokenAsync("alice", "pass-word", Spec(), probe.GetFunction());
  service.reset();
  handle = nullptr;
  server.AwaitRequests(1);
  server.Release();
  const auto calls = probe.Wait();
  ASSERT_EQ(1U, calls.size());
  EXPECT_EQ("_7f5a64e2", calls[0].value->GetId());
}

TEST(ServiceCancellation, EndsAsynchronousOperations) {
  LoopbackServer server({&TestSupport::StaySilent});
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor(server), OptionsWith(handle));
  TestSupport::CompletionProbe<boost::shared_ptr<const SamlToken>> probe;
  service->AcquireTokenAsync("alice", "pass-word", Spec(), probe.GetFunction());
  server.AwaitRequests(1);
  handle->Cancel();
  const auto calls = probe.Wait();
  ASSERT_EQ(1U, calls.size());
  EXPECT_FALSE(calls[0].value);
  EXPECT_TRUE(typeid(*calls[0].error) == typeid(CommunicationException));
  EXPECT_STREQ("The operation was cancelled.", calls[0].error->what());
}

TEST(ServiceCancellation, RacesWithAnswers) {
  constexpr int kCalls = 100;
  LoopbackServer server({AnswerEach({HttpAnswer("200 OK", TestSupport::IssueAnswer(SignedToken("valid")))})});
  for (int i = 0; i < kCalls; ++i) {
    RunningCall call(ConfigFor(server));
    const std::string outcome = call.CancelAndWait();
    EXPECT_TRUE(outcome == kCancelled || outcome == "_7f5a64e2") << outcome;
  }
}

// ---- A handle for each call ----

TEST(CancellableService, EndsItsOwnCallsOnly) {
  LoopbackServer server({&TestSupport::StaySilent, [](ServerConnection& connection) {
                           connection.ReadRequest();
                           connection.AwaitRelease();
                           connection.Send(
                               HttpAnswer("200 OK", TestSupport::IssueAnswer(SignedToken("valid"))));
                           connection.Close();
                         }});
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor(server), ServiceOptions());
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const boost::shared_ptr<SecurityTokenService> cancellable = CreateCancellableService(*service, handle);
  std::future<std::string> cancelled = std::async(std::launch::async, [&] { return Acquire(*cancellable); });
  server.AwaitRequests(1);
  std::future<std::string> other = std::async(std::launch::async, [&] { return Acquire(*service); });
  server.AwaitRequests(2);
  handle->Cancel();
  EXPECT_EQ(kCancelled, cancelled.get());
  server.Release();
  EXPECT_EQ("_7f5a64e2", other.get());
}

TEST(CancellableService, IsStillEndedByTheOptionsHandle) {
  LoopbackServer server({&TestSupport::StaySilent});
  const Ref<CancellationHandle> all = CreateCancellationHandle();
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor(server), OptionsWith(all));
  const boost::shared_ptr<SecurityTokenService> once =
      CreateCancellableService(*service, CreateCancellationHandle());
  const boost::shared_ptr<SecurityTokenService> twice =
      CreateCancellableService(*once, CreateCancellationHandle());
  std::future<std::string> outcome = std::async(std::launch::async, [&] { return Acquire(*twice); });
  server.AwaitRequests(1);
  all->Cancel();
  EXPECT_EQ(kCancelled, outcome.get());
}

TEST(CancellableService, NeedsAServiceWithOptionsAndAHandle) {
  const SecurityTokenServiceConfig config = ConfigFor("http://127.0.0.1:1");
  const auto refusal = [](const SecurityTokenService& service, const Ref<CancellationHandle>& handle) {
    return Outcome([&] {
      CreateCancellableService(service, handle);
      return "accepted";
    });
  };
  const std::string type = typeid(Pelmar::InvalidArgumentException).name();
  const boost::shared_ptr<SecurityTokenService> without = CreateSecurityTokenService(config);
  const std::string noOptions = type + ": Invalid argument : the service was made without options";
  EXPECT_EQ(noOptions, refusal(*without, CreateCancellationHandle()));
  EXPECT_EQ(noOptions, refusal(*TestSupport::FakeService().service, CreateCancellationHandle()));
  const boost::shared_ptr<SecurityTokenService> with = CreateSecurityTokenService(config, ServiceOptions());
  EXPECT_EQ(type + ": Invalid argument : there is no handle that could cancel", refusal(*with, nullptr));
}

// ---- The transport's asynchronous form ----

TEST(OptionsSession, CancelsAsynchronousExchanges) {
  LoopbackServer server({&TestSupport::StaySilent});
  const Ref<CancellationHandle> handle = CreateCancellationHandle();
  const OptionsTransport transport(ConfigFor(server), OptionsWith(handle));
  const boost::shared_ptr<TransportSession> session = transport.CreateSession();
  std::promise<std::string> outcome;
  Ref<Pelmar::System::ScheduledItem> item;
  session->SendRequestAsync(
      Request(),
      [&](const Pelmar::Exception* failure, Pelmar::Reader*) {
        outcome.set_value(failure == nullptr ? "answered" : failure->what());
      },
      item);
  server.AwaitRequests(1);
  handle->Cancel();
  EXPECT_EQ("The operation was cancelled.", outcome.get_future().get());
  EXPECT_TRUE(item->Wait(0));
}

}  // namespace
}  // namespace Quorlin
