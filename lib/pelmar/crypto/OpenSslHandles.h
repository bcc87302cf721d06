// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Owners of OpenSSL's objects. Only for the sources of the crypto and ssl layers.

#ifndef PELMAR_CRYPTO_OPENSSLHANDLES_H
#define PELMAR_CRYPTO_OPENSSLHANDLES_H

#include <openssl/bio.h>
#include <openssl/bn.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/x509.h>
#include <openssl/x509_vfy.h>

#include <memory>

namespace Pelmar {
namespace Crypto {

/// Frees a handle with the C function that belongs to it.
template <auto Free>
struct HandleDeleter {
  template <typename T>
  void operator()(T* handle) const noexcept {
    Free(handle);
  }
};

inline void FreeX509Stack(STACK_OF(X509) * stack) noexcept {
  sk_X509_free(stack);
}

using BioHandle = std::unique_ptr<BIO, HandleDeleter<BIO_free>>;
using BignumHandle = std::unique_ptr<BIGNUM, HandleDeleter<BN_free>>;
using EcdsaSignatureHandle = std::unique_ptr<ECDSA_SIG, HandleDeleter<ECDSA_SIG_free>>;
using DigestContextHandle = std::unique_ptr<EVP_MD_CTX, HandleDeleter<EVP_MD_CTX_free>>;
using KeyHandle = std::unique_ptr<EVP_PKEY, HandleDeleter<EVP_PKEY_free>>;
using KeyContextHandle = std::unique_ptr<EVP_PKEY_CTX, HandleDeleter<EVP_PKEY_CTX_free>>;
using Pkcs8Handle = std::unique_ptr<PKCS8_PRIV_KEY_INFO, HandleDeleter<PKCS8_PRIV_KEY_INFO_free>>;
using EncryptedPkcs8Handle = std::unique_ptr<X509_SIG, HandleDeleter<X509_SIG_free>>;
using X509Handle = std::unique_ptr<X509, HandleDeleter<X509_free>>;
using X509StoreHandle = std::unique_ptr<X509_STORE, HandleDeleter<X509_STORE_free>>;
using X509StoreContextHandle = std::unique_ptr<X509_STORE_CTX, HandleDeleter<X509_STORE_CTX_free>>;
/// Owns the stack, not the certificates on it.
using X509StackHandle = std::unique_ptr<STACK_OF(X509), HandleDeleter<FreeX509Stack>>;

}  // namespace Crypto
}  // namespace Pelmar

#endif  // PELMAR_CRYPTO_OPENSSLHANDLES_H
