// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A GSS/SPNEGO negotiation with the token service in which the caller keeps the initiative.

#ifndef QUORLIN_GSSNEGOTIATIONCONTEXT_H
#define QUORLIN_GSSNEGOTIATIONCONTEXT_H

#include <quorlin/Export.h>
#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenServiceConfig.h>
#include <quorlin/TokenSpec.h>

#include <boost/shared_ptr.hpp>

#include <utility>
#include <vector>

namespace Quorlin {
namespace InternalApi {

/// What one round brought: the service's message (never null, possibly empty) and the token (null until it is
/// issued).
typedef std::pair<boost::shared_ptr<std::vector<unsigned char>>, boost::shared_ptr<const SamlToken>>
    NegotiationResult;

/// Carries the messages of the caller's own GSS mechanism to the service and back. It remembers the service's
/// context between rounds, so it belongs to one negotiation and is used by one thread at a time.
class QUORLIN_API GssNegotiationContext {
 public:
  /// Sends `leg`, the mechanism's next message, and returns the answer. Waits 40 seconds at most. The
  /// exceptions are those of SecurityTokenService, except that a token that does not parse is a
  /// ParseException. After a failure the same leg may be tried again.
  virtual NegotiationResult NegotiateToken(const std::vector<unsigned char>& leg) = 0;

 protected:
  /// Not virtual: the shared pointer that the factory makes deletes the concrete class.
  ~GssNegotiationContext() {}
};

/// A new negotiation for a token as `spec` asks. Throws like CreateSecurityTokenService.
QUORLIN_API boost::shared_ptr<GssNegotiationContext> CreateGssNegotiationContext(
    const SecurityTokenServiceConfig& config, const TokenSpec& spec);

}  // namespace InternalApi
}  // namespace Quorlin

#endif  // QUORLIN_GSSNEGOTIATIONCONTEXT_H
