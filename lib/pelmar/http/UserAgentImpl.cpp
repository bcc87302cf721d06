// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/UserAgentImpl.h"

#include "pelmar/http/HttpLoop.h"

#include <pelmar/Exception.h>

#include <atomic>
#include <memory>

namespace Pelmar {
namespace Http {

namespace {

std::uint64_t DrawId() {
  static std::atomic<std::uint64_t> last(0);
  return ++last;
}

}  // namespace

ConnectionPool::~ConnectionPool() = default;

UserAgent::~UserAgent() = default;

UserAgentImpl::UserAgentImpl(const Ref<const ConnectionSpecImpl>& spec, const Ref<CookieStoreImpl>& cookies,
                             const ClientOptions& options)
    : _parts{DrawId(), spec, cookies, std::make_shared<const AgentOptions>(options)},
      _farewell(HttpLoop::MakeFarewell(LoopVerb::DROP_AGENT, _parts.id)) {}

UserAgentImpl::~UserAgentImpl() {
  HttpLoop::Get().TakeFarewell(_farewell);
}

void UserAgentImpl::SendAsync(const Ref<ClientRequest>& request, const CompletionFunctor& completion,
                              Ref<PendingRequestItem>& item) {
  auto* const own = dynamic_cast<ClientRequestImpl*>(request.Get());
  if (own == nullptr) {
    throw InvalidArgumentException("the request is null or was not made by this platform");
  }
  if (completion.empty()) {
    throw InvalidArgumentException("the completion functor is empty");
  }
  const Ref<Exchange> exchange = Exchange::Create(_parts, own->TakeParts(), completion);
  item = exchange;
  try {
    HttpLoop::Get().Submit(exchange);
  } catch (...) {
    // Never started, so nobody is to be told but the caller.
    exchange->Disarm();
    item = nullptr;
    throw;
  }
}

void UserAgentImpl::WaitFor(const Ref<PendingRequestItem>& item, long long timeoutMicroseconds,
                            Ref<ClientResponse>& response) {
  auto* const exchange = dynamic_cast<Exchange*>(item.Get());
  if (exchange == nullptr || exchange->GetAgent().id != _parts.id) {
    throw InvalidArgumentException("the pending item is null or was not made by this user agent");
  }
  exchange->WaitOrGiveUp(timeoutMicroseconds);
  response = exchange->GetResult();
}

Ref<UserAgent> CreateHttpUserAgent(const Ref<ConnectionSpec>& spec, const Ref<CookieStore>& cookies,
                                   const Ref<ConnectionPool>& pool) {
  return CreateHttpUserAgent(spec, cookies, pool, ClientOptions());
}

Ref<UserAgent> CreateHttpUserAgent(const Ref<ConnectionSpec>& spec, const Ref<CookieStore>& cookies,
                                   const Ref<ConnectionPool>& pool, const ClientOptions& options) {
  const Ref<const ConnectionSpecImpl> ownSpec = ToConnectionSpecImpl(spec.Get());
  auto* const ownCookies = dynamic_cast<CookieStoreImpl*>(cookies.Get());
  if (ownCookies == nullptr) {
    throw InvalidArgumentException("the cookie store is null or was not made by this platform");
  }
  if (pool) {
    throw InvalidArgumentException("there are no connection pools, so the pool must be null");
  }
  return MakeRef<UserAgentImpl>(ownSpec, Ref<CookieStoreImpl>(ownCookies), options);
}

bool IsSafeToRetry(const Ref<PendingRequestItem>& item) {
  const auto* const exchange = dynamic_cast<const Exchange*>(item.Get());
  return exchange != nullptr && exchange->IsSafeToRetry();
}

}  // namespace Http
}  // namespace Pelmar
