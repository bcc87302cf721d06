// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The texts of the answers, written out by hand: a reading of the protocol that owes nothing to the client
// library's builders.

#ifndef QUORLIN_DEVSTS_RESPONSES_H
#define QUORLIN_DEVSTS_RESPONSES_H

#include "devsts/Fault.h"

#include <string>

namespace DevSts {

/// An issued token and when it is valid, in microseconds since the epoch.
struct IssuedToken {
  std::string xml;
  long long notBefore = 0;
  long long notOnOrAfter = 0;
};

/// WS-Trust 1.3, section 4.3: the answer to an issue request is a collection.
std::string MakeIssueResponse(const IssuedToken& token);

/// The answer to a renewal is a single response (WS-Trust 1.3, section 5).
std::string MakeRenewResponse(const IssuedToken& token);

/// WS-Trust 1.3, section 7.
std::string MakeValidateResponse(bool valid);

/// WS-Trust 1.3, section 8: a message of the service's side of a negotiation, `leg` in base64, which goes on.
std::string MakeChallengeResponse(const std::string& context, const std::string& leg);

/// The end of a negotiation: the token, with the service's last message when there is one (`leg` not empty).
std::string MakeNegotiatedResponse(const std::string& context, const std::string& leg,
                                   const IssuedToken& token);

/// SOAP 1.1, section 4.4.
std::string MakeFault(FaultCode code, const std::string& text);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_RESPONSES_H
