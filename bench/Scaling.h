// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Whether two threads validate twice as many tokens as one.

#ifndef QUORLIN_BENCH_SCALING_H
#define QUORLIN_BENCH_SCALING_H

#include "bench/Measure.h"

#include <cstddef>
#include <string>
#include <vector>

namespace Bench {

/// By the wall clock, so other work on the machine counts.
struct ScalingResult {
  std::string name;
  Figure one;          ///< Microseconds for one validation, one thread working.
  Figure two;          ///< The same in each of two threads that work at once.
  Figure ratio;        ///< How many times as much two threads get done.
  double floorsRatio;  ///< The same of the floor: what the machine allows.
};

/// Of the small, the medium and the large token.
std::vector<ScalingResult> MeasureScaling(std::size_t rounds);

}  // namespace Bench

#endif  // QUORLIN_BENCH_SCALING_H
