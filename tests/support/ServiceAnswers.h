// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Answers of a token service, made of the data in tests/vectors/responses.

#ifndef QUORLIN_TESTS_SUPPORT_SERVICEANSWERS_H
#define QUORLIN_TESTS_SUPPORT_SERVICEANSWERS_H

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>

#include <list>
#include <string>
#include <vector>

namespace TestSupport {

/// The content of a file below tests/vectors/responses. Throws std::runtime_error when it cannot be read.
std::string ReadResponseVector(const std::string& name);

/// The lines of an expected.txt, split at tabs; "\n" in a field is a line feed.
std::vector<std::vector<std::string>> ReadExpectations(const std::string& name);

/// "valid", "expired" or "tampered": the text of that signed token.
std::string SignedToken(const std::string& name);
/// Trusts the signer of these tokens.
std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> TrustedSigner();

/// Answers that carry `token`.
std::string IssueAnswer(const std::string& token);
std::string RenewAnswer(const std::string& token);
std::string ValidateAnswer(bool isValid);
/// A round of a negotiation that goes on; `leg` is the text of its bytes.
std::string ChallengeAnswer(const std::string& contextId, const std::string& leg);
/// The last round; an empty leg is left out.
std::string FinalAnswer(const std::string& contextId, const std::string& leg, const std::string& token);
std::string FaultAnswer(const std::string& code, const std::string& text);

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_SERVICEANSWERS_H
