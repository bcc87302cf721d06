// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/doctor/Examination.h"

#include <arpa/inet.h>

namespace Cli {
namespace Doctor {

namespace {

Outcome Make(Status status, const std::string& found) {
  Outcome outcome;
  outcome.status = status;
  outcome.found = found;
  return outcome;
}

}  // namespace

Outcome Pass(const std::string& found) {
  return Make(Status::PASSED, found);
}

Outcome Skip(const std::string& found) {
  return Make(Status::SKIPPED, found);
}

Outcome Warn(const std::string& found, const std::string& advice) {
  Outcome outcome = Make(Status::WARNING, found);
  outcome.advice = advice;
  return outcome;
}

Outcome Fail(ExitCode exitCode, const std::string& found, const std::string& advice) {
  Outcome outcome = Make(Status::FAILED, found);
  outcome.advice = advice;
  outcome.exitCode = exitCode;
  return outcome;
}

bool IsAddress(const std::string& host) {
  in6_addr bytes;
  return inet_pton(AF_INET, host.c_str(), &bytes) == 1 || inet_pton(AF_INET6, host.c_str(), &bytes) == 1;
}

std::string GetEndpoint(const Patient& patient) {
  const std::string& host = patient.parts.host;
  return (host.find(':') == std::string::npos ? host : "[" + host + "]") + ":" +
         std::to_string(patient.parts.port);
}

std::string DescribeTimeout(const Patient& patient) {
  return std::to_string(patient.timeout.count()) + " s";
}

}  // namespace Doctor
}  // namespace Cli
