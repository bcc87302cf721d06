// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/Future.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <chrono>
#include <functional>
#include <future>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "support/FakeService.h"
#include "support/ManualService.h"
#include "support/RecordingLogSink.h"
#include "support/ServiceAnswers.h"

namespace Quorlin {
namespace {

using TestSupport::FakeService;
using TestSupport::ManualService;
using Lines = std::vector<std::string>;
using TokenFuture = std::future<boost::shared_ptr<const SamlToken>>;

/// An operation that yields a token, with the arguments of a FakeService.
struct TokenOperation {
  std::string started;
  std::function<TokenFuture(const SecurityTokenService&, const FakeService&)> start;
};

std::vector<TokenOperation> TokenOperations() {
  const std::string id = "_token-id-not-for-logs";
  return {
      {"AcquireToken|alice|pass-word|300",
       [](const SecurityTokenService& s, const FakeService& f) {
         return Future::AcquireToken(s, "alice", "pass-word", f.spec);
       }},
      {"AcquireTokenByGSS|300|handler",
       [](const SecurityTokenService& s, const FakeService& f) {
         return Future::AcquireTokenByGSS(s, f.spec, f.handler);
       }},
      {"AcquireTokenByCertificate|300",
       [](const SecurityTokenService& s, const FakeService& f) {
         return Future::AcquireTokenByCertificate(s, f.spec);
       }},
      {"AcquireTokenByToken|" + id + "|300",
       [](const SecurityTokenService& s, const FakeService& f) {
         return Future::AcquireTokenByToken(s, f.token, f.spec);
       }},
      {"RenewToken|" + id + "|600",
       [](const SecurityTokenService& s, const FakeService& f) {
         return Future::RenewToken(s, f.token, 600);
       }},
  };
}

template <typename Result>
bool IsReady(const std::future<Result>& future) {
  return future.wait_for(std::chrono::seconds(0)) == std::future_status::ready;
}

// What `get` throws, as "<message>", if it is of just that class.
template <typename Expected, typename Result>
std::string MessageOf(std::future<Result> future) {
  try {
    future.get();
  } catch (const Expected& error) {
    EXPECT_EQ(typeid(Expected), typeid(error));
    return error.what();
  }
  return "nothing was thrown";
}

TEST(Future, StartsTheOperationWithItsArguments) {
  const FakeService arguments;
  for (const TokenOperation& operation : TokenOperations()) {
    const ManualService service;
    const TokenFuture future = operation.start(service, arguments);
    EXPECT_EQ(Lines({operation.started}), service.GetStarted());
    EXPECT_FALSE(IsReady(future)) << operation.started;
  }
}

TEST(Future, GivesTheVeryTokenThatTheOperationBrought) {
  const FakeService arguments;
  for (const TokenOperation& operation : TokenOperations()) {
    const ManualService service;
    TokenFuture future = operation.start(service, arguments);
    service.TakeToken()(arguments.token, nullptr);
    ASSERT_TRUE(IsReady(future)) << operation.started;
    EXPECT_EQ(arguments.token, future.get()) << operation.started;
  }
}

TEST(Future, ThrowsTheExceptionAsItsOwnClass) {
  const FakeService arguments;
  for (const TokenOperation& operation : TokenOperations()) {
    const ManualService service;
    TokenFuture future = operation.start(service, arguments);
    {
      // Valid during the call only.
      const InvalidCredentialsException error("Authentication failed: No");
      service.TakeToken()(boost::shared_ptr<const SamlToken>(), &error);
    }
    EXPECT_EQ("Authentication failed: No", MessageOf<InvalidCredentialsException>(std::move(future)))
        << operation.started;
  }
}

TEST(Future, BreaksItsPromiseWhenTheCompletionIsDropped) {
  const FakeService arguments;
  for (const TokenOperation& operation : TokenOperations()) {
    const ManualService service;
    TokenFuture future = operation.start(service, arguments);
    service.TakeToken().clear();
    try {
      future.get();
      ADD_FAILURE() << operation.started;
    } catch (const std::future_error& error) {
      EXPECT_EQ(std::make_error_code(std::future_errc::broken_promise), error.code()) << operation.started;
    }
  }
}

TEST(Future, MayBeDestroyedBeforeTheOperationEnds) {
  const FakeService arguments;
  for (const TokenOperation& operation : TokenOperations()) {
    const ManualService service;
    { const TokenFuture future = operation.start(service, arguments); }
    service.TakeToken()(arguments.token, nullptr);
    EXPECT_EQ(Lines({operation.started}), service.GetStarted());
  }
}

TEST(Future, OfAValidationGivesTheVerdict) {
  const FakeService arguments;
  for (const bool verdict : {true, false}) {
    const ManualService service;
    std::future<bool> future = Future::ValidateSubject(service, arguments.token);
    EXPECT_EQ(Lines({"ValidateSubject|_token-id-not-for-logs"}), service.GetStarted());
    EXPECT_FALSE(IsReady(future));
    service.TakeValidation()(verdict, nullptr);
    EXPECT_EQ(verdict, future.get());
  }
}

TEST(Future, OfAValidationThrowsTheException) {
  const FakeService arguments;
  const ManualService service;
  std::future<bool> future = Future::ValidateSubject(service, arguments.token);
  const CommunicationException error("Server returned error: 503 Service Unavailable");
  service.TakeValidation()(boost::none, &error);
  EXPECT_EQ("Server returned error: 503 Service Unavailable",
            MessageOf<CommunicationException>(std::move(future)));
}

TEST(Future, ThatCannotBeStartedThrowsAtOnce) {
  const FakeService arguments;
  ManualService service;
  service.SetOnValidation([](const ValidationCompletion&) { throw Pelmar::Exception("no thread"); });
  EXPECT_THROW(Future::ValidateSubject(service, arguments.token), Pelmar::Exception);
}

// ---- On the pool, with the real operations ----

TEST(FutureOnThePool, BringsTheTokenAfterTheServiceWasReleased) {
  FakeService fake;
  fake.transport->Answer(TestSupport::IssueAnswer(TestSupport::SignedToken("valid")));
  TokenFuture future = Future::AcquireToken(*fake.service, "alice", "pass-word", fake.spec);
  fake.service.reset();
  EXPECT_EQ("_7f5a64e2", future.get()->GetId());
}

TEST(FutureOnThePool, ThrowsWhatTheBlockingOperationWouldHaveThrown) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::IssueAnswer(TestSupport::SignedToken("tampered")));
  EXPECT_EQ(
      "Failed to verify signature: token might have been tampered with.",
      MessageOf<InvalidSignatureException>(Future::AcquireTokenByCertificate(*fake.service, fake.spec)));
}

TEST(FutureOnThePool, TellsOfBadArguments) {
  const FakeService fake;
  fake.builder->Fail(Pelmar::InvalidArgumentException("Token lifetime must be positive"));
  EXPECT_EQ("Invalid argument : Token lifetime must be positive",
            MessageOf<Pelmar::InvalidArgumentException>(Future::RenewToken(*fake.service, fake.token, 0)));
}

TEST(FutureOnThePool, BreaksItsPromiseWhenAForeignExceptionEscapes) {
  const FakeService fake;
  fake.transport->SetBeforeAnswer([] { throw std::range_error("foreign"); });
  // Takes the pool's line about the escaped exception away from standard error.
  const TestSupport::LogRecording log;
  EXPECT_EQ("std::future_error: Broken promise",
            MessageOf<std::future_error>(Future::ValidateSubject(*fake.service, fake.token)));
}

TEST(FutureOnThePool, ManyAtOnceEachBringTheirOwn) {
  constexpr int kOperations = 300;
  const FakeService fake;
  std::vector<std::future<bool>> futures;
  for (int i = 0; i < kOperations; ++i) {
    fake.transport->Answer(TestSupport::ValidateAnswer(i % 3 == 0));
    futures.push_back(Future::ValidateSubject(*fake.service, fake.token));
  }
  int valid = 0;
  for (std::future<bool>& future : futures) {
    valid += future.get() ? 1 : 0;
  }
  EXPECT_EQ(kOperations / 3, valid);
}

}  // namespace
}  // namespace Quorlin
