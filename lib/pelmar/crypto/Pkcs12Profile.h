// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Which protection of a PKCS #12 file is good enough, judged before any of it is computed.

#ifndef PELMAR_CRYPTO_PKCS12PROFILE_H
#define PELMAR_CRYPTO_PKCS12PROFILE_H

#include <openssl/pkcs12.h>
#include <openssl/x509.h>

namespace Pelmar {
namespace Crypto {

/// For all parts of a file together. Programs use 1,000 to 600,000 a part; whoever wrote the file chose the
/// number, and could keep the reader busy for hours.
constexpr long long kMaxPkcs12Rounds = 5 * 1000 * 1000;

/// Knows what is accepted, and counts the rounds of key derivation of one file.
class Pkcs12Profile final {
 public:
  /// Throws CryptoException unless `file` has a MAC with SHA-256, SHA-384 or SHA-512 (RFC 7292, 4 and
  /// appendix B).
  void RequireMac(const PKCS12* file);

  /// Throws CryptoException unless `algorithm` is PBES2 with PBKDF2 and AES-CBC (RFC 8018, 6.2 and appendix
  /// A).
  void RequireEncryption(const X509_ALGOR* algorithm);

 private:
  void RequireDerivation(const X509_ALGOR* algorithm);
  void Count(const ASN1_INTEGER* rounds);

  long long _rounds = 0;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PKCS12PROFILE_H
