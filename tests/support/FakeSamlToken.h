// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A token that nobody issued.

#ifndef QUORLIN_TESTS_SUPPORT_FAKESAMLTOKEN_H
#define QUORLIN_TESTS_SUPPORT_FAKESAMLTOKEN_H

#include <quorlin/SamlToken.h>

#include <deque>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace TestSupport {

/// A token with a given ID, XML text and confirmation method, and nothing else of interest.
class FakeSamlToken final : public Quorlin::SamlToken {
 public:
  explicit FakeSamlToken(ConfirmationType confirmation = CONFIRM_HOLDER_OF_KEY)
      : FakeSamlToken(
            "_token-1",
            "<saml2:Assertion xmlns:saml2=\"urn:oasis:names:tc:SAML:2.0:assertion\" ID=\"_token-1\" Version=\"2.0\">"
            "<saml2:Issuer>https://sts.example/</saml2:Issuer></saml2:Assertion>",
            confirmation) {}

  FakeSamlToken(const std::string& id, const std::string& xml, ConfirmationType confirmation)
      : _id(id), _xml(xml), _confirmation(confirmation), _subject("alice", "example.com") {}

  /// What the token says of its confirmation before it settles on the one it was made with.
  mutable std::deque<ConfirmationType> firstAnswers;

  const std::string& GetId() const override { return _id; }
  const Pelmar::System::DateTime& GetStartDate() const override { return _date; }
  const Pelmar::System::DateTime& GetEndDate() const override { return _date; }
  const Quorlin::PrincipalId& GetSubject() const override { return _subject; }
  bool IsRenewable() const override { return false; }
  bool IsDelegable() const override { return false; }
  bool IsSolution() const override { return false; }
  ConfirmationType GetConfirmationMethod() const override {
    if (firstAnswers.empty()) {
      return _confirmation;
    }
    const ConfirmationType answer = firstAnswers.front();
    firstAnswers.pop_front();
    return answer;
  }
  void GetFullName(std::pair<std::string, std::string>& fullName) const override { fullName = {}; }
  void GetGroups(std::vector<Quorlin::PrincipalId>& groups) const override { groups.clear(); }
  void GetDelegationChain(std::vector<Quorlin::Delegate>& delegationChain) const override {
    delegationChain.clear();
  }
  void GetAudience(std::set<std::string>& audience) const override { audience.clear(); }
  void GetAdvice(std::vector<Quorlin::Advice>& advice) const override { advice.clear(); }
  const Pelmar::Crypto::Certificate* GetConfirmationCertificate() const override { return nullptr; }
  const std::string& ToXml() const override { return _xml; }

 private:
  std::string _id;
  std::string _xml;
  ConfirmationType _confirmation;
  Pelmar::System::DateTime _date;
  Quorlin::PrincipalId _subject;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_FAKESAMLTOKEN_H
