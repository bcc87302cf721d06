// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The system has no thread to give: an exception, and the next call works when it has one again.

#include "torture/HostFaults.h"

#include "support/CompletionProbe.h"
#include "support/FakeSamlToken.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/ServiceAnswers.h"
#include "support/Verdict.h"

#include <quorlin/quorlin.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using namespace Torture;

std::unique_ptr<LoopbackServer> StartServer() {
  const ServerScope scope;
  return std::make_unique<LoopbackServer>(
      std::vector<LoopbackServer::Script>{AnswerEach({HttpAnswer("200 OK", ValidateAnswer(true))})});
}

boost::shared_ptr<SecurityTokenService> Connect(const LoopbackServer& server) {
  SecurityTokenServiceConfig config;
  config.stsUrl = "http://" + server.GetEndpoint() + "/sts";
  return CreateSecurityTokenService(config);
}

std::string ValidateBlocking(const SecurityTokenService& service) {
  return VerdictOf([&] { EXPECT_TRUE(service.ValidateSubject(FakeSamlToken())); });
}

/// Each in a process of its own, as threads that were started stay.
class ThreadFailuresDeathTest : public testing::Test {
 public:
  ThreadFailuresDeathTest() { testing::FLAGS_gtest_death_test_style = "threadsafe"; }
};

[[noreturn]] void LeaveWith(bool isGood) {
  std::exit(isGood && !testing::Test::HasFailure() ? 0 : 1);
}

TEST_F(ThreadFailuresDeathTest, OfTheHttpLoopAreToldAndTheNextCallWorks) {
  EXPECT_EXIT(
      {
        const std::unique_ptr<LoopbackServer> server = StartServer();
        const boost::shared_ptr<SecurityTokenService> service = Connect(*server);
        FailThreadStart(1, Extent::ALL_FROM_THEN);
        const std::string failure = ValidateBlocking(*service);
        const bool hasFailed = StopFailingThreadStarts();
        EXPECT_EQ(failure,
                  "Pelmar::Http::HttpException: The HTTP client cannot start a thread: Resource temporarily "
                  "unavailable");
        LeaveWith(hasFailed && ValidateBlocking(*service) == "accepted");
      },
      testing::ExitedWithCode(0), "");
}

TEST_F(ThreadFailuresDeathTest, OfThePoolAreToldAndTheNextCallWorks) {
  EXPECT_EXIT(
      {
        const std::unique_ptr<LoopbackServer> server = StartServer();
        const boost::shared_ptr<SecurityTokenService> service = Connect(*server);
        const boost::shared_ptr<const SamlToken> token = boost::make_shared<FakeSamlToken>();
        FailThreadStart(1, Extent::ALL_FROM_THEN);
        const std::string failure = VerdictOf([&] {
          service->ValidateSubjectAsync(token, [](const boost::optional<bool>&, const Pelmar::Exception*) {});
        });
        const bool hasFailed = StopFailingThreadStarts();
        EXPECT_EQ(failure, "Pelmar::Exception: Unable to start a thread: Resource temporarily unavailable");
        CompletionProbe<boost::optional<bool>> probe;
        service->ValidateSubjectAsync(token, probe.GetFunction());
        const auto calls = probe.Wait();
        LeaveWith(hasFailed && calls.size() == 1 && calls[0].value == true);
      },
      testing::ExitedWithCode(0), "");
}

// The loop runs; its completion functors wait for a thread of the pool, but nobody who waits for the answer
// does.
TEST_F(ThreadFailuresDeathTest, OfThePoolDoNotHoldUpABlockingCall) {
  EXPECT_EXIT(
      {
        const std::unique_ptr<LoopbackServer> server = StartServer();
        FailThreadStart(2, Extent::ALL_FROM_THEN);
        const std::string outcome = ValidateBlocking(*Connect(*server));
        LeaveWith(outcome == "accepted" && StopFailingThreadStarts());
      },
      testing::ExitedWithCode(0), "");
}

}  // namespace
}  // namespace Quorlin
