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
constexpr std::size_t kHugeTokenGroups = 50000;

/// A bearer token as a token service makes it: names, group memberships, restrictions.
TestSupport::TokenText ComposeBearerToken(std::size_t groups);

/// The same bound to this certificate.
TestSupport::TokenText ComposeHolderOfKeyToken(std::size_t groups, const TestSupport::Identity& holder);

/// A signed token, the certificate that it is checked against, and how many groups must be found in it.
struct SampleToken {
  std::string name;
  std::string text;
  TestSupport::TrustList trusted;
  std::size_t groups;
};

/// Signed bearer tokens. The signature of the first four shows the signer's certificate, which is the trusted
/// one; that of the last one shows the certificates of the signer and of its issuer, of which only the latter
/// is trusted.
struct SampleTokens {
  SampleToken small;
  SampleToken medium;
  SampleToken large;
  SampleToken huge;
  SampleToken issued;
};

/// Made once.
const SampleTokens& GetSampleTokens();

}  // namespace Bench

#endif  // QUORLIN_BENCH_TOKENS_H
