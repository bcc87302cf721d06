// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Signatures or verifications with one key that wait for their next use.

#ifndef PELMAR_CRYPTO_KEYCONTEXTS_H
#define PELMAR_CRYPTO_KEYCONTEXTS_H

#include "pelmar/crypto/OpenSslHandles.h"

#include <pelmar/crypto/Digest.h>
#include <pelmar/crypto/PrivateKey.h>

#include <array>
#include <atomic>
#include <cstddef>

namespace Pelmar {
namespace Crypto {

/// A context for values of `key` over digests of `algorithm`; `init` is EVP_PKEY_sign_init or
/// EVP_PKEY_verify_init. RSA pads by PKCS #1 v1.5. Null, and OpenSSL has the error, when there is none.
KeyContextHandle StartKeyContext(EVP_PKEY* key, KeyType type, DigestAlgorithm algorithm,
                                 int (*init)(EVP_PKEY_CTX*));

/// OpenSSL's contexts for one key and one of the two uses, each set up for one digest algorithm. Setting one
/// up takes a fifth of an RSA verification, in look-ups under OpenSSL's locks; one that was used is as good
/// as new, as a signature or verification leaves nothing behind in it.
///
/// Threads: any may take and give; each context is with one of them at a time. There is no lock.
class KeyContexts final {
 public:
  KeyContexts() = default;
  KeyContexts(const KeyContexts&) = delete;
  KeyContexts& operator=(const KeyContexts&) = delete;
  ~KeyContexts();

  /// Null when none is waiting.
  KeyContextHandle Take(DigestAlgorithm algorithm) noexcept;
  /// For the next one; frees it when enough are waiting.
  void Give(DigestAlgorithm algorithm, KeyContextHandle context) noexcept;

 private:
  static constexpr std::size_t kAlgorithms = 3;
  static constexpr std::size_t kWaiting = 4;
  using Places = std::array<std::atomic<EVP_PKEY_CTX*>, kWaiting>;

  Places& PlacesOf(DigestAlgorithm algorithm) noexcept;

  std::array<Places, kAlgorithms> _places = {};
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_KEYCONTEXTS_H
