// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// PKCS #12 files: a private key, its certificate and the certificates above it.

#ifndef PELMAR_CRYPTO_PKCS12_H
#define PELMAR_CRYPTO_PKCS12_H

#include <pelmar/Export.h>
#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>

#include <list>
#include <string>
#include <vector>

namespace Pelmar {
namespace Crypto {

/// What a PKCS #12 file holds.
struct Pkcs12Content {
  Ref<const PrivateKey> privateKey;
  Ref<const Certificate> certificate;  ///< That of `privateKey`.
  /// The issuers above `certificate` that the file holds, nearest first, as SSLContextOptions wants them.
  /// Issuers are found by their names and key identifiers; no signature has been verified.
  std::list<Ref<const Certificate>> chain;
};

/// Reads a PKCS #12 file (RFC 7292) of at most 1 MiB, given as its bytes. It must hold exactly one private
/// key and exactly one certificate of that key; certificates that are no issuers of it are passed over.
///
/// The file must be protected by a MAC with SHA-256, SHA-384 or SHA-512, which `passPhrase` (UTF-8) must
/// confirm before anything else is believed. What is encrypted must be so by PBES2 with PBKDF2 (HMAC with one
/// of the same digests) and AES-CBC: RC2, triple DES and SHA-1, which older programs use, are refused by
/// name. At most 5,000,000 rounds of key derivation are done for one file.
///
/// Nothing of the pass phrase is kept, and copies made on the way are overwritten; the string itself is the
/// caller's. Throws CryptoException.
PELMAR_API Pkcs12Content ReadPkcs12(const std::vector<unsigned char>& der, const std::string& passPhrase);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PKCS12_H
