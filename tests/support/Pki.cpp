// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/Pki.h"

#include <openssl/bio.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/rsa.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <fstream>
#include <iterator>
#include <map>
#include <mutex>
#include <stdexcept>
#include <utility>

namespace TestSupport {

namespace {

namespace Crypto = Pelmar::Crypto;

struct OpenSslDeleter {
  void operator()(BIO* handle) const { BIO_free(handle); }
  void operator()(X509* handle) const { X509_free(handle); }
  void operator()(X509_EXTENSION* handle) const { X509_EXTENSION_free(handle); }
  void operator()(BIGNUM* handle) const { BN_free(handle); }
  void operator()(ASN1_OCTET_STRING* handle) const { ASN1_OCTET_STRING_free(handle); }
  void operator()(ASN1_OBJECT* handle) const { ASN1_OBJECT_free(handle); }
};

template <typename T>
using Handle = std::unique_ptr<T, OpenSslDeleter>;

void Check(bool succeeded, const char* what) {
  if (!succeeded) {
    throw std::runtime_error(std::string("test certificates: ") + what + " failed");
  }
}

std::shared_ptr<EVP_PKEY> Own(EVP_PKEY* key) {
  Check(key != nullptr, "making a key");
  return std::shared_ptr<EVP_PKEY>(key, EVP_PKEY_free);
}

std::shared_ptr<EVP_PKEY> ReadKeyVector(const std::string& name) {
  std::ifstream stream(std::string(QUORLIN_TEST_VECTORS_DIR) + "/keys/" + name, std::ios::binary);
  const std::string pem((std::istreambuf_iterator<char>(stream)), std::istreambuf_iterator<char>());
  const Handle<BIO> input(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
  return Own(PEM_read_bio_PrivateKey(input.get(), nullptr, nullptr, nullptr));
}

std::shared_ptr<EVP_PKEY> MakeKey(KeyKind kind) {
  switch (kind) {
    case KeyKind::RSA_1024:
      return Own(EVP_RSA_gen(1024));
    case KeyKind::RSA_2048:
      return Own(EVP_RSA_gen(2048));
    case KeyKind::RSA_3072:
      return ReadKeyVector("rsa3072.pem");
    case KeyKind::RSA_4096:
      return ReadKeyVector("rsa4096.pem");
    case KeyKind::EC_P256:
      return Own(EVP_EC_gen("P-256"));
    case KeyKind::EC_P384:
      return Own(EVP_EC_gen("P-384"));
    case KeyKind::EC_P521:
      return Own(EVP_EC_gen("P-521"));
    case KeyKind::EC_SECP256K1:
      return Own(EVP_EC_gen("secp256k1"));
    case KeyKind::ED25519:
      return Own(EVP_PKEY_Q_keygen(nullptr, nullptr, "ED25519"));
  }
  throw std::logic_error("unknown key kind");
}

std::string TakeText(BIO* memory) {
  char* data = nullptr;
  const long size = BIO_get_mem_data(memory, &data);
  return std::string(data, static_cast<std::size_t>(size));
}

std::vector<unsigned char> TakeBytes(BIO* memory) {
  const std::string text = TakeText(memory);
  return std::vector<unsigned char>(text.begin(), text.end());
}

void SetName(X509* x509, const std::string& commonName) {
  X509_NAME* const name = X509_get_subject_name(x509);
  const auto* const bytes = reinterpret_cast<const unsigned char*>(commonName.data());
  const int size = static_cast<int>(commonName.size());
  Check(X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_UTF8, bytes, size, -1, 0) == 1, "naming");
}

void SetSerialNumber(X509* x509) {
  const Handle<BIGNUM> number(BN_new());
  Check(BN_rand(number.get(), 64, BN_RAND_TOP_ONE, BN_RAND_BOTTOM_ANY) == 1 &&
            BN_to_ASN1_INTEGER(number.get(), X509_get_serialNumber(x509)) != nullptr,
        "numbering");
}

void SetPeriod(X509* x509, const CertificateSpec& spec) {
  const auto setTime = [](ASN1_TIME* time, long long fromNow) {
    const auto day = static_cast<int>(fromNow / kDay);
    Check(X509_time_adj_ex(time, day, static_cast<long>(fromNow % kDay), nullptr) != nullptr, "dating");
  };
  setTime(X509_getm_notBefore(x509), spec.notBefore);
  setTime(X509_getm_notAfter(x509), spec.notAfter);
}

void AddExtension(X509* x509, X509* issuer, int kind, const std::string& value) {
  X509V3_CTX context;
  X509V3_set_ctx_nodb(&context);
  X509V3_set_ctx(&context, issuer, x509, nullptr, nullptr, 0);
  const Handle<X509_EXTENSION> extension(X509V3_EXT_nconf_nid(nullptr, &context, kind, value.c_str()));
  Check(extension && X509_add_ext(x509, extension.get(), -1) == 1, "extending");
}

void AddUnknownCriticalExtension(X509* x509) {
  const Handle<ASN1_OBJECT> object(OBJ_txt2obj("1.3.6.1.4.1.99999.1", 1));
  const Handle<ASN1_OCTET_STRING> value(ASN1_OCTET_STRING_new());
  Check(ASN1_OCTET_STRING_set(value.get(), reinterpret_cast<const unsigned char*>("\x05\x00"), 2) == 1,
        "extending");
  constexpr int kCritical = 1;
  const Handle<X509_EXTENSION> extension(
      X509_EXTENSION_create_by_OBJ(nullptr, object.get(), kCritical, value.get()));
  Check(extension && X509_add_ext(x509, extension.get(), -1) == 1, "extending");
}

std::string GetKeyUsage(const CertificateSpec& spec) {
  if (spec.keyUsage != "default") {
    return spec.keyUsage;
  }
  return spec.ca ? "keyCertSign,cRLSign" : "digitalSignature,nonRepudiation,keyEncipherment";
}

std::string GetBasicConstraints(const CertificateSpec& spec) {
  const std::string kind = spec.ca ? "critical,CA:TRUE" : "critical,CA:FALSE";
  return spec.pathLength < 0 ? kind : kind + ",pathlen:" + std::to_string(spec.pathLength);
}

void AddExtensions(X509* x509, X509* issuer, const CertificateSpec& spec) {
  if (!spec.withoutBasicConstraints) {
    AddExtension(x509, issuer, NID_basic_constraints, GetBasicConstraints(spec));
  }
  if (!GetKeyUsage(spec).empty()) {
    AddExtension(x509, issuer, NID_key_usage, "critical," + GetKeyUsage(spec));
  }
  if (!spec.extendedKeyUsage.empty()) {
    AddExtension(x509, issuer, NID_ext_key_usage, spec.extendedKeyUsage);
  }
  if (!spec.subjectAlternativeName.empty()) {
    AddExtension(x509, issuer, NID_subject_alt_name, spec.subjectAlternativeName);
  }
  if (!spec.nameConstraints.empty()) {
    AddExtension(x509, issuer, NID_name_constraints, "critical," + spec.nameConstraints);
  }
  if (spec.keyIdentifiers) {
    AddExtension(x509, issuer, NID_subject_key_identifier, "hash");
    AddExtension(x509, issuer, NID_authority_key_identifier, "keyid:always");
  }
  if (spec.unknownCriticalExtension) {
    AddUnknownCriticalExtension(x509);
  }
}

const EVP_MD* GetDigest(const CertificateSpec& spec, const EVP_PKEY* signingKey) {
  return EVP_PKEY_is_a(signingKey, "ED25519") == 1 ? nullptr : EVP_get_digestbyname(spec.digest.c_str());
}

Pelmar::Ref<const Crypto::Certificate> ToCertificate(X509* x509) {
  const Handle<BIO> memory(BIO_new(BIO_s_mem()));
  Check(i2d_X509_bio(memory.get(), x509) == 1, "encoding");
  return Crypto::CreateCertificateFromDer(TakeBytes(memory.get()));
}

Handle<X509> ToX509(const Crypto::Certificate& certificate) {
  const std::vector<unsigned char>& der = certificate.GetDer();
  const unsigned char* position = der.data();
  Handle<X509> x509(d2i_X509(nullptr, &position, static_cast<long>(der.size())));
  Check(x509 != nullptr, "decoding");
  return x509;
}

/// A null `issuer` makes a self-signed certificate.
Identity Make(X509* issuer, EVP_PKEY* issuerKey, const CertificateSpec& spec) {
  constexpr long kVersion3 = 2;
  const KeyPair key = spec.key ? KeyPair(spec.key) : KeyPair::Get(spec.keyKind, spec.keyNumber);
  const Handle<X509> x509(X509_new());
  X509* const signer = issuer == nullptr ? x509.get() : issuer;
  EVP_PKEY* const signingKey = issuerKey == nullptr ? key.GetHandle() : issuerKey;
  Check(X509_set_version(x509.get(), kVersion3) == 1, "making a certificate");
  SetName(x509.get(), spec.commonName);
  SetSerialNumber(x509.get());
  SetPeriod(x509.get(), spec);
  Check(X509_set_issuer_name(x509.get(), X509_get_subject_name(signer)) == 1, "naming the issuer");
  Check(X509_set_pubkey(x509.get(), key.GetHandle()) == 1, "setting the key");
  AddExtensions(x509.get(), signer, spec);
  Check(X509_sign(x509.get(), signingKey, GetDigest(spec, signingKey)) > 0, "signing");
  return Identity{ToCertificate(x509.get()), key};
}

}  // namespace

KeyPair KeyPair::Get(KeyKind kind, unsigned number) {
  static std::mutex mutex;
  static std::map<std::pair<KeyKind, unsigned>, std::shared_ptr<EVP_PKEY>> keys;
  const std::lock_guard<std::mutex> lock(mutex);
  std::shared_ptr<EVP_PKEY>& key = keys[{kind, number}];
  if (!key) {
    key = MakeKey(kind);
  }
  return KeyPair(key);
}

std::string KeyPair::ToPem() const {
  const Handle<BIO> memory(BIO_new(BIO_s_mem()));
  Check(PEM_write_bio_PKCS8PrivateKey(memory.get(), GetHandle(), nullptr, nullptr, 0, nullptr, nullptr) == 1,
        "writing a key");
  return TakeText(memory.get());
}

std::string KeyPair::ToEncryptedPem(const std::string& passPhrase) const {
  const Handle<BIO> memory(BIO_new(BIO_s_mem()));
  Check(PEM_write_bio_PKCS8PrivateKey(memory.get(), GetHandle(), EVP_aes_256_cbc(), passPhrase.data(),
                                      static_cast<int>(passPhrase.size()), nullptr, nullptr) == 1,
        "writing a key");
  return TakeText(memory.get());
}

std::string KeyPair::ToTraditionalPem(const std::string& passPhrase) const {
  const Handle<BIO> memory(BIO_new(BIO_s_mem()));
  const EVP_CIPHER* const cipher = passPhrase.empty() ? nullptr : EVP_aes_256_cbc();
  Check(PEM_write_bio_PrivateKey_traditional(memory.get(), GetHandle(), cipher,
                                             reinterpret_cast<const unsigned char*>(passPhrase.data()),
                                             static_cast<int>(passPhrase.size()), nullptr, nullptr) == 1,
        "writing a key");
  return TakeText(memory.get());
}

std::vector<unsigned char> KeyPair::ToDer() const {
  const Handle<BIO> memory(BIO_new(BIO_s_mem()));
  Check(i2d_PKCS8PrivateKeyInfo_bio(memory.get(), GetHandle()) == 1, "writing a key");
  return TakeBytes(memory.get());
}

std::vector<unsigned char> KeyPair::ToEncryptedDer(const std::string& passPhrase) const {
  const Handle<BIO> memory(BIO_new(BIO_s_mem()));
  Check(i2d_PKCS8PrivateKey_bio(memory.get(), GetHandle(), EVP_aes_256_cbc(), passPhrase.data(),
                                static_cast<int>(passPhrase.size()), nullptr, nullptr) == 1,
        "writing a key");
  return TakeBytes(memory.get());
}

std::string KeyPair::ToPublicPem() const {
  const Handle<BIO> memory(BIO_new(BIO_s_mem()));
  Check(PEM_write_bio_PUBKEY(memory.get(), GetHandle()) == 1, "writing a key");
  return TakeText(memory.get());
}

Pelmar::Ref<const Crypto::PrivateKey> Identity::GetKey() const {
  return Crypto::CreatePrivateKeyFromPem(keyPair.ToPem());
}

Identity MakeSelfSigned(const CertificateSpec& spec) {
  return Make(nullptr, nullptr, spec);
}

Identity MakeCa(const std::string& commonName, unsigned keyNumber) {
  CertificateSpec spec;
  spec.commonName = commonName;
  spec.keyNumber = keyNumber;
  spec.ca = true;
  return MakeSelfSigned(spec);
}

Identity MakeIssued(const Identity& issuer, const CertificateSpec& spec) {
  const Handle<X509> issuerX509 = ToX509(*issuer.certificate);
  return Make(issuerX509.get(), issuer.keyPair.GetHandle(), spec);
}

std::list<Pelmar::Ref<const Crypto::Certificate>> Trust(std::initializer_list<Identity> identities) {
  std::list<Pelmar::Ref<const Crypto::Certificate>> trusted;
  for (const Identity& identity : identities) {
    trusted.push_back(identity.certificate);
  }
  return trusted;
}

}  // namespace TestSupport
