// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/SignatureValue.h"
#include "support/Pki.h"
#include "support/Process.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/PrivateKey.h>

#include <gtest/gtest.h>

#include <openssl/evp.h>
#include <openssl/pkcs12.h>
#include <openssl/x509.h>

#include <functional>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace Pelmar::Crypto;
using namespace TestSupport;
using Pelmar::Ref;
using Bytes = std::vector<unsigned char>;

constexpr const char* kPassPhrase = "correct horse";
const std::string kText = "what is signed";

std::string RefusalOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const CryptoException& error) {
    return error.what();
  }
  return "accepted";
}

Ref<const Certificate> MakeCertificate(KeyKind kind) {
  CertificateSpec spec;
  spec.keyKind = kind;
  return MakeSelfSigned(spec).certificate;
}

bool Verifies(const Certificate* certificate, DigestAlgorithm digest, const Bytes& value) {
  return VerifySignatureValue(certificate, digest, ComputeDigest(digest, kText.data(), kText.size()), value);
}

bool SignsFor(const PrivateKey* key, const Certificate* certificate) {
  return Verifies(certificate, DIGEST_SHA256, key->Sign(DIGEST_SHA256, kText.data(), kText.size()));
}

struct KindCase {
  KeyKind kind;
  KeyType type;
  std::size_t valueBytes;
};

const KindCase kKinds[] = {{KeyKind::RSA_2048, KEY_RSA, 256}, {KeyKind::RSA_3072, KEY_RSA, 384},
                           {KeyKind::RSA_4096, KEY_RSA, 512}, {KeyKind::EC_P256, KEY_EC, 64},
                           {KeyKind::EC_P384, KEY_EC, 96},    {KeyKind::EC_P521, KEY_EC, 132}};

TEST(PrivateKey, SignsWhatItsCertificateVerifies) {
  for (const KindCase& c : kKinds) {
    const Ref<const PrivateKey> key = CreatePrivateKeyFromPem(KeyPair::Get(c.kind).ToPem());
    const Ref<const Certificate> certificate = MakeCertificate(c.kind);
    EXPECT_EQ(key->GetType(), c.type);
    EXPECT_EQ(GetSignatureKeyType(certificate.Get()), c.type);
    for (const DigestAlgorithm digest : {DIGEST_SHA256, DIGEST_SHA384, DIGEST_SHA512}) {
      const Bytes value = key->Sign(digest, kText.data(), kText.size());
      EXPECT_EQ(value.size(), c.valueBytes);
      EXPECT_TRUE(Verifies(certificate.Get(), digest, value)) << c.valueBytes;
    }
  }
}

TEST(SignatureValue, IsWrongWhenAnyByteIsAltered) {
  for (const KeyKind kind : {KeyKind::RSA_2048, KeyKind::EC_P256, KeyKind::EC_P521}) {
    const Ref<const Certificate> certificate = MakeCertificate(kind);
    const Bytes value =
        CreatePrivateKeyFromPem(KeyPair::Get(kind).ToPem())->Sign(DIGEST_SHA256, kText.data(), kText.size());
    for (std::size_t i = 0; i < value.size(); ++i) {
      Bytes altered = value;
      altered[i] ^= 1;
      EXPECT_FALSE(Verifies(certificate.Get(), DIGEST_SHA256, altered)) << i;
    }
  }
}

TEST(SignatureValue, IsWrongInAnyOtherSize) {
  for (const KeyKind kind : {KeyKind::RSA_2048, KeyKind::EC_P256}) {
    const Ref<const Certificate> certificate = MakeCertificate(kind);
    Bytes value =
        CreatePrivateKeyFromPem(KeyPair::Get(kind).ToPem())->Sign(DIGEST_SHA256, kText.data(), kText.size());
    EXPECT_FALSE(Verifies(certificate.Get(), DIGEST_SHA256, {}));
    Bytes longer = value;
    longer.push_back(0);
    EXPECT_FALSE(Verifies(certificate.Get(), DIGEST_SHA256, longer));
    longer = value;
    longer.insert(longer.begin(), 0);
    EXPECT_FALSE(Verifies(certificate.Get(), DIGEST_SHA256, longer));
    value.pop_back();
    EXPECT_FALSE(Verifies(certificate.Get(), DIGEST_SHA256, value));
  }
}

TEST(SignatureValue, OfZerosIsWrong) {
  EXPECT_FALSE(Verifies(MakeCertificate(KeyKind::EC_P256).Get(), DIGEST_SHA256, Bytes(64)));
  EXPECT_FALSE(Verifies(MakeCertificate(KeyKind::RSA_2048).Get(), DIGEST_SHA256, Bytes(256)));
}

TEST(SignatureValue, IsWrongUnderAnotherDigest) {
  const Ref<const Certificate> certificate = MakeCertificate(KeyKind::RSA_2048);
  const Bytes value = CreatePrivateKeyFromPem(KeyPair::Get(KeyKind::RSA_2048).ToPem())
                          ->Sign(DIGEST_SHA256, kText.data(), kText.size());
  EXPECT_FALSE(Verifies(certificate.Get(), DIGEST_SHA512, value));
}

TEST(SignatureValue, RefusesCertificatesWithUnacceptableKeys) {
  const auto refusal = [](KeyKind kind) {
    const Ref<const Certificate> certificate = MakeCertificate(kind);
    return RefusalOf([&certificate] { Verifies(certificate.Get(), DIGEST_SHA256, Bytes(64)); });
  };
  EXPECT_EQ(refusal(KeyKind::RSA_1024),
            "The certificate has an RSA key of 1024 bits; at least 2048 are needed");
  EXPECT_EQ(refusal(KeyKind::EC_SECP256K1),
            "The certificate has an EC key on a curve other than P-256, P-384 and P-521");
  EXPECT_EQ(refusal(KeyKind::ED25519), "The certificate has a key that is neither RSA nor EC");
}

TEST(PrivateKey, IsReadFromEveryForm) {
  for (const KeyKind kind : {KeyKind::RSA_2048, KeyKind::EC_P256, KeyKind::EC_P384, KeyKind::EC_P521}) {
    const KeyPair pair = KeyPair::Get(kind);
    const Ref<const Certificate> certificate = MakeCertificate(kind);
    const Ref<const PrivateKey> forms[] = {
        CreatePrivateKeyFromPem(pair.ToPem()),
        CreatePrivateKeyFromPem(pair.ToPem(), kPassPhrase),
        CreatePrivateKeyFromPem(pair.ToTraditionalPem()),
        CreatePrivateKeyFromPem(pair.ToEncryptedPem(kPassPhrase), kPassPhrase),
        CreatePrivateKeyFromPem(pair.ToTraditionalPem(kPassPhrase), kPassPhrase),
        CreatePrivateKeyFromPem("text before\n" + certificate->ToPem() + pair.ToPem()),
        CreatePrivateKeyFromDer(pair.ToDer()),
        CreatePrivateKeyFromDer(pair.ToEncryptedDer(kPassPhrase), kPassPhrase),
    };
    for (const Ref<const PrivateKey>& key : forms) {
      EXPECT_TRUE(SignsFor(key.Get(), certificate.Get()));
    }
  }
}

TEST(PrivateKey, IsReadAsTheOpensslProgramWritesIt) {
  const std::vector<std::vector<std::string>> commands = {
      {"openssl", "ecparam", "-name", "prime256v1", "-genkey"},
      {"openssl", "genpkey", "-algorithm", "EC", "-pkeyopt", "ec_paramgen_curve:P-384"},
      {"openssl", "genrsa", "-traditional", "2048"},
  };
  for (const std::vector<std::string>& command : commands) {
    const ProcessResult made = RunProcess(command);
    ASSERT_EQ(made.exitCode, 0) << made.standardError;
    EXPECT_EQ(RefusalOf([&made] { CreatePrivateKeyFromPem(made.standardOutput); }), "accepted") << command[1];
  }
}

TEST(PrivateKey, RefusesAnEncryptedKeyWithoutPassPhrase) {
  const KeyPair pair = KeyPair::Get(KeyKind::EC_P256);
  for (const std::string& pem : {pair.ToEncryptedPem(kPassPhrase), pair.ToTraditionalPem(kPassPhrase)}) {
    EXPECT_EQ(RefusalOf([&pem] { CreatePrivateKeyFromPem(pem); }),
              "The private key is encrypted and there is no pass phrase");
  }
  // None is not an empty one.
  const std::string pem = pair.ToEncryptedPem("");
  EXPECT_EQ(RefusalOf([&pem] { CreatePrivateKeyFromPem(pem); }),
            "The private key is encrypted and there is no pass phrase");
  EXPECT_EQ(RefusalOf([&pem] { CreatePrivateKeyFromPem(pem, ""); }), "accepted");
}

// OpenSSL asks for 1024 bytes at most.
TEST(PrivateKey, TakesALongPassPhrase) {
  const std::string passPhrase(1024, 'x');
  const std::string pem = KeyPair::Get(KeyKind::EC_P256).ToEncryptedPem(passPhrase);
  EXPECT_EQ(RefusalOf([&] { CreatePrivateKeyFromPem(pem, passPhrase); }), "accepted");
  EXPECT_EQ(RefusalOf([&] { CreatePrivateKeyFromPem(pem, passPhrase + "x"); }),
            "The private key cannot be read: the pass phrase is wrong or the key is damaged");
}

TEST(PrivateKey, RefusesAWrongPassPhrase) {
  const std::string expected =
      "The private key cannot be read: the pass phrase is wrong or the key is damaged";
  const KeyPair pair = KeyPair::Get(KeyKind::EC_P256);
  for (const std::string& wrong : {std::string("wrong horse"), std::string(), std::string(5000, 'x')}) {
    for (const std::string& pem : {pair.ToEncryptedPem(kPassPhrase), pair.ToTraditionalPem(kPassPhrase)}) {
      EXPECT_EQ(RefusalOf([&] { CreatePrivateKeyFromPem(pem, wrong); }), expected);
    }
    EXPECT_EQ(RefusalOf([&] { CreatePrivateKeyFromDer(pair.ToEncryptedDer(kPassPhrase), wrong); }), expected);
  }
}

TEST(PrivateKey, RefusesUnacceptableKeys) {
  const auto refusal = [](KeyKind kind) {
    return RefusalOf([kind] { CreatePrivateKeyFromPem(KeyPair::Get(kind).ToPem()); });
  };
  EXPECT_EQ(refusal(KeyKind::RSA_1024),
            "The private key has an RSA key of 1024 bits; at least 2048 are needed");
  EXPECT_EQ(refusal(KeyKind::EC_SECP256K1),
            "The private key has an EC key on a curve other than P-256, P-384 and P-521");
  EXPECT_EQ(refusal(KeyKind::ED25519), "The private key has a key that is neither RSA nor EC");
}

TEST(PrivateKey, RefusesACurveGivenByItsNumbers) {
  const ProcessResult made = RunProcess({"openssl", "genpkey", "-algorithm", "EC", "-pkeyopt",
                                         "ec_paramgen_curve:P-256", "-pkeyopt", "ec_param_enc:explicit"});
  ASSERT_EQ(made.exitCode, 0) << made.standardError;
  EXPECT_EQ(RefusalOf([&made] { CreatePrivateKeyFromPem(made.standardOutput); }),
            "The private key has an EC key on a curve other than P-256, P-384 and P-521");
}

TEST(PrivateKey, RefusesWhatIsNoKey) {
  const std::string certificate = MakeCertificate(KeyKind::EC_P256)->ToPem();
  const std::string publicKey = KeyPair::Get(KeyKind::EC_P256).ToPublicPem();
  for (const std::string& pem : {std::string(), std::string("no PEM at all"), certificate, publicKey}) {
    const std::string refusal = RefusalOf([&pem] { CreatePrivateKeyFromPem(pem); });
    EXPECT_EQ(refusal, "There is no private key that can be read") << pem;
    EXPECT_EQ(RefusalOf([&pem] { CreatePrivateKeyFromPem(pem, kPassPhrase); }), refusal);
  }
}

TEST(PrivateKey, RefusesDerThatIsNoKeyOrGoesOn) {
  Bytes der = KeyPair::Get(KeyKind::RSA_2048).ToDer();
  der.push_back(0);
  EXPECT_EQ(RefusalOf([&der] { CreatePrivateKeyFromDer(der); }), "The private key is followed by other data");
  der = KeyPair::Get(KeyKind::RSA_2048).ToEncryptedDer(kPassPhrase);
  der.push_back(0);
  EXPECT_EQ(RefusalOf([&der] { CreatePrivateKeyFromDer(der, kPassPhrase); }),
            "The private key is followed by other data");
  for (const Bytes& bad :
       {Bytes(), Bytes{0x30, 0x00}, KeyPair::Get(KeyKind::RSA_2048).ToEncryptedDer(kPassPhrase)}) {
    EXPECT_EQ(RefusalOf([&bad] { CreatePrivateKeyFromDer(bad); }),
              "There is no private key that can be read");
    const Bytes plain = KeyPair::Get(KeyKind::RSA_2048).ToDer();
    EXPECT_EQ(RefusalOf([&plain] { CreatePrivateKeyFromDer(plain, kPassPhrase); }),
              "There is no private key that can be read");
  }
}

TEST(PrivateKey, RefusesEncryptedDerThatHoldsNoKey) {
  PKCS8_PRIV_KEY_INFO* const content = PKCS8_PRIV_KEY_INFO_new();
  auto* const bytes = static_cast<unsigned char*>(OPENSSL_zalloc(1));
  ASSERT_EQ(PKCS8_pkey_set0(content, OBJ_nid2obj(NID_rsaEncryption), 0, V_ASN1_NULL, nullptr, bytes, 1), 1);
  X509_SIG* const envelope = PKCS8_encrypt(-1, EVP_aes_256_cbc(), kPassPhrase, -1, nullptr, 0, 1, content);
  PKCS8_PRIV_KEY_INFO_free(content);
  ASSERT_NE(envelope, nullptr);
  std::vector<unsigned char> der(static_cast<std::size_t>(i2d_X509_SIG(envelope, nullptr)));
  unsigned char* position = der.data();
  i2d_X509_SIG(envelope, &position);
  X509_SIG_free(envelope);
  EXPECT_EQ(RefusalOf([&der] { CreatePrivateKeyFromDer(der, kPassPhrase); }),
            "There is no private key that can be read");
}

TEST(PrivateKey, SignsOnSeveralThreadsAtOnce) {
  constexpr int kThreads = 4;
  constexpr int kRounds = 20;
  const Ref<const PrivateKey> key = CreatePrivateKeyFromPem(KeyPair::Get(KeyKind::EC_P256).ToPem());
  const Ref<const Certificate> certificate = MakeCertificate(KeyKind::EC_P256);
  std::vector<int> good(kThreads);
  std::vector<std::thread> threads;
  for (int& count : good) {
    threads.emplace_back([&count, &key, &certificate] {
      for (int round = 0; round < kRounds; ++round) {
        count += SignsFor(key.Get(), certificate.Get()) ? 1 : 0;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(good, std::vector<int>(kThreads, kRounds));
}

}  // namespace
