// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// One request on its way: what its sender holds as a pending item, and what the HTTP loop works on.

#ifndef PELMAR_HTTP_EXCHANGE_H
#define PELMAR_HTTP_EXCHANGE_H

#include <pelmar/http/Client.h>
#include <pelmar/http/HttpException.h>

#include "pelmar/http/AgentOptions.h"
#include "pelmar/http/ClientRequestImpl.h"
#include "pelmar/http/ConnectionSpecImpl.h"
#include "pelmar/http/CookieStoreImpl.h"
#include "pelmar/http/LoopCommand.h"

#include <boost/function.hpp>

#include <condition_variable>
#include <cstdint>
#include <list>
#include <memory>
#include <mutex>
#include <utility>

namespace Pelmar {
namespace Http {

/// One piece of work, in a list so that it can change hands without an allocation that might fail.
using Work = std::list<boost::function<void()>>;

/// What an exchange needs to know of its user agent. Outlives the agent if need be.
struct AgentParts {
  std::uint64_t id;
  Ref<const ConnectionSpecImpl> spec;
  Ref<CookieStoreImpl> cookies;
  std::shared_ptr<const AgentOptions> options;

  /// Where requests go, for messages: "HOST:PORT", or "HOST:PORT through proxy HOST:PORT".
  std::string DescribeRoute() const;
};

/// An exchange is settled once, by whoever comes first: the HTTP loop with the outcome, `Cancel`, or a waiter
/// whose time is up. Settling wakes the waiters at once and sends the completion functor to the thread pool.
/// What the loop still does for an exchange that was settled elsewhere (closing its connection) is nobody's
/// concern any more.
class Exchange final : public PendingRequestItem {
 public:
  static Ref<Exchange> Create(const AgentParts& agent, RequestParts request,
                              const CompletionFunctor& completion);

  bool Wait(long long timeoutMicroseconds) override;
  void Cancel() override;

  /// Waits like `Wait`, but takes a negative time-out for none at all, and settles the exchange with
  /// HttpTimeoutException when it passes.
  void WaitOrGiveUp(long long timeoutMicroseconds);

  /// False when the exchange had been settled before. Exactly one of the first two is given.
  bool Settle(const std::shared_ptr<const HttpException>& error, const Ref<ClientResponse>& response,
              bool isSafeToRetry = false);
  bool IsSettled() const;
  /// As `Http::IsSafeToRetry` tells it.
  bool IsSafeToRetry() const;
  /// For an exchange that could not be started: it is settled without anybody being told.
  void Disarm();

  /// The response, or throws the error. Only after settling.
  Ref<ClientResponse> GetResult() const;

  /// For the HTTP loop, once: a command made in advance, as giving up must not fail for lack of memory.
  LoopCommands TakeAbandonment() noexcept { return std::move(_abandonment); }

  const AgentParts& GetAgent() const { return _agent; }
  const RequestParts& GetRequest() const { return _request; }

 private:
  Exchange(const AgentParts& agent, RequestParts&& request);
  ~Exchange() override;

  void Complete(const CompletionFunctor& completion);

  const AgentParts _agent;
  const RequestParts _request;
  LoopCommands _abandonment;  // Whoever settles the exchange may take it.

  mutable std::mutex _mutex;
  std::condition_variable _wake;
  // Guarded by the mutex until `_settled`, constant afterwards.
  bool _settled = false;
  std::shared_ptr<const HttpException> _error;
  Ref<ClientResponse> _response;
  bool _isSafeToRetry = false;
  // Keeps the exchange itself alive until it is settled.
  Work _delivery;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_EXCHANGE_H
