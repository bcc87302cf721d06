// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A request and its answer over HTTPS on loopback, beside libcurl alone sending the same bytes.

#include "bench/HttpsPeer.h"
#include "bench/PlainCurl.h"
#include "bench/Rows.h"

#include "quorlin/HttpsClient.h"
#include "quorlin/RequestBuilderImpl.h"
#include "support/Pki.h"

#include <pelmar/ssl/SSLContext.h>

#include <memory>
#include <stdexcept>

namespace Bench {

using namespace TestSupport;
using Quorlin::HttpsClient;
using Quorlin::Request;

namespace {

constexpr double kLimit = 3;
// Little work on either side, and ours wakes up threads: what else runs on the machine weighs more.
constexpr double kKeptLimit = 6;
constexpr std::size_t kAnswerBytes = 6000;  // An issued token in its envelope.

void Require(bool holds, const char* what) {
  if (!holds) {
    throw std::runtime_error(what);
  }
}

const Identity& GetCa() {
  static const Identity ca = MakeCa("Benchmark CA");
  return ca;
}

const std::string& GetAnswerBody() {
  static const std::string body(kAnswerBytes, 'x');
  return body;
}

const HttpsPeer& GetPeer() {
  static const HttpsPeer peer = [] {
    CertificateSpec spec;
    spec.commonName = "localhost";
    spec.extendedKeyUsage = "serverAuth";
    spec.subjectAlternativeName = "IP:127.0.0.1";
    return HttpsPeer(MakeIssued(GetCa(), spec), GetAnswerBody(), HttpsPeer::RESUMES);
  }();
  return peer;
}

std::string GetUrl() {
  return "https://127.0.0.1:" + std::to_string(GetPeer().GetPort()) + "/sts";
}

Request MakeRequest() {
  Quorlin::TokenSpec spec;
  spec.tokenLifetimeSec = 3600;
  Request request;
  Quorlin::RequestBuilderImpl(boost::none)
      .BuildUserPassTokenRequest("alice@example.com", "open sesame", spec, request);
  return request;
}

// --- This library ---

using ClientPointer = std::shared_ptr<const HttpsClient>;

ClientPointer MakeClient(const Pelmar::Ref<Pelmar::Ssl::SSLContext>& context) {
  return std::make_shared<const HttpsClient>(GetUrl(), context.Get(), "",
                                             Quorlin::kServiceTimeoutMicroseconds);
}

Pelmar::Ref<Pelmar::Ssl::SSLContext> MakeContext() {
  Pelmar::Ssl::SSLContextOptions options;
  options.trustAnchors = Trust({GetCa()});
  return Pelmar::Ssl::CreateSSLContext(options);
}

void Exchange(Quorlin::TransportSession& session, const Request& request) {
  Pelmar::Ref<Pelmar::Reader> answer;
  session.SendRequest(request, answer);
  char buffer[16384];
  std::size_t size = 0;
  while (const std::size_t count = answer->Read(buffer, sizeof buffer)) {
    size += count;
  }
  Require(size == kAnswerBytes, "the answer is cut off");
}

Action ExchangeAfresh() {
  return [context = MakeContext(), request = MakeRequest()] {
    Exchange(*MakeClient(context)->CreateSession(), request);
  };
}

Action ExchangeResuming() {
  return [client = MakeClient(MakeContext()), request = MakeRequest()] {
    Exchange(*client->CreateSession(), request);
  };
}

Action ExchangeOnAKeptConnection() {
  return [session = MakeClient(MakeContext())->CreateSession(), request = MakeRequest()] {
    Exchange(*session, request);
  };
}

// --- libcurl alone ---

std::shared_ptr<CurlSetup> MakeSetup(bool resumes) {
  return MakeCurlSetup(GetUrl(), GetCa().GetCertificatePem(), MakeRequest(), resumes);
}

Action PerformAfresh(bool resumes) {
  return [setup = MakeSetup(resumes)] {
    PerformAndCompare(MakeHandle(*setup), GetAnswerBody());
  };
}

Action PerformOnAKeptConnection() {
  const auto setup = MakeSetup(false);
  // Declared after the setup in the closure, so that it goes before it.
  const auto handle = std::make_shared<EasyHandle>(MakeHandle(*setup));
  return [setup, handle] {
    PerformAndCompare(*handle, GetAnswerBody());
  };
}

Row MakeRow(const std::string& name, const Action& subject, const Action& floor, double limit = kLimit) {
  Row row{name, MakeRequest().body.size() + kAnswerBytes, subject, floor, limit};
  row.countsAllThreads = true;
  return row;
}

}  // namespace

Section MakeHttpsSection() {
  // Before the first request, and so before the library's threads.
  GetPeer();
  curl_global_init(CURL_GLOBAL_DEFAULT);
  return {"Exchanges over HTTPS, against libcurl alone; processor time of all threads of the client",
          {MakeRow("full handshake", ExchangeAfresh(), PerformAfresh(false)),
           MakeRow("resumed handshake", ExchangeResuming(), PerformAfresh(true)),
           MakeRow("kept connection", ExchangeOnAKeptConnection(), PerformOnAKeptConnection(), kKeptLimit)}};
}

}  // namespace Bench
