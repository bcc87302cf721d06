// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/TokenRequest.h>

#include <pelmar/Exception.h>
#include <quorlin/TokenProvider.h>

#include "quorlin-provider/Secret.h"

namespace Quorlin {

namespace {

using Token = boost::shared_ptr<const SamlToken>;

template <typename Function>
void RequireFunction(const Function& function, const char* name) {
  if (function.empty()) {
    throw Pelmar::InvalidArgumentException(std::string(name) + " must not be empty");
  }
}

}  // namespace

TokenRequest RequestByPassword(const std::string& userName, const PasswordCallback& password) {
  RequireFunction(password, "PasswordCallback");
  return [userName, password](const SecurityTokenService& service, const TokenSpec& spec) {
    const Secret secret(password());
    return service.AcquireToken(userName, secret.Get(), spec);
  };
}

TokenRequest RequestByCertificate() {
  return [](const SecurityTokenService& service, const TokenSpec& spec) {
    return service.AcquireTokenByCertificate(spec);
  };
}

TokenRequest RequestByGss(const NegotiationHandlerFactory& makeHandler, const NegotiationCheck& check) {
  RequireFunction(makeHandler, "NegotiationHandlerFactory");
  RequireFunction(check, "NegotiationCheck");
  return [makeHandler, check](const SecurityTokenService& service, const TokenSpec& spec) {
    const boost::shared_ptr<NegotiationHandler> handler = makeHandler();
    if (!handler) {
      throw Pelmar::InvalidArgumentException(
          "Invalid NegotiationHandlerFactory: the returned handler may not be NULL");
    }
    const Token token = service.AcquireTokenByGSS(spec, *handler);
    check(*handler);
    return token;
  };
}

TokenRequest RequestByExchange(const boost::shared_ptr<TokenProvider>& source) {
  if (!source) {
    throw Pelmar::InvalidArgumentException("the source of the tokens to exchange must not be NULL");
  }
  return [source](const SecurityTokenService& service, const TokenSpec& spec) {
    const Token token = source->GetToken();
    return service.AcquireTokenByToken(*token, spec);
  };
}

}  // namespace Quorlin
