// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The way from an operation to the metrics that the host has installed.

#ifndef QUORLIN_OPERATIONREPORTS_H
#define QUORLIN_OPERATIONREPORTS_H

#include <quorlin/OperationMetrics.h>

namespace Quorlin {

/// Tells the installed metrics, if there are any. Without them it is one atomic load.
void ReportOperation(const OperationReport& report) noexcept;

}  // namespace Quorlin

#endif  // QUORLIN_OPERATIONREPORTS_H
