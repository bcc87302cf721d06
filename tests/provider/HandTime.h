// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Time and threads of a provider, turned by hand.

#ifndef QUORLIN_TESTS_PROVIDER_HANDTIME_H
#define QUORLIN_TESTS_PROVIDER_HANDTIME_H

#include <quorlin/TokenProviderOptions.h>

#include <atomic>
#include <mutex>
#include <utility>
#include <vector>

namespace TestSupport {

constexpr long long kSecond = 1000000;

/// Stands still until it is moved.
class HandClock final : public Quorlin::TokenProviderClock {
 public:
  explicit HandClock(long long now) : _now(now) {}

  long long GetUtcTime() const override { return _now; }
  void Advance(long long microseconds) { _now += microseconds; }

 private:
  std::atomic<long long> _now;
};

/// Runs work when it is told to, on the thread that tells it. Safe to use from any thread.
class HandScheduler final : public Quorlin::TokenProviderScheduler {
 public:
  unsigned long long Schedule(long long delayMicroseconds, const Work& work) override;
  void Cancel(unsigned long long number) override;

  /// Runs all that is due at once, also what that asks for at once; how many pieces there were.
  int RunAtOnce();
  /// Runs the first of what is to wait, whatever it is to wait for; false when there is none.
  bool RunTimer();
  /// The delays of all that is to wait, in microseconds.
  std::vector<long long> GetDelays() const;
  /// How many pieces of work are there.
  std::size_t Count() const;

  /// From now on `Schedule` throws.
  void Refuse() { _refuses = true; }

 private:
  struct Item {
    unsigned long long number;
    long long delay;
    Work work;
  };

  bool Take(bool isTimer, Work& work);

  mutable std::mutex _mutex;
  std::vector<Item> _items;
  unsigned long long _lastNumber = 0;
  std::atomic<bool> _refuses{false};
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_PROVIDER_HANDTIME_H
