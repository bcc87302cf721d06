// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/TextPlace.h"

#include <cstddef>
#include <cstring>

namespace Pelmar {
namespace Xml {

namespace {

bool Contains(const char* text, std::size_t size, char byte) noexcept {
  return std::memchr(text, byte, size) != nullptr;
}

// Every byte of UTF-8 begins a character but those of the form 10xxxxxx. A loop that the compiler turns into vector code.
unsigned long CountCharacters(const char* text, std::size_t size) noexcept {
  unsigned long count = 0;
  for (std::size_t i = 0; i < size; ++i) {
    count += (static_cast<unsigned char>(text[i]) & 0xC0u) != 0x80u ? 1 : 0;
  }
  return count;
}

}  // namespace

void TextPlace::AdvanceTo(const char* place) noexcept {
  const std::size_t size = static_cast<std::size_t>(place - _at);
  if (Contains(_at, size, '\n') || Contains(_at, size, '\r')) {
    AdvanceOverLines(place);
  } else {
    _column += CountCharacters(_at, size);
  }
  _at = place;
}

void TextPlace::AdvanceOverLines(const char* place) noexcept {
  const char* lineStart = _at;
  for (const char* p = _at; p != place; ++p) {
    const bool endsLine = *p == '\n' || (*p == '\r' && !(p + 1 != place && p[1] == '\n'));
    if (endsLine) {
      ++_line;
      lineStart = p + 1;
    }
  }
  _column = 1 + CountCharacters(lineStart, static_cast<std::size_t>(place - lineStart));
}

}  // namespace Xml
}  // namespace Pelmar
