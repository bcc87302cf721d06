// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The token service client: request builder, transport and response handler in a row.

#ifndef QUORLIN_SECURITYTOKENSERVICEIMPL_H
#define QUORLIN_SECURITYTOKENSERVICEIMPL_H

#include <pelmar/Reader.h>
#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/system/CancellationHandle.h>
#include <quorlin/SecurityTokenService.h>

#include <boost/shared_ptr.hpp>

#include <list>
#include <string>

#include "quorlin/RequestBuilder.h"
#include "quorlin/ResponseHandler.h"
#include "quorlin/Transport.h"

namespace Quorlin {

/// Every operation is framed by START and END log lines, opens a session of its own and keeps nothing.
class SecurityTokenServiceImpl final : public SecurityTokenService {
 public:
  SecurityTokenServiceImpl(
      const boost::shared_ptr<const RequestBuilder>& requestBuilder,
      const boost::shared_ptr<const Transport>& transport,
      const boost::shared_ptr<const ResponseHandler>& responseHandler,
      const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trustedStsCertificates);

  boost::shared_ptr<const SamlToken> AcquireToken(const std::string& userName, const std::string& password,
                                                  const TokenSpec& spec) const override;
  boost::shared_ptr<const SamlToken> AcquireTokenByGSS(const TokenSpec& spec,
                                                       NegotiationHandler& handler) const override;
  boost::shared_ptr<const SamlToken> AcquireTokenByCertificate(const TokenSpec& spec) const override;
  boost::shared_ptr<const SamlToken> AcquireTokenByToken(const SamlToken& token,
                                                         const TokenSpec& spec) const override;
  bool ValidateSubject(const SamlToken& token) const override;
  boost::shared_ptr<const SamlToken> RenewToken(const SamlToken& token, long long lifetimeSec) const override;

  void AcquireTokenAsync(const std::string& userName, const std::string& password, const TokenSpec& spec,
                         const TokenCompletion& done) const override;
  void AcquireTokenByGssAsync(const TokenSpec& spec, const boost::shared_ptr<NegotiationHandler>& handler,
                              const TokenCompletion& done) const override;
  void AcquireTokenByCertificateAsync(const TokenSpec& spec, const TokenCompletion& done) const override;
  void AcquireTokenByTokenAsync(const boost::shared_ptr<const SamlToken>& token, const TokenSpec& spec,
                                const TokenCompletion& done) const override;
  void ValidateSubjectAsync(const boost::shared_ptr<const SamlToken>& token,
                            const ValidationCompletion& done) const override;
  void RenewTokenAsync(const boost::shared_ptr<const SamlToken>& token, long long lifetimeSec,
                       const TokenCompletion& done) const override;

  /// As `CreateCancellableService` gives it.
  boost::shared_ptr<SecurityTokenService> WithCancellation(
      const Pelmar::Ref<Pelmar::System::CancellationHandle>& cancellation) const;

 private:
  // What a queued call runs on: it shares the three parts and outlives the caller's pointer.
  boost::shared_ptr<const SecurityTokenService> Copy() const;

  // The validated token in `xml`; null for an empty text.
  boost::shared_ptr<const SamlToken> ToSamlToken(const std::string& xml) const;

  void NegotiateLegs(TransportSession& session, const TokenSpec& spec, NegotiationHandler& handler,
                     SPNegoResponse& response) const;
  void StartSPNegotiation(TransportSession& session, const Leg& leg, const TokenSpec& spec,
                          SPNegoResponse& response) const;
  void ContinueSPNegotiation(TransportSession& session, const Leg& leg, const std::string& contextId,
                             SPNegoResponse& response) const;

  const boost::shared_ptr<const RequestBuilder> _requestBuilder;
  const boost::shared_ptr<const Transport> _transport;
  const boost::shared_ptr<const ResponseHandler> _responseHandler;
  const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> _trustedStsCertificates;
};

}  // namespace Quorlin

#endif  // QUORLIN_SECURITYTOKENSERVICEIMPL_H
