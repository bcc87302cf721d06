// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Verifications of one public key that wait for their next use.

#ifndef PELMAR_CRYPTO_VERIFICATIONCONTEXTS_H
#define PELMAR_CRYPTO_VERIFICATIONCONTEXTS_H

#include "pelmar/crypto/OpenSslHandles.h"

#include <pelmar/crypto/Digest.h>

#include <array>
#include <atomic>
#include <cstddef>

namespace Pelmar {
namespace Crypto {

/// OpenSSL's contexts for one key, each set up for one digest algorithm. Setting one up takes a fifth of an
/// RSA verification, in look-ups under OpenSSL's locks; one that was used is as good as new, as a
/// verification leaves nothing behind in it.
///
/// Threads: any may take and give; each context is with one of them at a time. There is no lock.
class VerificationContexts final {
 public:
  VerificationContexts() = default;
  VerificationContexts(const VerificationContexts&) = delete;
  VerificationContexts& operator=(const VerificationContexts&) = delete;
  ~VerificationContexts();

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

#endif  // PELMAR_CRYPTO_VERIFICATIONCONTEXTS_H
