// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The resolver that believes certificate chains.

#ifndef PELMAR_XML_TRUSTCHAINKEYRESOLVER_H
#define PELMAR_XML_TRUSTCHAINKEYRESOLVER_H

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/VerifiedChainCache.h"

#include <pelmar/system/DateTime.h>
#include <pelmar/xml/security/KeyInfoResolver.h>

#include <list>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

class TrustChainKeyResolver final : public KeyInfoResolver {
 public:
  /// `cache` must outlive the resolver. Throws CryptoException.
  TrustChainKeyResolver(const std::list<Ref<const Crypto::Certificate>>& trustedCertificates,
                        Crypto::VerifiedChainCache& cache);

  Ref<const Crypto::Certificate> ResolveSigner(const ElementNode* keyInfo) const override;
  /// The same as of `now`.
  Ref<const Crypto::Certificate> ResolveSignerAt(const ElementNode* keyInfo,
                                                 const System::DateTime& now) const;

 private:
  ~TrustChainKeyResolver() override;

  Ref<const Crypto::CertificateImpl> Parse(const std::vector<unsigned char>& der) const;

  std::list<Ref<const Crypto::CertificateImpl>> _trusted;
  Crypto::VerifiedChainCache& _cache;
};

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_TRUSTCHAINKEYRESOLVER_H
