// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The ways in which a token provider asks its token service for a new token.

#ifndef QUORLIN_TOKENREQUEST_H
#define QUORLIN_TOKENREQUEST_H

#include <quorlin/Export.h>
#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenService.h>
#include <quorlin/TokenSpec.h>

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include <string>

namespace Quorlin {

class TokenProvider;

/// Asks `service` for a token as `spec` says, and gives it; throws when it cannot. A provider calls it from
/// one thread at a time, not always the same, and for the last time perhaps when the provider has just been
/// destroyed: what it refers to must live as long as it does. A host may write its own.
typedef boost::function<boost::shared_ptr<const SamlToken>(const SecurityTokenService& service,
                                                           const TokenSpec& spec)>
    TokenRequest;

/// Gives the password. The text is overwritten once it has been used; copies that the callback keeps are its
/// own affair. What it throws, the request throws.
typedef boost::function<std::string()> PasswordCallback;

/// Gives a new handler for each negotiation. Never null.
typedef boost::function<boost::shared_ptr<NegotiationHandler>()> NegotiationHandlerFactory;

/// Throws unless the negotiation that `handler` was in is complete on the client's side too: whether the
/// service has proved who it is. Without it a token would be taken from a service that sent no last leg.
typedef boost::function<void(NegotiationHandler& handler)> NegotiationCheck;

/// By user name and password; `password` is called for each request. Throws
/// Pelmar::InvalidArgumentException for an empty function.
QUORLIN_API TokenRequest RequestByPassword(const std::string& userName, const PasswordCallback& password);

/// By the service's HolderOfKeyConfig. Without one each request throws Pelmar::InvalidStateException.
QUORLIN_API TokenRequest RequestByCertificate();

/// By GSS negotiation, with a new handler each time. `check` is called with the handler when the service has
/// issued a token; what it throws, the request throws, and the token is dropped. With
/// GssapiNegotiationHandler it calls RequireComplete. Throws Pelmar::InvalidArgumentException for an empty
/// function; so does each request for which `makeHandler` gives null.
QUORLIN_API TokenRequest RequestByGss(const NegotiationHandlerFactory& makeHandler,
                                      const NegotiationCheck& check);

/// In exchange for the token that `source` provides at that moment. Needs a HolderOfKeyConfig. Services do
/// not let the new token outlive the other, so `source` had better provide tokens that hold for much longer
/// than the new ones need to. Throws Pelmar::InvalidArgumentException when `source` is null.
QUORLIN_API TokenRequest RequestByExchange(const boost::shared_ptr<TokenProvider>& source);

}  // namespace Quorlin

#endif  // QUORLIN_TOKENREQUEST_H
