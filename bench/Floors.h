// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The work under every operation that nobody could do without: one public-key operation, hashing, tokenising.

#ifndef QUORLIN_BENCH_FLOORS_H
#define QUORLIN_BENCH_FLOORS_H

#include "bench/Measure.h"

#include "support/Pki.h"

#include <string>
#include <vector>

namespace Bench {

/// One verification of an RSA PKCS #1 v1.5 signature over a SHA-256 digest, everything about the key being
/// prepared.
Action VerifyWithRsa(const TestSupport::KeyPair& key);

/// One signature of that kind.
Action SignWithRsa(const TestSupport::KeyPair& key);

/// SHA-256 of `text`.
Action HashText(const std::string& text);

/// A new expat parser, one pass over `text` with handlers that do nothing, and the end of the parser.
Action TokeniseText(const std::string& text);

/// All of `actions`, one after the other.
Action DoAll(const std::vector<Action>& actions);

}  // namespace Bench

#endif  // QUORLIN_BENCH_FLOORS_H
