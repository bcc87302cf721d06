// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Runs an action once for each request for memory that it makes, and fails that one.

#ifndef QUORLIN_TESTS_TORTURE_ALLOCATIONSWEEP_H
#define QUORLIN_TESTS_TORTURE_ALLOCATIONSWEEP_H

#include "torture/HostFaults.h"

#include <cstddef>
#include <functional>
#include <map>
#include <string>

namespace Torture {

/// What came of it, and of how many runs: "std::bad_alloc", or class and message of an exception of ours, or
/// what the action returned.
using Outcomes = std::map<std::string, std::size_t>;

struct Sweep {
  Outcomes outcomes;
  std::size_t allocations = 0;  ///< How many requests for memory the longest run made.
  std::size_t lostBelow = 0;    ///< After how many of them a library below ours lost memory of its own.
};

/// Gets the number of the run: what a failed run is given, the undisturbed one after it is given too.
using Action = std::function<std::string(std::size_t)>;

/// For N = 1, 1 + `step`, ... until a run asks for memory fewer than N times: runs `action` while the N-th
/// request fails, and once more while none does. The latter has to come to `expected`, and nothing may be
/// lost: what is held afterwards that was not held before must not grow when the same is done over and over.
///
/// What a library below ours (libcurl, say) loses of its own when a request of its own fails cannot be mended
/// here; it is counted.
///
/// With QUORLIN_TORTURE_REQUEST=N in the environment, it is that N alone, and standard error tells who made
/// the request and who asked for what was lost.
Sweep FailEachAllocation(Extent extent, const std::string& expected, const Action& action,
                         std::size_t step = 1);

}  // namespace Torture

#endif  // QUORLIN_TESTS_TORTURE_ALLOCATIONSWEEP_H
