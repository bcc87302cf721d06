// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a client asks for: WS-Trust 1.3, sections 3, 4, 5 and 7.

#ifndef QUORLIN_DEVSTS_TOKENREQUEST_H
#define QUORLIN_DEVSTS_TOKENREQUEST_H

#include <pelmar/xml/Node.h>

#include <optional>
#include <string>
#include <vector>

namespace DevSts {

enum class Operation { ISSUE, RENEW, VALIDATE, CHALLENGE };

/// Named values that a client wants to stand in the token.
struct AdviceItem {
  std::string name;
  std::vector<std::string> values;
};

struct AdviceBlock {
  std::string source;
  std::vector<AdviceItem> items;
};

/// The fields of a request, in the form they came in. The pointers live as long as the message.
struct TokenRequest {
  Operation operation = Operation::ISSUE;
  bool holderOfKey = false;  ///< KeyType PublicKey rather than Bearer.
  long long lifetime = 0;    ///< Asked for, in microseconds; 0: not said.
  bool renewable = false;
  bool delegable = false;
  std::optional<std::string> delegateTo;
  std::vector<std::string> audience;
  std::vector<AdviceBlock> advice;
  std::string useKey;                          ///< The Id of the signature whose key to bind to; empty: none.
  Pelmar::Xml::ElementNode* target = nullptr;  ///< The assertion to renew or validate.
  std::string context;                         ///< Names the negotiation that the message belongs to.
  std::optional<std::string> binaryExchange;   ///< One message of a negotiation, in base64.
};

/// The operation that a SOAPAction header names: the URI in double quotes (SOAP 1.1, section 6.1.1). Throws
/// Fault.
Operation ReadAction(const std::string& soapAction);

/// Reads the request, whose RequestType must be that of `operation`. Elements that are not known are refused,
/// so that nothing a client asks for is silently ignored. Throws Fault.
TokenRequest ReadTokenRequest(const Pelmar::Xml::ElementNode& request, Operation operation);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_TOKENREQUEST_H
