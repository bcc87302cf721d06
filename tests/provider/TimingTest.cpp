// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/Timing.h"

#include <gtest/gtest.h>

#include <limits>

namespace {

using namespace Quorlin;

TokenProviderOptions MakeOptions() {
  TokenProviderOptions options;
  options.spec.tokenLifetimeSec = 600;
  options.jitterPercent = 50;
  return options;
}

TEST(Timing, IsFreshUntilTheLeastLifeIsLeft) {
  EXPECT_EQ(GetFreshThrough(1000000000, MakeOptions()), 940000000);
}

TEST(Timing, IsNeverFreshAtTheEnd) {
  TokenProviderOptions options = MakeOptions();
  options.minimumLifeSec = 0;
  EXPECT_EQ(GetFreshThrough(1000000000, options), 999999999);
}

TEST(Timing, RefreshesAtAShareLessWhatChanceTakes) {
  EXPECT_EQ(GetRefreshDelay(1000, MakeOptions(), 0), 800);
  EXPECT_EQ(GetRefreshDelay(1000, MakeOptions(), 0.5), 600);
  EXPECT_EQ(GetRefreshDelay(1000, MakeOptions(), 1), 400);
}

TEST(Timing, RefreshesAfterAYearAtTheLatest) {
  TokenProviderOptions options = MakeOptions();
  options.refreshPercent = 100;
  EXPECT_EQ(GetRefreshDelay(std::numeric_limits<long long>::max(), options, 0), 31536000LL * 1000000);
}

TEST(Timing, RetriesLessWhatChanceTakes) {
  EXPECT_EQ(GetRetryDelay(3, MakeOptions(), 0), 4000000);
  EXPECT_EQ(GetRetryDelay(3, MakeOptions(), 1), 2000000);
}

TEST(Timing, RetriesAtTheCapHoweverOftenItFailed) {
  EXPECT_EQ(GetRetryDelay(7, MakeOptions(), 0), 60000000);
  EXPECT_EQ(GetRetryDelay(std::numeric_limits<unsigned>::max(), MakeOptions(), 0), 60000000);
}

}  // namespace
