// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The development token service's side of a Kerberos negotiation.

#include "interop/kerberos/KerberosRealm.h"
#include "interop/kerberos/Outcome.h"

#include "devsts/Fault.h"
#include "devsts/KerberosNegotiation.h"

#include <quorlin-gssapi/GssapiNegotiation.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <iterator>
#include <string>
#include <vector>

/// MIT Kerberos 1.20 loses the acceptor's name when a keytab has no key for it: 88 bytes, once, in
/// gss_acquire_cred_from. Nothing of ours calls the function that makes it. Asked for by the leak sanitizer.
extern "C" __attribute__((visibility("default"))) const char* __lsan_default_suppressions();
extern "C" const char* __lsan_default_suppressions() {
  return "leak:krb5_build_principal_alloc_va\n";
}

namespace {

using namespace KerberosTests;
using DevSts::KerberosMechanism;
using Quorlin::Leg;

const KerberosRealm& Realm() {
  return KerberosRealm::Shared();
}

Leg MakeFirstLeg(const std::string& target = "HTTP@localhost",
                 const std::string& cache = Realm().GetCache()) {
  Quorlin::GssapiOptions options;
  options.targetService = target;
  options.credentialCache = cache;
  return *Quorlin::CreateGssapiNegotiationHandler(options)->Negotiate(Leg());
}

std::string OutcomeOfAccepting(const Leg& leg, const std::string& service = "") {
  return OutcomeOf([&] { KerberosMechanism({Realm().GetKeytab(), service}).Begin()->Accept(leg); });
}

TEST(KerberosNegotiation, NamesThePrincipalAndAnswers) {
  const KerberosMechanism mechanism({Realm().GetKeytab(), ""});
  for (const char* const target : {"HTTP@localhost", "HTTP@127.0.0.1"}) {
    const DevSts::NegotiationStep step = mechanism.Begin()->Accept(MakeFirstLeg(target));
    EXPECT_EQ(step.principal, "alice@EXAMPLE.COM") << target;
    EXPECT_FALSE(step.leg.empty()) << target;
  }
}

TEST(KerberosNegotiation, IsDoneAfterTheFirstLeg) {
  const auto negotiation = KerberosMechanism({Realm().GetKeytab(), ""}).Begin();
  negotiation->Accept(MakeFirstLeg());
  EXPECT_NE(OutcomeOf([&] { negotiation->Accept(MakeFirstLeg()); }), "done");
}

TEST(KerberosNegotiation, TakesTicketsOfTheNamedServiceOnly) {
  EXPECT_EQ(OutcomeOfAccepting(MakeFirstLeg("HTTP@localhost"), "HTTP@localhost"), "done");
  EXPECT_EQ(OutcomeOfAccepting(MakeFirstLeg("HTTP@localhost"), "HTTP@127.0.0.1"),
            std::string("Fault: Kerberos: ") + kUnspecified +
                "Request ticket server HTTP/localhost@EXAMPLE.COM found in keytab but does not match server "
                "principal HTTP/127.0.0.1@");
}

TEST(KerberosNegotiation, RefusesATicketForAnotherService) {
  EXPECT_EQ(OutcomeOfAccepting(MakeFirstLeg("HTTP@elsewhere")),
            std::string("Fault: Kerberos: ") + kUnspecified +
                "Request ticket server HTTP/elsewhere@EXAMPLE.COM not found in keytab (ticket kvno 2)");
}

TEST(KerberosNegotiation, RefusesALegThatItHasSeen) {
  const Leg leg = MakeFirstLeg();
  EXPECT_EQ(OutcomeOfAccepting(leg), "done");
  EXPECT_EQ(OutcomeOfAccepting(leg), std::string("Fault: Kerberos: ") + kUnspecified + "Request is a replay");
}

TEST(KerberosNegotiation, RefusesAChangedLeg) {
  Leg leg = MakeFirstLeg();
  leg.back() ^= 1;
  EXPECT_EQ(OutcomeOfAccepting(leg),
            std::string("Fault: Kerberos: ") + kUnspecified + "Decrypt integrity check failed");
}

TEST(KerberosNegotiation, RefusesWhatIsNoSpnego) {
  EXPECT_EQ(OutcomeOfAccepting({'r', 'u', 'b', 'b', 'i', 's', 'h'}),
            "Fault: Kerberos: Invalid token was supplied");
  EXPECT_EQ(OutcomeOfAccepting({}), "Fault: Kerberos: the leg is empty");
}

TEST(KerberosNegotiation, RefusesKerberosWithoutSpnego) {
  // The proposal ends with the Kerberos message, which is complete in itself: [APPLICATION 0], a length of
  // two bytes, and Kerberos V5's identifier.
  const Leg leg = MakeFirstLeg();
  const Leg kerberos = {0x06, 0x09, 0x2a, 0x86, 0x48, 0x86, 0xf7, 0x12, 0x01, 0x02, 0x02, 0x01, 0x00};
  const auto found = std::search(leg.begin(), leg.end(), kerberos.begin(), kerberos.end());
  ASSERT_NE(found, leg.end());
  const Leg bare(std::prev(found, 4), leg.end());
  ASSERT_EQ(bare[0], 0x60);
  EXPECT_EQ(
      OutcomeOfAccepting(bare),
      "Fault: Kerberos: No credentials were supplied, or the credentials were unavailable or inaccessible");
}

TEST(KerberosNegotiation, TellsTheClientThatItsCredentialsWereRefused) {
  try {
    KerberosMechanism({Realm().GetKeytab(), ""}).Begin()->Accept({'?'});
    FAIL();
  } catch (const DevSts::Fault& fault) {
    EXPECT_EQ(fault.GetCode(), DevSts::FaultCode::FAILED_AUTHENTICATION);
  }
}

TEST(KerberosNegotiation, NamesUsersOnly) {
  const std::string cache = Realm().LogIn("mallory/admin", "mallory's", "mallorys");
  EXPECT_EQ(OutcomeOfAccepting(MakeFirstLeg("HTTP@localhost", cache)),
            "Fault: The Kerberos principal is not a user");
}

// ---- Keytabs ----

TEST(KerberosNegotiation, SaysThatThereIsNoKeytab) {
  const std::string path = Realm().GetFiles().GetPath("nothing");
  EXPECT_EQ(OutcomeOf([&] {
              KerberosMechanism({path, ""});
            }),
            "KerberosException: cannot use the keytab " + path + ": " + kNoCredentials +
                "Keytab FILE:" + path + " is nonexistent or empty");
}

TEST(KerberosNegotiation, SaysThatTheKeytabHasNoKeyOfTheService) {
  const std::string path = Realm().GetKeytab();
  EXPECT_EQ(OutcomeOf([&] {
              KerberosMechanism({path, "HTTP@elsewhere"});
            }),
            "KerberosException: cannot use the keytab " + path + ": " + kNoCredentials +
                "No key table entry found matching HTTP/elsewhere@");
}

}  // namespace
