// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/CertificateCache.h"

#include "support/Pki.h"

#include <pelmar/crypto/CryptoException.h>

#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

namespace {

using namespace Pelmar::Crypto;
using namespace TestSupport;
using Pelmar::Ref;
using Bytes = std::vector<unsigned char>;

Bytes MakeDer(const std::string& commonName, const std::string& alternativeNames = "") {
  CertificateSpec spec;
  spec.commonName = commonName;
  spec.subjectAlternativeName = alternativeNames;
  return MakeSelfSigned(spec).certificate->GetDer();
}

TEST(CertificateCache, ReadsTheSameBytesOnce) {
  CertificateCache cache;
  const Bytes one = MakeDer("One");
  const Bytes other = MakeDer("One");
  const Ref<const CertificateImpl> first = cache.Read(one);
  EXPECT_EQ(first->GetDer(), one);
  EXPECT_EQ(cache.Read(one).Get(), first.Get());
  EXPECT_EQ(cache.Read(other)->GetDer(), other);
  EXPECT_NE(cache.Read(other).Get(), first.Get());
}

TEST(CertificateCache, ForgetsWhatWasUsedLeastRecently) {
  CertificateCache cache(2);
  const Bytes a = MakeDer("A");
  const Bytes b = MakeDer("B");
  const Ref<const CertificateImpl> firstA = cache.Read(a);
  const Ref<const CertificateImpl> firstB = cache.Read(b);
  EXPECT_EQ(cache.Read(a).Get(), firstA.Get());
  cache.Read(MakeDer("C"));
  EXPECT_EQ(cache.Read(a).Get(), firstA.Get());
  EXPECT_NE(cache.Read(b).Get(), firstB.Get());
}

TEST(CertificateCache, KeepsCertificatesOfABoundedSize) {
  std::string names = "DNS:0.example";
  for (int i = 1; i < 1000; ++i) {
    names += ",DNS:" + std::to_string(i) + ".example";
  }
  const Bytes large = MakeDer("Large", names);
  ASSERT_GT(large.size(), kMaxRememberedCertificateBytes);
  CertificateCache cache;
  const Ref<const CertificateImpl> first = cache.Read(large);
  EXPECT_EQ(first->GetDer(), large);
  EXPECT_NE(cache.Read(large).Get(), first.Get());
}

std::string RefusalOf(CertificateCache& cache, const Bytes& der) {
  try {
    cache.Read(der);
  } catch (const CryptoException& error) {
    return error.what();
  }
  return "accepted";
}

TEST(CertificateCache, RefusesTheSameBytesEachTime) {
  CertificateCache cache;
  Bytes longer = MakeDer("Longer");
  cache.Read(longer);
  longer.push_back(0);
  for (int i = 0; i < 2; ++i) {
    EXPECT_EQ(RefusalOf(cache, longer), "The certificate is followed by other data");
    EXPECT_EQ(RefusalOf(cache, Bytes(3)), "The certificate cannot be read: wrong tag");
  }
}

TEST(CertificateCache, ServesTheWholeProcess) {
  const Bytes der = MakeDer("Shared");
  EXPECT_EQ(CreateCertificateFromDer(der).Get(), CreateCertificateFromDer(der).Get());
  EXPECT_EQ(CreateCertificateFromPem(CreateCertificateFromDer(der)->ToPem()).Get(),
            CreateCertificateFromDer(der).Get());
}

TEST(CertificateCache, ServesSeveralThreadsAtOnce) {
  CertificateCache cache(3);
  std::vector<Bytes> encodings;
  for (int i = 0; i < 5; ++i) {
    encodings.push_back(MakeDer("Certificate " + std::to_string(i)));
  }
  std::vector<std::thread> threads;
  std::vector<int> wrong(4);
  for (int& count : wrong) {
    threads.emplace_back([&] {
      for (int i = 0; i < 100; ++i) {
        const Bytes& der = encodings[static_cast<std::size_t>(i) % encodings.size()];
        const Ref<const CertificateImpl> certificate = cache.Read(der);
        count += certificate->GetDer() == der && !certificate->GetSubject().empty() ? 0 : 1;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrong, std::vector<int>(4));
}

}  // namespace
