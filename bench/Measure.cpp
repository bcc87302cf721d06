// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/Measure.h"

#include <algorithm>
#include <cmath>
#include <ctime>
#include <stdexcept>

namespace Bench {

namespace {

// Long against the cost of reading the clock, short against the time between two changes of the processor's
// speed.
constexpr double kSampleMicroseconds = 2000;

double ReadMicroseconds(clockid_t clock) {
  timespec now = {};
  if (clock_gettime(clock, &now) != 0) {
    throw std::runtime_error("this system does not measure processor time");
  }
  return static_cast<double>(now.tv_sec) * 1e6 + static_cast<double>(now.tv_nsec) / 1e3;
}

// The first call is not counted: it finds the processor's caches and predictions full of another row's work,
// which is a matter of what was measured before and not of the row.
double TimeOneCall(const Action& action, std::size_t calls, clockid_t clock) {
  action();
  const double start = ReadMicroseconds(clock);
  for (std::size_t i = 0; i < calls; ++i) {
    action();
  }
  return (ReadMicroseconds(clock) - start) / static_cast<double>(calls);
}

std::size_t FindCallsPerSample(const Action& action, clockid_t clock) {
  const double once = std::min(TimeOneCall(action, 1, clock), TimeOneCall(action, 1, clock));
  return static_cast<std::size_t>(
      std::clamp(std::ceil(kSampleMicroseconds / std::max(once, 0.1)), 1.0, 10000.0));
}

double Median(std::vector<double> values) {
  const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
  std::nth_element(values.begin(), middle, values.end());
  return *middle;
}

class RowTimer final {
 public:
  explicit RowTimer(const Row& row)
      : _row(row),
        _clock(row.countsAllThreads ? CLOCK_PROCESS_CPUTIME_ID : CLOCK_THREAD_CPUTIME_ID),
        _subjectCalls(FindCallsPerSample(row.subject, _clock)),
        _floorCalls(FindCallsPerSample(row.floor, _clock)) {}

  void TakeSample() {
    _floors.push_back(TimeOneCall(_row.floor, _floorCalls, _clock));
    _subjects.push_back(TimeOneCall(_row.subject, _subjectCalls, _clock));
    _ratios.push_back(_subjects.back() / _floors.back());
  }

  Result GetResult() const { return {Median(_subjects), Median(_floors), Median(_ratios)}; }

 private:
  const Row& _row;
  const clockid_t _clock;
  const std::size_t _subjectCalls;
  const std::size_t _floorCalls;
  std::vector<double> _subjects;
  std::vector<double> _floors;
  std::vector<double> _ratios;
};

}  // namespace

std::vector<Result> MeasureInterleaved(const std::vector<Row>& rows, std::size_t rounds) {
  std::vector<RowTimer> timers(rows.begin(), rows.end());
  for (std::size_t round = 0; round < rounds; ++round) {
    for (RowTimer& timer : timers) {
      timer.TakeSample();
    }
  }
  std::vector<Result> results;
  for (const RowTimer& timer : timers) {
    results.push_back(timer.GetResult());
  }
  return results;
}

}  // namespace Bench
