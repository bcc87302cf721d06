// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The certificates that a TLS server showed, and what is wrong with them.

#ifndef QUORLIN_CLI_DOCTOR_SERVERCHAIN_H
#define QUORLIN_CLI_DOCTOR_SERVERCHAIN_H

#include "quorlin/doctor/TlsHandles.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>

#include <cstddef>
#include <string>
#include <vector>

namespace Cli {
namespace Doctor {

/// At most this many of the names that a certificate is for are shown.
constexpr std::size_t kMaxNamesShown = 10;

/// The chain as far as the verification came, the server's own certificate first.
struct ServerChain {
  std::vector<CertificateHandle> certificates;
  int error = X509_V_OK;    ///< What the verification failed with.
  std::size_t culprit = 0;  ///< The certificate it failed at; means nothing without an error.
};

/// Has the verification of `context` tell `chain` what it saw. This changes no verdict. `chain` must outlive
/// the context's connections.
void RecordServerChain(SSL_CTX* context, ServerChain& chain);

/// The certificate as the platform reads it; null when it does not.
Pelmar::Ref<const Pelmar::Crypto::Certificate> Read(const CertificateHandle& certificate);

/// The DNS names and IP addresses that the certificate is for: its subject alternative names. The last is
/// "..." when there are more than are shown.
std::vector<std::string> ReadNames(const CertificateHandle& certificate);

/// What is wrong, in the words of the library, which says the same when it refuses this server.
std::string DescribeProblem(const ServerChain& chain, const std::string& host);

/// "sha256//" and the base64 SHA-256 of the certificate's SubjectPublicKeyInfo (RFC 7469, section 2.4).
std::string ComputePin(const CertificateHandle& certificate);

/// The texts, with ", " between them.
std::string Join(const std::vector<std::string>& texts);

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_SERVERCHAIN_H
