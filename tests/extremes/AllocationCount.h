// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Counts what the whole process takes from the heap: our libraries', the tokeniser's and the crypto library's
// memory alike.

#ifndef QUORLIN_TESTS_EXTREMES_ALLOCATIONCOUNT_H
#define QUORLIN_TESTS_EXTREMES_ALLOCATIONCOUNT_H

#include <cstddef>

namespace Extremes {

struct Cost {
  std::size_t peakBytes;    ///< The most that was held at once beyond what was held before.
  std::size_t allocations;  ///< How often memory was asked for.
  std::size_t keptBytes;    ///< What is still held afterwards.
};

void StartCounting();
Cost StopCounting();

/// What `action` takes. It must not run while another thread allocates.
template <typename Action>
Cost MeasureCost(Action action) {
  StartCounting();
  action();
  return StopCounting();
}

}  // namespace Extremes

#endif  // QUORLIN_TESTS_EXTREMES_ALLOCATIONCOUNT_H
