// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/CertificateCache.h"

#include <algorithm>

namespace Pelmar {
namespace Crypto {

// Two threads that miss the same certificate both read it, and both copies are kept until they go out of use.
Ref<const CertificateImpl> CertificateCache::Read(const std::vector<unsigned char>& der) {
  if (der.size() > kMaxRememberedCertificateBytes) {
    return MakeRef<CertificateImpl>(der);
  }
  if (const Ref<const CertificateImpl> known = Find(der)) {
    return known;
  }
  const Ref<const CertificateImpl> certificate = MakeRef<CertificateImpl>(der);
  // What was not understood may be, when there is more memory.
  if (certificate->IsUnderstood()) {
    Add(certificate);
  }
  return certificate;
}

// Certificates differ in their first bytes, size and serial number, so passing over all of them is quick.
Ref<const CertificateImpl> CertificateCache::Find(const std::vector<unsigned char>& der) {
  const std::lock_guard<std::mutex> lock(_mutex);
  const auto found = std::find_if(
      _certificates.begin(), _certificates.end(),
      [&der](const Ref<const CertificateImpl>& certificate) { return certificate->GetDer() == der; });
  if (found == _certificates.end()) {
    return nullptr;
  }
  _certificates.splice(_certificates.end(), _certificates, found);
  return *found;
}

void CertificateCache::Add(const Ref<const CertificateImpl>& certificate) {
  const std::lock_guard<std::mutex> lock(_mutex);
  _certificates.push_back(certificate);
  if (_certificates.size() > _capacity) {
    _certificates.pop_front();
  }
}

// Never destroyed: another thread may still be reading certificates while the process ends.
CertificateCache& GetCertificateCache() {
  static CertificateCache* const cache = new CertificateCache();
  return *cache;
}

}  // namespace Crypto
}  // namespace Pelmar
