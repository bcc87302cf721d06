// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/ScriptedNegotiationHandler.h"

#include <boost/make_shared.hpp>

#include <stdexcept>

namespace TestSupport {

void ScriptedNegotiationHandler::Plan(const std::string& leg) {
  _legs.push_back(boost::make_shared<Quorlin::Leg>(leg.begin(), leg.end()));
}

void ScriptedNegotiationHandler::PlanNull() {
  _legs.push_back(nullptr);
}

boost::shared_ptr<Quorlin::Leg> ScriptedNegotiationHandler::Negotiate(const Quorlin::Leg& serverLeg) {
  _serverLegs.emplace_back(serverLeg.begin(), serverLeg.end());
  _threads.push_back(std::this_thread::get_id());
  if (_legs.empty()) {
    throw std::logic_error("the negotiation handler was asked for a leg that is not planned");
  }
  const boost::shared_ptr<Quorlin::Leg> leg = _legs.front();
  _legs.pop_front();
  return leg;
}

}  // namespace TestSupport
