// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/VerifiedChainCache.h"

#include "pelmar/crypto/DigestWriter.h"

#include <cstdint>

namespace Pelmar {
namespace Crypto {

namespace {

void WriteBytes(DigestWriter& writer, const std::vector<unsigned char>& bytes) {
  writer.Write(reinterpret_cast<const char*>(bytes.data()), bytes.size());
}

void WriteCount(DigestWriter& writer, std::size_t count) {
  const std::uint64_t number = count;
  writer.Write(reinterpret_cast<const char*>(&number), sizeof(number));
}

bool IsValidAt(const ChainValidity& validity, const System::DateTime& now) {
  return !(now < validity.notBefore) && now < validity.notAfter;
}

}  // namespace

ChainFingerprint ComputeChainFingerprint(const std::vector<std::vector<unsigned char>>& presented,
                                         const std::list<Ref<const CertificateImpl>>& trusted) {
  const Ref<DigestWriter> writer = MakeRef<DigestWriter>(DIGEST_SHA256);
  WriteCount(*writer, presented.size());
  for (const std::vector<unsigned char>& der : presented) {
    WriteCount(*writer, der.size());
    WriteBytes(*writer, der);
  }
  for (const Ref<const CertificateImpl>& certificate : trusted) {
    WriteBytes(*writer, certificate->GetSha256());
  }
  return writer->Finish();
}

Ref<const Certificate> VerifiedChainCache::Find(const ChainFingerprint& fingerprint,
                                                const System::DateTime& now) {
  const std::lock_guard<std::mutex> lock(_mutex);
  const auto found = _places.find(fingerprint);
  if (found == _places.end() || !IsValidAt(found->second->validity, now)) {
    return nullptr;
  }
  _entries.splice(_entries.end(), _entries, found->second);
  return found->second->signer;
}

void VerifiedChainCache::Add(const ChainFingerprint& fingerprint, const Ref<const Certificate>& signer,
                             const ChainValidity& validity) {
  const std::lock_guard<std::mutex> lock(_mutex);
  if (_capacity == 0 || _places.count(fingerprint) != 0) {
    return;
  }
  if (_entries.size() == _capacity) {
    _places.erase(_entries.front().fingerprint);
    _entries.pop_front();
  }
  std::list<Entry> entry(1, Entry{fingerprint, signer, validity});
  _places.emplace(fingerprint, entry.begin());
  _entries.splice(_entries.end(), entry);
}

// Never destroyed: a resolver may still be at work on another thread while the process ends.
VerifiedChainCache& GetVerifiedChainCache() {
  static VerifiedChainCache* const cache = new VerifiedChainCache();
  return *cache;
}

}  // namespace Crypto
}  // namespace Pelmar
