// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the largest and strangest tokens cost: at most so many times their own size in memory, and twice as
// much work for twice the token. Work is counted in requests for memory, which every node, record and copy
// makes; what is searched or compared on the way is bounded by the parser's limits, each of which has its own
// test.

#include "extremes/AllocationCount.h"
#include "quorlin/Namespaces.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"
#include "support/XmlText.h"

#include <pelmar/xml/Parser.h>

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using Extremes::Cost;
using Extremes::MeasureCost;

const char* const kTampered =
    "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.";

/// Texts made of `count` pieces.
std::string Repeat(const std::string& text, std::size_t count) {
  std::string all;
  all.reserve(text.size() * count);
  for (std::size_t i = 0; i < count; ++i) {
    all += text;
  }
  return all;
}

std::string Numbered(const std::string& before, std::size_t count, const std::string& after) {
  std::string all;
  for (std::size_t i = 0; i < count; ++i) {
    all.append(before).append(std::to_string(i)).append(after);
  }
  return all;
}

std::string WithAttributes(const std::string& attributes) {
  TokenText text;
  text.attributes = attributes;
  return SignToken(text);
}

std::string WithValues(const std::string& values) {
  return WithAttributes(std::string("<saml:Attribute Name=\"") + kAttrGroupIdentity + "\">" + values +
                        "</saml:Attribute>");
}

std::string WithRestrictions(const std::string& restrictions) {
  TokenText text;
  text.restrictions = restrictions;
  return SignToken(text);
}

std::string WithDelegates(std::size_t count) {
  const std::string link = NameIdElement("proxy@example.com");
  TokenText text;
  text.delegateId = link;
  text.restrictions = DelegationRestriction(Repeat(DelegateElement("2020-01-01T00:00:00Z", link), count));
  return SignToken(text);
}

std::string WithAdvice(std::size_t count) {
  TokenText text;
  text.advice =
      "<saml:Advice>" +
      Repeat("<ext:RSAAdvice AdviceSource=\"s\">" + AttributeElement("n", {"v", "w"}) + "</ext:RSAAdvice>",
             count) +
      "</saml:Advice>";
  return SignToken(text);
}

/// An unsigned place blown up: the token is refused, or the same as before.
std::string WithInserted(const std::string& where, const std::string& what) {
  return ReplaceOnce(SignToken(TokenText()), where, what + where);
}

struct CostCase {
  const char* name;
  std::size_t count;
  std::function<std::string(std::size_t)> make;
  std::string verdict;
  double timesItsSize;  ///< The memory it may take.
};

std::string Parse(const std::string& message) {
  return "Quorlin::ParseException: " + message;
}

std::vector<CostCase> MakeCases() {
  const std::string groupStart = "<saml:AttributeValue>D\\";
  const std::string groupEnd = "</saml:AttributeValue>";
  const std::string unexpected = "Unknown or duplicate restriction node under Conditions: a";
  return {
      {"Groups", 50000, [=](std::size_t n) { return WithValues(Numbered(groupStart, n, groupEnd)); },
       "accepted", 16},
      {"Audiences", 50000,
       [](std::size_t n) {
         return WithRestrictions("<saml:AudienceRestriction>" +
                                 Numbered("<saml:Audience>urn:audience:", n, "</saml:Audience>") +
                                 "</saml:AudienceRestriction>");
       },
       "accepted", 16},
      {"Delegates", 20000, WithDelegates, "accepted", 16},
      {"Advice", 20000, WithAdvice, "accepted", 16},
      {"Attributes", 40000,
       [](std::size_t n) { return WithAttributes(Numbered("<saml:Attribute Name=\"n", n, "\"/>")); },
       "accepted", 24},
      {"AttributesOfElements", 1000,
       [=](std::size_t n) {
         return WithValues(Repeat(
             "<saml:AttributeValue" + Numbered(" attribute", 200, "=\"value\"") + ">D\\g" + groupEnd, n));
       },
       "accepted", 16},
      {"NamespaceDeclarations", 500,
       [=](std::size_t n) {
         return WithValues(Repeat(
             "<saml:AttributeValue" + Numbered(" xmlns:p", 200, "=\"urn:p\"") + ">D\\g" + groupEnd, n));
       },
       "accepted", 16},
      {"Text", 4 * 1024 * 1024,
       [](std::size_t n) { return WithAttributes(AttributeElement(kClaimSurname, {std::string(n, 'x')})); },
       "accepted", 8},
      {"Lines", 1024 * 1024,
       [](std::size_t n) { return WithAttributes(AttributeElement(kClaimSurname, {Repeat("x\r\n", n)})); },
       "accepted", 8},
      {"CharacterReferences", 500000,
       [](std::size_t n) {
         return WithAttributes(AttributeElement(kClaimSurname, {Repeat("&lt;&#x41;", n)}));
       },
       "accepted", 8},
      {"CDataSections", 200000,
       [](std::size_t n) {
         return WithAttributes(AttributeElement(kClaimSurname, {Repeat("<![CDATA[x]]>", n)}));
       },
       "accepted", 8},
      {"Comments", 100000,
       [](std::size_t n) { return WithInserted("<saml:Subject>", Repeat("<!--c-->", n)); }, "accepted", 24},
      {"Instructions", 100000,
       [](std::size_t n) { return WithInserted("<saml:Subject>", Repeat("<?p?>", n)); },
       Parse("Expected element 'Subject' not found."), 40},
      {"EmptyElements", 100000,
       [](std::size_t n) { return WithInserted("</saml:Conditions>", Repeat("<a/>", n)); }, Parse(unexpected),
       64},
      {"SignatureValue", 3 * 1024 * 1024,
       [](std::size_t n) {
         const std::string start = "<ds:SignatureValue>";
         return ReplaceOnce(SignToken(TokenText()), start, start + std::string(n / 4 * 4, 'A'));
       },
       kTampered, 8},
      {"KeyInfo", 50000,
       [](std::size_t n) { return WithInserted("</ds:KeyInfo>", Repeat("<ds:KeyName>n</ds:KeyName>", n)); },
       "accepted", 24},
  };
}

class TokenCost : public testing::TestWithParam<CostCase> {};

INSTANTIATE_TEST_SUITE_P(Of, TokenCost, testing::ValuesIn(MakeCases()),
                         [](const auto& parameter) { return std::string(parameter.param.name); });

Cost CostOf(const std::string& text, const std::string& verdict) {
  const TrustList trusted = Trust({TokenSigner()});
  VerdictOnToken(SignToken(TokenText()));  // Whatever is made once and kept.
  std::string actual;
  actual.reserve(1024);
  const Cost cost = MeasureCost([&] { actual = VerdictOnToken(text, trusted); });
  EXPECT_EQ(actual, verdict);
  return cost;
}

TEST_P(TokenCost, IsAFewTimesItsSizeInMemory) {
  const CostCase& c = GetParam();
  const std::string text = c.make(c.count);
  ASSERT_LE(text.size(), Pelmar::Xml::kMaxDocumentBytes);
  const Cost cost = CostOf(text, c.verdict);
  const double times = static_cast<double>(cost.peakBytes) / static_cast<double>(text.size());
  RecordProperty("timesItsSize", std::to_string(times));
  EXPECT_LE(times, c.timesItsSize);
}

TEST_P(TokenCost, GrowsNoFasterThanTheToken) {
  const CostCase& c = GetParam();
  const Cost half = CostOf(c.make(c.count / 2), c.verdict);
  const Cost whole = CostOf(c.make(c.count), c.verdict);
  // What every token costs is in both.
  EXPECT_LE(whole.allocations, half.allocations * 2 + half.allocations / 20);
  EXPECT_LE(whole.peakBytes, half.peakBytes * 2 + half.peakBytes / 5);
}

TEST_P(TokenCost, IsAllGivenBack) {
  const CostCase& c = GetParam();
  const std::string text = c.make(c.count);
  constexpr std::size_t kSlack = 64 * 1024;  // Tables of the run-time libraries that grow and stay.
  EXPECT_LE(CostOf(text, c.verdict).keptBytes, kSlack);
}

// The element one too deep ends it: no node is made of what follows.
TEST(TokenCostOfNesting, DoesNotGrowBeyondTheLimit) {
  const auto measure = [](std::size_t depth) {
    const std::string bad = ReplaceOnce(SignToken(TokenText()), "alice@", Repeat("<a>", depth) + "alice@");
    const TrustList trusted = Trust({TokenSigner()});
    return MeasureCost([&] { VerdictOnToken(bad, trusted); });
  };
  measure(1000);
  const Cost small = measure(1000);
  const std::size_t deep = 2000000;
  const Cost large = measure(deep);
  // The text is still taken over whole, into buffers that double.
  EXPECT_LE(large.allocations, small.allocations + 20);
  EXPECT_LE(large.peakBytes, small.peakBytes + 6 * 3 * deep);
}

TEST(TokenCostOfAMessage, IsAFewTimesItsSizeInMemory) {
  const std::string token = WithValues(Numbered("<saml:AttributeValue>D\\", 50000, "</saml:AttributeValue>"));
  const std::string text = "<e:Envelope xmlns:e=\"urn:e\"><e:Body>" + token + "</e:Body></e:Envelope>";
  std::string verdict;
  const Cost cost = MeasureCost([&] { verdict = VerdictOnEmbedded(text, kTokenId); });
  EXPECT_EQ(verdict, "accepted");
  EXPECT_LE(cost.peakBytes, 16 * text.size());
}

}  // namespace
}  // namespace Quorlin
