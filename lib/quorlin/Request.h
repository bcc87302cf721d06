// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A finished request.

#ifndef QUORLIN_REQUEST_H
#define QUORLIN_REQUEST_H

#include <pelmar/SecretText.h>

#include <string>

namespace Quorlin {

/// One SOAP 1.1 request as it goes over the wire. A plain value, but for its body, which may hold a password
/// and is wiped in the end.
struct Request {
  ~Request() { Pelmar::Wipe(body); }

  /// The actions (WS-Trust 1.3, sections 4 to 8).
  static const char* const VALIDATE;
  static const char* const RENEW;
  /// Answers a challenge: every SPNEGO leg but the first. It is a response-side action, because such a leg is
  /// sent as a RequestSecurityTokenResponse (WS-Trust 1.3, section 8).
  static const char* const CHALLANGE;
  static const char* const ISSUE;

  std::string soapAction;  ///< Without the quotes that the HTTP header puts around it.
  std::string body;        ///< The envelope as XML text.
};

}  // namespace Quorlin

#endif  // QUORLIN_REQUEST_H
