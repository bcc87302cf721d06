// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What callers get, and when the service is asked; time and threads turned by hand.

#include <quorlin/TokenProvider.h>

#include "provider/ProviderWorld.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

namespace {

using namespace TestSupport;
using Quorlin::CommunicationException;
using Quorlin::InvalidCredentialsException;
using testing::ElementsAre;
using testing::IsEmpty;
using Token = boost::shared_ptr<const Quorlin::SamlToken>;

constexpr const char* kAcquire = "AcquireTokenByCertificate 600";
constexpr const char* kNoAnswer = "Quorlin::CommunicationException: no answer";
constexpr const char* kWrong = "Quorlin::InvalidCredentialsException: wrong";

/// A provider that holds the token "_1", of which nothing is written down any more.
struct ProviderWithToken : ProviderWorld {
  explicit ProviderWithToken(bool renewable = false, bool holderOfKey = false) {
    service->Issue(renewable, holderOfKey);
    provider = MakeProvider();
    provider->GetToken();
    service->TakeCalls();
    observer->TakeEvents();
  }

  /// The background's next try fails like that.
  template <typename Error>
  void FailInBackground(const Error& error) {
    service->PlanFailure(error);
    EXPECT_TRUE(scheduler->RunTimer());
  }

  boost::shared_ptr<Quorlin::TokenProvider> provider;
};

// ---- Fresh tokens ----

TEST(TokenProvider, AsksNothingBeforeTheFirstCall) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  EXPECT_EQ(world.scheduler->Count(), 0U);
  EXPECT_THAT(world.service->TakeCalls(), IsEmpty());
}

TEST(TokenProvider, AsksOnceAndHandsOutTheTokenWhileItIsFresh) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  EXPECT_EQ(Get(*provider), "_1");
  world.clock->Advance(540 * kSecond);
  EXPECT_EQ(Get(*provider), "_1");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, GivesEverybodyTheSameToken) {
  const ProviderWithToken world;
  EXPECT_EQ(world.provider->GetToken(), world.provider->GetToken());
}

TEST(TokenProvider, AsksAgainWhenTheTokenIsNoLongerFresh) {
  const ProviderWithToken world;
  world.clock->Advance(540 * kSecond + 1);
  EXPECT_EQ(Get(*world.provider), "_2");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, HandsOutNoTokenAtItsEnd) {
  ProviderWorld world;
  world.options.minimumLifeSec = 0;
  const auto provider = world.MakeProvider();
  EXPECT_EQ(Get(*provider), "_1");
  world.clock->Advance(600 * kSecond - 1);
  EXPECT_EQ(Get(*provider), "_1");
  world.clock->Advance(1);
  EXPECT_EQ(Get(*provider), "_2");
}

// ---- The background ----

TEST(TokenProvider, RefreshesInTheBackgroundAtAShareOfTheFreshTime) {
  const ProviderWithToken world;
  EXPECT_THAT(world.scheduler->GetDelays(), ElementsAre(432 * kSecond));  // 80 % of 540 s.
  world.clock->Advance(432 * kSecond);
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
  EXPECT_EQ(Get(*world.provider), "_2");
  EXPECT_THAT(world.service->TakeCalls(), IsEmpty());
  EXPECT_THAT(world.scheduler->GetDelays(), ElementsAre(432 * kSecond));
}

TEST(TokenProvider, HasOneTimerAtATime) {
  const ProviderWithToken world;
  world.clock->Advance(541 * kSecond);
  EXPECT_EQ(Get(*world.provider), "_2");
  EXPECT_THAT(world.scheduler->GetDelays(), ElementsAre(432 * kSecond));
}

TEST(TokenProvider, CutsTheWaitingTimeByChance) {
  ProviderWorld world;
  world.options.jitterPercent = 50;
  std::set<long long> delays;
  for (int i = 0; i < 20; ++i) {
    const auto provider = world.MakeProvider();
    provider->GetToken();
    const long long delay = world.scheduler->GetDelays().at(0);
    EXPECT_GE(delay, 216 * kSecond);
    EXPECT_LE(delay, 432 * kSecond);
    delays.insert(delay);
  }
  EXPECT_GT(delays.size(), 1U);
}

// ---- Renewal ----

TEST(TokenProvider, RenewsARenewableHolderOfKeyToken) {
  const ProviderWithToken world(true, true);
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("RenewToken _1 600"));
  EXPECT_THAT(world.observer->TakeEvents(), ElementsAre("renewed _2"));
  EXPECT_EQ(Get(*world.provider), "_2");
}

TEST(TokenProvider, RenewsNoBearerToken) {
  const ProviderWithToken world(true, false);
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, RenewsNoTokenThatIsNotRenewable) {
  const ProviderWithToken world(false, true);
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, RenewsNoTokenThatHasEnded) {
  const ProviderWithToken world(true, true);
  world.clock->Advance(600 * kSecond);
  EXPECT_EQ(Get(*world.provider), "_2");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, AsksAnewAtOnceWhenTheServiceWillNotRenew) {
  const ProviderWithToken world(true, true);
  world.service->PlanFailure(InvalidCredentialsException("the token is not known any more"));
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("RenewToken _1 600", kAcquire));
  EXPECT_THAT(world.observer->TakeEvents(), ElementsAre("refreshed _2"));
}

TEST(TokenProvider, AsksAnewAtOnceWhenThereIsNoKeyToRenewWith) {
  const ProviderWithToken world(true, true);
  world.service->PlanFailure(Pelmar::InvalidStateException("no key"));
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("RenewToken _1 600", kAcquire));
}

TEST(TokenProvider, AsksAnewAtOnceWhenTheRenewedTokenEndsTooEarly) {
  const ProviderWithToken world(true, true);
  world.service->Plan([&world] { return world.service->MakeToken(59); });
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("RenewToken _1 600", kAcquire));
  EXPECT_EQ(Get(*world.provider), "_3");
}

TEST(TokenProvider, DoesNotAskAnewWhenNobodyAnswersTheRenewal) {
  ProviderWithToken world(true, true);
  world.FailInBackground(CommunicationException("no answer"));
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("RenewToken _1 600"));
  EXPECT_THAT(world.observer->TakeEvents(), ElementsAre("failed in 1000000: no answer"));
}

// ---- Failures ----

TEST(TokenProvider, AFailedRefreshFailsNobodyWhileTheTokenIsFresh) {
  ProviderWithToken world;
  world.FailInBackground(CommunicationException("no answer"));
  EXPECT_EQ(Get(*world.provider), "_1");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, AFailedRefreshFailsNobodyBeforeTheTokensEnd) {
  ProviderWithToken world;
  world.clock->Advance(600 * kSecond - 1);
  world.service->PlanFailure(CommunicationException("no answer"));
  EXPECT_EQ(Get(*world.provider), "_1");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, CallersDoNotWaitForARetryWhileTheTokenIsValid) {
  ProviderWithToken world;
  world.FailInBackground(CommunicationException("no answer"));
  world.service->TakeCalls();
  world.clock->Advance(590 * kSecond);  // The retry is overdue: it is the timer's to make.
  EXPECT_EQ(Get(*world.provider), "_1");
  EXPECT_THAT(world.service->TakeCalls(), IsEmpty());
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_EQ(Get(*world.provider), "_2");
}

TEST(TokenProvider, AfterTheTokensEndThrowsTheLastErrorWithItsType) {
  ProviderWithToken world;
  world.FailInBackground(CommunicationException("no answer"));
  world.clock->Advance(600 * kSecond);
  world.service->PlanFailure(Quorlin::SsoException("nonsense"));
  EXPECT_EQ(Get(*world.provider), "Quorlin::SsoException: nonsense");
}

TEST(TokenProvider, ThrowsTheLastErrorWithoutAskingUntilTheNextTryIsDue) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(CommunicationException("no answer"));
  EXPECT_EQ(Get(*provider), kNoAnswer);
  world.clock->Advance(kSecond - 1);
  EXPECT_EQ(Get(*provider), kNoAnswer);
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
  world.clock->Advance(1);
  EXPECT_EQ(Get(*provider), "_1");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, RetriesInTheBackgroundAtGrowingIntervalsUpToTheCap) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(CommunicationException("no answer"));
  Get(*provider);
  std::vector<long long> delays;
  for (int i = 0; i < 8; ++i) {
    const std::vector<long long> waiting = world.scheduler->GetDelays();
    ASSERT_EQ(waiting.size(), 1U);
    delays.push_back(waiting[0] / kSecond);
    world.service->PlanFailure(CommunicationException("no answer"));
    world.scheduler->RunTimer();
  }
  EXPECT_THAT(delays, ElementsAre(1, 2, 4, 8, 16, 32, 60, 60));
}

TEST(TokenProvider, ASuccessEndsTheRetries) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(CommunicationException("no answer"));
  Get(*provider);
  world.service->PlanFailure(CommunicationException("no answer"));
  world.scheduler->RunTimer();
  world.scheduler->RunTimer();
  EXPECT_THAT(world.scheduler->GetDelays(), ElementsAre(432 * kSecond));
  EXPECT_EQ(Get(*provider), "_1");
  world.service->PlanFailure(CommunicationException("no answer"));
  world.scheduler->RunTimer();
  EXPECT_THAT(world.scheduler->GetDelays(), ElementsAre(kSecond));
}

TEST(TokenProvider, ATokenThatIsNotFreshIsAFailure) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->Plan([&world] { return world.service->MakeToken(59); });
  EXPECT_EQ(
      Get(*provider),
      "Quorlin::SsoException: The new token ends at 2027-01-15T08:00:59Z, and so holds for less than 60 "
      "seconds");
  EXPECT_THAT(world.scheduler->GetDelays(), ElementsAre(kSecond));
}

TEST(TokenProvider, ATokenOfJustTheLeastLifeIsFresh) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->Plan([&world] { return world.service->MakeToken(60); });
  EXPECT_EQ(Get(*provider), "_1");
}

TEST(TokenProvider, NoTokenIsAFailure) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->Plan([] { return Token(); });
  EXPECT_EQ(Get(*provider), "Quorlin::SsoException: The request for a token gave no token");
}

TEST(TokenProvider, OtherExceptionsArriveAsThePlatformsWithTheirText) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(std::runtime_error("no more handles"));
  EXPECT_EQ(Get(*provider), "Pelmar::Exception: The request for a token failed: no more handles");
}

TEST(TokenProvider, SomethingThatIsNoExceptionArrivesAsOne) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(7);
  EXPECT_EQ(Get(*provider),
            "Pelmar::Exception: The request for a token failed: an exception of an unknown class");
}

TEST(TokenProvider, AnExceptionThrownByPointerArrivesAsOne) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->Plan([]() -> Token { throw new Quorlin::ParseException("no value"); });
  EXPECT_EQ(Get(*provider), "Quorlin::ParseException: no value");
}

// ---- Wrong credentials ----

TEST(TokenProvider, WrongCredentialsAreNotTriedAgain) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(InvalidCredentialsException("wrong"));
  EXPECT_EQ(Get(*provider), kWrong);
  EXPECT_EQ(world.scheduler->Count(), 0U);
  world.clock->Advance(1000000 * kSecond);
  EXPECT_EQ(Get(*provider), kWrong);
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
  EXPECT_THAT(world.observer->TakeEvents(), ElementsAre("failed in -1: wrong"));
}

TEST(TokenProvider, WrongCredentialsAreNotTriedAgainWhileTheTokenIsValidEither) {
  ProviderWithToken world;
  world.FailInBackground(InvalidCredentialsException("wrong"));
  world.clock->Advance(600 * kSecond - 1);
  EXPECT_EQ(Get(*world.provider), "_1");
  world.clock->Advance(1);
  EXPECT_EQ(Get(*world.provider), kWrong);
  EXPECT_EQ(world.scheduler->Count(), 0U);
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, AfterInvalidateCredentialsAreTriedAgain) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(InvalidCredentialsException("wrong"));
  EXPECT_EQ(Get(*provider), kWrong);
  provider->Invalidate();
  EXPECT_EQ(Get(*provider), "_1");
}

// ---- Invalidate ----

TEST(TokenProvider, InvalidateForgetsTheTokenAndAsksNothing) {
  const ProviderWithToken world;
  world.provider->Invalidate();
  EXPECT_EQ(world.scheduler->Count(), 0U);
  EXPECT_THAT(world.service->TakeCalls(), IsEmpty());
  EXPECT_EQ(Get(*world.provider), "_2");
}

TEST(TokenProvider, InvalidateForgetsTheLastError) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(CommunicationException("no answer"));
  Get(*provider);
  provider->Invalidate();
  EXPECT_EQ(world.scheduler->Count(), 0U);
  EXPECT_EQ(Get(*provider), "_1");
}

TEST(TokenProvider, AnInvalidatedTokenIsNotRenewed) {
  const ProviderWithToken world(true, true);
  world.provider->Invalidate();
  EXPECT_EQ(Get(*world.provider), "_2");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre(kAcquire));
}

TEST(TokenProvider, InvalidateTokenForgetsTheTokenThatIsKept) {
  const ProviderWithToken world;
  const Token rejected = world.provider->GetToken();
  world.provider->InvalidateToken(*rejected);
  EXPECT_EQ(Get(*world.provider), "_2");
  world.provider->InvalidateToken(*rejected);
  EXPECT_EQ(Get(*world.provider), "_2");
}

TEST(TokenProvider, WhatWasAskedForBeforeInvalidateIsHandedToNobody) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  std::string heard;
  world.service->Plan([&] {
    provider->GetTokenAsync(
        [&heard](const Token& token, const Pelmar::Exception*) { heard += token->GetId(); });
    provider->Invalidate();
    return world.service->MakeToken(600);
  });
  EXPECT_EQ(Get(*provider), "_2");
  world.scheduler->RunAtOnce();
  EXPECT_EQ(heard, "_2");
  EXPECT_EQ(Get(*provider), "_2");
  EXPECT_THAT(world.observer->TakeEvents(), ElementsAre("refreshed _2"));
}

TEST(TokenProvider, WhoWaitsWithoutAThreadIsServedAfterAnInvalidatedRefresh) {
  const ProviderWithToken world;
  std::string heard;
  world.service->Plan([&] {
    world.provider->Invalidate();
    world.provider->GetTokenAsync(
        [&heard](const Token& token, const Pelmar::Exception*) { heard += token->GetId(); });
    return world.service->MakeToken(600);
  });
  EXPECT_TRUE(world.scheduler->RunTimer());
  world.scheduler->RunAtOnce();
  EXPECT_EQ(heard, "_3");
}

TEST(TokenProvider, AFailureBeforeInvalidateFailsNobody) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->Plan([&]() -> Token {
    provider->Invalidate();
    throw InvalidCredentialsException("wrong");
  });
  EXPECT_EQ(Get(*provider), "_1");
}

// ---- The observer ----

TEST(TokenProvider, TellsItsObserver) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(CommunicationException("no answer"));
  Get(*provider);
  world.scheduler->RunTimer();
  EXPECT_THAT(world.observer->TakeEvents(), ElementsAre("failed in 1000000: no answer", "refreshed _1"));
}

class ThrowingObserver final : public Quorlin::TokenProviderObserver {
 public:
  void OnRefreshed(const Token&, bool) override { throw std::runtime_error("refreshed"); }
  void OnFailed(const Pelmar::Exception&, long long) override { throw std::runtime_error("failed"); }
};

TEST(TokenProvider, WhatAnObserverThrowsIsLost) {
  ProviderWorld world;
  world.options.observer = boost::make_shared<ThrowingObserver>();
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(CommunicationException("no answer"));
  EXPECT_EQ(Get(*provider), kNoAnswer);
  world.scheduler->RunTimer();
  EXPECT_EQ(Get(*provider), "_1");
}

TEST(TokenProvider, NeedsNoObserver) {
  ProviderWorld world;
  world.options.observer.reset();
  const auto provider = world.MakeProvider();
  EXPECT_EQ(Get(*provider), "_1");
}

/// Gets the token when it is told that there is one.
class CuriousObserver final : public Quorlin::TokenProviderObserver {
 public:
  void OnRefreshed(const Token&, bool) override { heard = Get(*provider); }
  void OnFailed(const Pelmar::Exception&, long long) override { heard = Get(*provider); }

  Quorlin::TokenProvider* provider = nullptr;
  std::string heard;
};

TEST(TokenProvider, AnObserverMayCallTheProvider) {
  ProviderWorld world;
  const auto curious = boost::make_shared<CuriousObserver>();
  world.options.observer = curious;
  const auto provider = world.MakeProvider();
  curious->provider = provider.get();
  world.service->PlanFailure(CommunicationException("no answer"));
  Get(*provider);
  EXPECT_EQ(curious->heard, kNoAnswer);
  world.scheduler->RunTimer();
  EXPECT_EQ(curious->heard, "_1");
}

// ---- A scheduler without threads to give ----

TEST(TokenProvider, WithoutASchedulerThatWorksCallersAskThemselves) {
  const ProviderWorld world;
  world.scheduler->Refuse();
  const auto provider = world.MakeProvider();
  EXPECT_EQ(Get(*provider), "_1");
  world.clock->Advance(541 * kSecond);
  EXPECT_EQ(Get(*provider), "_2");
}

TEST(TokenProvider, WithoutASchedulerThatWorksCallersStillGetAValidToken) {
  const ProviderWorld world;
  world.scheduler->Refuse();
  const auto provider = world.MakeProvider();
  EXPECT_EQ(Get(*provider), "_1");
  world.clock->Advance(541 * kSecond);
  world.service->PlanFailure(CommunicationException("no answer"));
  EXPECT_EQ(Get(*provider), "_1");
  EXPECT_EQ(Get(*provider), "_1");
  world.clock->Advance(59 * kSecond);
  EXPECT_EQ(Get(*provider), "_2");
}

// ---- Making one ----

std::string Make(const Quorlin::TokenProviderOptions& options) {
  const ProviderWorld world;
  return VerdictOf(
      [&] { Quorlin::CreateTokenProvider(world.service, Quorlin::RequestByCertificate(), options); });
}

TEST(TokenProvider, HasItsDefaults) {
  const Quorlin::TokenProviderOptions options;
  EXPECT_EQ(options.spec.tokenLifetimeSec, Quorlin::TokenSpec().tokenLifetimeSec);
  EXPECT_EQ(options.minimumLifeSec, 60);
  EXPECT_EQ(options.refreshPercent, 80);
  EXPECT_EQ(options.jitterPercent, 10);
  EXPECT_EQ(options.firstRetrySec, 1);
  EXPECT_EQ(options.maxRetrySec, 60);
  EXPECT_EQ(options.observer, nullptr);
  EXPECT_EQ(options.clock, nullptr);
  EXPECT_EQ(options.scheduler, nullptr);
}

struct RangeCase {
  const char* text;
  void (*change)(Quorlin::TokenProviderOptions& options, int beyond);
};

class TokenProviderRanges : public testing::TestWithParam<RangeCase> {};

TEST_P(TokenProviderRanges, AreKept) {
  Quorlin::TokenProviderOptions options;
  options.spec.tokenLifetimeSec = 600;
  GetParam().change(options, 0);
  EXPECT_EQ(Make(options), "accepted");
  GetParam().change(options, 1);
  EXPECT_EQ(Make(options), std::string("Pelmar::InvalidArgumentException: Invalid argument : "
                                       "TokenProviderOptions::") +
                               GetParam().text);
}

using Options = Quorlin::TokenProviderOptions;
constexpr const char* kLifeText =
    "minimumLifeSec must be from 0 to a year, and below the lifetime that is asked for";
constexpr const char* kMaxRetryText = "maxRetrySec must be from firstRetrySec to a day";

INSTANTIATE_TEST_SUITE_P(All, TokenProviderRanges,
                         testing::Values(RangeCase{"spec must ask for a positive lifetime",
                                                   [](Options& o, int beyond) {
                                                     o.minimumLifeSec = 0;
                                                     o.spec.tokenLifetimeSec = 1 - beyond;
                                                   }},
                                         RangeCase{kLifeText,
                                                   [](Options& o, int beyond) {
                                                     o.minimumLifeSec = 0 - beyond;
                                                   }},
                                         RangeCase{kLifeText,
                                                   [](Options& o, int beyond) {
                                                     o.minimumLifeSec = 599 + beyond;
                                                   }},
                                         RangeCase{kLifeText,
                                                   [](Options& o, int beyond) {
                                                     o.spec.tokenLifetimeSec = 1000000000000;
                                                     o.minimumLifeSec = 31536000 + beyond;
                                                   }},
                                         RangeCase{"refreshPercent must be from 1 to 100",
                                                   [](Options& o, int beyond) {
                                                     o.refreshPercent = 1 - beyond;
                                                   }},
                                         RangeCase{"refreshPercent must be from 1 to 100",
                                                   [](Options& o, int beyond) {
                                                     o.refreshPercent = 100 + beyond;
                                                   }},
                                         RangeCase{"jitterPercent must be from 0 to 90",
                                                   [](Options& o, int beyond) {
                                                     o.jitterPercent = 0 - beyond;
                                                   }},
                                         RangeCase{"jitterPercent must be from 0 to 90",
                                                   [](Options& o, int beyond) {
                                                     o.jitterPercent = 90 + beyond;
                                                   }},
                                         RangeCase{"firstRetrySec must be at least 1",
                                                   [](Options& o, int beyond) {
                                                     o.firstRetrySec = 1 - beyond;
                                                   }},
                                         RangeCase{kMaxRetryText,
                                                   [](Options& o, int beyond) {
                                                     o.firstRetrySec = 5;
                                                     o.maxRetrySec = 5 - beyond;
                                                   }},
                                         RangeCase{kMaxRetryText, [](Options& o, int beyond) {
                                                     o.maxRetrySec = 86400 + beyond;
                                                   }}));

TEST(TokenProvider, NeedsAService) {
  EXPECT_EQ(
      VerdictOf([] {
        Quorlin::TokenProviderOptions options;
        options.spec.tokenLifetimeSec = 600;
        Quorlin::CreateTokenProvider(nullptr, Quorlin::RequestByCertificate(), options);
      }),
      "Pelmar::InvalidArgumentException: Invalid argument : the service of a token provider must not be "
      "NULL");
}

TEST(TokenProvider, NeedsAWayToAsk) {
  const ProviderWorld world;
  EXPECT_EQ(VerdictOf([&] { world.MakeProvider(Quorlin::TokenRequest()); }),
            "Pelmar::InvalidArgumentException: Invalid argument : TokenRequest must not be empty");
}

}  // namespace
