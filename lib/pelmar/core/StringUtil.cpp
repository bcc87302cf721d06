// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/StringUtil.h>

#include <pelmar/Exception.h>

#include "pelmar/core/Utf8.h"

#include <openssl/crypto.h>
#include <openssl/rand.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>

namespace Pelmar {
namespace StringUtil {

namespace {

constexpr std::size_t kUuidBytes = 16;

using Uuid = std::array<unsigned char, kUuidBytes>;

// RFC 4122, 4.4: the version goes into the high half of octet 6, the variant into the two high bits of
// octet 8.
void MarkAsRandom(Uuid& uuid) {
  uuid[6] = static_cast<unsigned char>((uuid[6] & 0x0Fu) | 0x40u);
  uuid[8] = static_cast<unsigned char>((uuid[8] & 0x3Fu) | 0x80u);
}

std::string FormatUuid(const Uuid& uuid) {
  static const char kDigits[] = "0123456789abcdef";
  std::string text;
  text.reserve(36);
  for (std::size_t i = 0; i < uuid.size(); ++i) {
    if (i == 4 || i == 6 || i == 8 || i == 10) {
      text += '-';
    }
    text += kDigits[uuid[i] >> 4];
    text += kDigits[uuid[i] & 0x0Fu];
  }
  return text;
}

char LowerAscii(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

char UpperAscii(char c) {
  return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
}

std::string MapEach(std::string text, char (*map)(char)) {
  std::transform(text.begin(), text.end(), text.begin(), map);
  return text;
}

// Eight bytes of ASCII without control characters, of which nearly all text consists: nothing is to be
// decided about them.
bool ArePlainAscii(const char* text) {
  constexpr std::uint64_t kEach = 0x0101010101010101u;
  std::uint64_t bytes = 0;
  std::memcpy(&bytes, text, sizeof(bytes));
  // With all high bits clear, subtracting 0x20 from each byte borrows, and so sets a high bit, exactly when
  // one of them is below that.
  return ((bytes | (bytes - kEach * 0x20)) & (kEach * 0x80)) == 0;
}

bool IsPlainAscii(char c) {
  return c >= 0x20 && static_cast<unsigned char>(c) < 0x80;
}

// XML 1.0, production 2 (Char), for what is already a Unicode scalar value.
bool IsXmlCharacter(char32_t c) {
  if (c < 0x20) {
    return c == 0x9 || c == 0xA || c == 0xD;
  }
  return c != 0xFFFE && c != 0xFFFF;
}

}  // namespace

std::string GenerateUuid() {
  Uuid uuid = {};
  if (RAND_bytes(uuid.data(), static_cast<int>(uuid.size())) != 1) {
    throw Exception("Unable to generate an identifier: the random generator failed");
  }
  MarkAsRandom(uuid);
  return FormatUuid(uuid);
}

std::string ToLower(const std::string& text) {
  return MapEach(text, LowerAscii);
}

std::string ToUpper(const std::string& text) {
  return MapEach(text, UpperAscii);
}

bool IsXmlText(const std::string& text) {
  std::size_t position = 0;
  while (position < text.size()) {
    if (text.size() - position >= sizeof(std::uint64_t) && ArePlainAscii(text.data() + position)) {
      position += sizeof(std::uint64_t);
      continue;
    }
    // Fewer than eight are left at the end of every text, and most texts are short.
    if (IsPlainAscii(text[position])) {
      ++position;
      continue;
    }
    char32_t character = 0;
    const std::size_t length = ReadUtf8(text, position, character);
    if (length == 0 || !IsXmlCharacter(character)) {
      return false;
    }
    position += length;
  }
  return true;
}

void Wipe(std::string& text) noexcept {
  // What a longer text left behind the end is wiped too; growing up to the capacity takes no new memory.
  text.resize(text.capacity());
  OPENSSL_cleanse(&text[0], text.size());
  text.clear();
}

}  // namespace StringUtil
}  // namespace Pelmar
