// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/Tables.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cstdio>

namespace Bench {

using Json = nlohmann::json;

namespace {

constexpr double kScalingAim = 1.9;
constexpr double kNativePeerAim = 5;

const char* Reached(bool reached) {
  return reached ? "yes" : "NO";
}

std::string DescribeAim(const Row& row) {
  char text[32] = "";
  if (row.aim > 0) {
    std::snprintf(text, sizeof(text), "<= %.2f", row.aim);
  } else if (row.aimMicroseconds > 0) {
    std::snprintf(text, sizeof(text), "< %.0f us", row.aimMicroseconds);
  }
  return text;
}

const char* DescribeSuccess(const Row& row, const Result& result) {
  if (row.aim <= 0 && row.aimMicroseconds <= 0) {
    return "";
  }
  return Reached(row.aim > 0 ? result.ratio <= row.aim : result.subject.median < row.aimMicroseconds);
}

void PrintContender(const std::string& name, const Figure& figure, const Result& result) {
  std::printf("  %-37s %11.1f %6.0f%% %11.2f %11.2f\n", name.c_str(), figure.median, figure.spread * 100,
              figure.median / result.floor.median, figure.median / result.subject.median);
}

/// How the fastest of the native peers that check what we check compares with the aim.
void PrintFastestNativePeer(const Row& row, const Result& result) {
  double fastest = 0;
  for (std::size_t i = 0; i < row.others.size(); ++i) {
    if (row.others[i].isNativePeer) {
      fastest = fastest == 0 ? result.othersRatios[i] : std::min(fastest, result.othersRatios[i]);
    }
  }
  if (fastest > 0) {
    std::printf(
        "  the fastest C or C++ peer that checks the chain: %.1f times ours, aim >= %.0f, reached: %s\n",
        fastest, kNativePeerAim, Reached(fastest >= kNativePeerAim));
  }
}

Json ToJson(const Figure& figure) {
  return {{"median", figure.median}, {"spread", figure.spread}};
}

}  // namespace

void PrintSection(const Section& section, const std::vector<Result>& results) {
  std::printf("\n%s\n  %-37s %9s %11s %7s %11s %7s %9s %s\n", section.title.c_str(), "", "bytes", "median us",
              "spread", "floor us", "ratio", "aim", "reached");
  for (std::size_t i = 0; i < section.rows.size(); ++i) {
    const Row& row = section.rows[i];
    const Result& result = results[i];
    std::printf("  %-37s %9zu %11.1f %6.0f%% %11.1f %7.2f %9s %s\n", row.name.c_str(), row.bytes,
                result.subject.median, result.subject.spread * 100, result.floor.median, result.ratio,
                DescribeAim(row).c_str(), DescribeSuccess(row, result));
  }
}

void PrintOthers(const Section& section, const std::vector<Result>& results) {
  for (std::size_t i = 0; i < section.rows.size(); ++i) {
    const Row& row = section.rows[i];
    if (row.others.empty()) {
      continue;
    }
    std::printf("\nOthers beside it: %s\n  %-37s %11s %7s %11s %11s\n", row.name.c_str(), "", "median us",
                "spread", "x the floor", "x ours");
    PrintContender(row.others.front().name, results[i].others.front(), results[i]);
    PrintContender("the floor", results[i].floor, results[i]);
    PrintContender("libquorlin", results[i].subject, results[i]);
    for (std::size_t other = 1; other < row.others.size(); ++other) {
      PrintContender(row.others[other].name, results[i].others[other], results[i]);
    }
    PrintFastestNativePeer(row, results[i]);
  }
}

void PrintScaling(const std::vector<ScalingResult>& results) {
  std::printf(
      "\nValidating in two threads at once, by the wall clock: how many times as many tokens as in one\n"
      "  %-37s %11s %11s %7s %7s %11s %9s %s\n",
      "", "one: us", "two: us", "ratio", "spread", "the floor's", "aim", "reached");
  for (const ScalingResult& result : results) {
    std::printf("  %-37s %11.1f %11.1f %7.2f %6.0f%% %11.2f %9s %s\n", result.name.c_str(), result.one.median,
                result.two.median, result.ratio.median, result.ratio.spread * 100, result.floorsRatio,
                ">= 1.90", Reached(result.ratio.median >= kScalingAim));
  }
}

void PrintCallers(const std::vector<CallersResult>& results) {
  std::printf(
      "\nAcquisitions over HTTPS with resumed handshakes in a second, by the wall clock, against libcurl alone and the "
      "validation\n  %-37s %11s %7s %11s %7s %7s\n",
      "callers", "a second", "spread", "libcurl's", "spread", "ratio");
  for (const CallersResult& result : results) {
    std::printf("  %-37zu %11.0f %6.0f%% %11.0f %6.0f%% %7.2f\n", result.callers, result.perSecond.median,
                result.perSecond.spread * 100, result.plainPerSecond.median,
                result.plainPerSecond.spread * 100, result.ratio);
  }
}

Json ToJson(const Section& section, const std::vector<Result>& results) {
  Json rows = Json::array();
  for (std::size_t i = 0; i < section.rows.size(); ++i) {
    const Row& row = section.rows[i];
    const Result& result = results[i];
    Json others = Json::array();
    for (std::size_t other = 0; other < row.others.size(); ++other) {
      others.push_back({{"name", row.others[other].name}, {"microseconds", ToJson(result.others[other])}});
    }
    rows.push_back({{"name", row.name},
                    {"bytes", row.bytes},
                    {"microseconds", ToJson(result.subject)},
                    {"floor", ToJson(result.floor)},
                    {"ratio", result.ratio},
                    {"aim", row.aim},
                    {"others", others}});
  }
  return {{"title", section.title}, {"rows", rows}};
}

Json ToJson(const std::vector<ScalingResult>& results) {
  Json rows = Json::array();
  for (const ScalingResult& result : results) {
    rows.push_back({{"name", result.name}, {"ratio", ToJson(result.ratio)}, {"floor", result.floorsRatio}});
  }
  return rows;
}

Json ToJson(const std::vector<CallersResult>& results) {
  Json rows = Json::array();
  for (const CallersResult& result : results) {
    rows.push_back({{"callers", result.callers},
                    {"perSecond", ToJson(result.perSecond)},
                    {"plainPerSecond", ToJson(result.plainPerSecond)}});
  }
  return rows;
}

}  // namespace Bench
