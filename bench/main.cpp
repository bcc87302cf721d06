// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin_bench [--check] [--rounds N] [--directory DIRECTORY]: measures, and prints tables. With --check it
// exits with 1 when a ratio is beyond its limit. In the directory it leaves the tokens that it measured with,
// and its results as results.json.

#include "bench/AcquisitionRows.h"
#include "bench/LoadRows.h"
#include "bench/PeerSet.h"
#include "bench/Rows.h"
#include "bench/Scaling.h"
#include "bench/Tables.h"

#include "support/TemporaryDirectory.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <fstream>
#include <stdexcept>

namespace {

using namespace Bench;

constexpr std::size_t kDefaultRounds = 101;
constexpr std::size_t kMaxRounds = 100000;
/// Of the time that a further byte costs between the medium and a longer token, to that between the small and
/// the medium one.
constexpr double kLinearityLimit = 2;
/// Of what a second thread adds to the throughput, to what it adds to that of the floor.
constexpr double kScalingLimit = 0.6;
/// By the wall clock, and so at the mercy of whatever else runs.
constexpr std::size_t kMaxScalingRounds = 31;

struct Options {
  bool check = false;
  std::size_t rounds = kDefaultRounds;
  std::string directory;
};

bool ParseRounds(const char* text, std::size_t& rounds) {
  char* end = nullptr;
  const unsigned long long number = std::strtoull(text, &end, 10);
  rounds = static_cast<std::size_t>(number);
  return end != text && *end == '\0' && number > 0 && number <= kMaxRounds;
}

bool ParseOptions(int count, char** arguments, Options& options) {
  for (int i = 1; i < count; ++i) {
    if (std::strcmp(arguments[i], "--check") == 0) {
      options.check = true;
    } else if (std::strcmp(arguments[i], "--directory") == 0 && i + 1 < count) {
      options.directory = arguments[++i];
    } else if (std::strcmp(arguments[i], "--rounds") != 0 || ++i == count ||
               !ParseRounds(arguments[i], options.rounds)) {
      return false;
    }
  }
  return true;
}

double NanosecondsPerByte(const Section& validation, const std::vector<Result>& results, std::size_t from,
                          std::size_t to) {
  const double bytes =
      static_cast<double>(validation.rows[to].bytes) - static_cast<double>(validation.rows[from].bytes);
  return (results[to].subject.median - results[from].subject.median) * 1000 / bytes;
}

/// Prints how the cost of validation grows with the size, and gives whether it grows no faster.
bool PrintGrowth(const Section& validation, const std::vector<Result>& results) {
  const double early = NanosecondsPerByte(validation, results, 0, 1);
  const double late = NanosecondsPerByte(validation, results, 1, 2);
  const double last = NanosecondsPerByte(validation, results, 2, 3);
  std::printf(
      "\nA further byte of a token costs %.2f ns up to 200 groups, %.2f ns from there to 5000 and %.2f ns from there to "
      "50000: %.2f and %.2f times as much.\n",
      early, late, last, late / early, last / early);
  return late / early <= kLinearityLimit && last / early <= kLinearityLimit;
}

bool AreWithinLimits(const Section& section, const std::vector<Result>& results) {
  bool within = true;
  for (std::size_t i = 0; i < section.rows.size(); ++i) {
    const Row& row = section.rows[i];
    // Written so that a ratio that is no number is a failure.
    if (!(results[i].ratio <= row.limit)) {
      std::printf("beyond its limit of %.2f: %s (%s)\n", row.limit, row.name.c_str(), section.title.c_str());
      within = false;
    }
    for (std::size_t other = 0; other < row.others.size(); ++other) {
      if (!(results[i].othersRatios[other] >= row.others[other].leastRatio)) {
        std::printf("less than %.2f times as slow as we are: %s (%s)\n", row.others[other].leastRatio,
                    row.others[other].name.c_str(), row.name.c_str());
        within = false;
      }
    }
  }
  return within;
}

bool AreWithinLimits(const std::vector<ScalingResult>& results) {
  bool within = true;
  for (const ScalingResult& result : results) {
    if (!(result.ratio.median >= kScalingLimit * result.floorsRatio)) {
      std::printf("two threads get less than %.2f of what they get done of the floor: %s\n", kScalingLimit,
                  result.name.c_str());
      within = false;
    }
  }
  return within;
}

void WriteResults(const std::string& path, const nlohmann::json& results) {
  std::ofstream file(path);
  file << results.dump(1) << '\n';
  file.close();
  if (!file) {
    throw std::runtime_error("cannot write " + path);
  }
}

/// All rows of all sections in one interleaved run, cut up by section again.
std::vector<std::vector<Result>> MeasureAll(const std::vector<Section>& sections, std::size_t rounds) {
  std::vector<Row> rows;
  for (const Section& section : sections) {
    rows.insert(rows.end(), section.rows.begin(), section.rows.end());
  }
  const std::vector<Result> results = MeasureInterleaved(rows, rounds);
  std::vector<std::vector<Result>> cut;
  auto next = results.begin();
  for (const Section& section : sections) {
    const auto end = next + static_cast<std::ptrdiff_t>(section.rows.size());
    cut.emplace_back(next, end);
    next = end;
  }
  return cut;
}

int Run(const Options& options) {
  const TestSupport::TemporaryDirectory temporary;
  const std::string directory = options.directory.empty() ? temporary.GetPath() : options.directory;
  // First, because they must be made before there are threads.
  ServiceProcess service;
  const Section https = MakeHttpsSection();
  const Section acquisitions = MakeAcquisitionSection();
  const PeerSet peers(directory);
  const std::vector<Section> sections = {MakeValidationSection(peers),
                                         MakeStepsSection(),
                                         MakeSignedRequestsSection(),
                                         MakeUnsignedRequestsSection(),
                                         https,
                                         acquisitions};
  const std::vector<std::vector<Result>> results = MeasureAll(sections, options.rounds);
  const std::vector<ScalingResult> scaling = MeasureScaling(std::min(options.rounds, kMaxScalingRounds));
  const std::vector<CallersResult> callers = MeasureCallers();

  nlohmann::json report = {{"rounds", options.rounds}, {"absent", peers.GetAbsent()}};
  std::printf(
      "Medians of %zu rounds, processor time; the spread is half of the distance between the quartiles.\n",
      options.rounds);
  for (std::size_t i = 0; i < sections.size(); ++i) {
    PrintSection(sections[i], results[i]);
    PrintOthers(sections[i], results[i]);
    report["sections"].push_back(ToJson(sections[i], results[i]));
  }
  for (const std::string& absent : peers.GetAbsent()) {
    std::printf("\n%s\n", absent.c_str());
  }
  bool within = PrintGrowth(sections.front(), results.front());
  PrintScaling(scaling);
  PrintCallers(callers);
  report["scaling"] = ToJson(scaling);
  report["callers"] = ToJson(callers);
  PrintLoad(service);
  WriteResults(directory + "/results.json", report);
  if (!options.check) {
    return EXIT_SUCCESS;
  }
  std::printf("\n");
  if (!within) {
    std::printf("beyond its limit of %.2f: the growth of the cost of a byte\n", kLinearityLimit);
  }
  for (std::size_t i = 0; i < sections.size(); ++i) {
    within = AreWithinLimits(sections[i], results[i]) && within;
  }
  within = AreWithinLimits(scaling) && within;
  if (within) {
    std::printf("every ratio is within its limit\n");
  }
  return within ? EXIT_SUCCESS : EXIT_FAILURE;
}

}  // namespace

int main(int count, char** arguments) {
  // Also in a pipe, through which somebody watches.
  std::setvbuf(stdout, nullptr, _IOLBF, BUFSIZ);
  Options options;
  if (!ParseOptions(count, arguments, options)) {
    std::fprintf(stderr, "usage: quorlin_bench [--check] [--rounds N] [--directory DIRECTORY]\n");
    return 2;
  }
  try {
    return Run(options);
  } catch (const std::exception& e) {
    std::fprintf(stderr, "quorlin_bench: %s\n", e.what());
    return EXIT_FAILURE;
  }
}
