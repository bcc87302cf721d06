// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Which keys are good enough, for signing and for being believed.

#ifndef PELMAR_CRYPTO_KEYSTRENGTH_H
#define PELMAR_CRYPTO_KEYSTRENGTH_H

#include <pelmar/crypto/PrivateKey.h>

#include <cstddef>

struct evp_pkey_st;

namespace Pelmar {
namespace Crypto {

/// NIST SP 800-131A: 112 bits of strength at least.
constexpr int kMinRsaBits = 2048;

/// The type of `key`: RSA of at least kMinRsaBits, or EC on one of the named curves P-256, P-384, P-521.
/// Throws CryptoException for everything else; the text begins with `owner`, for example "The certificate".
KeyType RequireAcceptableKey(const evp_pkey_st* key, const char* owner);

/// Length in bytes of the order of an EC key's curve: half of an XML Signature ECDSA value.
std::size_t GetEcOrderBytes(const evp_pkey_st* key);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_KEYSTRENGTH_H
