// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/HttpsClient.h"

#include <pelmar/Verify.h>
#include <pelmar/http/Url.h>
#include <quorlin/Exceptions.h>

#include <boost/bind/bind.hpp>
#include <boost/make_shared.hpp>

#include <utility>

namespace Quorlin {

namespace Http = Pelmar::Http;

namespace {

constexpr const char* kSource = "lib/quorlin/HttpsClient";
constexpr int kStatusServerError = 500;

bool CarriesSoapBody(int status) {
  return status / 100 == 2 || status == kStatusServerError;
}

// The synchronous path takes the outcome from the user agent, not from the callback.
void IgnoreOutcome(const Pelmar::Exception*, Pelmar::Reader*) {}

Pelmar::Ref<Http::UserAgent> CreateUserAgent(Http::ConnectionSpec* spec) {
  const Pelmar::Ref<Http::CookieStore> cookies = Http::CreateCookieStore(std::string());
  return Http::CreateHttpUserAgent(Pelmar::Ref<Http::ConnectionSpec>(spec), cookies, nullptr);
}

}  // namespace

HttpsEndpoint MakeHttpsEndpoint(const std::string& url, Pelmar::Ssl::SSLContext* sslContext,
                                const std::string& sslConnectionParam) {
  const Http::HttpURL parts = Http::ParseHttpURL(url);
  if (parts.isHttps && sslContext == nullptr) {
    throw Pelmar::InvalidArgumentException("HTTPS connection requested but no SSLContext provided.");
  }
  if (!parts.isHttps && !sslConnectionParam.empty()) {
    // Whoever pins a key wants to talk to nobody else.
    throw Pelmar::InvalidArgumentException("Public-key pins given, but the URL is not https.");
  }
  const Pelmar::Ref<Http::ConnectionSpec> tcp = Http::CreateTCPConnectionSpec(parts.host, parts.port);
  if (!parts.isHttps) {
    return {tcp, parts.path};
  }
  const Pelmar::Ref<Pelmar::Ssl::SSLContext> context(sslContext);
  return {Http::CreateSSLConnectionSpec(tcp, context, parts.host, sslConnectionParam), parts.path};
}

Pelmar::Ref<Http::ClientRequest> CreatePost(const std::string& path, const Request& request) {
  const Pelmar::Ref<Http::ClientRequest> post = Http::CreateHttpRequest(Http::METHOD_POST, path);
  post->SetHeader("Content-Type", "text/xml");
  // SOAP 1.1, section 6.1.1: the action is a quoted URI.
  post->SetHeader("SOAPAction", "\"" + request.soapAction + "\"");
  post->GetBodyWriter()->Write(request.body.data(), request.body.size());
  return post;
}

HttpsSession::HttpsSession(Http::ConnectionSpec* spec, const std::string& path, long long timeoutMicroseconds)
    : _userAgent(CreateUserAgent(spec)), _path(path), _timeoutMicroseconds(timeoutMicroseconds) {}

void HttpsSession::SendRequest(const Request& request, Pelmar::Ref<Pelmar::Reader>& response) {
  Pelmar::Ref<Http::PendingRequestItem> item;
  SendRequestAsync(request, &IgnoreOutcome, item);

  boost::shared_ptr<Pelmar::Exception> failure;
  try {
    Pelmar::Ref<Http::ClientResponse> answer;
    _userAgent->WaitFor(item, _timeoutMicroseconds, answer);
    TranslateResponse(nullptr, answer.Get(), failure, response);
  } catch (const Pelmar::Exception& error) {
    TranslateResponse(&error, nullptr, failure, response);
  }
  if (failure) {
    failure->Throw();
  }
}

void HttpsSession::SendRequestAsync(const Request& request, const ResponseCallback& callback,
                                    Pelmar::Ref<Pelmar::System::ScheduledItem>& item) {
  Pelmar::Ref<Http::PendingRequestItem> pending;
  SendRequestAsync(request, callback, pending);
  item = pending;
}

void HttpsSession::SendRequestAsync(const Request& request, const ResponseCallback& callback,
                                    Pelmar::Ref<Http::PendingRequestItem>& item) {
  using namespace boost::placeholders;
  _userAgent->SendAsync(CreatePost(_path, request),
                        boost::bind(&AsyncTranslateResponse, callback, _1, _2, _3), item);
}

HttpsClient::HttpsClient(const std::string& url, Pelmar::Ssl::SSLContext* sslContext,
                         std::string sslConnectionParam, long long timeoutMicroseconds)
    : _sslContext(sslContext), _timeoutMicroseconds(timeoutMicroseconds) {
  HttpsEndpoint endpoint = MakeHttpsEndpoint(url, sslContext, sslConnectionParam);
  _connectionSpec = endpoint.spec;
  _path = std::move(endpoint.path);
}

boost::shared_ptr<TransportSession> HttpsClient::CreateSession() const {
  return boost::make_shared<HttpsSession>(_connectionSpec.Get(), _path, _timeoutMicroseconds);
}

void TranslateResponse(const Pelmar::Exception* error, Http::ClientResponse* response,
                       boost::shared_ptr<Pelmar::Exception>& failure, Pelmar::Ref<Pelmar::Reader>& body) {
  if (error != nullptr) {
    failure = boost::make_shared<CommunicationException>(error->what());
    return;
  }
  if (response == nullptr) {
    Pelmar::PanicNotReached(kSource);
  }
  const int status = response->GetStatusCode();
  if (!CarriesSoapBody(status)) {
    failure = boost::make_shared<CommunicationException>("Server returned error: " + std::to_string(status) +
                                                         " " + response->GetReason());
    return;
  }
  body = Pelmar::Ref<Pelmar::Reader>(response);
}

void AsyncTranslateResponse(const ResponseCallback& callback, const Pelmar::Exception* error,
                            Http::ClientResponse* response, Http::PendingRequestItem* /*item*/) {
  boost::shared_ptr<Pelmar::Exception> failure;
  Pelmar::Ref<Pelmar::Reader> body;
  TranslateResponse(error, response, failure, body);
  callback(failure.get(), body.Get());
}

}  // namespace Quorlin
