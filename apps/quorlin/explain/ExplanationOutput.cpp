// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Explanations for people and for programs.

#include "quorlin/Terminal.h"
#include "quorlin/explain/Explanation.h"

namespace Cli {

namespace {

const char* GetName(CheckState state) {
  switch (state) {
    case CheckState::PASSED:
      return "passed";
    case CheckState::FAILED:
      return "failed";
    default:
      return "not reached";
  }
}

std::string DescribePlace(const Place& place) {
  std::string text = place.path;
  if (place.line != 0) {
    text += (text.empty() ? "" : ", ") + ("line " + std::to_string(place.line));
    text += place.column == 0 ? "" : ", column " + std::to_string(place.column);
  }
  return text;
}

std::string Describe(const Check& check) {
  std::string text = std::string(GetName(check.state)) + ": " + check.name;
  text += (check.finding.empty() ? "" : ": " + MakePrintable(check.finding)) + "\n";
  if (check.state == CheckState::NOT_REACHED) {
    return text;
  }
  for (const std::string& detail : check.details) {
    text += "    " + MakePrintable(detail) + "\n";
  }
  if (check.state == CheckState::FAILED) {
    text += check.place ? "    at " + MakePrintable(DescribePlace(*check.place)) + "\n" : "";
    text += check.advice.empty() ? "" : "    " + check.advice + "\n";
  }
  return text;
}

Json DescribeForPrograms(const Check& check) {
  Json json = {{"name", check.name}, {"state", GetName(check.state)}};
  if (!check.finding.empty()) {
    json["finding"] = check.finding;
  }
  if (check.state != CheckState::NOT_REACHED && !check.data.empty()) {
    json["data"] = check.data;
  }
  if (check.state == CheckState::FAILED) {
    if (check.place) {
      json["place"] = {
          {"path", check.place->path}, {"line", check.place->line}, {"column", check.place->column}};
    }
    json["advice"] = check.advice;
  }
  return json;
}

}  // namespace

std::string DescribeExplanation(const Explanation& explanation) {
  std::string text;
  for (std::size_t i = 0; i < explanation.checks.size(); ++i) {
    text += std::to_string(i + 1) + ". " + Describe(explanation.checks[i]);
  }
  if (explanation.token) {
    return text + "The token is valid\n" +
           SummarizeToken(*explanation.token, Pelmar::System::GetUtcDateTime());
  }
  return text + "The token is refused: " + MakePrintable(explanation.failure->message) + " (" +
         explanation.failure->type + ")\n";
}

Json ToJson(const Explanation& explanation) {
  Json json = explanation.token ? DescribeToken(*explanation.token) : DescribeFailure(*explanation.failure);
  json["checks"] = Json::array();
  for (const Check& check : explanation.checks) {
    json["checks"].push_back(DescribeForPrograms(check));
  }
  return json;
}

}  // namespace Cli
