// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/TokenFactory.h"

#include "support/Verdict.h"

#include <quorlin/Exceptions.h>

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

namespace TestSupport {
namespace {

TEST(TokenFactory, ReplacesWhatStandsInTheTextOnce) {
  EXPECT_EQ(ReplaceOnce("abc", "b", "xy"), "axyc");
  EXPECT_THROW(ReplaceOnce("abc", "d", ""), std::runtime_error);
  EXPECT_THROW(ReplaceOnce("abab", "ab", ""), std::runtime_error);
  EXPECT_THROW(ReplaceOnce("aaa", "aa", ""), std::runtime_error);
}

TEST(TokenFactory, CountsLinesAndColumnsFromOne) {
  EXPECT_EQ(PlaceOf("abc", "a"), " at line 1, column 1");
  EXPECT_EQ(PlaceOf("abc", "c"), " at line 1, column 3");
  EXPECT_EQ(PlaceOf("a\n\n bc", "b"), " at line 3, column 2");
  EXPECT_THROW(PlaceOf("abc", "d"), std::runtime_error);
}

TEST(TokenFactory, SignsWhereTheMarkerStandsOnly) {
  const TokenText text;
  const std::string composed = text.Compose();
  const std::size_t at = composed.find(kSignatureMarker);
  const std::string signedText = SignToken(composed);
  EXPECT_EQ(signedText.substr(0, at), composed.substr(0, at));
  const std::string rest = composed.substr(at + std::string(kSignatureMarker).size());
  EXPECT_EQ(signedText.substr(signedText.size() - rest.size()), rest);
  EXPECT_THROW(SignToken(rest), std::runtime_error);
}

TEST(TokenFactory, MakesGoodTokens) {
  EXPECT_EQ(VerdictOnToken(TokenText()), "accepted");
}

TEST(Verdict, TellsTheExactClassAndTheWholeMessage) {
  EXPECT_EQ(VerdictOf([] {}), "accepted");
  EXPECT_EQ(VerdictOf([] { throw Quorlin::ParseException("why"); }), "Quorlin::ParseException: why");
  EXPECT_EQ(VerdictOf([] { throw Pelmar::InvalidArgumentException("why"); }),
            "Pelmar::InvalidArgumentException: Invalid argument : why");
  EXPECT_EQ(VerdictOf([] { throw new Quorlin::ParseException("why"); }),
            "pointer to Quorlin::ParseException: why");
  EXPECT_THROW(VerdictOf([] { throw std::runtime_error("other"); }), std::runtime_error);
}

}  // namespace
}  // namespace TestSupport
