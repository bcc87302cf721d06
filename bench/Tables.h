// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What was measured, as text for people and as JSON for the page's charts.

#ifndef QUORLIN_BENCH_TABLES_H
#define QUORLIN_BENCH_TABLES_H

#include "bench/AcquisitionRows.h"
#include "bench/Measure.h"
#include "bench/Rows.h"
#include "bench/Scaling.h"

#include <nlohmann/json_fwd.hpp>

#include <vector>

namespace Bench {

void PrintSection(const Section& section, const std::vector<Result>& results);
/// For each row that has others: they, the floor and the subject below each other.
void PrintOthers(const Section& section, const std::vector<Result>& results);
void PrintScaling(const std::vector<ScalingResult>& results);
void PrintCallers(const std::vector<CallersResult>& results);

nlohmann::json ToJson(const Section& section, const std::vector<Result>& results);
nlohmann::json ToJson(const std::vector<ScalingResult>& results);
nlohmann::json ToJson(const std::vector<CallersResult>& results);

}  // namespace Bench

#endif  // QUORLIN_BENCH_TABLES_H
