// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/FunctionKey.h"

#include "pelmar/crypto/HostFunction.h"
#include "pelmar/crypto/SignatureValue.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>

namespace Pelmar {
namespace Crypto {

FunctionKey::FunctionKey(const Ref<const Certificate>& certificate, SigningInput input,
                         const SigningFunction& sign)
    : _certificate(certificate), _type(GetSignatureKeyType(certificate.Get())), _input(input), _sign(sign) {}

FunctionKey::~FunctionKey() = default;

std::vector<unsigned char> FunctionKey::Sign(DigestAlgorithm digest, const void* data,
                                             std::size_t size) const {
  const std::vector<unsigned char> hash = ComputeDigest(digest, data, size);
  const auto* const bytes = static_cast<const unsigned char*>(data);
  const std::vector<unsigned char> value =
      Call(digest, _input == SIGNING_INPUT_DIGEST ? hash : std::vector<unsigned char>(bytes, bytes + size));
  if (!VerifySignatureValue(_certificate.Get(), digest, hash, value)) {
    throw CryptoException("The signing function gave a value that the certificate's key does not verify");
  }
  return value;
}

std::vector<unsigned char> FunctionKey::Call(DigestAlgorithm digest,
                                             const std::vector<unsigned char>& input) const {
  return CallHost("The signing function failed", [&] { return _sign(digest, input); });
}

Ref<const PrivateKey> CreatePrivateKeyFromFunction(const Ref<const Certificate>& certificate,
                                                   SigningInput input, const SigningFunction& sign) {
  if (!certificate) {
    throw InvalidArgumentException("a key that signs by a function needs its certificate");
  }
  if (!sign) {
    throw InvalidArgumentException("the signing function is empty");
  }
  return MakeRef<FunctionKey>(certificate, input, sign);
}

}  // namespace Crypto
}  // namespace Pelmar
