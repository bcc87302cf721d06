// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Keys and certificates, made anew for each start of the service.

#ifndef QUORLIN_DEVSTS_IDENTITY_H
#define QUORLIN_DEVSTS_IDENTITY_H

#include "devsts/OpenSslHandles.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/PrivateKey.h>

#include <string>
#include <vector>

namespace DevSts {

/// A private key, its certificate (PEM), and the certificates that lead from there to a root (PEM, nearest
/// issuer first).
struct Identity {
  KeyHandle key;
  std::string certificate;
  std::vector<std::string> issuers;

  /// The key as the platform signs with it.
  Pelmar::Ref<const Pelmar::Crypto::PrivateKey> GetSigningKey() const;
};

/// Reads an identity from PEM texts: an unencrypted key, and its certificate followed by its issuers if any.
/// Throws std::invalid_argument when they do not belong together, Pelmar::Crypto::CryptoException when they
/// cannot be read.
Identity ReadIdentity(const std::string& keyPem, const std::string& certificatesPem);

/// A certification authority that lives in memory. Its certificates are valid from a day ago for 30 days.
class CertificateAuthority final {
 public:
  /// A new P-256 key with a self-signed certificate.
  CertificateAuthority();

  /// The authority's own certificate, PEM.
  const std::string& GetCertificate() const { return _certificatePem; }

  /// A P-256 key and a TLS server certificate for these host names and IP addresses. Throws
  /// std::invalid_argument for a text that is neither.
  Identity IssueServer(const std::vector<std::string>& names) const;

  /// An RSA 2048 key and a certificate to sign tokens with.
  Identity IssueSigner() const;
  /// An RSA 2048 key and a certificate for a client that signs its requests.
  Identity IssueClient(const std::string& commonName) const;

 private:
  Identity Issue(const KeyHandle& key, const std::string& commonName, const std::string& keyUsage,
                 const std::string& extendedKeyUsage, const std::string& alternativeNames) const;

  KeyHandle _key;
  CertificateHandle _certificate;
  std::string _certificatePem;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_IDENTITY_H
