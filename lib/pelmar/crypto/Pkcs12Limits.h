// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// How much a PKCS #12 file may hold.

#ifndef PELMAR_CRYPTO_PKCS12LIMITS_H
#define PELMAR_CRYPTO_PKCS12LIMITS_H

#include <cstddef>

namespace Pelmar {
namespace Crypto {

/// A key and its chain have a few kilobytes.
constexpr std::size_t kMaxPkcs12Bytes = 1024 * 1024;
/// Keys, certificates and the parts that hold them.
constexpr std::size_t kMaxPkcs12Objects = 64;
constexpr std::size_t kMaxPkcs12PassPhraseBytes = 4096;

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PKCS12LIMITS_H
