// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/http/HttpException.h>
#include <quorlin/SecurityTokenService.h>

#include <gtest/gtest.h>

#include <future>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "quorlin/HttpsClient.h"
#include "support/FakeService.h"
#include "support/RecordingLogSink.h"
#include "support/ServiceAnswers.h"

namespace Quorlin {
namespace {

using TestSupport::AllOperations;
using TestSupport::ChallengeAnswer;
using TestSupport::FakeService;
using TestSupport::FinalAnswer;
using TestSupport::IssueAnswer;
using TestSupport::LogRecording;
using TestSupport::OperationCase;
using TestSupport::SignedToken;

using Lines = std::vector<std::string>;

std::string Line(const std::string& text) {
  return "64 " + text;
}

std::string StartLine(const std::string& operation, const std::string& id = "<id 1>") {
  return Line("opId=" + id + " START operation SecurityTokenServiceImpl::" + operation);
}

std::string EndLine(const std::string& operation, const std::string& id = "<id 1>") {
  return Line("opId=" + id + " END operation SecurityTokenServiceImpl::" + operation);
}

std::string AcquiredLine() {
  return Line(std::string("Successfully acquired token: ") + TestSupport::kValidTokenText);
}

const char* const kSendingLine = "64 SecurityTokenServiceImpl::AcquireToken sending request";
const char* const kProcessingLine = "64 SecurityTokenServiceImpl::AcquireToken processing response";
const char* const kGssWarningLine = "8 GSS contract error: non-empty user leg after negotiation is complete";

// The message of the `Expected` that `call` throws.
template <typename Expected, typename Call>
std::string MessageOf(const Call& call) {
  try {
    call();
  } catch (const Expected& error) {
    EXPECT_EQ(typeid(Expected), typeid(error));
    return error.what();
  }
  return "nothing was thrown";
}

// ---- All operations ----

TEST(SecurityTokenServiceImpl, SendsExactlyWhatTheRequestBuilderMade) {
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    fake.transport->Answer(operation.answer);
    operation.call(fake);
    EXPECT_EQ(Lines({operation.request}), fake.transport->GetSent()) << operation.name;
  }
}

TEST(SecurityTokenServiceImpl, OpensOneSessionPerOperationAndReleasesIt) {
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    fake.transport->Answer(operation.answer);
    operation.call(fake);
    EXPECT_EQ(1, fake.transport->GetCreatedSessions()) << operation.name;
    EXPECT_EQ(0, fake.transport->GetLivingSessions()) << operation.name;
  }
}

TEST(SecurityTokenServiceImpl, KeepsTheSessionWhileItWaits) {
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    int livingSessions = 0;
    fake.transport->SetBeforeAnswer([&] { livingSessions = fake.transport->GetLivingSessions(); });
    fake.transport->Answer(operation.answer);
    operation.call(fake);
    EXPECT_EQ(1, livingSessions) << operation.name;
  }
}

TEST(SecurityTokenServiceImpl, LogsTheWholeStoryOfASuccess) {
  for (const OperationCase& operation : AllOperations()) {
    const std::string name = operation.name;
    Lines expected = {StartLine(name), Line(operation.askedLine)};
    if (name == "AcquireToken") {
      expected.insert(expected.end(), {kSendingLine, kProcessingLine});
    }
    expected.push_back(name == "ValidateSubject" ? Line("Result: true") : AcquiredLine());
    expected.push_back(EndLine(name));

    const FakeService fake;
    fake.transport->Answer(operation.answer);
    const LogRecording log;
    operation.call(fake);
    EXPECT_EQ(expected, log.GetLines()) << name;
  }
}

TEST(SecurityTokenServiceImpl, LogsTheEndWhenTheRequestCannotBeBuilt) {
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    fake.builder->Fail(Pelmar::InvalidArgumentException("Token lifetime must be positive"));
    const LogRecording log;
    EXPECT_EQ("Invalid argument : Token lifetime must be positive",
              MessageOf<Pelmar::InvalidArgumentException>([&] { operation.call(fake); }))
        << operation.name;
    EXPECT_EQ(Lines({StartLine(operation.name), Line(operation.askedLine), EndLine(operation.name)}),
              log.GetLines());
    EXPECT_EQ(Lines(), fake.transport->GetSent()) << operation.name;
  }
}

TEST(SecurityTokenServiceImpl, LogsTheEndWhenTheExchangeFails) {
  for (const OperationCase& operation : AllOperations()) {
    Lines expected = {StartLine(operation.name), Line(operation.askedLine), EndLine(operation.name)};
    if (operation.name == std::string("AcquireToken")) {
      expected.insert(expected.end() - 1, kSendingLine);
    }
    const FakeService fake;
    fake.transport->Fail(CommunicationException("Server returned error: 404 Not Found"));
    const LogRecording log;
    EXPECT_EQ("Server returned error: 404 Not Found",
              MessageOf<CommunicationException>([&] { operation.call(fake); }))
        << operation.name;
    EXPECT_EQ(expected, log.GetLines());
    EXPECT_EQ(0, fake.transport->GetLivingSessions()) << operation.name;
  }
}

TEST(SecurityTokenServiceImpl, LogsTheEndWhenTheServiceRefuses) {
  for (const OperationCase& operation : AllOperations()) {
    Lines expected = {StartLine(operation.name), Line(operation.askedLine), EndLine(operation.name)};
    if (operation.name == std::string("AcquireToken")) {
      expected.insert(expected.end() - 1, {kSendingLine, kProcessingLine});
    }
    const FakeService fake;
    fake.transport->Answer(TestSupport::FaultAnswer("wst:FailedAuthentication", "No"));
    const LogRecording log;
    EXPECT_EQ("Authentication failed: No",
              MessageOf<InvalidCredentialsException>([&] { operation.call(fake); }))
        << operation.name;
    EXPECT_EQ(expected, log.GetLines());
  }
}

TEST(SecurityTokenServiceImpl, LogsTheEndForForeignExceptionsToo) {
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    fake.transport->SetBeforeAnswer([] { throw std::range_error("not of the platform"); });
    const LogRecording log;
    EXPECT_EQ("not of the platform", MessageOf<std::range_error>([&] { operation.call(fake); }))
        << operation.name;
    const Lines lines = log.GetLines();
    EXPECT_EQ(EndLine(operation.name), lines.back());
  }
}

TEST(SecurityTokenServiceImpl, GivesEveryOperationAnIdOfItsOwn) {
  const FakeService fake;
  const LogRecording log;
  Lines expected;
  int number = 0;
  for (const OperationCase& operation : AllOperations()) {
    fake.builder->Fail(Pelmar::InvalidStateException("stop"));
    EXPECT_THROW(operation.call(fake), Pelmar::InvalidStateException);
    const std::string id = "<id " + std::to_string(++number) + ">";
    expected.insert(expected.end(),
                    {StartLine(operation.name, id), Line(operation.askedLine), EndLine(operation.name, id)});
  }
  EXPECT_EQ(expected, log.GetLines());
}

// Whatever happens: the password, the XML and ids of tokens, certificates, audience and advice of a token
// stay out of the log.
TEST(SecurityTokenServiceImpl, LogsNoSecretAtAnyLevel) {
  const LogRecording log;
  for (const OperationCase& operation : AllOperations()) {
    for (const std::string& answer :
         {operation.answer, IssueAnswer(SignedToken("expired")),
          TestSupport::RenewAnswer(SignedToken("tampered")),
          FinalAnswer("ctx", "last", SignedToken("tampered")),
          TestSupport::FaultAnswer("soapenv:Server", "pass-word"), std::string("pass-word <not-xml")}) {
      const FakeService fake;
      fake.handler->Plan("");
      fake.transport->Answer(answer);
      try {
        operation.call(fake);
      } catch (const Pelmar::Exception&) {
        // Only the lines matter here.
      }
    }
  }
  const std::string everything = log.GetEverything();
  ASSERT_NE(std::string::npos, everything.find("Successfully acquired token: "));
  for (const char* secret : {"pass-word", "not-for-logs", "_7f5a64e2", "_0b1c2d3e", "<saml", "Assertion",
                             "xmlns", "MIID", "hello", "last", "ctx"}) {
    EXPECT_EQ(std::string::npos, everything.find(secret)) << secret;
  }
}

TEST(SecurityTokenServiceImpl, BuildsNoDescriptionBelowTheThreshold) {
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    fake.transport->Answer(operation.answer);
    const LogRecording log(Pelmar::Service::kAllLogLevels & ~Pelmar::Service::LOG_INFO);
    operation.call(fake);
    EXPECT_EQ(0, fake.token->reads) << operation.name;
    EXPECT_EQ(Lines(), log.GetLines()) << operation.name;
  }
}

TEST(SecurityTokenServiceImpl, BuildsOneDescriptionForALineThatIsWritten) {
  // Subject, groups, delegation chain, two dates, three flags and the confirmation method.
  constexpr int kReadsPerDescription = 9;
  for (const OperationCase& operation : AllOperations()) {
    const FakeService fake;
    fake.transport->Answer(operation.answer);
    const LogRecording log;
    operation.call(fake);
    const bool isAboutAToken = operation.askedLine.find("SamlToken [") != std::string::npos;
    EXPECT_EQ(isAboutAToken ? kReadsPerDescription : 0, fake.token->reads) << operation.name;
  }
}

TEST(SecurityTokenServiceImpl, MayBeCalledByManyThreadsAtOnce) {
  const FakeService fake;
  constexpr int kThreads = 8;
  constexpr int kCallsPerThread = 4;
  for (int i = 0; i < kThreads * kCallsPerThread; ++i) {
    fake.transport->Answer(TestSupport::ValidateAnswer(true));
  }
  std::vector<std::future<int>> counts;
  for (int i = 0; i < kThreads; ++i) {
    counts.push_back(std::async(std::launch::async, [&fake] {
      int valid = 0;
      for (int call = 0; call < kCallsPerThread; ++call) {
        valid += fake.service->ValidateSubject(*fake.token) ? 1 : 0;
      }
      return valid;
    }));
  }
  for (std::future<int>& count : counts) {
    EXPECT_EQ(kCallsPerThread, count.get());
  }
  EXPECT_EQ(kThreads * kCallsPerThread, fake.transport->GetCreatedSessions());
}

// ---- The returned token ----

TEST(SecurityTokenServiceImpl, ReturnsTheValidatedToken) {
  const FakeService fake;
  fake.transport->Answer(IssueAnswer(SignedToken("valid")));
  const boost::shared_ptr<const SamlToken> token =
      fake.service->AcquireToken("alice", "pass-word", fake.spec);
  EXPECT_EQ("_7f5a64e2", token->GetId());
  EXPECT_EQ(PrincipalId("alice", "example.com"), token->GetSubject());
}

TEST(SecurityTokenServiceImpl, ReportsAnExpiredTokenAsUnusableAnswer) {
  const FakeService fake;
  fake.transport->Answer(IssueAnswer(SignedToken("expired")));
  const LogRecording log;
  EXPECT_EQ("The token has expired at: 2020-01-02T00:00:00Z",
            MessageOf<SsoException>([&] { fake.service->AcquireToken("alice", "pass-word", fake.spec); }));
  EXPECT_EQ(Lines({StartLine("AcquireToken"), Line(AllOperations().front().askedLine), kSendingLine,
                   kProcessingLine, EndLine("AcquireToken")}),
            log.GetLines());
}

TEST(SecurityTokenServiceImpl, ReportsATokenOutsideTheAcceptedSubsetAsUnusableAnswer) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::RenewAnswer("<x/>" + std::string("<Assertion xmlns='urn:x'/>")));
  EXPECT_EQ("Element 'Assertion' has unexpected namespace",
            MessageOf<SsoException>([&] { fake.service->RenewToken(*fake.token, 600); }));
}

TEST(SecurityTokenServiceImpl, PassesSignatureFailuresUnchanged) {
  const FakeService fake;
  fake.transport->Answer(IssueAnswer(SignedToken("tampered")));
  EXPECT_EQ(
      "Failed to verify signature: token might have been tampered with.",
      MessageOf<InvalidSignatureException>([&] { fake.service->AcquireTokenByCertificate(fake.spec); }));
}

// An undeclared prefix in a fault code is the response handler's affair: that ParseException is not
// converted.
TEST(SecurityTokenServiceImpl, ConvertsParseErrorsOfTokensOnly) {
  const FakeService fake;
  fake.transport->Answer(TestSupport::FaultAnswer("x:Server", ""));
  EXPECT_EQ("Element faultcodeat 1,167 uses undefined prefix: `x'",
            MessageOf<ParseException>([&] { fake.service->ValidateSubject(*fake.token); }));
}

TEST(SecurityTokenServiceImpl, ReportsTheVerdictAsItIs) {
  for (const bool verdict : {true, false}) {
    const FakeService fake;
    fake.transport->Answer(TestSupport::ValidateAnswer(verdict));
    const LogRecording log;
    EXPECT_EQ(verdict, fake.service->ValidateSubject(*fake.token));
    EXPECT_EQ(Lines({StartLine("ValidateSubject"),
                     Line(std::string("Validating subject of token ") + TestSupport::kFakeTokenText),
                     verdict ? "64 Result: true" : "64 Result: false", EndLine("ValidateSubject")}),
              log.GetLines());
  }
}

TEST(SecurityTokenServiceImpl, LogsLifetimesAsTheyWereGiven) {
  const FakeService fake;
  fake.builder->Fail(Pelmar::InvalidArgumentException("Token lifetime must be positive"));
  const LogRecording log;
  EXPECT_THROW(fake.service->RenewToken(*fake.token, -9223372036854775807LL - 1),
               Pelmar::InvalidArgumentException);
  EXPECT_EQ(Line(std::string("Renewing token ") + TestSupport::kFakeTokenText +
                 " for -9223372036854775808 more seconds"),
            log.GetLines().at(1));
}

TEST(SecurityTokenServiceImpl, PlaceholdersInUserNamesStayAsTheyAre) {
  const FakeService fake;
  fake.builder->Fail(Pelmar::InvalidStateException("stop"));
  const LogRecording log;
  EXPECT_THROW(fake.service->AcquireToken("%2%1'", "pass-word", fake.spec), Pelmar::InvalidStateException);
  EXPECT_EQ(
      Line(std::string("Requested token for subject `%2%1'', spec `") + TestSupport::kFakeSpecText + "'"),
      log.GetLines().at(1));
}

// ---- Negotiation ----

TEST(SecurityTokenServiceImpl, NegotiatesOverOneSessionUntilTheTokenComes) {
  const FakeService fake;
  fake.handler->Plan("second");
  fake.handler->Plan("third");
  fake.transport->Answer(ChallengeAnswer("ctx-1", "a"));
  fake.transport->Answer(ChallengeAnswer("ctx-2", "b"));
  fake.transport->Answer(FinalAnswer("ctx-3", "", SignedToken("valid")));
  const LogRecording log;
  EXPECT_EQ("_7f5a64e2", fake.service->AcquireTokenByGSS(fake.spec, *fake.handler)->GetId());
  EXPECT_EQ(Lines({std::string("1|InitialSPNego|") + TestSupport::kFakeSpecText + "|hello",
                   "1|ContinuedSPNego|ctx-1|second", "1|ContinuedSPNego|ctx-2|third"}),
            fake.transport->GetSent());
  EXPECT_EQ(Lines({"", "a", "b"}), fake.handler->GetServerLegs());
  EXPECT_EQ(Lines({StartLine("AcquireTokenByGSS"),
                   Line(std::string("Requested token with spec `") + TestSupport::kFakeSpecText + "'"),
                   AcquiredLine(), EndLine("AcquireTokenByGSS")}),
            log.GetLines());
}

TEST(SecurityTokenServiceImpl, AsksTheHandlerOnTheCallersThread) {
  const FakeService fake;
  fake.handler->Plan("second");
  fake.transport->Answer(ChallengeAnswer("ctx", "a"));
  fake.transport->Answer(FinalAnswer("ctx", "", SignedToken("valid")));
  fake.service->AcquireTokenByGSS(fake.spec, *fake.handler);
  EXPECT_EQ(std::vector<std::thread::id>(2, std::this_thread::get_id()), fake.handler->GetThreads());
}

TEST(SecurityTokenServiceImpl, NegotiatesAsManyRoundsAsTheServiceWants) {
  constexpr int kRounds = 300;
  const FakeService fake;
  Lines expected = {std::string("1|InitialSPNego|") + TestSupport::kFakeSpecText + "|hello"};
  for (int i = 0; i < kRounds; ++i) {
    const std::string leg = "leg " + std::to_string(i);
    fake.handler->Plan(leg);
    fake.transport->Answer(ChallengeAnswer("ctx", "challenge"));
    expected.push_back("1|ContinuedSPNego|ctx|" + leg);
  }
  fake.transport->Answer(FinalAnswer("ctx", "", SignedToken("valid")));
  EXPECT_EQ("_7f5a64e2", fake.service->AcquireTokenByGSS(fake.spec, *fake.handler)->GetId());
  EXPECT_EQ(expected, fake.transport->GetSent());
}

struct LastLegCase {
  const char* name;
  void (*plan)(TestSupport::ScriptedNegotiationHandler& handler);
  bool isWarned;
};

// The warning's condition is kept the way operators know it: a missing or empty answer is reported, a
// non-empty one is not.
TEST(SecurityTokenServiceImpl, HandsOnTheLastLegAndWarnsOfAMissingOrEmptyAnswer) {
  const std::vector<LastLegCase> cases = {
      {"null", [](TestSupport::ScriptedNegotiationHandler& handler) { handler.PlanNull(); }, true},
      {"empty", [](TestSupport::ScriptedNegotiationHandler& handler) { handler.Plan(""); }, true},
      {"non-empty", [](TestSupport::ScriptedNegotiationHandler& handler) { handler.Plan("more"); }, false},
  };
  for (const LastLegCase& c : cases) {
    Lines expected = {StartLine("AcquireTokenByGSS"),
                      Line(std::string("Requested token with spec `") + TestSupport::kFakeSpecText + "'"),
                      AcquiredLine(), EndLine("AcquireTokenByGSS")};
    if (c.isWarned) {
      expected.insert(expected.begin() + 2, kGssWarningLine);
    }
    const FakeService fake;
    c.plan(*fake.handler);
    fake.transport->Answer(FinalAnswer("ctx", "last", SignedToken("valid")));
    const LogRecording log;
    EXPECT_EQ("_7f5a64e2", fake.service->AcquireTokenByGSS(fake.spec, *fake.handler)->GetId()) << c.name;
    EXPECT_EQ(expected, log.GetLines()) << c.name;
    EXPECT_EQ(Lines({"", "last"}), fake.handler->GetServerLegs()) << c.name;
    EXPECT_EQ(1u, fake.transport->GetSent().size()) << c.name;
  }
}

TEST(SecurityTokenServiceImpl, WritesTheWarningWhenOnlyWarningsAreEnabled) {
  const FakeService fake;
  fake.handler->Plan("");
  fake.transport->Answer(FinalAnswer("ctx", "last", SignedToken("valid")));
  const LogRecording log(Pelmar::Service::kDefaultLogLevels);
  fake.service->AcquireTokenByGSS(fake.spec, *fake.handler);
  EXPECT_EQ(Lines({kGssWarningLine}), log.GetLines());
}

TEST(SecurityTokenServiceImpl, RefusesAHandlerThatReturnsNoLeg) {
  const FakeService fake;
  TestSupport::ScriptedNegotiationHandler handler;
  handler.PlanNull();
  EXPECT_EQ("Invalid argument : Invalid NegotiationHandler: the returned leg may not be NULL",
            MessageOf<Pelmar::InvalidArgumentException>(
                [&] { fake.service->AcquireTokenByGSS(fake.spec, handler); }));
  EXPECT_EQ(Lines(), fake.transport->GetSent());
}

TEST(SecurityTokenServiceImpl, RefusesAHandlerThatReturnsNoLegLater) {
  const FakeService fake;
  fake.handler->PlanNull();
  fake.transport->Answer(ChallengeAnswer("ctx", "a"));
  EXPECT_EQ("Invalid argument : Invalid NegotiationHandler: the returned leg may not be NULL",
            MessageOf<Pelmar::InvalidArgumentException>(
                [&] { fake.service->AcquireTokenByGSS(fake.spec, *fake.handler); }));
  EXPECT_EQ(1u, fake.transport->GetSent().size());
}

TEST(SecurityTokenServiceImpl, RefusesAnAnswerWithAnEmptyContextId) {
  for (const std::string& answer : {ChallengeAnswer("", "a"), FinalAnswer("", "", SignedToken("valid"))}) {
    const FakeService fake;
    fake.transport->Answer(answer);
    EXPECT_EQ("Error processing the response to SPNego token request: no Context ID was returned.",
              MessageOf<CommunicationException>(
                  [&] { fake.service->AcquireTokenByGSS(fake.spec, *fake.handler); }));
    EXPECT_EQ(0, fake.transport->GetLivingSessions());
  }
}

TEST(SecurityTokenServiceImpl, RefusesALaterAnswerWithAnEmptyContextId) {
  const FakeService fake;
  fake.handler->Plan("second");
  fake.transport->Answer(ChallengeAnswer("ctx", "a"));
  fake.transport->Answer(ChallengeAnswer("", "b"));
  EXPECT_EQ(
      "Error processing the response to SPNego token request: no Context ID was returned.",
      MessageOf<CommunicationException>([&] { fake.service->AcquireTokenByGSS(fake.spec, *fake.handler); }));
}

TEST(SecurityTokenServiceImpl, PassesTheHandlersExceptionsUnchanged) {
  class ThrowingHandler final : public NegotiationHandler {
   public:
    boost::shared_ptr<Leg> Negotiate(const Leg&) override {
      throw Pelmar::InvalidStateException("no ticket");
    }
  };
  const FakeService fake;
  ThrowingHandler handler;
  const LogRecording log;
  EXPECT_EQ("no ticket", MessageOf<Pelmar::InvalidStateException>(
                             [&] { fake.service->AcquireTokenByGSS(fake.spec, handler); }));
  EXPECT_EQ(EndLine("AcquireTokenByGSS"), log.GetLines().back());
}

class SecurityTokenServiceImplDeathTest : public testing::Test {
 protected:
  // Other tests leave pool threads behind: a plain fork would copy locks in whatever state.
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(SecurityTokenServiceImplDeathTest, AbortsForAnEmptyFirstLeg) {
  const FakeService fake;
  TestSupport::ScriptedNegotiationHandler handler;
  handler.Plan("");
  EXPECT_DEATH(fake.service->AcquireTokenByGSS(fake.spec, handler),
               "^Verify failed: !leg\\.empty\\(\\) \\(lib/quorlin/SecurityTokenServiceImpl\\)\n$");
}

TEST_F(SecurityTokenServiceImplDeathTest, AbortsForAnEmptyLaterLeg) {
  const FakeService fake;
  fake.handler->Plan("");
  fake.transport->Answer(ChallengeAnswer("ctx", "a"));
  EXPECT_DEATH(fake.service->AcquireTokenByGSS(fake.spec, *fake.handler),
               "^Verify failed: !leg\\.empty\\(\\) \\(lib/quorlin/SecurityTokenServiceImpl\\)\n$");
}

// ---- The factory ----

SecurityTokenServiceConfig ConfigFor(const std::string& url) {
  SecurityTokenServiceConfig config;
  config.stsUrl = url;
  return config;
}

TEST(CreateSecurityTokenService, AcceptsAConfigurationOfAnUrlOnly) {
  EXPECT_TRUE(CreateSecurityTokenService(ConfigFor("http://localhost:1/sts")));
}

TEST(CreateSecurityTokenService, RefusesHttpsWithoutAnSslContext) {
  EXPECT_EQ("Invalid argument : HTTPS connection requested but no SSLContext provided.",
            MessageOf<Pelmar::InvalidArgumentException>(
                [] { CreateSecurityTokenService(ConfigFor("https://localhost/sts")); }));
}

TEST(CreateSecurityTokenService, PassesTheUrlParsersExceptions) {
  EXPECT_THROW(CreateSecurityTokenService(ConfigFor("ftp://localhost/")), Pelmar::Http::HttpException);
}

TEST(CreateSecurityTokenService, FindsArgumentErrorsBeforeAnythingIsSent) {
  // Nothing listens at port 1: an attempt to send would be a CommunicationException.
  const boost::shared_ptr<SecurityTokenService> service =
      CreateSecurityTokenService(ConfigFor("http://localhost:1/"));
  const TestSupport::CountingSamlToken token;
  TokenSpec spec;
  EXPECT_EQ("Invalid argument : Token lifetime must be positive",
            MessageOf<Pelmar::InvalidArgumentException>([&] { service->AcquireToken("a", "b", spec); }));
  spec.tokenLifetimeSec = 300;
  EXPECT_EQ("No HolderOfKeyConfig provided. Unable to acquire token by certificate",
            MessageOf<Pelmar::InvalidStateException>([&] { service->AcquireTokenByCertificate(spec); }));
  EXPECT_EQ("No HolderOfKeyConfig provided. Unable to acquire token by token",
            MessageOf<Pelmar::InvalidStateException>([&] { service->AcquireTokenByToken(token, spec); }));
  EXPECT_EQ("No HolderOfKeyConfig provided. Unable to renew token",
            MessageOf<Pelmar::InvalidStateException>([&] { service->RenewToken(token, 300); }));
}

TEST(CreateSecurityTokenService, WaitsFourMinutesForAnAnswer) {
  EXPECT_EQ(240000000, kServiceTimeoutMicroseconds);
}

}  // namespace
}  // namespace Quorlin
