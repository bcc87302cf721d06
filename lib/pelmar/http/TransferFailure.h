// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// From the facts of a failed exchange to the exception that tells a person what to do about it.

#ifndef PELMAR_HTTP_TRANSFERFAILURE_H
#define PELMAR_HTTP_TRANSFERFAILURE_H

#include <pelmar/http/HttpException.h>

#include "pelmar/http/ResponseHead.h"
#include "pelmar/http/TlsRecord.h"

#include <curl/curl.h>

#include <memory>
#include <string>

namespace Pelmar {
namespace Http {

/// How long the TCP connection and the TLS handshake may take together when the user agent has no other
/// connect time-out and nobody waits with a shorter one.
constexpr long kMaxConnectSeconds = 300;

struct TransferFacts {
  CURLcode code = CURLE_OK;
  std::string engineText;  ///< The engine's own message; may be empty.
  int systemError = 0;     ///< errno of the failed system call; 0 when none is known.
  std::string host;        ///< Where the connection goes.
  std::string endpoint;    ///< The same as "HOST:PORT", with the proxy on the way.
  std::string serverName;  ///< Whom the certificate should be for.
  std::string proxyHost;   ///< Empty without a proxy.
  std::string proxyEndpoint;
  bool hasProxyCredentials = false;
  int proxyStatus = 0;  ///< The proxy's answer to CONNECT; 0 when there was none.
  long long connectTimeoutMicroseconds = kMaxConnectSeconds * 1000000LL;
  bool wasReady = false;       ///< A connection stood, so that some of the request may have been sent.
  bool hasTlsStarted = false;  ///< TCP, and the way through the proxy, were open.
  ResponseHead head;
  bool isBodyTooLarge = false;
  std::shared_ptr<const TlsRecord> tls;  ///< Null without TLS.
};

/// The exception for an exchange that failed. Never null.
std::shared_ptr<const HttpException> DescribeFailure(const TransferFacts& facts);

/// Whether nothing of the request can have reached the server, and trying again may help: the connection was
/// refused, or the TLS handshake broken off or not completed in time.
bool IsSafeToRetry(const TransferFacts& facts);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_TRANSFERFAILURE_H
