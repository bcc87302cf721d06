// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a provider does: who waits, who asks, when to ask again.

#ifndef QUORLIN_PROVIDER_TOKENKEEPER_H
#define QUORLIN_PROVIDER_TOKENKEEPER_H

#include <quorlin/SecurityTokenService.h>
#include <quorlin/TokenProviderOptions.h>
#include <quorlin/TokenRequest.h>

#include <boost/shared_ptr.hpp>

#include <condition_variable>
#include <list>
#include <memory>
#include <mutex>
#include <random>

#include "quorlin-provider/Failure.h"
#include "quorlin-provider/TokenCache.h"

namespace Quorlin {

/// The state of one provider. It lives as long as the provider, a call of it or a request of its, whichever
/// is the last; what it scheduled does not keep it alive. The interface is told at TokenProvider.
///
/// A *flight* is one try to get a new token: a request, or two when a renewal is refused. There is at most
/// one, on the thread that found the need for it; nothing is claimed for a thread that has yet to start, so
/// that callers on all the threads of a pool cannot wait for work that waits for one of these threads.
class TokenKeeper final : public std::enable_shared_from_this<TokenKeeper> {
 public:
  typedef boost::shared_ptr<const SamlToken> Token;

  /// The options are complete: they have a clock and a scheduler.
  TokenKeeper(const boost::shared_ptr<const SecurityTokenService>& service, const TokenRequest& request,
              const TokenProviderOptions& options);

  Token Get();
  void GetAsync(const TokenCompletion& done);
  void Invalidate();
  void InvalidateToken(const SamlToken& rejected);
  /// The provider is going away: everybody who waits is told so.
  void Close();

 private:
  typedef std::unique_lock<std::mutex> Lock;
  typedef std::list<TokenCompletion> Completions;

  /// A token, a failure, or neither: there is no answer yet.
  struct Answer {
    Token token;
    Failure failure;

    bool IsGiven() const { return token || failure; }
  };

  struct Flight {
    bool isAbandoned = false;  ///< Begun before Invalidate(): its result is nobody's.
    bool isDone = false;
    Answer result;
    bool isRenewal = false;
  };

  // Each is called with the lock held; those that take the lock give it up meanwhile.
  Answer FindAnswer();
  Answer AnswerAfter(const Flight& flight) const;
  std::shared_ptr<Flight> Fly(Lock& lock);
  void Await(Lock& lock, const Flight& flight);
  void HandOut(Lock& lock, const Flight& flight);
  void ServeWaiting(Lock& lock);
  void Keep(const Token& token);
  long long KeepFailure(const Failure& failure);
  bool IsValid() const;
  void Forget();
  void RequestRound();
  void Arm(long long delayMicroseconds);
  void Disarm();
  double DrawChance();

  // Each is called without the lock.
  void Ask(const Token& previous, Flight& flight) const noexcept;
  bool TryToRenew(const Token& previous, Flight& flight) const;
  Token RequireFresh(const Token& token) const;
  void Report(const Flight& flight, long long retryIn) const noexcept;
  void Complete(const Completions& completions, const Answer& answer) const noexcept;
  void RunTimer(unsigned long long number);

  const boost::shared_ptr<const SecurityTokenService> _service;
  const TokenRequest _request;
  const TokenProviderOptions _options;

  TokenCache _cache;  // Holds `_token` while it is fresh.
  std::mutex _mutex;
  std::condition_variable _changed;
  // All below are guarded by the mutex.
  bool _isClosed = false;
  Token _token;
  Failure _failure;         // Of the last flight; null after a success.
  unsigned _failures = 0;   // In a row.
  bool _isStopped = false;  // The credentials were wrong.
  long long _retryAt = 0;
  std::shared_ptr<Flight> _flight;
  Completions _completions;       // Asynchronous callers that wait.
  unsigned long long _armed = 0;  // How often a timer was set: a timer that is not the last one does nothing.
  bool _isArmed = false;
  unsigned long long _timer = 0;  // The scheduler's number for it.
  std::minstd_rand _chance;
};

}  // namespace Quorlin

#endif  // QUORLIN_PROVIDER_TOKENKEEPER_H
