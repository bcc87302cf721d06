// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/DigestWriter.h"

#include "pelmar/crypto/OpenSslError.h"

#include <pelmar/Verify.h>

#include <openssl/evp.h>

namespace Pelmar {
namespace Crypto {

namespace {

const EVP_MD* Fetch(const char* name) {
  const EVP_MD* const implementation = EVP_MD_fetch(nullptr, name, nullptr);
  if (implementation == nullptr) {
    ThrowOpenSslError(std::string("Digest ") + name + " is not available");
  }
  return implementation;
}

}  // namespace

// A look-up by name costs as much as digesting a small text, so each is made once. The results are not
// released: OpenSSL may have cleaned up before our static objects end.
const EVP_MD* GetDigestImplementation(DigestAlgorithm algorithm) {
  switch (algorithm) {
    case DIGEST_SHA256: {
      static const EVP_MD* const sha256 = Fetch("SHA256");
      return sha256;
    }
    case DIGEST_SHA384: {
      static const EVP_MD* const sha384 = Fetch("SHA384");
      return sha384;
    }
    case DIGEST_SHA512: {
      static const EVP_MD* const sha512 = Fetch("SHA512");
      return sha512;
    }
  }
  PanicNotReached("lib/pelmar/crypto/DigestWriter");
}

void DigestWriter::ContextDeleter::operator()(EVP_MD_CTX* context) const noexcept {
  EVP_MD_CTX_free(context);
}

DigestWriter::DigestWriter(DigestAlgorithm algorithm) : _context(EVP_MD_CTX_new()) {
  if (!_context || EVP_DigestInit_ex(_context.get(), GetDigestImplementation(algorithm), nullptr) != 1) {
    ThrowOpenSslError("Digest cannot be started");
  }
}

DigestWriter::~DigestWriter() = default;

void DigestWriter::Write(const char* data, std::size_t size) {
  if (EVP_DigestUpdate(_context.get(), data, size) != 1) {
    ThrowOpenSslError("Digest cannot be continued");
  }
}

std::vector<unsigned char> DigestWriter::Finish() {
  std::vector<unsigned char> digest(EVP_MAX_MD_SIZE);
  unsigned int size = 0;
  if (EVP_DigestFinal_ex(_context.get(), digest.data(), &size) != 1) {
    ThrowOpenSslError("Digest cannot be finished");
  }
  digest.resize(size);
  return digest;
}

}  // namespace Crypto
}  // namespace Pelmar
