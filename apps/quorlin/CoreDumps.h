// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A crash leaves no file with the memory of this program behind.

#ifndef QUORLIN_CLI_COREDUMPS_H
#define QUORLIN_CLI_COREDUMPS_H

namespace Cli {

/// Switches core dumps off for this process and whatever it starts, and keeps other processes of the same
/// user from looking into its memory. False when the system refuses.
bool ForbidCoreDumps();

}  // namespace Cli

#endif  // QUORLIN_CLI_COREDUMPS_H
