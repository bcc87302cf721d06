// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The request builder: checks the caller's input, chooses header, body and envelope, and writes them out.

#ifndef QUORLIN_REQUESTBUILDERIMPL_H
#define QUORLIN_REQUESTBUILDERIMPL_H

#include <quorlin/SecurityTokenServiceConfig.h>

#include <boost/optional.hpp>

#include <string>
#include <vector>

#include "quorlin/RequestBuilder.h"
#include "quorlin/xmlCommonBuilders.h"

namespace Quorlin {

class RequestBuilderImpl final : public RequestBuilder {
 public:
  /// With a signing identity, or without one for a client that only handles bearer tokens.
  explicit RequestBuilderImpl(const boost::optional<HolderOfKeyConfig>& holderOfKeyConfig);

  void BuildUserPassTokenRequest(const std::string& userName, const std::string& password,
                                 const TokenSpec& spec, Request& request) const override;
  void BuildInitialSPNegoRequest(const TokenSpec& spec, const std::vector<unsigned char>& leg,
                                 Request& request) const override;
  void BuildContinuedSPNegoRequest(const std::string& contextId, const std::vector<unsigned char>& leg,
                                   Request& request) const override;
  void BuildCertificateTokenRequest(const TokenSpec& spec, Request& request) const override;
  void BuildExchangeTokenRequest(const SamlToken& token, const TokenSpec& spec,
                                 Request& request) const override;
  void BuildValidateSubjectRequest(const SamlToken& token, Request& request) const override;
  void BuildRenewRequest(const SamlToken& token, long long lifetimeSec, Request& request) const override;

  /// Holder-of-key where a key is configured and the caller did not opt out of it.
  SamlToken::ConfirmationType GetEffectiveConfirmationType(TokenSpec::Confirmation confirmation) const;

  std::string BuildUnSignedRequest(const XMLBuilderPtr& header, const XMLBuilderPtr& body) const;
  /// Signed, the certificate in the header. Without a signing identity it aborts the process; one
  /// without key or certificate is an InvalidStateException.
  std::string BuildCertRefSignedRequest(const XMLBuilderPtr& header, const XMLBuilderPtr& body) const;
  /// Signed, referring to the token in the header. Without a signing identity it aborts the process; one
  /// without key is an InvalidStateException.
  std::string BuildSamlRefSignedRequest(const std::string& tokenId, const XMLBuilderPtr& header,
                                        const XMLBuilderPtr& body) const;
  /// Signed with the certificate in the header if the confirmation comes to holder-of-key, else unsigned.
  std::string BuildTokenRequest(TokenSpec::Confirmation confirmation, const XMLBuilderPtr& header,
                                const XMLBuilderPtr& body) const;

  /// Throws InvalidStateException, naming the operation, when there is no signing identity.
  void ValidateHokIsConfigured(const std::string& operation) const;

 private:
  boost::optional<HolderOfKeyConfig> _holderOfKeyConfig;
};

/// The text of the element that the builder yields.
std::string SerializeToXML(const XMLBuilderPtr& builder);

/// The confirmation that decides about signing: a request for a delegate goes out as for a bearer token.
TokenSpec::Confirmation ConfOverrideWithDelegate(TokenSpec spec);

/// Throws InvalidArgumentException unless the lifetime, in seconds, is positive.
void ValidateLifetime(long long lifetimeSec);

/// Throws InvalidArgumentException, naming the operation, unless the token is holder-of-key.
void ValidateTokenIsHok(const SamlToken& token, const std::string& operation);

}  // namespace Quorlin

#endif  // QUORLIN_REQUESTBUILDERIMPL_H
