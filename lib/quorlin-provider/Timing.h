// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// When the next token is got: plain sums, with chance as an argument.

#ifndef QUORLIN_PROVIDER_TIMING_H
#define QUORLIN_PROVIDER_TIMING_H

#include <quorlin/TokenProviderOptions.h>

namespace Quorlin {

constexpr long long kMicrosecondsPerSecond = 1000000;

/// Throws Pelmar::InvalidArgumentException for an option out of its range.
void CheckTiming(const TokenProviderOptions& options);

/// The last instant at which a token that is valid until just before `end` is fresh.
long long GetFreshThrough(long long end, const TokenProviderOptions& options);

/// How long to wait before a token that is fresh for `freshMicroseconds` more is replaced. `chance` is from 0
/// to 1. At most a year.
long long GetRefreshDelay(long long freshMicroseconds, const TokenProviderOptions& options, double chance);

/// How long to wait after the `failures`-th failure in a row, the first being 1.
long long GetRetryDelay(unsigned failures, const TokenProviderOptions& options, double chance);

}  // namespace Quorlin

#endif  // QUORLIN_PROVIDER_TIMING_H
