// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/RequestLog.h"

#include "devsts/Clock.h"

#include <nlohmann/json.hpp>

namespace DevSts {

void RequestRecord::SetAnswer(int status, const std::string& fault, const std::string& reason) {
  _status = status;
  _fault = fault;
  _reason = reason;
}

std::string RequestRecord::ToJson(long long now) const {
  nlohmann::ordered_json line;
  line["time"] = ToDateText(now);
  line["operation"] = _operation.empty() ? nlohmann::ordered_json() : nlohmann::ordered_json(_operation);
  line["user"] = _user.empty() ? nlohmann::ordered_json() : nlohmann::ordered_json(_user);
  line["passed"] = _passed;
  if (!_failed.empty()) {
    line["failed"] = _failed;
  }
  line["status"] = _status;
  if (!_fault.empty()) {
    line["fault"] = _fault;
  }
  if (!_reason.empty()) {
    line["reason"] = _reason;
  }
  // The reason may quote names from the request; whatever they hold, this stays one line of ASCII.
  return line.dump(-1, ' ', true, nlohmann::ordered_json::error_handler_t::replace);
}

}  // namespace DevSts
