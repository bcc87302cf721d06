// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Trouble.h"

#include <stdexcept>

namespace DevSts {

namespace {

bool IsRate(double value) {
  return value >= 0 && value <= 1;
}

}  // namespace

TroubleMaker::TroubleMaker(const TroubleOptions& options)
    : _options(options), _generator(options.seed ? *options.seed : std::random_device{}()) {
  if (!IsRate(options.failRate) || !IsRate(options.dropRate)) {
    throw std::invalid_argument("a rate is a number from 0 to 1");
  }
}

Trouble TroubleMaker::Draw() {
  const std::lock_guard<std::mutex> lock(_mutex);
  // Both are always drawn, so that one rate does not change which requests the other one hits.
  const double drop = DrawShare();
  const double fail = DrawShare();
  if (drop < _options.dropRate) {
    return Trouble::DROP;
  }
  return fail < _options.failRate ? Trouble::FAIL : Trouble::NONE;
}

/// From 0 up to, but not including, 1. By hand, because the distributions of the standard library differ from
/// one implementation to the next and the same seed shall mean the same everywhere.
double TroubleMaker::DrawShare() {
  constexpr double kStep = 1.0 / (1ULL << 53);
  return static_cast<double>(_generator() >> 11) * kStep;
}

}  // namespace DevSts
