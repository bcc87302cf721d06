// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/logging.h"

#include <pelmar/service/Logger.h>

#include <gtest/gtest.h>

#include <future>
#include <vector>

namespace Quorlin {
namespace {

namespace Service = Pelmar::Service;

TEST(Logging, GivesThePlatformLoggerOfTheLibrary) {
  Pelmar::Ref<Service::Logger> logger;
  Service::GetApp()->GetLogManager()->GetLogger("Quorlin", 127, logger);
  EXPECT_EQ(getLogger(), logger.Get());
  EXPECT_EQ(getLogger()->GetName(), "Quorlin");
}

TEST(Logging, AlwaysGivesTheSameLogger) {
  Service::Logger* const logger = getLogger();
  std::vector<std::future<Service::Logger*>> others;
  for (int i = 0; i < 8; ++i) {
    others.push_back(std::async(std::launch::async, &getLogger));
  }
  for (std::future<Service::Logger*>& other : others) {
    EXPECT_EQ(other.get(), logger);
  }
}

// Whoever asks for a logger first decides which levels it may ever write: here that is the library.
TEST(Logging, MayWriteEveryLevel) {
  const Service::Logger* const logger = getLogger();
  Service::LogManager* const manager = Service::GetApp()->GetLogManager();
  const int before = manager->GetEnabledLevels();
  manager->SetEnabledLevels(127);
  for (int level = 1; level <= 64; level *= 2) {
    EXPECT_TRUE(logger->IsEnabled(level)) << level;
  }
  manager->SetEnabledLevels(before);
}

TEST(Logging, UsesTheLevelsOfOrdinaryLinesAndWarnings) {
  EXPECT_EQ(kLogLevelInfo, 64);
  EXPECT_EQ(kLogLevelWarning, 8);
}

}  // namespace
}  // namespace Quorlin
