// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/KeyStrength.h"

#include "pelmar/crypto/OpenSslError.h"

#include <pelmar/crypto/CryptoException.h>

#include <openssl/core_names.h>
#include <openssl/evp.h>

#include <algorithm>
#include <iterator>
#include <string>

namespace Pelmar {
namespace Crypto {

namespace {

constexpr std::size_t kMaxGroupNameBytes = 80;

KeyType RequireAcceptableRsa(const EVP_PKEY* key, const char* owner) {
  const int bits = EVP_PKEY_get_bits(key);
  if (bits < kMinRsaBits) {
    throw CryptoException(std::string(owner) + " has an RSA key of " + std::to_string(bits) +
                          " bits; at least " + std::to_string(kMinRsaBits) + " are needed");
  }
  return KEY_RSA;
}

// A curve given by its numbers may be anything, even when it looks like a standard one (CVE-2020-0601).
bool IsNamedCurve(const EVP_PKEY* key) {
  int fromNumbers = 0;
  return EVP_PKEY_get_int_param(key, OSSL_PKEY_PARAM_EC_DECODED_FROM_EXPLICIT_PARAMS, &fromNumbers) == 1 &&
         fromNumbers == 0;
}

bool IsAcceptableCurve(const EVP_PKEY* key) {
  static const char* const kCurves[] = {"prime256v1", "secp384r1", "secp521r1"};
  char name[kMaxGroupNameBytes] = {};
  if (!IsNamedCurve(key) || EVP_PKEY_get_group_name(key, name, sizeof(name), nullptr) != 1) {
    return false;
  }
  const std::string curve(name);
  return std::any_of(std::begin(kCurves), std::end(kCurves),
                     [&curve](const char* known) { return curve == known; });
}

KeyType RequireAcceptableEc(const EVP_PKEY* key, const char* owner) {
  const bool acceptable = IsAcceptableCurve(key);
  ClearOpenSslErrors();
  if (!acceptable) {
    throw CryptoException(std::string(owner) + " has an EC key on a curve other than P-256, P-384 and P-521");
  }
  return KEY_EC;
}

}  // namespace

KeyType RequireAcceptableKey(const EVP_PKEY* key, const char* owner) {
  if (key != nullptr && EVP_PKEY_is_a(key, "RSA") == 1) {
    return RequireAcceptableRsa(key, owner);
  }
  if (key != nullptr && EVP_PKEY_is_a(key, "EC") == 1) {
    return RequireAcceptableEc(key, owner);
  }
  ClearOpenSslErrors();
  throw CryptoException(std::string(owner) + " has a key that is neither RSA nor EC");
}

std::size_t GetEcOrderBytes(const EVP_PKEY* key) {
  // For EC keys OpenSSL's "bits" is the size of the order.
  return (static_cast<std::size_t>(EVP_PKEY_get_bits(key)) + 7) / 8;
}

}  // namespace Crypto
}  // namespace Pelmar
