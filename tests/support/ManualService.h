// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A service whose asynchronous operations end when, how and where the test says.

#ifndef QUORLIN_TESTS_SUPPORT_MANUALSERVICE_H
#define QUORLIN_TESTS_SUPPORT_MANUALSERVICE_H

#include <quorlin/SecurityTokenService.h>

#include <boost/shared_ptr.hpp>

#include <functional>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

namespace TestSupport {

/// Keeps the completions that it is given. Not for several threads; each completion is the test's, once
/// taken.
class ManualService final : public Quorlin::SecurityTokenService {
 public:
  typedef boost::shared_ptr<const Quorlin::SamlToken> Token;

  /// What was started, as "<operation>|<argument>|...".
  const std::vector<std::string>& GetStarted() const { return _started; }
  /// The only completion kept; the service forgets it.
  Quorlin::TokenCompletion TakeToken() const { return Take(_tokens); }
  Quorlin::ValidationCompletion TakeValidation() const { return Take(_validations); }

  /// Called with each completion of a validation before the call that starts it returns, in place of keeping
  /// it.
  void SetOnValidation(const std::function<void(const Quorlin::ValidationCompletion&)>& action) {
    _onValidation = action;
  }

  void AcquireTokenAsync(const std::string& userName, const std::string& password,
                         const Quorlin::TokenSpec& spec,
                         const Quorlin::TokenCompletion& done) const override {
    Keep("AcquireToken|" + userName + "|" + password + "|" + Print(spec), done);
  }
  void AcquireTokenByGssAsync(const Quorlin::TokenSpec& spec,
                              const boost::shared_ptr<Quorlin::NegotiationHandler>& handler,
                              const Quorlin::TokenCompletion& done) const override {
    Keep("AcquireTokenByGSS|" + Print(spec) + (handler ? "|handler" : "|null"), done);
  }
  void AcquireTokenByCertificateAsync(const Quorlin::TokenSpec& spec,
                                      const Quorlin::TokenCompletion& done) const override {
    Keep("AcquireTokenByCertificate|" + Print(spec), done);
  }
  void AcquireTokenByTokenAsync(const Token& token, const Quorlin::TokenSpec& spec,
                                const Quorlin::TokenCompletion& done) const override {
    Keep("AcquireTokenByToken|" + token->GetId() + "|" + Print(spec), done);
  }
  void ValidateSubjectAsync(const Token& token, const Quorlin::ValidationCompletion& done) const override {
    _started.push_back("ValidateSubject|" + token->GetId());
    if (_onValidation) {
      _onValidation(done);
    } else {
      _validations.push_back(done);
    }
  }
  void RenewTokenAsync(const Token& token, long long lifetimeSec,
                       const Quorlin::TokenCompletion& done) const override {
    Keep("RenewToken|" + token->GetId() + "|" + std::to_string(lifetimeSec), done);
  }

  Token AcquireToken(const std::string&, const std::string&, const Quorlin::TokenSpec&) const override {
    throw std::logic_error("not blocking");
  }
  Token AcquireTokenByGSS(const Quorlin::TokenSpec&, Quorlin::NegotiationHandler&) const override {
    throw std::logic_error("not blocking");
  }
  Token AcquireTokenByCertificate(const Quorlin::TokenSpec&) const override {
    throw std::logic_error("not blocking");
  }
  Token AcquireTokenByToken(const Quorlin::SamlToken&, const Quorlin::TokenSpec&) const override {
    throw std::logic_error("not blocking");
  }
  bool ValidateSubject(const Quorlin::SamlToken&) const override { throw std::logic_error("not blocking"); }
  Token RenewToken(const Quorlin::SamlToken&, long long) const override {
    throw std::logic_error("not blocking");
  }

 private:
  static std::string Print(const Quorlin::TokenSpec& spec) { return std::to_string(spec.tokenLifetimeSec); }

  void Keep(const std::string& started, const Quorlin::TokenCompletion& done) const {
    _started.push_back(started);
    _tokens.push_back(done);
  }

  template <typename Completion>
  static Completion Take(std::vector<Completion>& kept) {
    if (kept.size() != 1) {
      throw std::logic_error("there are " + std::to_string(kept.size()) + " completions");
    }
    Completion completion = std::move(kept.back());
    kept.clear();
    return completion;
  }

  std::function<void(const Quorlin::ValidationCompletion&)> _onValidation;
  // The operations of a service are const.
  mutable std::vector<std::string> _started;
  mutable std::vector<Quorlin::TokenCompletion> _tokens;
  mutable std::vector<Quorlin::ValidationCompletion> _validations;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_MANUALSERVICE_H
