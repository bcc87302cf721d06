// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the crypto and TLS layers raise.

#ifndef PELMAR_CRYPTO_CRYPTOEXCEPTION_H
#define PELMAR_CRYPTO_CRYPTOEXCEPTION_H

#include <pelmar/Exception.h>
#include <pelmar/Export.h>

#include <string>

namespace Pelmar {
namespace Crypto {

/// A key, certificate or cryptographic operation failed. The message says what, never with key material in
/// it.
class PELMAR_API CryptoException : public Exception {
 public:
  explicit CryptoException(const std::string& message);
  CryptoException(const CryptoException& other);
  ~CryptoException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_CRYPTOEXCEPTION_H
