// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tokens for programs.

#include "quorlin/TokenOutput.h"

#include <pelmar/crypto/Digest.h>

#include <set>
#include <utility>
#include <vector>

namespace Cli {

namespace {

Json ToJson(const Quorlin::PrincipalId& principal) {
  return {{"name", principal.name}, {"domain", principal.domain}};
}

Json DescribeGroups(const Quorlin::SamlToken& token) {
  std::vector<Quorlin::PrincipalId> groups;
  token.GetGroups(groups);
  Json result = Json::array();
  for (const Quorlin::PrincipalId& group : groups) {
    result.push_back(ToJson(group));
  }
  return result;
}

Json DescribeDelegationChain(const Quorlin::SamlToken& token) {
  std::vector<Quorlin::Delegate> chain;
  token.GetDelegationChain(chain);
  Json result = Json::array();
  for (const Quorlin::Delegate& link : chain) {
    result.push_back({{"principal", ToJson(link.principal)}, {"instant", link.delegationInstant.ToString()}});
  }
  return result;
}

Json DescribeAudience(const Quorlin::SamlToken& token) {
  std::set<std::string> audience;
  token.GetAudience(audience);
  Json result = Json::array();
  for (const std::string& address : audience) {
    result.push_back(address);
  }
  return result;
}

Json ToJson(const Quorlin::Advice& advice) {
  Json attributes = Json::array();
  for (const Quorlin::AdviceAttribute& attribute : advice.attributes) {
    Json values = Json::array();
    for (const std::string& value : attribute.values) {
      values.push_back(value);
    }
    attributes.push_back({{"name", attribute.name}, {"values", values}});
  }
  return {{"source", advice.source}, {"attributes", attributes}};
}

Json DescribeAdvice(const Quorlin::SamlToken& token) {
  std::vector<Quorlin::Advice> advices;
  token.GetAdvice(advices);
  Json result = Json::array();
  for (const Quorlin::Advice& advice : advices) {
    result.push_back(ToJson(advice));
  }
  return result;
}

Json DescribeConfirmationCertificate(const Quorlin::SamlToken& token) {
  const Pelmar::Crypto::Certificate* const certificate = token.GetConfirmationCertificate();
  return certificate == nullptr ? Json() : Json(Pelmar::Crypto::ToHex(certificate->GetSha256()));
}

std::string GetXmlSha256(const Quorlin::SamlToken& token) {
  const std::string& xml = token.ToXml();
  return Pelmar::Crypto::ToHex(
      Pelmar::Crypto::ComputeDigest(Pelmar::Crypto::DIGEST_SHA256, xml.data(), xml.size()));
}

}  // namespace

Json DescribeToken(const Quorlin::SamlToken& token) {
  std::pair<std::string, std::string> fullName;
  token.GetFullName(fullName);
  const bool isBearer = token.GetConfirmationMethod() == Quorlin::SamlToken::CONFIRM_BEARER;
  Json description;
  description["id"] = token.GetId();
  description["subject"] = ToJson(token.GetSubject());
  description["startDate"] = token.GetStartDate().ToString();
  description["endDate"] = token.GetEndDate().ToString();
  description["renewable"] = token.IsRenewable();
  description["delegable"] = token.IsDelegable();
  description["isSolution"] = token.IsSolution();
  description["confirmation"] = isBearer ? "bearer" : "holder-of-key";
  description["givenName"] = fullName.first;
  description["surname"] = fullName.second;
  description["groups"] = DescribeGroups(token);
  description["delegationChain"] = DescribeDelegationChain(token);
  description["audience"] = DescribeAudience(token);
  description["advice"] = DescribeAdvice(token);
  description["confirmationCertificateSha256"] = DescribeConfirmationCertificate(token);
  description["xmlSha256"] = GetXmlSha256(token);
  Json result;
  result["valid"] = true;
  result["token"] = description;
  return result;
}

Json DescribeFailure(const Failure& failure) {
  Json error;
  error["type"] = failure.type;
  error["message"] = failure.message;
  if (failure.byPointer) {
    error["byPointer"] = true;
  }
  Json result;
  result["valid"] = false;
  result["error"] = error;
  return result;
}

std::string ToText(const Json& json) {
  return json.dump(-1, ' ', false, Json::error_handler_t::replace);
}

std::string ToAsciiText(const Json& json) {
  return json.dump(-1, ' ', true, Json::error_handler_t::replace);
}

}  // namespace Cli
