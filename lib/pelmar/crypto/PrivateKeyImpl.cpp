// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/PrivateKeyImpl.h"

#include "pelmar/crypto/EcdsaValue.h"
#include "pelmar/crypto/KeyStrength.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"

#include <pelmar/crypto/Digest.h>

#include <utility>

namespace Pelmar {
namespace Crypto {

PrivateKey::PrivateKey() = default;

PrivateKey::~PrivateKey() = default;

void PrivateKeyImpl::KeyDeleter::operator()(EVP_PKEY* key) const noexcept {
  EVP_PKEY_free(key);
}

PrivateKeyImpl::PrivateKeyImpl(EVP_PKEY* key)
    : _key(key), _type(RequireAcceptableKey(key, "The private key")) {}

PrivateKeyImpl::~PrivateKeyImpl() = default;

std::vector<unsigned char> PrivateKeyImpl::Sign(DigestAlgorithm digest, const void* data,
                                                std::size_t size) const {
  ClearOpenSslErrors();
  const std::vector<unsigned char> value = MakeValue(digest, ComputeDigest(digest, data, size));
  return _type == KEY_EC ? EcdsaValueFromDer(value, GetEcOrderBytes(_key.get())) : value;
}

std::vector<unsigned char> PrivateKeyImpl::MakeValue(DigestAlgorithm algorithm,
                                                     const std::vector<unsigned char>& digest) const {
  KeyContextHandle context = _signingContexts.Take(algorithm);
  if (!context) {
    context = StartKeyContext(_key.get(), _type, algorithm, EVP_PKEY_sign_init);
  }
  if (!context) {
    ThrowOpenSslError("Signing cannot be started");
  }
  std::vector<unsigned char> value(static_cast<std::size_t>(EVP_PKEY_get_size(_key.get())));
  std::size_t length = value.size();
  if (EVP_PKEY_sign(context.get(), value.data(), &length, digest.data(), digest.size()) != 1) {
    ThrowOpenSslError("Signing failed");
  }
  _signingContexts.Give(algorithm, std::move(context));
  value.resize(length);
  return value;
}

}  // namespace Crypto
}  // namespace Pelmar
