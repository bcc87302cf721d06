// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Checks signature values with the key of a certificate.

#ifndef PELMAR_CRYPTO_SIGNATUREVALUE_H
#define PELMAR_CRYPTO_SIGNATUREVALUE_H

#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/Digest.h>
#include <pelmar/crypto/PrivateKey.h>

#include <vector>

namespace Pelmar {
namespace Crypto {

/// The type of the certificate's key. Throws CryptoException when it is not good enough (KeyStrength.h).
KeyType GetSignatureKeyType(const Certificate* certificate);

/// Whether `value` is the signature that the key of `certificate` made over the text whose digest is
/// `digest`: RSASSA-PKCS1-v1_5 (RFC 8017) or, for EC keys, ECDSA with r and s one after the other (XML
/// Signature 1.1, section 6.4.3). A value of a wrong length is a wrong value. Throws CryptoException when the
/// key is not good enough (KeyStrength.h).
bool VerifySignatureValue(const Certificate* certificate, DigestAlgorithm algorithm,
                          const std::vector<unsigned char>& digest, const std::vector<unsigned char>& value);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_SIGNATUREVALUE_H
