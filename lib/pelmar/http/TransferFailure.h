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

/// How long the TCP connection and the TLS handshake may take together when nobody waits with a shorter
/// time-out.
constexpr long kMaxConnectSeconds = 300;

struct TransferFacts {
  CURLcode code = CURLE_OK;
  std::string engineText;  ///< The engine's own message; may be empty.
  int systemError = 0;     ///< errno of the failed system call; 0 when none is known.
  std::string host;        ///< Where the connection goes.
  std::string endpoint;    ///< The same as "HOST:PORT".
  std::string serverName;  ///< Whom the certificate should be for.
  ResponseHead head;
  bool isBodyTooLarge = false;
  std::shared_ptr<const TlsRecord> tls;  ///< Null without TLS.
};

/// The exception for an exchange that failed. Never null.
std::shared_ptr<const HttpException> DescribeFailure(const TransferFacts& facts);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_TRANSFERFAILURE_H
