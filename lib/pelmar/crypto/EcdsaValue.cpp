// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/EcdsaValue.h"

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"

namespace Pelmar {
namespace Crypto {

std::vector<unsigned char> EcdsaValueFromDer(const std::vector<unsigned char>& der, std::size_t orderBytes) {
  const unsigned char* position = der.data();
  const EcdsaSignatureHandle signature(d2i_ECDSA_SIG(nullptr, &position, static_cast<long>(der.size())));
  if (!signature) {
    ThrowOpenSslError("An ECDSA value cannot be read");
  }
  std::vector<unsigned char> value(orderBytes * 2);
  const int size = static_cast<int>(orderBytes);
  if (BN_bn2binpad(ECDSA_SIG_get0_r(signature.get()), value.data(), size) != size ||
      BN_bn2binpad(ECDSA_SIG_get0_s(signature.get()), value.data() + orderBytes, size) != size) {
    ThrowOpenSslError("An ECDSA value does not fit its curve");
  }
  return value;
}

std::vector<unsigned char> EcdsaValueToDer(const std::vector<unsigned char>& value) {
  const std::size_t half = value.size() / 2;
  BignumHandle r(BN_bin2bn(value.data(), static_cast<int>(half), nullptr));
  BignumHandle s(BN_bin2bn(value.data() + half, static_cast<int>(half), nullptr));
  const EcdsaSignatureHandle signature(ECDSA_SIG_new());
  if (!r || !s || !signature || ECDSA_SIG_set0(signature.get(), r.get(), s.get()) != 1) {
    ThrowOpenSslError("An ECDSA value cannot be read");
  }
  // The signature owns the numbers now.
  static_cast<void>(r.release());
  static_cast<void>(s.release());
  const int size = i2d_ECDSA_SIG(signature.get(), nullptr);
  if (size <= 0) {
    ThrowOpenSslError("An ECDSA value cannot be written");
  }
  std::vector<unsigned char> der(static_cast<std::size_t>(size));
  unsigned char* position = der.data();
  if (i2d_ECDSA_SIG(signature.get(), &position) != size) {
    ThrowOpenSslError("An ECDSA value cannot be written");
  }
  return der;
}

}  // namespace Crypto
}  // namespace Pelmar
