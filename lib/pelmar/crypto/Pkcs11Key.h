// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A private key that a PKCS #11 token keeps.

#ifndef PELMAR_CRYPTO_PKCS11KEY_H
#define PELMAR_CRYPTO_PKCS11KEY_H

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/PrivateKeyImpl.h"

#include <pelmar/crypto/Pkcs11.h>

#include <cstddef>
#include <vector>

namespace Pelmar {
namespace Crypto {

class Pkcs11Key final : public PrivateKeyImpl {
 public:
  /// Takes `key` over. Throws CryptoException when it is not good enough or not that of `certificate`.
  Pkcs11Key(evp_pkey_st* key, const Ref<const CertificateImpl>& certificate, const PinFunction& askPin);

  std::vector<unsigned char> Sign(DigestAlgorithm digest, const void* data, std::size_t size) const override;

 private:
  ~Pkcs11Key() override;

  std::vector<unsigned char> SignInToken(DigestAlgorithm digest, const void* data, std::size_t size) const;

  Ref<const CertificateImpl> _certificate;
  PinFunction _askPin;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PKCS11KEY_H
