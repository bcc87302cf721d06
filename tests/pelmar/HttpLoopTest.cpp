// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The HTTP thread: what it does when the thread pool is exhausted, and when the process ends under it.

#include "pelmar/http/HttpLoop.h"

#include "support/HttpCalls.h"
#include "support/LoopbackServer.h"

#include <pelmar/http/Client.h>
#include <pelmar/system/ThreadPool.h>

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <future>
#include <memory>
#include <stdexcept>
#include <string>

namespace {

using namespace TestSupport;
using namespace Pelmar::Http;
using Pelmar::Ref;

Ref<Exchange> MakeExchange(int port) {
  const Ref<const ConnectionSpecImpl> spec =
      ToConnectionSpecImpl(CreateTCPConnectionSpec("127.0.0.1", port).Get());
  const AgentParts agent{~0ULL, spec, Pelmar::MakeRef<CookieStoreImpl>(),
                         std::make_shared<const AgentOptions>(ClientOptions())};
  return Exchange::Create(agent, RequestParts{METHOD_GET, "/", {}, {}},
                          [](const Pelmar::Exception*, ClientResponse*, PendingRequestItem*) {});
}

TEST(HttpLoop, TriesAgainWhenThePoolTakesNothing) {
  int refusals = 0;
  HttpLoop loop([&](const boost::function<void()>& work) {
    if (++refusals <= 2) {
      throw std::runtime_error("no thread");
    }
    work();
  });
  const ClosedPort port;
  const Ref<Exchange> exchange = MakeExchange(port.GetPort());
  loop.Submit(exchange);
  EXPECT_TRUE(exchange->Wait(-1));
  std::promise<void> delivered;
  Work work;
  work.emplace_back([&] { delivered.set_value(); });
  loop.Deliver(std::move(work));
  delivered.get_future().wait();
  EXPECT_EQ(3, refusals);
}

TEST(HttpLoop, StartsNothingThatWasCancelledBefore) {
  LoopbackServer server({[](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 0\r\nConnection: close\r\n\r\n");
    connection.Close();
  }});
  HttpLoop loop([](const boost::function<void()>& work) { work(); });
  const Ref<Exchange> cancelled = MakeExchange(server.GetPort());
  cancelled->Cancel();
  loop.Submit(cancelled);
  const Ref<Exchange> next = MakeExchange(server.GetPort());
  loop.Submit(next);
  EXPECT_TRUE(next->Wait(-1));
  EXPECT_EQ("200 OK|", Describe(*next->GetResult()));
  EXPECT_EQ(1U, server.CountConnections());
  EXPECT_THROW(cancelled->GetResult(), HttpException);
}

TEST(HttpLoop, EndsWhatIsPendingWhenShutDown) {
  LoopbackServer server({[](ServerConnection& connection) {
    connection.AwaitPeerEnd();
  }});
  HttpLoop loop([](const boost::function<void()>& work) { work(); });
  const Ref<Exchange> running = MakeExchange(server.GetPort());
  loop.Submit(running);
  server.AwaitConnections(1);
  loop.Shutdown();
  const Ref<Exchange> late = MakeExchange(server.GetPort());
  loop.Submit(late);
  for (const Ref<Exchange>& exchange : {running, late}) {
    try {
      exchange->GetResult();
      FAIL() << "a result";
    } catch (const Pelmar::Exception& e) {
      EXPECT_EQ("HttpException: Request was cancelled: the process ends", DescribeFailure(e));
    }
  }
  server.AwaitEnd(0);
}

// --- The end of the process, each in a process of its own ---

// Static, so that the servers are there before the loop and go after it.
LoopbackServer& GetSilentServer() {
  static LoopbackServer server({[](ServerConnection& connection) {
    connection.ReadRequest();
    connection.AwaitPeerEnd();
  }});
  return server;
}

void Ignore(const Pelmar::Exception*, ClientResponse*, PendingRequestItem*) {}

void ExitWithARequestPending() {
  LoopbackServer& server = GetSilentServer();
  Ref<PendingRequestItem> item;
  MakeAgent(server.GetPort())->SendAsync(MakeGet("/"), Ignore, item);
  server.AwaitRequests(1);
  std::exit(0);
}

void ExitWithAThreadWaiting() {
  LoopbackServer& server = GetSilentServer();
  Pelmar::System::GetThreadPool()->Queue([&server] {
    const std::string outcome = Call(*MakeAgent(server.GetPort()), MakeGet("/"));
    std::fprintf(stderr, "[%s]", outcome.c_str());
  });
  server.AwaitRequests(1);
  std::exit(0);
}

void SendLate() {
  const std::string outcome = Call(*MakeAgent(1), MakeGet("/"));
  std::fprintf(stderr, "[%s]", outcome.c_str());
}

void ExitAndSendAfterwards() {
  // Registered before the loop exists, so called after it has been shut down.
  std::atexit(SendLate);
  const ClosedPort port;
  Call(*MakeAgent(port.GetPort()), MakeGet("/"));
  std::exit(0);
}

void ExitWithAUserAgentInAStaticObject() {
  static LoopbackServer server({[](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n");
    connection.AwaitPeerEnd();
  }});
  static const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  std::fprintf(stderr, "[%s]", Call(*agent, MakeGet("/")).c_str());
  std::exit(0);
}

class HttpLoopDeathTest : public testing::Test {
 protected:
  HttpLoopDeathTest() { testing::FLAGS_gtest_death_test_style = "threadsafe"; }
};

TEST_F(HttpLoopDeathTest, ProcessEndsWithARequestPending) {
  EXPECT_EXIT(ExitWithARequestPending(), testing::ExitedWithCode(0), "^$");
}

TEST_F(HttpLoopDeathTest, ProcessEndsWithAThreadWaiting) {
  EXPECT_EXIT(ExitWithAThreadWaiting(), testing::ExitedWithCode(0),
              "^\\[HttpException: Request was cancelled: the process ends\\]$");
}

TEST_F(HttpLoopDeathTest, RefusesRequestsAfterTheEnd) {
  EXPECT_EXIT(ExitAndSendAfterwards(), testing::ExitedWithCode(0),
              "^\\[HttpException: Request was cancelled: the process ends\\]$");
}

TEST_F(HttpLoopDeathTest, UserAgentMayOutliveTheLoop) {
  EXPECT_EXIT(ExitWithAUserAgentInAStaticObject(), testing::ExitedWithCode(0), "^\\[200 OK\\|\\]$");
}

}  // namespace
