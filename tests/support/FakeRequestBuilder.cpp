// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/FakeRequestBuilder.h"

#include "quorlin/descriptions.h"

namespace TestSupport {

using Quorlin::Request;
using Quorlin::SamlToken;
using Quorlin::TokenSpec;
using Quorlin::WriteTokenSpec;

namespace {

std::string AsText(const std::vector<unsigned char>& leg) {
  return std::string(leg.begin(), leg.end());
}

}  // namespace

void FakeRequestBuilder::Fail(const Pelmar::Exception& error) {
  _error.reset(error.Clone());
}

void FakeRequestBuilder::BuildUserPassTokenRequest(const std::string& userName, const std::string& password,
                                                   const TokenSpec& spec, Request& request) const {
  Fill("UserPass", userName + "|" + password + "|" + WriteTokenSpec(spec), request);
}

void FakeRequestBuilder::BuildInitialSPNegoRequest(const TokenSpec& spec,
                                                   const std::vector<unsigned char>& leg,
                                                   Request& request) const {
  Fill("InitialSPNego", WriteTokenSpec(spec) + "|" + AsText(leg), request);
}

void FakeRequestBuilder::BuildContinuedSPNegoRequest(const std::string& contextId,
                                                     const std::vector<unsigned char>& leg,
                                                     Request& request) const {
  Fill("ContinuedSPNego", contextId + "|" + AsText(leg), request);
}

void FakeRequestBuilder::BuildCertificateTokenRequest(const TokenSpec& spec, Request& request) const {
  Fill("Certificate", WriteTokenSpec(spec), request);
}

void FakeRequestBuilder::BuildExchangeTokenRequest(const SamlToken& token, const TokenSpec& spec,
                                                   Request& request) const {
  Fill("Exchange", token.GetId() + "|" + WriteTokenSpec(spec), request);
}

void FakeRequestBuilder::BuildValidateSubjectRequest(const SamlToken& token, Request& request) const {
  Fill("ValidateSubject", token.GetId(), request);
}

void FakeRequestBuilder::BuildRenewRequest(const SamlToken& token, long long lifetimeSec,
                                           Request& request) const {
  Fill("Renew", token.GetId() + "|" + std::to_string(lifetimeSec), request);
}

void FakeRequestBuilder::Fill(const char* operation, const std::string& arguments, Request& request) const {
  if (_error) {
    _error->Throw();
  }
  request.soapAction = operation;
  request.body = arguments;
}

}  // namespace TestSupport
