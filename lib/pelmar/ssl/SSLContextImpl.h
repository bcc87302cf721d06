// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The SSL context as the HTTP layer uses it.

#ifndef PELMAR_SSL_SSLCONTEXTIMPL_H
#define PELMAR_SSL_SSLCONTEXTIMPL_H

#include <pelmar/ssl/SSLContext.h>

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/PrivateKeyImpl.h"

#include <memory>
#include <vector>

struct ssl_ctx_st;
struct x509_store_st;

namespace Pelmar {
namespace Ssl {

class SSLContextImpl final : public SSLContext {
 public:
  /// Throws as `CreateSSLContext` does.
  explicit SSLContextImpl(const SSLContextOptions& options);

  /// Gives `context` this object's trust anchors in place of all it had, TLS 1.2 as the least version,
  /// OpenSSL's security level 2, and the client certificate if there is one. Peer and host name verification
  /// are for the caller to demand. Throws CryptoException.
  void ConfigureSslCtx(ssl_ctx_st* context) const;

 private:
  struct StoreDeleter {
    void operator()(x509_store_st* store) const noexcept;
  };

  ~SSLContextImpl() override;

  void ApplyClientIdentity(ssl_ctx_st* context) const;

  std::unique_ptr<x509_store_st, StoreDeleter> _store;
  Ref<const Crypto::PrivateKeyImpl> _clientKey;
  Ref<const Crypto::CertificateImpl> _clientCertificate;
  std::vector<Ref<const Crypto::CertificateImpl>> _clientChain;
};

}  // namespace Ssl
}  // namespace Pelmar

#endif  // PELMAR_SSL_SSLCONTEXTIMPL_H
