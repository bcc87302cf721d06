// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/core/Utf8.h"

namespace Pelmar {

namespace {

struct Lead {
  std::size_t length;  // 0: no sequence begins with this byte.
  char32_t bits;       // What the lead byte contributes.
  char32_t smallest;   // Anything below has a shorter form.
};

Lead ReadLead(unsigned char byte) {
  if (byte < 0x80) {
    return {1, byte, 0};
  }
  if (byte >= 0xC0 && byte < 0xE0) {
    return {2, byte & 0x1Fu, 0x80};
  }
  if (byte >= 0xE0 && byte < 0xF0) {
    return {3, byte & 0x0Fu, 0x800};
  }
  if (byte >= 0xF0 && byte < 0xF8) {
    return {4, byte & 0x07u, 0x10000};
  }
  return {0, 0, 0};
}

bool IsScalarValue(char32_t character) {
  return character <= 0x10FFFF && !(character >= 0xD800 && character <= 0xDFFF);
}

}  // namespace

std::size_t ReadUtf8(const std::string& text, std::size_t position, char32_t& character) noexcept {
  const Lead lead = ReadLead(static_cast<unsigned char>(text[position]));
  if (lead.length == 0 || lead.length > text.size() - position) {
    return 0;
  }
  char32_t value = lead.bits;
  for (std::size_t i = 1; i < lead.length; ++i) {
    const unsigned char byte = static_cast<unsigned char>(text[position + i]);
    if ((byte & 0xC0u) != 0x80u) {
      return 0;
    }
    value = (value << 6) | (byte & 0x3Fu);
  }
  if (value < lead.smallest || !IsScalarValue(value)) {
    return 0;
  }
  character = value;
  return lead.length;
}

}  // namespace Pelmar
