// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/descriptions.h"

#include <pelmar/MessageFormatter.h>

#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <vector>

#include "support/CountingSamlToken.h"

namespace Quorlin {
namespace {

using Pelmar::System::DateTime;

TEST(Descriptions, PrincipalHasABlankAfterNameOnly) {
  EXPECT_EQ("{Name: a; Domain:b}", PrincipalId("a", "b").ToString());
}

TEST(Descriptions, FormatterPrintsAPrincipal) {
  const PrincipalId principal("a", "b");
  EXPECT_EQ("{Name: a; Domain:b}", Pelmar::ToStringFormatter<PrincipalId>(&principal).Print());
}

TEST(Descriptions, FormatterPrintsNullForAMissingPrincipal) {
  EXPECT_EQ("(null)", Pelmar::ToStringFormatter<PrincipalId>(nullptr).Print());
}

TEST(Descriptions, DelegateIsPrincipalAndInstant) {
  const Delegate delegate(PrincipalId("a", "b"), DateTime("2012-03-05T07:04:09.045Z"));
  EXPECT_EQ("{Name: a; Domain:b} at 2012-03-05T07:04:09.045Z", WriteDelegate(&delegate));
}

struct JoinCase {
  std::vector<std::string> items;
  std::string text;
};

std::string WriteItem(const std::string* item) {
  return *item;
}

TEST(Descriptions, ListSeparatorDependsOnWhatIsWrittenSoFar) {
  const std::vector<JoinCase> cases = {
      {{}, ""},   {{"a"}, "a"},         {{"a", "b", "c"}, "a, b, c"},
      {{""}, ""}, {{"", "", "a"}, "a"}, {{"", "a", "", "b", ""}, "a, , b, "},
  };
  for (const JoinCase& c : cases) {
    EXPECT_EQ(c.text, AsString<std::string>(c.items, &WriteItem));
  }
}

struct AttributeCase {
  AdviceAttribute attribute;
  std::string text;
};

TEST(Descriptions, AdviceAttributeNameGoesByTheLabelSource) {
  const std::vector<AttributeCase> cases = {
      {{"n", {"1", "2"}}, "[source=n, attributes=[1, 2]]"},
      {{"n", {}}, "[source=n, attributes=[]]"},
      {{"", {""}}, "[source=, attributes=[]]"},
      // A plain join: here empty values count.
      {{"n", {"", "", "a"}}, "[source=n, attributes=[, , a]]"},
      {{"%2", {"%1"}}, "[source=%2, attributes=[%1]]"},
  };
  for (const AttributeCase& c : cases) {
    EXPECT_EQ(c.text, WriteAdviceAttribute(&c.attribute));
  }
}

TEST(Descriptions, AdviceListsItsAttributes) {
  const Advice advice = {"s", {{"n", {"1", "2"}}, {"m", {}}}};
  EXPECT_EQ("Advice [source=s, attributes=[[source=n, attributes=[1, 2]], [source=m, attributes=[]]]]",
            WriteAdvice(&advice));
}

TEST(Descriptions, AdviceWithoutAttributesHasEmptyBrackets) {
  const Advice advice = {"s", {}};
  EXPECT_EQ("Advice [source=s, attributes=[]]", WriteAdvice(&advice));
}

TEST(Descriptions, TokenSpecLeavesItsFirstBracketOpen) {
  EXPECT_EQ(
      "TokenSpec [tokenLifetimeSec=0, delegable=false, delegateTo=<unset>, renewable=false, "
      "confirmationType=0,audienceRestriction=, advice=[]",
      WriteTokenSpec(TokenSpec()));
}

TEST(Descriptions, TokenSpecTellsEverythingAskedFor) {
  TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  spec.audienceRestriction = {"y", "x"};
  spec.advice = {{"s", {{"n", {"v"}}}}, {"t", {}}};
  spec.delegable = true;
  spec.delegateTo = std::string("bob@example.com");
  spec.renewable = true;
  spec.confirmation = TokenSpec::CONFIRMATION_BEARER;
  EXPECT_EQ(
      "TokenSpec [tokenLifetimeSec=3600, delegable=true, delegateTo=bob@example.com, renewable=true, "
      "confirmationType=1,audienceRestriction=x, y, advice=[Advice [source=s, attributes=[[source=n, "
      "attributes=[v]]]], Advice [source=t, attributes=[]]]",
      WriteTokenSpec(spec));
}

TEST(Descriptions, TokenSpecPrintsLongLifetimesInFull) {
  TokenSpec spec;
  spec.tokenLifetimeSec = std::numeric_limits<long long>::min();
  EXPECT_EQ(
      "TokenSpec [tokenLifetimeSec=-9223372036854775808, delegable=false, delegateTo=<unset>, "
      "renewable=false, "
      "confirmationType=0,audienceRestriction=, advice=[]",
      WriteTokenSpec(spec));
}

TEST(Descriptions, TokenSpecPrintsAnEmptyDelegateAsEmpty) {
  TokenSpec spec;
  spec.delegateTo = std::string();
  EXPECT_EQ(
      "TokenSpec [tokenLifetimeSec=0, delegable=false, delegateTo=, renewable=false, "
      "confirmationType=0,audienceRestriction=, advice=[]",
      WriteTokenSpec(spec));
}

TEST(Descriptions, TokenWithoutGroupsAndDelegationHasEmptyBrackets) {
  EXPECT_EQ(
      "SamlToken [subject={Name: alice; Domain:example.com}, groups=[], delegationChain=[], "
      "startTime=2020-01-01T00:00:00Z, expirationTime=2030-01-01T00:00:00Z, renewable=false, delegable=true, "
      "isSolution=false,confirmationType=0]",
      CreateRedactedDescription(TestSupport::CountingSamlToken()));
}

TEST(Descriptions, TokenListsGroupsAndDelegatesInOrder) {
  TestSupport::CountingSamlToken token;
  token.groups = {PrincipalId("users", "EXAMPLE"), PrincipalId("admins", "EXAMPLE")};
  token.delegationChain = {Delegate(PrincipalId("d1", "x"), DateTime("2020-01-01T00:00:01Z")),
                           Delegate(PrincipalId("d2", "y"), DateTime("2020-01-01T00:00:02.5Z"))};
  token.renewable = true;
  token.delegable = false;
  token.solution = true;
  token.confirmationMethod = SamlToken::CONFIRM_HOLDER_OF_KEY;
  EXPECT_EQ(
      "SamlToken [subject={Name: alice; Domain:example.com}, groups=[{Name: users; Domain:EXAMPLE}, "
      "{Name: admins; Domain:EXAMPLE}], delegationChain=[{Name: d1; Domain:x} at 2020-01-01T00:00:01Z, "
      "{Name: d2; Domain:y} at 2020-01-01T00:00:02.5Z], startTime=2020-01-01T00:00:00Z, "
      "expirationTime=2030-01-01T00:00:00Z, renewable=true, delegable=false, "
      "isSolution=true,confirmationType=1]",
      CreateRedactedDescription(token));
}

TEST(Descriptions, PlaceholdersInNamesStayAsTheyAre) {
  TestSupport::CountingSamlToken token;
  token.subject = PrincipalId("%9", "%1");
  EXPECT_EQ(
      "SamlToken [subject={Name: %9; Domain:%1}, groups=[], delegationChain=[], "
      "startTime=2020-01-01T00:00:00Z, expirationTime=2030-01-01T00:00:00Z, renewable=false, delegable=true, "
      "isSolution=false,confirmationType=0]",
      CreateRedactedDescription(token));
}

}  // namespace
}  // namespace Quorlin
