// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// PEM text as OpenSSL reads it. Only for the sources of the crypto layer.

#ifndef PELMAR_CRYPTO_PEMINPUT_H
#define PELMAR_CRYPTO_PEMINPUT_H

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"

#include <pelmar/crypto/CryptoException.h>

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Crypto {

/// Enough for every bundle of trust anchors in use.
constexpr std::size_t kMaxPemBytes = 16 * 1024 * 1024;

/// A reader over `pem`, which it does not copy and which must outlive it. Throws CryptoException.
inline BioHandle OpenPemText(const std::string& pem) {
  if (pem.size() > kMaxPemBytes) {
    throw CryptoException("The PEM text is larger than " + std::to_string(kMaxPemBytes) + " bytes");
  }
  BioHandle input(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
  if (!input) {
    ThrowOpenSslError("The PEM text cannot be read");
  }
  ClearOpenSslErrors();
  return input;
}

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PEMINPUT_H
