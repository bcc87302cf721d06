// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Remembers which certificate chains were found good.

#ifndef PELMAR_CRYPTO_VERIFIEDCHAINCACHE_H
#define PELMAR_CRYPTO_VERIFIEDCHAINCACHE_H

#include "pelmar/crypto/CertificateChain.h"

#include <pelmar/crypto/Certificate.h>
#include <pelmar/system/DateTime.h>

#include <cstddef>
#include <list>
#include <map>
#include <mutex>
#include <vector>

namespace Pelmar {
namespace Crypto {

/// A few signers and trust lists per process are usual; a process that sees more only verifies some chains
/// again.
constexpr std::size_t kMaxRememberedChains = 64;

/// What a chain verification depended on: SHA-256 over the presented certificates and the trust list, whole
/// and in order.
using ChainFingerprint = std::vector<unsigned char>;

/// The digest of `presented` (DER encodings as they came) and `trusted`. Each item goes in with its length or
/// as a digest of fixed size, so that different lists never give the same text. Throws CryptoException.
ChainFingerprint ComputeChainFingerprint(const std::vector<std::vector<unsigned char>>& presented,
                                         const std::list<Ref<const CertificateImpl>>& trusted);

/// A bounded memory of accepted chains: which signer a set of presented certificates and trusted ones leads
/// to, and when that holds. Refusals are never remembered, and the entry that was used least recently makes
/// room: a stranger who sends ever new sets cannot push out what is in use. Any thread may call it.
///
/// Only for facts that stay true while the fingerprint and the time allow; a future check that depends on
/// anything else (revocation, say) has to be made outside.
class VerifiedChainCache final {
 public:
  explicit VerifiedChainCache(std::size_t capacity = kMaxRememberedChains) : _capacity(capacity) {}

  /// The signer remembered for `fingerprint`; null when there is none or when its chain is not valid at
  /// `now`.
  Ref<const Certificate> Find(const ChainFingerprint& fingerprint, const System::DateTime& now);

  /// Remembers `signer`.
  void Add(const ChainFingerprint& fingerprint, const Ref<const Certificate>& signer,
           const ChainValidity& validity);

 private:
  struct Entry {
    ChainFingerprint fingerprint;
    Ref<const Certificate> signer;
    ChainValidity validity;
  };

  const std::size_t _capacity;
  std::mutex _mutex;
  std::list<Entry> _entries;  // The last one was used most recently.
  std::map<ChainFingerprint, std::list<Entry>::iterator> _places;
};

/// The memory that all resolvers of the process share.
VerifiedChainCache& GetVerifiedChainCache();

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_VERIFIEDCHAINCACHE_H
