// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The two forms of an ECDSA signature: OpenSSL's (RFC 3279, 2.2.3) and that of XML Signature 1.1,
// section 6.4.3.

#ifndef PELMAR_CRYPTO_ECDSAVALUE_H
#define PELMAR_CRYPTO_ECDSAVALUE_H

#include <cstddef>
#include <vector>

namespace Pelmar {
namespace Crypto {

/// r and s, each in `orderBytes` bytes, one after the other. Throws CryptoException.
std::vector<unsigned char> EcdsaValueFromDer(const std::vector<unsigned char>& der, std::size_t orderBytes);

/// The DER form of `value`, whose size must be even. Throws CryptoException.
std::vector<unsigned char> EcdsaValueToDer(const std::vector<unsigned char>& value);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_ECDSAVALUE_H
