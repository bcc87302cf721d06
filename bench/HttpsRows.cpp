// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A request and its answer over HTTPS on loopback, beside libcurl alone sending the same bytes.

#include "bench/HttpsPeer.h"
#include "bench/Rows.h"

#include "quorlin/HttpsClient.h"
#include "quorlin/RequestBuilderImpl.h"
#include "support/Pki.h"

#include <pelmar/ssl/SSLContext.h>

#include <curl/curl.h>

#include <memory>
#include <stdexcept>

namespace Bench {

using namespace TestSupport;
using Quorlin::HttpsClient;
using Quorlin::Request;

namespace {

constexpr double kLimit = 3;
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
    return HttpsPeer(MakeIssued(GetCa(), spec),
                     "HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " +
                         std::to_string(kAnswerBytes) + "\r\n\r\n" + GetAnswerBody());
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

struct CurlDeleter {
  void operator()(CURL* handle) const noexcept { curl_easy_cleanup(handle); }
  void operator()(curl_slist* list) const noexcept { curl_slist_free_all(list); }
};

using EasyHandle = std::unique_ptr<CURL, CurlDeleter>;

std::size_t TakeBody(char* data, std::size_t size, std::size_t count, void* body) {
  static_cast<std::string*>(body)->append(data, size * count);
  return size * count;
}

/// What the handles of one row are made with. Lives as long as the row.
struct CurlSetup {
  std::string url = GetUrl();
  std::string anchor = GetCa().GetCertificatePem();
  Request request = MakeRequest();
  std::unique_ptr<curl_slist, CurlDeleter> headers;
  std::shared_ptr<CURLSH> share;
};

template <typename T>
void Set(const EasyHandle& handle, CURLoption option, T value) {
  Require(curl_easy_setopt(handle.get(), option, value) == CURLE_OK, "libcurl refuses a setting");
}

EasyHandle MakeHandle(const CurlSetup& setup) {
  EasyHandle handle(curl_easy_init());
  curl_blob anchor = {const_cast<char*>(setup.anchor.data()), setup.anchor.size(), CURL_BLOB_NOCOPY};
  Set(handle, CURLOPT_NOSIGNAL, 1L);
  Set(handle, CURLOPT_URL, setup.url.c_str());
  Set(handle, CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
  Set(handle, CURLOPT_CAINFO_BLOB, &anchor);
  Set(handle, CURLOPT_CAPATH, static_cast<char*>(nullptr));
  Set(handle, CURLOPT_SHARE, setup.share.get());
  Set(handle, CURLOPT_HTTPHEADER, setup.headers.get());
  Set(handle, CURLOPT_POSTFIELDSIZE, static_cast<long>(setup.request.body.size()));
  Set(handle, CURLOPT_POSTFIELDS, setup.request.body.c_str());
  Set(handle, CURLOPT_COOKIEFILE, "");
  Set(handle, CURLOPT_WRITEFUNCTION, TakeBody);
  return handle;
}

void Perform(const EasyHandle& handle) {
  std::string body;
  Set(handle, CURLOPT_WRITEDATA, &body);
  Require(curl_easy_perform(handle.get()) == CURLE_OK && body == GetAnswerBody(),
          "libcurl's exchange failed");
}

std::shared_ptr<CurlSetup> MakeSetup() {
  const auto setup = std::make_shared<CurlSetup>();
  curl_slist* headers = nullptr;
  const std::string action = "SOAPAction: \"" + setup->request.soapAction + "\"";
  for (const char* const line :
       {"Content-Type: text/xml", "Accept-Encoding: identity", "Accept:", "Expect:", action.c_str()}) {
    headers = curl_slist_append(headers, line);
  }
  setup->headers.reset(headers);
  return setup;
}

Action PerformAfresh() {
  return [setup = MakeSetup()] {
    Perform(MakeHandle(*setup));
  };
}

Action PerformResuming() {
  const auto setup = MakeSetup();
  setup->share.reset(curl_share_init(), curl_share_cleanup);
  curl_share_setopt(setup->share.get(), CURLSHOPT_SHARE, CURL_LOCK_DATA_SSL_SESSION);
  return [setup] {
    Perform(MakeHandle(*setup));
  };
}

Action PerformOnAKeptConnection() {
  const auto setup = MakeSetup();
  // Declared after the setup in the closure, so that it goes before it.
  const auto handle = std::make_shared<EasyHandle>(MakeHandle(*setup));
  return [setup, handle] {
    Perform(*handle);
  };
}

Row MakeRow(const std::string& name, const Action& subject, const Action& floor) {
  Row row{name, MakeRequest().body.size() + kAnswerBytes, subject, floor, kLimit};
  row.countsAllThreads = true;
  return row;
}

}  // namespace

Section MakeHttpsSection() {
  // Before the first request, and so before the library's threads.
  GetPeer();
  curl_global_init(CURL_GLOBAL_DEFAULT);
  return {"Exchanges over HTTPS, against libcurl alone; processor time of all threads of the client",
          {MakeRow("full handshake", ExchangeAfresh(), PerformAfresh()),
           MakeRow("resumed handshake", ExchangeResuming(), PerformResuming()),
           MakeRow("kept connection", ExchangeOnAKeptConnection(), PerformOnAKeptConnection())}};
}

}  // namespace Bench
