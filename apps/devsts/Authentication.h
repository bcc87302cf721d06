// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Who asks, and how that was proven.

#ifndef QUORLIN_DEVSTS_AUTHENTICATION_H
#define QUORLIN_DEVSTS_AUTHENTICATION_H

#include "devsts/Assertion.h"
#include "devsts/Directory.h"
#include "devsts/MessageSignature.h"
#include "devsts/RequestLog.h"
#include "devsts/SecurityHeader.h"
#include "devsts/SoapMessage.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>

#include <string>
#include <vector>

namespace DevSts {

/// The outcome of an authentication.
struct Caller {
  const User* user = nullptr;  ///< Whose identity the new token is to carry; never null.
  std::string authnContext;
  long long authenticated = 0;  ///< When the proof was given, microseconds since the epoch.
  /// The certificate whose key the caller has proven to hold; null: none.
  Pelmar::Ref<const Pelmar::Crypto::Certificate> proofCertificate;
  /// What UseKey must name to bind a token to that key: the Id of the message's signature. Empty: UseKey must
  /// not be there.
  std::string proofSignatureId;
  /// Through whom the identity came here already.
  std::vector<DelegateLink> delegates;
  unsigned proxyCount = 0;            ///< How often the identity may be handed on.
  unsigned renewCount = 0;            ///< How often a token for it may be renewed.
  std::vector<std::string> audience;  ///< Whom the new token may be for at most; empty: anybody.
  long long notOnOrAfter = 0;         ///< When what the caller presented ends; 0: no bound.
};

/// What a sender is judged by.
struct AuthenticationContext {
  const Directory& directory;
  /// That of the service itself, which signed the tokens that are presented to it.
  Pelmar::Ref<const Pelmar::Crypto::Certificate> tokenSigner;
  ReplayGuard& replays;
  long long now;  ///< Microseconds since the epoch.
  RequestRecord& record;
};

/// Authenticates the sender of a message by what its header carries: a token of this service (with a
/// signature by the key that it is bound to, if any); a UsernameToken with the right password; or a signature
/// made with a key whose certificate the message carries and the directory knows. With password and
/// signature, the password says who it is and the signature proves the key. Throws Fault.
Caller Authenticate(const SoapMessage& message, const SecurityHeader& header,
                    const AuthenticationContext& context);

/// `user` as somebody who has just been authenticated, without proof of a key.
Caller MakeCaller(const User& user, const std::string& authnContext, const AuthenticationContext& context);

/// Checks that the message is signed with the key of the certificate it carries, and that it is no copy of an
/// earlier one. This proves that the sender holds the key, not who the sender is. Throws Fault.
void RequireProofOfKey(const SoapMessage& message, const SecurityHeader& header,
                       const AuthenticationContext& context);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_AUTHENTICATION_H
