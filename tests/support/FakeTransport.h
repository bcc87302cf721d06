// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A transport without a network.

#ifndef QUORLIN_TESTS_SUPPORT_FAKETRANSPORT_H
#define QUORLIN_TESTS_SUPPORT_FAKETRANSPORT_H

#include <pelmar/Exception.h>

#include <boost/shared_ptr.hpp>

#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "quorlin/Transport.h"

namespace TestSupport {

/// Gives the answers it was told to, in order, whatever is sent, and records what was sent. May be used by
/// several threads.
class FakeTransport final : public Quorlin::Transport {
 public:
  FakeTransport();

  /// The next request that has no answer yet is answered with `body`.
  void Answer(const std::string& body);
  /// The next request that has no answer yet fails with a copy of `error`.
  void Fail(const Pelmar::Exception& error);
  /// What happens on the sender's thread before each answer.
  void SetBeforeAnswer(const std::function<void()>& action);

  boost::shared_ptr<Quorlin::TransportSession> CreateSession() const override;

  /// Everything sent so far, each as "<number of the session, from 1>|<SOAP action>|<body>".
  std::vector<std::string> GetSent() const;
  int GetCreatedSessions() const;
  int GetLivingSessions() const;

  struct State;  // Shared with the sessions.

 private:
  const std::shared_ptr<State> _state;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_FAKETRANSPORT_H
