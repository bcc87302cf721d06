// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/RecordingLogSink.h"

#include <gtest/gtest.h>

namespace TestSupport {
namespace {

using Lines = std::vector<std::string>;

const char* const kFirst = "01234567-89ab-4def-8123-456789abcdef";
const char* const kSecond = "ffffffff-ffff-4fff-bfff-ffffffffffff";

Pelmar::Ref<Pelmar::Service::Logger> LoggerNamed(const std::string& name) {
  Pelmar::Ref<Pelmar::Service::Logger> logger;
  Pelmar::Service::GetApp()->GetLogManager()->GetLogger(name, Pelmar::Service::kAllLogLevels, logger);
  return logger;
}

TEST(MaskUuids, NumbersThemInOrderOfFirstOccurrence) {
  Lines known;
  EXPECT_EQ("a <id 1> b <id 2> c <id 1>",
            MaskUuids(std::string("a ") + kFirst + " b " + kSecond + " c " + kFirst, known));
  EXPECT_EQ("<id 2>", MaskUuids(kSecond, known));
}

TEST(MaskUuids, LeavesEverythingElse) {
  Lines known;
  // Of version 1; of another variant; in upper case.
  for (const char* text : {"", "%1", "01234567-89ab-1def-8123-456789abcdef",
                           "01234567-89ab-4def-0123-456789abcdef", "01234567-89AB-4DEF-8123-456789ABCDEF"}) {
    EXPECT_EQ(text, MaskUuids(text, known));
  }
}

TEST(LogRecording, KeepsLevelAndTextOfTheLibrarysLoggerOnly) {
  const LogRecording recording;
  LoggerNamed("Quorlin")->Write(Pelmar::Service::LOG_INFO, std::string("one ") + kFirst);
  LoggerNamed("Another")->Write(Pelmar::Service::LOG_INFO, "two");
  LoggerNamed("Quorlin")->Write(Pelmar::Service::LOG_WARNING, "three");
  EXPECT_EQ(Lines({"64 one <id 1>", "8 three"}), recording.GetLines());
  EXPECT_EQ(std::string("one ") + kFirst + "\nthree\n", recording.GetEverything());
}

TEST(LogRecording, RecordsTheGivenLevelsAndRestoresThoseBefore) {
  Pelmar::Service::LogManager* const manager = Pelmar::Service::GetApp()->GetLogManager();
  const int before = manager->GetEnabledLevels();
  {
    const LogRecording recording(Pelmar::Service::LOG_WARNING);
    LoggerNamed("Quorlin")->Write(Pelmar::Service::LOG_INFO, "one");
    LoggerNamed("Quorlin")->Write(Pelmar::Service::LOG_WARNING, "two");
    EXPECT_EQ(Lines({"8 two"}), recording.GetLines());
  }
  EXPECT_EQ(before, manager->GetEnabledLevels());
}

}  // namespace
}  // namespace TestSupport
