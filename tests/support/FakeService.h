// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A service object on fakes.

#ifndef QUORLIN_TESTS_SUPPORT_FAKESERVICE_H
#define QUORLIN_TESTS_SUPPORT_FAKESERVICE_H

#include <quorlin/SecurityTokenService.h>

#include <boost/shared_ptr.hpp>

#include <functional>
#include <string>
#include <vector>

#include "support/CountingSamlToken.h"
#include "support/FakeRequestBuilder.h"
#include "support/FakeTransport.h"
#include "support/ScriptedNegotiationHandler.h"

namespace TestSupport {

/// A real service object with the real response handler, which trusts the signer of the test tokens, on a
/// fake request builder and a fake transport; and arguments for its operations.
struct FakeService {
  FakeService();

  boost::shared_ptr<FakeRequestBuilder> builder;
  boost::shared_ptr<FakeTransport> transport;
  boost::shared_ptr<const Quorlin::SecurityTokenService> service;

  Quorlin::TokenSpec spec;  ///< 300 seconds, for the audience "urn:a".
  boost::shared_ptr<CountingSamlToken> token;
  boost::shared_ptr<ScriptedNegotiationHandler> handler;  ///< Plans the leg "hello".
};

/// What `spec` and `token` of a FakeService are in log lines.
extern const char* const kFakeSpecText;
extern const char* const kFakeTokenText;
/// What the signed token "valid" is in log lines.
extern const char* const kValidTokenText;

/// One blocking operation, called with the arguments of a FakeService ("alice" and "pass-word" where it takes
/// a user, 600 seconds where a token is renewed).
struct OperationCase {
  const char* name;
  std::function<void(const FakeService&)> call;
  std::string request;    ///< What the fake transport records.
  std::string askedLine;  ///< The log line that tells what was asked.
  std::string answer;     ///< An answer with which it succeeds.
};

std::vector<OperationCase> AllOperations();

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_FAKESERVICE_H
