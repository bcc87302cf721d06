// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/SignatureValue.h"
#include "support/Pki.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/SigningFunction.h>
#include <pelmar/ssl/SSLContext.h>

#include <gtest/gtest.h>

#include <openssl/evp.h>
#include <openssl/rsa.h>

#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

using namespace Pelmar::Crypto;
using namespace TestSupport;
using Pelmar::Ref;
using Bytes = std::vector<unsigned char>;

const std::string kText = "what is signed";

std::string RefusalOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const Pelmar::Exception& error) {
    return error.what();
  }
  return "accepted";
}

Identity MakeIdentity(KeyKind kind, unsigned keyNumber = 0) {
  CertificateSpec spec;
  spec.keyKind = kind;
  spec.keyNumber = keyNumber;
  return MakeSelfSigned(spec);
}

/// Signs data with the key of `identity`.
SigningFunction SignDataFor(const Identity& identity) {
  const Ref<const PrivateKey> key = identity.GetKey();
  return [key](DigestAlgorithm digest, const Bytes& data) {
    return key->Sign(digest, data.data(), data.size());
  };
}

const EVP_MD* ToDigest(DigestAlgorithm digest) {
  return digest == DIGEST_SHA256 ? EVP_sha256() : digest == DIGEST_SHA384 ? EVP_sha384() : EVP_sha512();
}

/// Signs digests with the RSA key of `identity`, as a device does that is handed the bare digest.
SigningFunction SignDigestFor(const Identity& identity) {
  const KeyPair pair = identity.keyPair;
  return [pair](DigestAlgorithm digest, const Bytes& input) {
    const std::unique_ptr<EVP_PKEY_CTX, decltype(&EVP_PKEY_CTX_free)> context(
        EVP_PKEY_CTX_new(pair.GetHandle(), nullptr), EVP_PKEY_CTX_free);
    std::size_t size = 1024;
    Bytes value(size);
    if (EVP_PKEY_sign_init(context.get()) != 1 ||
        EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_PKCS1_PADDING) != 1 ||
        EVP_PKEY_CTX_set_signature_md(context.get(), ToDigest(digest)) != 1 ||
        EVP_PKEY_sign(context.get(), value.data(), &size, input.data(), input.size()) != 1) {
      throw std::runtime_error("the test cannot sign");
    }
    value.resize(size);
    return value;
  };
}

Bytes Sign(const PrivateKey* key, DigestAlgorithm digest) {
  return key->Sign(digest, kText.data(), kText.size());
}

bool Verifies(const Certificate* certificate, DigestAlgorithm digest, const Bytes& value) {
  return VerifySignatureValue(certificate, digest, ComputeDigest(digest, kText.data(), kText.size()), value);
}

constexpr DigestAlgorithm kDigests[] = {DIGEST_SHA256, DIGEST_SHA384, DIGEST_SHA512};

TEST(SigningFunction, SignsDataWithEveryKindOfKey) {
  for (const KeyKind kind : {KeyKind::RSA_2048, KeyKind::EC_P256, KeyKind::EC_P384, KeyKind::EC_P521}) {
    const Identity identity = MakeIdentity(kind);
    const Ref<const PrivateKey> key =
        CreatePrivateKeyFromFunction(identity.certificate, SIGNING_INPUT_DATA, SignDataFor(identity));
    EXPECT_EQ(key->GetType(), kind == KeyKind::RSA_2048 ? KEY_RSA : KEY_EC);
    for (const DigestAlgorithm digest : kDigests) {
      EXPECT_TRUE(Verifies(identity.certificate.Get(), digest, Sign(key.Get(), digest)));
    }
  }
}

TEST(SigningFunction, SignsDigests) {
  const Identity identity = MakeIdentity(KeyKind::RSA_2048);
  const Ref<const PrivateKey> key =
      CreatePrivateKeyFromFunction(identity.certificate, SIGNING_INPUT_DIGEST, SignDigestFor(identity));
  for (const DigestAlgorithm digest : kDigests) {
    EXPECT_EQ(Sign(key.Get(), digest), Sign(identity.GetKey().Get(), digest));
  }
}

TEST(SigningFunction, IsHandedWhatItAskedFor) {
  const Identity identity = MakeIdentity(KeyKind::RSA_2048);
  for (const SigningInput input : {SIGNING_INPUT_DIGEST, SIGNING_INPUT_DATA}) {
    Bytes seen;
    DigestAlgorithm seenDigest = DIGEST_SHA256;
    const Ref<const PrivateKey> key = CreatePrivateKeyFromFunction(
        identity.certificate, input, [&](DigestAlgorithm digest, const Bytes& bytes) {
          seenDigest = digest;
          seen = bytes;
          return Sign(identity.GetKey().Get(), digest);
        });
    Sign(key.Get(), DIGEST_SHA384);
    EXPECT_EQ(seenDigest, DIGEST_SHA384);
    EXPECT_EQ(seen, input == SIGNING_INPUT_DATA ? Bytes(kText.begin(), kText.end())
                                                : ComputeDigest(DIGEST_SHA384, kText.data(), kText.size()));
  }
}

TEST(SigningFunction, GetsEmptyDataToo) {
  const Identity identity = MakeIdentity(KeyKind::RSA_2048);
  const Ref<const PrivateKey> key =
      CreatePrivateKeyFromFunction(identity.certificate, SIGNING_INPUT_DATA, SignDataFor(identity));
  EXPECT_EQ(key->Sign(DIGEST_SHA256, nullptr, 0), identity.GetKey()->Sign(DIGEST_SHA256, "", 0));
}

// --- What must not become a message ---

constexpr const char* kNotVerified =
    "The signing function gave a value that the certificate's key does not verify";

TEST(SigningFunction, RefusesTheValueOfAnotherKey) {
  for (const KeyKind kind : {KeyKind::RSA_2048, KeyKind::EC_P256}) {
    const Ref<const PrivateKey> key = CreatePrivateKeyFromFunction(
        MakeIdentity(kind).certificate, SIGNING_INPUT_DATA, SignDataFor(MakeIdentity(kind, 1)));
    EXPECT_EQ(RefusalOf([&key] { Sign(key.Get(), DIGEST_SHA256); }), kNotVerified);
  }
}

TEST(SigningFunction, RefusesWrongValues) {
  const Identity identity = MakeIdentity(KeyKind::RSA_2048);
  const Bytes right = Sign(identity.GetKey().Get(), DIGEST_SHA256);
  Bytes flipped = right;
  flipped.back() ^= 1;
  Bytes longer = right;
  longer.push_back(0);
  const Bytes values[] = {{},
                          {0},
                          flipped,
                          longer,
                          Bytes(right.begin(), right.end() - 1),
                          Sign(identity.GetKey().Get(), DIGEST_SHA512)};
  for (const Bytes& value : values) {
    const Ref<const PrivateKey> key =
        CreatePrivateKeyFromFunction(identity.certificate, SIGNING_INPUT_DIGEST,
                                     [&value](DigestAlgorithm, const Bytes&) { return value; });
    EXPECT_EQ(RefusalOf([&key] { Sign(key.Get(), DIGEST_SHA256); }), kNotVerified);
  }
}

TEST(SigningFunction, RefusesAnEcdsaValueInDer) {
  const Identity identity = MakeIdentity(KeyKind::EC_P256);
  const KeyPair pair = identity.keyPair;
  const Ref<const PrivateKey> key = CreatePrivateKeyFromFunction(
      identity.certificate, SIGNING_INPUT_DATA, [&pair](DigestAlgorithm digest, const Bytes& data) {
        const std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)> context(EVP_MD_CTX_new(),
                                                                              EVP_MD_CTX_free);
        EXPECT_EQ(EVP_DigestSignInit(context.get(), nullptr, ToDigest(digest), nullptr, pair.GetHandle()), 1);
        std::size_t size = 256;
        Bytes value(size);
        EXPECT_EQ(EVP_DigestSign(context.get(), value.data(), &size, data.data(), data.size()), 1);
        value.resize(size);
        return value;
      });
  EXPECT_EQ(RefusalOf([&key] { Sign(key.Get(), DIGEST_SHA256); }), kNotVerified);
}

// --- Exceptions ---

/// A key whose function throws what `fail` throws.
Ref<const PrivateKey> MakeFailingKey(const std::function<void()>& fail) {
  return CreatePrivateKeyFromFunction(MakeIdentity(KeyKind::RSA_2048).certificate, SIGNING_INPUT_DIGEST,
                                      [fail](DigestAlgorithm, const Bytes&) -> Bytes {
                                        fail();
                                        return {};
                                      });
}

TEST(SigningFunction, TurnsItsExceptionsIntoOurs) {
  const Ref<const PrivateKey> key = MakeFailingKey([] { throw std::runtime_error("the device is gone"); });
  try {
    Sign(key.Get(), DIGEST_SHA256);
    FAIL();
  } catch (const CryptoException& error) {
    EXPECT_STREQ(error.what(), "The signing function failed: the device is gone");
  }
}

TEST(SigningFunction, TurnsWhatIsNoExceptionIntoOne) {
  const Ref<const PrivateKey> key = MakeFailingKey([] { throw 1; });
  EXPECT_EQ(RefusalOf([&key] { Sign(key.Get(), DIGEST_SHA256); }),
            "The signing function failed with something that is no exception");
}

TEST(SigningFunction, LetsThePlatformsExceptionsPass) {
  const Ref<const PrivateKey> key =
      MakeFailingKey([] { throw Pelmar::InvalidStateException("the device sleeps"); });
  try {
    Sign(key.Get(), DIGEST_SHA256);
    FAIL();
  } catch (const Pelmar::InvalidStateException& error) {
    EXPECT_STREQ(error.what(), "the device sleeps");
  }
}

// --- Making one ---

TEST(SigningFunction, NeedsACertificateAndAFunction) {
  const Identity identity = MakeIdentity(KeyKind::RSA_2048);
  EXPECT_EQ(
      RefusalOf([&] { CreatePrivateKeyFromFunction(nullptr, SIGNING_INPUT_DATA, SignDataFor(identity)); }),
      "Invalid argument : a key that signs by a function needs its certificate");
  EXPECT_EQ(RefusalOf([&] {
              CreatePrivateKeyFromFunction(identity.certificate, SIGNING_INPUT_DATA, SigningFunction());
            }),
            "Invalid argument : the signing function is empty");
}

TEST(SigningFunction, RefusesUnacceptableKeys) {
  const auto refusalOf = [](KeyKind kind) {
    return RefusalOf([kind] {
      CreatePrivateKeyFromFunction(MakeIdentity(kind).certificate, SIGNING_INPUT_DATA,
                                   [](DigestAlgorithm, const Bytes&) { return Bytes(); });
    });
  };
  EXPECT_EQ(refusalOf(KeyKind::RSA_1024),
            "The certificate has an RSA key of 1024 bits; at least 2048 are needed");
  EXPECT_EQ(refusalOf(KeyKind::EC_SECP256K1),
            "The certificate has an EC key on a curve other than P-256, P-384 and P-521");
}

TEST(SigningFunction, OutlivesWhatItWasMadeOf) {
  Ref<const PrivateKey> key;
  Identity identity = MakeIdentity(KeyKind::RSA_2048);
  {
    const SigningFunction sign = SignDataFor(identity);
    key = CreatePrivateKeyFromFunction(identity.certificate, SIGNING_INPUT_DATA, sign);
  }
  EXPECT_TRUE(Verifies(identity.certificate.Get(), DIGEST_SHA256, Sign(key.Get(), DIGEST_SHA256)));
}

TEST(SigningFunction, SignsOnSeveralThreadsAtOnce) {
  const Identity identity = MakeIdentity(KeyKind::EC_P256);
  const Ref<const PrivateKey> key =
      CreatePrivateKeyFromFunction(identity.certificate, SIGNING_INPUT_DATA, SignDataFor(identity));
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      for (int j = 0; j < 20; ++j) {
        EXPECT_TRUE(Verifies(identity.certificate.Get(), DIGEST_SHA256, Sign(key.Get(), DIGEST_SHA256)));
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

// --- What it is for ---

TEST(SigningFunction, IsNoClientKeyForTls) {
  const Identity identity = MakeIdentity(KeyKind::RSA_2048);
  Pelmar::Ssl::SSLContextOptions options;
  options.clientCertificate = identity.certificate;
  options.clientKey =
      CreatePrivateKeyFromFunction(identity.certificate, SIGNING_INPUT_DATA, SignDataFor(identity));
  EXPECT_EQ(RefusalOf([&options] { Pelmar::Ssl::CreateSSLContext(options); }),
            "Invalid argument : the client key signs by a function of the host, which TLS cannot use");
}

}  // namespace
