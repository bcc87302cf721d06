// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// How an operation that was cancelled is told from one that failed.

#ifndef QUORLIN_CANCELLATION_H
#define QUORLIN_CANCELLATION_H

namespace Quorlin {

/// The message of the CommunicationException that a cancelled operation ends with. There is no class for it,
/// so the text alone tells it from the others.
constexpr const char* kCancelledText = "The operation was cancelled.";

}  // namespace Quorlin

#endif  // QUORLIN_CANCELLATION_H
