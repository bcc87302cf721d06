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

std::size_t FindCalls(double microsecondsEach) {
  return static_cast<std::size_t>(
      std::clamp(std::ceil(kSampleMicroseconds / std::max(microsecondsEach, 0.1)), 1.0, 10000.0));
}

std::size_t FindCallsPerSample(const Action& action, clockid_t clock) {
  return FindCalls(std::min(TimeOneCall(action, 1, clock), TimeOneCall(action, 1, clock)));
}

// On some machines another process's clock stands still now and then: a sample must not become minutes.
std::size_t FindCallsPerSample(const Contender& contender) {
  constexpr std::size_t kMaxCalls = 50;
  const double each = std::max({contender.time(1), contender.time(1), contender.time(1)});
  return std::min(FindCalls(each), kMaxCalls);
}

double Quantile(std::vector<double>& values, double part) {
  const auto at =
      values.begin() + static_cast<std::ptrdiff_t>(part * static_cast<double>(values.size() - 1) + 0.5);
  std::nth_element(values.begin(), at, values.end());
  return *at;
}

class RowTimer final {
 public:
  explicit RowTimer(const Row& row)
      : _row(row),
        _clock(row.countsAllThreads ? CLOCK_PROCESS_CPUTIME_ID : CLOCK_THREAD_CPUTIME_ID),
        _subjectCalls(FindCallsPerSample(row.subject, _clock)),
        _floorCalls(FindCallsPerSample(row.floor, _clock)),
        _others(row.others.size()),
        _othersRatios(row.others.size()) {
    for (const Contender& other : row.others) {
      _othersCalls.push_back(FindCallsPerSample(other));
    }
  }

  void TakeSample() {
    _floors.push_back(TimeOneCall(_row.floor, _floorCalls, _clock));
    _subjects.push_back(TimeOneCall(_row.subject, _subjectCalls, _clock));
    _ratios.push_back(_subjects.back() / _floors.back());
    for (std::size_t i = 0; i < _others.size(); ++i) {
      _others[i].push_back(_row.others[i].time(_othersCalls[i]));
      _othersRatios[i].push_back(_others[i].back() / _subjects.back());
    }
  }

  Result GetResult() const {
    Result result{Summarise(_subjects), Summarise(_floors), Summarise(_ratios).median, {}, {}};
    for (std::size_t i = 0; i < _others.size(); ++i) {
      result.others.push_back(Summarise(_others[i]));
      result.othersRatios.push_back(Summarise(_othersRatios[i]).median);
    }
    return result;
  }

 private:
  const Row& _row;
  const clockid_t _clock;
  const std::size_t _subjectCalls;
  const std::size_t _floorCalls;
  std::vector<std::size_t> _othersCalls;
  std::vector<double> _subjects;
  std::vector<double> _floors;
  std::vector<double> _ratios;
  std::vector<std::vector<double>> _others;
  std::vector<std::vector<double>> _othersRatios;
};

}  // namespace

Figure Summarise(std::vector<double> samples) {
  const double median = Quantile(samples, 0.5);
  const double low = Quantile(samples, 0.25);
  return {median, (Quantile(samples, 0.75) - low) / 2 / median};
}

Contender MakeContender(const std::string& name, const Action& action) {
  return {name, [action](std::size_t calls) {
            return TimeOneCall(action, calls, CLOCK_THREAD_CPUTIME_ID);
          }};
}

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
