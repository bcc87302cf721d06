// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Identity.h"

#include "devsts/Secret.h"

#include <pelmar/crypto/Certificate.h>

#include <openssl/bn.h>
#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/rsa.h>

#include <arpa/inet.h>

#include <array>
#include <stdexcept>

namespace DevSts {

namespace {

constexpr long kDaySec = 24 * 60 * 60;
constexpr long kValidForSec = 30 * kDaySec;
constexpr std::size_t kSignerKeyBits = 2048;
constexpr const char* kAuthorityName = "Quorlin development CA";

[[noreturn]] void ThrowOpenSsl(const char* what) {
  std::array<char, 256> reason;
  ERR_error_string_n(ERR_get_error(), reason.data(), reason.size());
  ERR_clear_error();
  throw std::runtime_error(std::string("cannot make a certificate: ") + what + ": " + reason.data());
}

void Check(bool succeeded, const char* what) {
  if (!succeeded) {
    ThrowOpenSsl(what);
  }
}

KeyHandle Own(EVP_PKEY* key) {
  Check(key != nullptr, "key");
  return KeyHandle(key, EVP_PKEY_free);
}

std::string TakeText(BIO* bio) {
  char* data = nullptr;
  const long size = BIO_get_mem_data(bio, &data);
  return std::string(data, static_cast<std::size_t>(size));
}

std::string ToPem(X509* certificate) {
  const BioHandle bio(BIO_new(BIO_s_mem()));
  Check(bio != nullptr && PEM_write_bio_X509(bio.get(), certificate) == 1, "PEM");
  return TakeText(bio.get());
}

/// 127 random bits: unguessable, positive, and at most 20 octets long (RFC 5280, section 4.1.2.2).
void SetSerialNumber(X509* certificate) {
  std::array<unsigned char, 16> bytes;
  Check(RAND_bytes(bytes.data(), static_cast<int>(bytes.size())) == 1, "random number");
  bytes[0] = static_cast<unsigned char>((bytes[0] & 0x7F) | 0x40);
  const std::unique_ptr<BIGNUM, HandleDeleter<BN_free>> number(
      BN_bin2bn(bytes.data(), static_cast<int>(bytes.size()), nullptr));
  Check(number != nullptr && BN_to_ASN1_INTEGER(number.get(), X509_get_serialNumber(certificate)) != nullptr,
        "serial number");
}

void SetName(X509_NAME* name, const std::string& commonName) {
  const auto* const text = reinterpret_cast<const unsigned char*>(commonName.c_str());
  Check(X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_UTF8, text, -1, -1, 0) == 1, "name");
}

void AddExtension(X509* certificate, X509* issuer, int nid, const std::string& value) {
  if (value.empty()) {
    return;
  }
  X509V3_CTX context;
  X509V3_set_ctx(&context, issuer, certificate, nullptr, nullptr, 0);
  X509V3_set_ctx_nodb(&context);
  const ExtensionHandle extension(X509V3_EXT_conf_nid(nullptr, &context, nid, value.c_str()));
  Check(extension != nullptr && X509_add_ext(certificate, extension.get(), -1) == 1, OBJ_nid2sn(nid));
}

/// A certificate with subject, validity and key, for its issuer to complete and sign.
CertificateHandle MakeCertificate(EVP_PKEY* key, const std::string& commonName) {
  CertificateHandle certificate(X509_new());
  Check(certificate != nullptr && X509_set_version(certificate.get(), X509_VERSION_3) == 1, "certificate");
  SetSerialNumber(certificate.get());
  SetName(X509_get_subject_name(certificate.get()), commonName);
  Check(X509_gmtime_adj(X509_getm_notBefore(certificate.get()), -kDaySec) != nullptr &&
            X509_gmtime_adj(X509_getm_notAfter(certificate.get()), kValidForSec) != nullptr,
        "validity");
  Check(X509_set_pubkey(certificate.get(), key) == 1, "public key");
  return certificate;
}

bool IsIpAddress(const std::string& text) {
  std::array<unsigned char, sizeof(in6_addr)> address;
  return inet_pton(AF_INET, text.c_str(), address.data()) == 1 ||
         inet_pton(AF_INET6, text.c_str(), address.data()) == 1;
}

/// The text goes into OpenSSL's configuration syntax, so nothing but a name may come through.
std::string ToAlternativeName(const std::string& name) {
  if (IsIpAddress(name)) {
    return "IP:" + name;
  }
  const char* const allowed = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789.-";
  if (name.empty() || name.find_first_not_of(allowed) != std::string::npos) {
    throw std::invalid_argument("not a host name or IP address: " + name);
  }
  return "DNS:" + name;
}

std::string ToAlternativeNames(const std::vector<std::string>& names) {
  std::string result;
  for (const std::string& name : names) {
    result += (result.empty() ? "" : ",") + ToAlternativeName(name);
  }
  return result;
}

}  // namespace

Pelmar::Ref<const Pelmar::Crypto::PrivateKey> Identity::GetSigningKey() const {
  const int size = i2d_PrivateKey(key.get(), nullptr);
  Check(size > 0, "key encoding");
  std::vector<unsigned char> der(static_cast<std::size_t>(size));
  unsigned char* end = der.data();
  Check(i2d_PrivateKey(key.get(), &end) == size, "key encoding");
  struct Wiper {
    std::vector<unsigned char>& bytes;
    ~Wiper() { OPENSSL_cleanse(bytes.data(), bytes.size()); }
  } const wiper{der};
  return Pelmar::Crypto::CreatePrivateKeyFromDer(der);
}

Identity ReadIdentity(const std::string& keyPem, const std::string& certificatesPem) {
  Identity identity;
  const BioHandle keyBio(BIO_new_mem_buf(keyPem.data(), static_cast<int>(keyPem.size())));
  // Never asks for a pass phrase: an encrypted key is refused.
  const auto noPassPhrase = [](char*, int, int, void*) {
    return -1;
  };
  EVP_PKEY* const key = PEM_read_bio_PrivateKey(keyBio.get(), nullptr, noPassPhrase, nullptr);
  if (key == nullptr) {
    ERR_clear_error();
    throw std::invalid_argument("the signing key is not an unencrypted private key in PEM");
  }
  identity.key = Own(key);
  for (const auto& certificate : Pelmar::Crypto::CreateCertificatesFromPem(certificatesPem)) {
    if (identity.certificate.empty()) {
      identity.certificate = certificate->ToPem();
    } else {
      identity.issuers.push_back(certificate->ToPem());
    }
  }
  const BioHandle bio(
      BIO_new_mem_buf(identity.certificate.data(), static_cast<int>(identity.certificate.size())));
  const CertificateHandle certificate(PEM_read_bio_X509(bio.get(), nullptr, nullptr, nullptr));
  if (certificate == nullptr || X509_check_private_key(certificate.get(), identity.key.get()) != 1) {
    ERR_clear_error();
    throw std::invalid_argument("the signing certificate is not that of the signing key");
  }
  return identity;
}

CertificateAuthority::CertificateAuthority() : _key(Own(EVP_EC_gen("P-256"))) {
  _certificate = MakeCertificate(_key.get(), kAuthorityName);
  X509* const certificate = _certificate.get();
  Check(X509_set_issuer_name(certificate, X509_get_subject_name(certificate)) == 1, "issuer");
  AddExtension(certificate, certificate, NID_basic_constraints, "critical,CA:TRUE,pathlen:0");
  AddExtension(certificate, certificate, NID_key_usage, "critical,keyCertSign,cRLSign");
  AddExtension(certificate, certificate, NID_subject_key_identifier, "hash");
  Check(X509_sign(certificate, _key.get(), EVP_sha256()) > 0, "signature");
  _certificatePem = ToPem(certificate);
}

Identity CertificateAuthority::Issue(const KeyHandle& key, const std::string& commonName,
                                     const std::string& keyUsage, const std::string& extendedKeyUsage,
                                     const std::string& alternativeNames) const {
  const CertificateHandle certificate = MakeCertificate(key.get(), commonName);
  X509* const issuer = _certificate.get();
  Check(X509_set_issuer_name(certificate.get(), X509_get_subject_name(issuer)) == 1, "issuer");
  AddExtension(certificate.get(), issuer, NID_basic_constraints, "critical,CA:FALSE");
  AddExtension(certificate.get(), issuer, NID_key_usage, keyUsage);
  AddExtension(certificate.get(), issuer, NID_ext_key_usage, extendedKeyUsage);
  AddExtension(certificate.get(), issuer, NID_subject_alt_name, alternativeNames);
  AddExtension(certificate.get(), issuer, NID_subject_key_identifier, "hash");
  AddExtension(certificate.get(), issuer, NID_authority_key_identifier, "keyid:always");
  Check(X509_sign(certificate.get(), _key.get(), EVP_sha256()) > 0, "signature");
  return {key, ToPem(certificate.get()), {_certificatePem}};
}

Identity CertificateAuthority::IssueServer(const std::vector<std::string>& names) const {
  return Issue(Own(EVP_EC_gen("P-256")), "Quorlin development server", "critical,digitalSignature",
               "serverAuth", ToAlternativeNames(names));
}

Identity CertificateAuthority::IssueSigner() const {
  return IssueClient("Quorlin development token service");
}

Identity CertificateAuthority::IssueClient(const std::string& commonName) const {
  return Issue(Own(EVP_RSA_gen(kSignerKeyBits)), commonName, "critical,digitalSignature", "", "");
}

}  // namespace DevSts
