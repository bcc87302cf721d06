// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Private keys that somebody else keeps: a key service, an agent, a device with an interface of its own.

#ifndef PELMAR_CRYPTO_SIGNINGFUNCTION_H
#define PELMAR_CRYPTO_SIGNINGFUNCTION_H

#include <pelmar/Export.h>
#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/Digest.h>
#include <pelmar/crypto/PrivateKey.h>

#include <boost/function.hpp>

#include <vector>

namespace Pelmar {
namespace Crypto {

/// What a signing function is handed.
enum SigningInput {
  SIGNING_INPUT_DIGEST,  ///< The digest of what is signed: 32, 48 or 64 bytes, without a DigestInfo around
                         ///< it.
  SIGNING_INPUT_DATA     ///< What is signed itself; the function computes the digest.
};

/// Signs with the private key that the host knows how to reach. `digest` is the hash of the signature,
/// `input` what SigningInput says. Returns the value as PrivateKey::Sign does: RSASSA-PKCS1-v1_5 (RFC 8017)
/// for RSA; for EC r and s, each of the length of the curve's order, one after the other, not their DER form.
///
/// It is called on the thread that signs, and on several at once when several sign. It may throw: what is
/// below Pelmar::Exception reaches the caller of Sign as it is, any other exception as a CryptoException with
/// its text.
typedef boost::function<std::vector<unsigned char>(DigestAlgorithm digest,
                                                   const std::vector<unsigned char>& input)>
    SigningFunction;

/// A private key that signs by calling `sign`. `certificate` holds its public key: the type of the key is
/// read from there, and every value is verified with it before it is used, so that a function with a wrong
/// key, or a fault in between, ends in a CryptoException and never in a message. The key keeps a copy of the
/// function and a reference to the certificate.
///
/// It makes XML signatures as any other key does. It is no client key for TLS, which signs in ways
/// (RSASSA-PSS) that the function does not know.
///
/// Throws InvalidArgumentException for a null certificate and an empty function; CryptoException when the
/// certificate's key is not RSA (at least 2048 bits) or EC (P-256, P-384, P-521).
PELMAR_API Ref<const PrivateKey> CreatePrivateKeyFromFunction(const Ref<const Certificate>& certificate,
                                                              SigningInput input,
                                                              const SigningFunction& sign);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_SIGNINGFUNCTION_H
