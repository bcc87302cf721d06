// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// PKCS #11 URIs (RFC 7512), as far as they name a private key.

#ifndef PELMAR_CRYPTO_PKCS11URI_H
#define PELMAR_CRYPTO_PKCS11URI_H

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Crypto {

constexpr std::size_t kMaxPkcs11UriBytes = 4096;

/// A URI taken apart.
struct Pkcs11Uri {
  std::string objectUri;   ///< What to look for: the path written anew, without the query.
  std::string modulePath;  ///< Of module-path; empty: not given.
  std::string pinFile;     ///< Of pin-source; empty: not given.
};

/// Accepts what CreatePrivateKeyFromPkcs11 promises to; throws CryptoException for everything else. No
/// message holds a value of the URI: what is refused may be a PIN.
Pkcs11Uri ParsePkcs11Uri(const std::string& uri);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PKCS11URI_H
