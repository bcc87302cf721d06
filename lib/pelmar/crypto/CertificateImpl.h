// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The platform's certificate, and what the layers beside crypto may ask of it.

#ifndef PELMAR_CRYPTO_CERTIFICATEIMPL_H
#define PELMAR_CRYPTO_CERTIFICATEIMPL_H

#include "pelmar/crypto/KeyContexts.h"

#include <pelmar/crypto/Certificate.h>

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

struct evp_pkey_st;
struct x509_st;

namespace Pelmar {
namespace Crypto {

/// Real certificates have a few kilobytes; a larger one is not worth parsing.
constexpr std::size_t kMaxCertificateBytes = 64 * 1024;

/// A parsed certificate. Everything that OpenSSL would work out later and keep (its view of the extensions)
/// is worked out on construction, so that reading from several threads changes nothing.
class CertificateImpl final : public Certificate {
 public:
  /// Throws CryptoException.
  explicit CertificateImpl(const std::vector<unsigned char>& der);

  const std::vector<unsigned char>& GetDer() const override { return _der; }
  const std::vector<unsigned char>& GetSha256() const override { return _sha256; }
  std::string GetSubject() const override;
  std::string GetIssuer() const override;
  System::DateTime GetNotBefore() const override { return _notBefore; }
  System::DateTime GetNotAfter() const override { return _notAfter; }
  std::string ToPem() const override;

  /// OpenSSL's object, owned by this one. Only the crypto and ssl layers touch it, and they do not change it.
  x509_st* GetX509() const noexcept { return _x509.get(); }
  /// Whether OpenSSL could read its key and extensions. Whether they are acceptable is for chain verification
  /// to say.
  bool IsUnderstood() const noexcept { return _isUnderstood; }
  /// The subject's public key, owned by this object; null when OpenSSL does not know such keys.
  evp_pkey_st* GetPublicKey() const noexcept;
  /// Of the public key; the certificate stays the same whatever is taken or given.
  KeyContexts& GetVerificationContexts() const noexcept { return _verificationContexts; }

 private:
  struct X509Deleter {
    void operator()(x509_st* x509) const noexcept;
  };

  ~CertificateImpl() override;

  std::vector<unsigned char> _der;
  std::unique_ptr<x509_st, X509Deleter> _x509;
  bool _isUnderstood;
  std::vector<unsigned char> _sha256;
  System::DateTime _notBefore;
  System::DateTime _notAfter;
  mutable KeyContexts _verificationContexts;
};

/// `certificate` as the platform's own class; a foreign implementation is read again from its DER. Throws
/// CryptoException, also for null.
Ref<const CertificateImpl> ToCertificateImpl(const Certificate* certificate);

/// Throws CryptoException unless the key usage of `certificate` is absent or allows digitalSignature or
/// nonRepudiation (RFC 5280, 4.2.1.3).
void RequireSigningKeyUsage(const CertificateImpl& certificate);

/// Whether `issuer` names itself, and may act, as the issuer of `subject`: names, key identifiers and key
/// usage fit (RFC 5280, 4.2.1.1 to 4.2.1.3). Signatures are not looked at.
bool LooksLikeIssuer(const CertificateImpl& issuer, const CertificateImpl& subject);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_CERTIFICATEIMPL_H
