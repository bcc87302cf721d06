// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin_provider_bench [--rounds N]: what GetToken() costs while the token is fresh: by one and by two
// threads, and while the provider gets a new token all the time.

#include <pelmar/system/DateTime.h>
#include <quorlin/TokenProvider.h>
#include <quorlin/quorlin.h>

#include "devsts/Service.h"

#include <boost/make_shared.hpp>

#include <algorithm>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <exception>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

#include <pthread.h>
#include <sched.h>

namespace {

using Token = boost::shared_ptr<const Quorlin::SamlToken>;
using Action = std::function<void()>;

constexpr int kCallsPerRound = 200000;
constexpr int kDefaultRounds = 31;
constexpr int kMaxRounds = 10000;

/// Processor time of this thread: other work on the machine does not count.
double GetThreadNanoseconds() {
  std::timespec now{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &now);
  return static_cast<double>(now.tv_sec) * 1e9 + static_cast<double>(now.tv_nsec);
}

double MeasureCalls(const Action& call) {
  const double start = GetThreadNanoseconds();
  for (int i = 0; i < kCallsPerRound; ++i) {
    call();
  }
  return (GetThreadNanoseconds() - start) / kCallsPerRound;
}

/// Two threads on one processor would take turns, and never meet. Where there is only one they do.
void StayOnProcessor(std::size_t number) {
  cpu_set_t allowed;
  CPU_ZERO(&allowed);
  CPU_SET(number % std::thread::hardware_concurrency(), &allowed);
  pthread_setaffinity_np(pthread_self(), sizeof(allowed), &allowed);
}

/// What one call costs each of `count` threads that call all the time.
std::vector<double> MeasureTogether(const Action& call, int count) {
  std::vector<double> costs(static_cast<std::size_t>(count));
  std::atomic<int> missing(count);
  std::vector<std::thread> threads;
  for (std::size_t i = 0; i < costs.size(); ++i) {
    threads.emplace_back([&, i] {
      StayOnProcessor(i);
      for (--missing; missing > 0;) {
        std::this_thread::yield();
      }
      costs[i] = MeasureCalls(call);
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  return costs;
}

double MeasureMedian(const Action& call, int threads, int rounds) {
  std::vector<double> costs;
  for (int i = 0; i < rounds; ++i) {
    const std::vector<double> round = MeasureTogether(call, threads);
    costs.insert(costs.end(), round.begin(), round.end());
  }
  std::nth_element(costs.begin(), costs.begin() + static_cast<std::ptrdiff_t>(costs.size() / 2), costs.end());
  return costs[costs.size() / 2];
}

/// Holds the provider's timer until it is wanted; everything else is not needed here.
class TimerByHand final : public Quorlin::TokenProviderScheduler {
 public:
  unsigned long long Schedule(long long, const Work& work) override {
    const std::lock_guard<std::mutex> lock(_mutex);
    _work = work;
    return 1;
  }
  void Cancel(unsigned long long) override {}

  void Run() {
    Work work;
    {
      const std::lock_guard<std::mutex> lock(_mutex);
      work.swap(_work);
    }
    if (work) {
      work();
    }
  }

 private:
  std::mutex _mutex;
  Work _work;
};

/// Counts new tokens. A failure ends the program: what would be measured is something else.
class RefreshCounter final : public Quorlin::TokenProviderObserver {
 public:
  void OnRefreshed(const Token&, bool) override { ++_count; }
  void OnFailed(const Pelmar::Exception& error, long long) override {
    std::fprintf(stderr, "quorlin_provider_bench: a refresh failed: %s\n", error.what());
    std::abort();
  }
  int Count() const { return _count; }

 private:
  std::atomic<int> _count{0};
};

/// Has a provider refresh its token over and over, as long as this lives.
class RefreshAllTheTime final {
 public:
  explicit RefreshAllTheTime(TimerByHand& timer)
      : _thread([this, &timer] {
          while (!_isEnough) {
            timer.Run();
          }
        }) {}
  RefreshAllTheTime(const RefreshAllTheTime&) = delete;
  RefreshAllTheTime& operator=(const RefreshAllTheTime&) = delete;
  ~RefreshAllTheTime() {
    _isEnough = true;
    _thread.join();
  }

 private:
  std::atomic<bool> _isEnough{false};
  std::thread _thread;
};

boost::shared_ptr<Quorlin::SecurityTokenService> MakeClient(const DevSts::Service& service) {
  Pelmar::Ssl::SSLContextOptions tls;
  tls.trustAnchors = Pelmar::Crypto::CreateCertificatesFromPem(service.GetCaCertificate());
  Quorlin::SecurityTokenServiceConfig config;
  config.stsUrl = service.GetUrl();
  config.sslContext = Pelmar::Ssl::CreateSSLContext(tls);
  config.trustedStsCertificates = Pelmar::Crypto::CreateCertificatesFromPem(service.GetSigningCertificate());
  return Quorlin::CreateSecurityTokenService(config);
}

void Print(const char* name, double nanoseconds) {
  std::printf("  %-52s %7.1f\n", name, nanoseconds);
}

void Run(int rounds) {
  const DevSts::Service service{DevSts::ServiceConfig()};
  const auto timer = boost::make_shared<TimerByHand>();
  const auto counter = boost::make_shared<RefreshCounter>();
  Quorlin::TokenProviderOptions options;
  options.spec.tokenLifetimeSec = 3600;
  options.scheduler = timer;
  options.observer = counter;
  const auto provider = Quorlin::CreateTokenProvider(
      MakeClient(service),
      Quorlin::RequestByPassword("alice@example.com", [] { return std::string("secret"); }), options);
  provider->GetToken();
  const Action get = [&provider] {
    provider->GetToken();
  };

  std::printf("Medians of %d rounds of %d calls, processor time of the calling thread, in nanoseconds.\n\n",
              rounds, kCallsPerRound);
  Print("floor: reading the clock", MeasureMedian([] { Pelmar::System::GetUtcDateTime(); }, 1, rounds));
  Print("GetToken(), one thread", MeasureMedian(get, 1, rounds));
  Print("GetToken(), each of two threads", MeasureMedian(get, 2, rounds));
  const RefreshAllTheTime refreshing(*timer);
  Print("GetToken(), one thread, refreshed all the time", MeasureMedian(get, 1, rounds));
  Print("GetToken(), each of two threads, the same", MeasureMedian(get, 2, rounds));
  std::printf("\nThe last two saw %d refreshes over HTTPS.\n", counter->Count() - 1);
}

bool ParseRounds(int count, char** arguments, int& rounds) {
  if (count == 1) {
    return true;
  }
  if (count != 3 || std::strcmp(arguments[1], "--rounds") != 0) {
    return false;
  }
  char* end = nullptr;
  const long number = std::strtol(arguments[2], &end, 10);
  rounds = static_cast<int>(number);
  return end != arguments[2] && *end == '\0' && number > 0 && number <= kMaxRounds;
}

}  // namespace

int main(int count, char** arguments) {
  int rounds = kDefaultRounds;
  if (!ParseRounds(count, arguments, rounds)) {
    std::fprintf(stderr, "usage: quorlin_provider_bench [--rounds N]\n");
    return 2;
  }
  try {
    Run(rounds);
    return EXIT_SUCCESS;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "quorlin_provider_bench: %s\n", e.what());
    return EXIT_FAILURE;
  }
}
