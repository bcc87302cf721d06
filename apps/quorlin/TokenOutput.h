// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Showing tokens.

#ifndef QUORLIN_CLI_TOKENOUTPUT_H
#define QUORLIN_CLI_TOKENOUTPUT_H

#include "quorlin/Failure.h"

#include <pelmar/system/DateTime.h>
#include <quorlin/SamlToken.h>

#include <nlohmann/json.hpp>

#include <string>

namespace Cli {

using Json = nlohmann::ordered_json;

/// {"valid":true,"token":{...}}: everything the token says, except its XML, of which there is the SHA-256.
/// Dates as DateTime prints them.
Json DescribeToken(const Quorlin::SamlToken& token);

/// {"valid":false,"error":{"type":...,"message":...}}, and "byPointer":true where the error was thrown so.
Json DescribeFailure(const Failure& failure);

/// One line of UTF-8; bytes that are none are replaced.
std::string ToText(const Json& json);

/// The same with everything beyond printable ASCII escaped: for texts of anybody, which could steer a
/// terminal.
std::string ToAsciiText(const Json& json);

/// Some lines for people, each ending in a line feed. `now` tells how long the token is still valid.
std::string SummarizeToken(const Quorlin::SamlToken& token, const Pelmar::System::DateTime& now);

}  // namespace Cli

#endif  // QUORLIN_CLI_TOKENOUTPUT_H
