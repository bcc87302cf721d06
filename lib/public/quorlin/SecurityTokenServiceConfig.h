// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Where the token service is, whom to trust there, and who the client is.

#ifndef QUORLIN_SECURITYTOKENSERVICECONFIG_H
#define QUORLIN_SECURITYTOKENSERVICECONFIG_H

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>
#include <pelmar/ssl/SSLContext.h>
#include <quorlin/Export.h>

#include <boost/optional.hpp>

#include <list>
#include <string>

namespace Quorlin {

/// The client's signing identity: requests are signed with the key, and holder-of-key tokens are bound to the
/// certificate.
struct HolderOfKeyConfig {
  Pelmar::Ref<const Pelmar::Crypto::PrivateKey> privateKey;
  Pelmar::Ref<const Pelmar::Crypto::Certificate> certificate;  ///< That of `privateKey`.
};

/// What CreateSecurityTokenService needs. It is read once and not kept. Nothing else configures the library:
/// it reads no file, environment variable or registry.
struct QUORLIN_API SecurityTokenServiceConfig {
  SecurityTokenServiceConfig();
  ~SecurityTokenServiceConfig();
  SecurityTokenServiceConfig(const SecurityTokenServiceConfig& other);
  SecurityTokenServiceConfig& operator=(const SecurityTokenServiceConfig& other);

  std::string stsUrl;  ///< The service's endpoint, http: or https:.
  /// Certificates that the tokens' signatures must chain to. Null entries are skipped. When the list is
  /// empty, every token is refused.
  std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> trustedStsCertificates;
  /// Empty, or public-key pins "sha256//<base64>" joined by ";" that the TLS server's key must match.
  std::string sslConnectionParam;
  /// Absent for a client that only handles bearer tokens.
  boost::optional<HolderOfKeyConfig> holderOfKeyConfig;
  /// Needed for https:; may be null for http:.
  Pelmar::Ref<Pelmar::Ssl::SSLContext> sslContext;
};

}  // namespace Quorlin

#endif  // QUORLIN_SECURITYTOKENSERVICECONFIG_H
