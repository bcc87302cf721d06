// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Verify.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>

namespace Pelmar {
namespace {

using testing::Eq;
using testing::KilledBySignal;

class VerifyDeathTest : public testing::Test {
 protected:
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST(Verify, DoesNothingWhenTheConditionHolds) {
  Verify(true, "condition", "lib/pelmar/Source");
  SUCCEED();
}

TEST_F(VerifyDeathTest, AbortsNamingConditionAndSource) {
  EXPECT_EXIT(Verify(false, "rootBuilder != __null", "lib/quorlin/RequestBuilderImpl"),
              KilledBySignal(SIGABRT),
              Eq("Verify failed: rootBuilder != __null (lib/quorlin/RequestBuilderImpl)\n"));
}

TEST_F(VerifyDeathTest, VerifyFailedAborts) {
  EXPECT_EXIT(VerifyFailed("%s%n is only text", "lib/pelmar/Source"), KilledBySignal(SIGABRT),
              Eq("Verify failed: %s%n is only text (lib/pelmar/Source)\n"));
}

TEST_F(VerifyDeathTest, PanicNotReachedAbortsNamingTheSource) {
  EXPECT_EXIT(PanicNotReached("lib/quorlin/HttpsClient"), KilledBySignal(SIGABRT),
              Eq("Verify failed: not reached (lib/quorlin/HttpsClient)\n"));
}

}  // namespace
}  // namespace Pelmar
