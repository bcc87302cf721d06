// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// X.509 certificates.

#ifndef PELMAR_CRYPTO_CERTIFICATE_H
#define PELMAR_CRYPTO_CERTIFICATE_H

#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Ref.h>
#include <pelmar/system/DateTime.h>

#include <list>
#include <string>
#include <vector>

namespace Pelmar {
namespace Crypto {

/// An X.509 certificate (RFC 5280). Immutable; may be shared between threads.
class PELMAR_API Certificate : public Object {
 public:
  /// The DER encoding, byte for byte as it was read.
  virtual const std::vector<unsigned char>& GetDer() const = 0;
  /// SHA-256 of the DER encoding: 32 bytes.
  virtual const std::vector<unsigned char>& GetSha256() const = 0;
  /// Distinguished names as RFC 4514 text.
  virtual std::string GetSubject() const = 0;
  virtual std::string GetIssuer() const = 0;
  virtual System::DateTime GetNotBefore() const = 0;
  virtual System::DateTime GetNotAfter() const = 0;
  /// PEM text (RFC 7468) of the certificate.
  virtual std::string ToPem() const = 0;

 protected:
  Certificate();
  ~Certificate() override;
};

/// Exactly one certificate, with nothing after it. Throws CryptoException (pelmar/crypto/CryptoException.h).
PELMAR_API Ref<const Certificate> CreateCertificateFromDer(const std::vector<unsigned char>& der);

/// The first certificate of a PEM text. Throws CryptoException.
PELMAR_API Ref<const Certificate> CreateCertificateFromPem(const std::string& pem);

/// All certificates of a PEM text, in order; at least one. Text between them and other PEM objects are
/// skipped. Throws CryptoException.
PELMAR_API std::list<Ref<const Certificate>> CreateCertificatesFromPem(const std::string& pem);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_CERTIFICATE_H
