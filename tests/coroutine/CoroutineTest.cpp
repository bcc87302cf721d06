// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/system/CancellationHandle.h>
#include <quorlin/Coroutine.h>
#include <quorlin/ServiceOptions.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>
#include <boost/weak_ptr.hpp>

#include <chrono>
#include <coroutine>
#include <exception>
#include <functional>
#include <future>
#include <latch>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <stop_token>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "support/FakeService.h"
#include "support/LoopbackServer.h"
#include "support/ManualService.h"
#include "support/RecordingLogSink.h"
#include "support/RecordingMetrics.h"
#include "support/ServiceAnswers.h"

namespace Quorlin {
namespace {

using TestSupport::FakeService;
using TestSupport::ManualService;
using Lines = std::vector<std::string>;

const char* const kCancelled = "CommunicationException: The operation was cancelled.";

/// What the coroutines of a test did, and on which threads.
class Story {
 public:
  Story() : _gone(std::make_shared<std::promise<void>>()), _isGone(_gone->get_future()) {}

  void Tell(const std::string& line) {
    const std::lock_guard<std::mutex> lock(_mutex);
    _lines.push_back(line);
    _thread = std::this_thread::get_id();
  }
  Lines GetLines() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _lines;
  }
  std::thread::id GetThread() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _thread;
  }

  /// To be kept in a coroutine's frame; tells when the frame is gone.
  std::shared_ptr<void> MakeWitness() {
    return std::shared_ptr<void>(nullptr, [gone = _gone](void*) { gone->set_value(); });
  }
  /// Blocks until the frame is gone.
  void AwaitEnd() { _isGone.wait(); }
  bool IsOver() const { return _isGone.wait_for(std::chrono::seconds(0)) == std::future_status::ready; }

 private:
  mutable std::mutex _mutex;
  Lines _lines;
  std::thread::id _thread;
  const std::shared_ptr<std::promise<void>> _gone;
  const std::future<void> _isGone;
};

/// A coroutine that nobody waits for: it runs at once and destroys itself at its end. Until then its handle
/// destroys it.
struct Detached {
  struct promise_type {
    Detached get_return_object() { return {std::coroutine_handle<promise_type>::from_promise(*this)}; }
    std::suspend_never initial_suspend() noexcept { return {}; }
    std::suspend_never final_suspend() noexcept { return {}; }
    void return_void() {}
    void unhandled_exception() { std::terminate(); }
  };

  std::coroutine_handle<> handle;
};

// What was thrown, with its class.
std::string DescribeCurrent() {
  try {
    throw;
  } catch (const InvalidCredentialsException& error) {
    return std::string("InvalidCredentialsException: ") + error.what();
  } catch (const CommunicationException& error) {
    return std::string("CommunicationException: ") + error.what();
  } catch (const InvalidSignatureException& error) {
    return std::string("InvalidSignatureException: ") + error.what();
  } catch (const Pelmar::InvalidArgumentException& error) {
    return std::string("InvalidArgumentException: ") + error.what();
  } catch (const Pelmar::Exception& error) {
    return std::string("Exception: ") + error.what();
  } catch (const std::future_error& error) {
    return error.code() == std::future_errc::broken_promise ? "broken promise" : "another future_error";
  }
}

std::string Print(bool isValid) {
  return isValid ? "true" : "false";
}

std::string Print(const boost::shared_ptr<const SamlToken>& token) {
  return token ? token->GetId() : "null";
}

/// Awaits what `make` makes, once, and tells how that ended.
template <typename Make>
Detached Await(Story& story, Make make, [[maybe_unused]] std::shared_ptr<void> witness) {
  std::string line;
  try {
    line = Print(co_await make());
  } catch (...) {
    line = DescribeCurrent();
  }
  story.Tell(line);
}

template <typename Make>
Detached Await(Story& story, Make make) {
  return Await(story, std::move(make), story.MakeWitness());
}

boost::shared_ptr<const SamlToken> AnyToken() {
  static const FakeService fake;
  return fake.token;
}

/// A service, and a coroutine that awaits a validation by it.
class Waiting {
 public:
  Waiting() : service(boost::make_shared<ManualService>()) {}

  Detached Start() {
    return Await(story, [this] { return Coroutine::ValidateSubject(service, AnyToken(), stop.get_token()); });
  }

  const boost::shared_ptr<ManualService> service;
  std::stop_source stop;
  Story story;
};

// ---- The six operations ----

using TokenOperation = Coroutine::Operation<boost::shared_ptr<const SamlToken>>;

struct TokenCase {
  std::string started;
  std::function<TokenOperation(const Coroutine::Service&, const FakeService&)> make;
};

std::vector<TokenCase> TokenCases() {
  const std::string id = "_token-id-not-for-logs";
  return {
      {"AcquireToken|alice|pass-word|300",
       [](const Coroutine::Service& s, const FakeService& f) {
         return Coroutine::AcquireToken(s, "alice", "pass-word", f.spec);
       }},
      {"AcquireTokenByGSS|300|handler",
       [](const Coroutine::Service& s, const FakeService& f) {
         return Coroutine::AcquireTokenByGSS(s, f.spec, f.handler);
       }},
      {"AcquireTokenByCertificate|300",
       [](const Coroutine::Service& s, const FakeService& f) {
         return Coroutine::AcquireTokenByCertificate(s, f.spec);
       }},
      {"AcquireTokenByToken|" + id + "|300",
       [](const Coroutine::Service& s, const FakeService& f) {
         return Coroutine::AcquireTokenByToken(s, f.token, f.spec);
       }},
      {"RenewToken|" + id + "|600",
       [](const Coroutine::Service& s, const FakeService& f) {
         return Coroutine::RenewToken(s, f.token, 600);
       }},
  };
}

TEST(Coroutine, StartsTheOperationWithItsArgumentsWhenItIsAwaited) {
  const FakeService arguments;
  for (const TokenCase& test : TokenCases()) {
    const auto service = boost::make_shared<ManualService>();
    {
      const TokenOperation operation = test.make(service, arguments);
      EXPECT_EQ(Lines(), service->GetStarted());
    }
    Story story;
    Await(story, [&] { return test.make(service, arguments); });
    EXPECT_EQ(Lines({test.started}), service->GetStarted());
    EXPECT_EQ(Lines(), story.GetLines()) << test.started;
    service->TakeToken().clear();
  }
}

TEST(Coroutine, GoesOnWithTheToken) {
  const FakeService arguments;
  for (const TokenCase& test : TokenCases()) {
    const auto service = boost::make_shared<ManualService>();
    Story story;
    Await(story, [&] { return test.make(service, arguments); });
    service->TakeToken()(arguments.token, nullptr);
    EXPECT_EQ(Lines({"_token-id-not-for-logs"}), story.GetLines()) << test.started;
    EXPECT_TRUE(story.IsOver());
  }
}

TEST(Coroutine, GoesOnWithTheExceptionAsItsOwnClass) {
  const FakeService arguments;
  for (const TokenCase& test : TokenCases()) {
    const auto service = boost::make_shared<ManualService>();
    Story story;
    Await(story, [&] { return test.make(service, arguments); });
    {
      // Valid during the call only.
      const InvalidCredentialsException error("Authentication failed: No");
      service->TakeToken()(boost::shared_ptr<const SamlToken>(), &error);
    }
    EXPECT_EQ(Lines({"InvalidCredentialsException: Authentication failed: No"}), story.GetLines())
        << test.started;
  }
}

TEST(Coroutine, GoesOnWhenTheOperationIsGivenUp) {
  const FakeService arguments;
  for (const TokenCase& test : TokenCases()) {
    const auto service = boost::make_shared<ManualService>();
    Story story;
    Await(story, [&] { return test.make(service, arguments); });
    service->TakeToken().clear();
    EXPECT_EQ(Lines({"broken promise"}), story.GetLines()) << test.started;
  }
}

TEST(Coroutine, GoesOnWithTheVerdict) {
  for (const bool verdict : {true, false}) {
    Waiting waiting;
    waiting.Start();
    EXPECT_EQ(Lines({"ValidateSubject|_token-id-not-for-logs"}), waiting.service->GetStarted());
    waiting.service->TakeValidation()(verdict, nullptr);
    EXPECT_EQ(Lines({Print(verdict)}), waiting.story.GetLines());
  }
}

// ---- Ends that come early ----

TEST(Coroutine, IsNotSuspendedWhenTheOperationEndsBeforeItsStartReturns) {
  Waiting waiting;
  waiting.service->SetOnValidation([](const ValidationCompletion& done) { done(true, nullptr); });
  waiting.Start();
  EXPECT_EQ(Lines({"true"}), waiting.story.GetLines());
  EXPECT_EQ(std::this_thread::get_id(), waiting.story.GetThread());
}

TEST(Coroutine, GoesOnOnItsOwnThreadWhenAnotherEndsTheOperationDuringItsStart) {
  Waiting waiting;
  waiting.service->SetOnValidation(
      [](const ValidationCompletion& done) { std::thread([&done] { done(true, nullptr); }).join(); });
  waiting.Start();
  EXPECT_EQ(Lines({"true"}), waiting.story.GetLines());
  EXPECT_EQ(std::this_thread::get_id(), waiting.story.GetThread());
}

TEST(Coroutine, GetsTheExceptionOfAnOperationThatCannotBeStarted) {
  Waiting waiting;
  waiting.service->SetOnValidation([](const ValidationCompletion&) { throw Pelmar::Exception("no thread"); });
  waiting.Start();
  EXPECT_EQ(Lines({"Exception: no thread"}), waiting.story.GetLines());
}

// The service goes with the coroutine, which may happen during the call that starts the operation: not before
// that call has returned.
TEST(Coroutine, KeepsTheServiceDuringTheCallThatStarts) {
  auto service = boost::make_shared<ManualService>();
  const boost::weak_ptr<ManualService> watcher(service);
  bool wasAlive = false;
  service->SetOnValidation([&](const ValidationCompletion& done) {
    done(true, nullptr);
    wasAlive = !watcher.expired();
  });
  Story story;
  Await(story, [held = std::exchange(service, nullptr)]() mutable {
    return Coroutine::ValidateSubject(std::move(held), AnyToken());
  });
  EXPECT_TRUE(wasAlive);
  EXPECT_TRUE(watcher.expired());
  EXPECT_EQ(Lines({"true"}), story.GetLines());
}

// ---- Cancelling ----

TEST(Coroutine, GoesOnAtOnceWhenAStopIsRequested) {
  Waiting waiting;
  waiting.Start();
  EXPECT_TRUE(waiting.stop.request_stop());
  EXPECT_EQ(Lines({kCancelled}), waiting.story.GetLines());
  EXPECT_TRUE(waiting.story.IsOver());
}

TEST(Coroutine, GoesOnOnTheThreadThatRequestsTheStop) {
  Waiting waiting;
  waiting.Start();
  std::thread::id requester;
  std::thread([&] {
    requester = std::this_thread::get_id();
    waiting.stop.request_stop();
  }).join();
  EXPECT_EQ(Lines({kCancelled}), waiting.story.GetLines());
  EXPECT_EQ(requester, waiting.story.GetThread());
}

TEST(Coroutine, DropsWhatTheOperationBringsAfterTheStop) {
  Waiting waiting;
  waiting.Start();
  waiting.stop.request_stop();
  waiting.service->TakeValidation()(true, nullptr);
  EXPECT_EQ(Lines({kCancelled}), waiting.story.GetLines());
}

TEST(Coroutine, DropsAnOperationThatIsGivenUpAfterTheStop) {
  Waiting waiting;
  waiting.Start();
  waiting.stop.request_stop();
  waiting.service->TakeValidation().clear();
  EXPECT_EQ(Lines({kCancelled}), waiting.story.GetLines());
}

TEST(Coroutine, TakesNoNoticeOfAStopAfterTheEnd) {
  Waiting waiting;
  waiting.Start();
  waiting.service->TakeValidation()(true, nullptr);
  waiting.stop.request_stop();
  EXPECT_EQ(Lines({"true"}), waiting.story.GetLines());
}

TEST(Coroutine, StartsNothingWhenTheStopWasRequestedBefore) {
  Waiting waiting;
  waiting.stop.request_stop();
  waiting.Start();
  EXPECT_EQ(Lines(), waiting.service->GetStarted());
  EXPECT_EQ(Lines({kCancelled}), waiting.story.GetLines());
}

TEST(Coroutine, IsNotSuspendedWhenTheStopIsRequestedDuringTheStart) {
  Waiting waiting;
  ValidationCompletion kept;
  waiting.service->SetOnValidation([&](const ValidationCompletion& done) {
    waiting.stop.request_stop();
    kept = done;
  });
  waiting.Start();
  EXPECT_EQ(Lines({kCancelled}), waiting.story.GetLines());
  kept(true, nullptr);
  EXPECT_EQ(Lines({kCancelled}), waiting.story.GetLines());
}

TEST(Coroutine, OneStopEndsTheWaitsOfMany) {
  constexpr std::size_t kCoroutines = 10;
  std::stop_source stop;
  std::vector<std::unique_ptr<Waiting>> all;
  for (std::size_t i = 0; i < kCoroutines; ++i) {
    all.push_back(std::make_unique<Waiting>());
    all.back()->stop = stop;
    all.back()->Start();
  }
  stop.request_stop();
  for (const auto& waiting : all) {
    EXPECT_EQ(Lines({kCancelled}), waiting->story.GetLines());
  }
}

// Two waits in one expression: both Operations live to its end, and the second wait ends on another thread.
TEST(Coroutine, MayAwaitTwiceInOneExpression) {
  const auto first = boost::make_shared<ManualService>();
  const auto second = boost::make_shared<ManualService>();
  std::stop_source stop;
  Story story;
  const auto both = [](Coroutine::Service a, Coroutine::Service b, std::stop_token token, Story& told,
                       [[maybe_unused]] std::shared_ptr<void> witness) -> Detached {
    const std::string line = Print(co_await Coroutine::ValidateSubject(a, AnyToken(), token)) +
                             Print(co_await Coroutine::ValidateSubject(b, AnyToken(), token));
    told.Tell(line);
  };
  both(first, second, stop.get_token(), story, story.MakeWitness());
  std::thread([&] { first->TakeValidation()(true, nullptr); }).join();
  std::thread([&] { second->TakeValidation()(false, nullptr); }).join();
  stop.request_stop();
  EXPECT_EQ(Lines({"truefalse"}), story.GetLines());
}

// ---- Destroying a coroutine that waits ----

TEST(Coroutine, ThatIsDestroyedDropsWhatTheOperationBrings) {
  Waiting waiting;
  const Detached coroutine = waiting.Start();
  coroutine.handle.destroy();
  EXPECT_TRUE(waiting.story.IsOver());
  waiting.service->TakeValidation()(true, nullptr);
  EXPECT_EQ(Lines(), waiting.story.GetLines());
}

TEST(Coroutine, ThatIsDestroyedDropsTheException) {
  Waiting waiting;
  const Detached coroutine = waiting.Start();
  coroutine.handle.destroy();
  const SsoException error("too late");
  waiting.service->TakeValidation()(boost::none, &error);
  EXPECT_EQ(Lines(), waiting.story.GetLines());
}

TEST(Coroutine, ThatIsDestroyedTakesNoNoticeOfAStop) {
  Waiting waiting;
  const Detached coroutine = waiting.Start();
  coroutine.handle.destroy();
  waiting.stop.request_stop();
  waiting.service->TakeValidation().clear();
  EXPECT_EQ(Lines(), waiting.story.GetLines());
}

// ---- On the pool, with the real operations ----

TEST(CoroutineOnThePool, GoesOnOnAPoolThread) {
  FakeService fake;
  std::promise<void> open;
  const std::shared_future<void> opened = open.get_future();
  std::thread::id poolThread;
  fake.transport->SetBeforeAnswer([&] {
    opened.wait();
    poolThread = std::this_thread::get_id();
  });
  fake.transport->Answer(TestSupport::IssueAnswer(TestSupport::SignedToken("valid")));
  Story story;
  Await(story, [&] {
    return Coroutine::AcquireToken(std::exchange(fake.service, nullptr), "alice", "pass-word", fake.spec);
  });
  open.set_value();
  story.AwaitEnd();
  EXPECT_EQ(Lines({"_7f5a64e2"}), story.GetLines());
  EXPECT_EQ(poolThread, story.GetThread());
}

TEST(CoroutineOnThePool, GetsWhatTheBlockingOperationWouldHaveThrown) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::IssueAnswer(TestSupport::SignedToken("tampered")));
  Story story;
  Await(story, [&] { return Coroutine::AcquireTokenByCertificate(fake.service, fake.spec); });
  story.AwaitEnd();
  EXPECT_EQ(
      Lines({"InvalidSignatureException: Failed to verify signature: token might have been tampered with."}),
      story.GetLines());
}

TEST(CoroutineOnThePool, IsToldWhenAForeignExceptionEscapes) {
  const FakeService fake;
  fake.transport->SetBeforeAnswer([] { throw std::range_error("foreign"); });
  // Takes the pool's line about the escaped exception away from standard error.
  const TestSupport::LogRecording log;
  Story story;
  Await(story, [&] { return Coroutine::ValidateSubject(fake.service, fake.token); });
  story.AwaitEnd();
  EXPECT_EQ(Lines({"broken promise"}), story.GetLines());
}

// One operation after the other, each awaited on the pool thread of the one before.
Detached AwaitInTurn(const FakeService& fake, int count, Story& story,
                     [[maybe_unused]] std::shared_ptr<void> witness) {
  for (int i = 0; i < count; ++i) {
    try {
      const bool isValid = co_await Coroutine::ValidateSubject(fake.service, fake.token);
      story.Tell(Print(isValid));
    } catch (const SsoException& error) {
      story.Tell(error.what());
    }
  }
}

TEST(CoroutineOnThePool, MayAwaitAgainWhereItGoesOn) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  fake.transport->Answer(TestSupport::FaultAnswer("wst:FailedAuthentication", "No"));
  fake.transport->Answer(TestSupport::ValidateAnswer(false));
  Story story;
  AwaitInTurn(fake, 3, story, story.MakeWitness());
  story.AwaitEnd();
  EXPECT_EQ(Lines({"true", "Authentication failed: No", "false"}), story.GetLines());
}

TEST(CoroutineOnThePool, AwaitsThousandsInTurnWithoutGrowing) {
  constexpr int kOperations = 3000;
  const FakeService fake;
  for (int i = 0; i < kOperations; ++i) {
    fake.transport->Answer(TestSupport::ValidateAnswer(true));
  }
  Story story;
  AwaitInTurn(fake, kOperations, story, story.MakeWitness());
  story.AwaitEnd();
  EXPECT_EQ(Lines(kOperations, "true"), story.GetLines());
}

TEST(CoroutineOnThePool, ManyAtOnceAllGoOnOnce) {
  constexpr std::size_t kCoroutines = 300;
  const FakeService fake;
  std::vector<Story> stories(kCoroutines);
  for (Story& story : stories) {
    fake.transport->Answer(TestSupport::ValidateAnswer(true));
    Await(story, [&fake] { return Coroutine::ValidateSubject(fake.service, fake.token); });
  }
  for (Story& story : stories) {
    story.AwaitEnd();
    EXPECT_EQ(Lines({"true"}), story.GetLines());
  }
}

// A stop during the call ends the wait, although the call goes on; what it brings touches nothing.
TEST(CoroutineOnThePool, IsCancelledWhileTheCallWaitsForTheService) {
  FakeService fake;
  const auto sent = std::make_shared<std::promise<void>>();
  std::promise<void> open;
  const std::shared_future<void> opened = open.get_future();
  Story call;
  fake.transport->SetBeforeAnswer([sent, opened, witness = call.MakeWitness()] {
    sent->set_value();
    opened.wait();
  });
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  std::stop_source stop;
  Story story;
  Await(story, [&] { return Coroutine::ValidateSubject(fake.service, fake.token, stop.get_token()); });
  sent->get_future().wait();
  stop.request_stop();
  EXPECT_TRUE(story.IsOver());
  EXPECT_EQ(Lines({kCancelled}), story.GetLines());
  EXPECT_EQ(std::this_thread::get_id(), story.GetThread());
  open.set_value();
  fake = FakeService();
  call.AwaitEnd();
}

// A handle ends the call, and the coroutine goes on where that has ended.
TEST(CoroutineOnThePool, GoesOnWhenTheHandleOfTheServiceEndsTheCall) {
  const auto asked = std::make_shared<std::promise<void>>();
  TestSupport::LoopbackServer server({[asked](TestSupport::ServerConnection& connection) {
    connection.ReadRequest();
    asked->set_value();
    connection.AwaitPeerEnd();
  }});
  SecurityTokenServiceConfig config;
  config.stsUrl = "http://" + server.GetEndpoint() + "/sts";
  const auto handle = Pelmar::System::CreateCancellationHandle();
  const auto service =
      CreateCancellableService(*CreateSecurityTokenService(config, ServiceOptions()), handle);
  TokenSpec spec;
  spec.tokenLifetimeSec = 300;
  std::stop_source stop;
  const std::stop_callback end(stop.get_token(), [handle] { handle->Cancel(); });
  const TestSupport::MetricsRecording recording;
  Story story;
  Await(story, [&] { return Coroutine::AcquireToken(service, "alice", "pass-word", spec); });
  asked->get_future().wait();
  stop.request_stop();
  story.AwaitEnd();
  EXPECT_EQ(Lines({kCancelled}), story.GetLines());
  EXPECT_NE(std::this_thread::get_id(), story.GetThread());
  EXPECT_EQ(Lines({"AcquireToken cancelled 1"}), recording.metrics->GetLines());
}

// ---- Everything at the same moment ----

enum class Ends { RESULT_AND_STOP, DROP_AND_STOP, START_AND_RESULT, START_AND_STOP };

// Two threads at once; the coroutine goes on exactly once, with what one of the two says.
void Race(Ends ends, int rounds) {
  for (int round = 0; round < rounds; ++round) {
    Waiting waiting;
    std::latch together(2);
    ValidationCompletion completion;
    std::thread other;
    if (ends == Ends::RESULT_AND_STOP || ends == Ends::DROP_AND_STOP) {
      waiting.Start();
      completion = waiting.service->TakeValidation();
      other = std::thread([&] {
        together.arrive_and_wait();
        if (ends == Ends::RESULT_AND_STOP) {
          completion(true, nullptr);
        }
        completion.clear();
      });
      together.arrive_and_wait();
      waiting.stop.request_stop();
    } else {
      waiting.service->SetOnValidation([&](const ValidationCompletion& done) {
        completion = done;
        other = std::thread([&] {
          together.arrive_and_wait();
          if (ends == Ends::START_AND_RESULT) {
            completion(true, nullptr);
          } else {
            waiting.stop.request_stop();
          }
        });
        together.arrive_and_wait();
      });
      waiting.Start();
    }
    other.join();
    waiting.story.AwaitEnd();
    const Lines lines = waiting.story.GetLines();
    ASSERT_EQ(1u, lines.size());
    const std::string expected = ends == Ends::DROP_AND_STOP    ? "broken promise"
                                 : ends == Ends::START_AND_STOP ? kCancelled
                                                                : "true";
    EXPECT_TRUE(lines[0] == expected || (lines[0] == kCancelled && ends != Ends::START_AND_RESULT))
        << lines[0];
  }
}

constexpr int kRounds = 500;

TEST(CoroutineRace, OfResultAndStop) {
  Race(Ends::RESULT_AND_STOP, kRounds);
}

TEST(CoroutineRace, OfGivingUpAndStop) {
  Race(Ends::DROP_AND_STOP, kRounds);
}

TEST(CoroutineRace, OfSuspensionAndResult) {
  Race(Ends::START_AND_RESULT, kRounds);
}

TEST(CoroutineRace, OfSuspensionAndStop) {
  Race(Ends::START_AND_STOP, kRounds);
}

}  // namespace
}  // namespace Quorlin
