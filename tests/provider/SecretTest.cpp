// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-provider/Secret.h"

#include <gtest/gtest.h>

#include <array>
#include <cstring>
#include <new>
#include <string>

namespace {

using Quorlin::Secret;

TEST(Secret, WipeSetsEachByteToZero) {
  std::string text = "pass-word";
  Quorlin::Wipe(&text[0], text.size());
  EXPECT_EQ(text, std::string(9, '\0'));
}

TEST(Secret, KeepsTheTextWhileItLives) {
  const Secret secret(std::string("pass-word"));
  EXPECT_EQ(secret.Get(), "pass-word");
}

TEST(Secret, LeavesNothingInAShortTextThatItWasMadeFrom) {
  std::string text = "pass-word";  // Short enough to stand in the object itself.
  const Secret secret(std::move(text));
  text.resize(9);
  EXPECT_EQ(text, std::string(9, '\0'));
}

TEST(Secret, LeavesNothingOfAShortTextInItsPlace) {
  alignas(Secret) std::array<char, sizeof(Secret)> place{};
  Secret* const secret = new (place.data()) Secret(std::string("pass-word"));
  EXPECT_NE(std::string(place.data(), place.size()).find("pass-word"), std::string::npos);
  secret->~Secret();
  EXPECT_EQ(std::string(place.data(), place.size()).find("ass-word"), std::string::npos);
}

}  // namespace
