// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The ways to ask.

#include <quorlin/TokenRequest.h>

#include "provider/ProviderWorld.h"
#include "support/ScriptedNegotiationHandler.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <stdexcept>

namespace {

using namespace TestSupport;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(TokenRequest, AsksForThePasswordEachTime) {
  const ProviderWorld world;
  int asked = 0;
  const auto provider = world.MakeProvider(Quorlin::RequestByPassword(
      "alice@example.com", [&asked] { return "word-" + std::to_string(++asked); }));
  provider->GetToken();
  provider->Invalidate();
  provider->GetToken();
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("AcquireToken alice@example.com word-1 600",
                                                      "AcquireToken alice@example.com word-2 600"));
}

TEST(TokenRequest, WithoutAPasswordNothingIsAsked) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider(Quorlin::RequestByPassword(
      "alice@example.com", []() -> std::string { throw Pelmar::InvalidStateException("the safe is shut"); }));
  EXPECT_EQ(Get(*provider), "Pelmar::InvalidStateException: the safe is shut");
  EXPECT_THAT(world.service->TakeCalls(), IsEmpty());
}

TEST(TokenRequest, AsksByCertificate) {
  const ProviderWorld world;
  EXPECT_EQ(Get(*world.MakeProvider(Quorlin::RequestByCertificate())), "_1");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("AcquireTokenByCertificate 600"));
}

TEST(TokenRequest, NegotiatesWithANewHandlerEachTimeAndChecksIt) {
  const ProviderWorld world;
  std::vector<boost::shared_ptr<ScriptedNegotiationHandler>> made;
  std::vector<Quorlin::NegotiationHandler*> checked;
  const auto provider = world.MakeProvider(Quorlin::RequestByGss(
      [&made] {
        made.push_back(boost::make_shared<ScriptedNegotiationHandler>());
        made.back()->Plan("leg-" + std::to_string(made.size()));
        return made.back();
      },
      [&checked](Quorlin::NegotiationHandler& handler) { checked.push_back(&handler); }));
  provider->GetToken();
  provider->Invalidate();
  provider->GetToken();
  EXPECT_THAT(world.service->TakeCalls(),
              ElementsAre("AcquireTokenByGSS leg-1 600", "AcquireTokenByGSS leg-2 600"));
  ASSERT_EQ(made.size(), 2U);
  EXPECT_THAT(checked, ElementsAre(made[0].get(), made[1].get()));
}

TEST(TokenRequest, ATokenOfAServiceThatDidNotProveItselfIsDropped) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider(Quorlin::RequestByGss(
      [] {
        const auto handler = boost::make_shared<ScriptedNegotiationHandler>();
        handler->Plan("leg");
        return handler;
      },
      [](Quorlin::NegotiationHandler&) { throw Quorlin::SsoException("no proof"); }));
  EXPECT_EQ(Get(*provider), "Quorlin::SsoException: no proof");
}

TEST(TokenRequest, NeedsAHandlerFromItsFactory) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider(Quorlin::RequestByGss(
      [] { return boost::shared_ptr<Quorlin::NegotiationHandler>(); }, [](Quorlin::NegotiationHandler&) {}));
  EXPECT_EQ(Get(*provider),
            "Pelmar::InvalidArgumentException: Invalid argument : Invalid NegotiationHandlerFactory: the "
            "returned handler may not be NULL");
}

TEST(TokenRequest, ExchangesTheTokenThatTheOtherProviderHasAtThatMoment) {
  const ProviderWorld world;
  const auto source = world.MakeProvider();
  const auto provider = world.MakeProvider(Quorlin::RequestByExchange(source));
  EXPECT_EQ(Get(*provider), "_2");
  source->Invalidate();
  provider->Invalidate();
  EXPECT_EQ(Get(*provider), "_4");
  EXPECT_THAT(world.service->TakeCalls(),
              ElementsAre("AcquireTokenByCertificate 600", "AcquireTokenByToken _1 600",
                          "AcquireTokenByCertificate 600", "AcquireTokenByToken _3 600"));
}

TEST(TokenRequest, TheOtherProvidersFailureIsTheRequests) {
  const ProviderWorld world;
  const auto provider = world.MakeProvider(Quorlin::RequestByExchange(world.MakeProvider()));
  world.service->PlanFailure(Quorlin::CommunicationException("no answer"));
  EXPECT_EQ(Get(*provider), "Quorlin::CommunicationException: no answer");
  EXPECT_THAT(world.service->TakeCalls(), ElementsAre("AcquireTokenByCertificate 600"));
}

TEST(TokenRequest, RefusesWhatIsMissing) {
  const auto makeHandler = [] {
    return boost::shared_ptr<Quorlin::NegotiationHandler>();
  };
  const std::string prefix = "Pelmar::InvalidArgumentException: Invalid argument : ";
  EXPECT_EQ(VerdictOf([] { Quorlin::RequestByPassword("alice", Quorlin::PasswordCallback()); }),
            prefix + "PasswordCallback must not be empty");
  EXPECT_EQ(VerdictOf([] {
              Quorlin::RequestByGss(Quorlin::NegotiationHandlerFactory(),
                                    [](Quorlin::NegotiationHandler&) {});
            }),
            prefix + "NegotiationHandlerFactory must not be empty");
  EXPECT_EQ(VerdictOf([&] { Quorlin::RequestByGss(makeHandler, Quorlin::NegotiationCheck()); }),
            prefix + "NegotiationCheck must not be empty");
  EXPECT_EQ(VerdictOf([] { Quorlin::RequestByExchange(nullptr); }),
            prefix + "the source of the tokens to exchange must not be NULL");
}

}  // namespace
