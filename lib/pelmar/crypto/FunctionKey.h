// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A private key whose work a function of the host does.

#ifndef PELMAR_CRYPTO_FUNCTIONKEY_H
#define PELMAR_CRYPTO_FUNCTIONKEY_H

#include <pelmar/crypto/SigningFunction.h>

#include <cstddef>
#include <vector>

namespace Pelmar {
namespace Crypto {

class FunctionKey final : public PrivateKey {
 public:
  /// Throws CryptoException when the certificate's key is not good enough (KeyStrength.h). Neither argument
  /// may be empty.
  FunctionKey(const Ref<const Certificate>& certificate, SigningInput input, const SigningFunction& sign);

  KeyType GetType() const override { return _type; }
  std::vector<unsigned char> Sign(DigestAlgorithm digest, const void* data, std::size_t size) const override;

 private:
  ~FunctionKey() override;

  std::vector<unsigned char> Call(DigestAlgorithm digest, const std::vector<unsigned char>& input) const;

  Ref<const Certificate> _certificate;
  KeyType _type;
  SigningInput _input;
  SigningFunction _sign;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_FUNCTIONKEY_H
