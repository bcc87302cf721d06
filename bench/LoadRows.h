// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Whole acquisitions over HTTPS, many at a time.

#ifndef QUORLIN_BENCH_LOADROWS_H
#define QUORLIN_BENCH_LOADROWS_H

#include "bench/load/ServiceProcess.h"

namespace Bench {

/// Measures and prints: a thousand asynchronous acquisitions of a service that takes its time, and how many
/// several callers manage in a second.
void PrintLoad(ServiceProcess& service);

}  // namespace Bench

#endif  // QUORLIN_BENCH_LOADROWS_H
