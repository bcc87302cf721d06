// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/FakeService.h"

#include <boost/make_shared.hpp>

#include "quorlin/ResponseHandlerImpl.h"
#include "quorlin/SecurityTokenServiceImpl.h"
#include "support/ServiceAnswers.h"

namespace TestSupport {

const char* const kFakeSpecText =
    "TokenSpec [tokenLifetimeSec=300, delegable=false, delegateTo=<unset>, renewable=false, "
    "confirmationType=0,audienceRestriction=urn:a, advice=[]";
const char* const kFakeTokenText =
    "SamlToken [subject={Name: alice; Domain:example.com}, groups=[], delegationChain=[], "
    "startTime=2020-01-01T00:00:00Z, expirationTime=2030-01-01T00:00:00Z, renewable=false, delegable=true, "
    "isSolution=false,confirmationType=0]";
const char* const kValidTokenText =
    "SamlToken [subject={Name: alice; Domain:example.com}, groups=[], delegationChain=[], "
    "startTime=2020-01-01T00:00:00Z, expirationTime=9999-12-31T23:59:59Z, renewable=false, delegable=true, "
    "isSolution=false,confirmationType=0]";

FakeService::FakeService()
    : builder(boost::make_shared<FakeRequestBuilder>()),
      transport(boost::make_shared<FakeTransport>()),
      service(boost::make_shared<Quorlin::SecurityTokenServiceImpl>(
          builder, transport, boost::make_shared<Quorlin::ResponseHandlerImpl>(), TrustedSigner())),
      token(boost::make_shared<CountingSamlToken>()),
      handler(boost::make_shared<ScriptedNegotiationHandler>()) {
  spec.tokenLifetimeSec = 300;
  spec.audienceRestriction = {"urn:a"};
  handler->Plan("hello");
}

std::vector<OperationCase> AllOperations() {
  const std::string specText = kFakeSpecText;
  const std::string tokenText = kFakeTokenText;
  const std::string valid = SignedToken("valid");
  const std::string id = "_token-id-not-for-logs";
  return {
      {"AcquireToken", [](const FakeService& f) { f.service->AcquireToken("alice", "pass-word", f.spec); },
       "1|UserPass|alice|pass-word|" + specText,
       "Requested token for subject `alice', spec `" + specText + "'", IssueAnswer(valid)},
      {"AcquireTokenByGSS", [](const FakeService& f) { f.service->AcquireTokenByGSS(f.spec, *f.handler); },
       "1|InitialSPNego|" + specText + "|hello", "Requested token with spec `" + specText + "'",
       FinalAnswer("ctx", "", valid)},
      {"AcquireTokenByCertificate",
       [](const FakeService& f) { f.service->AcquireTokenByCertificate(f.spec); },
       "1|Certificate|" + specText, "Requested token with spec `" + specText + "'", IssueAnswer(valid)},
      {"AcquireTokenByToken", [](const FakeService& f) { f.service->AcquireTokenByToken(*f.token, f.spec); },
       "1|Exchange|" + id + "|" + specText,
       "Requested token for " + tokenText + " with spec `" + specText + "'", IssueAnswer(valid)},
      {"ValidateSubject", [](const FakeService& f) { f.service->ValidateSubject(*f.token); },
       "1|ValidateSubject|" + id, "Validating subject of token " + tokenText, ValidateAnswer(true)},
      {"RenewToken", [](const FakeService& f) { f.service->RenewToken(*f.token, 600); },
       "1|Renew|" + id + "|600", "Renewing token " + tokenText + " for 600 more seconds", RenewAnswer(valid)},
  };
}

}  // namespace TestSupport
