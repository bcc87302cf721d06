// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What this process uses (proc(5)).

#ifndef QUORLIN_BENCH_LOAD_PROCESSFIGURES_H
#define QUORLIN_BENCH_LOAD_PROCESSFIGURES_H

#include <cstddef>

namespace Bench {

/// Memory in use now, in KiB.
std::size_t GetResidentKib();
/// The most memory in use since the start or the last ForgetPeak, in KiB.
std::size_t GetPeakResidentKib();
void ForgetPeak();
/// The processor time of all threads so far, in seconds.
double GetProcessorSeconds();
std::size_t CountDescriptors();
std::size_t CountThreads();

}  // namespace Bench

#endif  // QUORLIN_BENCH_LOAD_PROCESSFIGURES_H
