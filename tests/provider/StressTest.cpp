// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// 64 threads and the development token service: one request per refresh, counted where it arrives.

#include <quorlin/TokenProvider.h>
#include <quorlin/quorlin.h>

#include "provider/ProviderWorld.h"

#include "devsts/Service.h"

#include <boost/make_shared.hpp>

#include <gtest/gtest.h>

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace TestSupport;
using Token = boost::shared_ptr<const Quorlin::SamlToken>;

constexpr int kThreads = 64;
constexpr int kRounds = 12;

/// Lets nobody through before everybody is there.
class Barrier final {
 public:
  explicit Barrier(int count) : _missing(count) {}

  void Pass() {
    std::unique_lock<std::mutex> lock(_mutex);
    if (--_missing == 0) {
      _complete.notify_all();
    }
    _complete.wait(lock, [this] { return _missing <= 0; });
  }

 private:
  std::mutex _mutex;
  std::condition_variable _complete;
  int _missing;
};

/// Runs `action` on many threads, all beginning together.
template <typename Action>
void RunTogether(int count, const Action& action) {
  Barrier barrier(count);
  std::vector<std::thread> threads;
  for (int i = 0; i < count; ++i) {
    threads.emplace_back([&barrier, &action, i] {
      barrier.Pass();
      action(i);
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

/// A development token service, and a provider whose clock is moved by hand: as the service's does not move,
/// it is asked for tokens that live longer by as much.
class StressWorld final {
 public:
  StressWorld() : _service(MakeConfig()), _start(_clock->GetUtcTime()) {
    Quorlin::TokenProviderOptions options;
    options.spec.tokenLifetimeSec = 600;
    options.clock = _clock;
    options.scheduler = scheduler;
    provider = Quorlin::CreateTokenProvider(MakeClient(), MakeRequest(), options);
  }

  void PassTheFreshTime() { _clock->Advance(601 * kSecond); }
  int CountRequests() const { return _requests; }

  boost::shared_ptr<HandScheduler> scheduler = boost::make_shared<HandScheduler>();
  boost::shared_ptr<Quorlin::TokenProvider> provider;

 private:
  DevSts::ServiceConfig MakeConfig() {
    DevSts::ServiceConfig config;
    config.log = [this](const std::string&) {
      ++_requests;
    };
    return config;
  }

  boost::shared_ptr<Quorlin::SecurityTokenService> MakeClient() const {
    Pelmar::Ssl::SSLContextOptions tls;
    tls.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(_service.GetCaCertificate());
    Quorlin::SecurityTokenServiceConfig config;
    config.stsUrl = _service.GetUrl();
    config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
    config.trustedStsCertificates =
        Pelmar::Crypto::CreateCertificatesFromPem(_service.GetSigningCertificate());
    return Quorlin::CreateSecurityTokenService(config);
  }

  Quorlin::TokenRequest MakeRequest() const {
    const Quorlin::TokenRequest request =
        Quorlin::RequestByPassword("alice@example.com", [] { return std::string("secret"); });
    return [this, request](const Quorlin::SecurityTokenService& service, const Quorlin::TokenSpec& spec) {
      Quorlin::TokenSpec longer = spec;
      longer.tokenLifetimeSec += (_clock->GetUtcTime() - _start) / kSecond;
      return request(service, longer);
    };
  }

  std::atomic<int> _requests{0};
  const boost::shared_ptr<HandClock> _clock =
      boost::make_shared<HandClock>(Pelmar::System::GetUtcDateTime().GetUtcTime());
  DevSts::Service _service;
  const long long _start;
};

/// What `count` threads get together.
std::set<std::string> GetTogether(StressWorld& world, int count) {
  std::vector<std::string> got(static_cast<std::size_t>(count));
  RunTogether(count, [&](int i) { got[static_cast<std::size_t>(i)] = Get(*world.provider); });
  return std::set<std::string>(got.begin(), got.end());
}

TEST(TokenProviderStress, ManyCallersWithoutATokenMakeOneRequest) {
  StressWorld world;
  std::set<std::string> all;
  for (int round = 1; round <= kRounds; ++round) {
    const std::set<std::string> got = GetTogether(world, kThreads);
    EXPECT_EQ(got.size(), 1U) << *got.begin();
    all.insert(got.begin(), got.end());
    EXPECT_EQ(world.CountRequests(), round);
    world.PassTheFreshTime();
  }
  EXPECT_EQ(all.size(), static_cast<std::size_t>(kRounds));
}

TEST(TokenProviderStress, ARefreshInTheBackgroundIsOneRequestToo) {
  StressWorld world;
  world.provider->GetToken();
  for (int round = 2; round <= kRounds; ++round) {
    RunTogether(kThreads, [&](int i) {
      if (i == 0) {
        EXPECT_TRUE(world.scheduler->RunTimer());
      } else {
        world.provider->GetToken();
      }
    });
    EXPECT_EQ(world.CountRequests(), round);
  }
}

// The timer is due and the token is stale: whoever comes first asks, and the timer is taken back or finds it
// done.
TEST(TokenProviderStress, CallersAndTheBackgroundTogetherMakeOneRequest) {
  StressWorld world;
  world.provider->GetToken();
  for (int round = 2; round <= kRounds; ++round) {
    world.PassTheFreshTime();
    std::atomic<int> ran{0};
    RunTogether(kThreads, [&](int i) {
      if (i == 0) {
        // At most the one that was there: the next is set by the refresh, and is another refresh.
        ran += world.scheduler->RunTimer() ? 1 : 0;
      } else {
        world.provider->GetToken();
      }
    });
    EXPECT_GE(world.CountRequests(), round);
    EXPECT_LE(world.CountRequests(), round + ran);
    round = world.CountRequests();
  }
}

TEST(TokenProviderStress, InvalidatingTogetherThrowsAwayOneToken) {
  StressWorld world;
  for (int round = 1; round <= kRounds; ++round) {
    const Token rejected = world.provider->GetToken();
    EXPECT_EQ(world.CountRequests(), round);
    RunTogether(kThreads, [&](int) {
      world.provider->InvalidateToken(*rejected);
      EXPECT_NE(world.provider->GetToken()->GetId(), rejected->GetId());
    });
    EXPECT_EQ(world.CountRequests(), round + 1);
  }
}

TEST(TokenProviderStress, AsynchronousAndBlockingCallersShareARequest) {
  StressWorld world;
  std::atomic<int> heard{0};
  for (int round = 1; round <= kRounds; ++round) {
    RunTogether(kThreads, [&](int i) {
      if (i % 2 == 0) {
        world.provider->GetToken();
        return;
      }
      world.provider->GetTokenAsync(
          [&heard](const Token& token, const Pelmar::Exception*) { heard += token ? 1 : 0; });
      world.scheduler->RunAtOnce();
    });
    world.scheduler->RunAtOnce();
    EXPECT_EQ(heard, round * kThreads / 2);
    EXPECT_EQ(world.CountRequests(), round);
    world.PassTheFreshTime();
  }
}

// With the scheduler and the clock that hosts get, and a service that is destroyed while it is asked.
TEST(TokenProviderStress, ProvidersMayGoAtAnyMoment) {
  DevSts::Service service{DevSts::ServiceConfig()};
  Quorlin::SecurityTokenServiceConfig config;
  Pelmar::Ssl::SSLContextOptions tls;
  tls.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(service.GetCaCertificate());
  config.stsUrl = service.GetUrl();
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(service.GetSigningCertificate());
  const auto client = Quorlin::CreateSecurityTokenService(config);
  Quorlin::TokenProviderOptions options;
  options.spec.tokenLifetimeSec = 600;
  std::mutex mutex;
  std::condition_variable told;
  int calls = 0;
  constexpr int kProviders = 30;
  for (int i = 0; i < kProviders; ++i) {
    const auto provider = Quorlin::CreateTokenProvider(
        client, Quorlin::RequestByPassword("alice@example.com", [] { return std::string("secret"); }),
        options);
    provider->GetTokenAsync([&](const Token& token, const Pelmar::Exception* error) {
      EXPECT_NE(token == nullptr, error == nullptr);
      const std::lock_guard<std::mutex> lock(mutex);
      ++calls;
      told.notify_all();
    });
  }
  std::unique_lock<std::mutex> lock(mutex);
  told.wait(lock, [&calls] { return calls == kProviders; });
}

}  // namespace
