// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/Scaling.h"

#include "bench/Floors.h"
#include "bench/Tokens.h"

#include <quorlin/SamlToken.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <thread>

namespace Bench {

namespace {

using Clock = std::chrono::steady_clock;

/// Long against the start of a thread.
constexpr double kSampleMicroseconds = 20000;

void Repeat(const Action& action, std::size_t calls) {
  for (std::size_t i = 0; i < calls; ++i) {
    action();
  }
}

double MicrosecondsSince(Clock::time_point start) {
  return std::chrono::duration<double, std::micro>(Clock::now() - start).count();
}

double TimeOneThread(const Action& action, std::size_t calls) {
  action();
  const Clock::time_point start = Clock::now();
  Repeat(action, calls);
  return MicrosecondsSince(start) / static_cast<double>(calls);
}

/// Both threads make the same number of calls; the time is that of the later one.
double TimeTwoThreads(const Action& here, const Action& there, std::size_t calls) {
  std::atomic<bool> ready{false};
  std::atomic<bool> go{false};
  std::thread other([&] {
    there();
    ready = true;
    while (!go) {
    }
    Repeat(there, calls);
  });
  here();
  while (!ready) {
  }
  const Clock::time_point start = Clock::now();
  go = true;
  Repeat(here, calls);
  other.join();
  return MicrosecondsSince(start) / static_cast<double>(calls);
}

/// One piece of work, with a copy for each thread.
class Scaler final {
 public:
  Scaler(const Action& here, const Action& there)
      : _here(here),
        _there(there),
        _calls(static_cast<std::size_t>(std::max(1.0, kSampleMicroseconds / TimeOneThread(here, 1)))) {}

  void TakeSample() {
    _one.push_back(TimeOneThread(_here, _calls));
    _two.push_back(TimeTwoThreads(_here, _there, _calls));
    _ratio.push_back(2 * _one.back() / _two.back());
  }

  Figure GetOne() const { return Summarise(_one); }
  Figure GetTwo() const { return Summarise(_two); }
  Figure GetRatio() const { return Summarise(_ratio); }

 private:
  const Action _here;
  const Action _there;
  const std::size_t _calls;
  std::vector<double> _one;
  std::vector<double> _two;
  std::vector<double> _ratio;
};

Scaler MakeSubject(const SampleToken& token) {
  const Action validate = [&token] {
    Quorlin::CreateSamlToken(token.text, token.trusted);
  };
  return Scaler(validate, validate);
}

Action MakeFloor(const SampleToken& token) {
  return DoAll(
      {VerifyWithRsa(TestSupport::TokenSigner().keyPair), HashText(token.text), TokeniseText(token.text)});
}

}  // namespace

std::vector<ScalingResult> MeasureScaling(std::size_t rounds) {
  const SampleTokens& tokens = GetSampleTokens();
  std::vector<ScalingResult> results;
  for (const SampleToken* const token : {&tokens.small, &tokens.medium, &tokens.large}) {
    Scaler subject = MakeSubject(*token);
    Scaler floor(MakeFloor(*token), MakeFloor(*token));
    for (std::size_t round = 0; round < rounds; ++round) {
      subject.TakeSample();
      floor.TakeSample();
    }
    results.push_back(
        {token->name, subject.GetOne(), subject.GetTwo(), subject.GetRatio(), floor.GetRatio().median});
  }
  return results;
}

}  // namespace Bench
