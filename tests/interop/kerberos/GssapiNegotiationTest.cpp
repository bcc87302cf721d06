// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The client's side of a Kerberos negotiation, against a real realm. Texts are compared whole, MIT's words
// included.

#include "interop/kerberos/KerberosRealm.h"
#include "interop/kerberos/Outcome.h"

#include "devsts/KerberosNegotiation.h"

#include <quorlin-gssapi/GssapiNegotiation.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <string>
#include <vector>

namespace {

using namespace KerberosTests;
using Quorlin::GssapiOptions;
using Quorlin::Leg;

using Handler = boost::shared_ptr<Quorlin::GssapiNegotiationHandler>;

constexpr const char* kFailed = "Kerberos negotiation with 'HTTP@localhost' failed: ";
constexpr const char* kUnusable = "InvalidCredentialsException: Kerberos credentials cannot be used: ";

const KerberosRealm& Realm() {
  return KerberosRealm::Shared();
}

GssapiOptions MakeOptions() {
  Realm();
  GssapiOptions options;
  options.targetService = "HTTP@localhost";
  return options;
}

Handler MakeHandler(const GssapiOptions& options = MakeOptions()) {
  return Quorlin::CreateGssapiNegotiationHandler(options);
}

Leg MakeFirstLeg(const Handler& handler) {
  return *handler->Negotiate(Leg());
}

std::string OutcomeOfFirstLeg(const GssapiOptions& options) {
  return OutcomeOf([&] { MakeFirstLeg(MakeHandler(options)); });
}

DevSts::NegotiationStep Accept(const Leg& leg) {
  return DevSts::KerberosMechanism({Realm().GetKeytab(), ""}).Begin()->Accept(leg);
}

TEST(GssapiNegotiation, ProvesBothSidesToEachOther) {
  const Handler handler = MakeHandler();
  const DevSts::NegotiationStep step = Accept(MakeFirstLeg(handler));
  EXPECT_EQ(step.principal, "alice@EXAMPLE.COM");
  EXPECT_FALSE(handler->IsComplete());
  EXPECT_EQ(handler->Negotiate(step.leg), nullptr);
  EXPECT_TRUE(handler->IsComplete());
  EXPECT_EQ(OutcomeOf([&] { handler->RequireComplete(); }), "done");
}

TEST(GssapiNegotiation, IsNotDisturbedByLegsAfterItsEnd) {
  const Handler handler = MakeHandler();
  handler->Negotiate(Accept(MakeFirstLeg(handler)).leg);
  EXPECT_EQ(handler->Negotiate(Leg{'?'}), nullptr);
  EXPECT_EQ(handler->Negotiate(Leg()), nullptr);
  EXPECT_TRUE(handler->IsComplete());
}

TEST(GssapiNegotiation, ActsAsTheNamedPrincipalOfTheNamedCache) {
  GssapiOptions options = MakeOptions();
  options.principal = "carol@EXAMPLE.COM";
  options.credentialCache = Realm().LogIn("carol", "carol's", "carols");
  EXPECT_EQ(Accept(MakeFirstLeg(MakeHandler(options))).principal, "carol@EXAMPLE.COM");
  options.principal = "";
  EXPECT_EQ(Accept(MakeFirstLeg(MakeHandler(options))).principal, "carol@EXAMPLE.COM");
  options.principal = "carol";
  EXPECT_EQ(Accept(MakeFirstLeg(MakeHandler(options))).principal, "carol@EXAMPLE.COM")
      << "in the default realm";
}

TEST(GssapiNegotiation, NeverDelegatesCredentials) {
  // A ticket-granting ticket sent along would more than double the leg, which carries one ticket.
  const Leg leg = MakeFirstLeg(MakeHandler());
  EXPECT_LT(leg.size(), 1000U);
}

// ---- Credentials that are missing or no good ----

TEST(GssapiNegotiation, SaysThatThereIsNoTicket) {
  GssapiOptions options = MakeOptions();
  options.credentialCache = Realm().MakeCacheName("none");
  EXPECT_EQ(OutcomeOfFirstLeg(options),
            std::string(kUnusable) + kNoCredentials + "No credentials cache found");
}

TEST(GssapiNegotiation, SaysThatTheCacheHoldsNoTicket) {
  GssapiOptions options = MakeOptions();
  const std::string cache = Realm().MakeEmptyCache("empty");
  const std::string problem = std::string(kNoCredentials) + "Credential cache is empty";
  const EnvironmentVariable defaultCache("KRB5CCNAME", cache);
  EXPECT_EQ(OutcomeOfFirstLeg(options), std::string("InvalidCredentialsException: ") + kFailed + problem)
      << "the default cache, which is only opened when the target is known";
  options.credentialCache = cache;
  EXPECT_EQ(OutcomeOfFirstLeg(options), kUnusable + problem);
}

TEST(GssapiNegotiation, SaysThatTheTicketHasExpired) {
  GssapiOptions options = MakeOptions();
  options.credentialCache = Realm().MakeExpiredCache("expired");
  const std::string expected =
      std::string("InvalidCredentialsException: ") + kFailed + kUnspecified + "Ticket expired";
  EXPECT_EQ(OutcomeOfFirstLeg(options), expected);
  options.principal = "alice@EXAMPLE.COM";
  EXPECT_EQ(OutcomeOfFirstLeg(options), expected);
}

TEST(GssapiNegotiation, SaysThatTheCacheIsOfAnotherPrincipal) {
  GssapiOptions options = MakeOptions();
  options.principal = "carol@EXAMPLE.COM";
  options.credentialCache = Realm().GetCache();
  EXPECT_EQ(OutcomeOfFirstLeg(options), std::string(kUnusable) + kNoCredentials +
                                            "Principal in credential cache does not match desired name");
}

TEST(GssapiNegotiation, SaysThatThereIsNoTicketOfAnotherRealm) {
  GssapiOptions options = MakeOptions();
  options.principal = "alice@OTHER.EXAMPLE";
  EXPECT_EQ(OutcomeOfFirstLeg(options),
            std::string(kUnusable) + kNoCredentials +
                "Can't find client principal alice@OTHER.EXAMPLE in cache collection");
}

TEST(GssapiNegotiation, SaysThatThePrincipalIsNone) {
  GssapiOptions options = MakeOptions();
  options.principal = "a@b@c";
  EXPECT_EQ(OutcomeOfFirstLeg(options),
            std::string(kUnusable) + "An invalid name was supplied: Malformed representation of principal");
}

// ---- Services that Kerberos cannot lead to ----

TEST(GssapiNegotiation, SaysThatTheServiceIsUnknown) {
  GssapiOptions options = MakeOptions();
  options.targetService = "HTTP@nowhere";
  EXPECT_EQ(OutcomeOfFirstLeg(options),
            std::string("SsoException: Kerberos negotiation with 'HTTP@nowhere' failed: ") + kUnspecified +
                "Server HTTP/nowhere@EXAMPLE.COM not found in Kerberos database");
}

TEST(GssapiNegotiation, SaysThatTheServicesRealmIsOutOfReach) {
  GssapiOptions options = MakeOptions();
  options.targetService = "HTTP@sts.other.example";
  EXPECT_EQ(OutcomeOfFirstLeg(options),
            std::string("SsoException: Kerberos negotiation with 'HTTP@sts.other.example' failed: ") +
                kUnspecified + "Server krbtgt/OTHER.EXAMPLE@EXAMPLE.COM not found in Kerberos database");
}

TEST(GssapiNegotiation, SaysThatNobodyAnswersForTheRealm) {
  KerberosRealm realm;
  realm.StopKdc();
  GssapiOptions options;
  options.targetService = "HTTP@localhost";
  EXPECT_EQ(OutcomeOfFirstLeg(options), std::string("SsoException: ") + kFailed + kUnspecified +
                                            "Cannot contact any KDC for realm 'EXAMPLE.COM'");
}

// ---- Services that do not prove who they are ----

TEST(GssapiNegotiation, IsNotCompleteUntilTheServiceHasProvedItself) {
  const Handler handler = MakeHandler();
  const std::string expected =
      "SsoException: Kerberos negotiation with 'HTTP@localhost' is not complete: the service did not prove its "
      "identity";
  EXPECT_EQ(OutcomeOf([&] { handler->RequireComplete(); }), expected);
  MakeFirstLeg(handler);
  EXPECT_EQ(OutcomeOf([&] { handler->RequireComplete(); }), expected);
}

TEST(GssapiNegotiation, RefusesTheProofOfAnotherNegotiation) {
  const Leg proofForAnother = Accept(MakeFirstLeg(MakeHandler())).leg;
  const Handler handler = MakeHandler();
  MakeFirstLeg(handler);
  EXPECT_EQ(OutcomeOf([&] { handler->Negotiate(proofForAnother); }),
            std::string("SsoException: ") + kFailed + kUnspecified + "Mutual authentication failed");
  EXPECT_FALSE(handler->IsComplete());
}

/// Where the service's encrypted proof begins; it goes on to the end of the leg.
std::size_t FindProof(const Leg& leg) {
  // EncryptedData of the type aes256-cts-hmac-sha1-96 (RFC 4120, section 5.2.9): its third field, of less
  // than 128 bytes.
  const Leg type = {0xa0, 0x03, 0x02, 0x01, 0x12, 0xa2};
  const auto found = std::search(leg.begin(), leg.end(), type.begin(), type.end());
  return static_cast<std::size_t>(found - leg.begin()) + type.size() + 3;
}

TEST(GssapiNegotiation, RefusesAChangeOfAnyByteOfTheProof) {
  // Two proofs may differ in length by a few bytes: they hold a random number in as few bytes as it needs.
  constexpr std::size_t kMinProofBytes = 60;
  for (std::size_t i = 0;; ++i) {
    const Handler handler = MakeHandler();
    Leg leg = Accept(MakeFirstLeg(handler)).leg;
    const std::size_t changed = FindProof(leg) + i;
    if (changed >= leg.size()) {
      EXPECT_GT(i, kMinProofBytes);
      break;
    }
    leg[changed] ^= 0x01;
    EXPECT_EQ(OutcomeOf([&] { handler->Negotiate(leg); }),
              std::string("SsoException: ") + kFailed + kUnspecified + "Decrypt integrity check failed")
        << "byte " << i;
    EXPECT_FALSE(handler->IsComplete()) << "byte " << i;
  }
}

/// What a service may send instead of its proof.
struct BadLeg {
  const char* name;
  Leg leg;
  const char* problem;
};

void PrintTo(const BadLeg& bad, std::ostream* out) {
  *out << bad.name;
}

class GssapiNegotiationRefuses : public testing::TestWithParam<BadLeg> {};

TEST_P(GssapiNegotiationRefuses, AndIsOver) {
  const Handler handler = MakeHandler();
  MakeFirstLeg(handler);
  EXPECT_EQ(OutcomeOf([&] { handler->Negotiate(GetParam().leg); }),
            std::string("SsoException: ") + kFailed + GetParam().problem);
  EXPECT_FALSE(handler->IsComplete());
  EXPECT_EQ(OutcomeOf([&] { handler->Negotiate(GetParam().leg); }),
            "InvalidStateException: Kerberos negotiation with 'HTTP@localhost' has failed and cannot go on");
}

constexpr const char* kNoProof = "Invalid token was supplied: SPNEGO acceptor did not return a valid token";

// The DER of NegTokenResp (RFC 4178, section 4.2.2).
const BadLeg kBadLegs[] = {
    {"AnEmptyLeg", {}, "the service sent an empty leg"},
    {"NoDer", {'r', 'u', 'b', 'b', 'i', 's', 'h'}, "Invalid token was supplied"},
    {"ALengthOfFourGigabytes", {0xa1, 0x84, 0xff, 0xff, 0xff, 0xff, 0x30}, "Invalid token was supplied"},
    {"AcceptCompletedWithoutProof", {0xa1, 7, 0x30, 5, 0xa0, 3, 0x0a, 1, 0}, kNoProof},
    {"AcceptCompletedWithKerberosButWithoutProof",
     {0xa1, 0x14, 0x30, 0x12, 0xa0, 3,    0x0a, 1,    0, 0xa1, 0x0b,
      6,    9,    0x2a, 0x86, 0x48, 0x86, 0xf7, 0x12, 1, 2,    2},
     kNoProof},
    {"AcceptIncompleteWithoutAnything", {0xa1, 7, 0x30, 5, 0xa0, 3, 0x0a, 1, 1}, kNoProof},
    {"Reject",
     {0xa1, 7, 0x30, 5, 0xa0, 3, 0x0a, 1, 2},
     "An unsupported mechanism was requested: SPNEGO failed to negotiate a mechanism"},
    {"RequestOfAnIntegrityCode", {0xa1, 7, 0x30, 5, 0xa0, 3, 0x0a, 1, 3}, kNoProof},
    {"AMechanismThatWasNotOffered",
     {0xa1, 0x15, 0x30, 0x13, 0xa0, 3,    0x0a, 1,    1,    0xa1, 0x0c, 6,
      0x0a, 0x2b, 0x06, 0x01, 0x04, 0x01, 0x82, 0x37, 0x02, 0x02, 0x0a},
     "Invalid token was supplied"}};

INSTANTIATE_TEST_SUITE_P(Leg, GssapiNegotiationRefuses, testing::ValuesIn(kBadLegs),
                         [](const testing::TestParamInfo<BadLeg>& tested) { return tested.param.name; });

// ---- Misuse ----

TEST(GssapiNegotiation, StartsWithoutALegOfTheService) {
  const Handler handler = MakeHandler();
  EXPECT_EQ(OutcomeOf([&] { handler->Negotiate(Leg{1}); }),
            "InvalidArgumentException: Invalid argument : a negotiation starts without a leg of the service");
}

TEST(GssapiNegotiation, NeedsAServiceOnAHost) {
  for (const char* const target : {"", "HTTP", "HTTP@", "@localhost", "HTTP/localhost"}) {
    GssapiOptions options = MakeOptions();
    options.targetService = target;
    EXPECT_EQ(
        OutcomeOf([&] { MakeHandler(options); }),
        "InvalidArgumentException: Invalid argument : GssapiOptions::targetService must be SERVICE@HOST")
        << target;
  }
}

TEST(GssapiNegotiation, TakesNoTextThatGoesOnBehindItsEnd) {
  const std::string twoFaced("HTTP@localhost\0.example", 23);
  for (std::string GssapiOptions::*const field :
       {&GssapiOptions::targetService, &GssapiOptions::principal, &GssapiOptions::credentialCache}) {
    GssapiOptions options = MakeOptions();
    options.*field = twoFaced;
    EXPECT_EQ(OutcomeOf([&] { MakeHandler(options); }),
              "InvalidArgumentException: Invalid argument : GssapiOptions must not contain NUL characters");
  }
}

}  // namespace
