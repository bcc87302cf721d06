// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The client of a WS-Trust 1.3 token service.

#ifndef QUORLIN_SECURITYTOKENSERVICE_H
#define QUORLIN_SECURITYTOKENSERVICE_H

#include <pelmar/Exception.h>
#include <quorlin/Exceptions.h>
#include <quorlin/Export.h>
#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenServiceConfig.h>
#include <quorlin/TokenSpec.h>

#include <boost/function.hpp>
#include <boost/optional.hpp>
#include <boost/shared_ptr.hpp>

#include <string>
#include <vector>

namespace Quorlin {

/// One SPNEGO message (RFC 4178) as exchanged with the service.
typedef std::vector<unsigned char> Leg;

/// What one SPNEGO round trip brought.
struct SPNegoResponse {
  std::string contextId;  ///< The service's negotiation context; empty until it has sent one.
  Leg leg;                ///< The service's message of this round; may be empty.
  std::string token;      ///< The issued token's XML; empty while the negotiation goes on.
};

/// The client's side of a GSS/SPNEGO negotiation, supplied by the caller.
class QUORLIN_API NegotiationHandler {
 public:
  /// Answers the service's message with the client's next one. The first call gets an empty message. While
  /// the negotiation goes on null is an error and an empty message ends the process; after the service's last
  /// message both say that nothing is left to send. Called on the operation's thread, round after round.
  virtual boost::shared_ptr<Leg> Negotiate(const Leg& serverLeg) = 0;

 protected:
  /// Not virtual: handlers are held by shared pointers that were made with the concrete class.
  ~NegotiationHandler() {}
};

/// Told how an asynchronous operation that yields a token ended: with the token and a null exception, or with
/// an empty pointer and the exception, which is valid during the call only (keep a copy by `Clone`, raise it
/// by `Throw`).
typedef boost::function<void(const boost::shared_ptr<const SamlToken>&, const Pelmar::Exception*)>
    TokenCompletion;

/// Told how an asynchronous validation ended: with the verdict and a null exception, or with an empty
/// optional and the exception.
typedef boost::function<void(const boost::optional<bool>&, const Pelmar::Exception*)> ValidationCompletion;

/// A token service.
///
/// Threads: immutable; any number of threads may call one object at once. Each call opens its own HTTP
/// session. Blocking operations run on the caller's thread. Asynchronous ones copy what they need, return at
/// once and complete on a platform thread, perhaps before they have returned; the caller may release the
/// service and the arguments right away.
///
/// Errors of every operation that returns a token:
/// - Pelmar::InvalidArgumentException, Pelmar::InvalidStateException: a bad argument, found before
///   anything is sent;
/// - CommunicationException: the service cannot be reached, does not answer within four minutes, or answers
///   with an error status;
/// - InvalidCredentialsException: the service rejected the credentials;
/// - InvalidSignatureException: the returned token's signature does not verify against the trusted
///   certificates;
/// - SsoException: any other fault, an unusable answer, or a returned token that does not parse or is not
///   valid now;
/// - other Pelmar::Exceptions, unchanged, where CreateSamlToken or the platform raise them.
class QUORLIN_API SecurityTokenService {
 public:
  /// A token for a user who proves to be one by a password. The password travels in the message: use https:.
  virtual boost::shared_ptr<const SamlToken> AcquireToken(const std::string& userName,
                                                          const std::string& password,
                                                          const TokenSpec& spec) const = 0;
  /// A token for the principal as whom `handler` negotiates.
  virtual boost::shared_ptr<const SamlToken> AcquireTokenByGSS(const TokenSpec& spec,
                                                               NegotiationHandler& handler) const = 0;
  /// A holder-of-key token for the principal that the configured certificate belongs to. Needs a
  /// HolderOfKeyConfig.
  virtual boost::shared_ptr<const SamlToken> AcquireTokenByCertificate(const TokenSpec& spec) const = 0;
  /// A new token in exchange for `token`, on which it acts. Needs a HolderOfKeyConfig.
  virtual boost::shared_ptr<const SamlToken> AcquireTokenByToken(const SamlToken& token,
                                                                 const TokenSpec& spec) const = 0;
  /// Whether the service still knows the token's subject as a valid principal.
  virtual bool ValidateSubject(const SamlToken& token) const = 0;
  /// The holder-of-key token `token` with a new lifetime of `lifetimeSec` seconds from now. Needs a
  /// HolderOfKeyConfig.
  virtual boost::shared_ptr<const SamlToken> RenewToken(const SamlToken& token,
                                                        long long lifetimeSec) const = 0;

  virtual void AcquireTokenAsync(const std::string& userName, const std::string& password,
                                 const TokenSpec& spec, const TokenCompletion& done) const = 0;
  virtual void AcquireTokenByGssAsync(const TokenSpec& spec,
                                      const boost::shared_ptr<NegotiationHandler>& handler,
                                      const TokenCompletion& done) const = 0;
  virtual void AcquireTokenByCertificateAsync(const TokenSpec& spec, const TokenCompletion& done) const = 0;
  virtual void AcquireTokenByTokenAsync(const boost::shared_ptr<const SamlToken>& token,
                                        const TokenSpec& spec, const TokenCompletion& done) const = 0;
  virtual void ValidateSubjectAsync(const boost::shared_ptr<const SamlToken>& token,
                                    const ValidationCompletion& done) const = 0;
  virtual void RenewTokenAsync(const boost::shared_ptr<const SamlToken>& token, long long lifetimeSec,
                               const TokenCompletion& done) const = 0;

 protected:
  /// Not virtual: the shared pointer that the factory makes deletes the concrete class.
  ~SecurityTokenService() {}
};

/// A client of the service that `config` describes. Nothing is sent yet. Throws
/// Pelmar::InvalidArgumentException for an https: URL without an SSL context or a bad connection parameter,
/// and Pelmar::Http::HttpException for a malformed URL.
QUORLIN_API boost::shared_ptr<SecurityTokenService> CreateSecurityTokenService(
    const SecurityTokenServiceConfig& config);

}  // namespace Quorlin

#endif  // QUORLIN_SECURITYTOKENSERVICE_H
