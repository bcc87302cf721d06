// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/LoadRows.h"

#include "bench/load/ProcessFigures.h"

#include <quorlin/SecurityTokenService.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace Bench {

namespace {

using Clock = std::chrono::steady_clock;

constexpr const char* kUser = "alice@example.com";
constexpr const char* kPassword = "secret";
constexpr unsigned kDelayMs = 200;
constexpr int kAtOnce = 1000;
constexpr int kRuns = 3;
constexpr double kAimSeconds = 2;
constexpr int kPerCaller = 200;

double SecondsSince(Clock::time_point start) {
  return std::chrono::duration<double>(Clock::now() - start).count();
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return spec;
}

/// Waits for completions.
class Counter final {
 public:
  void Add(const Pelmar::Exception* error) {
    const std::lock_guard<std::mutex> lock(_mutex);
    ++_count;
    if (error != nullptr && _failure.empty()) {
      _failure = error->what();
    }
    _added.notify_all();
  }

  /// Throws std::runtime_error when one failed.
  void Await(int count) {
    std::unique_lock<std::mutex> lock(_mutex);
    _added.wait(lock, [&] { return _count == count; });
    if (!_failure.empty()) {
      throw std::runtime_error("an acquisition failed: " + _failure);
    }
  }

 private:
  std::mutex _mutex;
  std::condition_variable _added;
  int _count = 0;
  std::string _failure;
};

void PrintAsynchronous(const Quorlin::SecurityTokenService& service) {
  ForgetPeak();
  const std::size_t before = GetResidentKib();
  Counter counter;
  const double processorBefore = GetProcessorSeconds();
  const auto start = Clock::now();
  for (int i = 0; i < kAtOnce; ++i) {
    service.AcquireTokenAsync(kUser, kPassword, MakeSpec(),
                              [&counter](const boost::shared_ptr<const Quorlin::SamlToken>&,
                                         const Pelmar::Exception* error) { counter.Add(error); });
  }
  counter.Await(kAtOnce);
  const double seconds = SecondsSince(start);
  const std::size_t peak = GetPeakResidentKib();
  std::printf("  %-37s %9.2f %11.2f %9zu %9zu %8s %s\n", "1000 asynchronous calls", seconds,
              GetProcessorSeconds() - processorBefore, (peak > before ? peak - before : 0) / 1024,
              CountThreads(), "< 2 s", seconds < kAimSeconds ? "yes" : "NO");
}

void PrintCallers(const Quorlin::SecurityTokenService& service, int callers) {
  std::atomic<bool> failed{false};
  std::vector<std::thread> threads;
  const auto start = Clock::now();
  for (int i = 0; i < callers; ++i) {
    threads.emplace_back([&] {
      try {
        for (int call = 0; call < kPerCaller; ++call) {
          service.AcquireToken(kUser, kPassword, MakeSpec());
        }
      } catch (const std::exception& e) {
        std::fprintf(stderr, "an acquisition failed: %s\n", e.what());
        failed = true;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  const double seconds = SecondsSince(start);
  if (failed) {
    throw std::runtime_error("an acquisition failed");
  }
  std::printf("  %-37d %9.0f %11.1f\n", callers, callers * kPerCaller / seconds, seconds * 1000 / kPerCaller);
}

}  // namespace

void PrintLoad(ServiceProcess& process) {
  process.Start(kDelayMs);
  std::printf(
      "\nAcquisitions over HTTPS, of a service that answers after %u ms\n  %-37s %9s %11s %9s %9s %8s %s\n",
      kDelayMs, "", "seconds", "processor", "MiB more", "threads", "aim", "reached");
  for (int run = 0; run < kRuns; ++run) {
    PrintAsynchronous(*Quorlin::CreateSecurityTokenService(process.MakeClientConfig()));
  }
  process.Start(0);
  const auto service = Quorlin::CreateSecurityTokenService(process.MakeClientConfig());
  std::printf("\nAcquisitions over HTTPS, of a service that answers at once\n  %-37s %9s %11s\n", "callers",
              "a second", "ms each");
  for (const int callers : {1, 2, 4, 16}) {
    PrintCallers(*service, callers);
  }
  process.Kill();
}

}  // namespace Bench
