// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Terminal.h"
#include "quorlin/doctor/HttpDate.h"
#include "quorlin/doctor/Steps.h"

#include <algorithm>
#include <cstdlib>

namespace Cli {
namespace Doctor {

namespace {

constexpr long long kMicrosecondsPerSecond = 1000000;
/// What services and clients commonly allow for.
constexpr long long kMaxDifferenceSec = 5 * 60;
/// More than clocks differ by that are kept right.
constexpr long long kMaxUsualDifferenceSec = 30;

constexpr const char* kAdvice =
    "Set this machine's clock by NTP (or have the service's set, if that one is wrong): tokens would seem expired or not "
    "yet valid, and requests would be refused.";
constexpr const char* kEarlyAdvice = "Let both clocks be set by NTP before the difference grows.";

/// What one source says about the service's clock.
struct Reading {
  std::string source;
  long long differenceMicroseconds;  ///< Positive: the service's clock is ahead.
};

/// How far `time`, which stands for `precision` from there on, lies outside the span in which the service has
/// answered. The time on the way is no difference between clocks.
long long Compare(const Findings& findings, long long time, long long precision) {
  if (time > findings.answeredAt) {
    return time - findings.answeredAt;
  }
  return std::min(0LL, time + precision - findings.askedAt);
}

std::vector<Reading> Read(const Findings& findings) {
  std::vector<Reading> readings;
  std::string date;
  if (findings.response->GetHeader("Date", date)) {
    if (const std::optional<long long> time = ReadHttpDate(date)) {
      readings.push_back({"its Date header", Compare(findings, *time, kMicrosecondsPerSecond)});
    }
  }
  if (findings.answerCreated) {
    readings.push_back({"its Timestamp", Compare(findings, *findings.answerCreated, 0)});
  }
  return readings;
}

bool IsCloser(const Reading& a, const Reading& b) {
  return std::llabs(a.differenceMicroseconds) < std::llabs(b.differenceMicroseconds);
}

std::string Describe(const Reading& reading) {
  const long long difference = std::llabs(reading.differenceMicroseconds);
  if (difference < kMicrosecondsPerSecond) {
    return "the service's clock agrees with this machine's, by " + reading.source;
  }
  return "the service's clock is " + DescribeSpan(difference) +
         (reading.differenceMicroseconds > 0 ? " ahead of" : " behind") + " this machine's, by " +
         reading.source;
}

Outcome Judge(const Reading& reading) {
  const long long seconds = std::llabs(reading.differenceMicroseconds) / kMicrosecondsPerSecond;
  if (seconds > kMaxDifferenceSec) {
    return Fail(EXIT_REFUSED, Describe(reading), kAdvice);
  }
  return seconds > kMaxUsualDifferenceSec ? Warn(Describe(reading), kEarlyAdvice) : Pass(Describe(reading));
}

}  // namespace

Outcome CheckClock(const Patient&, Findings& findings) {
  const std::vector<Reading> readings = Read(findings);
  if (readings.empty()) {
    return Skip("the answer does not tell the service's time");
  }
  const Reading worst = *std::max_element(readings.begin(), readings.end(), IsCloser);
  Outcome outcome = Judge(worst);
  outcome.data["differenceSeconds"] = worst.differenceMicroseconds / kMicrosecondsPerSecond;
  outcome.data["source"] = worst.source == "its Timestamp" ? "Timestamp" : "Date";
  return outcome;
}

}  // namespace Doctor
}  // namespace Cli
