// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a TLS client trusts, and who it says it is.

#ifndef PELMAR_SSL_SSLCONTEXT_H
#define PELMAR_SSL_SSLCONTEXT_H

#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>

#include <list>
#include <string>

namespace Pelmar {
namespace Ssl {

/// Trust anchors and, if wanted, a client identity for TLS connections. Immutable; shared by connections and
/// threads.
///
/// Servers are always verified: the chain up to one of the anchors, the validity periods, and the host name
/// (RFC 6125). The protocol is TLS 1.2 or newer. Nothing is read from the environment. There is no way to
/// switch any of this off.
class PELMAR_API SSLContext : public Object {
 protected:
  SSLContext();
  ~SSLContext() override;
};

/// Where an SSL context takes its trust anchors and its client identity from. All anchors given are trusted
/// together.
struct PELMAR_API SSLContextOptions {
  SSLContextOptions();
  ~SSLContextOptions();

  std::list<Ref<const Crypto::Certificate>> trustAnchors;  ///< Null entries are skipped.
  std::string caFile;                                      ///< A PEM bundle to read; empty: none.
  std::string caDirectory;  ///< A directory of hashed certificates to look anchors up in; empty: none.
  bool useSystemStore;      ///< Trust what the operating system trusts. Default: no.

  Ref<const Crypto::PrivateKey> clientKey;           ///< Null: the client shows no certificate.
  Ref<const Crypto::Certificate> clientCertificate;  ///< That of `clientKey`.
  std::list<Ref<const Crypto::Certificate>>
      clientCertificateChain;  ///< Intermediates sent with it, nearest issuer first.
};

/// Reads and parses all anchors once. Throws CryptoException when a file cannot be read or holds no
/// certificate, when the key does not belong to the certificate; InvalidArgumentException when only one of
/// key and certificate is given.
PELMAR_API Ref<SSLContext> CreateSSLContext(const SSLContextOptions& options);

}  // namespace Ssl
}  // namespace Pelmar

#endif  // PELMAR_SSL_SSLCONTEXT_H
