// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the service says when it refuses.

#ifndef QUORLIN_DEVSTS_FAULT_H
#define QUORLIN_DEVSTS_FAULT_H

#include <stdexcept>
#include <string>

namespace DevSts {

/// The fault codes this service uses: SOAP 1.1, section 4.4.1; WS-Trust 1.3, section 11; WS-Security 1.0,
/// section 12.
enum class FaultCode {
  CLIENT,                 ///< soapenv:Client: not a message as the protocol demands it.
  SERVER,                 ///< soapenv:Server: the service itself failed.
  FAILED_AUTHENTICATION,  ///< wst:FailedAuthentication: the credentials do not prove who asks.
  INVALID_TOKEN,          ///< wst:InvalidSecurityToken: a token that the request is about is not acceptable.
  INVALID_HEADER_TOKEN,   ///< wsse:InvalidSecurityToken: a token of the security header is not acceptable.
  REQUEST_FAILED          ///< wst:RequestFailed: understood, and not granted.
};

/// The code as it stands in the answer: "wst:FailedAuthentication".
const char* ToText(FaultCode code);

/// Ends the work on a request. The text goes to the client and must hold nothing secret.
class Fault final : public std::runtime_error {
 public:
  Fault(FaultCode code, const std::string& text) : std::runtime_error(text), _code(code) {}

  FaultCode GetCode() const { return _code; }

 private:
  FaultCode _code;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_FAULT_H
