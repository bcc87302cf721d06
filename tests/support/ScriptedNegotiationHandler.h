// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The client's side of a negotiation, by script.

#ifndef QUORLIN_TESTS_SUPPORT_SCRIPTEDNEGOTIATIONHANDLER_H
#define QUORLIN_TESTS_SUPPORT_SCRIPTEDNEGOTIATIONHANDLER_H

#include <quorlin/SecurityTokenService.h>

#include <deque>
#include <string>
#include <thread>
#include <vector>

namespace TestSupport {

/// Answers with the planned legs in order and records what the service sent. For one thread at a time.
class ScriptedNegotiationHandler final : public Quorlin::NegotiationHandler {
 public:
  void Plan(const std::string& leg);
  void PlanNull();

  boost::shared_ptr<Quorlin::Leg> Negotiate(const Quorlin::Leg& serverLeg) override;

  /// The legs of the service so far, as text; the first is that of the first call.
  const std::vector<std::string>& GetServerLegs() const { return _serverLegs; }
  /// The threads that called.
  const std::vector<std::thread::id>& GetThreads() const { return _threads; }

 private:
  std::deque<boost::shared_ptr<Quorlin::Leg>> _legs;
  std::vector<std::string> _serverLegs;
  std::vector<std::thread::id> _threads;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_SCRIPTEDNEGOTIATIONHANDLER_H
