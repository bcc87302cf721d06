// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Carries the legs of a negotiation that the caller drives.

#ifndef QUORLIN_GSSNEGOTIATIONCONTEXTIMPL_H
#define QUORLIN_GSSNEGOTIATIONCONTEXTIMPL_H

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <quorlin/GssNegotiationContext.h>

#include <boost/shared_ptr.hpp>

#include <list>
#include <string>
#include <vector>

#include "quorlin/RequestBuilder.h"
#include "quorlin/ResponseHandler.h"
#include "quorlin/Transport.h"

namespace Quorlin {
namespace InternalApi {

/// One negotiation over one session, so cookies persist across legs. The context id of the latest answer is
/// all that changes.
class GssNegotiationContextImpl final : public virtual GssNegotiationContext {
 public:
  GssNegotiationContextImpl(
      const TokenSpec& spec, const boost::shared_ptr<const RequestBuilder>& builder,
      const boost::shared_ptr<TransportSession>& session,
      const boost::shared_ptr<const ResponseHandler>& handler,
      const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trustedCertificates);

  NegotiationResult NegotiateToken(const std::vector<unsigned char>& leg) override;

 private:
  void BuildRequest(const std::vector<unsigned char>& leg, Request& request) const;

  const TokenSpec _spec;
  std::string _contextId;  // Empty before the first answer.
  const boost::shared_ptr<const RequestBuilder> _requestBuilder;
  const boost::shared_ptr<TransportSession> _session;
  const boost::shared_ptr<const ResponseHandler> _responseHandler;
  const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> _trustedCertificates;
};

}  // namespace InternalApi
}  // namespace Quorlin

#endif  // QUORLIN_GSSNEGOTIATIONCONTEXTIMPL_H
