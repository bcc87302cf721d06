// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin_bench [--check] [--rounds N]: measures, and prints a table. With --check it exits with 1 when a
// ratio is beyond its limit.

#include "bench/LoadRows.h"
#include "bench/Rows.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>

namespace {

using namespace Bench;

constexpr std::size_t kDefaultRounds = 101;
constexpr std::size_t kMaxRounds = 100000;
/// Of the time that a further byte costs between the medium and the large token, to that between the small
/// and the medium one.
constexpr double kLinearityLimit = 2;

struct Options {
  bool check = false;
  std::size_t rounds = kDefaultRounds;
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
    } else if (std::strcmp(arguments[i], "--rounds") != 0 || ++i == count ||
               !ParseRounds(arguments[i], options.rounds)) {
      return false;
    }
  }
  return true;
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
  const bool reached =
      row.aim > 0 ? result.ratio <= row.aim : result.subjectMicroseconds < row.aimMicroseconds;
  return reached ? "yes" : "NO";
}

void PrintSection(const Section& section, const std::vector<Result>& results) {
  std::printf("\n%s\n  %-37s %9s %11s %11s %7s %9s %s\n", section.title.c_str(), "", "bytes", "median us",
              "floor us", "ratio", "aim", "reached");
  for (std::size_t i = 0; i < section.rows.size(); ++i) {
    const Row& row = section.rows[i];
    const Result& result = results[i];
    std::printf("  %-37s %9zu %11.1f %11.1f %7.2f %9s %s\n", row.name.c_str(), row.bytes,
                result.subjectMicroseconds, result.floorMicroseconds, result.ratio, DescribeAim(row).c_str(),
                DescribeSuccess(row, result));
  }
}

double NanosecondsPerByte(const Section& validation, const std::vector<Result>& results, std::size_t from,
                          std::size_t to) {
  const double bytes =
      static_cast<double>(validation.rows[to].bytes) - static_cast<double>(validation.rows[from].bytes);
  return (results[to].subjectMicroseconds - results[from].subjectMicroseconds) * 1000 / bytes;
}

/// Prints how the cost of validation grows with the size, and gives whether it grows no faster.
bool PrintGrowth(const Section& validation, const std::vector<Result>& results) {
  const double early = NanosecondsPerByte(validation, results, 0, 1);
  const double late = NanosecondsPerByte(validation, results, 1, 2);
  std::printf(
      "\nA further byte of a token costs %.2f ns up to 200 groups, and %.2f ns from there to 5000: "
      "%.2f times as much.\n",
      early, late, late / early);
  return late / early <= kLinearityLimit;
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
  }
  return within;
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
  // First, because it must be made before there are threads.
  ServiceProcess service;
  const std::vector<Section> sections = {MakeValidationSection(), MakeStepsSection(),
                                         MakeSignedRequestsSection(), MakeUnsignedRequestsSection(),
                                         MakeHttpsSection()};
  const std::vector<std::vector<Result>> results = MeasureAll(sections, options.rounds);
  std::printf("Medians of %zu rounds, processor time.\n", options.rounds);
  for (std::size_t i = 0; i < sections.size(); ++i) {
    PrintSection(sections[i], results[i]);
  }
  bool within = PrintGrowth(sections.front(), results.front());
  PrintLoad(service);
  if (!options.check) {
    return EXIT_SUCCESS;
  }
  if (!within) {
    std::printf("beyond its limit of %.2f: the growth of the cost of a byte\n", kLinearityLimit);
  }
  for (std::size_t i = 0; i < sections.size(); ++i) {
    within = AreWithinLimits(sections[i], results[i]) && within;
  }
  return within ? EXIT_SUCCESS : EXIT_FAILURE;
}

}  // namespace

int main(int count, char** arguments) {
  Options options;
  if (!ParseOptions(count, arguments, options)) {
    std::fprintf(stderr, "usage: quorlin_bench [--check] [--rounds N]\n");
    return 2;
  }
  try {
    return Run(options);
  } catch (const std::exception& e) {
    std::fprintf(stderr, "quorlin_bench: %s\n", e.what());
    return EXIT_FAILURE;
  }
}
