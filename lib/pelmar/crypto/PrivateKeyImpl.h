// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The platform's private key, and what the TLS layer may ask of it.

#ifndef PELMAR_CRYPTO_PRIVATEKEYIMPL_H
#define PELMAR_CRYPTO_PRIVATEKEYIMPL_H

#include "pelmar/crypto/KeyContexts.h"

#include <pelmar/crypto/PrivateKey.h>

#include <cstddef>
#include <memory>
#include <vector>

struct evp_pkey_st;

namespace Pelmar {
namespace Crypto {

class PrivateKeyImpl : public PrivateKey {
 public:
  /// Takes `key` over. Throws CryptoException when it is not good enough (KeyStrength.h); it is freed then
  /// too.
  explicit PrivateKeyImpl(evp_pkey_st* key);

  KeyType GetType() const override { return _type; }
  std::vector<unsigned char> Sign(DigestAlgorithm digest, const void* data, std::size_t size) const override;

  /// OpenSSL's object, owned by this one.
  evp_pkey_st* GetKey() const noexcept { return _key.get(); }

 protected:
  ~PrivateKeyImpl() override;

 private:
  struct KeyDeleter {
    void operator()(evp_pkey_st* key) const noexcept;
  };

  std::vector<unsigned char> MakeValue(DigestAlgorithm algorithm,
                                       const std::vector<unsigned char>& digest) const;

  std::unique_ptr<evp_pkey_st, KeyDeleter> _key;
  KeyType _type;
  mutable KeyContexts _signingContexts;  // The key stays the same whatever is taken or given.
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PRIVATEKEYIMPL_H
