// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// PKCS #12 files. Whatever the bytes: a CryptoException, or a key that signs for its certificate. A changed
// file hardly ever has the right MAC, so each one is also tried with a new MAC, as whoever knows the pass
// phrase could make it.

#include "pelmar/crypto/Pkcs12Limits.h"
#include "pelmar/crypto/SignatureValue.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Digest.h>
#include <pelmar/crypto/Pkcs12.h>

#include <openssl/err.h>
#include <openssl/pkcs12.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iostream>
#include <string>
#include <vector>

namespace {

using namespace Pelmar::Crypto;

const std::string kPassPhrase = "fuzz";

[[noreturn]] void Fail(const char* promise) {
  std::cerr << "broken: " << promise << std::endl;
  std::abort();
}

void Check(const std::vector<unsigned char>& der) {
  try {
    const Pkcs12Content content = ReadPkcs12(der, kPassPhrase);
    const std::vector<unsigned char> digest = ComputeDigest(DIGEST_SHA256, der.data(), der.size());
    if (!VerifySignatureValue(content.certificate.Get(), DIGEST_SHA256, digest,
                              content.privateKey->Sign(DIGEST_SHA256, der.data(), der.size()))) {
      Fail("the key is that of the certificate");
    }
    if (content.chain.size() > kMaxPkcs12Objects) {
      Fail("the file has a limited number of certificates");
    }
  } catch (const CryptoException&) {
  }
  if (ERR_peek_error() != 0) {
    Fail("no error is left behind");
  }
}

/// The file with a MAC of its own; empty when OpenSSL cannot make one.
std::vector<unsigned char> WithNewMac(const std::vector<unsigned char>& der) {
  unsigned char salt[] = {1, 2, 3, 4, 5, 6, 7, 8};
  std::vector<unsigned char> made;
  const unsigned char* position = der.data();
  PKCS12* const file = d2i_PKCS12(nullptr, &position, static_cast<long>(der.size()));
  if (file != nullptr && PKCS12_set_mac(file, kPassPhrase.data(), static_cast<int>(kPassPhrase.size()), salt,
                                        sizeof(salt), 1, EVP_sha256()) == 1) {
    const int size = i2d_PKCS12(file, nullptr);
    made.resize(size > 0 ? static_cast<std::size_t>(size) : 0);
    unsigned char* end = made.data();
    if (size > 0) {
      i2d_PKCS12(file, &end);
    }
  }
  PKCS12_free(file);
  ERR_clear_error();
  return made;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  // Beyond this size there is nothing new to see.
  if (size > 64 * 1024) {
    return 0;
  }
  const std::vector<unsigned char> der(data, data + size);
  Check(der);
  Check(WithNewMac(der));
  return 0;
}
