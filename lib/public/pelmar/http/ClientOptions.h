// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a host may want otherwise of its HTTP client.

#ifndef PELMAR_HTTP_CLIENTOPTIONS_H
#define PELMAR_HTTP_CLIENTOPTIONS_H

#include <pelmar/Export.h>
#include <pelmar/Ref.h>
#include <pelmar/http/Client.h>

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Http {

/// The longest connect time-out: a day.
enum ConnectLimit : long long { kMaxConnectTimeoutMicroseconds = 24LL * 60 * 60 * 1000000 };

/// The longest `ClientOptions::userAgent`.
enum UserAgentLimit : std::size_t { kMaxUserAgentBytes = 256 };

/// How a user agent connects, and as what. A plain value that wipes its password. As it is made it stands for
/// what user agents do without options.
struct PELMAR_API ClientOptions {
  ClientOptions();
  /// Wipes the proxy's password.
  ~ClientOptions();
  ClientOptions(const ClientOptions& other);
  /// Wipes the password that was there.
  ClientOptions& operator=(const ClientOptions& other);

  /// How long name look-up, TCP, the proxy's answer to CONNECT and the TLS handshake may take together, from
  /// 1 to kMaxConnectTimeoutMicroseconds; rounded up to milliseconds. Default: 300 s.
  long long connectTimeoutMicroseconds;

  /// "http://HOST:PORT" of an HTTP proxy; empty: none, which is the default. Requests over TLS are tunnelled
  /// through it by CONNECT (RFC 9110, section 9.3.6), so that the proxy sees no more than where they go;
  /// others are handed to it whole. It is used for every request, also for those to this machine: no
  /// environment variable names one, nor exceptions.
  std::string proxyUrl;
  /// Credentials for the proxy, sent as Basic authentication (RFC 7617) with every connection: whoever can
  /// read the way to the proxy reads them. No user: none are sent. The HTTP engine makes copies that are not
  /// wiped.
  std::string proxyUser;
  std::string proxyPassword;

  /// The value of the header User-Agent, which the proxy is told too: up to kMaxUserAgentBytes of visible
  /// ASCII characters with blanks in between. Empty: no such header, which is the default.
  std::string userAgent;
};

/// A user agent like that of `CreateHttpUserAgent` without options, but for what `options` say; they are
/// copied. Throws InvalidArgumentException for options that are out of bounds, have a control character, name
/// a proxy otherwise than by an http: URL without a path, or have credentials without their user or proxy;
/// HttpException for a proxy URL that is none.
PELMAR_API Ref<UserAgent> CreateHttpUserAgent(const Ref<ConnectionSpec>& spec,
                                              const Ref<CookieStore>& cookies,
                                              const Ref<ConnectionPool>& pool, const ClientOptions& options);

/// Whether the request of `item` failed in a way that allows to send it again, because nothing of it can have
/// reached the server: the connection was refused, or the server broke the TLS handshake off or did not
/// complete it within the connect time-out. False while it is pending, for all other failures (a certificate
/// that is refused stays so), and for an item that is null or not of this platform.
PELMAR_API bool IsSafeToRetry(const Ref<PendingRequestItem>& item);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CLIENTOPTIONS_H
