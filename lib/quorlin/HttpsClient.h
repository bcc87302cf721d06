// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The transport over HTTP and HTTPS.

#ifndef QUORLIN_HTTPSCLIENT_H
#define QUORLIN_HTTPSCLIENT_H

#include <pelmar/Exception.h>
#include <pelmar/Reader.h>
#include <pelmar/Ref.h>
#include <pelmar/http/Client.h>
#include <pelmar/ssl/SSLContext.h>

#include <boost/shared_ptr.hpp>

#include <string>

#include "quorlin/Transport.h"

namespace Quorlin {

/// How long an operation of the service waits for each answer: four minutes.
constexpr long long kServiceTimeoutMicroseconds = 240000000;
/// How long a round of a GSS negotiation context waits: 40 seconds.
constexpr long long kNegotiationTimeoutMicroseconds = 40000000;

/// Where requests are posted to.
struct HttpsEndpoint {
  Pelmar::Ref<Pelmar::Http::ConnectionSpec> spec;
  std::string path;
};

/// `sslContext` may be null for an http: URL; for https: that is an InvalidArgumentException.
/// `sslConnectionParam` is handed to the TLS layer as it is; not empty for an http: URL, where nothing could
/// keep to it, is an InvalidArgumentException. Throws also what the platform's URL parser and
/// connection specs throw.
HttpsEndpoint MakeHttpsEndpoint(const std::string& url, Pelmar::Ssl::SSLContext* sslContext,
                                const std::string& sslConnectionParam);

/// The HTTP request that carries `request`.
Pelmar::Ref<Pelmar::Http::ClientRequest> CreatePost(const std::string& path, const Request& request);

/// A session on a user agent and a cookie store of its own, so that cookies last exactly as long as the
/// session.
class HttpsSession final : public TransportSession {
 public:
  /// `timeoutMicroseconds` bounds the wait of each `SendRequest`.
  HttpsSession(Pelmar::Http::ConnectionSpec* spec, const std::string& path, long long timeoutMicroseconds);

  void SendRequest(const Request& request, Pelmar::Ref<Pelmar::Reader>& response) override;
  void SendRequestAsync(const Request& request, const ResponseCallback& callback,
                        Pelmar::Ref<Pelmar::System::ScheduledItem>& item) override;

 private:
  void SendRequestAsync(const Request& request, const ResponseCallback& callback,
                        Pelmar::Ref<Pelmar::Http::PendingRequestItem>& item);

  const Pelmar::Ref<Pelmar::Http::UserAgent> _userAgent;
  const std::string _path;
  const long long _timeoutMicroseconds;
};

/// Posts requests to one URL.
class HttpsClient final : public Transport {
 public:
  /// Throws like `MakeHttpsEndpoint`, which takes the same first three.
  HttpsClient(const std::string& url, Pelmar::Ssl::SSLContext* sslContext, std::string sslConnectionParam,
              long long timeoutMicroseconds);

  boost::shared_ptr<TransportSession> CreateSession() const override;

 private:
  Pelmar::Ref<Pelmar::Http::ConnectionSpec> _connectionSpec;
  const Pelmar::Ref<Pelmar::Ssl::SSLContext> _sslContext;
  std::string _path;
  const long long _timeoutMicroseconds;
};

/// What one HTTP exchange comes to: sets `failure` (a CommunicationException) when it failed or the status is
/// neither 2xx nor 500; sets `body` otherwise. 500 is how a SOAP fault arrives (SOAP 1.1, section 6.2).
/// One of `error` and `response` must be given; an error comes first.
void TranslateResponse(const Pelmar::Exception* error, Pelmar::Http::ClientResponse* response,
                       boost::shared_ptr<Pelmar::Exception>& failure, Pelmar::Ref<Pelmar::Reader>& body);

/// Translates the outcome and hands it to `callback`. An empty callback raises boost::bad_function_call.
void AsyncTranslateResponse(const ResponseCallback& callback, const Pelmar::Exception* error,
                            Pelmar::Http::ClientResponse* response, Pelmar::Http::PendingRequestItem* item);

}  // namespace Quorlin

#endif  // QUORLIN_HTTPSCLIENT_H
