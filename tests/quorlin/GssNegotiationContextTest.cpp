// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/http/HttpException.h>
#include <quorlin/GssNegotiationContext.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <string>
#include <vector>

#include "quorlin/GssNegotiationContextImpl.h"
#include "quorlin/HttpsClient.h"
#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/ResponseHandlerImpl.h"
#include "support/FakeRequestBuilder.h"
#include "support/FakeService.h"
#include "support/FakeTransport.h"
#include "support/ServiceAnswers.h"

namespace Quorlin {
namespace InternalApi {
namespace {

using TestSupport::ChallengeAnswer;
using TestSupport::FinalAnswer;
using TestSupport::SignedToken;

using Lines = std::vector<std::string>;

TokenSpec Spec() {
  TokenSpec spec;
  spec.tokenLifetimeSec = 300;
  spec.audienceRestriction = {"urn:a"};
  return spec;
}

Leg ToLeg(const std::string& text) {
  return Leg(text.begin(), text.end());
}

std::string ToText(const Leg& leg) {
  return std::string(leg.begin(), leg.end());
}

// A context on a fake transport, by default with a fake request builder.
struct Negotiation {
  explicit Negotiation(const boost::shared_ptr<const RequestBuilder>& builder =
                           boost::make_shared<TestSupport::FakeRequestBuilder>())
      : context(Spec(), builder, transport.CreateSession(), boost::make_shared<ResponseHandlerImpl>(),
                TestSupport::TrustedSigner()) {}

  TestSupport::FakeTransport transport;
  GssNegotiationContextImpl context;
};

std::string FirstRequest(const std::string& leg) {
  return std::string("1|InitialSPNego|") + TestSupport::kFakeSpecText + "|" + leg;
}

TEST(GssNegotiationContext, CarriesLegsUntilTheTokenComes) {
  Negotiation negotiation;
  negotiation.transport.Answer(ChallengeAnswer("ctx-1", "a"));
  negotiation.transport.Answer(ChallengeAnswer("ctx-2", "b"));
  negotiation.transport.Answer(FinalAnswer("ctx-3", "c", SignedToken("valid")));

  const NegotiationResult first = negotiation.context.NegotiateToken(ToLeg("one"));
  EXPECT_EQ("a", ToText(*first.first));
  EXPECT_FALSE(first.second);
  const NegotiationResult second = negotiation.context.NegotiateToken(ToLeg("two"));
  EXPECT_EQ("b", ToText(*second.first));
  EXPECT_FALSE(second.second);
  const NegotiationResult third = negotiation.context.NegotiateToken(ToLeg("three"));
  EXPECT_EQ("c", ToText(*third.first));
  ASSERT_TRUE(third.second);
  EXPECT_EQ("_7f5a64e2", third.second->GetId());

  EXPECT_EQ(Lines({FirstRequest("one"), "1|ContinuedSPNego|ctx-1|two", "1|ContinuedSPNego|ctx-2|three"}),
            negotiation.transport.GetSent());
}

TEST(GssNegotiationContext, GivesAnEmptyLegWhenTheLastAnswerHasNone) {
  Negotiation negotiation;
  negotiation.transport.Answer(FinalAnswer("ctx", "", SignedToken("valid")));
  const NegotiationResult result = negotiation.context.NegotiateToken(ToLeg("one"));
  ASSERT_TRUE(result.first);
  EXPECT_EQ(Leg(), *result.first);
  EXPECT_TRUE(result.second);
}

TEST(GssNegotiationContext, GoesOnUnderTheLastContextIdAfterTheToken) {
  Negotiation negotiation;
  negotiation.transport.Answer(FinalAnswer("ctx", "", SignedToken("valid")));
  negotiation.transport.Answer(ChallengeAnswer("ctx", "a"));
  negotiation.context.NegotiateToken(ToLeg("one"));
  negotiation.context.NegotiateToken(ToLeg("two"));
  EXPECT_EQ(Lines({FirstRequest("one"), "1|ContinuedSPNego|ctx|two"}), negotiation.transport.GetSent());
}

TEST(GssNegotiationContext, StartsAgainAfterAnEmptyContextId) {
  Negotiation negotiation;
  negotiation.transport.Answer(ChallengeAnswer("", "a"));
  negotiation.transport.Answer(ChallengeAnswer("ctx", "b"));
  negotiation.context.NegotiateToken(ToLeg("one"));
  negotiation.context.NegotiateToken(ToLeg("two"));
  EXPECT_EQ(Lines({FirstRequest("one"), FirstRequest("two")}), negotiation.transport.GetSent());
}

TEST(GssNegotiationContext, MayTryTheFirstLegAgainAfterAFailure) {
  Negotiation negotiation;
  negotiation.transport.Fail(CommunicationException("down"));
  negotiation.transport.Answer("no answer at all");
  negotiation.transport.Answer(ChallengeAnswer("ctx", "a"));
  EXPECT_THROW(negotiation.context.NegotiateToken(ToLeg("one")), CommunicationException);
  EXPECT_THROW(negotiation.context.NegotiateToken(ToLeg("one")), SsoException);
  EXPECT_EQ("a", ToText(*negotiation.context.NegotiateToken(ToLeg("one")).first));
  EXPECT_EQ(Lines({FirstRequest("one"), FirstRequest("one"), FirstRequest("one")}),
            negotiation.transport.GetSent());
}

TEST(GssNegotiationContext, MayTryALaterLegAgainAfterAFailure) {
  Negotiation negotiation;
  negotiation.transport.Answer(ChallengeAnswer("ctx", "a"));
  negotiation.transport.Answer(TestSupport::FaultAnswer("wst:FailedAuthentication", "No"));
  negotiation.transport.Answer(ChallengeAnswer("ctx", "b"));
  negotiation.context.NegotiateToken(ToLeg("one"));
  EXPECT_THROW(negotiation.context.NegotiateToken(ToLeg("two")), InvalidCredentialsException);
  EXPECT_EQ("b", ToText(*negotiation.context.NegotiateToken(ToLeg("two")).first));
  EXPECT_EQ(Lines({FirstRequest("one"), "1|ContinuedSPNego|ctx|two", "1|ContinuedSPNego|ctx|two"}),
            negotiation.transport.GetSent());
}

TEST(GssNegotiationContext, PassesParseErrorsOfTheTokenUnchanged) {
  Negotiation negotiation;
  negotiation.transport.Answer(FinalAnswer("ctx", "", SignedToken("expired")));
  try {
    negotiation.context.NegotiateToken(ToLeg("one"));
    FAIL() << "an expired token was accepted";
  } catch (const ParseException& error) {
    EXPECT_STREQ("The token has expired at: 2020-01-02T00:00:00Z", error.what());
  }
}

TEST(GssNegotiationContext, RefusesATokenWithABrokenSignatureAndKeepsTheContextId) {
  Negotiation negotiation;
  negotiation.transport.Answer(FinalAnswer("ctx", "", SignedToken("tampered")));
  negotiation.transport.Answer(ChallengeAnswer("ctx", "a"));
  EXPECT_THROW(negotiation.context.NegotiateToken(ToLeg("one")), InvalidSignatureException);
  negotiation.context.NegotiateToken(ToLeg("two"));
  EXPECT_EQ(Lines({FirstRequest("one"), "1|ContinuedSPNego|ctx|two"}), negotiation.transport.GetSent());
}

TEST(GssNegotiationContext, UsesTheIssueActionFirstAndTheChallengeActionThen) {
  Negotiation negotiation(boost::make_shared<RequestBuilderImpl>(boost::none));
  negotiation.transport.Answer(ChallengeAnswer("ctx", "a"));
  negotiation.transport.Answer(ChallengeAnswer("ctx", "b"));
  negotiation.context.NegotiateToken(ToLeg("one"));
  negotiation.context.NegotiateToken(ToLeg("two"));
  Lines actions;
  for (const std::string& sent : negotiation.transport.GetSent()) {
    actions.push_back(sent.substr(0, sent.find('|', 2)));
  }
  EXPECT_EQ(Lines({"1|http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue",
                   "1|http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue"}),
            actions);
}

TEST(GssNegotiationContext, IsUsedThroughItsInterface) {
  TestSupport::FakeTransport transport;
  transport.Answer(ChallengeAnswer("ctx", "a"));
  const boost::shared_ptr<GssNegotiationContext> context = boost::make_shared<GssNegotiationContextImpl>(
      Spec(), boost::make_shared<TestSupport::FakeRequestBuilder>(), transport.CreateSession(),
      boost::make_shared<ResponseHandlerImpl>(), TestSupport::TrustedSigner());
  EXPECT_EQ("a", ToText(*context->NegotiateToken(ToLeg("one")).first));
  EXPECT_EQ(1, transport.GetCreatedSessions());
}

// ---- The factory ----

SecurityTokenServiceConfig ConfigFor(const std::string& url) {
  SecurityTokenServiceConfig config;
  config.stsUrl = url;
  return config;
}

TEST(CreateGssNegotiationContext, AcceptsAConfigurationOfAnUrlOnly) {
  EXPECT_TRUE(CreateGssNegotiationContext(ConfigFor("http://localhost:1/"), Spec()));
}

TEST(CreateGssNegotiationContext, RefusesHttpsWithoutAnSslContext) {
  try {
    CreateGssNegotiationContext(ConfigFor("https://localhost/"), Spec());
    FAIL() << "https: without an SSL context was accepted";
  } catch (const Pelmar::InvalidArgumentException& error) {
    EXPECT_STREQ("Invalid argument : HTTPS connection requested but no SSLContext provided.", error.what());
  }
}

TEST(CreateGssNegotiationContext, PassesTheUrlParsersExceptions) {
  EXPECT_THROW(CreateGssNegotiationContext(ConfigFor("localhost"), Spec()), Pelmar::Http::HttpException);
}

TEST(CreateGssNegotiationContext, FindsArgumentErrorsInTheFirstRound) {
  const boost::shared_ptr<GssNegotiationContext> context =
      CreateGssNegotiationContext(ConfigFor("http://localhost:1/"), TokenSpec());
  try {
    context->NegotiateToken(ToLeg("one"));
    FAIL() << "a spec without a lifetime was accepted";
  } catch (const Pelmar::InvalidArgumentException& error) {
    EXPECT_STREQ("Invalid argument : Token lifetime must be positive", error.what());
  }
}

TEST(CreateGssNegotiationContext, WaitsFortySecondsForAnAnswer) {
  EXPECT_EQ(40000000, kNegotiationTimeoutMicroseconds);
}

}  // namespace
}  // namespace InternalApi
}  // namespace Quorlin
