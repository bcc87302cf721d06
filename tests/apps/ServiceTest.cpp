// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The development token service's HTTP side.

#include "apps/StsRequests.h"
#include "support/HttpCalls.h"

#include "devsts/Clock.h"
#include "devsts/HttpServer.h"
#include "devsts/Service.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <regex>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace StsTests;
using namespace TestSupport;

const DevSts::Service& PlainService() {
  static const DevSts::Service service([] {
    DevSts::ServiceConfig config;
    config.tls = false;
    return config;
  }());
  return service;
}

int PortOf(const DevSts::Service& service) {
  return std::stoi(std::regex_replace(service.GetUrl(), std::regex(".*:([0-9]+)/sts"), "$1"));
}

DevSts::HttpResponse MakeText(const std::string& text) {
  DevSts::HttpResponse response;
  response.contentType = "text/plain";
  response.body = text;
  return response;
}

/// A server without TLS that answers with this handler.
class PlainServer final {
 public:
  explicit PlainServer(const DevSts::HttpServer::Handler& handler)
      : _server(DevSts::HttpServerOptions(), handler) {}

  std::string Send(const Pelmar::Ref<Pelmar::Http::ClientRequest>& request) const {
    return Call(*MakeAgent(_server.GetPort()), request);
  }
  int GetPort() const { return _server.GetPort(); }

 private:
  DevSts::HttpServer _server;
};

TEST(Service, AnswersOnlyOnItsPath) {
  EXPECT_EQ(Call(*MakeAgent(PortOf(PlainService())), MakePost("/", PasswordRequest())),
            "404 Not Found|The token service is at /sts.\n");
}

TEST(Service, AnswersOnlyToPosts) {
  EXPECT_EQ(Call(*MakeAgent(PortOf(PlainService())), MakeGet("/sts")),
            "405 Method Not Allowed|SOAP requests are posted.\n");
}

TEST(Service, WantsAContentType) {
  EXPECT_EQ(Call(*MakeAgent(PortOf(PlainService())), MakePost("/sts", PasswordRequest())),
            "415 Unsupported Media Type|SOAP 1.1 requests have the content type text/xml.\n");
}

TEST(HttpServer, HandsOverWhatTheHandlerNeeds) {
  DevSts::HttpRequest seen;
  const PlainServer server([&](const DevSts::HttpRequest& request) {
    seen = request;
    return MakeText("hello");
  });
  const Pelmar::Ref<Pelmar::Http::ClientRequest> request = MakePost("/path?query", "body");
  request->SetHeader("Content-Type", "text/xml");
  request->SetHeader("SOAPAction", "\"urn:act\"");
  EXPECT_EQ(server.Send(request), "200 OK|hello");
  EXPECT_EQ(seen.method, "POST");
  EXPECT_EQ(seen.target, "/path?query");
  EXPECT_EQ(seen.contentType, "text/xml");
  EXPECT_EQ(seen.soapAction, "\"urn:act\"");
  EXPECT_EQ(seen.body, "body");
}

TEST(HttpServer, RefusesBodiesBeyondItsLimitBeforeTheHandlerSeesThem) {
  std::atomic<int> calls{0};
  const PlainServer server([&](const DevSts::HttpRequest&) {
    ++calls;
    return MakeText("taken");
  });
  EXPECT_EQ(server.Send(MakePost("/", std::string(DevSts::kMaxRequestBytes, 'x'))), "200 OK|taken");
  EXPECT_EQ(calls, 1);
  EXPECT_NE(server.Send(MakePost("/", std::string(DevSts::kMaxRequestBytes + 1, 'x'))), "200 OK|taken");
  EXPECT_EQ(calls, 1);
}

TEST(HttpServer, SurvivesAHandlerThatThrows) {
  const PlainServer server(
      [](const DevSts::HttpRequest&) -> DevSts::HttpResponse { throw std::runtime_error("inside"); });
  EXPECT_EQ(server.Send(MakeGet("/")), "500 Internal Server Error|The service failed.\n");
  EXPECT_EQ(server.Send(MakeGet("/")), "500 Internal Server Error|The service failed.\n");
}

TEST(HttpServer, ServesSeveralRequestsOnOneConnection) {
  const PlainServer server([](const DevSts::HttpRequest& request) { return MakeText(request.target); });
  const Pelmar::Ref<Pelmar::Http::UserAgent> agent = MakeAgent(server.GetPort());
  for (const char* const path : {"/one", "/two", "/three"}) {
    EXPECT_EQ(Call(*agent, MakeGet(path)), std::string("200 OK|") + path);
  }
}

TEST(HttpServer, WaitsForRunningHandlersWhenItEnds) {
  std::promise<void> entered;
  std::promise<void> mayLeave;
  std::atomic<bool> hasLeft{false};
  auto server = std::make_unique<PlainServer>([&](const DevSts::HttpRequest&) {
    entered.set_value();
    mayLeave.get_future().wait();
    hasLeft = true;
    return MakeText("");
  });
  std::thread client([&, port = server->GetPort()] { Call(*MakeAgent(port), MakeGet("/")); });
  entered.get_future().wait();
  std::thread ending([&] {
    server.reset();
    EXPECT_TRUE(hasLeft);
  });
  mayLeave.set_value();
  ending.join();
  client.join();
}

TEST(HttpServer, EndsWhileAClientKeepsItsConnection) {
  auto server = std::make_unique<PlainServer>([](const DevSts::HttpRequest&) { return MakeText("hello"); });
  const Pelmar::Ref<Pelmar::Http::UserAgent> agent = MakeAgent(server->GetPort());
  EXPECT_EQ(Call(*agent, MakeGet("/")), "200 OK|hello");
  server.reset();
  EXPECT_NE(Call(*agent, MakeGet("/")), "200 OK|hello");
}

}  // namespace
