// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "torture/AllocationSweep.h"

#include "support/Verdict.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdlib>
#include <new>

namespace Torture {

namespace {

/// After so many runs the caches are full, and the tables that grow and stay have grown.
constexpr std::size_t kWarmUps = 70;

/// What still grows when it is done so often once more is a leak. What only seemed to grow, as the HTTP loop
/// was still at work, or is kept for later (OpenSSL keeps the texts of 16 errors per thread), does not.
constexpr int kRepetitions = 20;

/// The text of an outcome in memory of its own, so that it is not counted.
using Text = std::array<char, 512>;

Text Keep(const std::string& text) {
  Text kept = {};
  text.copy(kept.data(), kept.size() - 1);
  return kept;
}

struct Run {
  Text outcome;
  bool hasFailed;  ///< A request was failed.
};

Run RunAndFail(std::size_t number, Extent extent, std::size_t round, const Action& action) {
  FailAllocation(number, extent);
  try {
    const std::string result = action(round);
    const bool hasFailed = StopFailingAllocations();
    return {Keep(result), hasFailed};
  } catch (const std::bad_alloc&) {
    return {Keep("std::bad_alloc"), StopFailingAllocations()};
  } catch (const Pelmar::Exception& error) {
    const bool hasFailed = StopFailingAllocations();
    return {Keep(TestSupport::Describe(error)), hasFailed};
  } catch (...) {
    StopFailingAllocations();
    throw;
  }
}

constexpr std::size_t kNone = 0;

/// One failed run, and one after it that has to succeed.
Run FailAndGoOn(std::size_t number, Extent extent, std::size_t round, const std::string& expected,
                const Action& action) {
  const Run failed = RunAndFail(number, extent, round, action);
  const Run next = RunAndFail(kNone, extent, round, action);
  const ServerScope notCounted;
  EXPECT_EQ(expected, next.outcome.data())
      << "after request " << number << " failed, with " << failed.outcome.data();
  return failed;
}

/// Whether what is lost each time was asked for below our code, for a request that failed there too.
bool IsLostBelow(std::size_t number, Extent extent, std::size_t round, const std::string& expected,
                 const Action& action) {
  const std::size_t own = CountOwnBlocks();
  FailAndGoOn(number, extent, round, expected, action);
  AwaitHeldBlocks(0);
  return WasFailedBelow() && CountOwnBlocks() <= own;
}

/// Of the developer who looks for a fault; 0: none.
std::size_t ReadNumberToExplain() {
  const char* const text = std::getenv("QUORLIN_TORTURE_REQUEST");
  return text == nullptr ? 0 : std::strtoul(text, nullptr, 10);
}

void Explain(std::size_t number, Extent extent, std::size_t round, const std::string& expected,
             const Action& action) {
  NoteCallers();
  const std::size_t before = CountAskedFor();
  FailAndGoOn(number, extent, round, expected, action);
  AwaitHeldBlocks(0);
  WriteCallersSince(before);
}

}  // namespace

Sweep FailEachAllocation(Extent extent, const std::string& expected, const Action& action, std::size_t step) {
  std::size_t round = 0;
  while (round < kWarmUps) {
    FailAndGoOn(kNone, extent, round++, expected, action);
  }
  if (const std::size_t number = ReadNumberToExplain()) {
    Explain(number, extent, round, expected, action);
    return Sweep();
  }
  Sweep sweep;
  std::size_t held = CountHeldBlocks();
  for (std::size_t number = 1; !testing::Test::HasFailure(); number += step) {
    Run failed = FailAndGoOn(number, extent, round++, expected, action);
    std::size_t heldNow = AwaitHeldBlocks(held);
    for (int i = 0; heldNow > held && i < kRepetitions; ++i) {
      held = heldNow;
      FailAndGoOn(number, extent, round++, expected, action);
      heldNow = AwaitHeldBlocks(held);
    }
    if (heldNow > held && IsLostBelow(number, extent, round++, expected, action)) {
      ++sweep.lostBelow;
      heldNow = held = AwaitHeldBlocks(heldNow);
    }
    const ServerScope notCounted;
    EXPECT_LE(heldNow, held) << "each time request " << number << " failed, with " << failed.outcome.data();
    // Threads of the pool come and go, each with a few blocks, so less is no new measure.
    held = std::max(held, heldNow);
    ++sweep.outcomes[failed.outcome.data()];
    if (!failed.hasFailed) {
      break;
    }
    sweep.allocations = number;
  }
  return sweep;
}

}  // namespace Torture
