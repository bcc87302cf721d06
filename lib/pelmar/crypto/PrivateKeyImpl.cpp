// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/PrivateKeyImpl.h"

#include "pelmar/crypto/DigestWriter.h"
#include "pelmar/crypto/EcdsaValue.h"
#include "pelmar/crypto/KeyStrength.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"

namespace Pelmar {
namespace Crypto {

namespace {

std::vector<unsigned char> MakeSignature(EVP_PKEY* key, DigestAlgorithm digest, const void* data,
                                         std::size_t size) {
  const DigestContextHandle context(EVP_MD_CTX_new());
  if (!context ||
      EVP_DigestSignInit(context.get(), nullptr, GetDigestImplementation(digest), nullptr, key) != 1) {
    ThrowOpenSslError("Signing cannot be started");
  }
  const auto* const bytes = static_cast<const unsigned char*>(data);
  std::size_t length = 0;
  if (EVP_DigestSign(context.get(), nullptr, &length, bytes, size) != 1) {
    ThrowOpenSslError("Signing failed");
  }
  std::vector<unsigned char> value(length);
  if (EVP_DigestSign(context.get(), value.data(), &length, bytes, size) != 1) {
    ThrowOpenSslError("Signing failed");
  }
  value.resize(length);
  return value;
}

}  // namespace

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
  const std::vector<unsigned char> value = MakeSignature(_key.get(), digest, data, size);
  return _type == KEY_EC ? EcdsaValueFromDer(value, GetEcOrderBytes(_key.get())) : value;
}

}  // namespace Crypto
}  // namespace Pelmar
