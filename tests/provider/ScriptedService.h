// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A token service that issues what it is told to, and tokens with a life of their own.

#ifndef QUORLIN_TESTS_PROVIDER_SCRIPTEDSERVICE_H
#define QUORLIN_TESTS_PROVIDER_SCRIPTEDSERVICE_H

#include <quorlin/SecurityTokenService.h>

#include <boost/shared_ptr.hpp>

#include <deque>
#include <functional>
#include <mutex>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "provider/HandTime.h"

namespace TestSupport {

struct TokenTraits {
  std::string id;
  long long endsAt = 0;  ///< Microseconds since 1970.
  bool renewable = false;
  bool holderOfKey = false;
};

/// A token that nobody issued, with these traits and nothing else of interest.
class TimedToken final : public Quorlin::SamlToken {
 public:
  explicit TimedToken(const TokenTraits& traits);

  const std::string& GetId() const override { return _traits.id; }
  const Pelmar::System::DateTime& GetStartDate() const override { return _end; }
  const Pelmar::System::DateTime& GetEndDate() const override { return _end; }
  const Quorlin::PrincipalId& GetSubject() const override { return _subject; }
  bool IsRenewable() const override { return _traits.renewable; }
  bool IsDelegable() const override { return false; }
  bool IsSolution() const override { return false; }
  ConfirmationType GetConfirmationMethod() const override {
    return _traits.holderOfKey ? CONFIRM_HOLDER_OF_KEY : CONFIRM_BEARER;
  }
  void GetFullName(std::pair<std::string, std::string>& fullName) const override { fullName = {}; }
  void GetGroups(std::vector<Quorlin::PrincipalId>& groups) const override { groups.clear(); }
  void GetDelegationChain(std::vector<Quorlin::Delegate>& chain) const override { chain.clear(); }
  void GetAudience(std::set<std::string>& audience) const override { audience.clear(); }
  void GetAdvice(std::vector<Quorlin::Advice>& advice) const override { advice.clear(); }
  const Pelmar::Crypto::Certificate* GetConfirmationCertificate() const override { return nullptr; }
  const std::string& ToXml() const override { return _traits.id; }

 private:
  TokenTraits _traits;
  Pelmar::System::DateTime _end;
  Quorlin::PrincipalId _subject;
};

/// Answers the blocking operations as planned, and as a good service does when nothing is planned: with
/// tokens
/// "_1", "_2" and so on, of the lifetime that is asked for. Safe to use from any thread.
class ScriptedService final : public Quorlin::SecurityTokenService {
 public:
  typedef boost::shared_ptr<const Quorlin::SamlToken> Token;
  typedef std::function<Token()> Step;

  explicit ScriptedService(const boost::shared_ptr<HandClock>& clock) : _clock(clock) {}

  /// The next call does this.
  void Plan(const Step& step);
  /// The next call throws this.
  template <typename Error>
  void PlanFailure(const Error& error) {
    Plan([error]() -> Token { throw error; });
  }
  /// What tokens are from now on.
  void Issue(bool renewable, bool holderOfKey);
  /// The next token that a good service would issue, with this lifetime.
  Token MakeToken(long long lifetimeSec);

  /// What was called, with the arguments of interest: "AcquireToken alice pass-word 600".
  std::vector<std::string> TakeCalls();

  Token AcquireToken(const std::string& userName, const std::string& password,
                     const Quorlin::TokenSpec& spec) const override;
  Token AcquireTokenByGSS(const Quorlin::TokenSpec& spec,
                          Quorlin::NegotiationHandler& handler) const override;
  Token AcquireTokenByCertificate(const Quorlin::TokenSpec& spec) const override;
  Token AcquireTokenByToken(const Quorlin::SamlToken& token, const Quorlin::TokenSpec& spec) const override;
  bool ValidateSubject(const Quorlin::SamlToken& token) const override;
  Token RenewToken(const Quorlin::SamlToken& token, long long lifetimeSec) const override;

  // No provider calls these.
  void AcquireTokenAsync(const std::string&, const std::string&, const Quorlin::TokenSpec&,
                         const Quorlin::TokenCompletion&) const override;
  void AcquireTokenByGssAsync(const Quorlin::TokenSpec&,
                              const boost::shared_ptr<Quorlin::NegotiationHandler>&,
                              const Quorlin::TokenCompletion&) const override;
  void AcquireTokenByCertificateAsync(const Quorlin::TokenSpec&,
                                      const Quorlin::TokenCompletion&) const override;
  void AcquireTokenByTokenAsync(const Token&, const Quorlin::TokenSpec&,
                                const Quorlin::TokenCompletion&) const override;
  void ValidateSubjectAsync(const Token&, const Quorlin::ValidationCompletion&) const override;
  void RenewTokenAsync(const Token&, long long, const Quorlin::TokenCompletion&) const override;

 private:
  Token Answer(const std::string& call, long long lifetimeSec) const;
  Token MakeTokenLocked(long long lifetimeSec) const;

  const boost::shared_ptr<HandClock> _clock;
  mutable std::mutex _mutex;
  mutable std::deque<Step> _steps;
  mutable std::vector<std::string> _calls;
  mutable unsigned _lastToken = 0;
  TokenTraits _traits;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_PROVIDER_SCRIPTEDSERVICE_H
