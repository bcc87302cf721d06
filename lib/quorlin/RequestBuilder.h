// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Makes the requests that the token service understands.

#ifndef QUORLIN_REQUESTBUILDER_H
#define QUORLIN_REQUESTBUILDER_H

#include <quorlin/SamlToken.h>
#include <quorlin/TokenSpec.h>

#include <string>
#include <vector>

#include "quorlin/Request.h"

namespace Quorlin {

/// One operation per sentence of the protocol. Immutable; may be shared between threads.
///
/// All operations replace `request`; when one throws, `request` may hold the new action with the old body.
/// They throw Pelmar::InvalidArgumentException for a lifetime (in seconds) that is not positive and for text
/// that XML 1.0 cannot carry, Pelmar::InvalidStateException where a signing identity is needed and none is
/// configured, and the platform's exceptions when signing fails.
class RequestBuilder {
 public:
  /// Issue by user name and password. Signed when the token is to be bound to the configured key and is not
  /// for a delegate.
  virtual void BuildUserPassTokenRequest(const std::string& userName, const std::string& password,
                                         const TokenSpec& spec, Request& request) const = 0;
  /// The first leg of an issue by SPNEGO. Signed like the above.
  virtual void BuildInitialSPNegoRequest(const TokenSpec& spec, const std::vector<unsigned char>& leg,
                                         Request& request) const = 0;
  /// A further leg of the negotiation that the service calls `contextId`. Never signed.
  virtual void BuildContinuedSPNegoRequest(const std::string& contextId,
                                           const std::vector<unsigned char>& leg, Request& request) const = 0;
  /// Issue by the configured certificate. Always signed. The spec's confirmation must be
  /// CONFIRMATION_DEFAULT.
  virtual void BuildCertificateTokenRequest(const TokenSpec& spec, Request& request) const = 0;
  /// Issue in exchange for `token`. Always signed.
  virtual void BuildExchangeTokenRequest(const SamlToken& token, const TokenSpec& spec,
                                         Request& request) const = 0;
  /// Asks whether the token and its subject are still valid. Never signed.
  virtual void BuildValidateSubjectRequest(const SamlToken& token, Request& request) const = 0;
  /// Renewal of `token`, which must be holder-of-key. Always signed.
  virtual void BuildRenewRequest(const SamlToken& token, long long lifetimeSec, Request& request) const = 0;

 protected:
  /// Not virtual: builders are held by shared pointers that were made with the concrete class.
  ~RequestBuilder() = default;
};

}  // namespace Quorlin

#endif  // QUORLIN_REQUESTBUILDER_H
