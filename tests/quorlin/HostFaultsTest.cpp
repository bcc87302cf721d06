// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the host and its system may do to the library: no descriptors left, a fork, signals all the time, an
// end of the process in the midst of operations.

#include "support/CompletionProbe.h"
#include "support/FakeSamlToken.h"
#include "support/HttpScripts.h"
#include "support/LoopbackServer.h"
#include "support/ServiceAnswers.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <quorlin/quorlin.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <sys/resource.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;

boost::shared_ptr<SecurityTokenService> Connect(const LoopbackServer& server) {
  SecurityTokenServiceConfig config;
  config.stsUrl = "http://" + server.GetEndpoint() + "/sts";
  return CreateSecurityTokenService(config);
}

LoopbackServer::Script AnswerValid() {
  return AnswerEach({HttpAnswer("200 OK", ValidateAnswer(true))});
}

std::string Validate(const SecurityTokenService& service) {
  return VerdictOf([&] { EXPECT_TRUE(service.ValidateSubject(FakeSamlToken())); });
}

/// Also for a process of its own, whose failures nobody prints: what stands on standard error is shown.
void Compare(const std::string& actual, const std::string& expected) {
  EXPECT_EQ(actual, expected);
  if (actual != expected) {
    std::fprintf(stderr, "actual:   %s\nexpected: %s\n", actual.c_str(), expected.c_str());
  }
}

/// While it lives, no descriptor with this number or a higher one is given.
class DescriptorLimit final {
 public:
  explicit DescriptorLimit(rlim_t limit) {
    getrlimit(RLIMIT_NOFILE, &_before);
    rlimit lower = _before;
    lower.rlim_cur = limit;
    setrlimit(RLIMIT_NOFILE, &lower);
  }
  DescriptorLimit(const DescriptorLimit&) = delete;
  DescriptorLimit& operator=(const DescriptorLimit&) = delete;
  ~DescriptorLimit() { setrlimit(RLIMIT_NOFILE, &_before); }

 private:
  rlimit _before;
};

#if defined(__SANITIZE_THREAD__) || defined(__SANITIZE_ADDRESS__)
/// The processes of these tests end, on purpose, with threads at work, or as the forked children of such
/// ones. The sanitizers read what to make of that when a process starts.
void AllowEndingsWithThreads(const char* variable, const char* option) {
  const char* const options = std::getenv(variable);
  const std::string before = options == nullptr ? "" : std::string(options) + ":";
  setenv(variable, (before + option).c_str(), 1);
}
#endif

/// Each in a process of its own.
class HostFaultsDeathTest : public testing::Test {
 public:
  HostFaultsDeathTest() {
    testing::FLAGS_gtest_death_test_style = "threadsafe";
#if defined(__SANITIZE_THREAD__)
    AllowEndingsWithThreads("TSAN_OPTIONS", "report_thread_leaks=0");
#elif defined(__SANITIZE_ADDRESS__)
    AllowEndingsWithThreads("ASAN_OPTIONS", "detect_leaks=0");
#endif
  }
};

[[noreturn]] void Leave() {
  std::exit(testing::Test::HasFailure() ? 1 : 0);
}

#if !defined(__SANITIZE_ADDRESS__)  // The check of virtual calls that comes with it needs a pipe for each.
TEST_F(HostFaultsDeathTest, WithoutDescriptorsTheClientDoesNotStartAndThenItDoes) {
  EXPECT_EXIT(
      {
        const LoopbackServer server({AnswerValid()});
        const boost::shared_ptr<SecurityTokenService> service = Connect(server);
        {
          const DescriptorLimit none(0);
          EXPECT_EQ(
              Validate(*service),
              "Pelmar::Http::HttpException: The HTTP client cannot start: the system gives no descriptors");
        }
        Compare(Validate(*service), "accepted");
        Leave();
      },
      testing::ExitedWithCode(0), "");
}

TEST_F(HostFaultsDeathTest, WithoutDescriptorsARequestFailsAndTheNextWorks) {
  EXPECT_EXIT(
      {
        const LoopbackServer server({AnswerValid()});
        const boost::shared_ptr<SecurityTokenService> service = Connect(server);
        Compare(Validate(*service), "accepted");
        {
          const DescriptorLimit none(0);
          Compare(Validate(*service),
                  "Quorlin::CommunicationException: No connection to " + server.GetEndpoint());
        }
        Compare(Validate(*service), "accepted");
        Leave();
      },
      testing::ExitedWithCode(0), "");
}
#endif

// --- Fork ---

const char* const kRefusedInChild =
    "Pelmar::Http::HttpException: The HTTP client was started before this process was forked, and works in the parent "
    "only";
const char* const kPoolRefusedInChild =
    "Pelmar::Exception: The thread pool was started before this process was forked, and works in the parent only";

/// What a child does that is forked here: its exit code.
int RunInFork(const std::function<void()>& action) {
  const pid_t child = fork();
  if (child == 0) {
    action();
    std::exit(testing::Test::HasFailure() ? 1 : 0);
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

TEST_F(HostFaultsDeathTest, AChildForkedAfterTheFirstOperationIsRefusedReadsTokensAndEnds) {
  EXPECT_EXIT(
      {
        const std::string token = SignToken(TokenText());
        const LoopbackServer server({AnswerValid()});
        boost::shared_ptr<SecurityTokenService> service = Connect(server);
        CompletionProbe<boost::optional<bool>> probe;
        service->ValidateSubjectAsync(boost::make_shared<FakeSamlToken>(), probe.GetFunction());
        EXPECT_EQ(probe.Wait().size(), 1u);
        EXPECT_EQ(RunInFork([&] {
                    Compare(Validate(*service), kRefusedInChild);
                    Compare(VerdictOf([&] {
                              service->ValidateSubjectAsync(
                                  boost::make_shared<FakeSamlToken>(),
                                  [](const boost::optional<bool>&, const Pelmar::Exception*) {});
                            }),
                            kPoolRefusedInChild);
                    Compare(VerdictOnToken(token), "accepted");
                    service.reset();
                  }),
                  0);
        Compare(Validate(*service), "accepted");
        Leave();
      },
      testing::ExitedWithCode(0), "");
}

#if !defined(__SANITIZE_THREAD__)  // Which allows no threads in a child of a process that has some.
TEST_F(HostFaultsDeathTest, AChildForkedBeforeTheFirstOperationWorks) {
  EXPECT_EXIT(
      {
        // The server's threads stay with the parent, which waits for the child.
        const LoopbackServer server({AnswerValid()});
        const boost::shared_ptr<SecurityTokenService> service = Connect(server);
        EXPECT_EQ(RunInFork([&] { Compare(Validate(*service), "accepted"); }), 0);
        Compare(Validate(*service), "accepted");
        Leave();
      },
      testing::ExitedWithCode(0), "");
}
#endif

// --- Signals ---

std::atomic<int> signalsSeen{0};

void CountSignal(int) {
  ++signalsSeen;
}

/// Interrupts system calls of the process's threads all the time, and restarts none.
class SignalStorm final {
 public:
  SignalStorm() {
    struct sigaction action = {};
    action.sa_handler = CountSignal;
    sigaction(SIGALRM, &action, &_before);
    const itimerval often = {{0, kMicrosecondsBetween}, {0, kMicrosecondsBetween}};
    setitimer(ITIMER_REAL, &often, nullptr);
  }
  SignalStorm(const SignalStorm&) = delete;
  SignalStorm& operator=(const SignalStorm&) = delete;
  ~SignalStorm() {
    const itimerval never = {};
    setitimer(ITIMER_REAL, &never, nullptr);
    sigaction(SIGALRM, &_before, nullptr);
  }

 private:
  static constexpr suseconds_t kMicrosecondsBetween = 500;
  struct sigaction _before;
};

/// The same mask for the threads that are started meanwhile: the server of the test is not what is tested.
class AlarmBlock final {
 public:
  AlarmBlock() {
    sigset_t alarm;
    sigemptyset(&alarm);
    sigaddset(&alarm, SIGALRM);
    pthread_sigmask(SIG_BLOCK, &alarm, &_before);
  }
  AlarmBlock(const AlarmBlock&) = delete;
  AlarmBlock& operator=(const AlarmBlock&) = delete;
  ~AlarmBlock() { pthread_sigmask(SIG_SETMASK, &_before, nullptr); }

 private:
  sigset_t _before;
};

TEST(HostFaults, SignalsAllTheTimeDisturbNoOperation) {
  constexpr int kOperations = 50;
  std::unique_ptr<LoopbackServer> server;
  {
    const AlarmBlock block;
    server = std::make_unique<LoopbackServer>(std::vector<LoopbackServer::Script>{AnswerValid()});
  }
  const boost::shared_ptr<SecurityTokenService> service = Connect(*server);
  {
    const SignalStorm storm;
    for (int i = 0; i < kOperations || signalsSeen < kOperations; ++i) {
      ASSERT_EQ(Validate(*service), "accepted");
    }
  }
  const AlarmBlock block;
  server.reset();
}

// A server that goes while a request is being written: the default action of SIGPIPE would end the process.
TEST_F(HostFaultsDeathTest, ABrokenConnectionRaisesNoSigpipe) {
  EXPECT_EXIT(
      {
        std::signal(SIGPIPE, SIG_DFL);
        const LoopbackServer server({[](ServerConnection& connection) {
          connection.ReadSome();
          connection.Reset();
        }});
        const std::string xml = "<a>" + std::string(4 * 1024 * 1024, 'x') + "</a>";
        const FakeSamlToken large("_large", xml, SamlToken::CONFIRM_BEARER);
        const std::string failure = VerdictOf([&] { Connect(server)->ValidateSubject(large); });
        Compare(failure, "Quorlin::CommunicationException: " + server.GetEndpoint() +
                             " reset the connection before it answered");
        Leave();
      },
      testing::ExitedWithCode(0), "");
}

// --- Exit ---

TEST_F(HostFaultsDeathTest, TheProcessEndsWhileOperationsAreBusy) {
  EXPECT_EXIT(
      {
        constexpr std::size_t kOperations = 8;
        // Never destroyed: it holds the connections to the very end.
        auto* const server = new LoopbackServer({StaySilent});
        const boost::shared_ptr<SecurityTokenService> service = Connect(*server);
        for (std::size_t i = 0; i < kOperations; ++i) {
          service->ValidateSubjectAsync(boost::make_shared<FakeSamlToken>(),
                                        [](const boost::optional<bool>&, const Pelmar::Exception*) {});
        }
        server->AwaitRequests(kOperations);
        std::exit(0);
      },
      testing::ExitedWithCode(0), "");
}

}  // namespace
}  // namespace Quorlin
