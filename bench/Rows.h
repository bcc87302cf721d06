// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The lines of the table.

#ifndef QUORLIN_BENCH_ROWS_H
#define QUORLIN_BENCH_ROWS_H

#include "bench/Measure.h"
#include "bench/PeerSet.h"

#include <string>
#include <vector>

namespace Bench {

/// Lines that belong together.
struct Section {
  std::string title;
  std::vector<Row> rows;
};

/// The first four rows are the small, the medium, the large and the huge token.
Section MakeValidationSection(const PeerSet& peers);
/// The same tokens through the single steps of validation.
Section MakeStepsSection();
Section MakeSignedRequestsSection();
Section MakeUnsignedRequestsSection();
/// Starts a server. Make it before anything starts a thread.
Section MakeHttpsSection();

}  // namespace Bench

#endif  // QUORLIN_BENCH_ROWS_H
