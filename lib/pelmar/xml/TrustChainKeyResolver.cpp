// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/TrustChainKeyResolver.h"

#include "pelmar/crypto/CertificateChain.h"
#include "pelmar/xml/KeyInfoCertificates.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/xml/security/Exceptions.h>

#include <algorithm>

namespace Pelmar {
namespace Xml {
namespace Security {

namespace {

using Crypto::CertificateImpl;
using Certificates = std::vector<Ref<const CertificateImpl>>;

bool IssuesAnother(const CertificateImpl& certificate, const Certificates& all) {
  return std::any_of(all.begin(), all.end(), [&certificate](const Ref<const CertificateImpl>& other) {
    return other->GetDer() != certificate.GetDer() && LooksLikeIssuer(certificate, *other);
  });
}

/// XML Signature 1.1, section 4.5.4, leaves the order of certificates open. The signer's is the one that
/// issues none of the others; when not exactly one is like that, the first. A wrong guess is only a refusal:
/// the signature is checked with the key of the one that is taken.
Ref<const CertificateImpl> ChooseSigner(const Certificates& all) {
  Certificates leaves;
  for (const Ref<const CertificateImpl>& certificate : all) {
    if (!IssuesAnother(*certificate, all)) {
      leaves.push_back(certificate);
    }
  }
  return leaves.size() == 1 ? leaves.front() : all.front();
}

bool Contains(const Certificates& all, const std::vector<unsigned char>& der) {
  return std::any_of(all.begin(), all.end(), [&der](const Ref<const CertificateImpl>& certificate) {
    return certificate->GetDer() == der;
  });
}

}  // namespace

KeyInfoResolver::~KeyInfoResolver() = default;

TrustChainKeyResolver::TrustChainKeyResolver(
    const std::list<Ref<const Crypto::Certificate>>& trustedCertificates, Crypto::VerifiedChainCache& cache)
    : _cache(cache) {
  for (const Ref<const Crypto::Certificate>& certificate : trustedCertificates) {
    if (certificate) {
      _trusted.push_back(Crypto::ToCertificateImpl(certificate.Get()));
    }
  }
}

TrustChainKeyResolver::~TrustChainKeyResolver() = default;

Ref<const Crypto::Certificate> TrustChainKeyResolver::ResolveSigner(const ElementNode* keyInfo) const {
  return ResolveSignerAt(keyInfo, System::GetUtcDateTime());
}

Ref<const Crypto::Certificate> TrustChainKeyResolver::ResolveSignerAt(const ElementNode* keyInfo,
                                                                      const System::DateTime& now) const {
  const std::vector<std::vector<unsigned char>> encodings = ReadKeyInfoCertificates(keyInfo);
  try {
    const Crypto::ChainFingerprint fingerprint = Crypto::ComputeChainFingerprint(encodings, _trusted);
    if (const Ref<const Crypto::Certificate> remembered = _cache.Find(fingerprint, now)) {
      return remembered;
    }
    Certificates certificates;
    for (const std::vector<unsigned char>& der : encodings) {
      if (!Contains(certificates, der)) {
        certificates.push_back(Parse(der));
      }
    }
    const Ref<const CertificateImpl> signer = ChooseSigner(certificates);
    Crypto::RequireSigningKeyUsage(*signer);
    _cache.Add(fingerprint, signer, Crypto::TrustStore(_trusted).Verify(*signer, certificates, now));
    return signer;
  } catch (const Crypto::CryptoException& error) {
    throw XmlSecurityException(error.what());
  }
}

// A trusted certificate is known already; reading it again would only cost.
Ref<const CertificateImpl> TrustChainKeyResolver::Parse(const std::vector<unsigned char>& der) const {
  const auto known =
      std::find_if(_trusted.begin(), _trusted.end(),
                   [&der](const Ref<const CertificateImpl>& trusted) { return trusted->GetDer() == der; });
  return known != _trusted.end() ? *known : Ref<const CertificateImpl>(MakeRef<CertificateImpl>(der));
}

Ref<KeyInfoResolver> CreateTrustChainKeyResolver(
    const std::list<Ref<const Crypto::Certificate>>& trustedCertificates) {
  return MakeRef<TrustChainKeyResolver>(trustedCertificates, Crypto::GetVerifiedChainCache());
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
