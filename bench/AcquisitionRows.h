// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Whole acquisitions over HTTPS from a server with a prepared answer, beside libcurl alone carrying the same
// bytes and the validation of the token in them.

#ifndef QUORLIN_BENCH_ACQUISITIONROWS_H
#define QUORLIN_BENCH_ACQUISITIONROWS_H

#include "bench/Measure.h"
#include "bench/Rows.h"

#include <cstddef>
#include <vector>

namespace Bench {

/// Acquisitions of so many threads at a time, by the wall clock.
struct CallersResult {
  std::size_t callers;
  Figure perSecond;
  Figure plainPerSecond;
  double ratio;  ///< Of plainPerSecond to perSecond: how many times as long ours takes.
};

/// Starts servers. Make it before anything starts a thread.
Section MakeAcquisitionSection();

/// By 1, 4 and 16 callers, after MakeAcquisitionSection.
std::vector<CallersResult> MeasureCallers();

}  // namespace Bench

#endif  // QUORLIN_BENCH_ACQUISITIONROWS_H
