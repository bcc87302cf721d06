// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin_soak [ACQUISITIONS]: many acquisitions over HTTPS through one service object. Fails when one fails,
// when the client keeps using more memory or descriptors, or when it does not get over a service that was
// killed.

#include "bench/load/ProcessFigures.h"
#include "bench/load/ServiceProcess.h"

#include <quorlin/SecurityTokenService.h>

#include <array>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace Bench;
using ServicePointer = boost::shared_ptr<Quorlin::SecurityTokenService>;

constexpr int kThreads = 16;
constexpr int kDefaultAcquisitions = 50000;
/// The caches are full and every thread has its memory by then.
constexpr int kWarmUp = 5000;
constexpr int kReports = 5;
/// A leak of a hundred bytes in each of the 45,000 acquisitions that follow is more than this.
constexpr std::size_t kMaxGrowthKib = 4096;
/// The last connection of each thread may still be closing when the descriptors are counted.
constexpr std::size_t kMaxMoreDescriptors = kThreads;

struct Figures {
  std::size_t kib = GetResidentKib();
  std::size_t descriptors = CountDescriptors();
};

void Acquire(const Quorlin::SecurityTokenService& service) {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  if (service.AcquireToken("alice@example.com", "secret", spec) == nullptr) {
    throw std::runtime_error("an acquisition brought no token");
  }
}

/// Runs `work(thread)` on all threads, and throws what one of them threw.
template <typename Work>
void RunOnAll(const Work& work) {
  std::mutex mutex;
  std::exception_ptr failure;
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([&, i] {
      try {
        work(i);
      } catch (...) {
        const std::lock_guard<std::mutex> lock(mutex);
        failure = std::current_exception();
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  if (failure) {
    std::rethrow_exception(failure);
  }
}

/// Every one has to succeed.
void AcquireMany(const Quorlin::SecurityTokenService& service, int count) {
  std::atomic<int> left{count};
  RunOnAll([&](int) {
    while (left.fetch_sub(1) > 0) {
      Acquire(service);
    }
  });
}

/// What the threads see of a service that is killed under them and comes back.
class Outage final {
 public:
  /// One thread's part: good calls, then failed ones, then good ones again.
  void Live(const Quorlin::SecurityTokenService& service) {
    for (Stage stage = Stage::BEFORE; stage != Stage::RECOVERED;) {
      const bool worked = Try(service);
      if (worked && stage == Stage::BEFORE) {
        stage = Stage::CALLED;
        Report(_called);
      } else if (!worked && stage == Stage::CALLED) {
        stage = Stage::FAILED;
        Report(_failed);
      } else if (worked && stage == Stage::FAILED) {
        stage = Stage::RECOVERED;
      }
    }
  }

  void AwaitAllCalled() { Await(_called); }
  void AwaitAllFailed() { Await(_failed); }
  int GetFailures() const { return _failures; }

 private:
  enum class Stage { BEFORE, CALLED, FAILED, RECOVERED };

  /// Any other exception than the one that belongs here ends the thread.
  bool Try(const Quorlin::SecurityTokenService& service) {
    try {
      Acquire(service);
      return true;
    } catch (const Quorlin::CommunicationException&) {
      ++_failures;
      return false;
    }
  }

  void Report(int& count) {
    const std::lock_guard<std::mutex> lock(_mutex);
    ++count;
    _changed.notify_all();
  }

  void Await(const int& count) {
    std::unique_lock<std::mutex> lock(_mutex);
    _changed.wait(lock, [&] { return count == kThreads; });
  }

  std::mutex _mutex;
  std::condition_variable _changed;
  int _called = 0;
  int _failed = 0;
  std::atomic<int> _failures{0};
};

void SurviveAnOutage(ServiceProcess& process, const Quorlin::SecurityTokenService& service) {
  Outage outage;
  std::thread accident([&] {
    outage.AwaitAllCalled();
    process.Kill();
    outage.AwaitAllFailed();
    process.Start(0);
  });
  try {
    RunOnAll([&](int) { outage.Live(service); });
  } catch (const std::exception& e) {
    // The accident may wait for a thread that has ended: there is nothing to save.
    std::fprintf(stderr, "quorlin_soak: during the outage: %s\n", e.what());
    std::_Exit(EXIT_FAILURE);
  }
  accident.join();
  std::printf(
      "  the service was killed and started anew: %d CommunicationExceptions, then all %d threads recovered\n",
      outage.GetFailures(), kThreads);
}

void Print(int done, const Figures& figures) {
  std::printf("  %6d acquisitions: %zu KiB resident, %zu descriptors\n", done, figures.kib,
              figures.descriptors);
  std::fflush(stdout);
}

void RequireNoGrowth(const Figures& before, const Figures& after) {
  if (after.kib > before.kib + kMaxGrowthKib) {
    throw std::runtime_error("memory grew by " + std::to_string(after.kib - before.kib) + " KiB");
  }
  if (after.descriptors > before.descriptors + kMaxMoreDescriptors) {
    throw std::runtime_error("descriptors grew by " + std::to_string(after.descriptors - before.descriptors));
  }
}

void Soak(int acquisitions) {
  ServiceProcess process;
  process.Start(0);
  const ServicePointer service = Quorlin::CreateSecurityTokenService(process.MakeClientConfig());
  std::printf("%d acquisitions over HTTPS by %d threads through one service object\n", acquisitions,
              kThreads);
  const auto start = std::chrono::steady_clock::now();
  AcquireMany(*service, kWarmUp);
  const Figures before;
  Print(kWarmUp, before);
  int done = kWarmUp;
  for (int report = 1; report <= kReports; ++report) {
    const int target =
        kWarmUp + static_cast<int>(static_cast<long long>(acquisitions - kWarmUp) * report / kReports);
    AcquireMany(*service, target - done);
    done = target;
    Print(done, Figures());
    if (report == kReports / 2) {
      SurviveAnOutage(process, *service);
    }
  }
  RequireNoGrowth(before, Figures());
  const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  std::printf("All succeeded, in %.0f s (%.0f a second); no growth after the first %d (less than %zu KiB).\n",
              seconds, acquisitions / seconds, kWarmUp, kMaxGrowthKib);
}

/// 0 for what is no usable number.
int ParseCount(const char* text) {
  char* end = nullptr;
  const long number = std::strtol(text, &end, 10);
  return end != text && *end == '\0' && number > kWarmUp && number <= 100 * 1000 * 1000
             ? static_cast<int>(number)
             : 0;
}

}  // namespace

int main(int count, char** arguments) {
  const int acquisitions = count == 1 ? kDefaultAcquisitions : count == 2 ? ParseCount(arguments[1]) : 0;
  if (acquisitions == 0) {
    std::fprintf(stderr, "usage: quorlin_soak [ACQUISITIONS], more than %d, %d if not given\n", kWarmUp,
                 kDefaultAcquisitions);
    return 2;
  }
  try {
    Soak(acquisitions);
    return EXIT_SUCCESS;
  } catch (const std::exception& e) {
    std::fprintf(stderr, "quorlin_soak: %s\n", e.what());
    return EXIT_FAILURE;
  }
}
