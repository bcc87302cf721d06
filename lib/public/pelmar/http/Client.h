// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The HTTP client: where to connect, what to send, and what came back.

#ifndef PELMAR_HTTP_CLIENT_H
#define PELMAR_HTTP_CLIENT_H

#include <pelmar/Exception.h>
#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Reader.h>
#include <pelmar/Ref.h>
#include <pelmar/Writer.h>
#include <pelmar/ssl/SSLContext.h>
#include <pelmar/system/ThreadPool.h>

#include <boost/function.hpp>

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Http {

/// What an exchange may at most bring before it is given up with an HttpException.
enum ClientLimit : std::size_t { kMaxResponseBytes = 16 * 1024 * 1024, kMaxResponseHeaderBytes = 256 * 1024 };

/// Where and how to connect: plain TCP, or TLS over it. Immutable; may be shared between threads. User agents of one TLS spec resume each
/// other's TLS sessions.
class PELMAR_API ConnectionSpec : public Object {
 protected:
  ~ConnectionSpec() override;
};

PELMAR_API Ref<ConnectionSpec> CreateTCPConnectionSpec(const std::string& host, int port);

/// TLS over `tcp`, to a server that must prove to be `host`. `connectionParam` is empty, or one or more public-key pins in the form
/// "sha256//<base64>" joined by ";": the server's key must then be one of them, beside all other checks. Anything else is an
/// InvalidArgumentException.
PELMAR_API Ref<ConnectionSpec> CreateSSLConnectionSpec(const Ref<ConnectionSpec>& tcp, const Ref<Ssl::SSLContext>& context,
                                                       const std::string& host, const std::string& connectionParam);

/// Cookies (RFC 6265) of one user agent.
class PELMAR_API CookieStore : public Object {
 protected:
  ~CookieStore() override;
};

/// A cookie store. `fileName` must be empty: cookies are kept in memory only (InvalidArgumentException otherwise).
PELMAR_API Ref<CookieStore> CreateCookieStore(const std::string& fileName);

/// Connections shared between user agents. None exists yet, so the only value is null: a user agent keeps its own connections.
class PELMAR_API ConnectionPool : public Object {
 protected:
  ~ConnectionPool() override;
};

enum Method { METHOD_GET, METHOD_POST };

/// One request. Used by one thread until it is sent, and sent once.
class PELMAR_API ClientRequest : public Object {
 public:
  /// Adds a header. Names and values with control characters are refused with InvalidArgumentException.
  virtual void SetHeader(const std::string& name, const std::string& value) = 0;
  /// What is written here becomes the request's body.
  virtual Writer* GetBodyWriter() = 0;

 protected:
  ~ClientRequest() override;
};

PELMAR_API Ref<ClientRequest> CreateHttpRequest(Method method, const std::string& path);

/// A complete response. As a reader it yields the body; for one thread at a time.
class PELMAR_API ClientResponse : public Reader {
 public:
  virtual int GetStatusCode() const = 0;
  /// The reason phrase of the status line; empty when there is none.
  virtual const std::string& GetReason() const = 0;

 protected:
  ~ClientResponse() override;
};

/// A request that was sent and has not been answered yet. `Cancel` ends it with an HttpException; the completion functor is still called.
class PELMAR_API PendingRequestItem : public System::ScheduledItem {
 protected:
  ~PendingRequestItem() override;
};

/// Called once when a request is done: with an error and no response, or with a response and no error. All three are valid during the
/// call only (the response may be kept by a `Ref`).
typedef boost::function<void(const Exception*, ClientResponse*, PendingRequestItem*)> CompletionFunctor;

/// An HTTP client with its own connections and cookies. Redirects are not followed and no proxy is used.
/// May be released while requests are pending: they go on, and their functors are called.
class PELMAR_API UserAgent : public Object {
 public:
  /// Starts the exchange and returns. `completion` is called once, on a platform thread, perhaps before this call returns.
  /// An empty functor is refused with InvalidArgumentException.
  virtual void SendAsync(const Ref<ClientRequest>& request, const CompletionFunctor& completion,
                         Ref<PendingRequestItem>& item) = 0;

  /// Blocks until the request of `item`, sent by this user agent, is done or `timeoutMicroseconds` have passed since the call.
  /// Throws what the exchange failed with, or HttpTimeoutException, in which case the request is cancelled.
  virtual void WaitFor(const Ref<PendingRequestItem>& item, long long timeoutMicroseconds, Ref<ClientResponse>& response) = 0;

 protected:
  ~UserAgent() override;
};

/// A user agent for `spec` that keeps its cookies in `cookies`. `pool` must be null.
PELMAR_API Ref<UserAgent> CreateHttpUserAgent(const Ref<ConnectionSpec>& spec, const Ref<CookieStore>& cookies,
                                              const Ref<ConnectionPool>& pool);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CLIENT_H
