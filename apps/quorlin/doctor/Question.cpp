// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/doctor/Question.h"

namespace Cli {
namespace Doctor {

namespace {

constexpr const char* kTrustNs = "http://docs.oasis-open.org/ws-sx/ws-trust/200512";
constexpr const char* kSecextNs =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
constexpr const char* kSamlNs = "urn:oasis:names:tc:SAML:2.0:assertion";

constexpr long long kMicrosecondsPerSecond = 1000000;
constexpr long long kLifetimeSec = 300;

std::string MakeTimestamp(const Pelmar::System::DateTime& now) {
  const Pelmar::System::DateTime end =
      Pelmar::System::DateTimeFromUtc(now.GetUtcTime() + kLifetimeSec * kMicrosecondsPerSecond, false);
  return std::string("<wsu:Timestamp xmlns:wsu=\"") + kUtilityNs + "\"><wsu:Created>" + now.ToString() +
         "</wsu:Created><wsu:Expires>" + end.ToString() + "</wsu:Expires></wsu:Timestamp>";
}

}  // namespace

std::string MakeQuestion(const Pelmar::System::DateTime& now) {
  return std::string("<?xml version=\"1.0\" encoding=\"UTF-8\"?><S:Envelope xmlns:S=\"") + kSoapNs +
         "\"><S:Header><wsse:Security xmlns:wsse=\"" + kSecextNs + "\">" + MakeTimestamp(now) +
         "</wsse:Security></S:Header><S:Body><wst:RequestSecurityToken xmlns:wst=\"" + kTrustNs +
         "\"><wst:TokenType>" + kSamlNs + "</wst:TokenType><wst:RequestType>" + kTrustNs +
         "/Issue</wst:RequestType><wst:KeyType>" + kTrustNs +
         "/Bearer</wst:KeyType></wst:RequestSecurityToken></S:Body></S:Envelope>";
}

}  // namespace Doctor
}  // namespace Cli
