// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Authentication in several legs: WS-Trust 1.3, section 8.

#ifndef QUORLIN_DEVSTS_NEGOTIATOR_H
#define QUORLIN_DEVSTS_NEGOTIATOR_H

#include "devsts/Authentication.h"
#include "devsts/Negotiation.h"
#include "devsts/NegotiationTable.h"
#include "devsts/SecurityHeader.h"
#include "devsts/SoapMessage.h"
#include "devsts/TokenRequest.h"

#include <cstddef>
#include <memory>
#include <optional>
#include <string>

namespace DevSts {

/// The longest leg that a mechanism is given. Kerberos tickets with many groups stay below 64 KiB.
constexpr std::size_t kMaxLegBytes = 128 * 1024;

/// What came of one message of a client.
struct NegotiationRound {
  std::string context;           ///< The service's name for the negotiation.
  NegotiationLeg leg;            ///< What to answer.
  std::string cookie;            ///< "name=value" for the client to keep; empty: none.
  std::optional<Caller> caller;  ///< Set when the negotiation has ended well.
  TokenRequest wishes;           ///< What its first message asked for.
};

/// Safe to use from any thread.
class Negotiator final {
 public:
  /// Without a mechanism every negotiation is refused. `withCookie`: further legs must bring the cookie that
  /// the first one got.
  Negotiator(const std::shared_ptr<const NegotiationMechanism>& mechanism, bool withCookie)
      : _mechanism(mechanism), _withCookie(withCookie) {}

  /// A negotiation's first message, which may prove a key by its signature but holds no other credentials.
  /// Throws Fault.
  NegotiationRound Start(const SoapMessage& message, const SecurityHeader& header,
                         const TokenRequest& request, const AuthenticationContext& context);

  /// Every later message: it names the negotiation and brings the next leg. `cookies` is the value of the
  /// Cookie header. Throws Fault; a leg or a cookie that is not accepted ends the negotiation.
  NegotiationRound Continue(const SecurityHeader& header, const TokenRequest& request,
                            const std::string& cookies, const AuthenticationContext& context);

 private:
  NegotiationRound Advance(const std::string& id, RunningNegotiation running, const TokenRequest& request,
                           const AuthenticationContext& context);

  std::shared_ptr<const NegotiationMechanism> _mechanism;
  bool _withCookie;
  NegotiationTable _table;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_NEGOTIATOR_H
