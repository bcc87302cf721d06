// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Owners of the OpenSSL objects used here.

#ifndef QUORLIN_DEVSTS_OPENSSLHANDLES_H
#define QUORLIN_DEVSTS_OPENSSLHANDLES_H

#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <memory>

namespace DevSts {

template <auto Free>
struct HandleDeleter {
  template <typename T>
  void operator()(T* handle) const noexcept {
    Free(handle);
  }
};

using BioHandle = std::unique_ptr<BIO, HandleDeleter<BIO_free_all>>;
using CertificateHandle = std::unique_ptr<X509, HandleDeleter<X509_free>>;
using ExtensionHandle = std::unique_ptr<X509_EXTENSION, HandleDeleter<X509_EXTENSION_free>>;

/// Keys are shared: by the identity, and by the TLS server that uses it.
using KeyHandle = std::shared_ptr<EVP_PKEY>;

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_OPENSSLHANDLES_H
