// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/Exchange.h"

#include "pelmar/http/Durations.h"
#include "pelmar/http/HttpLoop.h"

#include <algorithm>
#include <chrono>
#include <utility>

namespace Pelmar {
namespace Http {

namespace {

using Clock = std::chrono::steady_clock;

// Longer waits are cut to this, for the clock would overflow: a hundred years.
constexpr long long kMaxWaitMicroseconds = 100LL * 365 * 24 * 60 * 60 * 1000000;

Clock::time_point GetDeadline(long long timeoutMicroseconds) {
  return Clock::now() + std::chrono::microseconds(std::min(timeoutMicroseconds, kMaxWaitMicroseconds));
}

}  // namespace

PendingRequestItem::~PendingRequestItem() = default;

std::string AgentParts::DescribeRoute() const {
  const std::string endpoint = spec->GetEndpoint();
  return options->HasProxy() ? endpoint + " through proxy " + options->GetProxyEndpoint() : endpoint;
}

Ref<Exchange> Exchange::Create(const AgentParts& agent, RequestParts request,
                               const CompletionFunctor& completion) {
  Ref<Exchange> exchange(new Exchange(agent, std::move(request)));
  exchange->_delivery.emplace_back([exchange, completion] { exchange->Complete(completion); });
  return exchange;
}

Exchange::Exchange(const AgentParts& agent, RequestParts&& request)
    : _agent(agent),
      _request(std::move(request)),
      _abandonment(1, LoopCommand{LoopVerb::ABANDON, nullptr, 0}) {}

Exchange::~Exchange() = default;

bool Exchange::Wait(long long timeoutMicroseconds) {
  std::unique_lock<std::mutex> lock(_mutex);
  const auto isSettled = [this] {
    return _settled;
  };
  if (timeoutMicroseconds < 0) {
    _wake.wait(lock, isSettled);
    return true;
  }
  return _wake.wait_until(lock, GetDeadline(timeoutMicroseconds), isSettled);
}

void Exchange::Cancel() {
  if (Settle(std::make_shared<const HttpException>("Request was cancelled"), nullptr)) {
    HttpLoop::Get().Abandon(this);
  }
}

void Exchange::WaitOrGiveUp(long long timeoutMicroseconds) {
  const long long timeout = std::max(timeoutMicroseconds, 0LL);
  if (Wait(timeout)) {
    return;
  }
  const std::string text =
      "No answer from " + _agent.DescribeRoute() + " within " + FormatSeconds(timeout) + " s";
  if (Settle(std::make_shared<const HttpTimeoutException>(text), nullptr)) {
    HttpLoop::Get().Abandon(this);
  }
}

bool Exchange::Settle(const std::shared_ptr<const HttpException>& error, const Ref<ClientResponse>& response,
                      bool isSafeToRetry) {
  Work delivery;
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    if (_settled) {
      return false;
    }
    _settled = true;
    _error = error;
    _response = response;
    _isSafeToRetry = isSafeToRetry;
    delivery.swap(_delivery);
  }
  _wake.notify_all();
  HttpLoop::Get().Deliver(std::move(delivery));
  return true;
}

void Exchange::Disarm() {
  Work dropped;
  const std::lock_guard<std::mutex> lock(_mutex);
  _settled = true;
  dropped.swap(_delivery);
}

bool Exchange::IsSettled() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _settled;
}

bool Exchange::IsSafeToRetry() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _isSafeToRetry;
}

Ref<ClientResponse> Exchange::GetResult() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  if (_error) {
    _error->Throw();
  }
  return _response;
}

void Exchange::Complete(const CompletionFunctor& completion) {
  // Settled, so nothing changes any more; the lock orders this thread after the one that settled.
  std::unique_lock<std::mutex> lock(_mutex);
  const std::shared_ptr<const HttpException> error = _error;
  const Ref<ClientResponse> response = _response;
  lock.unlock();
  completion(error.get(), response.Get(), this);
}

}  // namespace Http
}  // namespace Pelmar
