// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What happened in a TLS handshake, so that a failure can be told in words a person can act on.

#ifndef PELMAR_HTTP_TLSRECORD_H
#define PELMAR_HTTP_TLSRECORD_H

#include "pelmar/http/SpecShare.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

struct ssl_ctx_st;
struct ssl_st;

namespace Pelmar {

namespace Ssl {
class SSLContextImpl;
}

namespace Http {

/// A message lists at most this many of the names that a certificate is for.
constexpr std::size_t kMaxNamesShown = 10;

enum class CertificateProblem {
  NONE,
  UNKNOWN_ISSUER,
  SELF_SIGNED,
  EXPIRED,
  NOT_YET_VALID,
  WRONG_NAME,
  OTHER
};

enum class TlsAlert { NONE, PROTOCOL_VERSION, CERTIFICATE_REQUIRED, OTHER };

/// Written by the connection as it goes along, on the HTTP loop's thread.
struct TlsRecord {
  CertificateProblem problem = CertificateProblem::NONE;
  bool isServerCertificate =
      false;            ///< Whether the problem lies with the server's own certificate or with one above it.
  std::string subject;  ///< Names of the certificate the problem lies with, as RFC 4514 text.
  std::string issuer;
  std::string notBefore;  ///< Its validity as xs:dateTime.
  std::string notAfter;
  std::vector<std::string>
      names;  ///< DNS names and IP addresses that the server's certificate is for; at most kMaxNamesShown.
  bool hasMoreNames = false;
  std::string reason;  ///< The verifier's words.

  TlsAlert alert = TlsAlert::NONE;  ///< The last fatal alert that either side sent.
  std::string alertText;
  bool isAlertFromServer = false;
  bool wasClientCertificateRequested = false;
  bool hasClientCertificate = false;
  bool hasServerEnded = false;  ///< The server has sent close_notify.
};

/// Why OpenSSL gave up, as far as it matters here.
enum class TlsFailureKind { OTHER, NOT_TLS, PROTOCOL_VERSION, CERTIFICATE_REQUIRED, UNEXPECTED_END };

struct TlsFailureReason {
  TlsFailureKind kind = TlsFailureKind::OTHER;
  std::string text;  ///< OpenSSL's words; empty when there is no reason.
};

/// Readies `tls` for one connection to `serverName` with the anchors and identity of `context`, and has the
/// handshake tell `record` about itself. The record changes no verdict. On top of what the HTTP engine
/// checks, the server's certificate must be for `serverName` by its subject alternative names; the common
/// name does not count (RFC 9525, section 6.3). `expiry` is told how long the sessions may live that the HTTP
/// engine keeps. Throws CryptoException.
void ConfigureTls(ssl_ctx_st* tls, const Ssl::SSLContextImpl& context, const std::string& serverName,
                  const std::shared_ptr<TlsRecord>& record, const std::shared_ptr<SessionExpiry>& expiry);

/// The record of a connection that was set up by `ConfigureTls`, perhaps for an earlier exchange.
std::shared_ptr<const TlsRecord> GetTlsRecord(const ssl_st* connection);

/// Reads the packed error code ("error:0A00010B:...") that the HTTP engine hands on in its messages.
TlsFailureReason FindTlsFailureReason(const std::string& engineText);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_TLSRECORD_H
