// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a person can do when the service cannot be reached.

#ifndef QUORLIN_CLI_CONNECTIONADVICE_H
#define QUORLIN_CLI_CONNECTIONADVICE_H

#include <string>

namespace Cli {

/// A sentence or two for the message of a CommunicationException. Never empty.
std::string AdviseOnConnection(const std::string& message);

}  // namespace Cli

#endif  // QUORLIN_CLI_CONNECTIONADVICE_H
