// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Private keys that sign.

#ifndef PELMAR_CRYPTO_PRIVATEKEY_H
#define PELMAR_CRYPTO_PRIVATEKEY_H

#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Ref.h>
#include <pelmar/crypto/Digest.h>

#include <cstddef>
#include <string>
#include <vector>

namespace Pelmar {
namespace Crypto {

enum KeyType { KEY_RSA, KEY_EC };

/// A private key. Immutable; may sign on several threads at once. Its secret never leaves it.
class PELMAR_API PrivateKey : public Object {
 public:
  virtual KeyType GetType() const = 0;
  /// Signs `size` bytes at `data`: RSASSA-PKCS1-v1_5 (RFC 8017) for RSA; for EC the ECDSA value as r and s,
  /// each of the length of the curve's order, one after the other (XML Signature 1.1, section 6.4.3). Throws
  /// CryptoException.
  virtual std::vector<unsigned char> Sign(DigestAlgorithm digest, const void* data,
                                          std::size_t size) const = 0;

 protected:
  PrivateKey();
  ~PrivateKey() override;
};

/// An unencrypted RSA (at least 2048 bits) or EC (P-256, P-384, P-521) key from PEM text: PKCS #8, or the
/// traditional forms. Throws CryptoException, also when the key is encrypted.
PELMAR_API Ref<const PrivateKey> CreatePrivateKeyFromPem(const std::string& pem);

/// The same for a key that may be encrypted (PKCS #8 EncryptedPrivateKeyInfo, or a traditional form) with
/// `passPhrase`. A wrong pass phrase is a CryptoException. Nothing is ever asked for on a terminal.
PELMAR_API Ref<const PrivateKey> CreatePrivateKeyFromPem(const std::string& pem,
                                                         const std::string& passPhrase);

/// From DER: PKCS #8 or the traditional forms, unencrypted.
PELMAR_API Ref<const PrivateKey> CreatePrivateKeyFromDer(const std::vector<unsigned char>& der);

/// From DER: PKCS #8 EncryptedPrivateKeyInfo.
PELMAR_API Ref<const PrivateKey> CreatePrivateKeyFromDer(const std::vector<unsigned char>& der,
                                                         const std::string& passPhrase);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PRIVATEKEY_H
