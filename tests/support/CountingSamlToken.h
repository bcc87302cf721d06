// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A token made of given values that counts how often it is read.

#ifndef QUORLIN_TESTS_SUPPORT_COUNTINGSAMLTOKEN_H
#define QUORLIN_TESTS_SUPPORT_COUNTINGSAMLTOKEN_H

#include <quorlin/SamlToken.h>

#include <atomic>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace TestSupport {

/// "alice" of "example.com", a bearer token from 2020-01-01 until 2030-01-01, with recognisable values where
/// a log line must not show any. Every getter but GetId, which fakes of the request builder use, adds to
/// `reads`.
class CountingSamlToken final : public Quorlin::SamlToken {
 public:
  CountingSamlToken();

  const std::string& GetId() const override { return id; }
  const Pelmar::System::DateTime& GetStartDate() const override { return Read(startDate); }
  const Pelmar::System::DateTime& GetEndDate() const override { return Read(endDate); }
  const Quorlin::PrincipalId& GetSubject() const override { return Read(subject); }
  bool IsRenewable() const override { return Read(renewable); }
  bool IsDelegable() const override { return Read(delegable); }
  bool IsSolution() const override { return Read(solution); }
  ConfirmationType GetConfirmationMethod() const override { return Read(confirmationMethod); }
  void GetFullName(std::pair<std::string, std::string>& out) const override { out = Read(fullName); }
  void GetGroups(std::vector<Quorlin::PrincipalId>& out) const override { out = Read(groups); }
  void GetDelegationChain(std::vector<Quorlin::Delegate>& out) const override { out = Read(delegationChain); }
  void GetAudience(std::set<std::string>& out) const override { out = Read(audience); }
  void GetAdvice(std::vector<Quorlin::Advice>& out) const override { out = Read(advice); }
  const Pelmar::Crypto::Certificate* GetConfirmationCertificate() const override {
    ++reads;
    return nullptr;
  }
  const std::string& ToXml() const override { return Read(xml); }

  std::string id;
  Pelmar::System::DateTime startDate;
  Pelmar::System::DateTime endDate;
  Quorlin::PrincipalId subject;
  bool renewable;
  bool delegable;
  bool solution;
  ConfirmationType confirmationMethod;
  std::pair<std::string, std::string> fullName;
  std::vector<Quorlin::PrincipalId> groups;
  std::vector<Quorlin::Delegate> delegationChain;
  std::set<std::string> audience;
  std::vector<Quorlin::Advice> advice;
  std::string xml;
  mutable std::atomic<int> reads;

 private:
  template <typename T>
  const T& Read(const T& value) const {
    ++reads;
    return value;
  }
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_COUNTINGSAMLTOKEN_H
