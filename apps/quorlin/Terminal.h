// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Text for people.

#ifndef QUORLIN_CLI_TERMINAL_H
#define QUORLIN_CLI_TERMINAL_H

#include <cstddef>
#include <string>

namespace Cli {

/// `text` with everything that could steer a terminal or turn the writing direction shown as <U+XXXX>, and
/// bytes that are no UTF-8 as <XX>. Tokens and answers may hold anything that XML can carry.
std::string MakePrintable(const std::string& text);

/// `text`, or when it has more than `maxBytes` bytes its start, in whole characters of UTF-8, and "...".
std::string CutText(const std::string& text, std::size_t maxBytes);

/// A span of microseconds in the two largest units that say something: "9 min 58 s", "3 h 20 min", "2 d".
std::string DescribeSpan(long long microseconds);

/// A running time: "37 ms" or "1.4 s".
std::string DescribeElapsed(double seconds);

}  // namespace Cli

#endif  // QUORLIN_CLI_TERMINAL_H
