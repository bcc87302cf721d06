// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Fields of OpenSSL's certificates as the platform's values. Only for the sources of the crypto layer.

#ifndef PELMAR_CRYPTO_X509FIELDS_H
#define PELMAR_CRYPTO_X509FIELDS_H

#include <pelmar/system/DateTime.h>

#include <openssl/x509.h>

#include <string>

namespace Pelmar {
namespace Crypto {

/// RFC 4514 text, but with letters beyond ASCII as they are (UTF-8) instead of escaped byte by byte. Control
/// characters stay escaped, so that a name can go into a message. Throws CryptoException.
std::string PrintX509Name(const X509_NAME* name);

/// Throws CryptoException for a malformed time.
System::DateTime ReadX509Time(const ASN1_TIME* time);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_X509FIELDS_H
