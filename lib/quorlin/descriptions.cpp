// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/descriptions.h"

#include <pelmar/MessageFormatter.h>

#include <boost/algorithm/string/join.hpp>

#include <utility>

namespace Quorlin {

namespace {

constexpr const char* kSeparator = ", ";

std::string WriteGroups(const SamlToken& token) {
  std::vector<PrincipalId> groups;
  token.GetGroups(groups);
  return AsString<PrincipalId>(groups, &PrincipalId::ToString);
}

std::string WriteDelegationChain(const SamlToken& token) {
  std::vector<Delegate> delegationChain;
  token.GetDelegationChain(delegationChain);
  return AsString<Delegate>(delegationChain, &WriteDelegate);
}

}  // namespace

std::string PrincipalId::ToString() const {
  return "{Name: " + name + "; Domain:" + domain + "}";
}

std::string CreateRedactedDescription(const SamlToken& token) {
  return Pelmar::MessageFormatter(
             "SamlToken [subject=%1, groups=[%2], delegationChain=[%3], startTime=%4, expirationTime=%5, "
             "renewable=%6, delegable=%7, isSolution=%8,confirmationType=%9]")
      .Add(Pelmar::ToStringFormatter<PrincipalId>(&token.GetSubject()))
      .AddString(WriteGroups(token))
      .AddString(WriteDelegationChain(token))
      .AddDate(token.GetStartDate())
      .AddDate(token.GetEndDate())
      .AddBoolean(token.IsRenewable())
      .AddBoolean(token.IsDelegable())
      .AddBoolean(token.IsSolution())
      .AddInteger(token.GetConfirmationMethod())
      .ToString();
}

std::string WriteTokenSpec(const TokenSpec& spec) {
  return Pelmar::MessageFormatter(
             "TokenSpec [tokenLifetimeSec=%1, delegable=%2, delegateTo=%3, renewable=%4, "
             "confirmationType=%5,audienceRestriction=%6, advice=[%7]")
      .AddInteger(spec.tokenLifetimeSec)
      .AddBoolean(spec.delegable)
      .AddString(spec.delegateTo.get_value_or("<unset>"))
      .AddBoolean(spec.renewable)
      .AddInteger(spec.confirmation)
      .AddString(boost::algorithm::join(spec.audienceRestriction, kSeparator))
      .AddString(AsString<Advice>(spec.advice, &WriteAdvice))
      .ToString();
}

std::string WriteAdvice(const Advice* advice) {
  return Pelmar::MessageFormatter("Advice [source=%1, attributes=[%2]]")
      .AddString(advice->source)
      .AddString(AsString<AdviceAttribute>(advice->attributes, &WriteAdviceAttribute))
      .ToString();
}

std::string WriteAdviceAttribute(const AdviceAttribute* attribute) {
  return Pelmar::MessageFormatter("[source=%1, attributes=[%2]]")
      .AddString(attribute->name)
      .AddString(boost::algorithm::join(attribute->values, kSeparator))
      .ToString();
}

std::string WriteDelegate(const Delegate* delegate) {
  return delegate->principal.ToString() + " at " + delegate->delegationInstant.ToString();
}

}  // namespace Quorlin
