// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Negotiations with the development token service: the messages are those of the library, the answers are
// read by it.

#include "apps/StsRequests.h"
#include "support/GoldenText.h"
#include "support/Pki.h"
#include "support/TokenFactory.h"

#include "devsts/Clock.h"
#include "devsts/Fault.h"
#include "devsts/RequestHandler.h"
#include "devsts/ToyNegotiation.h"

#include <pelmar/Reader.h>
#include <pelmar/StringUtil.h>
#include <pelmar/crypto/Digest.h>
#include <quorlin/SamlToken.h>

#include <gtest/gtest.h>

#include <memory>
#include <regex>
#include <set>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/ResponseHandlerImpl.h"

namespace {

using namespace StsTests;
using namespace TestSupport;
using DevSts::ToyOptions;

constexpr const char* kAlice = "alice@example.com";
constexpr const char* kChallengeAction = "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RSTR/Issue\"";

DevSts::TokenIssuer& Issuer() {
  static DevSts::TokenIssuer issuer(DevSts::CertificateAuthority().IssueSigner(), "urn:test:sts");
  return issuer;
}

const Identity& ClientIdentity() {
  static const Identity client = [] {
    CertificateSpec spec;
    spec.keyNumber = 3;
    return MakeSelfSigned(spec);
  }();
  return client;
}

/// A service whose clock the test moves.
class Desk final {
 public:
  explicit Desk(const ToyOptions& options) : Desk(MakeToy(options)) {}

  explicit Desk(const std::shared_ptr<const DevSts::NegotiationMechanism>& mechanism,
                bool withCookie = false) {
    DevSts::HandlerOptions options;
    options.negotiation = mechanism;
    options.cookie = withCookie;
    _handler = std::make_unique<DevSts::RequestHandler>(
        options, DevSts::Directory::MakeSample(), Issuer(), GetClock(),
        [this](const std::string& line) { lines.push_back(line); });
  }

  DevSts::Answer Send(const Quorlin::Request& request, const std::string& cookie = "") {
    return _handler->HandleRequest("\"" + request.soapAction + "\"", kXml, request.body, cookie);
  }
  DevSts::Answer Send(const std::string& action, const std::string& body) {
    return _handler->HandleRequest(action, kXml, body);
  }

  DevSts::Clock GetClock() {
    return [this] {
      return DevSts::MakeSystemClock(0)() + ahead;
    };
  }
  void SetDirectory(const DevSts::Directory& directory) { _handler->SetDirectory(directory); }

  long long ahead = 0;  ///< Microseconds.
  std::vector<std::string> lines;

 private:
  std::shared_ptr<const DevSts::NegotiationMechanism> MakeToy(const ToyOptions& options) {
    return std::make_shared<DevSts::ToyMechanism>(options, DevSts::Directory::MakeSample(), GetClock());
  }

  std::unique_ptr<DevSts::RequestHandler> _handler;
};

/// "code: text" of a fault; empty for another answer.
std::string FaultOf(const std::string& body) {
  if (body.find("<soapenv:Fault>") == std::string::npos) {
    return "";
  }
  const std::string code = CutBetween(body, "<faultcode", "</faultcode>");
  return code.substr(code.rfind('>') + 1) + ": " + CutBetween(body, "<faultstring>", "</faultstring>");
}

Quorlin::TokenSpec MakeSpec() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 600;
  return spec;
}

ToyOptions Legs(unsigned legs, bool provesBack = true) {
  ToyOptions options;
  options.legs = legs;
  options.provesBack = provesBack;
  return options;
}

/// One negotiation as the library holds it.
class Client final {
 public:
  Client(Desk& desk, const ToyOptions& options, const std::string& user = kAlice,
         const std::string& password = "secret", const Quorlin::TokenSpec& spec = MakeSpec(),
         const Identity* identity = nullptr)
      : _desk(desk), _toy(options, user, password, desk.GetClock()), _spec(spec) {
    if (identity != nullptr) {
      Quorlin::HolderOfKeyConfig config;
      config.privateKey = identity->GetKey();
      config.certificate = identity->certificate;
      _holder = config;
    }
  }

  /// Sends the next leg: "challenge", "token", or the fault.
  std::string Step() { return Send(_toy.Answer(last.leg)); }

  std::string Send(const Quorlin::Leg& leg) {
    Quorlin::Request request = Build(leg);
    const std::string body = _desk.Send(request).body;
    const std::string fault = FaultOf(body);
    if (!fault.empty()) {
      return fault;
    }
    Quorlin::ResponseHandlerImpl().HandleSPNegoResponse(Pelmar::CreateStringReader(body).Get(), last);
    return last.token.empty() ? "challenge" : "token";
  }

  Quorlin::Request Build(const Quorlin::Leg& leg) const {
    const Quorlin::RequestBuilderImpl builder(_holder);
    Quorlin::Request request;
    if (last.contextId.empty()) {
      builder.BuildInitialSPNegoRequest(_spec, leg, request);
    } else {
      builder.BuildContinuedSPNegoRequest(last.contextId, leg, request);
    }
    return request;
  }

  /// All that is said until the end: "challenge challenge token ".
  std::string Run() {
    std::string story;
    std::string outcome;
    do {
      outcome = Step();
      story += outcome + " ";
    } while (outcome == "challenge");
    return story;
  }

  boost::shared_ptr<Quorlin::SamlToken> GetToken() const {
    return Quorlin::CreateSamlToken(last.token, Issuer().GetCertificate().Get());
  }
  DevSts::ToyClient& GetToy() { return _toy; }

  Quorlin::SPNegoResponse last;

 private:
  Desk& _desk;
  DevSts::ToyClient _toy;
  Quorlin::TokenSpec _spec;
  boost::optional<Quorlin::HolderOfKeyConfig> _holder;
};

std::string ToText(const Quorlin::Leg& leg) {
  return std::string(leg.begin(), leg.end());
}

Quorlin::Leg ToLeg(const std::string& text) {
  return Quorlin::Leg(text.begin(), text.end());
}

class NegotiationOf : public testing::TestWithParam<std::tuple<unsigned, bool>> {};

TEST_P(NegotiationOf, SomeLegsEndsWithAToken) {
  const auto [legs, provesBack] = GetParam();
  Desk desk(Legs(legs, provesBack));
  Client client(desk, Legs(legs, provesBack));
  std::string expected;
  for (unsigned i = 1; i < legs; ++i) {
    expected += "challenge ";
  }
  EXPECT_EQ(client.Run(), expected + "token ");
  EXPECT_TRUE(client.GetToken()->GetSubject() == Quorlin::PrincipalId("alice", "example.com"));
  EXPECT_EQ(client.GetToken()->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_BEARER);
  EXPECT_EQ(client.last.leg.empty(), !provesBack);
  if (provesBack) {
    EXPECT_EQ(ToText(client.GetToy().Answer(client.last.leg)), "done\n");
  }
}

INSTANTIATE_TEST_SUITE_P(Table, NegotiationOf,
                         testing::Combine(testing::Values(1U, 2U, 5U, DevSts::kMaxToyLegs), testing::Bool()));

TEST(Negotiation, GivesWhatItsFirstMessageAskedFor) {
  Quorlin::TokenSpec spec = MakeSpec();
  spec.renewable = true;
  spec.delegable = true;
  spec.delegateTo = std::string("bob@example.com");
  spec.audienceRestriction = {"urn:one", "urn:two"};
  Desk desk(Legs(3));
  Client client(desk, Legs(3), kAlice, "secret", spec);
  EXPECT_EQ(client.Run(), "challenge challenge token ");
  const auto token = client.GetToken();
  EXPECT_TRUE(token->IsRenewable());
  EXPECT_TRUE(token->IsDelegable());
  EXPECT_EQ(token->GetEndDate().GetUtcTime() - token->GetStartDate().GetUtcTime(), 600LL * 1000000);
  std::set<std::string> audience;
  token->GetAudience(audience);
  EXPECT_EQ(audience, spec.audienceRestriction);
  std::vector<Quorlin::Delegate> chain;
  token->GetDelegationChain(chain);
  ASSERT_EQ(chain.size(), 1U);
  EXPECT_TRUE(chain[0].principal == Quorlin::PrincipalId("bob", "example.com"));
}

TEST(Negotiation, BindsTheTokenToTheKeyThatSignedItsFirstMessage) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2), kAlice, "secret", MakeSpec(), &ClientIdentity());
  EXPECT_EQ(client.Run(), "challenge token ");
  EXPECT_EQ(client.GetToken()->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_HOLDER_OF_KEY);
  EXPECT_EQ(client.GetToken()->GetConfirmationCertificate()->GetSha256(),
            ClientIdentity().certificate->GetSha256());
}

TEST(Negotiation, GivesABearerTokenToAHolderOfAKeyWhoAsksForOne) {
  Quorlin::TokenSpec spec = MakeSpec();
  spec.confirmation = Quorlin::TokenSpec::CONFIRMATION_BEARER;
  Desk desk(Legs(1));
  Client client(desk, Legs(1), kAlice, "secret", spec, &ClientIdentity());
  EXPECT_EQ(client.Run(), "token ");
  EXPECT_EQ(client.GetToken()->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_BEARER);
}

/// The library then asks for a holder-of-key token in a message that it does not sign.
TEST(Negotiation, GivesABearerTokenForADelegateOfAHolderOfAKey) {
  Quorlin::TokenSpec spec = MakeSpec();
  spec.delegateTo = std::string("bob@example.com");
  Desk desk(Legs(2));
  Client client(desk, Legs(2), kAlice, "secret", spec, &ClientIdentity());
  EXPECT_EQ(client.Run(), "challenge token ");
  EXPECT_EQ(client.GetToken()->GetConfirmationMethod(), Quorlin::SamlToken::CONFIRM_BEARER);
}

TEST(Negotiation, RefusesASignatureOverAnotherMessage) {
  Desk desk(Legs(1));
  Client client(desk, Legs(1), kAlice, "secret", MakeSpec(), &ClientIdentity());
  Quorlin::Request request = client.Build(client.GetToy().Answer({}));
  request.body = ReplaceOnce(request.body, "Allow=\"false\"", "Allow=\"true\"");
  EXPECT_EQ(FaultOf(desk.Send(request).body),
            "wst:FailedAuthentication: The message's signature does not match the message");
}

TEST(Negotiation, RefusesASignedFirstMessageTheSecondTime) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2), kAlice, "secret", MakeSpec(), &ClientIdentity());
  const Quorlin::Request request = client.Build(client.GetToy().Answer({}));
  EXPECT_EQ(FaultOf(desk.Send(request).body), "");
  EXPECT_EQ(FaultOf(desk.Send(request).body), "wst:FailedAuthentication: The message was sent before");
}

TEST(Negotiation, RefusesAHolderOfKeyTokenWithoutProofOfAKey) {
  Desk desk(Legs(1));
  Client client(desk, Legs(1));
  Quorlin::Request request = client.Build(client.GetToy().Answer({}));
  request.body = ReplaceOnce(request.body, "/Bearer<", "/PublicKey<");
  EXPECT_EQ(FaultOf(desk.Send(request).body),
            "wst:RequestFailed: A token can only be bound to a key that signed the request");
}

constexpr const char* kWrongProof = "wst:FailedAuthentication: Invalid user name or password";

TEST(Negotiation, RefusesAWrongProof) {
  for (const unsigned legs : {1U, 2U, 5U}) {
    Desk desk(Legs(legs));
    Client client(desk, Legs(legs), kAlice, "guess");
    const std::string story = client.Run();
    EXPECT_EQ(story.substr((legs - 1) * std::string("challenge ").size()), std::string(kWrongProof) + " ");
  }
}

TEST(Negotiation, SaysNoMoreOfUnknownUsersThanOfWrongProofs) {
  Desk desk(Legs(1));
  EXPECT_EQ(Client(desk, Legs(1), "mallory@example.com", "secret").Step(), kWrongProof);
  EXPECT_EQ(Client(desk, Legs(1), "mallory@example.com", "").Step(), kWrongProof);
}

TEST(Negotiation, RefusesAUserWithoutPassword) {
  DevSts::User robot;
  robot.name = "robot";
  robot.domain = "example.com";
  Desk desk(std::make_shared<DevSts::ToyMechanism>(Legs(1), DevSts::Directory({robot}),
                                                   DevSts::MakeSystemClock(0)));
  EXPECT_EQ(Client(desk, Legs(1), "robot@example.com", "").Step(), kWrongProof);
}

TEST(Negotiation, RefusesAUserWhomTheServiceHasForgotten) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  EXPECT_EQ(client.Step(), "challenge");
  desk.SetDirectory(DevSts::Directory({}));
  EXPECT_EQ(client.Step(), "wst:FailedAuthentication: The principal is not known");
}

constexpr const char* kUnknown = "wst:RequestFailed: The negotiation is not known or has ended";

TEST(Negotiation, RefusesAContextThatItNeverNamed) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  client.GetToy().Answer({});
  client.last.contextId = "urn:uuid:00000000-0000-4000-8000-000000000000";
  EXPECT_EQ(client.Send(ToLeg("anything")), kUnknown);
}

TEST(Negotiation, IsOverWithItsLastLeg) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  EXPECT_EQ(client.Step(), "challenge");
  const Quorlin::Request last = client.Build(client.GetToy().Answer(client.last.leg));
  EXPECT_EQ(FaultOf(desk.Send(last).body), "");
  EXPECT_EQ(FaultOf(desk.Send(last).body), kUnknown);
}

TEST(Negotiation, IsOverWithItsFirstBadLeg) {
  Desk desk(Legs(3));
  Client client(desk, Legs(3));
  EXPECT_EQ(client.Step(), "challenge");
  EXPECT_EQ(client.Send(ToLeg("nonsense")), "wst:RequestFailed: The leg is none of the toy negotiation");
  EXPECT_EQ(client.Step(), kUnknown);
}

TEST(Negotiation, MustGoOnWithinFiveMinutes) {
  Desk desk(Legs(2));
  Client prompt(desk, Legs(2));
  Client late(desk, Legs(2));
  EXPECT_EQ(late.Step(), "challenge");
  EXPECT_EQ(prompt.Step(), "challenge");
  desk.ahead += DevSts::kMaxNegotiationAge / 2;
  EXPECT_EQ(prompt.Step(), "token");
  desk.ahead += DevSts::kMaxNegotiationAge / 2;
  EXPECT_EQ(late.Step(), kUnknown);
}

TEST(Negotiation, DoesNotMixWithOthers) {
  Desk desk(Legs(3));
  Client alice(desk, Legs(3));
  Client bob(desk, Legs(3), "bob@example.com", "builder");
  EXPECT_EQ(alice.Step(), "challenge");
  EXPECT_EQ(bob.Step(), "challenge");
  EXPECT_NE(alice.last.contextId, bob.last.contextId);
  EXPECT_EQ(bob.Step(), "challenge");
  EXPECT_EQ(alice.Step(), "challenge");
  EXPECT_EQ(alice.Step(), "token");
  EXPECT_EQ(bob.Step(), "token");
  EXPECT_EQ(alice.GetToken()->GetSubject().name, "alice");
  EXPECT_EQ(bob.GetToken()->GetSubject().name, "bob");
}

TEST(Negotiation, CannotBeEndedInAnothersName) {
  Desk desk(Legs(2));
  Client alice(desk, Legs(2));
  Client bob(desk, Legs(2), "bob@example.com", "builder");
  EXPECT_EQ(alice.Step(), "challenge");
  EXPECT_EQ(bob.Step(), "challenge");
  std::swap(alice.last.contextId, bob.last.contextId);
  EXPECT_EQ(alice.Step(), kWrongProof);
  EXPECT_EQ(bob.Step(), kWrongProof);
}

/// Every other message is heard and sent again by somebody who does not know the password.
TEST(Negotiation, OfOneLegCannotBeHeldAgain) {
  Desk desk(Legs(1));
  Client client(desk, Legs(1));
  const Quorlin::Leg leg = client.GetToy().Answer({});
  EXPECT_EQ(client.Send(leg), "token");
  EXPECT_EQ(Client(desk, Legs(1)).Send(leg), "wst:FailedAuthentication: The negotiation was held before");
  desk.ahead = DevSts::kMaxToyClockSkew + 2 * DevSts::kMicrosecondsPerSecond;
  EXPECT_EQ(Client(desk, Legs(1)).Send(leg),
            "wst:FailedAuthentication: The negotiation was not begun now: check the clocks");
}

TEST(Negotiation, OfTwoLegsCannotBeHeldAgain) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  const Quorlin::Leg first = client.GetToy().Answer({});
  EXPECT_EQ(client.Send(first), "challenge");
  const Quorlin::Leg last = client.GetToy().Answer(client.last.leg);
  EXPECT_EQ(client.Send(last), "token");
  Client thief(desk, Legs(2));
  EXPECT_EQ(thief.Send(first), "challenge");
  EXPECT_EQ(thief.Send(last), kWrongProof);
}

TEST(Negotiation, TakesNoMoreThanItsTableHolds) {
  Desk desk(Legs(2));
  Client first(desk, Legs(2));
  ASSERT_EQ(first.Step(), "challenge");
  for (std::size_t i = 1; i < DevSts::kMaxNegotiations; ++i) {
    ASSERT_EQ(Client(desk, Legs(2)).Step(), "challenge");
  }
  const std::string full = "soapenv:Server: Too many negotiations are under way";
  EXPECT_EQ(Client(desk, Legs(2)).Step(), full);
  EXPECT_EQ(first.Step(), "token");
  EXPECT_EQ(Client(desk, Legs(2)).Step(), "challenge");
  EXPECT_EQ(Client(desk, Legs(2)).Step(), full);
  desk.ahead = DevSts::kMaxNegotiationAge;
  EXPECT_EQ(Client(desk, Legs(2)).Step(), "challenge");
}

TEST(NegotiationTable, GivesANegotiationToOneOnly) {
  DevSts::NegotiationTable table;
  table.Put("a", {}, 0);
  table.Take("a", 1);
  EXPECT_THROW(table.Take("a", 1), DevSts::Fault);
}

/// A change to a message, and the fault that it brings.
struct Defect {
  const char* name;
  const char* from;
  const char* to;
  const char* fault;
};

const Defect kDefects[] = {
    {"NotBase64", ">{leg}</wst:BinaryExchange>", ">*</wst:BinaryExchange>",
     "soapenv:Client: The BinaryExchange is not base64"},
    {"OtherValueType", "/trust/spnego\"", "/trust/kerberos\"",
     "wst:RequestFailed: The BinaryExchange is not SPNEGO in base64"},
    {"OtherEncoding", "#Base64Binary\"", "#HexBinary\"",
     "wst:RequestFailed: The BinaryExchange is not SPNEGO in base64"},
    {"EmptyLeg", ">{leg}</wst:BinaryExchange>", "></wst:BinaryExchange>",
     "wst:RequestFailed: The leg is none of the toy negotiation"},
};

std::string Change(const Quorlin::Request& request, const Defect& defect) {
  const std::string leg = CutBetween(request.body, "trust/spnego\">", "</wst:BinaryExchange>");
  return ReplaceOnce(request.body, ReplaceAll(defect.from, "{leg}", leg), defect.to);
}

class NegotiationRefuses : public testing::TestWithParam<Defect> {};

TEST_P(NegotiationRefuses, AFirstMessage) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  const Quorlin::Request request = client.Build(client.GetToy().Answer({}));
  EXPECT_EQ(FaultOf(desk.Send(kIssueAction, Change(request, GetParam())).body), GetParam().fault);
}

TEST_P(NegotiationRefuses, ALaterMessage) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  EXPECT_EQ(client.Step(), "challenge");
  const Quorlin::Request request = client.Build(client.GetToy().Answer(client.last.leg));
  EXPECT_EQ(FaultOf(desk.Send(kChallengeAction, Change(request, GetParam())).body), GetParam().fault);
}

INSTANTIATE_TEST_SUITE_P(Table, NegotiationRefuses, testing::ValuesIn(kDefects),
                         [](const auto& test) { return std::string(test.param.name); });

/// Hears every leg out.
class Listener final : public DevSts::NegotiationMechanism {
 public:
  class Silent final : public DevSts::Negotiation {
   public:
    DevSts::NegotiationStep Accept(const DevSts::NegotiationLeg& leg) override {
      return {DevSts::NegotiationLeg(leg.size() > 1 ? 1U : 0U), std::nullopt};
    }
  };
  std::unique_ptr<DevSts::Negotiation> Begin() const override { return std::make_unique<Silent>(); }
};

TEST(Negotiation, TakesLegsUpToItsLimit) {
  Desk desk(std::make_shared<Listener>());
  EXPECT_EQ(Client(desk, Legs(2)).Send(Quorlin::Leg(DevSts::kMaxLegBytes)), "challenge");
  EXPECT_EQ(Client(desk, Legs(2)).Send(Quorlin::Leg(DevSts::kMaxLegBytes + 1)),
            "wst:RequestFailed: The BinaryExchange is too long");
}

TEST(Negotiation, FailsWithAMechanismThatHasNothingToSay) {
  Desk desk(std::make_shared<Listener>());
  EXPECT_EQ(Client(desk, Legs(2)).Send(Quorlin::Leg(1)), "soapenv:Server: The service failed");
}

TEST(Negotiation, IsNotSupportedUnlessThereIsAMechanism) {
  Desk desk(std::shared_ptr<const DevSts::NegotiationMechanism>{});
  Client client(desk, Legs(2));
  EXPECT_EQ(client.Step(), "wst:RequestFailed: Negotiation is not supported");
  client.last.contextId = "urn:uuid:00000000-0000-4000-8000-000000000000";
  EXPECT_EQ(client.Send(ToLeg("x")), "wst:RequestFailed: Negotiation is not supported");
}

constexpr const char* kUserNameToken =
    "<wsse:UsernameToken><wsse:Username>bob@example.com</wsse:Username><wsse:Password Type=\"http://docs.oasis-open.org/"
    "wss/2004/01/oasis-200401-wss-username-token-profile-1.0#PasswordText\">builder</wsse:Password></wsse:UsernameToken>"
    "</wsse:Security>";

TEST(Negotiation, TakesNoOtherCredentials) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  Quorlin::Request request = client.Build(client.GetToy().Answer({}));
  const std::string fault = "wsse:InvalidSecurityToken: A negotiation takes no other credentials";
  const std::string first = request.body;
  request.body = ReplaceOnce(first, "</wsse:Security>", kUserNameToken);
  EXPECT_EQ(FaultOf(desk.Send(request).body), fault);
  request.body =
      ReplaceOnce(first, "</wsse:Security>",
                  "<saml:Assertion xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\"/></wsse:Security>");
  EXPECT_EQ(FaultOf(desk.Send(request).body), fault);
}

TEST(Negotiation, TakesNoCredentialsWhenItGoesOn) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  EXPECT_EQ(client.Step(), "challenge");
  Quorlin::Request request = client.Build(client.GetToy().Answer(client.last.leg));
  const std::string good = request.body;
  request.body = ReplaceOnce(good, "</wsse:Security>", kUserNameToken);
  EXPECT_EQ(FaultOf(desk.Send(request).body),
            "wsse:InvalidSecurityToken: A negotiation takes no other credentials");
  request.body =
      ReplaceOnce(good, "</wsse:Security>",
                  "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"/></wsse:Security>");
  EXPECT_EQ(FaultOf(desk.Send(request).body),
            "wsse:InvalidSecurityToken: A negotiation that goes on takes no credentials");
  request.body = good;
  EXPECT_EQ(FaultOf(desk.Send(request).body), "") << "what was refused before does not count";
}

TEST(Negotiation, HasItsTokenSayHowTheSubjectWasAuthenticated) {
  Desk desk(Legs(1));
  Client client(desk, Legs(1));
  EXPECT_EQ(client.Run(), "token ");
  EXPECT_EQ(CutBetween(client.last.token, "AuthnContextClassRef>", "<"),
            "urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport");
  EXPECT_EQ(Listener().GetAuthnContext(), "urn:oasis:names:tc:SAML:2.0:ac:classes:Kerberos");
}

/// The library's golden messages, with times and names put into them. Their leg says nothing to the toy.
class NegotiationReads : public testing::TestWithParam<const char*> {};

TEST_P(NegotiationReads, TheMessagesOfTheLibrary) {
  Desk desk(Legs(2));
  std::string text = ReadGoldenText(std::string("requests/") + GetParam());
  const long long now = desk.GetClock()();
  const auto inSeconds = [now](long long seconds) {
    return DevSts::ToDateText(now + seconds * DevSts::kMicrosecondsPerSecond);
  };
  text = ReplaceAll(text, "{time}", inSeconds(0));
  text = ReplaceAll(text, "{time + 600 s}", inSeconds(600));
  text = ReplaceAll(text, "{time + 3600 s}", inSeconds(3600));
  text = ReplaceAll(text, "{uuid 1}", "00000000-0000-4000-8000-000000000000");
  const bool isFirst = text.find("RequestSecurityToken>") != std::string::npos;
  EXPECT_EQ(FaultOf(desk.Send(isFirst ? kIssueAction : kChallengeAction, text).body),
            isFirst ? "wst:RequestFailed: The leg is none of the toy negotiation" : kUnknown);
}

INSTANTIATE_TEST_SUITE_P(Table, NegotiationReads,
                         testing::Values("spnego-initial-bearer.xml", "spnego-initial-bearer-full.xml",
                                         "spnego-initial-holder-of-key-delegate.xml", "spnego-continued.xml",
                                         "spnego-continued-empty-leg.xml"));

TEST(Negotiation, GoesOnOnlyWithItsCookie) {
  Desk desk(std::make_shared<DevSts::ToyMechanism>(Legs(2), DevSts::Directory::MakeSample(),
                                                   DevSts::MakeSystemClock(0)),
            true);
  for (const std::string kind : {"right", "among others", "none", "part", "another's"}) {
    Client client(desk, Legs(2));
    const DevSts::Answer first = desk.Send(client.Build(client.GetToy().Answer({})));
    EXPECT_EQ(first.cookie.substr(0, 12), "negotiation=");
    Quorlin::ResponseHandlerImpl().HandleSPNegoResponse(Pelmar::CreateStringReader(first.body).Get(),
                                                        client.last);
    const std::string cookie = kind == "right"          ? first.cookie
                               : kind == "among others" ? "a=b; " + first.cookie + "; c=d"
                               : kind == "none"         ? ""
                               : kind == "part"         ? first.cookie.substr(0, first.cookie.size() - 1)
                                                        : "negotiation=00000000-0000-4000-8000-000000000000";
    const DevSts::Answer last = desk.Send(client.Build(client.GetToy().Answer(client.last.leg)), cookie);
    EXPECT_EQ(FaultOf(last.body), kind == "right" || kind == "among others"
                                      ? ""
                                      : "wst:RequestFailed: The negotiation's cookie did not come back")
        << kind;
    EXPECT_EQ(last.cookie, "") << "it is given once";
  }
}

TEST(Negotiation, GivesNoCookieUnlessToldTo) {
  Desk desk(Legs(2));
  Client client(desk, Legs(2));
  EXPECT_EQ(desk.Send(client.Build(client.GetToy().Answer({}))).cookie, "");
}

/// The log's lines without their times.
std::vector<std::string> Timeless(const std::vector<std::string>& lines) {
  std::vector<std::string> result;
  for (const std::string& line : lines) {
    result.push_back(std::regex_replace(line, std::regex("\"time\":\"[^\"]*\""), "\"time\":0"));
  }
  return result;
}

TEST(Negotiation, LogsEachOfItsMessages) {
  Desk desk(Legs(2));
  EXPECT_EQ(Client(desk, Legs(2)).Run(), "challenge token ");
  EXPECT_EQ(Client(desk, Legs(2), kAlice, "guess").Run(), "challenge " + std::string(kWrongProof) + " ");
  const std::string first =
      R"({"time":0,"operation":"issue","user":null,"asked":{"confirmation":"bearer","lifetimeSec":600,)"
      R"("renewable":false,"delegable":false,"delegates":false,"audiences":0,"advices":0},"passed":["timestamp"],)"
      R"("status":200,"answer":"challenge"})";
  const std::vector<std::string> expected = {
      first,
      R"({"time":0,"operation":"challenge","user":"alice@example.com","asked":null,"passed":["timestamp","negotiation"],)"
      R"("status":200,"answer":"token","granted":{"confirmation":"bearer","lifetimeSec":600}})",
      first,
      R"({"time":0,"operation":"challenge","user":null,"asked":null,"passed":["timestamp"],"status":500,)"
      R"("answer":"fault","fault":"wst:FailedAuthentication","reason":"Invalid user name or password"})"};
  EXPECT_EQ(Timeless(desk.lines), expected);
}

// ---- The toy on its own ----

TEST(ToyMechanism, HasOneToAHundredLegs) {
  const DevSts::Directory directory = DevSts::Directory::MakeSample();
  for (const unsigned legs : {0U, DevSts::kMaxToyLegs + 1}) {
    try {
      const DevSts::ToyMechanism mechanism(Legs(legs), directory, DevSts::MakeSystemClock(0));
      ADD_FAILURE() << legs;
    } catch (const std::invalid_argument& e) {
      EXPECT_STREQ(e.what(), "a toy negotiation has 1 to 100 legs");
    }
  }
}

/// What the service says to these first legs of two.
TEST(ToyMechanism, RefusesLegsOfAnotherForm) {
  const std::string good = "toy negotiation of 2 legs\nalice@example.com\n1893456000\nnonce\n";
  const DevSts::ToyMechanism mechanism(Legs(2), DevSts::Directory::MakeSample(), [] { return kNow; });
  EXPECT_FALSE(mechanism.Begin()->Accept(ToLeg(good)).leg.empty());
  const std::vector<std::string> bad = {
      "",
      "\n",
      good.substr(0, good.size() - 1),
      good + "proof\n",
      ReplaceOnce(good, "of 2 legs", "of 3 legs"),
      ReplaceOnce(good, "1893456000", ""),
      ReplaceOnce(good, "1893456000", "-1893456000"),
      ReplaceOnce(good, "1893456000", "1893456000.5"),
      ReplaceOnce(good, "1893456000", "9999999999999"),
      ReplaceOnce(good, "nonce", std::string(DevSts::kMaxToyLegBytes, 'n')),
  };
  for (const std::string& leg : bad) {
    try {
      mechanism.Begin()->Accept(ToLeg(leg));
      ADD_FAILURE() << leg;
    } catch (const DevSts::Fault& fault) {
      EXPECT_STREQ(fault.what(), "The leg is none of the toy negotiation") << leg;
    }
  }
}

std::string FailToAnswer(DevSts::ToyClient& client, const std::string& leg) {
  try {
    return "answered: " + ToText(client.Answer(ToLeg(leg)));
  } catch (const Pelmar::Exception& e) {
    return e.what();
  }
}

TEST(ToyClient, RefusesAServiceThatDoesNotKnowThePassword) {
  DevSts::ToyClient client(Legs(1), kAlice, "secret", DevSts::MakeSystemClock(0));
  client.Answer({});
  EXPECT_EQ(FailToAnswer(client, std::string(64, '0') + "\n"),
            "The service does not prove that it knows the password");
}

TEST(ToyClient, RefusesLegsThatHaveNoPlace) {
  const std::string expected = "The service says something that has no place in a toy negotiation";
  DevSts::ToyClient fresh(Legs(2), kAlice, "secret", DevSts::MakeSystemClock(0));
  EXPECT_EQ(FailToAnswer(fresh, "hello\n"), expected);
  fresh.Answer({});
  EXPECT_EQ(FailToAnswer(fresh, ""), expected);
}

}  // namespace
