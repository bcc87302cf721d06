// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// GetTokenAsync, callers of both kinds together, and the provider's end.

#include <quorlin/TokenProvider.h>

#include "provider/ProviderWorld.h"
#include "quorlin-provider/TokenKeeper.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <condition_variable>
#include <future>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <thread>

namespace {

using namespace TestSupport;
using testing::ElementsAre;
using testing::IsEmpty;
using Token = boost::shared_ptr<const Quorlin::SamlToken>;

constexpr const char* kDestroyed = "Pelmar::InvalidStateException: The token provider was destroyed.";

/// Writes down the ID of the token, or what is said of the exception.
struct Ear {
  Quorlin::TokenCompletion Listen() {
    return [this](const Token& token, const Pelmar::Exception* error) {
      heard.push_back(token && error == nullptr ? token->GetId() : Describe(*error));
    };
  }

  std::vector<std::string> heard;
};

TEST(TokenProviderAsync, RunsNothingWithinTheCall) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  Ear ear;
  provider->GetTokenAsync(ear.Listen());
  EXPECT_THAT(world.service->TakeCalls(), IsEmpty());
  world.scheduler->RunAtOnce();
  EXPECT_THAT(ear.heard, ElementsAre("_1"));
}

TEST(TokenProviderAsync, GivesTheTokenThatIsKept) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  provider->GetToken();
  Ear ear;
  provider->GetTokenAsync(ear.Listen());
  EXPECT_THAT(ear.heard, IsEmpty());
  world.scheduler->RunAtOnce();
  EXPECT_THAT(ear.heard, ElementsAre("_1"));
}

TEST(TokenProviderAsync, ManyWaitForOneRequest) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  Ear ear;
  for (int i = 0; i < 3; ++i) {
    provider->GetTokenAsync(ear.Listen());
  }
  world.scheduler->RunAtOnce();
  EXPECT_THAT(ear.heard, ElementsAre("_1", "_1", "_1"));
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("AcquireTokenByCertificate 600"));
}

TEST(TokenProviderAsync, AllHearOfTheFailureWithItsType) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.service->PlanFailure(Quorlin::InvalidCredentialsException("wrong"));
  Ear ear;
  provider->GetTokenAsync(ear.Listen());
  provider->GetTokenAsync(ear.Listen());
  world.scheduler->RunAtOnce();
  provider->GetTokenAsync(ear.Listen());
  world.scheduler->RunAtOnce();
  const std::string wrong = "Quorlin::InvalidCredentialsException: wrong";
  EXPECT_THAT(ear.heard, ElementsAre(wrong, wrong, wrong));
}

TEST(TokenProviderAsync, AFailureGivesTheValidTokenInstead) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  provider->GetToken();
  world.clock->Advance(599 * kSecond);
  world.service->PlanFailure(Quorlin::CommunicationException("no answer"));
  Ear ear;
  provider->GetTokenAsync(ear.Listen());
  world.scheduler->RunAtOnce();
  EXPECT_THAT(ear.heard, ElementsAre("_1"));
}

// Were the request claimed for the thread that is to come, a caller that blocks all threads would wait for
// ever.
TEST(TokenProviderAsync, ABlockingCallerDoesNotWaitForWorkThatHasNotBegun) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  Ear ear;
  provider->GetTokenAsync(ear.Listen());
  EXPECT_EQ(Get(*provider), "_1");
  EXPECT_THAT(ear.heard, IsEmpty());
  world.scheduler->RunAtOnce();
  EXPECT_THAT(ear.heard, ElementsAre("_1"));
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("AcquireTokenByCertificate 600"));
}

TEST(TokenProviderAsync, FindsWhatHasBecomeFreshMeanwhile) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  Ear ear;
  world.service->Plan([&] {
    provider->GetTokenAsync(ear.Listen());
    return world.service->MakeToken(600);
  });
  provider->GetToken();
  world.scheduler->RunAtOnce();
  EXPECT_THAT(ear.heard, ElementsAre("_1"));
}

TEST(TokenProviderAsync, RefusesAnEmptyFunction) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  EXPECT_EQ(VerdictOf([&] { provider->GetTokenAsync(Quorlin::TokenCompletion()); }),
            "Pelmar::InvalidArgumentException: Invalid argument : TokenCompletion must not be empty");
}

TEST(TokenProviderAsync, ThrowsWhatTheSchedulerThrowsAndForgetsTheCaller) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  world.scheduler->Refuse();
  Ear ear;
  EXPECT_THROW(provider->GetTokenAsync(ear.Listen()), std::runtime_error);
  EXPECT_EQ(Get(*provider), "_1");
  EXPECT_THAT(ear.heard, IsEmpty());
}

TEST(TokenProviderAsync, IsAnsweredOnTheSpotWhenTheSchedulerTakesNoMoreWork) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  Ear ear;
  provider->GetTokenAsync(ear.Listen());
  provider->GetTokenAsync([](const Token&, const Pelmar::Exception*) { throw std::runtime_error("lost"); });
  provider->GetTokenAsync(ear.Listen());
  world.scheduler->Refuse();
  EXPECT_EQ(Get(*provider), "_1");
  EXPECT_THAT(ear.heard, ElementsAre("_1", "_1"));
}

TEST(TokenProviderAsync, MayBeUsedInACompletionOnTheSpot) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider();
  provider->GetToken();
  world.scheduler->Refuse();
  std::string heard;
  provider->GetTokenAsync([&](const Token& token, const Pelmar::Exception*) {
    provider->Invalidate();
    heard = token->GetId();
  });
  EXPECT_EQ(heard, "_1");
}

// ---- The end ----

/// Stands still, and counts how often it is read.
class CountedClock final : public Quorlin::TokenProviderClock {
 public:
  explicit CountedClock(long long now) : _now(now) {}

  long long GetUtcTime() const override {
    const std::lock_guard<std::mutex> lock(_mutex);
    ++_readings;
    _changed.notify_all();
    return _now;
  }
  int CountReadings() const {
    const std::lock_guard<std::mutex> lock(_mutex);
    return _readings;
  }
  void AwaitReadings(int count) const {
    std::unique_lock<std::mutex> lock(_mutex);
    _changed.wait(lock, [&] { return _readings >= count; });
  }

 private:
  const long long _now;
  mutable std::mutex _mutex;
  mutable std::condition_variable _changed;
  mutable int _readings = 0;
};

TEST(TokenProviderEnd, WhoWaitsWithoutAThreadIsTold) {
  const ProviderWorld world;
  auto provider = world.MakeProvider();
  Ear ear;
  provider->GetTokenAsync(ear.Listen());
  provider.reset();
  EXPECT_THAT(ear.heard, IsEmpty());
  world.scheduler->RunAtOnce();
  EXPECT_THAT(ear.heard, ElementsAre(kDestroyed));
  EXPECT_THAT(world.service->TakeCalls(), IsEmpty());
}

TEST(TokenProviderEnd, TimersAreForgotten) {
  const ProviderWorld world;
  auto provider = world.MakeProvider();
  provider->GetToken();
  provider.reset();
  EXPECT_EQ(world.scheduler->Count(), 0U);
}

TEST(TokenProviderEnd, MayComeInTheMiddleOfARefreshOfWhichNobodyHears) {
  const ProviderWorld world;
  auto provider = world.MakeProvider();
  provider->GetToken();
  world.observer->TakeEvents();
  world.service->Plan([&] {
    provider.reset();
    return world.service->MakeToken(600);
  });
  EXPECT_TRUE(world.scheduler->RunTimer());
  EXPECT_EQ(provider, nullptr);
  EXPECT_THAT(world.observer->TakeEvents(), IsEmpty());
  EXPECT_EQ(world.scheduler->Count(), 0U);
}

TEST(TokenProviderEnd, DoesNotWaitForARequestOnItsWayAndWakesThoseWhoDo) {
  const ProviderWorld world;
  std::promise<void> begun;
  std::promise<void> released;
  world.service->Plan([&] {
    begun.set_value();
    released.get_future().wait();
    return world.service->MakeToken(600);
  });
  const auto clock = boost::make_shared<CountedClock>(world.clock->GetUtcTime());
  Quorlin::TokenProviderOptions options = world.options;
  options.clock = clock;
  const auto keeper =
      std::make_shared<Quorlin::TokenKeeper>(world.service, Quorlin::RequestByCertificate(), options);
  const auto get = [keeper] {
    return VerdictOf([&] { keeper->Get(); });
  };
  std::future<std::string> asking = std::async(std::launch::async, get);
  begun.get_future().wait();
  const int readings = clock->CountReadings();
  std::future<std::string> waiting = std::async(std::launch::async, get);
  // The second is made under the lock, which is held until the wait begins: Close comes after that.
  clock->AwaitReadings(readings + 2);
  keeper->Close();
  EXPECT_EQ(waiting.get(), kDestroyed);
  released.set_value();
  EXPECT_EQ(asking.get(), kDestroyed);
  EXPECT_THAT(world.observer->TakeEvents(), IsEmpty());
}

TEST(TokenProviderEnd, TheLastReferenceMayBeReleasedInACompletion) {
  const ProviderWorld world;
  auto provider = world.MakeProvider();
  provider->GetTokenAsync([&provider](const Token&, const Pelmar::Exception*) { provider.reset(); });
  world.scheduler->RunAtOnce();
  EXPECT_EQ(provider, nullptr);
  EXPECT_EQ(world.scheduler->Count(), 0U);
}

}  // namespace
