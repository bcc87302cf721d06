// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/doctor/Handshake.h"

#include "quorlin/Failure.h"
#include "quorlin/doctor/Deadline.h"

#include <openssl/err.h>

#include <cerrno>
#include <filesystem>
#include <system_error>

namespace Cli {
namespace Doctor {

namespace {

// 112 bits: RSA and DH from 2048 bits, SHA-2.
constexpr int kSecurityLevel = 2;

// Where Debian and its kin keep the bundle; OpenSSL's own default there names a file that does not exist.
constexpr const char* kDebianBundle = "/etc/ssl/certs/ca-certificates.crt";

[[noreturn]] void RefuseSetup() {
  ERR_clear_error();
  throw UsageException("cannot set up TLS");
}

void Require(bool isDone) {
  if (!isDone) {
    RefuseSetup();
  }
}

// --- Rules ---

void AddAuthorities(X509_STORE* store, const Patient& patient) {
  for (const auto& authority : patient.authorities) {
    const unsigned char* position = authority->GetDer().data();
    const CertificateHandle certificate(
        d2i_X509(nullptr, &position, static_cast<long>(authority->GetDer().size())));
    Require(certificate != nullptr && X509_STORE_add_cert(store, certificate.get()) == 1);
  }
}

/// What OpenSSL was built to use, not what the environment names.
void AddSystemStore(X509_STORE* store) {
  std::error_code ignored;
  const char* const file = std::filesystem::is_regular_file(X509_get_default_cert_file(), ignored)
                               ? X509_get_default_cert_file()
                               : kDebianBundle;
  if (std::filesystem::is_regular_file(file, ignored)) {
    Require(X509_STORE_load_file(store, file) == 1);
  }
  const char* const directory = X509_get_default_cert_dir();
  if (std::filesystem::is_directory(directory, ignored)) {
    X509_LOOKUP* const lookup = X509_STORE_add_lookup(store, X509_LOOKUP_hash_dir());
    Require(lookup != nullptr && X509_LOOKUP_add_dir(lookup, directory, X509_FILETYPE_PEM) == 1);
  }
}

StoreHandle MakeStore(const Patient& patient) {
  StoreHandle store(X509_STORE_new());
  // An anchor ends the chain whether or not it is self-signed.
  Require(store != nullptr && X509_STORE_set_flags(store.get(), X509_V_FLAG_PARTIAL_CHAIN) == 1);
  if (patient.authorities.empty()) {
    AddSystemStore(store.get());
  } else {
    AddAuthorities(store.get(), patient);
  }
  return store;
}

void RequireServerName(SSL_CTX* context, const std::string& host) {
  X509_VERIFY_PARAM* const rules = SSL_CTX_get0_param(context);
  X509_VERIFY_PARAM_set_hostflags(rules,
                                  X509_CHECK_FLAG_NEVER_CHECK_SUBJECT | X509_CHECK_FLAG_NO_PARTIAL_WILDCARDS);
  Require((IsAddress(host) ? X509_VERIFY_PARAM_set1_ip_asc(rules, host.c_str())
                           : X509_VERIFY_PARAM_set1_host(rules, host.data(), host.size())) == 1);
}

SslContextHandle MakeContext(const Patient& patient, ServerChain& chain) {
  SslContextHandle context(SSL_CTX_new(TLS_client_method()));
  Require(context != nullptr && SSL_CTX_set_min_proto_version(context.get(), TLS1_2_VERSION) == 1);
  SSL_CTX_set_security_level(context.get(), kSecurityLevel);
  SSL_CTX_set_cert_store(context.get(), MakeStore(patient).release());
  SSL_CTX_set_verify(context.get(), SSL_VERIFY_PEER, nullptr);
  RequireServerName(context.get(), patient.parts.host);
  RecordServerChain(context.get(), chain);
  return context;
}

SslHandle MakeConnection(SSL_CTX* context, const std::string& host, int socket) {
  SslHandle connection(SSL_new(context));
  Require(connection != nullptr && SSL_set_fd(connection.get(), socket) == 1);
  if (!IsAddress(host)) {
    // RFC 6066, section 3: no addresses, and no dot at the end.
    const std::string name = host.back() == '.' ? host.substr(0, host.size() - 1) : host;
    Require(SSL_set_tlsext_host_name(connection.get(), name.c_str()) == 1);
  }
  static constexpr unsigned char kProtocols[] = "\x08http/1.1";
  Require(SSL_set_alpn_protos(connection.get(), kProtocols, sizeof kProtocols - 1) == 0);
  return connection;
}

// --- Course ---

/// How the handshake ended, if it failed.
struct Break {
  bool isLate = false;
  int systemError = 0;
  unsigned long code = 0;  ///< OpenSSL's first error.
};

bool Connect(SSL* connection, int socket, const Deadline& deadline, Break& reason) {
  for (;;) {
    ERR_clear_error();
    errno = 0;
    const int result = SSL_connect(connection);
    if (result == 1) {
      return true;
    }
    const int systemError = errno;
    const int error = SSL_get_error(connection, result);
    if (error != SSL_ERROR_WANT_READ && error != SSL_ERROR_WANT_WRITE) {
      reason.systemError = error == SSL_ERROR_SYSCALL ? systemError : 0;
      reason.code = ERR_get_error();
      return false;
    }
    if (!deadline.Await(socket, error == SSL_ERROR_WANT_READ ? POLLIN : POLLOUT)) {
      reason.isLate = true;
      return false;
    }
  }
}

std::string DescribeReason(unsigned long code, const std::string& endpoint) {
  const int reason = ERR_GET_REASON(code);
  switch (reason) {
    case SSL_R_WRONG_VERSION_NUMBER:
    case SSL_R_HTTP_REQUEST:
    case SSL_R_PACKET_LENGTH_TOO_LONG:
    case SSL_R_BAD_RECORD_TYPE:
    case SSL_R_RECORD_LENGTH_MISMATCH:
      return endpoint + " does not speak TLS";
    case SSL_R_UNSUPPORTED_PROTOCOL:
    case SSL_R_TLSV1_ALERT_PROTOCOL_VERSION:
      return endpoint + " does not speak TLS 1.2 or newer";
    case SSL_R_UNEXPECTED_EOF_WHILE_READING:
      return endpoint + " closed the connection during the TLS handshake";
    default:
      break;
  }
  constexpr int kMaxAlert = 255;
  if (reason >= SSL_AD_REASON_OFFSET && reason <= SSL_AD_REASON_OFFSET + kMaxAlert) {
    return endpoint + " ended TLS: " + SSL_alert_desc_string_long(reason - SSL_AD_REASON_OFFSET);
  }
  const char* const text = ERR_reason_error_string(code);
  return "TLS with " + endpoint + " failed" + (text == nullptr ? std::string() : std::string(": ") + text);
}

std::string DescribeBreak(const Break& reason, const Patient& patient) {
  const std::string endpoint = GetEndpoint(patient);
  if (reason.isLate) {
    return "No answer from " + endpoint + " to the TLS handshake within " + DescribeTimeout(patient);
  }
  if (reason.systemError == ECONNRESET || reason.systemError == EPIPE) {
    return endpoint + " reset the connection during the TLS handshake";
  }
  if (reason.code == 0) {
    return endpoint + " closed the connection during the TLS handshake";
  }
  return DescribeReason(reason.code, endpoint);
}

}  // namespace

void MakeHandshake(const Patient& patient, int socket, Handshake& result) {
  const SslContextHandle context = MakeContext(patient, result.chain);
  const SslHandle connection = MakeConnection(context.get(), patient.parts.host, socket);
  Break reason;
  result.isDone = Connect(connection.get(), socket, Deadline(patient.timeout), reason);
  if (result.isDone) {
    result.protocol = SSL_get_version(connection.get());
    result.cipher = SSL_get_cipher_name(connection.get());
    SSL_shutdown(connection.get());
  } else if (result.chain.error == X509_V_OK) {
    result.failure = DescribeBreak(reason, patient);
  }
  ERR_clear_error();
}

}  // namespace Doctor
}  // namespace Cli
