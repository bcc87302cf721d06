// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the service needs of a mechanism that proves who a client is in several legs (WS-Trust 1.3, section
// 8).

#ifndef QUORLIN_DEVSTS_NEGOTIATION_H
#define QUORLIN_DEVSTS_NEGOTIATION_H

#include "devsts/Assertion.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace DevSts {

using NegotiationLeg = std::vector<std::uint8_t>;

/// What came of one of the client's legs.
struct NegotiationStep {
  NegotiationLeg leg;                    ///< The service's answer; empty: there is nothing more to say.
  std::optional<std::string> principal;  ///< Set when the client is known: its user principal name.
};

/// One client's negotiation. Used by one thread at a time.
class Negotiation {
 public:
  virtual ~Negotiation() = default;
  /// Takes the client's next leg. Throws Fault when the client is not who it has to be, after which the
  /// negotiation is over.
  virtual NegotiationStep Accept(const NegotiationLeg& leg) = 0;
};

/// Starts negotiations. Safe to use from any thread.
class NegotiationMechanism {
 public:
  virtual ~NegotiationMechanism() = default;
  virtual std::unique_ptr<Negotiation> Begin() const = 0;
  /// What the tokens say of how their subject was authenticated (SAML 2.0 Authentication Context,
  /// section 3.4).
  virtual std::string GetAuthnContext() const { return kKerberosContext; }
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_NEGOTIATION_H
