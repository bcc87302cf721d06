// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/TextPlace.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace Pelmar {
namespace Xml {

namespace {

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

// Whether no byte has its highest bit set.
bool IsAllAscii(std::string_view text) noexcept {
  constexpr std::uint64_t kHighBits = 0x8080808080808080u;
  std::uint64_t all = 0;
  std::size_t i = 0;
  for (; text.size() - i >= sizeof(all); i += sizeof(all)) {
    std::uint64_t bytes = 0;
    std::memcpy(&bytes, text.data() + i, sizeof(bytes));
    all |= bytes;
  }
  for (; i < text.size(); ++i) {
    all |= static_cast<unsigned char>(text[i]);
  }
  return (all & kHighBits) == 0;
}

}  // namespace

TextPlace::TextPlace(std::string_view text) noexcept
    : _at(text.data()),
      _end(text.data() + text.size()),
      _isAscii(IsAllAscii(text)),
      _nextLineFeed(FindNext('\n')),
      _nextReturn(FindNext('\r')) {}

void TextPlace::AdvanceTo(const char* place) noexcept {
  const bool isOnThisLine = place <= _nextLineFeed && place <= _nextReturn;
  if (isOnThisLine) {
    _column += CountCharacters(_at, place);
  } else {
    AdvanceOverLines(place);
  }
  _at = place;
  if (_nextLineFeed < place) {
    _nextLineFeed = FindNext('\n');
  }
  if (_nextReturn < place) {
    _nextReturn = FindNext('\r');
  }
}

// The end of the text when there is none.
const char* TextPlace::FindNext(char byte) const noexcept {
  if (_at == _end) {
    return _end;
  }
  const void* const found = std::memchr(_at, byte, static_cast<std::size_t>(_end - _at));
  return found != nullptr ? static_cast<const char*>(found) : _end;
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
  _column = 1 + CountCharacters(lineStart, place);
}

unsigned long TextPlace::CountCharacters(const char* first, const char* last) const noexcept {
  const std::size_t size = static_cast<std::size_t>(last - first);
  if (_isAscii) {
    return size;
  }
  unsigned long continuations = 0;
  std::size_t i = 0;
  for (; size - i >= sizeof(std::uint64_t); i += sizeof(std::uint64_t)) {
    continuations += CountContinuations(first + i);
  }
  for (; i < size; ++i) {
    continuations += ContinuesCharacter(first[i]) ? 1 : 0;
  }
  return size - continuations;
}

}  // namespace Xml
}  // namespace Pelmar
