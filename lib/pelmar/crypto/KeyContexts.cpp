// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/KeyContexts.h"

#include "pelmar/crypto/DigestWriter.h"

#include <openssl/rsa.h>

#include <utility>

namespace Pelmar {
namespace Crypto {

KeyContextHandle StartKeyContext(EVP_PKEY* key, KeyType type, DigestAlgorithm algorithm,
                                 int (*init)(EVP_PKEY_CTX*)) {
  KeyContextHandle context(EVP_PKEY_CTX_new(key, nullptr));
  const bool isReady =
      context && init(context.get()) == 1 &&
      (type != KEY_RSA || EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_PADDING) == 1) &&
      EVP_PKEY_CTX_set_signature_md(context.get(), GetDigestImplementation(algorithm)) == 1;
  return isReady ? std::move(context) : nullptr;
}

KeyContexts::~KeyContexts() {
  for (Places& places : _places) {
    for (std::atomic<EVP_PKEY_CTX*>& place : places) {
      EVP_PKEY_CTX_free(place.load(std::memory_order_acquire));
    }
  }
}

KeyContextHandle KeyContexts::Take(DigestAlgorithm algorithm) noexcept {
  for (std::atomic<EVP_PKEY_CTX*>& place : PlacesOf(algorithm)) {
    EVP_PKEY_CTX* const context = place.exchange(nullptr, std::memory_order_acquire);
    if (context != nullptr) {
      return KeyContextHandle(context);
    }
  }
  return nullptr;
}

void KeyContexts::Give(DigestAlgorithm algorithm, KeyContextHandle context) noexcept {
  for (std::atomic<EVP_PKEY_CTX*>& place : PlacesOf(algorithm)) {
    EVP_PKEY_CTX* nobody = nullptr;
    if (place.compare_exchange_strong(nobody, context.get(), std::memory_order_release,
                                      std::memory_order_relaxed)) {
      context.release();
      return;
    }
  }
}

KeyContexts::Places& KeyContexts::PlacesOf(DigestAlgorithm algorithm) noexcept {
  static_assert(DIGEST_SHA256 == 0 && DIGEST_SHA512 == kAlgorithms - 1, "the algorithms are the indexes");
  return _places[static_cast<std::size_t>(algorithm)];
}

}  // namespace Crypto
}  // namespace Pelmar
