// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Claims for people.

#ifndef QUORLIN_CLI_INSPECT_CLAIMSTEXT_H
#define QUORLIN_CLI_INSPECT_CLAIMSTEXT_H

#include "quorlin/TokenOutput.h"

#include <pelmar/system/DateTime.h>

#include <string>

namespace Cli {
namespace Inspect {

/// One line per claim, indented as they are nested, printable. Dates are followed by how far from `now` they
/// are.
std::string PrintClaims(const Json& claims, const Pelmar::System::DateTime& now);

}  // namespace Inspect
}  // namespace Cli

#endif  // QUORLIN_CLI_INSPECT_CLAIMSTEXT_H
