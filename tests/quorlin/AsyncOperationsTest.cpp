// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/SecurityTokenService.h>

#include <gtest/gtest.h>
#include <boost/bind/bind.hpp>
#include <boost/make_shared.hpp>
#include <boost/optional/optional_io.hpp>
#include <boost/weak_ptr.hpp>

#include <chrono>
#include <condition_variable>
#include <cstdlib>
#include <future>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "quorlin/ResponseHandlerImpl.h"
#include "quorlin/SecurityTokenServiceImpl.h"
#include "quorlin/asyncCalls.h"
#include "support/CompletionProbe.h"
#include "support/FakeService.h"
#include "support/RecordingLogSink.h"
#include "support/ServiceAnswers.h"

namespace Quorlin {
namespace {

using TestSupport::FakeService;
using TestSupport::FinalAnswer;
using TestSupport::IssueAnswer;
using TestSupport::RenewAnswer;
using TestSupport::SignedToken;

using Lines = std::vector<std::string>;
using TokenProbe = TestSupport::CompletionProbe<boost::shared_ptr<const SamlToken>>;
using ValidationProbe = TestSupport::CompletionProbe<boost::optional<bool>>;

// ---- The helpers ----

// Told what a completion function was called with.
struct IntCompletion {
  void operator()(const int& value, const Pelmar::Exception* error) const {
    calls->push_back(std::to_string(value) + ", " + (error == nullptr ? "no error" : error->what()));
  }
  Lines* calls;
};

TEST(SyncCallToResultFunc, ReportsTheResult) {
  Lines calls;
  SyncCallToResultFunc([] { return 7; }, IntCompletion{&calls}, -1);
  EXPECT_EQ(Lines({"7, no error"}), calls);
}

TEST(SyncCallToResultFunc, ReportsTheErrorValueAndTheException) {
  Lines calls;
  SyncCallToResultFunc([]() -> int { throw SsoException("failed"); }, IntCompletion{&calls}, -1);
  EXPECT_EQ(Lines({"-1, failed"}), calls);
}

TEST(SyncCallToResultFunc, LetsForeignExceptionsEscapeUnreported) {
  Lines calls;
  EXPECT_THROW(
      SyncCallToResultFunc([]() -> int { throw std::range_error("foreign"); }, IntCompletion{&calls}, -1),
      std::range_error);
  EXPECT_EQ(Lines(), calls);
}

TEST(SyncCallToResultFunc, LetsTheErrorOfAnEmptyCallEscape) {
  Lines calls;
  EXPECT_THROW(SyncCallToResultFunc(boost::function<int()>(), IntCompletion{&calls}, -1),
               boost::bad_function_call);
  EXPECT_EQ(Lines(), calls);
}

// What a completion function throws about a success must not come back to it as a failure.
TEST(SyncCallToResultFunc, CallsACompletionThatThrowsOnlyOnce) {
  int calls = 0;
  const auto done = [&calls](int, const Pelmar::Exception*) {
    ++calls;
    throw SsoException("thrown by the completion function");
  };
  EXPECT_THROW(SyncCallToResultFunc([] { return 7; }, done, -1), SsoException);
  EXPECT_EQ(1, calls);
  EXPECT_THROW(SyncCallToResultFunc([]() -> int { throw SsoException("failed"); }, done, -1), SsoException);
  EXPECT_EQ(2, calls);
}

TEST(SyncToAsyncCall, UsesADefaultResultAsErrorValue) {
  TestSupport::CompletionProbe<int> probe;
  SyncToAsyncCall([]() -> int { throw SsoException("failed"); }, probe.GetFunction());
  const auto calls = probe.Wait();
  ASSERT_EQ(1u, calls.size());
  EXPECT_EQ(0, calls[0].value);
  EXPECT_EQ("failed", calls[0].Message());
}

TEST(SyncToAsyncCall, UsesTheGivenErrorValue) {
  TestSupport::CompletionProbe<int> probe;
  SyncToAsyncCall([]() -> int { throw SsoException("failed"); }, probe.GetFunction(), -1);
  const auto calls = probe.Wait();
  ASSERT_EQ(1u, calls.size());
  EXPECT_EQ(-1, calls[0].value);
}

TEST(SyncToAsyncCall, RunsABoundCallOnAnotherThread) {
  const auto nextTo = [](int value) {
    return value + 1;
  };
  TestSupport::CompletionProbe<int> probe;
  SyncToAsyncCall(boost::bind<int>(nextTo, 41), probe.GetFunction());
  const auto calls = probe.Wait();
  ASSERT_EQ(1u, calls.size());
  EXPECT_EQ(42, calls[0].value);
  EXPECT_EQ("no error", calls[0].Message());
  EXPECT_NE(std::this_thread::get_id(), calls[0].thread);
}

TEST(PassByRefHelper, YieldsTheVeryObject) {
  const boost::shared_ptr<int> object = boost::make_shared<int>(7);
  const PassByRefHelper<int> helper(object);
  int& reference = helper;
  EXPECT_EQ(object.get(), &reference);
}

TEST(PassByRefHelper, KeepsTheObjectAlive) {
  boost::shared_ptr<int> object = boost::make_shared<int>(7);
  const boost::weak_ptr<int> watcher(object);
  {
    const PassByRefHelper<int> helper(object);
    object.reset();
    EXPECT_FALSE(watcher.expired());
  }
  EXPECT_TRUE(watcher.expired());
}

TEST(PassByRefHelper, SatisfiesAReferenceParameterOfABoundCall) {
  const auto increment = [](int& value) {
    return ++value;
  };
  const boost::shared_ptr<int> object = boost::make_shared<int>(7);
  const auto call = boost::bind<int>(increment, PassByRefHelper<int>(object));
  EXPECT_EQ(8, call());
  EXPECT_EQ(8, *object);
}

// ---- The six twins ----

struct TokenOperationCase {
  const char* name;
  void (*start)(const FakeService& fake, const TokenCompletion& done);
  std::string request;
  std::string answer;
};

std::vector<TokenOperationCase> TokenOperations() {
  const std::string specText = TestSupport::kFakeSpecText;
  const std::string valid = SignedToken("valid");
  return {
      {"AcquireTokenAsync",
       [](const FakeService& f, const TokenCompletion& done) {
         f.service->AcquireTokenAsync("alice", "pass-word", f.spec, done);
       },
       "1|UserPass|alice|pass-word|" + specText, IssueAnswer(valid)},
      {"AcquireTokenByGssAsync",
       [](const FakeService& f, const TokenCompletion& done) {
         f.service->AcquireTokenByGssAsync(f.spec, f.handler, done);
       },
       "1|InitialSPNego|" + specText + "|hello", FinalAnswer("ctx", "", valid)},
      {"AcquireTokenByCertificateAsync",
       [](const FakeService& f, const TokenCompletion& done) {
         f.service->AcquireTokenByCertificateAsync(f.spec, done);
       },
       "1|Certificate|" + specText, IssueAnswer(valid)},
      {"AcquireTokenByTokenAsync",
       [](const FakeService& f, const TokenCompletion& done) {
         f.service->AcquireTokenByTokenAsync(f.token, f.spec, done);
       },
       "1|Exchange|_token-id-not-for-logs|" + specText, IssueAnswer(valid)},
      {"RenewTokenAsync",
       [](const FakeService& f, const TokenCompletion& done) {
         f.service->RenewTokenAsync(f.token, 600, done);
       },
       "1|Renew|_token-id-not-for-logs|600", RenewAnswer(valid)},
  };
}

TEST(AsyncOperations, CompleteOnceWithTheToken) {
  for (const TokenOperationCase& operation : TokenOperations()) {
    const FakeService fake;
    fake.transport->Answer(operation.answer);
    TokenProbe probe;
    operation.start(fake, probe.GetFunction());
    const TokenProbe::Calls calls = probe.Wait();
    ASSERT_EQ(1u, calls.size()) << operation.name;
    ASSERT_TRUE(calls[0].value) << operation.name;
    EXPECT_EQ("_7f5a64e2", calls[0].value->GetId()) << operation.name;
    EXPECT_EQ("no error", calls[0].Message()) << operation.name;
    EXPECT_EQ(Lines({operation.request}), fake.transport->GetSent()) << operation.name;
  }
}

TEST(AsyncOperations, CompleteOnceWithTheException) {
  for (const TokenOperationCase& operation : TokenOperations()) {
    const FakeService fake;
    fake.transport->Answer(TestSupport::FaultAnswer("wst:FailedAuthentication", "No"));
    TokenProbe probe;
    operation.start(fake, probe.GetFunction());
    const TokenProbe::Calls calls = probe.Wait();
    ASSERT_EQ(1u, calls.size()) << operation.name;
    EXPECT_FALSE(calls[0].value) << operation.name;
    EXPECT_EQ("Authentication failed: No", calls[0].Message()) << operation.name;
    EXPECT_TRUE(dynamic_cast<const InvalidCredentialsException*>(calls[0].error.get())) << operation.name;
  }
}

TEST(AsyncOperations, ReportArgumentErrorsToTheCompletion) {
  for (const TokenOperationCase& operation : TokenOperations()) {
    const FakeService fake;
    fake.builder->Fail(Pelmar::InvalidArgumentException("Token lifetime must be positive"));
    TokenProbe probe;
    operation.start(fake, probe.GetFunction());
    const TokenProbe::Calls calls = probe.Wait();
    ASSERT_EQ(1u, calls.size()) << operation.name;
    EXPECT_FALSE(calls[0].value) << operation.name;
    EXPECT_EQ("Invalid argument : Token lifetime must be positive", calls[0].Message()) << operation.name;
    EXPECT_EQ(Lines(), fake.transport->GetSent()) << operation.name;
  }
}

TEST(AsyncOperations, CompleteOnAnotherThread) {
  for (const TokenOperationCase& operation : TokenOperations()) {
    const FakeService fake;
    fake.transport->Answer(operation.answer);
    TokenProbe probe;
    operation.start(fake, probe.GetFunction());
    const TokenProbe::Calls calls = probe.Wait();
    ASSERT_EQ(1u, calls.size()) << operation.name;
    EXPECT_NE(std::this_thread::get_id(), calls[0].thread) << operation.name;
  }
}

TEST(AsyncOperations, GiveAnEmptyTokenForAnEmptyAnswer) {
  // A response handler may find the empty text; the real one never does.
  class EmptyHandler final : public ResponseHandler {
   public:
    void HandleAcquireTokenResponse(Pelmar::Reader*, std::string& token) const override { token.clear(); }
    bool HandleValidateSubjectResponse(Pelmar::Reader*) const override { return false; }
    void HandleRenewTokenResponse(Pelmar::Reader*, std::string& token) const override { token.clear(); }
    void HandleSPNegoResponse(Pelmar::Reader*, SPNegoResponse&) const override {}
  };
  const FakeService fake;
  const SecurityTokenServiceImpl service(fake.builder, fake.transport, boost::make_shared<EmptyHandler>(),
                                         {});
  fake.transport->Answer("");
  TokenProbe probe;
  service.RenewTokenAsync(fake.token, 600, probe.GetFunction());
  const TokenProbe::Calls calls = probe.Wait();
  ASSERT_EQ(1u, calls.size());
  EXPECT_FALSE(calls[0].value);
  EXPECT_EQ("no error", calls[0].Message());
}

TEST(AsyncOperations, ValidationReportsTheVerdictInTheOptional) {
  for (const bool verdict : {true, false}) {
    const FakeService fake;
    fake.transport->Answer(TestSupport::ValidateAnswer(verdict));
    ValidationProbe probe;
    fake.service->ValidateSubjectAsync(fake.token, probe.GetFunction());
    const ValidationProbe::Calls calls = probe.Wait();
    ASSERT_EQ(1u, calls.size());
    EXPECT_EQ(boost::optional<bool>(verdict), calls[0].value);
    EXPECT_EQ("no error", calls[0].Message());
    EXPECT_NE(std::this_thread::get_id(), calls[0].thread);
    EXPECT_EQ(Lines({"1|ValidateSubject|_token-id-not-for-logs"}), fake.transport->GetSent());
  }
}

TEST(AsyncOperations, ValidationReportsFailureByAnEmptyOptional) {
  const FakeService fake;
  fake.transport->Fail(CommunicationException("Server returned error: 503 Service Unavailable"));
  ValidationProbe probe;
  fake.service->ValidateSubjectAsync(fake.token, probe.GetFunction());
  const ValidationProbe::Calls calls = probe.Wait();
  ASSERT_EQ(1u, calls.size());
  EXPECT_EQ(boost::optional<bool>(), calls[0].value);
  EXPECT_EQ("Server returned error: 503 Service Unavailable", calls[0].Message());
}

TEST(AsyncOperations, ExceptionKeptByCloneIsThrownAsItsOwnClass) {
  const FakeService fake;
  fake.transport->Answer(IssueAnswer(SignedToken("tampered")));
  TokenProbe probe;
  fake.service->AcquireTokenByCertificateAsync(fake.spec, probe.GetFunction());
  const TokenProbe::Calls calls = probe.Wait();
  ASSERT_EQ(1u, calls.size());
  EXPECT_THROW(calls[0].error->Throw(), InvalidSignatureException);
}

// ---- Lifetimes ----

// Holds every request back until it is told that the caller has let go of everything.
class Gate {
 public:
  explicit Gate(TestSupport::FakeTransport& transport) : _opened(_open.get_future()) {
    transport.SetBeforeAnswer([opened = _opened] { opened.wait(); });
  }
  void Open() { _open.set_value(); }

 private:
  std::promise<void> _open;
  const std::shared_future<void> _opened;
};

TEST(AsyncOperations, SurviveTheReleaseOfEverythingTheCallerHas) {
  for (const TokenOperationCase& operation : TokenOperations()) {
    FakeService fake;
    Gate gate(*fake.transport);
    fake.transport->Answer(operation.answer);
    TokenProbe probe;
    operation.start(fake, probe.GetFunction());
    fake.service.reset();
    fake.token.reset();
    fake.handler.reset();
    fake.builder.reset();
    gate.Open();
    const TokenProbe::Calls calls = probe.Wait();
    ASSERT_EQ(1u, calls.size()) << operation.name;
    EXPECT_EQ("no error", calls[0].Message()) << operation.name;
  }
}

TEST(AsyncOperations, ValidationSurvivesTheReleaseOfEverythingTheCallerHas) {
  FakeService fake;
  Gate gate(*fake.transport);
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  ValidationProbe probe;
  fake.service->ValidateSubjectAsync(fake.token, probe.GetFunction());
  fake.service.reset();
  fake.token.reset();
  fake.builder.reset();
  gate.Open();
  const ValidationProbe::Calls calls = probe.Wait();
  ASSERT_EQ(1u, calls.size());
  EXPECT_EQ(boost::optional<bool>(true), calls[0].value);
}

// A shared pointer to a new `T`, and the moment of its destruction.
template <typename T>
struct Watched {
  Watched() : gone(std::make_shared<std::promise<void>>()), isGone(gone->get_future()) {
    object.reset(new T, [promise = gone](T* dying) {
      delete dying;
      promise->set_value();
    });
  }
  bool IsAlive() const { return isGone.wait_for(std::chrono::seconds(0)) != std::future_status::ready; }

  std::shared_ptr<std::promise<void>> gone;
  std::future<void> isGone;
  boost::shared_ptr<T> object;
};

TEST(AsyncOperations, HoldTheirArgumentsUntilTheyAreDoneAndNoLonger) {
  Watched<TestSupport::CountingSamlToken> token;
  Watched<TestSupport::FakeRequestBuilder> builder;
  const boost::shared_ptr<TestSupport::FakeTransport> transport =
      boost::make_shared<TestSupport::FakeTransport>();
  Gate gate(*transport);
  transport->Answer(TestSupport::ValidateAnswer(true));
  boost::shared_ptr<const SecurityTokenService> service = boost::make_shared<SecurityTokenServiceImpl>(
      builder.object, transport, boost::make_shared<ResponseHandlerImpl>(), TestSupport::TrustedSigner());
  ValidationProbe probe;
  service->ValidateSubjectAsync(token.object, probe.GetFunction());
  service.reset();
  token.object.reset();
  builder.object.reset();
  EXPECT_TRUE(token.IsAlive());
  EXPECT_TRUE(builder.IsAlive());
  gate.Open();
  EXPECT_EQ(1u, probe.Wait().size());
  token.isGone.wait();
  builder.isGone.wait();
}

TEST(AsyncOperations, MayBeStartedFromACompletion) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::ValidateAnswer(false));
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  ValidationProbe first;
  ValidationProbe second;
  fake.service->ValidateSubjectAsync(fake.token, first.GetFunction([&fake, &second] {
    fake.service->ValidateSubjectAsync(fake.token, second.GetFunction());
  }));
  EXPECT_EQ(boost::optional<bool>(false), first.Wait().at(0).value);
  EXPECT_EQ(boost::optional<bool>(true), second.Wait().at(0).value);
}

// ---- Many at once ----

// Lets nobody pass before `expected` have come.
class MeetingPoint {
 public:
  explicit MeetingPoint(int expected) : _missing(expected) {}

  void Arrive() {
    std::unique_lock<std::mutex> lock(_mutex);
    --_missing;
    _changed.notify_all();
    _changed.wait(lock, [this] { return _missing <= 0; });
  }

 private:
  std::mutex _mutex;
  std::condition_variable _changed;
  int _missing;
};

TEST(AsyncOperations, RunAtOnceWhileOthersWaitForTheirAnswers) {
  constexpr int kOperations = 50;
  const FakeService fake;
  MeetingPoint meetingPoint(kOperations);
  fake.transport->SetBeforeAnswer([&meetingPoint] { meetingPoint.Arrive(); });
  std::vector<ValidationProbe> probes(kOperations);
  for (ValidationProbe& probe : probes) {
    fake.transport->Answer(TestSupport::ValidateAnswer(true));
    fake.service->ValidateSubjectAsync(fake.token, probe.GetFunction());
  }
  for (ValidationProbe& probe : probes) {
    const ValidationProbe::Calls calls = probe.Wait();
    ASSERT_EQ(1u, calls.size());
    EXPECT_EQ(boost::optional<bool>(true), calls[0].value);
  }
}

TEST(AsyncOperations, AllCompleteWhenManyAreQueued) {
  constexpr int kOperations = 1000;
  const FakeService fake;
  std::vector<ValidationProbe> probes(kOperations);
  for (ValidationProbe& probe : probes) {
    fake.transport->Answer(TestSupport::ValidateAnswer(true));
    fake.service->ValidateSubjectAsync(fake.token, probe.GetFunction());
  }
  for (ValidationProbe& probe : probes) {
    EXPECT_EQ(1u, probe.Wait().size());
  }
  EXPECT_EQ(kOperations, fake.transport->GetCreatedSessions());
  EXPECT_EQ(0, fake.transport->GetLivingSessions());
}

// ---- What goes wrong outside the rules ----

TEST(AsyncOperations, ForeignExceptionsReachNoCompletionAndThePoolLivesOn) {
  const FakeService fake;
  // Takes the pool's line about the escaped exception away from standard error.
  const TestSupport::LogRecording log;
  fake.transport->SetBeforeAnswer([] { throw std::range_error("not of the platform"); });
  ValidationProbe lost;
  fake.service->ValidateSubjectAsync(fake.token, lost.GetFunction());
  EXPECT_EQ(0u, lost.Wait().size());

  fake.transport->SetBeforeAnswer({});
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  ValidationProbe next;
  fake.service->ValidateSubjectAsync(fake.token, next.GetFunction());
  EXPECT_EQ(1u, next.Wait().size());
}

TEST(AsyncOperations, LogTheSameLinesAsTheBlockingOnes) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::ValidateAnswer(true));
  const TestSupport::LogRecording log;
  ValidationProbe probe;
  fake.service->ValidateSubjectAsync(fake.token, probe.GetFunction());
  probe.Wait();
  EXPECT_EQ(
      Lines({"64 opId=<id 1> START operation SecurityTokenServiceImpl::ValidateSubject",
             std::string("64 Validating subject of token ") + TestSupport::kFakeTokenText, "64 Result: true",
             "64 opId=<id 1> END operation SecurityTokenServiceImpl::ValidateSubject"}),
      log.GetLines());
}

class AsyncOperationsDeathTest : public testing::Test {
 protected:
  // Other tests leave pool threads behind: a plain fork would copy locks in whatever state.
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(AsyncOperationsDeathTest, ProcessMayEndWithWorkPending) {
  EXPECT_EXIT(
      {
        const FakeService fake;
        fake.builder->Fail(Pelmar::InvalidStateException("stop"));
        for (int i = 0; i < 1000; ++i) {
          fake.service->ValidateSubjectAsync(fake.token,
                                             [](const boost::optional<bool>&, const Pelmar::Exception*) {});
        }
        std::exit(0);
      },
      testing::ExitedWithCode(0), "^$");
}

TEST_F(AsyncOperationsDeathTest, MissingTokenIsAProgrammingError) {
  EXPECT_DEATH(
      {
        const FakeService fake;
        ValidationProbe probe;
        fake.service->ValidateSubjectAsync(nullptr, probe.GetFunction());
        probe.Wait();
      },
      "px != 0");
}

}  // namespace
}  // namespace Quorlin
