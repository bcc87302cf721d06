// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/CertificateImpl.h"

#include "pelmar/crypto/CertificateCache.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"
#include "pelmar/crypto/X509Fields.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Digest.h>

#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include <cstdint>

namespace Pelmar {
namespace Crypto {

namespace {

X509* ParseX509(const std::vector<unsigned char>& der) {
  if (der.size() > kMaxCertificateBytes) {
    throw CryptoException("The certificate is larger than " + std::to_string(kMaxCertificateBytes) +
                          " bytes");
  }
  const unsigned char* position = der.data();
  X509Handle x509(d2i_X509(nullptr, &position, static_cast<long>(der.size())));
  if (!x509) {
    ThrowOpenSslError("The certificate cannot be read");
  }
  if (position != der.data() + der.size()) {
    throw CryptoException("The certificate is followed by other data");
  }
  return x509.release();
}

/// Whether OpenSSL has made sense of the extensions and of the key, which it reads on its own account. One
/// that is issued under its own name but not self-signed is rare enough to be doubted.
bool IsUnderstood(X509* x509) {
  const bool hasExtensions = X509_check_purpose(x509, -1, 0) == 1;
  const EVP_PKEY* const key = X509_get0_pubkey(x509);
  const std::uint32_t flags = X509_get_extension_flags(x509);
  ClearOpenSslErrors();
  const bool isDoubtful =
      (flags & EXFLAG_NO_FINGERPRINT) != 0 || ((flags & EXFLAG_SI) != 0 && (flags & EXFLAG_SS) == 0);
  return hasExtensions && key != nullptr && EVP_PKEY_get_security_bits(key) > 0 && !isDoubtful;
}

// When memory runs out meanwhile, OpenSSL takes that for a fault of the certificate, and for good. A second
// reading tells a certificate that is really like that.
X509* ReadX509(const std::vector<unsigned char>& der) {
  X509Handle x509(ParseX509(der));
  if (!IsUnderstood(x509.get())) {
    x509.reset(ParseX509(der));
  }
  return x509.release();
}

}  // namespace

Certificate::Certificate() = default;

Certificate::~Certificate() = default;

void CertificateImpl::X509Deleter::operator()(X509* x509) const noexcept {
  X509_free(x509);
}

CertificateImpl::CertificateImpl(const std::vector<unsigned char>& der)
    : _der(der),
      _x509(ReadX509(der)),
      _isUnderstood(Crypto::IsUnderstood(_x509.get())),
      _sha256(ComputeDigest(DIGEST_SHA256, der.data(), der.size())),
      _notBefore(ReadX509Time(X509_get0_notBefore(_x509.get()))),
      _notAfter(ReadX509Time(X509_get0_notAfter(_x509.get()))) {}

CertificateImpl::~CertificateImpl() = default;

std::string CertificateImpl::GetSubject() const {
  return PrintX509Name(X509_get_subject_name(_x509.get()));
}

std::string CertificateImpl::GetIssuer() const {
  return PrintX509Name(X509_get_issuer_name(_x509.get()));
}

std::string CertificateImpl::ToPem() const {
  const BioHandle memory(BIO_new(BIO_s_mem()));
  if (!memory || PEM_write_bio_X509(memory.get(), _x509.get()) != 1) {
    ThrowOpenSslError("The certificate cannot be written");
  }
  char* data = nullptr;
  const long size = BIO_get_mem_data(memory.get(), &data);
  return size <= 0 ? std::string() : std::string(data, static_cast<std::size_t>(size));
}

EVP_PKEY* CertificateImpl::GetPublicKey() const noexcept {
  EVP_PKEY* const key = X509_get0_pubkey(_x509.get());
  ClearOpenSslErrors();
  return key;
}

Ref<const CertificateImpl> ToCertificateImpl(const Certificate* certificate) {
  if (certificate == nullptr) {
    throw CryptoException("There is no certificate");
  }
  const auto* const own = dynamic_cast<const CertificateImpl*>(certificate);
  return own != nullptr ? Ref<const CertificateImpl>(own)
                        : Ref<const CertificateImpl>(MakeRef<CertificateImpl>(certificate->GetDer()));
}

void RequireSigningKeyUsage(const CertificateImpl& certificate) {
  constexpr std::uint32_t kSigning = KU_DIGITAL_SIGNATURE | KU_NON_REPUDIATION;
  // Without the extension OpenSSL answers with all bits set.
  const std::uint32_t usage = X509_get_key_usage(certificate.GetX509());
  ClearOpenSslErrors();
  if ((usage & kSigning) == 0) {
    throw CryptoException("The certificate's key usage does not allow signatures (" +
                          certificate.GetSubject() + ")");
  }
}

bool LooksLikeIssuer(const CertificateImpl& issuer, const CertificateImpl& subject) {
  const bool fits = X509_check_issued(issuer.GetX509(), subject.GetX509()) == X509_V_OK;
  ClearOpenSslErrors();
  return fits;
}

Ref<const Certificate> CreateCertificateFromDer(const std::vector<unsigned char>& der) {
  return GetCertificateCache().Read(der);
}

}  // namespace Crypto
}  // namespace Pelmar
