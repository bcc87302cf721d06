// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/service/LogEscape.h"

#include "pelmar/core/Utf8.h"

#include <cstddef>

namespace Pelmar {
namespace Service {

namespace {

bool IsHarmful(char32_t c) {
  return c < 0x20 || (c >= 0x7F && c <= 0x9F) || c == 0x2028 || c == 0x2029;
}

void AppendEscaped(std::string& line, char c) {
  static const char kDigits[] = "0123456789abcdef";
  const unsigned int byte = static_cast<unsigned char>(c);
  line += "\\x";
  line += kDigits[byte >> 4];
  line += kDigits[byte & 0x0Fu];
}

}  // namespace

std::string EscapeForLog(const std::string& text) {
  std::string line;
  line.reserve(text.size());
  for (std::size_t position = 0; position < text.size();) {
    char32_t character = 0;
    const std::size_t length = ReadUtf8(text, position, character);
    if (length != 0 && !IsHarmful(character)) {
      line.append(text, position, length);
      position += length;
      continue;
    }
    const std::size_t end = position + (length == 0 ? 1 : length);
    for (; position < end; ++position) {
      AppendEscaped(line, text[position]);
    }
  }
  return line;
}

}  // namespace Service
}  // namespace Pelmar
