// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The files are made by the openssl program; those that it does not make, by its library.

#include "pelmar/crypto/Pkcs12Limits.h"
#include "pelmar/crypto/Pkcs12Profile.h"
#include "pelmar/crypto/SignatureValue.h"
#include "support/GoldenText.h"
#include "support/Pki.h"
#include "support/Process.h"
#include "support/TemporaryDirectory.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Pkcs12.h>
#include <pelmar/ssl/SSLContext.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <openssl/pkcs12.h>
#include <openssl/x509.h>

#include <algorithm>
#include <functional>
#include <iterator>
#include <list>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

using namespace Pelmar::Crypto;
using namespace TestSupport;
using Pelmar::Ref;
using Bytes = std::vector<unsigned char>;

const std::string kPassPhrase = "correct h\xC3\xB6rse";

std::string RefusalOf(const Bytes& der, const std::string& passPhrase = kPassPhrase) {
  try {
    ReadPkcs12(der, passPhrase);
  } catch (const CryptoException& error) {
    return error.what();
  }
  return "accepted";
}

// --- Files of the openssl program ---

/// A key with a certificate under two authorities.
struct Family {
  Family()
      : root(MakeCa("Root")), middle(MakeIssued(root, MakeMiddle())), leaf(MakeIssued(middle, MakeLeaf())) {}

  static CertificateSpec MakeMiddle() {
    CertificateSpec spec;
    spec.commonName = "Middle";
    spec.ca = true;
    spec.keyNumber = 2;
    return spec;
  }

  static CertificateSpec MakeLeaf() {
    CertificateSpec spec;
    spec.commonName = "Leaf";
    spec.keyNumber = 3;
    return spec;
  }

  Identity root;
  Identity middle;
  Identity leaf;
};

const Family& TheFamily() {
  static const Family family;
  return family;
}

/// What "openssl pkcs12 -export" makes of `certificates` and `keyPem` with more arguments.
Bytes Export(const std::string& keyPem, const std::string& certificates,
             const std::vector<std::string>& more = {}, const std::string& passPhrase = kPassPhrase) {
  const TemporaryDirectory files;
  std::vector<std::string> command = {"openssl",
                                      "pkcs12",
                                      "-export",
                                      "-in",
                                      files.WriteFile("in.pem", keyPem + certificates),
                                      "-passout",
                                      "file:" + files.WriteFile("phrase", passPhrase + "\n"),
                                      "-out",
                                      files.GetPath("out.p12")};
  command.insert(command.end(), more.begin(), more.end());
  const ProcessResult made = RunProcess(command);
  if (made.exitCode != 0) {
    throw std::runtime_error(made.standardError);
  }
  const std::string der = files.ReadFile("out.p12");
  return Bytes(der.begin(), der.end());
}

Bytes ExportLeaf(const std::vector<std::string>& more = {}) {
  return Export(TheFamily().leaf.GetKeyPem(), TheFamily().leaf.GetCertificatePem(), more);
}

bool SignsForItself(const Pkcs12Content& content) {
  const std::string text = "what is signed";
  return VerifySignatureValue(content.certificate.Get(), DIGEST_SHA256,
                              ComputeDigest(DIGEST_SHA256, text.data(), text.size()),
                              content.privateKey->Sign(DIGEST_SHA256, text.data(), text.size()));
}

std::vector<std::string> SubjectsOf(const std::list<Ref<const Certificate>>& certificates) {
  std::vector<std::string> subjects;
  for (const Ref<const Certificate>& certificate : certificates) {
    subjects.push_back(certificate->GetSubject());
  }
  return subjects;
}

TEST(Pkcs12, IsReadAsTheOpensslProgramWritesIt) {
  const Pkcs12Content content = ReadPkcs12(ExportLeaf(), kPassPhrase);
  EXPECT_EQ(content.certificate->GetDer(), TheFamily().leaf.certificate->GetDer());
  EXPECT_TRUE(content.chain.empty());
  EXPECT_TRUE(SignsForItself(content));
}

TEST(Pkcs12, IsReadInEveryAcceptedForm) {
  const std::vector<std::string> forms[] = {
      {"-keypbe", "AES-128-CBC", "-certpbe", "AES-192-CBC"},
      {"-keypbe", "AES-256-CBC", "-certpbe", "NONE"},
      {"-keypbe", "NONE", "-certpbe", "AES-256-CBC"},
      {"-keypbe", "NONE", "-certpbe", "NONE"},
      {"-macalg", "sha384"},
      {"-macalg", "sha512"},
      {"-iter", "100000"},
      {"-nomaciter", "-noiter"},
      {"-name", "a friendly name"},
  };
  for (const std::vector<std::string>& form : forms) {
    EXPECT_TRUE(SignsForItself(ReadPkcs12(ExportLeaf(form), kPassPhrase))) << form[1];
  }
}

TEST(Pkcs12, HoldsEcKeysToo) {
  CertificateSpec spec;
  spec.keyKind = KeyKind::EC_P384;
  const Identity identity = MakeSelfSigned(spec);
  const Pkcs12Content content =
      ReadPkcs12(Export(identity.GetKeyPem(), identity.GetCertificatePem()), kPassPhrase);
  EXPECT_EQ(content.privateKey->GetType(), KEY_EC);
  EXPECT_TRUE(SignsForItself(content));
}

TEST(Pkcs12, TakesAnEmptyPassPhrase) {
  const Bytes der = Export(TheFamily().leaf.GetKeyPem(), TheFamily().leaf.GetCertificatePem(), {}, "");
  EXPECT_TRUE(SignsForItself(ReadPkcs12(der, "")));
}

TEST(Pkcs12, GivesTheChainNearestIssuerFirst) {
  const Family& family = TheFamily();
  const std::string orders[] = {family.middle.GetCertificatePem() + family.root.GetCertificatePem(),
                                family.root.GetCertificatePem() + family.middle.GetCertificatePem()};
  for (const std::string& order : orders) {
    const Bytes der = Export(family.leaf.GetKeyPem(), family.leaf.GetCertificatePem() + order);
    EXPECT_EQ(SubjectsOf(ReadPkcs12(der, kPassPhrase).chain),
              (std::vector<std::string>{"CN=Middle", "CN=Root"}));
  }
}

TEST(Pkcs12, FindsTheCertificateBehindItsIssuers) {
  const Family& family = TheFamily();
  const Bytes der =
      Export(family.leaf.GetKeyPem(), family.root.GetCertificatePem() + family.leaf.GetCertificatePem());
  const Pkcs12Content content = ReadPkcs12(der, kPassPhrase);
  EXPECT_EQ(content.certificate->GetSubject(), "CN=Leaf");
  // The root is not the leaf's issuer, and the one between them is not in the file.
  EXPECT_TRUE(content.chain.empty());
}

TEST(Pkcs12, IsAClientIdentityForTls) {
  const Family& family = TheFamily();
  const Pkcs12Content content = ReadPkcs12(
      Export(family.leaf.GetKeyPem(), family.leaf.GetCertificatePem() + family.middle.GetCertificatePem()),
      kPassPhrase);
  Pelmar::Ssl::SSLContextOptions options;
  options.clientKey = content.privateKey;
  options.clientCertificate = content.certificate;
  options.clientCertificateChain = content.chain;
  EXPECT_TRUE(Pelmar::Ssl::CreateSSLContext(options));
}

// --- Refusals ---

constexpr const char* kWrong =
    "The PKCS #12 file cannot be read: the pass phrase is wrong or the file is damaged";

TEST(Pkcs12, RefusesAWrongPassPhrase) {
  const Bytes der = ExportLeaf();
  for (const std::string& wrong :
       {std::string(), std::string("Correct"), kPassPhrase + " ", std::string(4096, 'x')}) {
    EXPECT_EQ(RefusalOf(der, wrong), kWrong);
  }
}

TEST(Pkcs12, RefusesAPassPhraseBeyondTheLimit) {
  EXPECT_EQ(RefusalOf(ExportLeaf(), std::string(kMaxPkcs12PassPhraseBytes + 1, 'x')),
            "The pass phrase of the PKCS #12 file has more than 4096 bytes");
}

TEST(Pkcs12, RefusesEveryChangedByteThatTheMacCovers) {
  const Bytes der = ExportLeaf({"-nomaciter"});
  // Beside what the MAC is over stand lengths and the MAC itself; a change there is refused in other words.
  for (std::size_t i = 100; i + 100 < der.size(); i += 97) {
    Bytes changed = der;
    changed[i] ^= 1;
    EXPECT_EQ(RefusalOf(changed), kWrong) << i;
  }
}

TEST(Pkcs12, RefusesAFileWithoutAMac) {
  EXPECT_EQ(RefusalOf(ExportLeaf({"-nomac"})),
            "The PKCS #12 file has no MAC, so anybody may have changed it");
}

TEST(Pkcs12, RefusesAnOldMac) {
  EXPECT_EQ(RefusalOf(ExportLeaf({"-macalg", "sha1"})),
            "The MAC of the PKCS #12 file uses sha1; SHA-256, SHA-384 or SHA-512 is needed");
}

TEST(Pkcs12, RefusesOldEncryption) {
  const auto refusalOf = [](const std::string& algorithm) {
    return "The PKCS #12 file is encrypted with " + algorithm + "; PBES2 with PBKDF2 and AES-CBC is needed";
  };
  EXPECT_EQ(RefusalOf(ExportLeaf({"-certpbe", "PBE-SHA1-3DES"})),
            refusalOf("pbeWithSHA1And3-KeyTripleDES-CBC"));
  EXPECT_EQ(RefusalOf(ExportLeaf({"-keypbe", "PBE-SHA1-3DES"})),
            refusalOf("pbeWithSHA1And3-KeyTripleDES-CBC"));
  EXPECT_EQ(RefusalOf(ExportLeaf({"-legacy", "-macalg", "sha256"})), refusalOf("pbeWithSHA1And40BitRC2-CBC"));
  EXPECT_EQ(RefusalOf(ExportLeaf({"-certpbe", "DES-EDE3-CBC"})), refusalOf("des-ede3-cbc"));
  EXPECT_EQ(RefusalOf(ExportLeaf({"-keypbe", "CAMELLIA-256-CBC"})), refusalOf("camellia-256-cbc"));
}

TEST(Pkcs12, RefusesAFileWithoutAKeyOrItsCertificate) {
  EXPECT_EQ(RefusalOf(Export("", TheFamily().leaf.GetCertificatePem(), {"-nokeys"})),
            "The PKCS #12 file holds no private key");
  EXPECT_EQ(RefusalOf(Export(TheFamily().leaf.GetKeyPem(), "", {"-nocerts"})),
            "The PKCS #12 file holds no certificate of its private key");
}

TEST(Pkcs12, RefusesWhatIsNoFile) {
  for (const std::string& text : {std::string(), std::string("x"), TheFamily().leaf.GetKeyPem()}) {
    EXPECT_EQ(RefusalOf(Bytes(text.begin(), text.end())), "The PKCS #12 file cannot be read");
  }
  EXPECT_EQ(RefusalOf(TheFamily().leaf.certificate->GetDer()), "The PKCS #12 file cannot be read");
  Bytes longer = ExportLeaf();
  longer.push_back(0);
  EXPECT_EQ(RefusalOf(longer), "The PKCS #12 file is followed by other data");
}

TEST(Pkcs12, RefusesEveryTruncation) {
  const Bytes der = ExportLeaf();
  for (std::size_t size = 0; size < der.size(); size += 13) {
    EXPECT_EQ(RefusalOf(Bytes(der.begin(), der.begin() + static_cast<std::ptrdiff_t>(size))),
              "The PKCS #12 file cannot be read");
  }
}

TEST(Pkcs12, RefusesUnacceptableKeys) {
  CertificateSpec spec;
  spec.keyKind = KeyKind::RSA_1024;
  const Identity weak = MakeSelfSigned(spec);
  EXPECT_EQ(RefusalOf(Export(weak.GetKeyPem(), weak.GetCertificatePem())),
            "The private key has an RSA key of 1024 bits; at least 2048 are needed");
}

TEST(Pkcs12, HasALimitedSize) {
  EXPECT_EQ(RefusalOf(Bytes(kMaxPkcs12Bytes)), "The PKCS #12 file cannot be read");
  EXPECT_EQ(RefusalOf(Bytes(kMaxPkcs12Bytes + 1)), "The PKCS #12 file has more than 1048576 bytes");
}

constexpr const char* kTooManyRounds =
    "The PKCS #12 file asks for less than 1 or, in all its parts, more than 5000000 rounds of key derivation";

// --- Files that the program does not make ---

void Check(bool good) {
  if (!good) {
    throw std::runtime_error("the test cannot make its file");
  }
}

/// Puts a file together part by part; the MAC is right, so that what it covers is read.
class FileBuilder final {
 public:
  FileBuilder() : _bags(sk_PKCS12_SAFEBAG_new_null()) {}
  FileBuilder(const FileBuilder&) = delete;
  FileBuilder& operator=(const FileBuilder&) = delete;
  ~FileBuilder() { sk_PKCS12_SAFEBAG_pop_free(_bags, PKCS12_SAFEBAG_free); }

  FileBuilder& AddCertificate(const Identity& identity) {
    const Bytes& der = identity.certificate->GetDer();
    const unsigned char* position = der.data();
    X509* const x509 = d2i_X509(nullptr, &position, static_cast<long>(der.size()));
    Check(PKCS12_add_cert(&_bags, x509) != nullptr);
    X509_free(x509);
    return *this;
  }

  FileBuilder& AddKey(const Identity& identity) {
    Check(PKCS12_add_key(&_bags, identity.keyPair.GetHandle(), 0, 1, -1, nullptr) != nullptr);
    return *this;
  }

  /// Encrypted by PBES2 with PBKDF2 and this function within it.
  FileBuilder& AddEncryptedKey(const Identity& identity, int prf, int rounds) {
    X509_ALGOR* const algorithm = PKCS5_pbe2_set_iv(EVP_aes_256_cbc(), rounds, nullptr, 16, nullptr, prf);
    PKCS8_PRIV_KEY_INFO* const key = EVP_PKEY2PKCS8(identity.keyPair.GetHandle());
    X509_SIG* const encrypted =
        PKCS8_set0_pbe(kPassPhrase.data(), static_cast<int>(kPassPhrase.size()), key, algorithm);
    PKCS8_PRIV_KEY_INFO_free(key);
    PKCS12_SAFEBAG* const bag = PKCS12_SAFEBAG_create0_pkcs8(encrypted);
    Check(bag != nullptr && sk_PKCS12_SAFEBAG_push(_bags, bag) > 0);
    return *this;
  }

  FileBuilder& AddSecret() {
    const unsigned char secret[] = {1};
    Check(PKCS12_add_secret(&_bags, NID_id_smime_ct_authData, secret, sizeof(secret)) != nullptr);
    return *this;
  }

  FileBuilder& AddUnreadableKey() {
    PKCS8_PRIV_KEY_INFO* const key = PKCS8_PRIV_KEY_INFO_new();
    auto* const bytes = static_cast<unsigned char*>(OPENSSL_zalloc(1));
    Check(PKCS8_pkey_set0(key, OBJ_nid2obj(NID_rsaEncryption), 0, V_ASN1_NULL, nullptr, bytes, 1) == 1);
    PKCS12_SAFEBAG* const bag = PKCS12_SAFEBAG_create0_p8inf(key);
    Check(bag != nullptr && sk_PKCS12_SAFEBAG_push(_bags, bag) > 0);
    return *this;
  }

  /// In a bag for a certificate of this type.
  FileBuilder& AddUnreadableCertificate(int type) {
    ASN1_OCTET_STRING* const content = ASN1_OCTET_STRING_new();
    PKCS12_SAFEBAG* const bag =
        PKCS12_item_pack_safebag(content, ASN1_ITEM_rptr(ASN1_OCTET_STRING), type, NID_certBag);
    ASN1_OCTET_STRING_free(content);
    Check(bag != nullptr && sk_PKCS12_SAFEBAG_push(_bags, bag) > 0);
    return *this;
  }

  Bytes Build(int macRounds = 1) const {
    STACK_OF(PKCS7)* safes = nullptr;
    Check(PKCS12_add_safe(&safes, _bags, -1, 0, nullptr) == 1);
    return BuildOf(safes, macRounds);
  }

  /// A file of these parts, which are the builder's from now on.
  static Bytes BuildOf(STACK_OF(PKCS7) * safes, int macRounds = 1) {
    PKCS12* const file = PKCS12_add_safes(safes, 0);
    sk_PKCS7_pop_free(safes, PKCS7_free);
    return Finish(file, macRounds);
  }

  static Bytes BuildOf(PKCS7* safe) {
    STACK_OF(PKCS7)* const safes = sk_PKCS7_new_null();
    Check(sk_PKCS7_push(safes, safe) > 0);
    return BuildOf(safes);
  }

  /// A new MAC over what the file has become.
  static Bytes MakeMacRight(const Bytes& der) {
    const unsigned char* position = der.data();
    PKCS12* const file = d2i_PKCS12(nullptr, &position, static_cast<long>(der.size()));
    return Finish(file, 1);
  }

 private:
  static Bytes Finish(PKCS12* file, int macRounds) {
    Check(file != nullptr && PKCS12_set_mac(file, kPassPhrase.data(), static_cast<int>(kPassPhrase.size()),
                                            nullptr, 0, macRounds, EVP_sha256()) == 1);
    Bytes der(static_cast<std::size_t>(i2d_PKCS12(file, nullptr)));
    unsigned char* position = der.data();
    i2d_PKCS12(file, &position);
    PKCS12_free(file);
    return der;
  }

  STACK_OF(PKCS12_SAFEBAG) * _bags;
};

TEST(Pkcs12, IsReadAsTheBuilderOfTheTestsMakesIt) {
  const Identity& leaf = TheFamily().leaf;
  EXPECT_TRUE(
      SignsForItself(ReadPkcs12(FileBuilder().AddKey(leaf).AddCertificate(leaf).Build(), kPassPhrase)));
}

// The fuzzer changed one bit of the secret half; the public half is still that of the certificate.
TEST(Pkcs12, RefusesADamagedKey) {
  const std::string der = TestSupport::ReadVector("pkcs12/damaged-key.p12");
  EXPECT_THAT([&der] { ReadPkcs12(std::vector<unsigned char>(der.begin(), der.end()), "fuzz"); },
              testing::ThrowsMessage<CryptoException>("The PKCS #12 file holds a damaged private key"));
}

TEST(Pkcs12, RefusesTwoKeys) {
  const Family& family = TheFamily();
  EXPECT_EQ(
      RefusalOf(FileBuilder().AddKey(family.leaf).AddKey(family.root).AddCertificate(family.leaf).Build()),
      "The PKCS #12 file holds more than one private key");
}

TEST(Pkcs12, RefusesTwoCertificatesOfItsKey) {
  const Identity& leaf = TheFamily().leaf;
  const Identity other = MakeSelfSigned(Family::MakeLeaf());
  EXPECT_EQ(RefusalOf(FileBuilder().AddKey(leaf).AddCertificate(leaf).AddCertificate(other).Build()),
            "The PKCS #12 file holds more than one certificate of its private key");
}

TEST(Pkcs12, RefusesACertificateOfAnotherKey) {
  const Family& family = TheFamily();
  EXPECT_EQ(RefusalOf(FileBuilder().AddKey(family.leaf).AddCertificate(family.root).Build()),
            "The PKCS #12 file holds no certificate of its private key");
}

TEST(Pkcs12, RefusesOtherContents) {
  const Identity& leaf = TheFamily().leaf;
  EXPECT_EQ(RefusalOf(FileBuilder().AddKey(leaf).AddCertificate(leaf).AddSecret().Build()),
            "The PKCS #12 file holds something that is neither a private key nor a certificate");
}

TEST(Pkcs12, RefusesUnreadableContents) {
  const Identity& leaf = TheFamily().leaf;
  EXPECT_EQ(RefusalOf(FileBuilder().AddUnreadableKey().AddCertificate(leaf).Build()),
            "The PKCS #12 file holds a private key that cannot be read");
  for (const int type : {NID_x509Certificate, NID_sdsiCertificate}) {
    EXPECT_EQ(
        RefusalOf(FileBuilder().AddKey(leaf).AddCertificate(leaf).AddUnreadableCertificate(type).Build()),
        "The PKCS #12 file holds a certificate that cannot be read");
  }
}

PKCS7* MakePart(int type) {
  PKCS7* const part = PKCS7_new();
  part->type = OBJ_nid2obj(type);
  return part;
}

TEST(Pkcs12, RefusesPartsThatItDoesNotKnow) {
  const char* const refusal =
      "The PKCS #12 file has a part that is neither plain nor encrypted with the pass phrase";
  EXPECT_EQ(RefusalOf(FileBuilder::BuildOf(MakePart(NID_pkcs7_signed))), refusal);
  EXPECT_EQ(RefusalOf(FileBuilder::BuildOf(MakePart(NID_pkcs7_encrypted))), refusal);
  PKCS7* const other = MakePart(NID_id_smime_ct_authData);
  other->d.other = ASN1_TYPE_new();
  ASN1_TYPE_set(other->d.other, V_ASN1_OCTET_STRING, ASN1_OCTET_STRING_new());
  EXPECT_EQ(RefusalOf(FileBuilder::BuildOf(other)), refusal);
}

TEST(Pkcs12, RefusesPartsThatAreDamaged) {
  const char* const refusal = "The PKCS #12 file is damaged inside";
  PKCS7* const part = MakePart(NID_pkcs7_data);
  part->d.data = ASN1_OCTET_STRING_new();
  EXPECT_EQ(RefusalOf(FileBuilder::BuildOf(part)), refusal);

  // The list of parts is an octet string within the first "data".
  Bytes der = FileBuilder::BuildOf(MakePart(NID_pkcs7_data));
  const unsigned char data[] = {0x2A, 0x86, 0x48, 0x86, 0xF7, 0x0D, 0x01, 0x07, 0x01};
  const auto at = std::search(der.begin(), der.end(), std::begin(data), std::end(data));
  const auto tag = std::find(at, der.end(), 0x30);
  ASSERT_NE(tag, der.end());
  *tag = 0x31;
  EXPECT_EQ(RefusalOf(FileBuilder::MakeMacRight(der)), refusal);
}

TEST(Pkcs12, HasALimitedNumberOfObjects) {
  const Family& family = TheFamily();
  FileBuilder builder;
  builder.AddKey(family.leaf).AddCertificate(family.leaf);
  // The part that holds them counts too.
  for (std::size_t i = 3; i < kMaxPkcs12Objects; ++i) {
    builder.AddCertificate(family.root);
  }
  EXPECT_EQ(RefusalOf(builder.Build()), "accepted");
  EXPECT_EQ(RefusalOf(builder.AddCertificate(family.root).Build()),
            "The PKCS #12 file holds more than 64 objects");
}

TEST(Pkcs12, RefusesSha1InTheDerivationOfItsKeys) {
  const Identity& leaf = TheFamily().leaf;
  EXPECT_EQ(
      RefusalOf(FileBuilder().AddEncryptedKey(leaf, NID_hmacWithSHA1, 1).AddCertificate(leaf).Build()),
      "The keys of the PKCS #12 file are derived with hmacWithSHA1; HMAC with SHA-256, SHA-384 or SHA-512 is needed");
  for (const int prf : {NID_hmacWithSHA256, NID_hmacWithSHA384, NID_hmacWithSHA512}) {
    EXPECT_EQ(RefusalOf(FileBuilder().AddEncryptedKey(leaf, prf, 1).AddCertificate(leaf).Build()),
              "accepted");
  }
}

X509_ALGOR* AlgorithmWithRounds(long long rounds) {
  X509_ALGOR* const algorithm =
      PKCS5_pbe2_set_iv(EVP_aes_256_cbc(), 1, nullptr, 16, nullptr, NID_hmacWithSHA256);
  PBE2PARAM* const outer =
      static_cast<PBE2PARAM*>(ASN1_TYPE_unpack_sequence(ASN1_ITEM_rptr(PBE2PARAM), algorithm->parameter));
  PBKDF2PARAM* const inner = static_cast<PBKDF2PARAM*>(
      ASN1_TYPE_unpack_sequence(ASN1_ITEM_rptr(PBKDF2PARAM), outer->keyfunc->parameter));
  Check(ASN1_INTEGER_set_int64(inner->iter, rounds) == 1 &&
        ASN1_TYPE_pack_sequence(ASN1_ITEM_rptr(PBKDF2PARAM), inner, &outer->keyfunc->parameter) != nullptr &&
        ASN1_TYPE_pack_sequence(ASN1_ITEM_rptr(PBE2PARAM), outer, &algorithm->parameter) != nullptr);
  PBKDF2PARAM_free(inner);
  PBE2PARAM_free(outer);
  return algorithm;
}

/// Takes the algorithm.
std::string VerdictOn(Pkcs12Profile& profile, X509_ALGOR* algorithm) {
  std::string verdict = "accepted";
  try {
    profile.RequireEncryption(algorithm);
  } catch (const CryptoException& error) {
    verdict = error.what();
  }
  X509_ALGOR_free(algorithm);
  return verdict;
}

std::string VerdictOn(Pkcs12Profile& profile, long long rounds) {
  return VerdictOn(profile, AlgorithmWithRounds(rounds));
}

TEST(Pkcs12, RefusesAnotherDerivationOfItsKeys) {
  Pkcs12Profile profile;
  EXPECT_EQ(VerdictOn(profile, PKCS5_pbe2_set_scrypt(EVP_aes_256_cbc(), nullptr, 0, nullptr, 16, 1, 1)),
            "The PKCS #12 file is encrypted with scrypt; PBES2 with PBKDF2 and AES-CBC is needed");
}

TEST(Pkcs12, RefusesUnreadableParametersOfItsEncryption) {
  const char* const refusal = "The PKCS #12 file is encrypted with parameters that cannot be read";
  Pkcs12Profile profile;
  X509_ALGOR* const outer = X509_ALGOR_new();
  X509_ALGOR_set0(outer, OBJ_nid2obj(NID_pbes2), V_ASN1_NULL, nullptr);
  EXPECT_EQ(VerdictOn(profile, outer), refusal);

  X509_ALGOR* const inner = PKCS5_pbe2_set_iv(EVP_aes_256_cbc(), 1, nullptr, 16, nullptr, NID_hmacWithSHA256);
  PBE2PARAM* const parameters =
      static_cast<PBE2PARAM*>(ASN1_TYPE_unpack_sequence(ASN1_ITEM_rptr(PBE2PARAM), inner->parameter));
  X509_ALGOR_set0(parameters->keyfunc, OBJ_nid2obj(NID_id_pbkdf2), V_ASN1_NULL, nullptr);
  Check(ASN1_TYPE_pack_sequence(ASN1_ITEM_rptr(PBE2PARAM), parameters, &inner->parameter) != nullptr);
  PBE2PARAM_free(parameters);
  EXPECT_EQ(VerdictOn(profile, inner), refusal);
}

TEST(Pkcs12, CountsTheRoundsOfAllItsParts) {
  Pkcs12Profile profile;
  EXPECT_EQ(VerdictOn(profile, kMaxPkcs12Rounds - 1), "accepted");
  EXPECT_EQ(VerdictOn(profile, 2), kTooManyRounds);
  EXPECT_EQ(VerdictOn(profile, 1), "accepted");
  EXPECT_EQ(VerdictOn(profile, 1), kTooManyRounds);
}

TEST(Pkcs12, RefusesRoundsThatAreNoCount) {
  for (const long long rounds : {0LL, -1LL, kMaxPkcs12Rounds + 1, 0x7FFFFFFFFFFFFFFFLL}) {
    Pkcs12Profile profile;
    EXPECT_EQ(VerdictOn(profile, rounds), kTooManyRounds);
  }
}

TEST(Pkcs12, CountsTheRoundsOfItsMac) {
  const Identity& leaf = TheFamily().leaf;
  Bytes der = FileBuilder().AddKey(leaf).AddCertificate(leaf).Build(0x12345);
  // The number stands at the very end. Making a file with a large one would take as long as checking it.
  ASSERT_EQ(Bytes(der.end() - 5, der.end()), (Bytes{0x02, 0x03, 0x01, 0x23, 0x45}));
  der[der.size() - 3] = 0x7F;
  EXPECT_EQ(RefusalOf(der), kTooManyRounds);
}

}  // namespace
