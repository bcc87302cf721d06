// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Signature and digest values that forgers compute rather than copy, and the spellings of base64.

#include "quorlin/Namespaces.h"
#include "support/GoldenText.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <pelmar/StringUtil.h>

#include <openssl/bn.h>
#include <openssl/core_names.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/rsa.h>

#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using namespace Pelmar::Xml::Security;
using Bytes = std::vector<unsigned char>;

const char* const kTampered =
    "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.";

std::string ValueOf(const std::string& token) {
  return CutBetween(token, "<ds:SignatureValue>", "</ds:SignatureValue>");
}

std::string WithValue(const std::string& token, const std::string& base64) {
  return ReplaceOnce(token, "<ds:SignatureValue>" + ValueOf(token), "<ds:SignatureValue>" + base64);
}

std::string WithValue(const std::string& token, const Bytes& value) {
  return WithValue(token, Pelmar::StringUtil::Base64Encode(value));
}

/// A self-signed signer, and a token that it signed.
struct Sample {
  Identity signer;
  std::string token;

  std::string Judge(const Bytes& value) const {
    return VerdictOnToken(WithValue(token, value), Trust({signer}));
  }
  Bytes Value() const { return Pelmar::StringUtil::Base64Decode(ValueOf(token)); }
};

Sample MakeSample(const CertificateSpec& spec, const char* method) {
  Sample sample{MakeSelfSigned(spec), ""};
  TokenSigning signing;
  signing.signatureMethod = method;
  sample.token = SignToken(TokenText().Compose(), sample.signer, signing);
  return sample;
}

Sample MakeSample(KeyKind kind, const char* method) {
  CertificateSpec spec;
  spec.keyKind = kind;
  return MakeSample(spec, method);
}

Bytes Join(const Bytes& a, const Bytes& b) {
  Bytes all = a;
  all.insert(all.end(), b.begin(), b.end());
  return all;
}

Bytes Part(const Bytes& bytes, std::size_t begin, std::size_t end) {
  return Bytes(bytes.begin() + static_cast<std::ptrdiff_t>(begin),
               bytes.begin() + static_cast<std::ptrdiff_t>(end));
}

using Number = std::unique_ptr<BIGNUM, void (*)(BIGNUM*)>;

Number MakeNumber() {
  return Number(BN_new(), BN_free);
}

Number ToNumber(const Bytes& bytes) {
  return Number(BN_bin2bn(bytes.data(), static_cast<int>(bytes.size()), nullptr), BN_free);
}

Bytes ToBytes(const Number& number, std::size_t size) {
  Bytes bytes(size);
  if (BN_bn2binpad(number.get(), bytes.data(), static_cast<int>(size)) != static_cast<int>(size)) {
    throw std::runtime_error("the number does not fit");
  }
  return bytes;
}

Number GetKeyNumber(const Identity& identity, const char* name) {
  BIGNUM* number = nullptr;
  if (EVP_PKEY_get_bn_param(identity.keyPair.GetHandle(), name, &number) != 1) {
    throw std::runtime_error("the key does not tell its numbers");
  }
  return Number(number, BN_free);
}

// --- ECDSA: two numbers side by side, each as long as the order (XML Signature 1.1, section 6.4.3) ---

TEST(EcdsaValueOfAToken, IsRefusedWithNumbersThatProveNothing) {
  const Sample sample = MakeSample(KeyKind::EC_P256, kEcdsaSha256);
  const Bytes r = Part(sample.Value(), 0, 32);
  const Bytes s = Part(sample.Value(), 32, 64);
  const Bytes zero(32);
  const Bytes order = ToBytes(GetKeyNumber(sample.signer, OSSL_PKEY_PARAM_EC_ORDER), 32);
  const Bytes largest(32, 0xFF);
  Bytes one(32);
  one.back() = 1;
  ASSERT_EQ(sample.Judge(Join(r, s)), "accepted");
  for (const Bytes& value :
       {Join(zero, zero), Join(r, zero), Join(zero, s), Join(order, order), Join(r, order), Join(order, s),
        Join(largest, largest), Join(one, one), Join(s, r)}) {
    EXPECT_EQ(sample.Judge(value), kTampered);
  }
}

TEST(EcdsaValueOfAToken, IsRefusedInAnotherEncodingOrLength) {
  const Sample sample = MakeSample(KeyKind::EC_P256, kEcdsaSha256);
  const Bytes value = sample.Value();
  const Bytes r = Part(value, 0, 32);
  const Bytes s = Part(value, 32, 64);
  const std::unique_ptr<ECDSA_SIG, void (*)(ECDSA_SIG*)> numbers(ECDSA_SIG_new(), ECDSA_SIG_free);
  ASSERT_EQ(ECDSA_SIG_set0(numbers.get(), ToNumber(r).release(), ToNumber(s).release()), 1);
  unsigned char* encoding = nullptr;
  const int size = i2d_ECDSA_SIG(numbers.get(), &encoding);
  const Bytes der(encoding, encoding + size);
  OPENSSL_free(encoding);
  const Bytes zero(1);
  const Bytes padding(16);
  for (const Bytes& other :
       {der, Join(zero, value), Join(value, zero), Part(value, 0, 63), Part(value, 1, 64), r,
        Join(Join(zero, r), Join(zero, s)), Join(Join(padding, r), Join(padding, s)), Join(value, value)}) {
    EXPECT_EQ(sample.Judge(other), kTampered) << other.size();
  }
}

// Whoever has seen one value can compute the other (its second number taken from the order). Both stand for
// the same signed token, so a value is nothing to tell tokens apart by.
TEST(EcdsaValueOfAToken, HasATwin) {
  const Sample sample = MakeSample(KeyKind::EC_P384, kEcdsaSha384);
  const Bytes value = sample.Value();
  const Number order = GetKeyNumber(sample.signer, OSSL_PKEY_PARAM_EC_ORDER);
  const Number twin = MakeNumber();
  ASSERT_EQ(BN_sub(twin.get(), order.get(), ToNumber(Part(value, 48, 96)).get()), 1);
  const Bytes other = Join(Part(value, 0, 48), ToBytes(twin, 48));
  ASSERT_NE(other, value);
  EXPECT_EQ(sample.Judge(other), "accepted");
}

TEST(EcdsaValueOfAToken, IsRefusedUnderTheHashOfAnotherMethod) {
  const Sample sample = MakeSample(KeyKind::EC_P384, kEcdsaSha384);
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(sample.token, kEcdsaSha384, kEcdsaSha256), Trust({sample.signer})),
            kTampered);
}

// --- RSA: exactly as long as the modulus (RFC 8017, section 8.2.2) ---

TEST(RsaValueOfAToken, IsRefusedInAnotherLength) {
  const Sample sample = MakeSample(KeyKind::RSA_2048, kRsaSha256);
  const Bytes value = sample.Value();
  const Bytes zero(1);
  ASSERT_EQ(sample.Judge(value), "accepted");
  for (const Bytes& other :
       {Join(zero, value), Join(zero, Part(value, 0, 255)), Join(value, zero), Part(value, 1, 256),
        Part(value, 0, 255), Part(value, 0, 1), Join(value, value)}) {
    EXPECT_EQ(sample.Judge(other), kTampered) << other.size();
  }
}

TEST(RsaValueOfAToken, IsRefusedWithNumbersThatProveNothing) {
  const Sample sample = MakeSample(KeyKind::RSA_2048, kRsaSha256);
  const Number modulus = GetKeyNumber(sample.signer, OSSL_PKEY_PARAM_RSA_N);
  const Number last = MakeNumber();
  ASSERT_EQ(BN_sub(last.get(), modulus.get(), BN_value_one()), 1);
  Bytes one(256);
  one.back() = 1;
  for (const Bytes& value : {Bytes(256), one, ToBytes(last, 256), ToBytes(modulus, 256), Bytes(256, 0xFF)}) {
    EXPECT_EQ(sample.Judge(value), kTampered);
  }
}

std::shared_ptr<EVP_PKEY> MakeRsaKey(unsigned bits, unsigned long exponent) {
  const std::unique_ptr<EVP_PKEY_CTX, void (*)(EVP_PKEY_CTX*)> context(
      EVP_PKEY_CTX_new_from_name(nullptr, "RSA", nullptr), EVP_PKEY_CTX_free);
  const Number e = MakeNumber();
  EVP_PKEY* key = nullptr;
  if (BN_set_word(e.get(), exponent) != 1 || EVP_PKEY_keygen_init(context.get()) != 1 ||
      EVP_PKEY_CTX_set_rsa_keygen_bits(context.get(), static_cast<int>(bits)) != 1 ||
      EVP_PKEY_CTX_set1_rsa_keygen_pubexp(context.get(), e.get()) != 1 ||
      EVP_PKEY_generate(context.get(), &key) != 1) {
    throw std::runtime_error("an RSA key cannot be made");
  }
  return std::shared_ptr<EVP_PKEY>(key, EVP_PKEY_free);
}

/// The smallest number whose third power is at least `bytes`, by halving what is possible.
Bytes CubeRoot(const Bytes& bytes) {
  const std::unique_ptr<BN_CTX, void (*)(BN_CTX*)> context(BN_CTX_new(), BN_CTX_free);
  const Number target = ToNumber(bytes);
  const Number root = MakeNumber();
  const Number power = MakeNumber();
  for (int bit = static_cast<int>(bytes.size()) * 8 / 3 + 1; bit >= 0; --bit) {
    BN_set_bit(root.get(), bit);
    BN_sqr(power.get(), root.get(), context.get());
    BN_mul(power.get(), power.get(), root.get(), context.get());
    if (BN_cmp(power.get(), target.get()) > 0) {
      BN_clear_bit(root.get(), bit);
    }
  }
  BN_add_word(root.get(), 1);
  return ToBytes(root, bytes.size());
}

// D. Bleichenbacher's forgery: with the exponent 3, a number whose third power begins like the padded digest
// is found without the key. Whoever does not look at all of the padding believes it.
TEST(RsaValueOfAToken, IsRefusedWhenOnlyItsBeginningIsRight) {
  CertificateSpec spec;
  spec.key = MakeRsaKey(2048, 3);
  const Sample sample = MakeSample(spec, kRsaSha256);
  const Bytes value = sample.Value();
  ASSERT_EQ(sample.Judge(value), "accepted");
  // What the right value decrypts to is the padded digest; its run of 0xFF is shortened, garbage follows.
  Bytes padded(256);
  std::size_t size = padded.size();
  const std::unique_ptr<EVP_PKEY_CTX, void (*)(EVP_PKEY_CTX*)> context(
      EVP_PKEY_CTX_new(sample.signer.keyPair.GetHandle(), nullptr), EVP_PKEY_CTX_free);
  ASSERT_EQ(EVP_PKEY_encrypt_init(context.get()), 1);
  ASSERT_EQ(EVP_PKEY_CTX_set_rsa_padding(context.get(), RSA_NO_PADDING), 1);
  ASSERT_EQ(EVP_PKEY_encrypt(context.get(), padded.data(), &size, value.data(), value.size()), 1);
  const Bytes start = {0x00, 0x01, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF};
  ASSERT_EQ(Part(padded, 0, start.size()), start);
  const std::size_t kDigestInfoBytes = 51 + 1;  // With the zero before it.
  Bytes wanted = Join(start, Part(padded, 256 - kDigestInfoBytes, 256));
  wanted.resize(256);
  EXPECT_EQ(sample.Judge(CubeRoot(wanted)), kTampered);
}

// --- Weak and unusual keys: trusted by name, refused for their kind ---

std::string JudgeTrusted(const CertificateSpec& spec, const char* method) {
  const Sample sample = MakeSample(spec, method);
  return VerdictOnToken(sample.token, Trust({sample.signer}));
}

std::string Error(const std::string& reason) {
  return "Quorlin::InvalidSignatureException: Signature verification error. " + reason;
}

TEST(KeyOfATokenSigner, IsRefusedWhenItIsAShortRsaKey) {
  const std::string tooWeak =
      "Certificate chain is not trusted: EE certificate key too weak (CN=Test signer)";
  const std::pair<unsigned, std::string> cases[] = {
      {512, tooWeak},
      {1024, tooWeak},
      {2040, "The certificate has an RSA key of 2040 bits; at least 2048 are needed"}};
  for (const auto& [bits, reason] : cases) {
    CertificateSpec spec;
    spec.key = MakeRsaKey(bits, 65537);
    EXPECT_EQ(JudgeTrusted(spec, kRsaSha256), Error(reason)) << bits;
  }
}

TEST(KeyOfATokenSigner, IsRefusedOnAnUnusualCurve) {
  CertificateSpec spec;
  spec.keyKind = KeyKind::EC_SECP256K1;
  EXPECT_EQ(JudgeTrusted(spec, kEcdsaSha256),
            Error("The certificate has an EC key on a curve other than P-256, P-384 and P-521"));
}

// A curve given by its numbers could be another one that only looks like P-256 (CVE-2020-0601).
TEST(KeyOfATokenSigner, IsRefusedOnACurveGivenByItsNumbers) {
  const std::unique_ptr<EVP_PKEY_CTX, void (*)(EVP_PKEY_CTX*)> context(
      EVP_PKEY_CTX_new_from_name(nullptr, "EC", nullptr), EVP_PKEY_CTX_free);
  EVP_PKEY* key = nullptr;
  ASSERT_EQ(EVP_PKEY_keygen_init(context.get()), 1);
  ASSERT_EQ(EVP_PKEY_CTX_set_group_name(context.get(), "P-256"), 1);
  ASSERT_EQ(EVP_PKEY_CTX_set_ec_param_enc(context.get(), OPENSSL_EC_EXPLICIT_CURVE), 1);
  ASSERT_EQ(EVP_PKEY_generate(context.get(), &key), 1);
  CertificateSpec spec;
  spec.key = std::shared_ptr<EVP_PKEY>(key, EVP_PKEY_free);
  EXPECT_EQ(JudgeTrusted(spec, kEcdsaSha256),
            Error("The certificate has an EC key on a curve other than P-256, P-384 and P-521"));
}

TEST(KeyOfATokenSigner, IsRefusedWhenItIsNeitherRsaNorEc) {
  CertificateSpec spec;
  spec.keyKind = KeyKind::ED25519;
  const Identity signer = MakeSelfSigned(spec);
  TokenSigning signing;
  signing.keyInfo = "<ds:KeyInfo><ds:X509Data><ds:X509Certificate>" + Base64Of(signer) +
                    "</ds:X509Certificate></ds:X509Data></ds:KeyInfo>";
  EXPECT_EQ(VerdictOnToken(SignToken(TokenText().Compose(), TokenSigner(), signing), Trust({signer})),
            Error("The certificate has a key that is neither RSA nor EC"));
}

TEST(KeyOfATokenSigner, IsRefusedForTheMethodOfAnotherKind) {
  const Sample rsa = MakeSample(KeyKind::RSA_2048, kRsaSha256);
  const Sample ec = MakeSample(KeyKind::EC_P256, kEcdsaSha256);
  const std::string unfit = "' does not fit the signer's key";
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(rsa.token, kRsaSha256, kEcdsaSha256), Trust({rsa.signer})),
            Error(std::string("Signature method '") + kEcdsaSha256 + unfit));
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(ec.token, kEcdsaSha256, kRsaSha256), Trust({ec.signer})),
            Error(std::string("Signature method '") + kRsaSha256 + unfit));
}

// --- Digests: signed as they stand, so that nothing but their length is wrong ---

TEST(DigestValueOfAToken, IsRefusedInAnotherLength) {
  for (const std::size_t bytes : {1u, 16u, 20u, 31u, 33u, 64u}) {
    TokenSigning signing;
    signing.references[0].digestBytes = bytes;
    EXPECT_EQ(VerdictOnToken(SignToken(TokenText().Compose(), TokenSigner(), signing)), kTampered) << bytes;
  }
}

TEST(DigestValueOfAToken, IsRefusedWhenEmpty) {
  TokenSigning signing;
  signing.references[0].digestBytes = 0;
  const std::string text = SignToken(TokenText().Compose(), TokenSigner(), signing);
  EXPECT_EQ(VerdictOnToken(text),
            "Quorlin::ParseException: Signature syntax error: Element 'ds:DigestValue' must hold one text" +
                PlaceOf(text, "<ds:DigestValue>"));
}

// --- Base64 (XML Schema Part 2, 3.2.16: white space may stand anywhere) ---

std::string InLines(const std::string& base64, std::size_t width, const std::string& end) {
  std::string lines = end;
  for (std::size_t at = 0; at < base64.size(); at += width) {
    lines += base64.substr(at, width) + end;
  }
  return lines;
}

TEST(Base64OfAToken, MayBeInLines) {
  const std::string good = SignToken(TokenText());
  const std::string value = ValueOf(good);
  for (const char* const end : {"\n", "\r\n", "&#13;\n", " ", "\t", "\n        "}) {
    for (const std::size_t width : {1u, 60u, 64u, 76u}) {
      EXPECT_EQ(VerdictOnToken(WithValue(good, InLines(value, width, end))), "accepted") << end << width;
    }
  }
  const std::string certificate = Base64Of(TokenSigner());
  EXPECT_EQ(VerdictOnToken(ReplaceOnce(good, certificate, InLines(certificate, 64, "\r\n"))), "accepted");
}

TEST(Base64OfAToken, IsRefusedInEveryOtherSpelling) {
  const std::string good = SignToken(TokenText());
  const std::string value = ValueOf(good);
  ASSERT_EQ(value.substr(value.size() - 2), "==");
  const std::string bare = value.substr(0, value.size() - 2);
  const std::vector<std::string> spellings = {
      bare,            // Without padding.
      bare + "=",      // With half of it.
      value + "=",     // With too much.
      value + "AAAA",  // Text behind it.
      bare.substr(0, 8) + "==" + bare.substr(8),
      bare.substr(0, 8) + "\xC2\xA0" + bare.substr(8) + "==",  // A blank that is none to XML.
      bare.substr(0, 8) + "-_" + bare.substr(8) + "==",        // The alphabet for URLs.
      bare.substr(0, 8) + "*" + bare.substr(8) + "==",
      "====",
  };
  for (const std::string& spelling : spellings) {
    const std::string text = WithValue(good, spelling);
    EXPECT_EQ(
        VerdictOnToken(text),
        "Quorlin::ParseException: Signature syntax error: Element 'ds:SignatureValue' must hold base64 text" +
            PlaceOf(text, "<ds:SignatureValue>"))
        << spelling;
  }
}

TEST(Base64OfAToken, IsRefusedWithBitsThatMeanNothing) {
  const std::string good = SignToken(TokenText());
  std::string value = ValueOf(good);
  // Of the last character before the padding only the upper two bits count.
  char& last = value[value.size() - 3];
  ASSERT_NE(std::string("AQgw").find(last), std::string::npos);
  ++last;
  const std::string text = WithValue(good, value);
  EXPECT_EQ(
      VerdictOnToken(text),
      "Quorlin::ParseException: Signature syntax error: Element 'ds:SignatureValue' must hold base64 text" +
          PlaceOf(text, "<ds:SignatureValue>"));
}

}  // namespace
}  // namespace Quorlin
