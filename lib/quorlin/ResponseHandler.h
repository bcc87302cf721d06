// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What an answer of the token service means.

#ifndef QUORLIN_RESPONSEHANDLER_H
#define QUORLIN_RESPONSEHANDLER_H

#include <pelmar/Reader.h>
#include <quorlin/SecurityTokenService.h>

#include <string>

namespace Quorlin {

/// Reads SOAP 1.1 answers with WS-Trust 1.3 responses. Immutable; may be shared between threads.
///
/// All operations throw InvalidCredentialsException for a fault that rejects the credentials and SsoException
/// for any other fault and for an unusable answer; outputs are then as they were. A fault code whose prefix
/// is not declared is a ParseException.
class ResponseHandler {
 public:
  /// Stores the issued assertion as canonical XML that stands on its own.
  virtual void HandleAcquireTokenResponse(Pelmar::Reader* response, std::string& token) const = 0;
  /// Whether the service calls the token's subject valid.
  virtual bool HandleValidateSubjectResponse(Pelmar::Reader* response) const = 0;
  /// Stores the renewed assertion as canonical XML that stands on its own.
  virtual void HandleRenewTokenResponse(Pelmar::Reader* response, std::string& token) const = 0;
  /// Replaces `result` by what this round of a negotiation brought.
  virtual void HandleSPNegoResponse(Pelmar::Reader* response, SPNegoResponse& result) const = 0;

 protected:
  /// Not virtual: handlers are held by shared pointers that were made with the concrete class.
  ~ResponseHandler() = default;
};

}  // namespace Quorlin

#endif  // QUORLIN_RESPONSEHANDLER_H
