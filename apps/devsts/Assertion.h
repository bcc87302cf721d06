// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a SAML 2.0 assertion of this service says.

#ifndef QUORLIN_DEVSTS_ASSERTION_H
#define QUORLIN_DEVSTS_ASSERTION_H

#include "devsts/Directory.h"
#include "devsts/TokenRequest.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>

#include <string>
#include <vector>

namespace DevSts {

/// SAML 2.0 Authentication Context, section 3.4.
constexpr const char* kPasswordContext = "urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport";
constexpr const char* kCertificateContext = "urn:oasis:names:tc:SAML:2.0:ac:classes:X509";
constexpr const char* kKerberosContext = "urn:oasis:names:tc:SAML:2.0:ac:classes:Kerberos";

/// One link of a delegation chain.
struct DelegateLink {
  std::string upn;
  long long instant = 0;
};

/// All instants are microseconds since the epoch.
struct AssertionContent {
  std::string upn;  ///< The subject, as name@domain.
  std::string givenName;
  std::string surname;
  std::vector<Group> groups;
  bool solution = false;
  long long issued = 0;
  long long notBefore = 0;
  long long notOnOrAfter = 0;
  long long authenticated = 0;
  std::string authnContext;
  unsigned renewCount = 0;  ///< How often it may be renewed; 0: never.
  unsigned proxyCount = 0;  ///< How often it may be delegated further; 0: never.
  std::vector<std::string> audience;
  std::vector<AdviceBlock> advice;
  std::vector<DelegateLink> delegates;
  /// Whose key the token is bound to; null for a bearer token.
  Pelmar::Ref<const Pelmar::Crypto::Certificate> confirmationCertificate;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_ASSERTION_H
