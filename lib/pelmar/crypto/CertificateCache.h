// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Certificates that were read lately.

#ifndef PELMAR_CRYPTO_CERTIFICATECACHE_H
#define PELMAR_CRYPTO_CERTIFICATECACHE_H

#include "pelmar/crypto/CertificateImpl.h"

#include <pelmar/Ref.h>

#include <cstddef>
#include <list>
#include <mutex>
#include <vector>

namespace Pelmar {
namespace Crypto {

constexpr std::size_t kMaxRememberedCertificates = 64;
/// Larger ones are read again each time: together those that are kept take at most a few megabytes.
constexpr std::size_t kMaxRememberedCertificateBytes = 8 * 1024;

/// A bounded memory of parsed certificates. The same few come again and again, in each holder-of-key token of
/// a client for one, and reading one costs OpenSSL as much as verifying two signatures.
///
/// That a certificate was read says nothing of whether it is trusted. The one that was used least recently
/// makes room. Any thread may call it.
class CertificateCache final {
 public:
  explicit CertificateCache(std::size_t capacity = kMaxRememberedCertificates) : _capacity(capacity) {}

  /// The certificate with exactly this encoding. Throws CryptoException; failures are not remembered.
  Ref<const CertificateImpl> Read(const std::vector<unsigned char>& der);

 private:
  Ref<const CertificateImpl> Find(const std::vector<unsigned char>& der);
  void Add(const Ref<const CertificateImpl>& certificate);

  const std::size_t _capacity;
  std::mutex _mutex;
  std::list<Ref<const CertificateImpl>> _certificates;  // The last one was used most recently.
};

/// The memory that the whole process shares.
CertificateCache& GetCertificateCache();

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_CERTIFICATECACHE_H
