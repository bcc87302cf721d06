// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Private keys in PKCS #11 tokens: smart cards, hardware security modules.

#ifndef PELMAR_CRYPTO_PKCS11_H
#define PELMAR_CRYPTO_PKCS11_H

#include <pelmar/Export.h>
#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>

#include <boost/function.hpp>

#include <string>

namespace Pelmar {
namespace Crypto {

/// Gives a token's PIN: 1 to 255 bytes, none of them zero. Called once when a key is loaded, on that thread;
/// and again for each signature, on the thread that signs, when the token asks for that
/// (CKA_ALWAYS_AUTHENTICATE). The text it returns is overwritten after use. It may throw: what is below
/// Pelmar::Exception reaches the caller as it is, any other exception as a CryptoException with its text.
typedef boost::function<std::string()> PinFunction;

/// Whether `text` is a PKCS #11 URI and not, say, the name of a file: it begins with "pkcs11:".
PELMAR_API bool IsPkcs11Uri(const std::string& text);

/// The private key that `uri` names (RFC 7512), which stays in its token: the token signs. `certificate` is
/// that of the key; every signature is verified with it before it is used. The key serves XML signatures, and
/// as client key of TLS unless the token asks for the PIN for each signature.
///
/// The URI's path must have `token` or `serial`, and `object` or `id`; it may also have `manufacturer`,
/// `model` and `type=private`. Of the query it may have
/// - `module-path`, the token's library: a file that is loaded into the process, so the URI must come from
///   whoever may choose programs. Without it p11-kit-proxy.so is used, which brings together the modules that
///   p11-kit is configured for. A process can use one module only;
/// - `pin-source`, the file that holds the PIN (an absolute path or file: URI; one line end is dropped). It
///   takes the place of `askPin`.
/// Everything else is refused, above all `pin-value`: a URI stands in argument lists and logs.
///
/// The PIN is had, from `askPin` or from the file, even when the process is logged in to the token already; a
/// wrong one is tried once. OpenSSL's PKCS #11 engine keeps a copy of it while the process lives, to be able
/// to log in again after a fork. Nothing is ever asked for on a terminal.
///
/// Throws InvalidArgumentException for a null certificate; CryptoException when the URI is refused, when
/// there is no PIN, when the engine, the module, the token or the key cannot be used, and when the key is not
/// that of the certificate. Loading is serialised between threads; signing is not.
PELMAR_API Ref<const PrivateKey> CreatePrivateKeyFromPkcs11(const std::string& uri,
                                                            const Ref<const Certificate>& certificate,
                                                            const PinFunction& askPin);

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PKCS11_H
