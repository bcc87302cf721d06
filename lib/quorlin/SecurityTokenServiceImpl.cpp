// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/SecurityTokenServiceImpl.h"

#include <pelmar/Exception.h>
#include <pelmar/MessageFormatter.h>
#include <pelmar/SecretText.h>
#include <pelmar/Verify.h>
#include <pelmar/service/Logger.h>
#include <quorlin/Exceptions.h>
#include <quorlin/ServiceOptions.h>

#include <boost/bind/bind.hpp>
#include <boost/make_shared.hpp>

#include "quorlin/HttpsClient.h"
#include "quorlin/OperationFrame.h"
#include "quorlin/OptionsTransport.h"
#include "quorlin/Request.h"
#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/ResponseHandlerImpl.h"
#include "quorlin/asyncCalls.h"
#include "quorlin/descriptions.h"
#include "quorlin/logging.h"

namespace Quorlin {

namespace {

using Pelmar::BooleanFormatter;
using Pelmar::IntegerFormatter;
using Pelmar::StringFormatter;
using Pelmar::Service::LogInternal;

constexpr const char* kSource = "lib/quorlin/SecurityTokenServiceImpl";

// ---- Log lines. Descriptions walk whole tokens: they are built only for a line that will be written. ----

bool IsLogged() {
  return getLogger()->IsEnabled(kLogLevelInfo);
}

void LogRequestFor(const std::string& userName, const TokenSpec& spec) {
  if (IsLogged()) {
    LogInternal(getLogger(), kLogLevelInfo, "Requested token for subject `%1', spec `%2'",
                StringFormatter(userName), StringFormatter(WriteTokenSpec(spec)));
  }
}

void LogRequestWith(const TokenSpec& spec) {
  if (IsLogged()) {
    LogInternal(getLogger(), kLogLevelInfo, "Requested token with spec `%1'",
                StringFormatter(WriteTokenSpec(spec)));
  }
}

void LogExchange(const SamlToken& token, const TokenSpec& spec) {
  if (IsLogged()) {
    LogInternal(getLogger(), kLogLevelInfo, "Requested token for %1 with spec `%2'",
                StringFormatter(CreateRedactedDescription(token)), StringFormatter(WriteTokenSpec(spec)));
  }
}

void LogRenewal(const SamlToken& token, long long lifetimeSec) {
  if (IsLogged()) {
    LogInternal(getLogger(), kLogLevelInfo, "Renewing token %1 for %2 more seconds",
                StringFormatter(CreateRedactedDescription(token)), IntegerFormatter(lifetimeSec));
  }
}

// A line whose only argument is a token's description.
void LogToken(const char* format, const SamlToken& token) {
  if (IsLogged()) {
    LogInternal(getLogger(), kLogLevelInfo, format, StringFormatter(CreateRedactedDescription(token)));
  }
}

// ---- Steps ----

// An answer and the session it came over, which it must not outlive.
struct Answer {
  boost::shared_ptr<TransportSession> session;
  Pelmar::Ref<Pelmar::Reader> response;
};

Answer Send(const Transport& transport, const Request& request) {
  Answer answer;
  answer.session = transport.CreateSession();
  answer.session->SendRequest(request, answer.response);
  return answer;
}

boost::shared_ptr<Leg> RequireLeg(NegotiationHandler& handler, const Leg& serverLeg) {
  const boost::shared_ptr<Leg> leg = handler.Negotiate(serverLeg);
  if (!leg) {
    throw Pelmar::InvalidArgumentException("Invalid NegotiationHandler: the returned leg may not be NULL");
  }
  return leg;
}

// The service's last message lets the client complete its own context; nothing is sent any more.
void CompleteNegotiation(NegotiationHandler& handler, const Leg& serverLeg) {
  if (serverLeg.empty()) {
    return;
  }
  const boost::shared_ptr<Leg> leg = handler.Negotiate(serverLeg);
  // It is a missing or empty answer that is reported, whatever the text says: the line is known to operators
  // in just this case.
  if (!leg || leg->empty()) {
    LogInternal(getLogger(), kLogLevelWarning,
                "GSS contract error: non-empty user leg after negotiation is complete");
  }
}

}  // namespace

SecurityTokenServiceImpl::SecurityTokenServiceImpl(
    const boost::shared_ptr<const RequestBuilder>& requestBuilder,
    const boost::shared_ptr<const Transport>& transport,
    const boost::shared_ptr<const ResponseHandler>& responseHandler,
    const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trustedStsCertificates)
    : _requestBuilder(requestBuilder),
      _transport(transport),
      _responseHandler(responseHandler),
      _trustedStsCertificates(trustedStsCertificates) {}

// ---- Blocking operations ----

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireToken(const std::string& userName,
                                                                          const std::string& password,
                                                                          const TokenSpec& spec) const {
  return RunOperation("AcquireToken", [&] {
    LogRequestFor(userName, spec);

    Request request;
    _requestBuilder->BuildUserPassTokenRequest(userName, password, spec, request);
    LogInternal(getLogger(), kLogLevelInfo, "SecurityTokenServiceImpl::AcquireToken sending request");
    const Answer answer = Send(*_transport, request);
    LogInternal(getLogger(), kLogLevelInfo, "SecurityTokenServiceImpl::AcquireToken processing response");
    std::string token;
    _responseHandler->HandleAcquireTokenResponse(answer.response.Get(), token);
    return ToSamlToken(token);
  });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByGSS(
    const TokenSpec& spec, NegotiationHandler& handler) const {
  return RunOperation("AcquireTokenByGSS", [&] {
    LogRequestWith(spec);

    const boost::shared_ptr<TransportSession> session = _transport->CreateSession();
    SPNegoResponse response;
    NegotiateLegs(*session, spec, handler, response);
    CompleteNegotiation(handler, response.leg);
    return ToSamlToken(response.token);
  });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByCertificate(
    const TokenSpec& spec) const {
  return RunOperation("AcquireTokenByCertificate", [&] {
    LogRequestWith(spec);

    Request request;
    _requestBuilder->BuildCertificateTokenRequest(spec, request);
    const Answer answer = Send(*_transport, request);
    std::string token;
    _responseHandler->HandleAcquireTokenResponse(answer.response.Get(), token);
    return ToSamlToken(token);
  });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::AcquireTokenByToken(
    const SamlToken& token, const TokenSpec& spec) const {
  return RunOperation("AcquireTokenByToken", [&] {
    LogExchange(token, spec);

    Request request;
    _requestBuilder->BuildExchangeTokenRequest(token, spec, request);
    const Answer answer = Send(*_transport, request);
    std::string issued;
    _responseHandler->HandleAcquireTokenResponse(answer.response.Get(), issued);
    return ToSamlToken(issued);
  });
}

bool SecurityTokenServiceImpl::ValidateSubject(const SamlToken& token) const {
  return RunOperation("ValidateSubject", [&] {
    LogToken("Validating subject of token %1", token);

    Request request;
    _requestBuilder->BuildValidateSubjectRequest(token, request);
    const Answer answer = Send(*_transport, request);
    const bool isValid = _responseHandler->HandleValidateSubjectResponse(answer.response.Get());
    LogInternal(getLogger(), kLogLevelInfo, "Result: %1", BooleanFormatter(isValid));
    return isValid;
  });
}

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::RenewToken(const SamlToken& token,
                                                                        long long lifetimeSec) const {
  return RunOperation("RenewToken", [&] {
    LogRenewal(token, lifetimeSec);

    Request request;
    _requestBuilder->BuildRenewRequest(token, lifetimeSec, request);
    const Answer answer = Send(*_transport, request);
    std::string renewed;
    _responseHandler->HandleRenewTokenResponse(answer.response.Get(), renewed);
    return ToSamlToken(renewed);
  });
}

// ---- Asynchronous operations: the blocking ones, called through the interface on a copy of this object ----

void SecurityTokenServiceImpl::AcquireTokenAsync(const std::string& userName, const std::string& password,
                                                 const TokenSpec& spec, const TokenCompletion& done) const {
  SyncToAsyncCall(
      boost::bind(&SecurityTokenService::AcquireToken, Copy(), userName, Pelmar::SecretText(password), spec),
      done);
}

void SecurityTokenServiceImpl::AcquireTokenByGssAsync(const TokenSpec& spec,
                                                      const boost::shared_ptr<NegotiationHandler>& handler,
                                                      const TokenCompletion& done) const {
  SyncToAsyncCall(boost::bind(&SecurityTokenService::AcquireTokenByGSS, Copy(), spec,
                              PassByRefHelper<NegotiationHandler>(handler)),
                  done);
}

void SecurityTokenServiceImpl::AcquireTokenByCertificateAsync(const TokenSpec& spec,
                                                              const TokenCompletion& done) const {
  SyncToAsyncCall(boost::bind(&SecurityTokenService::AcquireTokenByCertificate, Copy(), spec), done);
}

void SecurityTokenServiceImpl::AcquireTokenByTokenAsync(const boost::shared_ptr<const SamlToken>& token,
                                                        const TokenSpec& spec,
                                                        const TokenCompletion& done) const {
  SyncToAsyncCall(boost::bind(&SecurityTokenService::AcquireTokenByToken, Copy(),
                              PassByRefHelper<const SamlToken>(token), spec),
                  done);
}

void SecurityTokenServiceImpl::ValidateSubjectAsync(const boost::shared_ptr<const SamlToken>& token,
                                                    const ValidationCompletion& done) const {
  SyncToAsyncCall(
      boost::bind(&SecurityTokenService::ValidateSubject, Copy(), PassByRefHelper<const SamlToken>(token)),
      done, boost::optional<bool>());
}

void SecurityTokenServiceImpl::RenewTokenAsync(const boost::shared_ptr<const SamlToken>& token,
                                               long long lifetimeSec, const TokenCompletion& done) const {
  SyncToAsyncCall(boost::bind(&SecurityTokenService::RenewToken, Copy(),
                              PassByRefHelper<const SamlToken>(token), lifetimeSec),
                  done);
}

boost::shared_ptr<const SecurityTokenService> SecurityTokenServiceImpl::Copy() const {
  return boost::make_shared<SecurityTokenServiceImpl>(*this);
}

// ---- The token ----

boost::shared_ptr<const SamlToken> SecurityTokenServiceImpl::ToSamlToken(const std::string& xml) const {
  boost::shared_ptr<const SamlToken> token;
  if (xml.empty()) {
    return token;
  }
  try {
    token = CreateSamlToken(xml, _trustedStsCertificates);
  } catch (const ParseException& error) {
    // To the caller a token that cannot be used is an unusable answer of the service.
    throw SsoException(error.what());
  }
  LogToken("Successfully acquired token: %1", *token);
  return token;
}

// ---- The negotiation ----

void SecurityTokenServiceImpl::NegotiateLegs(TransportSession& session, const TokenSpec& spec,
                                             NegotiationHandler& handler, SPNegoResponse& response) const {
  do {
    const boost::shared_ptr<Leg> leg = RequireLeg(handler, response.leg);
    if (response.contextId.empty()) {
      StartSPNegotiation(session, *leg, spec, response);
    } else {
      ContinueSPNegotiation(session, *leg, response.contextId, response);
    }
    if (response.contextId.empty()) {
      throw CommunicationException(
          "Error processing the response to SPNego token request: no Context ID was returned.");
    }
  } while (response.token.empty());
}

void SecurityTokenServiceImpl::StartSPNegotiation(TransportSession& session, const Leg& leg,
                                                  const TokenSpec& spec, SPNegoResponse& response) const {
  Pelmar::Verify(!leg.empty(), "!leg.empty()", kSource);
  Request request;
  _requestBuilder->BuildInitialSPNegoRequest(spec, leg, request);
  Pelmar::Ref<Pelmar::Reader> answer;
  session.SendRequest(request, answer);
  _responseHandler->HandleSPNegoResponse(answer.Get(), response);
}

void SecurityTokenServiceImpl::ContinueSPNegotiation(TransportSession& session, const Leg& leg,
                                                     const std::string& contextId,
                                                     SPNegoResponse& response) const {
  Pelmar::Verify(!leg.empty(), "!leg.empty()", kSource);
  Request request;
  _requestBuilder->BuildContinuedSPNegoRequest(contextId, leg, request);
  Pelmar::Ref<Pelmar::Reader> answer;
  session.SendRequest(request, answer);
  _responseHandler->HandleSPNegoResponse(answer.Get(), response);
}

// ---- The factories ----

boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(const SecurityTokenServiceConfig& config) {
  const boost::shared_ptr<const RequestBuilder> requestBuilder =
      boost::make_shared<RequestBuilderImpl>(config.holderOfKeyConfig);
  const boost::shared_ptr<const Transport> transport = boost::make_shared<HttpsClient>(
      config.stsUrl, config.sslContext.Get(), config.sslConnectionParam, kServiceTimeoutMicroseconds);
  const boost::shared_ptr<const ResponseHandler> responseHandler = boost::make_shared<ResponseHandlerImpl>();
  return boost::make_shared<SecurityTokenServiceImpl>(requestBuilder, transport, responseHandler,
                                                      config.trustedStsCertificates);
}

boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(const SecurityTokenServiceConfig& config,
                                                                   const ServiceOptions& options) {
  const boost::shared_ptr<const RequestBuilder> requestBuilder =
      boost::make_shared<RequestBuilderImpl>(config.holderOfKeyConfig);
  const boost::shared_ptr<const Transport> transport = boost::make_shared<OptionsTransport>(config, options);
  const boost::shared_ptr<const ResponseHandler> responseHandler = boost::make_shared<ResponseHandlerImpl>();
  return boost::make_shared<SecurityTokenServiceImpl>(requestBuilder, transport, responseHandler,
                                                      config.trustedStsCertificates);
}

boost::shared_ptr<SecurityTokenService> SecurityTokenServiceImpl::WithCancellation(
    const Pelmar::Ref<Pelmar::System::CancellationHandle>& cancellation) const {
  const auto* const transport = dynamic_cast<const OptionsTransport*>(_transport.get());
  if (transport == nullptr) {
    throw Pelmar::InvalidArgumentException("the service was made without options");
  }
  return boost::make_shared<SecurityTokenServiceImpl>(
      _requestBuilder, transport->WithCancellation(cancellation), _responseHandler, _trustedStsCertificates);
}

boost::shared_ptr<SecurityTokenService> CreateCancellableService(
    const SecurityTokenService& service,
    const Pelmar::Ref<Pelmar::System::CancellationHandle>& cancellation) {
  if (!cancellation) {
    throw Pelmar::InvalidArgumentException("there is no handle that could cancel");
  }
  const auto* const own = dynamic_cast<const SecurityTokenServiceImpl*>(&service);
  if (own == nullptr) {
    throw Pelmar::InvalidArgumentException("the service was made without options");
  }
  return own->WithCancellation(cancellation);
}

}  // namespace Quorlin
