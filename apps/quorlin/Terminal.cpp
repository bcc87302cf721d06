// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Terminal.h"

#include <array>
#include <cmath>
#include <cstdio>

namespace Cli {

namespace {

struct Character {
  unsigned long code;
  std::size_t size;  ///< 0: no UTF-8.
};

bool IsContinuation(const std::string& text, std::size_t at) {
  return at < text.size() && (static_cast<unsigned char>(text[at]) & 0xC0) == 0x80;
}

std::size_t GetSequenceLength(unsigned char lead) {
  if (lead < 0x80) {
    return 1;
  }
  if (lead < 0xC2 || lead > 0xF4) {
    return 0;
  }
  return lead < 0xE0 ? 2 : lead < 0xF0 ? 3 : 4;
}

/// Overlong forms and surrogates are no UTF-8 (RFC 3629, section 3).
bool IsCanonical(unsigned long code, std::size_t size) {
  static constexpr std::array<unsigned long, 5> kLowest = {0, 0, 0x80, 0x800, 0x10000};
  return code >= kLowest[size] && code <= 0x10FFFF && (code < 0xD800 || code > 0xDFFF);
}

Character ReadCharacter(const std::string& text, std::size_t at) {
  static constexpr std::array<unsigned char, 5> kLeadMask = {0, 0x7F, 0x1F, 0x0F, 0x07};
  const unsigned char lead = static_cast<unsigned char>(text[at]);
  const std::size_t size = GetSequenceLength(lead);
  if (size == 0) {
    return {0, 0};
  }
  unsigned long code = lead & kLeadMask[size];
  for (std::size_t i = 1; i < size; ++i) {
    if (!IsContinuation(text, at + i)) {
      return {0, 0};
    }
    code = (code << 6) | (static_cast<unsigned char>(text[at + i]) & 0x3F);
  }
  return IsCanonical(code, size) ? Character{code, size} : Character{0, 0};
}

/// Control characters, line separators, and those that change the direction of writing or are not seen at
/// all.
bool IsSteering(unsigned long code) {
  return code < 0x20 || (code >= 0x7F && code <= 0x9F) || code == 0x061C ||
         (code >= 0x200B && code <= 0x200F) || (code >= 0x2028 && code <= 0x202E) ||
         (code >= 0x2060 && code <= 0x206F) || code == 0xFEFF || (code >= 0xFFF9 && code <= 0xFFFB);
}

std::string Format(const char* format, unsigned long value) {
  std::array<char, 16> text;
  std::snprintf(text.data(), text.size(), format, value);
  return text.data();
}

}  // namespace

std::string MakePrintable(const std::string& text) {
  std::string result;
  std::size_t at = 0;
  while (at < text.size()) {
    const Character character = ReadCharacter(text, at);
    if (character.size == 0) {
      result += Format("<%02lX>", static_cast<unsigned char>(text[at]));
      ++at;
      continue;
    }
    result +=
        IsSteering(character.code) ? Format("<U+%04lX>", character.code) : text.substr(at, character.size);
    at += character.size;
  }
  return result;
}

std::string CutText(const std::string& text, std::size_t maxBytes) {
  if (text.size() <= maxBytes) {
    return text;
  }
  std::size_t end = maxBytes;
  while (end > 0 && IsContinuation(text, end)) {
    --end;
  }
  return text.substr(0, end) + "...";
}

std::string DescribeSpan(long long microseconds) {
  const long long seconds = microseconds / 1000000;
  const std::array<long long, 4> counts = {seconds / 86400, seconds / 3600 % 24, seconds / 60 % 60,
                                           seconds % 60};
  static constexpr std::array<const char*, 4> kUnits = {" d", " h", " min", " s"};
  std::size_t first = 0;
  while (first < 3 && counts[first] == 0) {
    ++first;
  }
  std::string text = std::to_string(counts[first]) + kUnits[first];
  if (first < 3 && counts[first + 1] != 0) {
    text += " " + std::to_string(counts[first + 1]) + kUnits[first + 1];
  }
  return text;
}

std::string DescribeElapsed(double seconds) {
  std::array<char, 32> text;
  if (seconds < 1) {
    std::snprintf(text.data(), text.size(), "%.0f ms", std::ceil(seconds * 1000));
  } else {
    std::snprintf(text.data(), text.size(), "%.1f s", seconds);
  }
  return text.data();
}

}  // namespace Cli
