// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Certificates in PEM text (RFC 7468).

#include <pelmar/crypto/Certificate.h>

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"
#include "pelmar/crypto/PemInput.h"

#include <pelmar/crypto/CryptoException.h>

#include <openssl/err.h>
#include <openssl/pem.h>

#include <cstring>

namespace Pelmar {
namespace Crypto {

namespace {

/// One PEM object. Its bytes are cleansed, as a bundle may well hold the private key too.
class PemObject final {
 public:
  PemObject() = default;
  PemObject(const PemObject&) = delete;
  PemObject& operator=(const PemObject&) = delete;
  ~PemObject() {
    OPENSSL_free(_name);
    OPENSSL_free(_header);
    OPENSSL_clear_free(_data, static_cast<std::size_t>(_size));
  }

  /// Reads the next object; false at the end of the text.
  bool Read(BIO* input) {
    if (PEM_read_bio(input, &_name, &_header, &_data, &_size) == 1) {
      return true;
    }
    if (ERR_GET_REASON(ERR_peek_last_error()) != PEM_R_NO_START_LINE) {
      ThrowOpenSslError("The PEM text cannot be read");
    }
    ClearOpenSslErrors();
    return false;
  }

  bool IsCertificate() const {
    return std::strcmp(_name, PEM_STRING_X509) == 0 || std::strcmp(_name, PEM_STRING_X509_OLD) == 0;
  }

  std::vector<unsigned char> GetBytes() const { return std::vector<unsigned char>(_data, _data + _size); }

 private:
  char* _name = nullptr;
  char* _header = nullptr;
  unsigned char* _data = nullptr;
  long _size = 0;
};

/// The next certificate of `input`; null at the end of the text.
Ref<const Certificate> ReadNextCertificate(BIO* input) {
  for (;;) {
    PemObject object;
    if (!object.Read(input)) {
      return nullptr;
    }
    if (object.IsCertificate()) {
      return CreateCertificateFromDer(object.GetBytes());
    }
  }
}

Ref<const Certificate> RequireNextCertificate(BIO* input) {
  const Ref<const Certificate> certificate = ReadNextCertificate(input);
  if (!certificate) {
    throw CryptoException("The PEM text holds no certificate");
  }
  return certificate;
}

}  // namespace

Ref<const Certificate> CreateCertificateFromPem(const std::string& pem) {
  const BioHandle input = OpenPemText(pem);
  return RequireNextCertificate(input.get());
}

std::list<Ref<const Certificate>> CreateCertificatesFromPem(const std::string& pem) {
  const BioHandle input = OpenPemText(pem);
  std::list<Ref<const Certificate>> certificates;
  certificates.push_back(RequireNextCertificate(input.get()));
  while (const Ref<const Certificate> next = ReadNextCertificate(input.get())) {
    certificates.push_back(next);
  }
  return certificates;
}

}  // namespace Crypto
}  // namespace Pelmar
