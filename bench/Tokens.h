// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The tokens that are measured.

#ifndef QUORLIN_BENCH_TOKENS_H
#define QUORLIN_BENCH_TOKENS_H

#include "support/TokenFactory.h"

#include <cstddef>
#include <string>

namespace Bench {

constexpr std::size_t kSmallTokenGroups = 5;
constexpr std::size_t kMediumTokenGroups = 200;
constexpr std::size_t kLargeTokenGroups = 5000;

/// A bearer token as a token service makes it: names, group memberships, restrictions.
TestSupport::TokenText ComposeBearerToken(std::size_t groups);

/// The same bound to this certificate.
TestSupport::TokenText ComposeHolderOfKeyToken(std::size_t groups, const TestSupport::Identity& holder);

}  // namespace Bench

#endif  // QUORLIN_BENCH_TOKENS_H
