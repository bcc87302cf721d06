// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a caller asks of a token.

#ifndef QUORLIN_TOKENSPEC_H
#define QUORLIN_TOKENSPEC_H

#include <quorlin/Export.h>
#include <quorlin/SamlToken.h>

#include <boost/optional.hpp>

#include <set>
#include <string>
#include <vector>

namespace Quorlin {

/// The properties of a token to be issued. A plain value; only the lifetime must be set. The service may
/// grant less than was asked.
struct QUORLIN_API TokenSpec {
  /// How the token is to be bound to its bearer.
  enum Confirmation : int {
    CONFIRMATION_DEFAULT =
        0,  ///< Holder-of-key when the service object has a HolderOfKeyConfig, bearer otherwise.
    CONFIRMATION_BEARER = 1  ///< Always bearer.
  };

  /// No lifetime (it must be set), no audience, advice or delegate, not delegable, not renewable,
  /// CONFIRMATION_DEFAULT.
  TokenSpec();
  ~TokenSpec();
  TokenSpec(const TokenSpec& other);
  TokenSpec& operator=(const TokenSpec& other);

  long long tokenLifetimeSec;                 ///< Requested lifetime in seconds; must be positive.
  std::set<std::string> audienceRestriction;  ///< URIs of the services the token is for; empty: any.
  std::vector<Advice> advice;                 ///< Advice for the service to write into the token.
  bool delegable;  ///< Whether the token may be used to delegate the subject's identity.
  /// The principal to delegate to. When set, requests by password or GSS go out unsigned, though they may ask
  /// for a holder-of-key token.
  boost::optional<std::string> delegateTo;
  bool renewable;  ///< Whether the token may be renewed.
  Confirmation confirmation;
};

}  // namespace Quorlin

#endif  // QUORLIN_TOKENSPEC_H
