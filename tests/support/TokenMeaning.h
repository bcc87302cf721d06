// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a token says, as text, for tests and for the fuzz target.

#ifndef QUORLIN_TESTS_SUPPORT_TOKENMEANING_H
#define QUORLIN_TESTS_SUPPORT_TOKENMEANING_H

#include <pelmar/crypto/Digest.h>
#include <quorlin/SamlToken.h>

#include <set>
#include <string>
#include <utility>
#include <vector>

namespace TestSupport {

namespace TokenMeaningDetail {

inline std::string Brace(const Quorlin::PrincipalId& principal) {
  return "{" + principal.name + "}{" + principal.domain + "}";
}

inline std::string DescribePeople(const Quorlin::SamlToken& token) {
  std::pair<std::string, std::string> fullName;
  token.GetFullName(fullName);
  std::string text =
      "subject " + Brace(token.GetSubject()) + "\nname {" + fullName.first + "}{" + fullName.second + "}\n";
  std::vector<Quorlin::PrincipalId> groups;
  token.GetGroups(groups);
  for (const Quorlin::PrincipalId& group : groups) {
    text += "group " + Brace(group) + "\n";
  }
  std::vector<Quorlin::Delegate> chain;
  token.GetDelegationChain(chain);
  for (const Quorlin::Delegate& delegate : chain) {
    text += "delegate " + Brace(delegate.principal) + " " + delegate.delegationInstant.ToString() + "\n";
  }
  return text;
}

inline std::string DescribeFlags(const Quorlin::SamlToken& token) {
  return "renewable " + std::to_string(token.IsRenewable()) + ", delegable " +
         std::to_string(token.IsDelegable()) + ", solution " + std::to_string(token.IsSolution()) +
         ", confirmation " + std::to_string(static_cast<int>(token.GetConfirmationMethod())) + "\n";
}

inline std::string DescribeAudience(const Quorlin::SamlToken& token) {
  std::set<std::string> audience;
  token.GetAudience(audience);
  std::string text;
  for (const std::string& uri : audience) {
    text += "audience {" + uri + "}\n";
  }
  return text;
}

inline std::string DescribeAdvice(const Quorlin::SamlToken& token) {
  std::vector<Quorlin::Advice> advice;
  token.GetAdvice(advice);
  std::string text;
  for (const Quorlin::Advice& one : advice) {
    text += "advice {" + one.source + "}";
    for (const Quorlin::AdviceAttribute& attribute : one.attributes) {
      text += " {" + attribute.name + "}:";
      for (const std::string& value : attribute.values) {
        text += "{" + value + "}";
      }
    }
    text += "\n";
  }
  return text;
}

}  // namespace TokenMeaningDetail

/// All that the getters say, except the XML text, in lines.
inline std::string MeaningOf(const Quorlin::SamlToken& token) {
  using namespace TokenMeaningDetail;
  const Pelmar::Crypto::Certificate* const certificate = token.GetConfirmationCertificate();
  return "id {" + token.GetId() + "}\nfrom " + token.GetStartDate().ToString() + " until " +
         token.GetEndDate().ToString() + "\n" + DescribePeople(token) + DescribeFlags(token) +
         DescribeAudience(token) + DescribeAdvice(token) + "certificate " +
         (certificate == nullptr ? "none" : Pelmar::Crypto::ToHex(certificate->GetSha256())) + "\n";
}

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_TOKENMEANING_H
