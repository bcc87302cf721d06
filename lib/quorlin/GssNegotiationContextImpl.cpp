// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/GssNegotiationContextImpl.h"

#include <pelmar/Reader.h>

#include <boost/make_shared.hpp>

#include "quorlin/HttpsClient.h"
#include "quorlin/Request.h"
#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/ResponseHandlerImpl.h"

namespace Quorlin {
namespace InternalApi {

GssNegotiationContextImpl::GssNegotiationContextImpl(
    const TokenSpec& spec, const boost::shared_ptr<const RequestBuilder>& builder,
    const boost::shared_ptr<TransportSession>& session,
    const boost::shared_ptr<const ResponseHandler>& handler,
    const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trustedCertificates)
    : _spec(spec),
      _requestBuilder(builder),
      _session(session),
      _responseHandler(handler),
      _trustedCertificates(trustedCertificates) {}

NegotiationResult GssNegotiationContextImpl::NegotiateToken(const std::vector<unsigned char>& leg) {
  Request request;
  BuildRequest(leg, request);
  Pelmar::Ref<Pelmar::Reader> answer;
  _session->SendRequest(request, answer);
  SPNegoResponse response;
  _responseHandler->HandleSPNegoResponse(answer.Get(), response);
  // Only now: until here a failed round may be tried again as it was.
  _contextId = response.contextId;

  NegotiationResult result;
  result.first = boost::make_shared<std::vector<unsigned char>>(response.leg);
  if (!response.token.empty()) {
    result.second = CreateSamlToken(response.token, _trustedCertificates);
  }
  return result;
}

void GssNegotiationContextImpl::BuildRequest(const std::vector<unsigned char>& leg, Request& request) const {
  if (_contextId.empty()) {
    _requestBuilder->BuildInitialSPNegoRequest(_spec, leg, request);
    return;
  }
  _requestBuilder->BuildContinuedSPNegoRequest(_contextId, leg, request);
}

boost::shared_ptr<GssNegotiationContext> CreateGssNegotiationContext(const SecurityTokenServiceConfig& config,
                                                                     const TokenSpec& spec) {
  const HttpsClient transport(config.stsUrl, config.sslContext.Get(), config.sslConnectionParam,
                              kNegotiationTimeoutMicroseconds);
  const boost::shared_ptr<TransportSession> session = transport.CreateSession();
  const boost::shared_ptr<const RequestBuilder> builder =
      boost::make_shared<RequestBuilderImpl>(config.holderOfKeyConfig);
  const boost::shared_ptr<const ResponseHandler> handler = boost::make_shared<ResponseHandlerImpl>();
  return boost::make_shared<GssNegotiationContextImpl>(spec, builder, session, handler,
                                                       config.trustedStsCertificates);
}

}  // namespace InternalApi
}  // namespace Quorlin
