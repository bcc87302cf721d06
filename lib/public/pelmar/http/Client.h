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

/// What an exchange may at most bring before it is given up with an HttpException. The headers' bound holds
/// for interim responses, the final one and trailers together.
enum ClientLimit : std::size_t { kMaxResponseBytes = 16 * 1024 * 1024, kMaxResponseHeaderBytes = 256 * 1024 };

/// Where and how to connect: plain TCP, or TLS over it. Immutable; may be shared between threads. User agents
/// of one TLS spec resume each other's TLS sessions.
class PELMAR_API ConnectionSpec : public Object {
 protected:
  ~ConnectionSpec() override;
};

/// Plain TCP to `host` (a name, an IPv4 address, or an IPv6 address without brackets) and `port` (1 to
/// 65535). Throws InvalidArgumentException.
PELMAR_API Ref<ConnectionSpec> CreateTCPConnectionSpec(const std::string& host, int port);

/// TLS over `tcp`, to a server that must prove to be `host` by its certificate's subject alternative names
/// (RFC 9525; the common name does not count). Requests are addressed to `host` at the TCP port.
/// `connectionParam` is empty, or one or more public-key pins in the form "sha256//<base64>" joined by ";":
/// the server's key must then be one of them, beside all other checks. Anything else is an
/// InvalidArgumentException.
PELMAR_API Ref<ConnectionSpec> CreateSSLConnectionSpec(const Ref<ConnectionSpec>& tcp,
                                                       const Ref<Ssl::SSLContext>& context,
                                                       const std::string& host,
                                                       const std::string& connectionParam);

/// Cookies (RFC 6265) of one user agent, or of several; at most 200, of which the oldest go first. Safe to
/// share between threads.
class PELMAR_API CookieStore : public Object {
 protected:
  ~CookieStore() override;
};

/// A cookie store. `fileName` must be empty: cookies are kept in memory only (InvalidArgumentException
/// otherwise).
PELMAR_API Ref<CookieStore> CreateCookieStore(const std::string& fileName);

/// Connections shared between user agents. None exists yet, so the only value is null: a user agent keeps its
/// own connections.
class PELMAR_API ConnectionPool : public Object {
 protected:
  ~ConnectionPool() override;
};

enum Method { METHOD_GET, METHOD_POST };

/// One request. Used by one thread until it is sent, and sent once.
class PELMAR_API ClientRequest : public Object {
 public:
  /// Adds a header. Refused with InvalidArgumentException: names that are no tokens (RFC 9110,
  /// section 5.6.2), values with control or non-ASCII characters, and headers that the client sets itself
  /// (Host, Cookie, those about framing, coding and the connection).
  virtual void SetHeader(const std::string& name, const std::string& value) = 0;
  /// What is written here becomes the request's body.
  virtual Writer* GetBodyWriter() = 0;

 protected:
  ~ClientRequest() override;
};

/// A request for `path`, which goes out exactly as it is: it starts with a slash and may have a query (RFC
/// 9112, section 3.2.1). Throws InvalidArgumentException. Beside the headers that are set, a request has
/// Host, Accept-Encoding: identity, Content-Length with POST, and cookies.
PELMAR_API Ref<ClientRequest> CreateHttpRequest(Method method, const std::string& path);

/// A complete response; never an interim one (1xx). As a reader it yields the body; for one thread at a time.
/// A body in a content coding is an HttpException, since none is asked for; so is one over TLS that only the
/// end of the connection ends, unless the server announced that end (close_notify).
class PELMAR_API ClientResponse : public Reader {
 public:
  virtual int GetStatusCode() const = 0;
  /// The reason phrase of the status line, with "?" for control characters; empty when there is none.
  virtual const std::string& GetReason() const = 0;
  /// Looks a header of the response up, `name` in any letter case. True and the value when there is one;
  /// several of the same name are one list, joined by ", " (RFC 9110, section 5.3). Else false and `value`
  /// unchanged. Headers of interim responses and trailers do not count.
  virtual bool GetHeader(const std::string& name, std::string& value) const = 0;

 protected:
  ~ClientResponse() override;
};

/// A request that was sent. It is done when its outcome is known, whether or not its functor has been called.
/// `Cancel` ends it with an HttpException and closes its connection; the completion functor is still called.
class PELMAR_API PendingRequestItem : public System::ScheduledItem {
 protected:
  ~PendingRequestItem() override;
};

/// Called once when a request is done: with an error and no response, or with a response and no error. All
/// three are valid during the call only (the response may be kept by a `Ref`).
typedef boost::function<void(const Exception*, ClientResponse*, PendingRequestItem*)> CompletionFunctor;

/// An HTTP client with its own connections and cookies. Redirects are not followed, and no proxy is used but
/// the one that ClientOptions name. May be released while requests are pending: they go on, and their
/// functors are called. Any number of requests may be pending, and any thread may send and wait.
///
/// A kept connection that breaks before any byte of an answer has come is replaced, and the request sent
/// again, if it is a GET or the server had ended the connection before the request was sent. A POST that the
/// server may have read is not sent twice (RFC 9110, section 9.2.2). When the process exits, pending requests
/// end with an HttpException; functors that have not been called by then are dropped.
class PELMAR_API UserAgent : public Object {
 public:
  /// Starts the exchange and returns. `completion` is called once, on a platform thread, perhaps before this
  /// call returns. Connecting may take 300 s unless ClientOptions say otherwise; beyond that nothing but
  /// `Cancel` and `WaitFor` limits the time. Throws InvalidArgumentException for a null request, a GET with a
  /// body or an empty functor, InvalidStateException for a request that was sent before, HttpException when
  /// the system has no thread or descriptors left.
  virtual void SendAsync(const Ref<ClientRequest>& request, const CompletionFunctor& completion,
                         Ref<PendingRequestItem>& item) = 0;

  /// Blocks until the request of `item`, sent by this user agent, is done or `timeoutMicroseconds` have
  /// passed since the call. Throws what the exchange failed with, or HttpTimeoutException, in which case the
  /// request is cancelled and its connection closed. A negative time-out counts as 0.
  /// InvalidArgumentException for an item of another user agent.
  virtual void WaitFor(const Ref<PendingRequestItem>& item, long long timeoutMicroseconds,
                       Ref<ClientResponse>& response) = 0;

 protected:
  ~UserAgent() override;
};

/// A user agent for `spec` that keeps its cookies in `cookies`. `pool` must be null.
PELMAR_API Ref<UserAgent> CreateHttpUserAgent(const Ref<ConnectionSpec>& spec,
                                              const Ref<CookieStore>& cookies,
                                              const Ref<ConnectionPool>& pool);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CLIENT_H
