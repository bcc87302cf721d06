// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Certificate authorities, certificates and keys for tests, made in memory.

#ifndef QUORLIN_TESTS_SUPPORT_PKI_H
#define QUORLIN_TESTS_SUPPORT_PKI_H

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>

#include <initializer_list>
#include <list>
#include <memory>
#include <string>
#include <vector>

struct evp_pkey_st;

namespace TestSupport {

enum class KeyKind {
  RSA_1024,
  RSA_2048,
  RSA_3072,
  RSA_4096,
  EC_P256,
  EC_P384,
  EC_P521,
  EC_SECP256K1,
  ED25519
};

/// A key pair. The larger RSA keys are read from tests/vectors/keys, all others are generated.
class KeyPair final {
 public:
  /// The `number`-th key of its kind; the same in the whole test process, so that slow ones are made once.
  /// RSA_3072 and RSA_4096 have number 0 only.
  static KeyPair Get(KeyKind kind, unsigned number = 0);

  evp_pkey_st* GetHandle() const { return _key.get(); }
  /// PKCS #8, unencrypted.
  std::string ToPem() const;
  /// PKCS #8, encrypted (AES-256) with `passPhrase`.
  std::string ToEncryptedPem(const std::string& passPhrase) const;
  /// The traditional form: "RSA PRIVATE KEY" or "EC PRIVATE KEY"; encrypted (AES-256) unless `passPhrase` is
  /// empty.
  std::string ToTraditionalPem(const std::string& passPhrase = "") const;
  std::vector<unsigned char> ToDer() const;
  std::vector<unsigned char> ToEncryptedDer(const std::string& passPhrase) const;
  /// The public key as PEM text (SubjectPublicKeyInfo).
  std::string ToPublicPem() const;

  explicit KeyPair(const std::shared_ptr<evp_pkey_st>& key) : _key(key) {}

 private:
  std::shared_ptr<evp_pkey_st> _key;
};

/// Seconds, for the validity periods below.
constexpr long long kHour = 3600;
constexpr long long kDay = 24 * kHour;
constexpr long long kYear = 365 * kDay;

/// What to put into a certificate. As it stands: an end-entity certificate for a fresh-looking RSA 2048 key,
/// valid for a year.
struct CertificateSpec {
  std::string commonName = "Test signer";
  KeyKind keyKind = KeyKind::RSA_2048;
  unsigned keyNumber = 0;
  bool ca = false;
  /// basicConstraints is left out; `ca` then only decides the key usage.
  bool withoutBasicConstraints = false;
  /// Seconds from now.
  long long notBefore = -kHour;
  long long notAfter = kYear;
  /// In OpenSSL's configuration syntax; "default" is "digitalSignature,nonRepudiation,keyEncipherment" or,
  /// for a CA, "keyCertSign,cRLSign"; empty: the extension is left out.
  std::string keyUsage = "default";
  /// In the same syntax, for example "serverAuth"; empty: left out.
  std::string extendedKeyUsage;
  /// In the same syntax, for example "DNS:localhost,IP:127.0.0.1"; empty: left out.
  std::string subjectAlternativeName;
  /// Of OpenSSL's digests: what the issuer signs with.
  std::string digest = "SHA256";
  /// Adds the key identifiers of the subject and of the issuer, which must have one too.
  bool keyIdentifiers = false;
  /// Adds a critical extension that nobody knows.
  bool unknownCriticalExtension = false;
  /// Of basicConstraints: how many other CAs may stand below this one; negative: any number.
  int pathLength = -1;
  /// In OpenSSL's configuration syntax, for example "permitted;DNS:example.com"; empty: left out.
  std::string nameConstraints;
  /// Used instead of the key that `keyKind` and `keyNumber` name.
  std::shared_ptr<evp_pkey_st> key;
};

/// A certificate with its private key.
struct Identity {
  Pelmar::Ref<const Pelmar::Crypto::Certificate> certificate;
  KeyPair keyPair;

  /// The private key as the platform has it. Throws CryptoException for keys the platform refuses.
  Pelmar::Ref<const Pelmar::Crypto::PrivateKey> GetKey() const;
  std::string GetCertificatePem() const { return certificate->ToPem(); }
  std::string GetKeyPem() const { return keyPair.ToPem(); }
};

/// A certificate signed with its own key.
Identity MakeSelfSigned(const CertificateSpec& spec);

/// A self-signed CA named `commonName`.
Identity MakeCa(const std::string& commonName = "Test CA", unsigned keyNumber = 1);

/// A certificate signed by `issuer`, whatever that one may be allowed to do.
Identity MakeIssued(const Identity& issuer, const CertificateSpec& spec);

/// A list of trusted certificates.
std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> Trust(std::initializer_list<Identity> identities);

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_PKI_H
