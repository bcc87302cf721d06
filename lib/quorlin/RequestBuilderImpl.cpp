// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/RequestBuilderImpl.h"

#include <pelmar/Exception.h>
#include <pelmar/Verify.h>
#include <pelmar/Writer.h>

#include <boost/make_shared.hpp>

#include "quorlin/Namespaces.h"
#include "quorlin/xmlRequestBuilders.h"
#include "quorlin/xmlSoapBuilders.h"

namespace Quorlin {

using Pelmar::InvalidArgumentException;
using Pelmar::InvalidStateException;
using Pelmar::Ref;

const char* const Request::VALIDATE = kWstValidateAction;
const char* const Request::RENEW = kWstRenewAction;
const char* const Request::CHALLANGE = kWstChallengeAction;
const char* const Request::ISSUE = kWstIssueAction;

namespace {

constexpr const char* kSource = "lib/quorlin/RequestBuilderImpl";

// As they stand in messages.
constexpr const char* kByToken = "acquire token by token";
constexpr const char* kByCertificate = "acquire token by certificate";

// How long the service may take to see a request. It bounds the time in which a recorded request can be
// replayed, and so must allow for clocks that disagree a little but not for more.
constexpr int kMessageValidityMinutes = 10;

// A half-filled configuration is the caller's mistake, so it is told, not fatal.
void RequireKey(const HolderOfKeyConfig& config) {
  if (!config.privateKey) {
    throw InvalidStateException("HolderOfKeyConfig has no private key");
  }
}

void RequireCertificate(const HolderOfKeyConfig& config) {
  if (!config.certificate) {
    throw InvalidStateException("HolderOfKeyConfig has no certificate");
  }
}

XMLBuilderPtr SecurityHeader() {
  return WsSecurityHeaderBuilder(kMessageValidityMinutes);
}

XMLBuilderPtr SecurityHeaderWith(const XMLBuilderPtr& credential) {
  return CompositeBuilder(SecurityHeader(), {credential});
}

}  // namespace

RequestBuilderImpl::RequestBuilderImpl(const boost::optional<HolderOfKeyConfig>& holderOfKeyConfig)
    : _holderOfKeyConfig(holderOfKeyConfig) {}

// --- Operations ---

void RequestBuilderImpl::BuildUserPassTokenRequest(const std::string& userName, const std::string& password,
                                                   const TokenSpec& spec, Request& request) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  const XMLBuilderPtr header = SecurityHeaderWith(WsseUsernameTokenBuilder(userName, password));
  // The body asks for what the spec's confirmation comes to, whoever the token is for; only signing minds the
  // delegate.
  const XMLBuilderPtr body =
      AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
  request.soapAction = Request::ISSUE;
  request.body = BuildTokenRequest(ConfOverrideWithDelegate(spec), header, body);
}

void RequestBuilderImpl::BuildInitialSPNegoRequest(const TokenSpec& spec,
                                                   const std::vector<unsigned char>& leg,
                                                   Request& request) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  const XMLBuilderPtr body = boost::make_shared<XMLBodyBuilderInitialSPNego>(
      GetEffectiveConfirmationType(spec.confirmation), spec, leg);
  request.soapAction = Request::ISSUE;
  request.body = BuildTokenRequest(ConfOverrideWithDelegate(spec), SecurityHeader(), body);
}

void RequestBuilderImpl::BuildContinuedSPNegoRequest(const std::string& contextId,
                                                     const std::vector<unsigned char>& leg,
                                                     Request& request) const {
  const XMLBuilderPtr body = boost::make_shared<XMLBodyBuilderContinuedSPNego>(contextId, leg);
  request.soapAction = Request::CHALLANGE;
  request.body = BuildUnSignedRequest(SecurityHeader(), body);
}

void RequestBuilderImpl::BuildCertificateTokenRequest(const TokenSpec& spec, Request& request) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  ValidateHokIsConfigured(kByCertificate);
  if (spec.confirmation != TokenSpec::CONFIRMATION_DEFAULT) {
    throw InvalidArgumentException(std::string("TokenSpec::confirmation must be CONFIRMATION_DEFAULT for ") +
                                   kByCertificate);
  }
  const XMLBuilderPtr body =
      AcquireSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
  request.soapAction = Request::ISSUE;
  request.body = BuildCertRefSignedRequest(SecurityHeader(), body);
}

void RequestBuilderImpl::BuildExchangeTokenRequest(const SamlToken& token, const TokenSpec& spec,
                                                   Request& request) const {
  ValidateLifetime(spec.tokenLifetimeSec);
  ValidateHokIsConfigured(kByToken);
  const XMLBuilderPtr header = SecurityHeaderWith(InsertSamlTokenBuilder(token));
  const XMLBuilderPtr body =
      ExchangeSecurityTokenBuilder(GetEffectiveConfirmationType(spec.confirmation), spec);
  request.soapAction = Request::ISSUE;
  request.body = BuildSamlRefSignedRequest(token.GetId(), header, body);
}

void RequestBuilderImpl::BuildValidateSubjectRequest(const SamlToken& token, Request& request) const {
  const XMLBuilderPtr body = ValidateSecurityTokenBuilder(token);
  request.soapAction = Request::VALIDATE;
  request.body = BuildUnSignedRequest(SecurityHeader(), body);
}

void RequestBuilderImpl::BuildRenewRequest(const SamlToken& token, long long lifetimeSec,
                                           Request& request) const {
  static const std::string kRenew = "renew token";
  ValidateLifetime(lifetimeSec);
  ValidateHokIsConfigured(kRenew);
  ValidateTokenIsHok(token, kRenew);
  Pelmar::Verify(token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY,
                 "token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY", kSource);
  const XMLBuilderPtr body = RenewSecurityTokenBuilder(token, lifetimeSec);
  request.soapAction = Request::RENEW;
  request.body = BuildCertRefSignedRequest(SecurityHeader(), body);
}

// --- Envelopes ---

SamlToken::ConfirmationType RequestBuilderImpl::GetEffectiveConfirmationType(
    TokenSpec::Confirmation confirmation) const {
  const bool isHolderOfKey = _holderOfKeyConfig && confirmation == TokenSpec::CONFIRMATION_DEFAULT;
  return isHolderOfKey ? SamlToken::CONFIRM_HOLDER_OF_KEY : SamlToken::CONFIRM_BEARER;
}

std::string RequestBuilderImpl::BuildUnSignedRequest(const XMLBuilderPtr& header,
                                                     const XMLBuilderPtr& body) const {
  return SerializeToXML(SoapBuilder(header, body));
}

std::string RequestBuilderImpl::BuildCertRefSignedRequest(const XMLBuilderPtr& header,
                                                          const XMLBuilderPtr& body) const {
  Pelmar::Verify(_holderOfKeyConfig.is_initialized(), "_holderOfKeyConfig.is_initialized()", kSource);
  RequireKey(*_holderOfKeyConfig);
  RequireCertificate(*_holderOfKeyConfig);
  return SerializeToXML(CertRefSignedSoapBuilder(header, body, _holderOfKeyConfig->privateKey.Get(),
                                                 _holderOfKeyConfig->certificate.Get()));
}

std::string RequestBuilderImpl::BuildSamlRefSignedRequest(const std::string& tokenId,
                                                          const XMLBuilderPtr& header,
                                                          const XMLBuilderPtr& body) const {
  Pelmar::Verify(_holderOfKeyConfig.is_initialized(), "_holderOfKeyConfig.is_initialized()", kSource);
  RequireKey(*_holderOfKeyConfig);
  return SerializeToXML(
      SamlRefSignedSoapBuilder(header, body, _holderOfKeyConfig->privateKey.Get(), tokenId));
}

std::string RequestBuilderImpl::BuildTokenRequest(TokenSpec::Confirmation confirmation,
                                                  const XMLBuilderPtr& header,
                                                  const XMLBuilderPtr& body) const {
  if (GetEffectiveConfirmationType(confirmation) == SamlToken::CONFIRM_HOLDER_OF_KEY) {
    return BuildCertRefSignedRequest(header, body);
  }
  return BuildUnSignedRequest(header, body);
}

// --- Checks ---

void RequestBuilderImpl::ValidateHokIsConfigured(const std::string& operation) const {
  if (!_holderOfKeyConfig) {
    throw InvalidStateException("No HolderOfKeyConfig provided. Unable to " + operation);
  }
}

void ValidateLifetime(long long lifetimeSec) {
  if (lifetimeSec <= 0) {
    throw InvalidArgumentException("Token lifetime must be positive");
  }
}

void ValidateTokenIsHok(const SamlToken& token, const std::string& operation) {
  if (token.GetConfirmationMethod() != SamlToken::CONFIRM_HOLDER_OF_KEY) {
    throw InvalidArgumentException("Unable to " + operation + ": the provided token must be Holder Of Key");
  }
}

TokenSpec::Confirmation ConfOverrideWithDelegate(TokenSpec spec) {
  return spec.delegateTo ? TokenSpec::CONFIRMATION_BEARER : spec.confirmation;
}

std::string SerializeToXML(const XMLBuilderPtr& builder) {
  Ref<Pelmar::Xml::ElementNode> element;
  builder->build(element);
  const Ref<Pelmar::StringWriter> writer = Pelmar::CreateSecretStringWriter();
  element->WriteXml(writer.Get());
  return writer->GetText();
}

}  // namespace Quorlin
