// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A request builder whose requests say which operation was called with which arguments.

#ifndef QUORLIN_TESTS_SUPPORT_FAKEREQUESTBUILDER_H
#define QUORLIN_TESTS_SUPPORT_FAKEREQUESTBUILDER_H

#include <pelmar/Exception.h>

#include <memory>
#include <string>
#include <vector>

#include "quorlin/RequestBuilder.h"

namespace TestSupport {

/// The action of each request is the operation's name, the body its arguments, separated by "|": texts as
/// they are, a spec as its description, a token by its id, a leg as the text of its bytes.
class FakeRequestBuilder final : public Quorlin::RequestBuilder {
 public:
  /// From now on every operation throws a copy of `error`.
  void Fail(const Pelmar::Exception& error);

  void BuildUserPassTokenRequest(const std::string& userName, const std::string& password,
                                 const Quorlin::TokenSpec& spec, Quorlin::Request& request) const override;
  void BuildInitialSPNegoRequest(const Quorlin::TokenSpec& spec, const std::vector<unsigned char>& leg,
                                 Quorlin::Request& request) const override;
  void BuildContinuedSPNegoRequest(const std::string& contextId, const std::vector<unsigned char>& leg,
                                   Quorlin::Request& request) const override;
  void BuildCertificateTokenRequest(const Quorlin::TokenSpec& spec, Quorlin::Request& request) const override;
  void BuildExchangeTokenRequest(const Quorlin::SamlToken& token, const Quorlin::TokenSpec& spec,
                                 Quorlin::Request& request) const override;
  void BuildValidateSubjectRequest(const Quorlin::SamlToken& token, Quorlin::Request& request) const override;
  void BuildRenewRequest(const Quorlin::SamlToken& token, long long lifetimeSec,
                         Quorlin::Request& request) const override;

 private:
  void Fill(const char* operation, const std::string& arguments, Quorlin::Request& request) const;

  std::shared_ptr<const Pelmar::Exception> _error;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_FAKEREQUESTBUILDER_H
