// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/ssl/SSLContextImpl.h"

#include "pelmar/crypto/FunctionKey.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"
#include "pelmar/ssl/TrustAnchors.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/CryptoException.h>

#include <openssl/ssl.h>
#include <openssl/x509_vfy.h>

namespace Pelmar {
namespace Ssl {

namespace {

using Crypto::ClearOpenSslErrors;
using Crypto::CryptoException;
using Crypto::ThrowOpenSslError;

// 112 bits: RSA and DH from 2048 bits, SHA-2, no compression.
constexpr int kSecurityLevel = 2;

X509_STORE* MakeStore(const SSLContextOptions& options) {
  Crypto::X509StoreHandle store(X509_STORE_new());
  // An anchor ends the chain whether or not it is self-signed.
  if (!store || X509_STORE_set_flags(store.get(), X509_V_FLAG_PARTIAL_CHAIN) != 1) {
    ThrowOpenSslError("A trust store cannot be made");
  }
  AddCertificates(store.get(), options.trustAnchors);
  if (!options.caFile.empty()) {
    AddFile(store.get(), options.caFile);
  }
  if (!options.caDirectory.empty()) {
    AddDirectory(store.get(), options.caDirectory);
  }
  if (options.useSystemStore) {
    AddSystemStore(store.get());
  }
  return store.release();
}

void RequireWholeIdentity(const SSLContextOptions& options) {
  const bool hasKey = options.clientKey.Get() != nullptr;
  const bool hasCertificate = options.clientCertificate.Get() != nullptr;
  if (hasKey != hasCertificate) {
    throw InvalidArgumentException(hasKey ? "the client key has no client certificate"
                                          : "the client certificate has no client key");
  }
  if (!hasCertificate && !options.clientCertificateChain.empty()) {
    throw InvalidArgumentException("the client certificate chain has no client certificate");
  }
}

// A key of another class would keep its secret to itself, and TLS could not sign with it.
Ref<const Crypto::PrivateKeyImpl> ToPrivateKeyImpl(const Crypto::PrivateKey* key) {
  if (dynamic_cast<const Crypto::FunctionKey*>(key) != nullptr) {
    throw InvalidArgumentException("the client key signs by a function of the host, which TLS cannot use");
  }
  const auto* const own = dynamic_cast<const Crypto::PrivateKeyImpl*>(key);
  if (own == nullptr) {
    throw InvalidArgumentException("the client key was not made by this platform");
  }
  return own;
}

void RequireMatch(const Crypto::CertificateImpl& certificate, const Crypto::PrivateKeyImpl& key) {
  const bool matches = X509_check_private_key(certificate.GetX509(), key.GetKey()) == 1;
  ClearOpenSslErrors();
  if (!matches) {
    throw CryptoException("The client key does not belong to the client certificate");
  }
}

}  // namespace

SSLContext::SSLContext() = default;

SSLContext::~SSLContext() = default;

SSLContextOptions::SSLContextOptions() : useSystemStore(false) {}

SSLContextOptions::~SSLContextOptions() = default;

void SSLContextImpl::StoreDeleter::operator()(X509_STORE* store) const noexcept {
  X509_STORE_free(store);
}

SSLContextImpl::SSLContextImpl(const SSLContextOptions& options) {
  RequireWholeIdentity(options);
  if (options.clientKey) {
    _clientKey = ToPrivateKeyImpl(options.clientKey.Get());
    _clientCertificate = Crypto::ToCertificateImpl(options.clientCertificate.Get());
    RequireMatch(*_clientCertificate, *_clientKey);
    for (const Ref<const Crypto::Certificate>& issuer : options.clientCertificateChain) {
      _clientChain.push_back(Crypto::ToCertificateImpl(issuer.Get()));
    }
  }
  _store.reset(MakeStore(options));
  ClearOpenSslErrors();
}

SSLContextImpl::~SSLContextImpl() = default;

void SSLContextImpl::ConfigureSslCtx(SSL_CTX* context) const {
  ClearOpenSslErrors();
  // From here on this store alone counts; without any anchor in it no server is trusted.
  SSL_CTX_set1_cert_store(context, _store.get());
  SSL_CTX_set_security_level(context, kSecurityLevel);
  if (SSL_CTX_set_min_proto_version(context, TLS1_2_VERSION) != 1) {
    ThrowOpenSslError("TLS cannot be set up");
  }
  if (_clientKey) {
    ApplyClientIdentity(context);
  }
}

void SSLContextImpl::ApplyClientIdentity(SSL_CTX* context) const {
  constexpr int kReplace = 1;
  const Crypto::X509StackHandle chain(sk_X509_new_null());
  if (!chain) {
    ThrowOpenSslError("The client certificate cannot be used");
  }
  for (const Ref<const Crypto::CertificateImpl>& issuer : _clientChain) {
    if (sk_X509_push(chain.get(), issuer->GetX509()) <= 0) {
      ThrowOpenSslError("The client certificate cannot be used");
    }
  }
  if (SSL_CTX_use_cert_and_key(context, _clientCertificate->GetX509(), _clientKey->GetKey(), chain.get(),
                               kReplace) != 1) {
    ThrowOpenSslError("The client certificate cannot be used");
  }
}

Ref<SSLContext> CreateSSLContext(const SSLContextOptions& options) {
  return MakeRef<SSLContextImpl>(options);
}

}  // namespace Ssl
}  // namespace Pelmar
