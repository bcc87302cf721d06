// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "provider/ScriptedService.h"

#include <boost/make_shared.hpp>

#include <stdexcept>

namespace TestSupport {

using Token = ScriptedService::Token;

namespace {

[[noreturn]] void RefuseCall() {
  throw std::logic_error("a provider must not call this");
}

}  // namespace

TimedToken::TimedToken(const TokenTraits& traits)
    : _traits(traits),
      _end(Pelmar::System::DateTimeFromUtc(traits.endsAt, false)),
      _subject("alice", "example.com") {}

void ScriptedService::Plan(const Step& step) {
  const std::lock_guard<std::mutex> lock(_mutex);
  _steps.push_back(step);
}

void ScriptedService::Issue(bool renewable, bool holderOfKey) {
  const std::lock_guard<std::mutex> lock(_mutex);
  _traits.renewable = renewable;
  _traits.holderOfKey = holderOfKey;
}

Token ScriptedService::MakeToken(long long lifetimeSec) {
  const std::lock_guard<std::mutex> lock(_mutex);
  return MakeTokenLocked(lifetimeSec);
}

Token ScriptedService::MakeTokenLocked(long long lifetimeSec) const {
  TokenTraits traits = _traits;
  traits.id = "_" + std::to_string(++_lastToken);
  traits.endsAt = _clock->GetUtcTime() + lifetimeSec * kSecond;
  return boost::make_shared<TimedToken>(traits);
}

std::vector<std::string> ScriptedService::TakeCalls() {
  const std::lock_guard<std::mutex> lock(_mutex);
  std::vector<std::string> calls;
  calls.swap(_calls);
  return calls;
}

Token ScriptedService::Answer(const std::string& call, long long lifetimeSec) const {
  Step step;
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    _calls.push_back(call + " " + std::to_string(lifetimeSec));
    if (_steps.empty()) {
      return MakeTokenLocked(lifetimeSec);
    }
    step = _steps.front();
    _steps.pop_front();
  }
  return step();
}

Token ScriptedService::AcquireToken(const std::string& userName, const std::string& password,
                                    const Quorlin::TokenSpec& spec) const {
  return Answer("AcquireToken " + userName + " " + password, spec.tokenLifetimeSec);
}

Token ScriptedService::AcquireTokenByGSS(const Quorlin::TokenSpec& spec,
                                         Quorlin::NegotiationHandler& handler) const {
  const boost::shared_ptr<Quorlin::Leg> leg = handler.Negotiate(Quorlin::Leg());
  return Answer("AcquireTokenByGSS " + std::string(leg->begin(), leg->end()), spec.tokenLifetimeSec);
}

Token ScriptedService::AcquireTokenByCertificate(const Quorlin::TokenSpec& spec) const {
  return Answer("AcquireTokenByCertificate", spec.tokenLifetimeSec);
}

Token ScriptedService::AcquireTokenByToken(const Quorlin::SamlToken& token,
                                           const Quorlin::TokenSpec& spec) const {
  return Answer("AcquireTokenByToken " + token.GetId(), spec.tokenLifetimeSec);
}

bool ScriptedService::ValidateSubject(const Quorlin::SamlToken&) const {
  RefuseCall();
}

Token ScriptedService::RenewToken(const Quorlin::SamlToken& token, long long lifetimeSec) const {
  return Answer("RenewToken " + token.GetId(), lifetimeSec);
}

void ScriptedService::AcquireTokenAsync(const std::string&, const std::string&, const Quorlin::TokenSpec&,
                                        const Quorlin::TokenCompletion&) const {
  RefuseCall();
}

void ScriptedService::AcquireTokenByGssAsync(const Quorlin::TokenSpec&,
                                             const boost::shared_ptr<Quorlin::NegotiationHandler>&,
                                             const Quorlin::TokenCompletion&) const {
  RefuseCall();
}

void ScriptedService::AcquireTokenByCertificateAsync(const Quorlin::TokenSpec&,
                                                     const Quorlin::TokenCompletion&) const {
  RefuseCall();
}

void ScriptedService::AcquireTokenByTokenAsync(const Token&, const Quorlin::TokenSpec&,
                                               const Quorlin::TokenCompletion&) const {
  RefuseCall();
}

void ScriptedService::ValidateSubjectAsync(const Token&, const Quorlin::ValidationCompletion&) const {
  RefuseCall();
}

void ScriptedService::RenewTokenAsync(const Token&, long long, const Quorlin::TokenCompletion&) const {
  RefuseCall();
}

}  // namespace TestSupport
