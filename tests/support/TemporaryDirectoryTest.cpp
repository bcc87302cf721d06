// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <stdexcept>
#include <string>

namespace {

using namespace TestSupport;

TEST(TemporaryDirectory, KeepsFilesWhileItLives) {
  std::string path;
  {
    const TemporaryDirectory directory;
    path = directory.GetPath();
    const std::string content("a\0b\n", 4);
    EXPECT_EQ(directory.WriteFile("file", content), path + "/file");
    EXPECT_EQ(directory.ReadFile("file"), content);
    EXPECT_THROW(directory.ReadFile("other"), std::runtime_error);
    std::filesystem::create_directory(directory.GetPath("below"));
  }
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST(TemporaryDirectory, IsForThisUserAlone) {
  const TemporaryDirectory directory;
  EXPECT_EQ(std::filesystem::status(directory.GetPath()).permissions(), std::filesystem::perms::owner_all);
}

TEST(TemporaryDirectory, IsAnotherOneEachTime) {
  const TemporaryDirectory one;
  const TemporaryDirectory two;
  EXPECT_NE(one.GetPath(), two.GetPath());
}

}  // namespace
