// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Peers that misbehave, time-outs, cancelling, and many requests at once.

#include "support/HttpCalls.h"
#include "support/LoopbackServer.h"

#include <pelmar/http/Client.h>
#include <pelmar/http/HttpException.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace TestSupport;
using namespace Pelmar::Http;
using Pelmar::Ref;

const std::string kHello = "HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhello";

/// Short enough to wait for.
constexpr long long kSoon = 50 * 1000;

std::string Replace(std::string text, const std::string& what, const std::string& by) {
  const std::size_t start = text.find(what);
  return start == std::string::npos ? text : text.replace(start, what.size(), by);
}

/// What a call gets from a server with this script; its address is given as "PEER".
std::string CallOnce(const LoopbackServer::Script& script, long long timeoutMicroseconds = kPatience) {
  LoopbackServer server({script});
  const std::string outcome =
      Call(*MakeAgent(server.GetPort()), MakePost("/", "question"), timeoutMicroseconds);
  return Replace(outcome, server.GetEndpoint(), "PEER");
}

/// Reads the request, sends the text, and closes.
LoopbackServer::Script SendAndClose(const std::string& text) {
  return [text](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send(text);
    connection.Close();
  };
}

LoopbackServer::Script SendAndStaySilent(const std::string& text) {
  return [text](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send(text);
    connection.AwaitPeerEnd();
  };
}

// --- Connections that fail ---

TEST(HttpFaults, TellsThatNobodyListens) {
  const ClosedPort port;
  EXPECT_EQ("HttpException: Connection refused by 127.0.0.1:" + std::to_string(port.GetPort()),
            Call(*MakeAgent(port.GetPort()), MakeGet("/")));
}

TEST(HttpFaults, TellsThatAHostIsUnknown) {
  // RFC 6761, section 6.4: this name exists nowhere.
  const Ref<UserAgent> agent = MakeAgent(CreateTCPConnectionSpec("sts.invalid", 443));
  EXPECT_EQ("HttpException: Host sts.invalid was not found", Call(*agent, MakeGet("/")));
}

TEST(HttpFaults, TellsOfIPv6AddressesInBrackets) {
  const ClosedPort port;
  const std::string outcome = Call(*MakeAgent(CreateTCPConnectionSpec("::1", port.GetPort())), MakeGet("/"));
  const std::string endpoint = "[::1]:" + std::to_string(port.GetPort());
  // Where there is no IPv6 the system refuses before the peer can.
  if (outcome != "HttpException: No connection to " + endpoint + ": Cannot assign requested address") {
    EXPECT_EQ("HttpException: Connection refused by " + endpoint, outcome);
  }
}

TEST(HttpFaults, TellsOfClosedConnections) {
  const std::string end = "HttpException: PEER closed the connection ";
  const struct {
    std::string sent;
    std::string outcome;
  } cases[] = {
      {"", end + "before it answered"},
      {"HTTP/1.1 200 OK\r\n", end + "inside the headers of its answer"},
      {"HTTP/1.1 200 OK\r\nContent-Length: 5\r\n", end + "inside the headers of its answer"},
      {"HTTP/1.1 200 OK\r\nContent-Length: 5\r\nX-", end + "inside the headers of its answer"},
      {"HTTP/1.1 100 Continue\r\n\r\n", end + "inside the headers of its answer"},
      {"HTTP/1.1 199 Last\r\n\r\n", end + "inside the headers of its answer"},
      {"HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\n", end + "inside the body of its answer"},
      {"HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhell", end + "inside the body of its answer"},
      {"HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n5\r\nhel",
       end + "inside the body of its answer"},
      {"HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n5\r\nhello\r\n",
       end + "inside the body of its answer"},
      {"HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n5\r\nhello\r\n0\r\n",
       end + "inside the body of its answer"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(c.outcome, CallOnce(SendAndClose(c.sent))) << c.sent;
  }
}

LoopbackServer::Script SendAndReset(const std::string& text) {
  return [text](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send(text);
    connection.Reset();
  };
}

TEST(HttpFaults, TellsOfResetBeforeTheAnswer) {
  EXPECT_EQ("HttpException: PEER reset the connection before it answered", CallOnce(SendAndReset("")));
}

// A reset discards what the kernel still holds back. That Send has returned shows that all but the last few
// megabytes, and with them the headers, have been read.
TEST(HttpFaults, TellsOfResetInsideTheBody) {
  const std::string outcome = CallOnce([](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 16000000\r\n\r\n" + std::string(15000000, 'x'));
    connection.Reset();
  });
  EXPECT_EQ("HttpException: PEER reset the connection inside the body of its answer", outcome);
}

// --- Answers that are none ---

TEST(HttpFaults, RefusesWhatIsNotHttp1) {
  const std::string refusal = "HttpException: PEER did not answer in HTTP/1";
  for (const std::string& sent : {
           std::string("\x00\x01\x02\xff\xfe rubbish\n\n", 15),
           std::string("220 mail.example.org ESMTP\r\n"),
           std::string("<html>hello</html>\r\n\r\n"),
           std::string("HTTP/2 200 OK\r\nContent-Length: 0\r\n\r\n"),
           std::string("HTTP/3 200\r\n\r\n"),
           std::string("HTTP/1.1 20 OK\r\nContent-Length: 0\r\n\r\n"),
           std::string("HTTP/1.1 2000 OK\r\nContent-Length: 0\r\n\r\n"),
           std::string("HTTP/1.1 -20 OK\r\nContent-Length: 0\r\n\r\n"),
           std::string("HTTP/9.9 200 OK\r\nContent-Length: 0\r\n\r\n"),
           std::string("HTTP/1.1 200 OK\r\nContent-Length: -5\r\n\r\n"),
           std::string("HTTP/1.1 200 OK\r\nContent-Length: five\r\n\r\n"),
           std::string("HTTP/1.1 101 Switching Protocols\r\nUpgrade: h2c\r\n\r\nmore"),
       }) {
    EXPECT_EQ(refusal, CallOnce(SendAndClose(sent))) << sent;
  }
}

/// The other protocol may have nothing to say for as long as we wait.
TEST(HttpFaults, RefusesASwitchToAnotherProtocolAtOnce) {
  EXPECT_EQ(
      "HttpException: PEER did not answer in HTTP/1",
      CallOnce(SendAndStaySilent("HTTP/1.1 101 Switching Protocols\r\nUpgrade: h2c\r\n\r\nHTTP/1.1 200 OK\r\n"
                                 "Content-Length: 5\r\n\r\nhello")));
}

TEST(HttpFaults, RefusesBrokenChunks) {
  const std::string head = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n";
  const std::string refusal = "HttpException: PEER answered in broken chunks";
  for (const std::string& body : {
           std::string("xyz\r\n"),
           std::string("5\r\nhello5\r\n"),
           std::string("-1\r\n"),
           std::string("fffffffffffffffff\r\n"),
           std::string("\r\n\r\n"),
       }) {
    EXPECT_EQ(refusal, CallOnce(SendAndClose(head + body))) << body;
  }
}

TEST(HttpFaults, RefusesCodingsThatWereNotAskedFor) {
  EXPECT_EQ("HttpException: PEER answered 200 OK with a content coding, though it was asked for none",
            CallOnce(SendAndClose(
                "HTTP/1.1 200 OK\r\ncontent-encoding:gzip\r\nContent-Length: 3\r\n\r\n\x1f\x8b\x08")));
  EXPECT_EQ("HttpException: PEER answered 503 with a content coding, though it was asked for none",
            CallOnce(SendAndClose("HTTP/1.1 503\r\nContent-Encoding: br\r\nContent-Length: 0\r\n\r\n")));
  EXPECT_EQ("HttpException: PEER answered 200 OK with a transfer coding other than chunked",
            CallOnce(SendAndClose("HTTP/1.1 200 OK\r\nTransfer-Encoding: gzip, chunked\r\n\r\n0\r\n\r\n")));
}

// What different readers on the way could take for different messages.
TEST(HttpFaults, RefusesAnswersWithTwoReadings) {
  const std::string malformed = "HttpException: PEER answered 200 OK with a malformed header line";
  const std::string unclear = "HttpException: PEER answered 200 OK without a clear length of its body";
  const std::string coding = "HttpException: PEER answered 200 OK with a transfer coding other than chunked";
  const std::string chunks = "5\r\nhello\r\n0\r\n\r\n";
  const struct {
    std::string headers;
    std::string body;
    std::string outcome;
  } cases[] = {
      {"Content-Length: 5\r\nContent-Length: 3\r\n", "hello", unclear},
      {"Content-Length: 3\r\nContent-Length: 5\r\n", "hello", unclear},
      {"Content-Length: 5\r\nContent-Length: 5\r\n", "hello", unclear},
      {"Content-Length: 5, 3\r\n", "hello", unclear},
      {"Content-Length: +5\r\n", "hello", unclear},
      {"Content-Length: 5\r\nTransfer-Encoding: chunked\r\n", chunks, unclear},
      {"Transfer-Encoding: chunked\r\nContent-Length: 5\r\n", chunks, unclear},
      {"Transfer-Encoding: chunked\r\nTransfer-Encoding: chunked\r\n", chunks, coding},
      {"Transfer-Encoding: chunked, identity\r\n", chunks, coding},
      {"Transfer-Encoding : chunked\r\n", chunks, malformed},
      {"Content-Length : 5\r\n", "hello", malformed},
      {"X-Folded: a\r\n Content-Length: 5\r\n", "hello", malformed},
      {"X-Folded: a\r\n\tb\r\nContent-Length: 5\r\n", "hello", malformed},
      {"Content-Length: 5\r\n(no name): a\r\n", "hello", malformed},
      {"Content-Length: 5\r\nX: a\rb\r\n", "hello", malformed},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(c.outcome, CallOnce(SendAndClose("HTTP/1.1 200 OK\r\n" + c.headers + "\r\n" + c.body)))
        << c.headers;
  }
  EXPECT_EQ(coding, CallOnce(SendAndClose("HTTP/1.0 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n" + chunks)));
}

// By the standard there is none, and the bytes would be taken for the start of the next answer.
TEST(HttpFaults, RefusesABodyThatMayNotBe) {
  const std::string refusal =
      "HttpException: PEER answered 204 No Content without a clear length of its body";
  EXPECT_EQ(refusal, CallOnce(SendAndClose("HTTP/1.1 204 No Content\r\nContent-Length: 2\r\n\r\nhi")));
  EXPECT_EQ(refusal,
            CallOnce(SendAndClose(
                "HTTP/1.1 204 No Content\r\nTransfer-Encoding: chunked\r\n\r\n2\r\nhi\r\n0\r\n\r\n")));
}

TEST(HttpFaults, RefusesHeaderLinesThatTheEngineCannotRead) {
  EXPECT_EQ("HttpException: PEER did not answer in HTTP/1",
            CallOnce(SendAndClose("HTTP/1.1 200 OK\r\nContent-Length: 5\r\nno colon\r\n\r\nhello")));
  EXPECT_EQ(
      "HttpException: PEER did not answer in HTTP/1",
      CallOnce(SendAndClose(std::string("HTTP/1.1 200 OK\r\nX: a\0b\r\nContent-Length: 0\r\n\r\n", 46))));
}

// --- Answers without measure ---

TEST(HttpFaults, BoundsTheBody) {
  const std::string refusal = "HttpException: The body of the answer of PEER has more than 16777216 bytes";
  EXPECT_EQ(refusal, CallOnce([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Send("HTTP/1.1 200 OK\r\n\r\n");
              connection.SendForever(std::string(65536, 'x'));
            }));
  EXPECT_EQ(refusal, CallOnce([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Send("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n");
              connection.SendForever("8000\r\n" + std::string(0x8000, 'x') + "\r\n");
            }));
  EXPECT_EQ(refusal, CallOnce(SendAndStaySilent("HTTP/1.1 200 OK\r\nContent-Length: 16777217\r\n\r\n")));
}

TEST(HttpFaults, TakesABodyAsLargeAsTheBound) {
  const std::string body(kMaxResponseBytes, 'x');
  EXPECT_EQ("200 OK|" + body, CallOnce(SendAndClose("HTTP/1.1 200 OK\r\n\r\n" + body)));
}

TEST(HttpFaults, BoundsTheHeaders) {
  const std::string refusal = "HttpException: The headers of the answer of PEER have more than 262144 bytes";
  EXPECT_EQ(refusal, CallOnce([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Send("HTTP/1.1 200 OK\r\n");
              connection.SendForever("X-Header: " + std::string(1000, 'x') + "\r\n");
            }));
  EXPECT_EQ(refusal, CallOnce([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.SendForever("HTTP/1.1 100 Continue\r\n\r\n");
            }));
  EXPECT_EQ(refusal, CallOnce([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Send("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n");
              connection.SendForever("X-Trailer: " + std::string(1000, 'x') + "\r\n");
            }));
}

TEST(HttpFaults, BoundsASingleHeader) {
  EXPECT_EQ("HttpException: A header of the answer of PEER is too long",
            CallOnce([](ServerConnection& connection) {
              connection.ReadRequest();
              connection.Send("HTTP/1.1 200 ");
              connection.SendForever(std::string(1000, 'x'));
            }));
}

TEST(HttpFaults, TakesAHugeReasonWithinTheHeaderBound) {
  const std::string reason(90000, 'r');
  EXPECT_EQ("404 " + reason + "|",
            CallOnce(SendAndClose("HTTP/1.1 404 " + reason + "\r\nContent-Length: 0\r\n\r\n")));
}

// --- Silence ---

TEST(HttpFaults, GivesUpOnAPeerThatDoesNotAccept) {
  const FullListener listener;
  EXPECT_EQ("HttpTimeoutException: No answer from 127.0.0.1:" + std::to_string(listener.GetPort()) +
                " within 0.05 s",
            Call(*MakeAgent(listener.GetPort()), MakeGet("/"), kSoon));
}

TEST(HttpFaults, GivesUpOnAPeerThatFallsSilent) {
  for (const char* const sent : {
           "",
           "HT",
           "HTTP/1.1 100 Continue\r\n\r\n",
           "HTTP/1.1 200 OK\r\nContent-Length: 5\r\n",
           "HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhell",
           "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n5\r\nhello\r\n",
           "HTTP/1.1 200 OK\r\n\r\nuntil the end",
       }) {
    EXPECT_EQ("HttpTimeoutException: No answer from PEER within 0.05 s",
              CallOnce(SendAndStaySilent(sent), kSoon))
        << sent;
  }
}

TEST(HttpFaults, ClosesTheConnectionOfARequestGivenUp) {
  LoopbackServer server({SendAndStaySilent("HTTP/1.1 200 OK\r\n"), SendAndClose(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  EXPECT_EQ("HttpTimeoutException: No answer from " + server.GetEndpoint() + " within 0.05 s",
            Call(*agent, MakeGet("/"), kSoon));
  server.AwaitEnd(0);
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/")));
}

TEST(HttpFaults, TellsTheTimeoutInSeconds) {
  const FullListener listener;
  const struct {
    long long timeout;
    std::string text;
  } cases[] = {{0, "0"}, {-1, "0"}, {1, "0.000001"}, {1000, "0.001"}, {10200, "0.0102"}};
  for (const auto& c : cases) {
    EXPECT_EQ("HttpTimeoutException: No answer from 127.0.0.1:" + std::to_string(listener.GetPort()) +
                  " within " + c.text + " s",
              Call(*MakeAgent(listener.GetPort()), MakeGet("/"), c.timeout));
  }
}

TEST(HttpFaults, TellsTheFunctorOfATimeout) {
  LoopbackServer server({SendAndStaySilent("")});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  const std::string outcome =
      "HttpTimeoutException: No answer from " + server.GetEndpoint() + " within 0.05 s";
  EXPECT_EQ(outcome, Await(*agent, item, kSoon));
  EXPECT_EQ(std::vector<std::string>{outcome}, completions.AwaitOutcomes(1));
}

TEST(HttpFaults, WaitsWithoutEndWhenTheTimeIsHuge) {
  LoopbackServer server({SendAndClose(kHello)});
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(server.GetPort()), MakeGet("/"), 0x7fffffffffffffffLL));
}

// --- Completion ---

TEST(HttpAsync, CompletesOnceOnAnotherThread) {
  LoopbackServer server({SendAndClose(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  EXPECT_EQ(std::vector<std::string>{"200 OK|hello"}, completions.AwaitOutcomes(1));
  EXPECT_NE(std::this_thread::get_id(), completions.GetThreads()[0]);
  EXPECT_TRUE(item->Wait(-1));
}

TEST(HttpAsync, CompletesWithTheErrorOfTheExchange) {
  const ClosedPort port;
  const Ref<UserAgent> agent = MakeAgent(port.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  EXPECT_EQ(std::vector<std::string>{"HttpException: Connection refused by 127.0.0.1:" +
                                     std::to_string(port.GetPort())},
            completions.AwaitOutcomes(1));
}

TEST(HttpAsync, WaitTellsWhetherTheItemIsDone) {
  LoopbackServer server({[](ServerConnection& connection) {
    connection.ReadRequest();
    connection.AwaitRelease();
    connection.Send(kHello);
    connection.AwaitPeerEnd();
  }});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  EXPECT_FALSE(item->Wait(0));
  EXPECT_FALSE(item->Wait(kSoon));
  server.Release();
  EXPECT_TRUE(item->Wait(-1));
  EXPECT_TRUE(item->Wait(0));
  completions.AwaitOutcomes(1);
}

TEST(HttpAsync, MayWaitForOtherRequestsInAFunctor) {
  LoopbackServer server({SendAndClose(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(
      MakeGet("/1"),
      [&](const Pelmar::Exception* error, ClientResponse* response, PendingRequestItem* done) {
        EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/2")));
        completions.GetFunctor()(error, response, done);
      },
      item);
  EXPECT_EQ(std::vector<std::string>{"200 OK|hello"}, completions.AwaitOutcomes(1));
}

TEST(HttpAsync, KeepsTheResponseAsLongAsItIsHeld) {
  LoopbackServer server({SendAndClose(kHello)});
  Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  completions.AwaitOutcomes(1);
  Ref<ClientResponse> response;
  agent->WaitFor(item, kPatience, response);
  item = nullptr;
  agent = nullptr;
  EXPECT_EQ(200, response->GetStatusCode());
  EXPECT_EQ("OK", response->GetReason());
  EXPECT_EQ("", ReadAll(*response)) << "the functor has read it";
}

TEST(HttpAsync, SurvivesAFunctorThatThrows) {
  LoopbackServer server({SendAndClose(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Ref<PendingRequestItem> item;
  agent->SendAsync(
      MakeGet("/"),
      [](const Pelmar::Exception*, ClientResponse*, PendingRequestItem*) {
        throw HttpException("thrown by a test");
      },
      item);
  EXPECT_EQ("200 OK|hello", Await(*agent, item));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/")));
}

TEST(HttpAsync, GoesOnWhenUserAgentAndItemAreReleased) {
  LoopbackServer server({[](ServerConnection& connection) {
    connection.ReadRequest();
    connection.AwaitRelease();
    connection.Send(kHello);
    connection.AwaitPeerEnd();
  }});
  Completions completions;
  {
    Ref<PendingRequestItem> item;
    MakeAgent(server.GetPort())->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  }
  server.AwaitRequests(1);
  server.Release();
  EXPECT_EQ(std::vector<std::string>{"200 OK|hello"}, completions.AwaitOutcomes(1));
  server.AwaitEnd(0);
}

TEST(HttpAsync, ReleasesTheFunctorAfterTheCall) {
  LoopbackServer server({SendAndClose(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  std::mutex mutex;
  std::condition_variable released;
  bool isReleased = false;
  Ref<PendingRequestItem> item;
  {
    const std::shared_ptr<int> owned(new int(0), [&](int* value) {
      delete value;
      const std::lock_guard<std::mutex> lock(mutex);
      isReleased = true;
      released.notify_all();
    });
    agent->SendAsync(
        MakeGet("/"), [owned](const Pelmar::Exception*, ClientResponse*, PendingRequestItem*) {}, item);
  }
  std::unique_lock<std::mutex> lock(mutex);
  released.wait(lock, [&] { return isReleased; });
}

// --- Cancelling ---

const std::vector<std::string> kCancelled = {"HttpException: Request was cancelled"};

TEST(HttpCancel, EndsARequestThatConnects) {
  const FullListener listener;
  const Ref<UserAgent> agent = MakeAgent(listener.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  item->Cancel();
  EXPECT_EQ(kCancelled[0], Await(*agent, item));
  EXPECT_EQ(kCancelled, completions.AwaitOutcomes(1));
}

TEST(HttpCancel, EndsARequestThatAwaitsItsAnswerAndItsConnection) {
  LoopbackServer server({SendAndStaySilent("")});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  server.AwaitRequests(1);
  item->Cancel();
  EXPECT_EQ(kCancelled, completions.AwaitOutcomes(1));
  server.AwaitEnd(0);
}

TEST(HttpCancel, EndsARequestThatReadsItsAnswer) {
  LoopbackServer server({[](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhell");
    connection.AwaitRelease();
    connection.AwaitPeerEnd();
  }});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  server.AwaitRequests(1);
  item->Cancel();
  server.Release();
  EXPECT_EQ(kCancelled, completions.AwaitOutcomes(1));
  server.AwaitEnd(0);
}

TEST(HttpCancel, DoesNothingAfterCompletion) {
  LoopbackServer server({SendAndClose(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  EXPECT_EQ(std::vector<std::string>{"200 OK|hello"}, completions.AwaitOutcomes(1));
  item->Cancel();
  item->Cancel();
  Ref<ClientResponse> response;
  agent->WaitFor(item, 0, response);
  EXPECT_EQ(200, response->GetStatusCode());
  EXPECT_EQ(1U, completions.AwaitOutcomes(1).size());
}

TEST(HttpCancel, WakesAWaitingThread) {
  LoopbackServer server({SendAndStaySilent("")});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  std::thread canceller([&] {
    server.AwaitRequests(1);
    item->Cancel();
  });
  EXPECT_EQ(kCancelled[0], Await(*agent, item));
  canceller.join();
  completions.AwaitOutcomes(1);
}

TEST(HttpCancel, LeavesTheUserAgentUsable) {
  LoopbackServer server({SendAndStaySilent(""), SendAndClose(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  server.AwaitRequests(1);
  item->Cancel();
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/")));
  completions.AwaitOutcomes(1);
}

// --- Many at once ---

constexpr std::size_t kMany = 200;

LoopbackServer::Script AnswerWhenReleased() {
  return [](ServerConnection& connection) {
    connection.ReadRequest();
    connection.AwaitRelease();
    connection.Send(kHello);
    connection.AwaitPeerEnd();
  };
}

TEST(HttpMany, TwoHundredRequestsOfOneUserAgentArePendingAtOnce) {
  LoopbackServer server({AnswerWhenReleased()});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  std::vector<Ref<PendingRequestItem>> items(kMany);
  for (Ref<PendingRequestItem>& item : items) {
    agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  }
  server.AwaitRequests(kMany);
  server.Release();
  EXPECT_EQ(std::vector<std::string>(kMany, "200 OK|hello"), completions.AwaitOutcomes(kMany));
}

TEST(HttpMany, TwoHundredUserAgentsArePendingAtOnce) {
  LoopbackServer server({AnswerWhenReleased()});
  const Ref<ConnectionSpec> spec = CreateTCPConnectionSpec("127.0.0.1", server.GetPort());
  Completions completions;
  for (std::size_t i = 0; i < kMany; ++i) {
    Ref<PendingRequestItem> item;
    MakeAgent(spec)->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  }
  server.AwaitRequests(kMany);
  server.Release();
  EXPECT_EQ(std::vector<std::string>(kMany, "200 OK|hello"), completions.AwaitOutcomes(kMany));
}

TEST(HttpMany, CancelsRaceWithAnswers) {
  LoopbackServer server({SendAndClose(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Completions completions;
  std::vector<Ref<PendingRequestItem>> items(kMany);
  for (Ref<PendingRequestItem>& item : items) {
    agent->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  }
  for (const Ref<PendingRequestItem>& item : items) {
    item->Cancel();
  }
  const std::vector<std::string> outcomes = completions.AwaitOutcomes(kMany);
  EXPECT_EQ(kMany, outcomes.size());
  EXPECT_TRUE(std::all_of(outcomes.begin(), outcomes.end(), [](const std::string& outcome) {
    return outcome == "200 OK|hello" || outcome == kCancelled[0];
  }));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/")));
}

TEST(HttpMany, ThreadsShareAUserAgent) {
  LoopbackServer server({[](ServerConnection& connection) {
    for (;;) {
      connection.ReadRequest();
      connection.Send(kHello);
    }
  }});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  std::vector<std::thread> threads;
  for (int i = 0; i < 8; ++i) {
    threads.emplace_back([&] {
      for (int j = 0; j < 20; ++j) {
        EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "x")));
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

}  // namespace
