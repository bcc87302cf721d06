// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/Pkcs12Profile.h"

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"

#include <pelmar/crypto/CryptoException.h>

#include <openssl/asn1t.h>

#include <algorithm>
#include <cstdint>
#include <initializer_list>
#include <string>

namespace Pelmar {
namespace Crypto {

namespace {

constexpr int kNameBytes = 80;

using Pbes2Handle = std::unique_ptr<PBE2PARAM, HandleDeleter<PBE2PARAM_free>>;
using Pbkdf2Handle = std::unique_ptr<PBKDF2PARAM, HandleDeleter<PBKDF2PARAM_free>>;

bool IsOneOf(const ASN1_OBJECT* object, std::initializer_list<int> accepted) {
  return std::find(accepted.begin(), accepted.end(), OBJ_obj2nid(object)) != accepted.end();
}

const ASN1_OBJECT* GetAlgorithm(const X509_ALGOR* algorithm) {
  const ASN1_OBJECT* object = nullptr;
  X509_ALGOR_get0(&object, nullptr, nullptr, algorithm);
  return object;
}

// OpenSSL's name, or the numbers.
std::string NameOf(const ASN1_OBJECT* object) {
  char name[kNameBytes] = {};
  OBJ_obj2txt(name, kNameBytes, object, 0);
  ClearOpenSslErrors();
  return name;
}

/// The parameters of `algorithm`, which must be a sequence of the form `item`. Null if they are not.
void* Unpack(const X509_ALGOR* algorithm, const ASN1_ITEM* item) {
  void* const parameters = ASN1_TYPE_unpack_sequence(item, algorithm->parameter);
  ClearOpenSslErrors();
  return parameters;
}

[[noreturn]] void RefuseEncryption(const ASN1_OBJECT* used) {
  throw CryptoException("The PKCS #12 file is encrypted with " + NameOf(used) +
                        "; PBES2 with PBKDF2 and AES-CBC is needed");
}

[[noreturn]] void RefuseParameters() {
  throw CryptoException("The PKCS #12 file is encrypted with parameters that cannot be read");
}

}  // namespace

void Pkcs12Profile::RequireMac(const PKCS12* file) {
  if (PKCS12_mac_present(file) != 1) {
    throw CryptoException("The PKCS #12 file has no MAC, so anybody may have changed it");
  }
  const ASN1_INTEGER* rounds = nullptr;
  const X509_ALGOR* algorithm = nullptr;
  PKCS12_get0_mac(nullptr, &algorithm, nullptr, &rounds, file);
  const ASN1_OBJECT* const digest = GetAlgorithm(algorithm);
  if (!IsOneOf(digest, {NID_sha256, NID_sha384, NID_sha512})) {
    throw CryptoException("The MAC of the PKCS #12 file uses " + NameOf(digest) +
                          "; SHA-256, SHA-384 or SHA-512 is needed");
  }
  // Absent it is 1.
  if (rounds != nullptr) {
    Count(rounds);
  }
}

void Pkcs12Profile::RequireEncryption(const X509_ALGOR* algorithm) {
  const ASN1_OBJECT* const scheme = GetAlgorithm(algorithm);
  if (!IsOneOf(scheme, {NID_pbes2})) {
    RefuseEncryption(scheme);
  }
  const Pbes2Handle parameters(static_cast<PBE2PARAM*>(Unpack(algorithm, ASN1_ITEM_rptr(PBE2PARAM))));
  if (!parameters) {
    RefuseParameters();
  }
  const ASN1_OBJECT* const cipher = GetAlgorithm(parameters->encryption);
  if (!IsOneOf(cipher, {NID_aes_128_cbc, NID_aes_192_cbc, NID_aes_256_cbc})) {
    RefuseEncryption(cipher);
  }
  RequireDerivation(parameters->keyfunc);
}

void Pkcs12Profile::RequireDerivation(const X509_ALGOR* algorithm) {
  const ASN1_OBJECT* const function = GetAlgorithm(algorithm);
  if (!IsOneOf(function, {NID_id_pbkdf2})) {
    RefuseEncryption(function);
  }
  const Pbkdf2Handle parameters(static_cast<PBKDF2PARAM*>(Unpack(algorithm, ASN1_ITEM_rptr(PBKDF2PARAM))));
  if (!parameters) {
    RefuseParameters();
  }
  // Absent it is HMAC with SHA-1 (RFC 8018, A.2).
  const ASN1_OBJECT* const prf =
      parameters->prf == nullptr ? OBJ_nid2obj(NID_hmacWithSHA1) : GetAlgorithm(parameters->prf);
  if (!IsOneOf(prf, {NID_hmacWithSHA256, NID_hmacWithSHA384, NID_hmacWithSHA512})) {
    throw CryptoException("The keys of the PKCS #12 file are derived with " + NameOf(prf) +
                          "; HMAC with SHA-256, SHA-384 or SHA-512 is needed");
  }
  Count(parameters->iter);
}

void Pkcs12Profile::Count(const ASN1_INTEGER* rounds) {
  std::int64_t number = 0;
  const bool isNumber = ASN1_INTEGER_get_int64(&number, rounds) == 1;
  ClearOpenSslErrors();
  // Nothing is added that could overflow.
  if (!isNumber || number < 1 || number > kMaxPkcs12Rounds - _rounds) {
    throw CryptoException("The PKCS #12 file asks for less than 1 or, in all its parts, more than " +
                          std::to_string(kMaxPkcs12Rounds) + " rounds of key derivation");
  }
  _rounds += number;
}

}  // namespace Crypto
}  // namespace Pelmar
