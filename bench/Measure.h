// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Times pieces of work beside the work that nobody could do without, and beside others' ways of doing it, in
// one run.

#ifndef QUORLIN_BENCH_MEASURE_H
#define QUORLIN_BENCH_MEASURE_H

#include <cstddef>
#include <functional>
#include <string>
#include <vector>

namespace Bench {

using Action = std::function<void()>;

/// Somebody else's way of doing the work of a row.
struct Contender {
  std::string name;
  /// Does the work `calls` times, and once before, and gives the processor time of one of them in
  /// microseconds.
  std::function<double(std::size_t calls)> time;
  /// How many times as long as the subject it must take for `--check` to pass; 0: any.
  double leastRatio = 0;
  /// Written in C or C++, and checks what we check.
  bool isNativePeer = false;
};

/// One line of the table: a piece of work and what it is measured against.
struct Row {
  std::string name;
  std::size_t bytes;  ///< Of the text that is read or made.
  Action subject;
  Action floor;
  double limit;                   ///< The largest ratio of the subject to its floor that `--check` lets pass.
  double aim = 0;                 ///< The ratio we work for; 0: none.
  double aimMicroseconds = 0;     ///< The time we work for, on a machine of today; 0: none. Never checked.
  bool countsAllThreads = false;  ///< Both sides hand work to threads of their own.
  std::vector<Contender> others = {};
};

/// What is left of many samples.
struct Figure {
  double median;
  double spread;  ///< Half the distance between the quartiles, as a part of the median.
};

Figure Summarise(std::vector<double> samples);

/// Times are in microseconds. A ratio is the median of the rounds' ratios, so that a machine that changes its
/// speed in the middle changes both sides of it.
struct Result {
  Figure subject;
  Figure floor;
  double ratio;
  std::vector<Figure> others;
  std::vector<double> othersRatios;  ///< Of the others to the subject.
};

/// An action of this process as a contender.
Contender MakeContender(const std::string& name, const Action& action);

/// One result for each row. Every round goes through all rows and takes the floor, the subject and the others
/// right after each other. What is counted is the processor time of this thread, or of all threads of the
/// process for rows that ask for it, so that other work on the machine does not count.
std::vector<Result> MeasureInterleaved(const std::vector<Row>& rows, std::size_t rounds);

}  // namespace Bench

#endif  // QUORLIN_BENCH_MEASURE_H
