// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/TlsRecord.h"

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/X509Fields.h"
#include "pelmar/http/ResponseHead.h"
#include "pelmar/http/UrlSyntax.h"
#include "pelmar/ssl/SSLContextImpl.h"

#include <arpa/inet.h>
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <algorithm>
#include <cstdlib>
#include <limits>

namespace Pelmar {
namespace Http {

namespace {

/// What a connection carries along. It outlives the exchange that opened it.
struct Companion {
  std::shared_ptr<TlsRecord> record;
  std::shared_ptr<SessionExpiry> expiry;
  /// When the first certificate of the verified chain expires. Of a resumed session only the earliest that it
  /// may be is known.
  Seconds chainEnd;
  int (*keepSession)(SSL*, SSL_SESSION*);
};

struct NamesDeleter {
  void operator()(GENERAL_NAMES* names) const noexcept { GENERAL_NAMES_free(names); }
};

// --- Certificates ---

CertificateProblem Classify(int error) {
  switch (error) {
    case X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT:
    case X509_V_ERR_UNABLE_TO_GET_ISSUER_CERT_LOCALLY:
    case X509_V_ERR_UNABLE_TO_VERIFY_LEAF_SIGNATURE:
    case X509_V_ERR_SELF_SIGNED_CERT_IN_CHAIN:
      return CertificateProblem::UNKNOWN_ISSUER;
    case X509_V_ERR_DEPTH_ZERO_SELF_SIGNED_CERT:
      return CertificateProblem::SELF_SIGNED;
    case X509_V_ERR_CERT_HAS_EXPIRED:
      return CertificateProblem::EXPIRED;
    case X509_V_ERR_CERT_NOT_YET_VALID:
      return CertificateProblem::NOT_YET_VALID;
    case X509_V_ERR_HOSTNAME_MISMATCH:
    case X509_V_ERR_IP_ADDRESS_MISMATCH:
      return CertificateProblem::WRONG_NAME;
    default:
      return CertificateProblem::OTHER;
  }
}

std::string ReadString(const ASN1_STRING* text) {
  const auto* const data = reinterpret_cast<const char*>(ASN1_STRING_get0_data(text));
  return MaskControlCharacters(std::string(data, static_cast<std::size_t>(ASN1_STRING_length(text))));
}

std::string ReadAddress(const ASN1_STRING* address) {
  const int family = ASN1_STRING_length(address) == 4 ? AF_INET : AF_INET6;
  if (family == AF_INET6 && ASN1_STRING_length(address) != 16) {
    return "?";
  }
  char text[INET6_ADDRSTRLEN];
  return inet_ntop(family, ASN1_STRING_get0_data(address), text, sizeof text) == nullptr ? "?" : text;
}

void RecordName(const GENERAL_NAME* name, TlsRecord& record) {
  if (name->type != GEN_DNS && name->type != GEN_IPADD) {
    return;
  }
  if (record.names.size() == kMaxNamesShown) {
    record.hasMoreNames = true;
    return;
  }
  record.names.push_back(name->type == GEN_DNS ? ReadString(name->d.dNSName)
                                               : ReadAddress(name->d.iPAddress));
}

void RecordNames(const X509* certificate, TlsRecord& record) {
  const std::unique_ptr<GENERAL_NAMES, NamesDeleter> names(
      static_cast<GENERAL_NAMES*>(X509_get_ext_d2i(certificate, NID_subject_alt_name, nullptr, nullptr)));
  for (int i = 0; names && i < sk_GENERAL_NAME_num(names.get()); ++i) {
    RecordName(sk_GENERAL_NAME_value(names.get(), i), record);
  }
}

void RecordProblem(X509_STORE_CTX* verification, TlsRecord& record) {
  const int error = X509_STORE_CTX_get_error(verification);
  record.problem = Classify(error);
  record.reason = X509_verify_cert_error_string(error);
  record.isServerCertificate = X509_STORE_CTX_get_error_depth(verification) == 0;
  if (const X509* const server = X509_STORE_CTX_get0_cert(verification)) {
    RecordNames(server, record);
  }
  if (const X509* const culprit = X509_STORE_CTX_get_current_cert(verification)) {
    record.subject = Crypto::PrintX509Name(X509_get_subject_name(culprit));
    record.issuer = Crypto::PrintX509Name(X509_get_issuer_name(culprit));
    record.notBefore = Crypto::ReadX509Time(X509_get0_notBefore(culprit)).ToString();
    record.notAfter = Crypto::ReadX509Time(X509_get0_notAfter(culprit)).ToString();
  }
}

Seconds FindEnd(const X509* certificate) {
  constexpr long long kMicrosecondsPerSecond = 1000000;
  return Crypto::ReadX509Time(X509_get0_notAfter(certificate)).GetUtcTime() / kMicrosecondsPerSecond;
}

/// The anchor counts too: its dates are checked like the others'.
Seconds FindChainEnd(X509_STORE_CTX* verification) {
  const STACK_OF(X509)* const chain = X509_STORE_CTX_get0_chain(verification);
  Seconds end = std::numeric_limits<Seconds>::max();
  for (int i = 0; i < sk_X509_num(chain); ++i) {
    end = std::min(end, FindEnd(sk_X509_value(chain, i)));
  }
  return end;
}

int VerifyAndRecord(X509_STORE_CTX* verification, void* data) {
  Companion& companion = *static_cast<Companion*>(data);
  companion.chainEnd = 0;
  const int verdict = X509_verify_cert(verification);
  try {
    if (verdict > 0) {
      companion.chainEnd = FindChainEnd(verification);
    } else {
      RecordProblem(verification, *companion.record);
    }
  } catch (const std::exception&) {
    // A certificate too odd to describe; the verdict stands, the message says less, and no session is
    // resumed.
    Crypto::ClearOpenSslErrors();
  }
  return verdict;
}

// --- The course of the handshake ---

void FreeCompanion(void*, void* companion, CRYPTO_EX_DATA*, int, long, void*) {
  delete static_cast<Companion*>(companion);
}

/// Throws where there is none, so that it is asked for again.
int DrawCompanionIndex() {
  const int index = SSL_CTX_get_ex_new_index(0, nullptr, nullptr, nullptr, FreeCompanion);
  if (index < 0) {
    Crypto::ThrowOpenSslError("TLS cannot be set up");
  }
  return index;
}

int GetCompanionIndex() {
  static const int index = DrawCompanionIndex();
  return index;
}

const Companion& GetCompanion(const SSL* connection) {
  return *static_cast<const Companion*>(
      SSL_CTX_get_ex_data(SSL_get_SSL_CTX(connection), GetCompanionIndex()));
}

TlsAlert ClassifyAlert(int code) {
  switch (code) {
    case SSL_AD_PROTOCOL_VERSION:
      return TlsAlert::PROTOCOL_VERSION;
    case SSL_AD_CERTIFICATE_REQUIRED:
      return TlsAlert::CERTIFICATE_REQUIRED;
    default:
      return TlsAlert::OTHER;
  }
}

void RecordFatalAlert(int value, bool isFromServer, TlsRecord& record) noexcept {
  record.alert = ClassifyAlert(value & 0xff);
  record.isAlertFromServer = isFromServer;
  try {
    record.alertText = SSL_alert_desc_string_long(value);
  } catch (const std::exception&) {
    // Out of memory: the message will say less. No exception may pass through OpenSSL.
  }
}

void RecordAlert(const SSL* connection, int where, int value) noexcept {
  constexpr int kFatal = 2;
  if ((where & SSL_CB_ALERT) == 0) {
    return;
  }
  TlsRecord& record = *GetCompanion(connection).record;
  const bool isFromServer = (where & SSL_CB_READ) != 0;
  if ((value & 0xff) == SSL_AD_CLOSE_NOTIFY) {
    record.hasServerEnded = record.hasServerEnded || isFromServer;
  } else if ((value >> 8) == kFatal) {
    RecordFatalAlert(value, isFromServer, record);
  }
}

// Called when the server has asked for a certificate, before one is chosen.
int RecordCertificateRequest(SSL*, void* record) {
  constexpr int kGoOn = 1;
  static_cast<TlsRecord*>(record)->wasClientCertificateRequested = true;
  return kGoOn;
}

// Called when the server has given a session to resume, perhaps long after the handshake.
int LimitAndKeepSession(SSL* connection, SSL_SESSION* session) {
  const Companion& companion = GetCompanion(connection);
  companion.expiry->Limit(companion.chainEnd);
  return companion.keepSession(connection, session);
}

void AttachCompanion(SSL_CTX* tls, const std::shared_ptr<TlsRecord>& record,
                     const std::shared_ptr<SessionExpiry>& expiry) {
  auto owner =
      std::make_unique<Companion>(Companion{record, expiry, expiry->Get(), SSL_CTX_sess_get_new_cb(tls)});
  Companion* const companion = owner.get();
  if (SSL_CTX_set_ex_data(tls, GetCompanionIndex(), companion) != 1) {
    Crypto::ThrowOpenSslError("TLS cannot be set up");
  }
  static_cast<void>(owner.release());  // The context's now.
  record->hasClientCertificate = SSL_CTX_get0_certificate(tls) != nullptr;
  SSL_CTX_set_cert_verify_callback(tls, VerifyAndRecord, companion);
  SSL_CTX_set_cert_cb(tls, RecordCertificateRequest, record.get());
  SSL_CTX_set_info_callback(tls, RecordAlert);
  if (companion->keepSession != nullptr) {
    SSL_CTX_sess_set_new_cb(tls, LimitAndKeepSession);
  }
}

// --- Trust ---

// The HTTP engine adds flags, defaults and a cache of its own to the context's general store. Kept apart from
// that, the anchors stay what they are.
void SetAnchorsApart(SSL_CTX* tls) {
  X509_STORE* const unused = X509_STORE_new();
  if (unused == nullptr || SSL_CTX_set1_verify_cert_store(tls, SSL_CTX_get_cert_store(tls)) != 1) {
    X509_STORE_free(unused);
    Crypto::ThrowOpenSslError("TLS cannot be set up");
  }
  SSL_CTX_set_cert_store(tls, unused);
}

void RequireServerName(SSL_CTX* tls, const std::string& serverName) {
  X509_VERIFY_PARAM* const parameters = SSL_CTX_get0_param(tls);
  X509_VERIFY_PARAM_set_hostflags(parameters,
                                  X509_CHECK_FLAG_NEVER_CHECK_SUBJECT | X509_CHECK_FLAG_NO_PARTIAL_WILDCARDS);
  const int isSet = IsIPAddress(serverName)
                        ? X509_VERIFY_PARAM_set1_ip_asc(parameters, serverName.c_str())
                        : X509_VERIFY_PARAM_set1_host(parameters, serverName.data(), serverName.size());
  if (isSet != 1) {
    Crypto::ThrowOpenSslError("TLS cannot be set up");
  }
}

TlsFailureKind ClassifyReason(int reason) {
  switch (reason) {
    case SSL_R_WRONG_VERSION_NUMBER:
    case SSL_R_HTTP_REQUEST:
    case SSL_R_PACKET_LENGTH_TOO_LONG:
    case SSL_R_BAD_RECORD_TYPE:
    case SSL_R_RECORD_LENGTH_MISMATCH:
      return TlsFailureKind::NOT_TLS;
    case SSL_R_UNSUPPORTED_PROTOCOL:
    case SSL_R_TLSV1_ALERT_PROTOCOL_VERSION:
      return TlsFailureKind::PROTOCOL_VERSION;
    case SSL_R_TLSV13_ALERT_CERTIFICATE_REQUIRED:
      return TlsFailureKind::CERTIFICATE_REQUIRED;
    case SSL_R_UNEXPECTED_EOF_WHILE_READING:
      return TlsFailureKind::UNEXPECTED_END;
    default:
      return TlsFailureKind::OTHER;
  }
}

}  // namespace

void ConfigureTls(SSL_CTX* tls, const Ssl::SSLContextImpl& context, const std::string& serverName,
                  const std::shared_ptr<TlsRecord>& record, const std::shared_ptr<SessionExpiry>& expiry) {
  context.ConfigureSslCtx(tls);
  SetAnchorsApart(tls);
  SSL_CTX_set_verify(tls, SSL_VERIFY_PEER, nullptr);
  RequireServerName(tls, serverName);
  // The HTTP engine would write the session keys to the file that an environment variable names.
  SSL_CTX_set_keylog_callback(tls, nullptr);
  AttachCompanion(tls, record, expiry);
}

std::shared_ptr<const TlsRecord> GetTlsRecord(const SSL* connection) {
  return GetCompanion(connection).record;
}

TlsFailureReason FindTlsFailureReason(const std::string& engineText) {
  static const std::string kMark = "error:";
  const std::size_t mark = engineText.find(kMark);
  if (mark == std::string::npos) {
    return TlsFailureReason();
  }
  const unsigned long code = std::strtoul(engineText.c_str() + mark + kMark.size(), nullptr, 16);
  TlsFailureReason reason;
  if (ERR_GET_LIB(code) == ERR_LIB_SSL) {
    reason.kind = ClassifyReason(ERR_GET_REASON(code));
  }
  // The texts are loaded with the first connection, which is not a given here.
  OPENSSL_init_ssl(OPENSSL_INIT_LOAD_SSL_STRINGS, nullptr);
  const char* const text = ERR_reason_error_string(code);
  reason.text = text == nullptr ? "" : text;
  return reason;
}

}  // namespace Http
}  // namespace Pelmar
