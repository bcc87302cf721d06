// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/Timing.h"

#include <pelmar/Exception.h>

#include <algorithm>
#include <string>

namespace Quorlin {

namespace {

constexpr long long kSecondsPerDay = 86400;
constexpr long long kLongestMinimumLifeSec = 365 * kSecondsPerDay;
constexpr long long kLongestRetrySec = kSecondsPerDay;
/// Keeps sums of instants and delays far from the end of their type, whatever a service grants.
constexpr long long kLongestRefreshDelay = 365 * kSecondsPerDay * kMicrosecondsPerSecond;
constexpr int kMaxJitterPercent = 90;

void Require(bool holds, const char* rule) {
  if (!holds) {
    throw Pelmar::InvalidArgumentException(std::string("TokenProviderOptions::") + rule);
  }
}

long long CutByChance(long long delay, const TokenProviderOptions& options, double chance) {
  return delay - static_cast<long long>(static_cast<double>(delay) * options.jitterPercent / 100 * chance);
}

}  // namespace

void CheckTiming(const TokenProviderOptions& options) {
  Require(options.spec.tokenLifetimeSec > 0, "spec must ask for a positive lifetime");
  Require(options.minimumLifeSec >= 0 && options.minimumLifeSec <= kLongestMinimumLifeSec &&
              options.minimumLifeSec < options.spec.tokenLifetimeSec,
          "minimumLifeSec must be from 0 to a year, and below the lifetime that is asked for");
  Require(options.refreshPercent >= 1 && options.refreshPercent <= 100,
          "refreshPercent must be from 1 to 100");
  Require(options.jitterPercent >= 0 && options.jitterPercent <= kMaxJitterPercent,
          "jitterPercent must be from 0 to 90");
  Require(options.firstRetrySec >= 1, "firstRetrySec must be at least 1");
  Require(options.maxRetrySec >= options.firstRetrySec && options.maxRetrySec <= kLongestRetrySec,
          "maxRetrySec must be from firstRetrySec to a day");
}

long long GetFreshThrough(long long end, const TokenProviderOptions& options) {
  // At its end a token is no longer valid (SAML 2.0 Core, 2.5.1: NotOnOrAfter), however little is asked for.
  return end - std::max(options.minimumLifeSec * kMicrosecondsPerSecond, 1LL);
}

long long GetRefreshDelay(long long freshMicroseconds, const TokenProviderOptions& options, double chance) {
  const long long bounded = std::min(freshMicroseconds, kLongestRefreshDelay);
  return CutByChance(bounded * options.refreshPercent / 100, options, chance);
}

long long GetRetryDelay(unsigned failures, const TokenProviderOptions& options, double chance) {
  long long seconds = options.firstRetrySec;
  for (unsigned i = 1; i < failures && seconds < options.maxRetrySec; ++i) {
    seconds *= 2;
  }
  return CutByChance(std::min(seconds, options.maxRetrySec) * kMicrosecondsPerSecond, options, chance);
}

}  // namespace Quorlin
