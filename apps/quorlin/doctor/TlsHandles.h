// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Owners of OpenSSL's objects.

#ifndef QUORLIN_CLI_DOCTOR_TLSHANDLES_H
#define QUORLIN_CLI_DOCTOR_TLSHANDLES_H

#include <openssl/ssl.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <memory>

namespace Cli {
namespace Doctor {

template <auto Free>
struct TlsHandleDeleter {
  template <typename T>
  void operator()(T* handle) const noexcept {
    Free(handle);
  }
};

using SslContextHandle = std::unique_ptr<SSL_CTX, TlsHandleDeleter<SSL_CTX_free>>;
using SslHandle = std::unique_ptr<SSL, TlsHandleDeleter<SSL_free>>;
using StoreHandle = std::unique_ptr<X509_STORE, TlsHandleDeleter<X509_STORE_free>>;
using CertificateHandle = std::unique_ptr<X509, TlsHandleDeleter<X509_free>>;
using NamesHandle = std::unique_ptr<GENERAL_NAMES, TlsHandleDeleter<GENERAL_NAMES_free>>;

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_TLSHANDLES_H
