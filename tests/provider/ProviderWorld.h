// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A provider with everything around it in the test's hands.

#ifndef QUORLIN_TESTS_PROVIDER_PROVIDERWORLD_H
#define QUORLIN_TESTS_PROVIDER_PROVIDERWORLD_H

#include <quorlin/TokenProvider.h>

#include <boost/make_shared.hpp>

#include <mutex>
#include <string>
#include <vector>

#include "provider/HandTime.h"
#include "provider/ScriptedService.h"
#include "support/Verdict.h"

namespace TestSupport {

/// Writes down what it is told: "refreshed _1", "renewed _2", "failed in 1000000: text".
class RecordingObserver final : public Quorlin::TokenProviderObserver {
 public:
  void OnRefreshed(const boost::shared_ptr<const Quorlin::SamlToken>& token, bool renewed) override {
    Add((renewed ? "renewed " : "refreshed ") + token->GetId());
  }
  void OnFailed(const Pelmar::Exception& error, long long retryInMicroseconds) override {
    Add("failed in " + std::to_string(retryInMicroseconds) + ": " + error.what());
  }
  std::vector<std::string> TakeEvents() {
    const std::lock_guard<std::mutex> lock(_mutex);
    std::vector<std::string> events;
    events.swap(_events);
    return events;
  }

 private:
  void Add(const std::string& event) {
    const std::lock_guard<std::mutex> lock(_mutex);
    _events.push_back(event);
  }

  std::mutex _mutex;
  std::vector<std::string> _events;
};

/// Tokens of 600 seconds, of which 60 have to be left; by certificate; nothing left to chance.
struct ProviderWorld {
  typedef boost::shared_ptr<const Quorlin::SamlToken> Token;

  boost::shared_ptr<HandClock> clock = boost::make_shared<HandClock>(1800000000 * kSecond);
  boost::shared_ptr<HandScheduler> scheduler = boost::make_shared<HandScheduler>();
  boost::shared_ptr<ScriptedService> service = boost::make_shared<ScriptedService>(clock);
  boost::shared_ptr<RecordingObserver> observer = boost::make_shared<RecordingObserver>();
  Quorlin::TokenProviderOptions options = MakeOptions();

  boost::shared_ptr<Quorlin::TokenProvider> MakeProvider(
      const Quorlin::TokenRequest& request = Quorlin::RequestByCertificate()) const {
    return Quorlin::CreateTokenProvider(service, request, options);
  }

 private:
  Quorlin::TokenProviderOptions MakeOptions() const {
    Quorlin::TokenProviderOptions made;
    made.spec.tokenLifetimeSec = 600;
    made.jitterPercent = 0;
    made.clock = clock;
    made.scheduler = scheduler;
    made.observer = observer;
    return made;
  }
};

/// The ID of the token that the provider gives, or "Class: message" of what it throws.
inline std::string Get(Quorlin::TokenProvider& provider) {
  std::string id;
  const std::string verdict = VerdictOf([&] { id = provider.GetToken()->GetId(); });
  return id.empty() ? verdict : id;
}

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_PROVIDER_PROVIDERWORLD_H
