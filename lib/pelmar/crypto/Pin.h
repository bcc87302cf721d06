// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Where the PIN of a PKCS #11 token comes from.

#ifndef PELMAR_CRYPTO_PIN_H
#define PELMAR_CRYPTO_PIN_H

#include "pelmar/crypto/WipedText.h"

#include <pelmar/crypto/Pkcs11.h>

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Crypto {

constexpr std::size_t kMaxPinBytes = 255;

/// Gives the PIN that stands in the file at `path`, each time as it is then; one line end is dropped. Throws
/// CryptoException when it is called and there is none.
PinFunction ReadPinFrom(const std::string& path);

/// The PIN that `askPin` gives. Throws CryptoException for one that no token can have; CallHost
/// (HostFunction.h) tells what becomes of exceptions of `askPin`.
class Pin final {
 public:
  explicit Pin(const PinFunction& askPin);

  const char* Get() const { return _pin.text.c_str(); }

 private:
  WipedText _pin;
};

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_PIN_H
