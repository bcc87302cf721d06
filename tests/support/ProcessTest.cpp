// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/Process.h"

#include <gtest/gtest.h>

#include <string>
#include <system_error>

namespace {

using namespace TestSupport;

TEST(Process, GivesInputAndTakesBothOutputsAndTheExitCode) {
  const ProcessResult result = RunProcess({"sh", "-c", "cat; echo problem >&2; exit 3"}, "input");
  EXPECT_EQ(result.exitCode, 3);
  EXPECT_EQ(result.standardOutput, "input");
  EXPECT_EQ(result.standardError, "problem\n");
}

TEST(Process, CarriesMoreThanAnyBufferHolds) {
  const std::string much(3000000, 'm');
  EXPECT_EQ(RunProcess({"cat"}, much).standardOutput, much);
}

TEST(Process, GoesOnWhenTheProgramDoesNotReadItsInput) {
  const ProcessResult result = RunProcess({"true"}, std::string(3000000, 'm'));
  EXPECT_EQ(result.exitCode, 0);
}

TEST(Process, PassesArgumentsWithoutAShell) {
  EXPECT_EQ(RunProcess({"printf", "%s|", "a b", "$HOME", "*", ""}).standardOutput, "a b|$HOME|*||");
}

TEST(Process, TellsTheSignalThatEndedTheProgram) {
  EXPECT_EQ(RunProcess({"sh", "-c", "kill -9 $$"}).exitCode, 128 + 9);
}

TEST(Process, FailsWhenThereIsNoSuchProgram) {
  EXPECT_THROW(RunProcess({"there-is-no-such-program"}), std::system_error);
}

}  // namespace
