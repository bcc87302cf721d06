// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin/TokenProvider.h>

#include <pelmar/Exception.h>
#include <pelmar/system/DateTime.h>

#include <boost/make_shared.hpp>

#include <memory>

#include "quorlin-provider/TimerScheduler.h"
#include "quorlin-provider/Timing.h"
#include "quorlin-provider/TokenKeeper.h"

namespace Quorlin {

namespace {

using Token = boost::shared_ptr<const SamlToken>;

class SystemClock final : public TokenProviderClock {
 public:
  long long GetUtcTime() const override { return Pelmar::System::GetUtcDateTime().GetUtcTime(); }
};

/// The face of a keeper, which may outlive it.
class TokenProviderImpl final : public TokenProvider {
 public:
  explicit TokenProviderImpl(const std::shared_ptr<TokenKeeper>& keeper) : _keeper(keeper) {}
  TokenProviderImpl(const TokenProviderImpl&) = delete;
  TokenProviderImpl& operator=(const TokenProviderImpl&) = delete;
  ~TokenProviderImpl() { _keeper->Close(); }

  Token GetToken() override { return _keeper->Get(); }
  void GetTokenAsync(const TokenCompletion& done) override { _keeper->GetAsync(done); }
  void Invalidate() override { _keeper->Invalidate(); }
  void InvalidateToken(const SamlToken& rejected) override { _keeper->InvalidateToken(rejected); }

 private:
  const std::shared_ptr<TokenKeeper> _keeper;
};

TokenProviderOptions Completed(TokenProviderOptions options) {
  if (!options.clock) {
    options.clock = boost::make_shared<SystemClock>();
  }
  if (!options.scheduler) {
    options.scheduler = GetProcessScheduler();
  }
  return options;
}

}  // namespace

boost::shared_ptr<TokenProvider> CreateTokenProvider(
    const boost::shared_ptr<const SecurityTokenService>& service, const TokenRequest& request,
    const TokenProviderOptions& options) {
  if (!service) {
    throw Pelmar::InvalidArgumentException("the service of a token provider must not be NULL");
  }
  if (request.empty()) {
    throw Pelmar::InvalidArgumentException("TokenRequest must not be empty");
  }
  CheckTiming(options);
  return boost::make_shared<TokenProviderImpl>(
      std::make_shared<TokenKeeper>(service, request, Completed(options)));
}

}  // namespace Quorlin
