// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/RequestLog.h"

#include "devsts/Clock.h"

#include <nlohmann/json.hpp>

namespace DevSts {

namespace {

using Json = nlohmann::ordered_json;

Json TextOrNull(const std::string& text) {
  return text.empty() ? Json() : Json(text);
}

const char* GetConfirmation(bool holderOfKey) {
  return holderOfKey ? "holder-of-key" : "bearer";
}

Json DescribeLifetime(const TokenRequest& request) {
  return request.lifetime == 0 ? Json() : Json(request.lifetime / kMicrosecondsPerSecond);
}

Json DescribeIssue(const TokenRequest& request) {
  Json asked;
  asked["confirmation"] = GetConfirmation(request.holderOfKey);
  asked["lifetimeSec"] = DescribeLifetime(request);
  asked["renewable"] = request.renewable;
  asked["delegable"] = request.delegable;
  asked["delegates"] = request.delegateTo.has_value();
  asked["audiences"] = request.audience.size();
  asked["advices"] = request.advice.size();
  return asked;
}

/// The other operations ask for nothing but themselves.
Json DescribeAsked(const TokenRequest& request) {
  if (request.operation == Operation::ISSUE) {
    return DescribeIssue(request);
  }
  return request.operation == Operation::RENEW ? Json{{"lifetimeSec", DescribeLifetime(request)}} : Json();
}

Json DescribeGranted(const AssertionContent& content) {
  Json granted;
  granted["confirmation"] = GetConfirmation(static_cast<bool>(content.confirmationCertificate));
  granted["lifetimeSec"] = (content.notOnOrAfter - content.notBefore) / kMicrosecondsPerSecond;
  return granted;
}

}  // namespace

void RequestRecord::SetAsked(const TokenRequest& request) {
  _asked = request;
}

void RequestRecord::SetGranted(const AssertionContent& content) {
  _granted = content;
}

void RequestRecord::SetAnswer(int status, const std::string& answer) {
  _status = status;
  _answer = answer;
}

void RequestRecord::SetReason(const std::string& fault, const std::string& reason) {
  _fault = fault;
  _reason = reason;
}

std::string RequestRecord::ToJson(long long now) const {
  Json line;
  line["time"] = ToDateText(now);
  line["operation"] = TextOrNull(_operation);
  line["user"] = TextOrNull(_user);
  line["asked"] = _asked ? DescribeAsked(*_asked) : Json();
  line["passed"] = _passed;
  if (!_failed.empty()) {
    line["failed"] = _failed;
  }
  line["status"] = _status == 0 ? Json() : Json(_status);
  line["answer"] = _answer;
  if (_answer == "token") {
    line["granted"] = DescribeGranted(*_granted);
  }
  if (!_fault.empty()) {
    line["fault"] = _fault;
  }
  if (!_reason.empty()) {
    line["reason"] = _reason;
  }
  // The reason may quote names from the request; whatever they hold, this stays one line of ASCII.
  return line.dump(-1, ' ', true, Json::error_handler_t::replace);
}

}  // namespace DevSts
