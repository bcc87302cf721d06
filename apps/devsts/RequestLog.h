// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// One line of JSON for each request: what was asked, what was checked, what was answered. Never a password, a
// key or a token.

#ifndef QUORLIN_DEVSTS_REQUESTLOG_H
#define QUORLIN_DEVSTS_REQUESTLOG_H

#include "devsts/Assertion.h"
#include "devsts/TokenRequest.h"

#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace DevSts {

/// Takes a line without its line feed. Called from several threads at once.
using LogSink = std::function<void(const std::string& line)>;

/// Collects what happened to one request.
class RequestRecord final {
 public:
  /// `operation`: "issue", "renew", ...
  void SetOperation(const std::string& operation) { _operation = operation; }
  /// Only for users of the directory: an unknown name may be a password typed into the wrong field.
  void SetUser(const std::string& upn) { _user = upn; }
  /// A check that passed.
  void AddPassed(const std::string& check) { _passed.push_back(check); }
  /// A check that failed without the request failing with it.
  void AddFailed(const std::string& check) { _failed.push_back(check); }
  /// What the client wishes for. Of texts only how many there are.
  void SetAsked(const TokenRequest& request);
  /// What the token is that the client gets.
  void SetGranted(const AssertionContent& content);
  /// The HTTP status and what the answer is: "token", "challenge", "valid", "invalid", "fault", "refusal" of
  /// what is no SOAP, or "none".
  void SetAnswer(int status, const std::string& answer);
  /// Why the answer is not what was asked for; `fault` is empty unless it is one.
  void SetReason(const std::string& fault, const std::string& reason);

  std::string ToJson(long long now) const;

 private:
  std::string _operation;
  std::string _user;
  std::vector<std::string> _passed;
  std::vector<std::string> _failed;
  std::optional<TokenRequest> _asked;
  std::optional<AssertionContent> _granted;
  int _status = 0;
  std::string _answer;
  std::string _fault;
  std::string _reason;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_REQUESTLOG_H
