// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/OpenSslError.h"

#include <pelmar/crypto/CryptoException.h>

#include <openssl/err.h>

namespace Pelmar {
namespace Crypto {

void ClearOpenSslErrors() noexcept {
  ERR_clear_error();
}

void ThrowOpenSslError(const std::string& what) {
  // The oldest entry is the one nearest to the cause; later ones are added on the way out.
  const unsigned long code = ERR_peek_error();
  const char* const reason = code == 0 ? nullptr : ERR_reason_error_string(code);
  const std::string message = reason == nullptr ? what : what + ": " + reason;
  ERR_clear_error();
  throw CryptoException(message);
}

void ThrowIfMemoryRanOut(const std::string& what) {
  while (const unsigned long code = ERR_get_error()) {
    if (ERR_GET_REASON(code) == ERR_R_MALLOC_FAILURE) {
      ERR_clear_error();
      throw CryptoException(what + ": " + ERR_reason_error_string(code));
    }
  }
}

}  // namespace Crypto
}  // namespace Pelmar
