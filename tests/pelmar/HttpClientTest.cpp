// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Requests and answers over plain TCP, with peers that behave.

#include "support/HttpCalls.h"
#include "support/LoopbackServer.h"
#include "support/TemporaryDirectory.h"

#include <pelmar/Exception.h>
#include <pelmar/http/Client.h>
#include <pelmar/http/ClientOptions.h>

#include <gtest/gtest.h>

#include <cstdlib>
#include <future>
#include <string>
#include <vector>

namespace {

using namespace TestSupport;
using namespace Pelmar::Http;
using Pelmar::InvalidArgumentException;
using Pelmar::InvalidStateException;
using Pelmar::Ref;

/// Answers every request on a connection with the same bytes.
LoopbackServer::Script AnswerAll(const std::string& answer) {
  return [answer](ServerConnection& connection) {
    for (;;) {
      connection.ReadRequest();
      connection.Send(answer);
    }
  };
}

/// Answers the requests with one text each, then waits for the peer to go.
LoopbackServer::Script AnswerInTurn(const std::vector<std::string>& answers) {
  return [answers](ServerConnection& connection) {
    for (const std::string& answer : answers) {
      connection.ReadRequest();
      connection.Send(answer);
    }
    connection.AwaitPeerEnd();
  };
}

/// The answer, then the end of the connection.
LoopbackServer::Script AnswerAndClose(const std::string& answer) {
  return [answer](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send(answer);
    connection.Close();
  };
}

const std::string kHello = "HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nhello";

/// What a call gets from a server with this script.
std::string CallOnce(const LoopbackServer::Script& script) {
  LoopbackServer server({script});
  return Call(*MakeAgent(server.GetPort()), MakePost("/", "question"));
}

// --- The request on the wire ---

TEST(HttpClient, SendsPostAsWritten) {
  LoopbackServer server({AnswerAll(kHello)});
  const Ref<ClientRequest> request = MakePost("/a/../b%20c//d?x=%7e", "the ");
  request->SetHeader("Content-Type", "text/xml");
  request->SetHeader("SOAPAction", "\"urn:do\"");
  request->GetBodyWriter()->Write("body\0!", 6);
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(server.GetPort()), request));
  EXPECT_EQ("POST /a/../b%20c//d?x=%7e HTTP/1.1\r\nHost: " + server.GetEndpoint() +
                "\r\nAccept-Encoding: identity\r\nContent-Type: text/xml\r\nSOAPAction: \"urn:do\"\r\n"
                "Content-Length: 10\r\n\r\nthe body" +
                std::string("\0!", 2),
            server.GetRecord(0).received);
}

TEST(HttpClient, SendsGetWithoutBody) {
  LoopbackServer server({AnswerAll(kHello)});
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(server.GetPort()), MakeGet("/")));
  EXPECT_EQ("GET / HTTP/1.1\r\nHost: " + server.GetEndpoint() + "\r\nAccept-Encoding: identity\r\n\r\n",
            server.GetRecord(0).received);
}

TEST(HttpClient, SendsEmptyBodyAndEmptyHeaderValues) {
  LoopbackServer server({AnswerAll(kHello)});
  const Ref<ClientRequest> request = MakePost("/", "");
  request->SetHeader("X-Empty", "");
  request->SetHeader("X-Twice", "1");
  request->SetHeader("X-Twice", "2");
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(server.GetPort()), request));
  EXPECT_EQ("POST / HTTP/1.1\r\nHost: " + server.GetEndpoint() +
                "\r\nAccept-Encoding: identity\r\nX-Empty:\r\n"
                "X-Twice: 1\r\nX-Twice: 2\r\nContent-Length: 0\r\n\r\n",
            server.GetRecord(0).received);
}

TEST(HttpClient, SendsLargeBodyWithoutAskingFirst) {
  LoopbackServer server({AnswerAll(kHello)});
  const std::string body(3 * 1024 * 1024, 'b');
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(server.GetPort()), MakePost("/", body)));
  EXPECT_EQ("POST / HTTP/1.1\r\nHost: " + server.GetEndpoint() +
                "\r\nAccept-Encoding: identity\r\nContent-Length: 3145728\r\n\r\n" + body,
            server.GetRecord(0).received);
}

TEST(HttpClient, SendsCallersAcceptHeader) {
  LoopbackServer server({AnswerAll(kHello)});
  const Ref<ClientRequest> request = MakeGet("/");
  request->SetHeader("Accept", "text/xml");
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(server.GetPort()), request));
  EXPECT_EQ("GET / HTTP/1.1\r\nHost: " + server.GetEndpoint() +
                "\r\nAccept-Encoding: identity\r\nAccept: text/xml\r\n\r\n",
            server.GetRecord(0).received);
}

// --- What callers must not do ---

template <typename Action>
std::string CatchArgumentRefusal(Action action) {
  try {
    action();
  } catch (const InvalidArgumentException& e) {
    return e.what();
  }
  return "accepted";
}

TEST(HttpClient, RefusesBadHeaders) {
  const std::string badName =
      "Invalid argument : the header name is empty or has a character that is not allowed";
  const std::string badValue =
      "Invalid argument : the value of the header X-A has a control character or is not ASCII";
  const struct {
    std::string name;
    std::string value;
    std::string refusal;
  } cases[] = {
      {"", "v", badName},
      {"X A", "v", badName},
      {"X-A:", "v", badName},
      {"X-A\r\nX-B", "v", badName},
      {std::string("X\0", 2), "v", badName},
      {"X-\xc3\xbc", "v", badName},
      {"X-A", "v\r\nX-B: w", badValue},
      {"X-A", "v\n", badValue},
      {"X-A", std::string("v\0w", 3), badValue},
      {"X-A", "v\tw", badValue},
      {"X-A", "\x7f", badValue},
      {"X-A", "\xc3\xbc", badValue},
      {"Host", "other", "Invalid argument : the header host is set by the HTTP client alone"},
      {"CONTENT-LENGTH", "1", "Invalid argument : the header content-length is set by the HTTP client alone"},
      {"Transfer-Encoding", "chunked",
       "Invalid argument : the header transfer-encoding is set by the HTTP client alone"},
      {"Expect", "100-continue", "Invalid argument : the header expect is set by the HTTP client alone"},
      {"Connection", "close", "Invalid argument : the header connection is set by the HTTP client alone"},
      {"Cookie", "a=b", "Invalid argument : the header cookie is set by the HTTP client alone"},
      {"Accept-Encoding", "gzip",
       "Invalid argument : the header accept-encoding is set by the HTTP client alone"},
      {"Upgrade", "h2c", "Invalid argument : the header upgrade is set by the HTTP client alone"},
      {"TE", "trailers", "Invalid argument : the header te is set by the HTTP client alone"},
      {"Trailer", "X", "Invalid argument : the header trailer is set by the HTTP client alone"},
      {"Keep-Alive", "1", "Invalid argument : the header keep-alive is set by the HTTP client alone"},
      {"Proxy-Connection", "close",
       "Invalid argument : the header proxy-connection is set by the HTTP client alone"},
  };
  const Ref<ClientRequest> request = MakeGet("/");
  for (const auto& c : cases) {
    EXPECT_EQ(c.refusal, CatchArgumentRefusal([&] { request->SetHeader(c.name, c.value); })) << c.name;
  }
}

TEST(HttpClient, RefusesBadPaths) {
  EXPECT_EQ("Invalid argument : the path does not start with a slash",
            CatchArgumentRefusal([] { MakeGet(""); }));
  EXPECT_EQ("Invalid argument : the path does not start with a slash",
            CatchArgumentRefusal([] { MakeGet("a"); }));
  EXPECT_EQ("Invalid argument : the path has a character that is not allowed",
            CatchArgumentRefusal([] { MakeGet("/ HTTP/1.1\r\nX: y"); }));
  EXPECT_EQ("Invalid argument : the path has a character that is not allowed",
            CatchArgumentRefusal([] { MakeGet("/a#b"); }));
  EXPECT_EQ("Invalid argument : the path has more than 8192 bytes",
            CatchArgumentRefusal([] { MakeGet("/" + std::string(8192, 'a')); }));
}

TEST(HttpClient, RefusesBadConnectionSpecs) {
  EXPECT_EQ("Invalid argument : the host is empty",
            CatchArgumentRefusal([] { CreateTCPConnectionSpec("", 80); }));
  EXPECT_EQ("Invalid argument : the host has a character that is not allowed",
            CatchArgumentRefusal([] { CreateTCPConnectionSpec("a/b", 80); }));
  EXPECT_EQ("Invalid argument : the port is not from 1 to 65535",
            CatchArgumentRefusal([] { CreateTCPConnectionSpec("a", 0); }));
  EXPECT_EQ("Invalid argument : the port is not from 1 to 65535",
            CatchArgumentRefusal([] { CreateTCPConnectionSpec("a", 65536); }));
  EXPECT_NO_THROW(CreateTCPConnectionSpec("a", 1));
  EXPECT_NO_THROW(CreateTCPConnectionSpec("a", 65535));
}

TEST(HttpClient, RefusesCookieFiles) {
  EXPECT_EQ("Invalid argument : cookies are kept in memory only, so the file name must be empty",
            CatchArgumentRefusal([] { CreateCookieStore("cookies.txt"); }));
}

TEST(HttpClient, RefusesMissingParts) {
  const Ref<ConnectionSpec> spec = CreateTCPConnectionSpec("127.0.0.1", 1);
  EXPECT_EQ("Invalid argument : the connection spec is null or was not made by this platform",
            CatchArgumentRefusal([] { CreateHttpUserAgent(nullptr, CreateCookieStore(""), nullptr); }));
  EXPECT_EQ("Invalid argument : the cookie store is null or was not made by this platform",
            CatchArgumentRefusal([&] { CreateHttpUserAgent(spec, nullptr, nullptr); }));
  class Pool final : public ConnectionPool {};
  EXPECT_EQ("Invalid argument : there are no connection pools, so the pool must be null",
            CatchArgumentRefusal(
                [&] { CreateHttpUserAgent(spec, CreateCookieStore(""), Pelmar::MakeRef<Pool>()); }));
  const Ref<UserAgent> agent = MakeAgent(spec);
  Ref<PendingRequestItem> item;
  Ref<ClientResponse> response;
  EXPECT_EQ("Invalid argument : the request is null or was not made by this platform",
            CatchArgumentRefusal([&] { agent->SendAsync(nullptr, Completions().GetFunctor(), item); }));
  EXPECT_EQ("Invalid argument : the completion functor is empty",
            CatchArgumentRefusal([&] { agent->SendAsync(MakeGet("/"), CompletionFunctor(), item); }));
  EXPECT_EQ("Invalid argument : the pending item is null or was not made by this user agent",
            CatchArgumentRefusal([&] { agent->WaitFor(nullptr, 0, response); }));
}

TEST(HttpClient, RefusesGetWithBody) {
  const Ref<UserAgent> agent = MakeAgent(1);
  const Ref<ClientRequest> request = MakeGet("/");
  request->GetBodyWriter()->Write("x", 1);
  Ref<PendingRequestItem> item;
  EXPECT_EQ("Invalid argument : a GET request has no body",
            CatchArgumentRefusal([&] { agent->SendAsync(request, Completions().GetFunctor(), item); }));
}

TEST(HttpClient, SendsARequestOnlyOnce) {
  LoopbackServer server({AnswerAll(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  const Ref<ClientRequest> request = MakeGet("/");
  EXPECT_EQ("200 OK|hello", Call(*agent, request));
  try {
    Call(*agent, request);
    FAIL() << "sent twice";
  } catch (const InvalidStateException& e) {
    EXPECT_STREQ("The request has been sent already", e.what());
  }
}

TEST(HttpClient, RefusesToWaitForAnothersRequest) {
  LoopbackServer server({AnswerAll(kHello)});
  const Ref<UserAgent> sender = MakeAgent(server.GetPort());
  const Ref<UserAgent> other = MakeAgent(server.GetPort());
  Completions completions;
  Ref<PendingRequestItem> item;
  sender->SendAsync(MakeGet("/"), completions.GetFunctor(), item);
  Ref<ClientResponse> response;
  EXPECT_EQ("Invalid argument : the pending item is null or was not made by this user agent",
            CatchArgumentRefusal([&] { other->WaitFor(item, kPatience, response); }));
  completions.AwaitOutcomes(1);
}

// --- Answers ---

TEST(HttpClient, TakesStatusReasonAndBody) {
  const struct {
    std::string answer;
    std::string outcome;
  } cases[] = {
      {"HTTP/1.1 200 OK\r\nContent-Length: 2\r\n\r\nhi", "200 OK|hi"},
      {"HTTP/1.1 200\r\nContent-Length: 2\r\n\r\nhi", "200 |hi"},
      {"HTTP/1.1 200 \r\nContent-Length: 2\r\n\r\nhi", "200 |hi"},
      {"HTTP/1.1 299 Odd but fine\r\nContent-Length: 2\r\n\r\nhi", "299 Odd but fine|hi"},
      {"HTTP/1.1 204 No Content\r\n\r\n", "204 No Content|"},
      {"HTTP/1.1 204 No Content\r\nContent-Length: 0\r\n\r\n", "204 No Content|"},
      {"HTTP/1.1 300 Multiple Choices\r\nContent-Length: 0\r\n\r\n", "300 Multiple Choices|"},
      {"HTTP/1.1 302 Found\r\nLocation: http://127.0.0.1:1/\r\nContent-Length: 0\r\n\r\n", "302 Found|"},
      {"HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: Basic realm=\"x\"\r\nContent-Length: 2\r\n\r\nno",
       "401 Unauthorized|no"},
      {"HTTP/1.1 404 Not Found\r\nContent-Length: 0\r\n\r\n", "404 Not Found|"},
      {"HTTP/1.1 500 Internal Server Error\r\nContent-Length: 5\r\n\r\nfault",
       "500 Internal Server Error|fault"},
      {"HTTP/1.1 503 Service Unavailable\r\nContent-Length: 6\r\n\r\n<html>",
       "503 Service Unavailable|<html>"},
      {"HTTP/1.1 599 Strange\r\nContent-Length: 0\r\n\r\n", "599 Strange|"},
      {"HTTP/1.1 200 A\x1b[31mB\x7f\r\nContent-Length: 0\r\n\r\n", "200 A?[31mB?|"},
      {"HTTP/1.1 200 OK\r\nContent-Encoding: identity\r\nContent-Length: 2\r\n\r\nhi", "200 OK|hi"},
      // RFC 9112, section 2.2: a line feed alone may be taken for a line's end.
      {"HTTP/1.1 200 OK\nContent-Length: 2\n\nhi", "200 OK|hi"},
      {"HTTP/1.1 200 OK\r\nContent-Length: 2\n\r\nhi", "200 OK|hi"},
      {"HTTP/1.0 200 OK\r\n\r\nuntil the end", "200 OK|until the end"},
      {"HTTP/1.1 200 OK\r\n\r\nuntil the end", "200 OK|until the end"},
      {"HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n3\r\none\r\n4;x=y\r\n two\r\n0\r\n\r\n",
       "200 OK|one two"},
      {"HTTP/1.1 200 OK\r\nTransfer-Encoding: Chunked\r\n\r\n1\r\na\r\n0\r\nX-Trailer: t\r\n\r\n",
       "200 OK|a"},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(c.outcome, CallOnce(AnswerAndClose(c.answer))) << c.answer;
  }
}

/// "name=value" for each of the names that the answer has; "name" for each that it lacks.
std::string CallForHeaders(const std::string& answer, const std::vector<std::string>& names) {
  LoopbackServer server({AnswerAndClose(answer)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  Ref<PendingRequestItem> item;
  agent->SendAsync(
      MakeGet("/"), [](const Pelmar::Exception*, ClientResponse*, PendingRequestItem*) {}, item);
  Ref<ClientResponse> response;
  agent->WaitFor(item, kPatience, response);
  std::string text;
  for (const std::string& name : names) {
    std::string value = "unchanged";
    text += name + (response->GetHeader(name, value) ? "=" : " not there, value ") + value + "\n";
  }
  return text;
}

TEST(HttpClient, GivesTheHeadersOfTheFinalResponse) {
  EXPECT_EQ(
      "date=today\nX-A=1, 2\nx-empty=\nX-Interim not there, value unchanged\nX-Trailer not there, value "
      "unchanged\n",
      CallForHeaders("HTTP/1.1 103 Early Hints\r\nX-Interim: 1\r\nX-A: 0\r\n\r\n"
                     "HTTP/1.1 200 OK\r\nDate:  today \r\nX-A: 1\r\nx-a: 2\r\nX-Empty:\r\n"
                     "Transfer-Encoding: chunked\r\n\r\n0\r\nX-Trailer: 1\r\n\r\n",
                     {"date", "X-A", "x-empty", "X-Interim", "X-Trailer"}));
}

TEST(HttpClient, PassesOverInterimResponses) {
  EXPECT_EQ("200 OK|hello", CallOnce(AnswerAndClose("HTTP/1.1 100 Continue\r\n\r\n" + kHello)));
  EXPECT_EQ("200 OK|hello",
            CallOnce(AnswerAndClose("HTTP/1.1 102 Processing\r\nContent-Encoding: gzip\r\n\r\n"
                                    "HTTP/1.1 103 Early Hints\r\nLink: <x>\r\n\r\n" +
                                    kHello)));
}

TEST(HttpClient, TakesAnswerInSingleBytes) {
  const std::string answer =
      "HTTP/1.1 100 Continue\r\n\r\n"
      "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n3\r\none\r\n0\r\n\r\n";
  EXPECT_EQ("200 OK|one", CallOnce([&](ServerConnection& connection) {
              connection.ReadRequest();
              for (const char byte : answer) {
                connection.Send(std::string(1, byte));
              }
              connection.Close();
            }));
}

TEST(HttpClient, TakesAnswerGivenBeforeTheRequestIsRead) {
  EXPECT_EQ("413 Too Large|", CallOnce([](ServerConnection& connection) {
              connection.ReadSome();
              connection.Send("HTTP/1.1 413 Too Large\r\nContent-Length: 0\r\nConnection: close\r\n\r\n");
              connection.Close();
            }));
}

TEST(HttpClient, TakesAnswerSentBeforeAnythingIsRead) {
  EXPECT_EQ("200 OK|hello", CallOnce([](ServerConnection& connection) {
              connection.Send("HTTP/1.1 200 OK\r\nContent-Length: 5\r\nConnection: close\r\n\r\nhello");
              connection.ReadRequest();
              connection.Close();
            }));
}

TEST(HttpClient, DropsWhatFollowsTheAnnouncedBodyWithItsConnection) {
  LoopbackServer server(
      {AnswerInTurn({kHello + "HTTP/1.1 200 Smuggled\r\nContent-Length: 0\r\n\r\n"}), AnswerAll(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/1")));
  server.AwaitEnd(0);
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/2")));
  EXPECT_EQ(2U, server.CountConnections());
}

TEST(HttpClient, FollowsNoRedirect) {
  LoopbackServer target({AnswerAll(kHello)});
  LoopbackServer server({AnswerAll("HTTP/1.1 307 Temporary Redirect\r\nLocation: http://" +
                                   target.GetEndpoint() + "/\r\nContent-Length: 0\r\n\r\n")});
  EXPECT_EQ("307 Temporary Redirect|", Call(*MakeAgent(server.GetPort()), MakePost("/", "secret")));
  EXPECT_EQ(0U, target.CountConnections());
}

TEST(HttpClient, UsesNoProxyFromTheEnvironment) {
  LoopbackServer proxy({AnswerAll(kHello)});
  LoopbackServer server({AnswerAll("HTTP/1.1 200 Direct\r\nContent-Length: 0\r\n\r\n")});
  const std::string address = "http://" + proxy.GetEndpoint();
  const char* const names[] = {"http_proxy",  "HTTP_PROXY", "https_proxy",
                               "HTTPS_PROXY", "all_proxy",  "ALL_PROXY"};
  for (const char* const name : names) {
    ::setenv(name, address.c_str(), 1);
  }
  EXPECT_EQ("200 Direct|", Call(*MakeAgent(server.GetPort()), MakeGet("/")));
  for (const char* const name : names) {
    ::unsetenv(name);
  }
  EXPECT_EQ(0U, proxy.CountConnections());
}

TEST(HttpClient, UsesNoCredentialsOfTheHomeDirectory) {
  LoopbackServer server({AnswerAll(kHello)});
  const TemporaryDirectory home;
  const std::string file =
      home.WriteFile(".netrc", "machine 127.0.0.1 login x password y\ndefault login x password y\n");
  home.WriteFile("_netrc", "default login x password y\n");
  home.WriteFile(".curlrc", "user = x:y\n");
  const char* const before = std::getenv("HOME");
  const std::string oldHome = before == nullptr ? "" : before;
  ::setenv("HOME", home.GetPath().c_str(), 1);
  ::setenv("CURL_HOME", home.GetPath().c_str(), 1);
  ::setenv("NETRC", file.c_str(), 1);
  EXPECT_EQ("200 OK|hello", Call(*MakeAgent(server.GetPort()), MakeGet("/")));
  ::setenv("HOME", oldHome.c_str(), 1);
  ::unsetenv("CURL_HOME");
  ::unsetenv("NETRC");
  EXPECT_EQ("GET / HTTP/1.1\r\nHost: " + server.GetEndpoint() + "\r\nAccept-Encoding: identity\r\n\r\n",
            server.GetRecord(0).received);
}

// --- Connections ---

TEST(HttpClient, KeepsItsConnectionBetweenRequests) {
  LoopbackServer server({AnswerAll(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "leg")));
  }
  EXPECT_EQ(1U, server.CountConnections());
}

TEST(HttpClient, SharesNoConnectionBetweenUserAgents) {
  LoopbackServer server({AnswerAll(kHello)});
  const Ref<ConnectionSpec> spec = CreateTCPConnectionSpec("127.0.0.1", server.GetPort());
  const Ref<UserAgent> first = MakeAgent(spec);
  const Ref<UserAgent> second = MakeAgent(spec);
  EXPECT_EQ("200 OK|hello", Call(*first, MakeGet("/")));
  EXPECT_EQ("200 OK|hello", Call(*second, MakeGet("/")));
  EXPECT_EQ("200 OK|hello", Call(*first, MakeGet("/")));
  EXPECT_EQ(2U, server.CountConnections());
}

TEST(HttpClient, ConnectsAnewWhenTheServerHasClosed) {
  std::promise<void> isClosed;
  LoopbackServer server({[&](ServerConnection& connection) {
                           connection.ReadRequest();
                           connection.Send(kHello);
                           connection.EndSending();
                           isClosed.set_value();
                           connection.AwaitPeerEnd();
                         },
                         AnswerAll(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "one")));
  isClosed.get_future().wait();
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "two")));
  EXPECT_EQ(2U, server.CountConnections());
}

/// Answers the first request, and breaks the connection off when it has read the next one.
LoopbackServer::Script AnswerOnceAndReset() {
  return [](ServerConnection& connection) {
    connection.ReadRequest();
    connection.Send(kHello);
    connection.ReadRequest();
    connection.Reset();
  };
}

TEST(HttpClient, SendsAGetAgainWhenAKeptConnectionBreaks) {
  LoopbackServer server({AnswerOnceAndReset(), AnswerAll(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "one")));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/two")));
  EXPECT_EQ("GET /two HTTP/1.1\r\nHost: " + server.GetEndpoint() + "\r\nAccept-Encoding: identity\r\n\r\n",
            server.GetRecord(1).received);
}

/// RFC 9110, section 9.2.2: the server may have done already what it was asked for.
TEST(HttpClient, SendsNoPostAgainThatMayHaveBeenRead) {
  LoopbackServer server({AnswerOnceAndReset(), AnswerAll(kHello)});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "one")));
  const std::string endpoint = server.GetEndpoint();
  Ref<PendingRequestItem> item;
  agent->SendAsync(
      MakePost("/", "two"), [](const Pelmar::Exception*, ClientResponse*, PendingRequestItem*) {}, item);
  EXPECT_EQ("HttpException: " + endpoint + " closed the connection before it answered", Await(*agent, item));
  EXPECT_FALSE(IsSafeToRetry(item));
  EXPECT_EQ("200 OK|hello", Call(*agent, MakePost("/", "three")));
  std::string received;
  for (std::size_t i = 0; i < server.CountConnections(); ++i) {
    received += server.GetRecord(i).received;
  }
  EXPECT_EQ(received.find("two"), received.rfind("two"));
}

TEST(HttpClient, ClosesItsConnectionsWhenReleased) {
  LoopbackServer server({AnswerInTurn({kHello})});
  Ref<UserAgent> agent = MakeAgent(server.GetPort());
  EXPECT_EQ("200 OK|hello", Call(*agent, MakeGet("/")));
  agent = nullptr;
  server.AwaitEnd(0);
}

// --- Cookies ---

/// The Cookie line of a request, without its name.
std::string FindCookies(const std::string& request) {
  const std::string name = "\r\nCookie: ";
  const std::size_t start = request.find(name);
  return start == std::string::npos
             ? "none"
             : request.substr(start + name.size(), request.find("\r\n", start + 2) - start - name.size());
}

std::string AnswerWith(const std::vector<std::string>& cookies) {
  std::string answer = "HTTP/1.1 200 OK\r\n";
  for (const std::string& cookie : cookies) {
    answer += "Set-Cookie: " + cookie + "\r\n";
  }
  return answer + "Content-Length: 0\r\nConnection: close\r\n\r\n";
}

/// Sends one GET per path; the first is answered with the cookies. The Cookie lines of all.
std::vector<std::string> SendLegs(const std::vector<std::string>& cookies,
                                  const std::vector<std::string>& paths,
                                  const std::string& host = "127.0.0.1") {
  LoopbackServer server({AnswerAndClose(AnswerWith(cookies)), AnswerAndClose(AnswerWith({}))});
  const Ref<UserAgent> agent = MakeAgent(CreateTCPConnectionSpec(host, server.GetPort()));
  std::vector<std::string> sent;
  for (std::size_t i = 0; i < paths.size(); ++i) {
    EXPECT_EQ("200 OK|", Call(*agent, MakeGet(paths[i])));
    sent.push_back(FindCookies(server.GetRecord(i).received));
  }
  return sent;
}

using Lines = std::vector<std::string>;

TEST(HttpCookies, AreSentBackOnLaterLegs) {
  EXPECT_EQ((Lines{"none", "a=1; b=2", "a=1; b=2"}), SendLegs({"a=1", "b=2"}, {"/x", "/x", "/x"}));
}

TEST(HttpCookies, KeepToTheirPath) {
  EXPECT_EQ((Lines{"none", "a=1", "none", "a=1", "none"}),
            SendLegs({"a=1; Path=/in"}, {"/in", "/in/deep", "/", "/in", "/inner"}));
}

TEST(HttpCookies, EndWithTheirExpiry) {
  EXPECT_EQ((Lines{"none", "b=2; d=4"}), SendLegs({"a=1; Max-Age=0", "b=2; Max-Age=1000",
                                                   "c=3; Expires=Thu, 01 Jan 1970 00:00:01 GMT", "d=4"},
                                                  {"/", "/"}));
}

TEST(HttpCookies, AreReplacedAndRemovedByTheServer) {
  LoopbackServer server({AnswerAndClose(AnswerWith({"a=1", "b=1", "c=1"})),
                         AnswerAndClose(AnswerWith({"a=2", "b=; Max-Age=0"})),
                         AnswerAndClose(AnswerWith({}))});
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ("200 OK|", Call(*agent, MakeGet("/")));
  }
  EXPECT_EQ("a=1; b=1; c=1", FindCookies(server.GetRecord(1).received));
  EXPECT_EQ("a=2; c=1", FindCookies(server.GetRecord(2).received));
}

TEST(HttpCookies, AreNotTakenInTheClearWhenSecure) {
  // A loopback address counts as safe; a name below "localhost" (RFC 6761, section 6.3) leads there without
  // being one.
  EXPECT_EQ((Lines{"none", "b=2"}), SendLegs({"a=1; Secure", "b=2"}, {"/", "/"}, "sts.localhost"));
}

TEST(HttpCookies, OfForeignDomainsAreNotTaken) {
  EXPECT_EQ((Lines{"none", "b=2"}), SendLegs({"a=1; Domain=example.org", "b=2"}, {"/", "/"}));
}

TEST(HttpCookies, AreNotSentToAnotherHost) {
  LoopbackServer server({AnswerAndClose(AnswerWith({"a=1"})), AnswerAndClose(AnswerWith({}))});
  const Ref<CookieStore> cookies = CreateCookieStore("");
  const auto call = [&](const std::string& host) {
    const Ref<UserAgent> agent =
        CreateHttpUserAgent(CreateTCPConnectionSpec(host, server.GetPort()), cookies, nullptr);
    EXPECT_EQ("200 OK|", Call(*agent, MakeGet("/")));
  };
  call("127.0.0.1");
  call("localhost");
  call("127.0.0.1");
  EXPECT_EQ("none", FindCookies(server.GetRecord(1).received));
  EXPECT_EQ("a=1", FindCookies(server.GetRecord(2).received));
}

TEST(HttpCookies, OfOneUserAgentAreNotThoseOfAnother) {
  LoopbackServer server({AnswerAndClose(AnswerWith({"a=1"})), AnswerAndClose(AnswerWith({}))});
  const Ref<ConnectionSpec> spec = CreateTCPConnectionSpec("127.0.0.1", server.GetPort());
  EXPECT_EQ("200 OK|", Call(*MakeAgent(spec), MakeGet("/")));
  EXPECT_EQ("200 OK|", Call(*MakeAgent(spec), MakeGet("/")));
  EXPECT_EQ("none", FindCookies(server.GetRecord(1).received));
}

TEST(HttpCookies, AreBoundedInNumber) {
  std::vector<std::string> all;
  std::vector<LoopbackServer::Script> scripts;
  // The engine takes 50 of one answer at most.
  for (int leg = 0; leg < 5; ++leg) {
    std::vector<std::string> cookies;
    for (int i = 0; i < 50; ++i) {
      cookies.push_back("c" + std::to_string(1000 + leg * 50 + i) + "=v; Path=/" + std::to_string(leg));
    }
    scripts.push_back(AnswerAndClose(AnswerWith(cookies)));
  }
  scripts.push_back(AnswerAndClose(AnswerWith({})));
  LoopbackServer server(scripts);
  const Ref<UserAgent> agent = MakeAgent(server.GetPort());
  for (int leg = 0; leg < 5; ++leg) {
    EXPECT_EQ("200 OK|", Call(*agent, MakeGet("/" + std::to_string(leg))));
  }
  EXPECT_EQ("200 OK|", Call(*agent, MakeGet("/0")));
  EXPECT_EQ("200 OK|", Call(*agent, MakeGet("/1")));
  EXPECT_EQ("none", FindCookies(server.GetRecord(5).received));
  EXPECT_EQ("c1050=v; ", FindCookies(server.GetRecord(6).received).substr(0, 9));
}

}  // namespace
