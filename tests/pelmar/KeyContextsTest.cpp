// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/KeyContexts.h"

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/SignatureValue.h"
#include "support/Pki.h"

#include <pelmar/crypto/Digest.h>
#include <pelmar/crypto/PrivateKey.h>

#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace Pelmar {
namespace Crypto {
namespace {

KeyContextHandle MakeContext() {
  return KeyContextHandle(EVP_PKEY_CTX_new_from_name(nullptr, "RSA", nullptr));
}

TEST(KeyContexts, GiveBackWhatWasGivenForTheSameAlgorithm) {
  KeyContexts contexts;
  KeyContextHandle context = MakeContext();
  EVP_PKEY_CTX* const given = context.get();
  contexts.Give(DIGEST_SHA384, std::move(context));
  EXPECT_EQ(contexts.Take(DIGEST_SHA256), nullptr);
  EXPECT_EQ(contexts.Take(DIGEST_SHA512), nullptr);
  EXPECT_EQ(contexts.Take(DIGEST_SHA384).get(), given);
  EXPECT_EQ(contexts.Take(DIGEST_SHA384), nullptr);
}

TEST(KeyContexts, KeepFourAndFreeTheRest) {
  KeyContexts contexts;
  for (int i = 0; i < 6; ++i) {
    contexts.Give(DIGEST_SHA256, MakeContext());
  }
  std::vector<KeyContextHandle> taken;
  while (KeyContextHandle context = contexts.Take(DIGEST_SHA256)) {
    taken.push_back(std::move(context));
  }
  EXPECT_EQ(taken.size(), 4u);
}

// A wrong value leaves nothing behind that would change the verdict on the next one, and the other way round.
TEST(KeyContexts, JudgeEachValueAlone) {
  for (const TestSupport::KeyKind kind : {TestSupport::KeyKind::RSA_2048, TestSupport::KeyKind::EC_P384}) {
    TestSupport::CertificateSpec spec;
    spec.keyKind = kind;
    const TestSupport::Identity signer = TestSupport::MakeSelfSigned(spec);
    const Ref<const PrivateKey> key = CreatePrivateKeyFromPem(signer.keyPair.ToPem());
    for (const DigestAlgorithm algorithm : {DIGEST_SHA256, DIGEST_SHA384, DIGEST_SHA512}) {
      const std::vector<unsigned char> digest = ComputeDigest(algorithm, "text", 4);
      const std::vector<unsigned char> other = ComputeDigest(algorithm, "test", 4);
      const std::vector<unsigned char> value = key->Sign(algorithm, "text", 4);
      for (int i = 0; i < 3; ++i) {
        EXPECT_TRUE(VerifySignatureValue(signer.certificate.Get(), algorithm, digest, value));
        EXPECT_FALSE(VerifySignatureValue(signer.certificate.Get(), algorithm, other, value));
        EXPECT_FALSE(VerifySignatureValue(signer.certificate.Get(), algorithm, digest, {}));
      }
    }
  }
}

// What was signed before, and over which digest, does not show in the next value.
TEST(KeyContexts, SignEachTextAlone) {
  for (const TestSupport::KeyKind kind : {TestSupport::KeyKind::RSA_2048, TestSupport::KeyKind::EC_P384}) {
    TestSupport::CertificateSpec spec;
    spec.keyKind = kind;
    const TestSupport::Identity signer = TestSupport::MakeSelfSigned(spec);
    const Ref<const PrivateKey> key = CreatePrivateKeyFromPem(signer.keyPair.ToPem());
    for (const std::string& text : {std::string("first"), std::string(), std::string("third")}) {
      for (const DigestAlgorithm algorithm : {DIGEST_SHA512, DIGEST_SHA256, DIGEST_SHA384}) {
        const std::vector<unsigned char> value = key->Sign(algorithm, text.data(), text.size());
        EXPECT_TRUE(VerifySignatureValue(signer.certificate.Get(), algorithm,
                                         ComputeDigest(algorithm, text.data(), text.size()), value));
        const bool isRepeatable = kind == TestSupport::KeyKind::RSA_2048;
        EXPECT_EQ(key->Sign(algorithm, text.data(), text.size()) == value, isRepeatable);
      }
    }
  }
}

TEST(KeyContexts, ServeSigningThreadsAtOnce) {
  const TestSupport::Identity signer = TestSupport::MakeSelfSigned(TestSupport::CertificateSpec());
  const Ref<const PrivateKey> key = CreatePrivateKeyFromPem(signer.keyPair.ToPem());
  std::atomic<int> wrong{0};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 8; ++thread) {
    threads.emplace_back([&signer, &key, &wrong, thread] {
      for (int i = 0; i < 10; ++i) {
        const std::string text = "text " + std::to_string(thread) + " " + std::to_string(i);
        const std::vector<unsigned char> value = key->Sign(DIGEST_SHA256, text.data(), text.size());
        const std::vector<unsigned char> digest = ComputeDigest(DIGEST_SHA256, text.data(), text.size());
        wrong += VerifySignatureValue(signer.certificate.Get(), DIGEST_SHA256, digest, value) ? 0 : 1;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrong, 0);
}

// All at once, with more threads than contexts are kept for; each must get the right verdict on its own
// value.
TEST(KeyContexts, ServeThreadsAtOnce) {
  const TestSupport::Identity signer = TestSupport::MakeSelfSigned(TestSupport::CertificateSpec());
  const Ref<const PrivateKey> key = CreatePrivateKeyFromPem(signer.keyPair.ToPem());
  std::atomic<int> wrong{0};
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 8; ++thread) {
    threads.emplace_back([&signer, &key, &wrong, thread] {
      const std::string text = "text " + std::to_string(thread);
      const std::vector<unsigned char> digest = ComputeDigest(DIGEST_SHA256, text.data(), text.size());
      const std::vector<unsigned char> mine = key->Sign(DIGEST_SHA256, text.data(), text.size());
      const std::vector<unsigned char> another = key->Sign(DIGEST_SHA256, "another", 7);
      for (int i = 0; i < 50; ++i) {
        wrong += VerifySignatureValue(signer.certificate.Get(), DIGEST_SHA256, digest, mine) ? 0 : 1;
        wrong += VerifySignatureValue(signer.certificate.Get(), DIGEST_SHA256, digest, another) ? 1 : 0;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrong, 0);
}

}  // namespace
}  // namespace Crypto
}  // namespace Pelmar
