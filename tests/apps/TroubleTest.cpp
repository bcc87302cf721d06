// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The development token service when it is told to be a difficult one.

#include "apps/StsRequests.h"
#include "support/HttpCalls.h"
#include "support/TokenFactory.h"

#include "devsts/HttpServer.h"
#include "devsts/RequestHandler.h"
#include "devsts/Service.h"
#include "devsts/Trouble.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <limits>
#include <memory>
#include <mutex>
#include <regex>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using namespace StsTests;
using namespace TestSupport;

DevSts::TroubleOptions Rates(double fail, double drop, std::uint64_t seed = 1) {
  DevSts::TroubleOptions options;
  options.failRate = fail;
  options.dropRate = drop;
  options.seed = seed;
  return options;
}

/// What happens to so many requests: "." nothing, "F" failure, "D" drop.
std::string Draw(const DevSts::TroubleOptions& options, int count) {
  DevSts::TroubleMaker maker(options);
  std::string text;
  for (int i = 0; i < count; ++i) {
    text += ".FD"[static_cast<int>(maker.Draw())];
  }
  return text;
}

TEST(TroubleMaker, HitsNoneOrAllAtTheEndsOfTheScale) {
  EXPECT_EQ(Draw(Rates(0, 0), 5), ".....");
  EXPECT_EQ(Draw(Rates(1, 0), 5), "FFFFF");
  EXPECT_EQ(Draw(Rates(0, 1), 5), "DDDDD");
  EXPECT_EQ(Draw(Rates(1, 1), 5), "DDDDD");
}

/// The generator is the standard's, so these are the same everywhere.
TEST(TroubleMaker, HitsTheSameRequestsForTheSameSeed) {
  EXPECT_EQ(Draw(Rates(0.5, 0.2, 7), 20), Draw(Rates(0.5, 0.2, 7), 20));
  EXPECT_EQ(Draw(Rates(0.5, 0.2, 7), 20), ".DD...FF.FFDDF.F..FD");
  EXPECT_EQ(Draw(Rates(0.5, 0.2, 8), 20), "...F..FFF.F.FFF.FF.D");
}

TEST(TroubleMaker, HitsItsShare) {
  const std::string story = Draw(Rates(0.25, 0), 10000);
  const auto hits = std::count(story.begin(), story.end(), 'F');
  EXPECT_NEAR(static_cast<double>(hits), 2500, 200);
}

TEST(TroubleMaker, RefusesRatesThatAreNone) {
  for (const double rate : {-0.1, 1.1, std::numeric_limits<double>::quiet_NaN()}) {
    EXPECT_THROW(DevSts::TroubleMaker(Rates(rate, 0)), std::invalid_argument);
    EXPECT_THROW(DevSts::TroubleMaker(Rates(0, rate)), std::invalid_argument);
  }
}

DevSts::TokenIssuer& Issuer() {
  static DevSts::TokenIssuer issuer(DevSts::CertificateAuthority().IssueSigner(), "urn:test:sts");
  return issuer;
}

/// The answer of a handler with this trouble to the good request, and its line of the log.
DevSts::Answer Handle(const DevSts::TroubleOptions& trouble, std::vector<std::string>& lines) {
  DevSts::HandlerOptions options;
  options.trouble = trouble;
  DevSts::RequestHandler handler(
      options, DevSts::Directory::MakeSample(), Issuer(), [] { return kNow; },
      [&](const std::string& line) { lines.push_back(line); });
  return handler.HandleRequest(kIssueAction, kXml, PasswordRequest());
}

TEST(RequestHandler, FailsWhenToldTo) {
  std::vector<std::string> lines;
  const DevSts::Answer answer = Handle(Rates(1, 0), lines);
  EXPECT_EQ(answer.status, 500);
  EXPECT_NE(
      answer.body.find(">soapenv:Server</faultcode><faultstring>The service failed, as it was told to<"),
      std::string::npos);
  const std::vector<std::string> expected = {
      R"({"time":"2030-01-01T00:00:01Z","operation":"issue","user":null,"asked":null,"passed":[],"status":500,)"
      R"("answer":"fault","fault":"soapenv:Server","reason":"The service failed, as it was told to"})"};
  EXPECT_EQ(lines, expected);
}

TEST(RequestHandler, GivesNoAnswerWhenToldTo) {
  std::vector<std::string> lines;
  const DevSts::Answer answer = Handle(Rates(0, 1), lines);
  EXPECT_EQ(answer.status, 0);
  EXPECT_EQ(answer.body, "");
  const std::vector<std::string> expected = {
      R"({"time":"2030-01-01T00:00:01Z","operation":"issue","user":null,"asked":null,"passed":[],"status":null,)"
      R"("answer":"none","reason":"dropped, as the service was told to"})"};
  EXPECT_EQ(lines, expected);
}

Pelmar::Ref<Pelmar::Http::ClientRequest> MakeSoapPost() {
  const Pelmar::Ref<Pelmar::Http::ClientRequest> request = MakePost("/sts", PasswordRequest());
  request->SetHeader("Content-Type", kXml);
  request->SetHeader("SOAPAction", kIssueAction);
  return request;
}

int PortOf(const std::string& url) {
  return std::stoi(std::regex_replace(url, std::regex(".*:([0-9]+)/sts"), "$1"));
}

TEST(Service, ClosesTheConnectionWhenToldTo) {
  DevSts::ServiceConfig config;
  config.tls = false;
  config.handler.trouble = Rates(0, 1);
  const DevSts::Service service(config);
  const int port = PortOf(service.GetUrl());
  EXPECT_EQ(Call(*MakeAgent(port), MakeSoapPost()),
            "HttpException: 127.0.0.1:" + std::to_string(port) + " closed the connection before it answered");
}

TEST(Service, HoldsItsAnswersBack) {
  DevSts::ServiceConfig config;
  config.tls = false;
  config.delay = std::chrono::milliseconds(20);
  const DevSts::Service service(config);
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(Call(*MakeAgent(PortOf(service.GetUrl())), MakePost("/sts", "")),
            "415 Unsupported Media Type|SOAP 1.1 requests have the content type text/xml.\n");
  EXPECT_GE(std::chrono::steady_clock::now() - start, config.delay);
}

/// More answers are held back, for longer than any test lasts, than the server has threads.
TEST(HttpServer, KeepsNoThreadBusyWithAnAnswerThatIsHeldBack) {
  constexpr std::size_t kHeld = 100;
  std::mutex mutex;
  std::condition_variable arrived;
  std::size_t held = 0;
  auto server = std::make_unique<DevSts::HttpServer>(DevSts::HttpServerOptions(),
                                                     [&](const DevSts::HttpRequest& request) {
                                                       DevSts::HttpResponse response;
                                                       response.contentType = "text/plain";
                                                       if (request.target == "/held") {
                                                         response.delay = std::chrono::hours(24);
                                                         const std::lock_guard<std::mutex> lock(mutex);
                                                         ++held;
                                                         arrived.notify_all();
                                                       }
                                                       return response;
                                                     });
  Completions completions;
  std::vector<Pelmar::Ref<Pelmar::Http::UserAgent>> agents;
  for (std::size_t i = 0; i < kHeld; ++i) {
    agents.push_back(MakeAgent(server->GetPort()));
    Pelmar::Ref<Pelmar::Http::PendingRequestItem> item;
    agents.back()->SendAsync(MakeGet("/held"), completions.GetFunctor(), item);
  }
  {
    std::unique_lock<std::mutex> lock(mutex);
    arrived.wait(lock, [&] { return held == kHeld; });
  }
  EXPECT_EQ(Call(*MakeAgent(server->GetPort()), MakeGet("/now")), "200 OK|");
  server.reset();
  EXPECT_EQ(completions.AwaitOutcomes(kHeld).size(), kHeld);
}

}  // namespace
