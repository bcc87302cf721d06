// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Strict reading of UTF-8, one character at a time.

#ifndef PELMAR_CORE_UTF8_H
#define PELMAR_CORE_UTF8_H

#include <cstddef>
#include <string>

namespace Pelmar {

/// Reads the character of `text` that begins at `position` (which must be below the size). Gives its length
/// in bytes and stores it into `character`; gives 0 where the bytes are not well-formed (Unicode 15, table
/// 3-7: no overlong form, no surrogate, nothing beyond U+10FFFF, no truncated sequence).
std::size_t ReadUtf8(const std::string& text, std::size_t position, char32_t& character) noexcept;

}  // namespace Pelmar

#endif  // PELMAR_CORE_UTF8_H
