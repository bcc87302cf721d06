// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The wsse:Security header: WS-Security 1.0, section 5.

#ifndef QUORLIN_DEVSTS_SECURITYHEADER_H
#define QUORLIN_DEVSTS_SECURITYHEADER_H

#include "devsts/Secret.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/xml/Node.h>

#include <optional>
#include <string>

namespace DevSts {

/// WS-Security UsernameToken Profile 1.0, section 3.1.
struct UsernameToken {
  std::string userName;
  Secret password;
};

/// What a header holds. Nothing of it is verified but its form. The pointers live as long as the message.
struct SecurityHeader {
  const Pelmar::Xml::ElementNode* timestamp = nullptr;
  long long created = 0;  ///< Microseconds since the epoch.
  long long expires = 0;
  std::optional<UsernameToken> usernameToken;
  Pelmar::Ref<const Pelmar::Crypto::Certificate> certificate;  ///< Of the BinarySecurityToken; null: none.
  std::string certificateId;                                   ///< Its wsu:Id.
  Pelmar::Xml::ElementNode* assertion = nullptr;               ///< Null: none.
  Pelmar::Xml::ElementNode* signature = nullptr;               ///< Null: none.
};

/// Reads a header made of one Timestamp and at most one each of UsernameToken, BinarySecurityToken, Assertion
/// and Signature, and nothing else. Throws Fault.
SecurityHeader ReadSecurityHeader(const Pelmar::Xml::ElementNode& security);

/// Refuses a header that does not reach the service fresh at `now`: created more than `skew` ahead, expired
/// more than `skew` ago, or valid for longer than any honest message needs (all in microseconds). Throws
/// Fault.
void RequireFresh(const SecurityHeader& header, long long now, long long skew);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_SECURITYHEADER_H
