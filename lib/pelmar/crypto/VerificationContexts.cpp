// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/VerificationContexts.h"

namespace Pelmar {
namespace Crypto {

VerificationContexts::~VerificationContexts() {
  for (Places& places : _places) {
    for (std::atomic<EVP_PKEY_CTX*>& place : places) {
      EVP_PKEY_CTX_free(place.load(std::memory_order_acquire));
    }
  }
}

KeyContextHandle VerificationContexts::Take(DigestAlgorithm algorithm) noexcept {
  for (std::atomic<EVP_PKEY_CTX*>& place : PlacesOf(algorithm)) {
    EVP_PKEY_CTX* const context = place.exchange(nullptr, std::memory_order_acquire);
    if (context != nullptr) {
      return KeyContextHandle(context);
    }
  }
  return nullptr;
}

void VerificationContexts::Give(DigestAlgorithm algorithm, KeyContextHandle context) noexcept {
  for (std::atomic<EVP_PKEY_CTX*>& place : PlacesOf(algorithm)) {
    EVP_PKEY_CTX* nobody = nullptr;
    if (place.compare_exchange_strong(nobody, context.get(), std::memory_order_release,
                                      std::memory_order_relaxed)) {
      context.release();
      return;
    }
  }
}

VerificationContexts::Places& VerificationContexts::PlacesOf(DigestAlgorithm algorithm) noexcept {
  static_assert(DIGEST_SHA256 == 0 && DIGEST_SHA512 == kAlgorithms - 1, "the algorithms are the indexes");
  return _places[static_cast<std::size_t>(algorithm)];
}

}  // namespace Crypto
}  // namespace Pelmar
