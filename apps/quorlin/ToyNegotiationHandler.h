// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The toy mechanism as the library takes it.

#ifndef QUORLIN_CLI_TOYNEGOTIATIONHANDLER_H
#define QUORLIN_CLI_TOYNEGOTIATIONHANDLER_H

#include "devsts/ToyNegotiation.h"

#include <quorlin/SecurityTokenService.h>

#include <boost/make_shared.hpp>

#include <string>

namespace Cli {

/// The client's side of one toy negotiation. Also answers the service's proof, as the library wants it.
class ToyNegotiationHandler final : public Quorlin::NegotiationHandler {
 public:
  ToyNegotiationHandler(const DevSts::ToyOptions& options, const std::string& user,
                        const std::string& password, const DevSts::Clock& clock = DevSts::MakeSystemClock(0))
      : _client(options, user, password, clock) {}

  boost::shared_ptr<Quorlin::Leg> Negotiate(const Quorlin::Leg& serverLeg) override {
    return boost::make_shared<Quorlin::Leg>(_client.Answer(serverLeg));
  }

 private:
  DevSts::ToyClient _client;
};

}  // namespace Cli

#endif  // QUORLIN_CLI_TOYNEGOTIATIONHANDLER_H
