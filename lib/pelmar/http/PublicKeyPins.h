// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Public-key pins: the hash of a SubjectPublicKeyInfo that a server's key has to be (RFC 7469, section 2.4,
// for the hash).

#ifndef PELMAR_HTTP_PUBLICKEYPINS_H
#define PELMAR_HTTP_PUBLICKEYPINS_H

#include <string>

namespace Pelmar {
namespace Http {

/// Throws InvalidArgumentException unless `pins` is empty or made of "sha256//" followed by the base64 text
/// of 32 bytes, joined by ";".
void RequirePublicKeyPins(const std::string& pins);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_PUBLICKEYPINS_H
