// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/TextPlace.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace Pelmar {
namespace Xml {

namespace {

bool Contains(const char* text, std::size_t size, char byte) noexcept {
  return std::memchr(text, byte, size) != nullptr;
}

// Every byte of UTF-8 begins a character but those of the form 10xxxxxx.
bool ContinuesCharacter(char byte) noexcept {
  return (static_cast<unsigned char>(byte) & 0xC0u) == 0x80u;
}

// The same for eight bytes at once: how many of them continue a character.
unsigned long CountContinuations(const char* text) noexcept {
  constexpr std::uint64_t kLowBits = 0x0101010101010101u;
  std::uint64_t bytes = 0;
  std::memcpy(&bytes, text, sizeof(bytes));
  const std::uint64_t marks = (bytes >> 7) & ~(bytes >> 6) & kLowBits;
  // The product's highest byte is the sum of all bytes.
  return static_cast<unsigned long>((marks * kLowBits) >> 56);
}

unsigned long CountCharacters(const char* text, std::size_t size) noexcept {
  unsigned long continuations = 0;
  std::size_t i = 0;
  for (; size - i >= sizeof(std::uint64_t); i += sizeof(std::uint64_t)) {
    continuations += CountContinuations(text + i);
  }
  for (; i < size; ++i) {
    continuations += ContinuesCharacter(text[i]) ? 1 : 0;
  }
  return size - continuations;
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
