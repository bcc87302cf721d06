// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Builds and judges certificate chains.

#ifndef PELMAR_CRYPTO_CERTIFICATECHAIN_H
#define PELMAR_CRYPTO_CERTIFICATECHAIN_H

#include "pelmar/crypto/CertificateImpl.h"

#include <pelmar/system/DateTime.h>

#include <list>
#include <memory>
#include <vector>

struct x509_store_st;

namespace Pelmar {
namespace Crypto {

/// Issuers between a leaf and its anchor; what is deeper is not a chain that anyone uses.
constexpr int kMaxChainIssuers = 8;

/// When a verified chain is good: what the validity periods of its certificates have in common. The end
/// itself is not part of it, which is a second stricter than RFC 5280, 4.1.2.5, and how OpenSSL sees it.
struct ChainValidity {
  System::DateTime notBefore;
  System::DateTime notAfter;
};

/// Certificates that chains may end at. Immutable; may be shared between threads.
class TrustStore final {
 public:
  /// Throws CryptoException.
  explicit TrustStore(const std::list<Ref<const CertificateImpl>>& anchors);
  ~TrustStore();

  /// Verifies, as of `now`, that `leaf` chains to an anchor (RFC 5280, section 6), perhaps through some of
  /// `intermediates`, which are not trusted themselves: issuer signatures (SHA-2, keys of at least 112 bits
  /// of strength), validity periods, CA flags, key usage, name and length constraints, no unknown critical
  /// extension. An anchor need not be self-signed; the leaf may be one itself. No revocation lists. Throws
  /// CryptoException "Certificate chain is not trusted: <reason> (<subject>)".
  ChainValidity Verify(const CertificateImpl& leaf,
                       const std::vector<Ref<const CertificateImpl>>& intermediates,
                       const System::DateTime& now) const;

 private:
  struct StoreDeleter {
    void operator()(x509_store_st* store) const noexcept;
  };

  std::unique_ptr<x509_store_st, StoreDeleter> _store;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_CERTIFICATECHAIN_H
