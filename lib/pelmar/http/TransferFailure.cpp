// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/TransferFailure.h"

#include "pelmar/http/Durations.h"

#include <pelmar/http/Client.h>

#include <cerrno>
#include <system_error>

namespace Pelmar {
namespace Http {

namespace {

std::string Join(const std::vector<std::string>& names) {
  std::string text;
  for (const std::string& name : names) {
    text += (text.empty() ? "" : ", ") + name;
  }
  return text;
}

std::string DescribeSystemError(int error) {
  return std::generic_category().message(error);
}

// --- Certificates ---

std::string ListNames(const TlsRecord& tls) {
  if (tls.names.empty()) {
    return "no host at all";
  }
  return Join(tls.names) + (tls.hasMoreNames ? ", ..." : "");
}

/// The start of a sentence about the certificate with the problem.
std::string NameCertificate(const TransferFacts& facts) {
  const std::string server = "ertificate of " + facts.serverName;
  return facts.tls->isServerCertificate
             ? "C" + server
             : "Issuing certificate " + facts.tls->subject + " above the c" + server;
}

std::string DescribeCertificateProblem(const TransferFacts& facts) {
  const std::string server = "Certificate of " + facts.serverName;
  switch (facts.tls->problem) {
    case CertificateProblem::UNKNOWN_ISSUER:
      return server + " is not trusted: issuer " + facts.tls->issuer;
    case CertificateProblem::SELF_SIGNED:
      return server + " is not trusted: it is self-signed (" + facts.tls->subject + ")";
    case CertificateProblem::EXPIRED:
      return NameCertificate(facts) + " expired at " + facts.tls->notAfter;
    case CertificateProblem::NOT_YET_VALID:
      return NameCertificate(facts) + " is not valid before " + facts.tls->notBefore;
    case CertificateProblem::WRONG_NAME:
      return server + " does not match the name: it is for " + ListNames(*facts.tls);
    case CertificateProblem::NONE:
    case CertificateProblem::OTHER:
      break;
  }
  return NameCertificate(facts) + " is not accepted: " + facts.tls->reason;
}

// --- The client's own certificate ---

std::string DescribeAlert(const TransferFacts& facts) {
  const TlsRecord& tls = *facts.tls;
  if (tls.alert == TlsAlert::PROTOCOL_VERSION) {
    return facts.endpoint + " does not speak TLS 1.2 or newer";
  }
  if (!tls.isAlertFromServer) {
    return "TLS with " + facts.endpoint + " failed: " + tls.alertText;
  }
  if (tls.wasClientCertificateRequested && !tls.hasClientCertificate) {
    return facts.endpoint + " demands a client certificate";
  }
  return facts.endpoint +
         (tls.wasClientCertificateRequested ? " refused the client certificate: " : " ended TLS: ") +
         tls.alertText;
}

// --- Before, inside and after the answer ---

std::string DescribeEnd(const TransferFacts& facts, const std::string& what) {
  if (facts.head.IsComplete()) {
    return facts.endpoint + " " + what + " inside the body of its answer";
  }
  if (facts.head.HasStarted()) {
    return facts.endpoint + " " + what + " inside the headers of its answer";
  }
  const bool wantsCertificate =
      facts.tls && facts.tls->wasClientCertificateRequested && !facts.tls->hasClientCertificate;
  return facts.endpoint + " " + what + " before it answered" +
         (wantsCertificate ? "; it had asked for a client certificate" : "");
}

bool IsReset(int error) {
  return error == ECONNRESET || error == EPIPE || error == ECONNABORTED;
}

std::string DescribeTlsFailure(const TransferFacts& facts) {
  const TlsFailureReason reason = FindTlsFailureReason(facts.engineText);
  switch (reason.kind) {
    case TlsFailureKind::NOT_TLS:
      return facts.endpoint + " does not speak TLS";
    case TlsFailureKind::PROTOCOL_VERSION:
      return facts.endpoint + " does not speak TLS 1.2 or newer";
    case TlsFailureKind::CERTIFICATE_REQUIRED:
      return facts.endpoint + " demands a client certificate";
    case TlsFailureKind::UNEXPECTED_END:
      return DescribeEnd(facts, "closed the connection");
    case TlsFailureKind::OTHER:
      break;
  }
  if (facts.tls && facts.tls->alert != TlsAlert::NONE) {
    return DescribeAlert(facts);
  }
  return reason.text.empty() ? std::string() : "TLS with " + facts.endpoint + " failed: " + reason.text;
}

/// For what can happen at any time while bytes are sent and received.
std::string DescribeBrokenConnection(const TransferFacts& facts) {
  if (IsReset(facts.systemError)) {
    return DescribeEnd(facts, "reset the connection");
  }
  std::string tlsFailure = DescribeTlsFailure(facts);
  if (!tlsFailure.empty()) {
    return tlsFailure;
  }
  if (facts.systemError != 0) {
    return "Connection to " + facts.endpoint + " broke: " + DescribeSystemError(facts.systemError);
  }
  return DescribeEnd(facts, "closed the connection");
}

/// What either side objected to; empty when the connection just ended.
std::string DescribeHandshakeObjection(const TransferFacts& facts) {
  if (facts.tls && facts.tls->problem != CertificateProblem::NONE) {
    return DescribeCertificateProblem(facts);
  }
  return FindTlsFailureReason(facts.engineText).kind == TlsFailureKind::UNEXPECTED_END
             ? std::string()
             : DescribeTlsFailure(facts);
}

std::string DescribeHandshakeFailure(const TransferFacts& facts) {
  std::string objection = DescribeHandshakeObjection(facts);
  if (!objection.empty()) {
    return objection;
  }
  return facts.endpoint + (IsReset(facts.systemError) ? " reset" : " closed") +
         " the connection during the TLS handshake";
}

std::string DescribeConnectFailure(const TransferFacts& facts) {
  const std::string peer = facts.proxyHost.empty() ? facts.endpoint : "proxy " + facts.proxyEndpoint;
  if (facts.systemError == ECONNREFUSED) {
    return "Connection refused by " + peer;
  }
  return "No connection to " + peer +
         (facts.systemError == 0 ? std::string() : ": " + DescribeSystemError(facts.systemError));
}

/// What the proxy had against opening a way to the server; empty when it was nothing.
std::string DescribeProxyRefusal(const TransferFacts& facts) {
  constexpr int kUnauthorized = 401;  // Some proxies' word for credentials that are wrong.
  constexpr int kProxyAuthenticationRequired = 407;
  if (facts.proxyStatus == 0 || facts.proxyStatus / 100 == 2) {
    return std::string();
  }
  const std::string proxy = "Proxy " + facts.proxyEndpoint;
  if (facts.hasProxyCredentials &&
      (facts.proxyStatus == kProxyAuthenticationRequired || facts.proxyStatus == kUnauthorized)) {
    return proxy + " refused the credentials";
  }
  if (facts.proxyStatus == kProxyAuthenticationRequired) {
    return proxy + " demands credentials";
  }
  return proxy + " opens no way to the service: it answered " + std::to_string(facts.proxyStatus);
}

/// What our own callbacks objected to; empty when it was nothing.
std::string DescribeRefusal(const TransferFacts& facts) {
  const std::string status = std::to_string(facts.head.GetStatusCode()) +
                             (facts.head.GetReason().empty() ? "" : " ") + facts.head.GetReason();
  switch (facts.head.GetFault()) {
    case HeadFault::TOO_LARGE:
      return "The headers of the answer of " + facts.endpoint + " have more than " +
             std::to_string(kMaxResponseHeaderBytes) + " bytes";
    case HeadFault::NOT_HTTP_1:
      return facts.endpoint + " did not answer in HTTP/1";
    case HeadFault::CONTENT_CODING:
      return facts.endpoint + " answered " + status + " with a content coding, though it was asked for none";
    case HeadFault::TRANSFER_CODING:
      return facts.endpoint + " answered " + status + " with a transfer coding other than chunked";
    case HeadFault::BAD_FIELD:
      return facts.endpoint + " answered " + status + " with a malformed header line";
    case HeadFault::BODY_LENGTH:
      return facts.endpoint + " answered " + status + " without a clear length of its body";
    case HeadFault::NONE:
      break;
  }
  return facts.isBodyTooLarge ? "The body of the answer of " + facts.endpoint + " has more than " +
                                    std::to_string(kMaxResponseBytes) + " bytes"
                              : std::string();
}

std::string DescribeUnknown(const TransferFacts& facts) {
  const std::string text = facts.engineText.empty() ? curl_easy_strerror(facts.code) : facts.engineText;
  return "Exchange with " + facts.endpoint + " failed: " + MaskControlCharacters(text);
}

bool IsChunkingFault(const TransferFacts& facts) {
  return facts.engineText.find("chunk") != std::string::npos;
}

std::string Describe(const TransferFacts& facts) {
  std::string refusal = DescribeRefusal(facts);
  if (!refusal.empty()) {
    return refusal;
  }
  std::string proxyRefusal = DescribeProxyRefusal(facts);
  if (!proxyRefusal.empty()) {
    return proxyRefusal;
  }
  switch (facts.code) {
    case CURLE_OK:
      // The engine takes the end of the connection inside the headers for the end of the answer.
      return DescribeEnd(facts, "closed the connection");
    case CURLE_COULDNT_RESOLVE_HOST:
      return "Host " + facts.host + " was not found";
    case CURLE_COULDNT_RESOLVE_PROXY:
      return "Proxy " + facts.proxyHost + " was not found";
    case CURLE_COULDNT_CONNECT:
      return DescribeConnectFailure(facts);
    case CURLE_OPERATION_TIMEDOUT:
      return "No connection to " + facts.endpoint + " within " +
             FormatSeconds(facts.connectTimeoutMicroseconds) + " s";
    case CURLE_SSL_CONNECT_ERROR:
    case CURLE_PEER_FAILED_VERIFICATION:
    case CURLE_SSL_CLIENTCERT:
      return DescribeHandshakeFailure(facts);
    case CURLE_SSL_PINNEDPUBKEYNOTMATCH:
      return "Public key of " + facts.serverName + " matches none of the pins";
    case CURLE_UNSUPPORTED_PROTOCOL:
    case CURLE_WEIRD_SERVER_REPLY:
      return facts.endpoint + " did not answer in HTTP/1";
    case CURLE_FILESIZE_EXCEEDED:
      return "The body of the answer of " + facts.endpoint + " has more than " +
             std::to_string(kMaxResponseBytes) + " bytes";
    case CURLE_OUT_OF_MEMORY:
      // The engine's word for a line beyond its own bound.
      return facts.head.IsComplete() ? DescribeUnknown(facts)
                                     : "A header of the answer of " + facts.endpoint + " is too long";
    case CURLE_GOT_NOTHING:
    case CURLE_PARTIAL_FILE:
    case CURLE_ABORTED_BY_CALLBACK:  // By ours that lets nothing be sent twice.
      return DescribeEnd(facts, "closed the connection");
    case CURLE_SEND_ERROR:
    case CURLE_RECV_ERROR:
      return IsChunkingFault(facts) ? facts.endpoint + " answered in broken chunks"
                                    : DescribeBrokenConnection(facts);
    default:
      return DescribeUnknown(facts);
  }
}

/// Neither side had anything against the other. What OpenSSL or an alert gave as a reason would come again.
bool WasHandshakeBrokenOff(const TransferFacts& facts) {
  return DescribeHandshakeObjection(facts).empty();
}

}  // namespace

bool IsSafeToRetry(const TransferFacts& facts) {
  // A kept connection that breaks is replaced by the engine, and the server may have read what went over it.
  if (facts.wasReady) {
    return false;
  }
  switch (facts.code) {
    case CURLE_COULDNT_CONNECT:
      return facts.systemError == ECONNREFUSED;
    case CURLE_SSL_CONNECT_ERROR:
      return WasHandshakeBrokenOff(facts);
    case CURLE_OPERATION_TIMEDOUT:
      return facts.hasTlsStarted;
    default:
      return false;
  }
}

std::shared_ptr<const HttpException> DescribeFailure(const TransferFacts& facts) {
  const std::string text = Describe(facts);
  if (facts.code == CURLE_OPERATION_TIMEDOUT) {
    return std::make_shared<const HttpTimeoutException>(text);
  }
  return std::make_shared<const HttpException>(text);
}

}  // namespace Http
}  // namespace Pelmar
