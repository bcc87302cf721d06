// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Message digests.

#ifndef PELMAR_CRYPTO_DIGEST_H
#define PELMAR_CRYPTO_DIGEST_H

#include <pelmar/Export.h>

#include <cstddef>
#include <string>
#include <vector>

namespace Pelmar {
namespace Crypto {

enum DigestAlgorithm { DIGEST_SHA256, DIGEST_SHA384, DIGEST_SHA512 };

/// The digest of `size` bytes at `data` (FIPS 180-4): 32, 48 or 64 bytes. Throws CryptoException.
PELMAR_API std::vector<unsigned char> ComputeDigest(DigestAlgorithm algorithm, const void* data,
                                                    std::size_t size);

/// Bytes as lower-case hexadecimal text.
PELMAR_API std::string ToHex(const std::vector<unsigned char>& bytes);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_DIGEST_H
