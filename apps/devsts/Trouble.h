// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Failures on demand, for those who want to see how their client takes them.

#ifndef QUORLIN_DEVSTS_TROUBLE_H
#define QUORLIN_DEVSTS_TROUBLE_H

#include <cstdint>
#include <mutex>
#include <optional>
#include <random>

namespace DevSts {

/// Rates are shares of the requests, from 0 (none) to 1 (all).
struct TroubleOptions {
  double failRate = 0;  ///< Answered by a fault soapenv:Server.
  double dropRate = 0;  ///< Not answered: the connection is closed. Drawn first.
  /// Who gives the same seed meets the same trouble again. Absent: another one each time.
  std::optional<std::uint64_t> seed;
};

enum class Trouble { NONE, FAIL, DROP };

/// Draws what is to happen to each request. Safe to use from any thread.
class TroubleMaker final {
 public:
  /// Throws std::invalid_argument for rates that are none.
  explicit TroubleMaker(const TroubleOptions& options);

  Trouble Draw();

 private:
  double DrawShare();

  TroubleOptions _options;
  std::mutex _mutex;
  std::mt19937_64 _generator;  // Guarded by the mutex.
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_TROUBLE_H
