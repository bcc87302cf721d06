// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/doctor/Report.h"

#include "quorlin/Terminal.h"

#include <algorithm>

namespace Cli {
namespace Doctor {

namespace {

constexpr std::size_t kNameWidth = 13;
constexpr std::size_t kStatusWidth = 13;
/// For what is shown to people; a certificate may name a novel.
constexpr std::size_t kMaxLineBytes = 2000;

std::string Pad(const std::string& text, std::size_t width) {
  return text + std::string(width - std::min(width, text.size()), ' ');
}

std::string GetText(Status status) {
  switch (status) {
    case Status::PASSED:
      return "passed";
    case Status::WARNING:
      return "warning";
    case Status::FAILED:
      return "failed";
    case Status::SKIPPED:
      return "skipped";
    case Status::NOT_REACHED:
      break;
  }
  return "not reached";
}

bool WasTried(const Result& result) {
  return result.outcome.status != Status::SKIPPED && result.outcome.status != Status::NOT_REACHED;
}

std::string MakeLine(const std::string& text) {
  const std::string line = MakePrintable(CutText(text, kMaxLineBytes));
  return line.substr(0, line.find_last_not_of(' ') + 1) + "\n";
}

bool HasFailed(const Result& result) {
  return result.outcome.status == Status::FAILED;
}

bool HasWarned(const Result& result) {
  return result.outcome.status == Status::WARNING;
}

Json Describe(const Result& result) {
  const Outcome& outcome = result.outcome;
  Json json = {{"name", result.name}, {"status", GetText(outcome.status)}, {"found", outcome.found}};
  if (!outcome.details.empty()) {
    json["details"] = outcome.details;
  }
  if (!outcome.advice.empty()) {
    json["advice"] = outcome.advice;
  }
  if (WasTried(result)) {
    json["seconds"] = result.seconds;
  }
  json["data"] = outcome.data;
  return json;
}

}  // namespace

std::string PrintResult(const Result& result) {
  std::string lines =
      MakeLine("  " + Pad(result.name, kNameWidth) + Pad(GetText(result.outcome.status), kStatusWidth) +
               result.outcome.found + (WasTried(result) ? " (" + DescribeElapsed(result.seconds) + ")" : ""));
  for (const std::string& detail : result.outcome.details) {
    lines += MakeLine(std::string(2 + kNameWidth + kStatusWidth, ' ') + detail);
  }
  return lines;
}

std::string PrintConclusion(const std::vector<Result>& results) {
  const auto failed = std::find_if(results.begin(), results.end(), HasFailed);
  std::string lines =
      failed == results.end() ? "All checks passed" : "The check of " + failed->name + " failed";
  lines += std::any_of(results.begin(), results.end(), HasWarned) ? ", with a warning.\n" : ".\n";
  for (const Result& result : results) {
    if (!result.outcome.advice.empty()) {
      lines += MakeLine("What to do (" + result.name + "): " + result.outcome.advice);
    }
  }
  return lines;
}

Json DescribeResults(const std::string& url, const std::vector<Result>& results) {
  Json steps = Json::array();
  for (const Result& result : results) {
    steps.push_back(Describe(result));
  }
  return {
      {"url", url}, {"passed", std::none_of(results.begin(), results.end(), HasFailed)}, {"steps", steps}};
}

ExitCode GetExitCode(const std::vector<Result>& results) {
  const auto failed = std::find_if(results.begin(), results.end(), HasFailed);
  return failed == results.end() ? EXIT_DONE : failed->outcome.exitCode;
}

}  // namespace Doctor
}  // namespace Cli
