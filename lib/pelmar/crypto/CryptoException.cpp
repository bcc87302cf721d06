// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/crypto/CryptoException.h>

namespace Pelmar {
namespace Crypto {

CryptoException::CryptoException(const std::string& message) : Exception(message) {}

CryptoException::CryptoException(const CryptoException& other) = default;

CryptoException::~CryptoException() noexcept = default;

Exception* CryptoException::Clone() const {
  return new CryptoException(*this);
}

void CryptoException::Throw() const {
  throw CryptoException(*this);
}

}  // namespace Crypto
}  // namespace Pelmar
