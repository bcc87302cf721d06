// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// OpenSSL's PKCS #11 engine: the one place where engines are known.

#ifndef PELMAR_CRYPTO_PKCS11ENGINE_H
#define PELMAR_CRYPTO_PKCS11ENGINE_H

#include <pelmar/crypto/Pkcs11.h>

#include <exception>
#include <string>

struct evp_pkey_st;

namespace Pelmar {
namespace Crypto {

/// The module that stands for all that p11-kit is configured for.
constexpr const char* kDefaultPkcs11Module = "p11-kit-proxy.so";

/// The private key that `objectUri` names in a token of the module at `modulePath`, after logging in with
/// `pin`. The caller owns it. Throws CryptoException.
evp_pkey_st* LoadPkcs11Key(const std::string& objectUri, const std::string& modulePath, const char* pin);

/// While it lives, a token that wants the PIN once more gets it from `askPin`, if it wants it on this thread.
/// Without one the token gets nothing.
class PinOnDemand final {
 public:
  explicit PinOnDemand(const PinFunction& askPin);
  PinOnDemand(const PinOnDemand&) = delete;
  PinOnDemand& operator=(const PinOnDemand&) = delete;
  ~PinOnDemand();

  /// Throws what `askPin` threw, if it did.
  void RethrowFailure() const;

  /// The one that lives on this thread; null if there is none.
  static PinOnDemand* GetCurrent();

  const PinFunction& askPin;
  std::exception_ptr failure;

 private:
  PinOnDemand* _outer;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PKCS11ENGINE_H
