// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The client's side of a negotiation by Kerberos: a NegotiationHandler over the system's GSS-API.
//
// It lives in a library of its own, libquorlin-gssapi, so that libquorlin needs no Kerberos.

#ifndef QUORLIN_GSSAPI_GSSAPINEGOTIATION_H
#define QUORLIN_GSSAPI_GSSAPINEGOTIATION_H

#include <quorlin/Export.h>
#include <quorlin/SecurityTokenService.h>

#include <boost/shared_ptr.hpp>

#include <string>

namespace Quorlin {

/// With whom to negotiate, and as whom.
struct GssapiOptions {
  /// The service as SERVICE@HOST (RFC 2743, section 4.1): "HTTP@sts.example.com". Required.
  std::string targetService;
  /// The Kerberos principal to act as: "alice@EXAMPLE.COM". Empty: the one of the credential cache.
  std::string principal;
  /// The credential cache to take the ticket from: "FILE:/tmp/cache". Empty: the one that Kerberos takes by
  /// default (for the environment variable KRB5CCNAME, or in a collection by principal and target).
  std::string credentialCache;
};

/// Negotiates Kerberos V5 (RFC 4121), and nothing else, by SPNEGO (RFC 4178), with mutual authentication: the
/// service has to prove that it holds the key of `targetService`. Credentials are never delegated.
///
/// One object serves one negotiation, on one thread at a time. The ticket is looked for when the first leg is
/// asked for, which may ask the realm's key distribution center and wait for it.
///
/// `Negotiate` throws
/// - InvalidCredentialsException: no ticket, an expired one, or one of another principal;
/// - SsoException: the service is not known to Kerberos, does not prove its identity, or sent something
///   unusable; the realm's key distribution center cannot be reached or refuses;
/// - Pelmar::InvalidStateException: a negotiation that has failed cannot go on.
/// The message holds the texts of both of GSS-API's status codes.
///
/// When the negotiation is complete and there is nothing left to say, `Negotiate` returns null:
/// AcquireTokenByGSS logs that after the service's last leg (a line at level 8) and goes on, and ends a
/// negotiation that the service will not let end with Pelmar::InvalidArgumentException. An empty leg would
/// let such a service stop the process.
class QUORLIN_API GssapiNegotiationHandler : public NegotiationHandler {
 public:
  /// Whether the negotiation is complete: both sides have proved who they are.
  virtual bool IsComplete() const = 0;
  /// Throws SsoException unless the negotiation is complete. To be called when AcquireTokenByGSS has
  /// returned: a service that issues the token without a last leg has not proved its identity, and nobody
  /// noticed yet.
  virtual void RequireComplete() const = 0;

 protected:
  /// Not virtual: the shared pointer that the factory makes deletes the concrete class.
  ~GssapiNegotiationHandler() {}
};

/// A handler for one negotiation, for AcquireTokenByGSS, AcquireTokenByGssAsync or, leg by leg,
/// InternalApi::GssNegotiationContext. Throws Pelmar::InvalidArgumentException when `options` name no
/// service, or contain a NUL character.
QUORLIN_API boost::shared_ptr<GssapiNegotiationHandler> CreateGssapiNegotiationHandler(
    const GssapiOptions& options);

}  // namespace Quorlin

#endif  // QUORLIN_GSSAPI_GSSAPINEGOTIATION_H
