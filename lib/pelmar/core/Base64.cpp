// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>

#include <openssl/evp.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>

namespace Pelmar {
namespace StringUtil {

namespace {

constexpr std::size_t kBytesPerGroup = 3;
constexpr std::size_t kLettersPerGroup = 4;
// OpenSSL counts in int; longer input goes through in pieces of whole groups.
constexpr std::size_t kMaxGroupsPerCall = 1u << 20;

enum class ByteClass : unsigned char { OTHER, LETTER, WHITE_SPACE };

using ByteClasses = std::array<ByteClass, 256>;

constexpr void Mark(ByteClasses& classes, std::string_view bytes, ByteClass byteClass) {
  for (const char byte : bytes) {
    classes[static_cast<unsigned char>(byte)] = byteClass;
  }
}

// RFC 4648, section 4, and the white space of XML 1.0, production 3.
constexpr ByteClasses MakeByteClasses() {
  ByteClasses classes = {};
  Mark(classes, "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/", ByteClass::LETTER);
  Mark(classes, " \t\r\n", ByteClass::WHITE_SPACE);
  return classes;
}

constexpr ByteClasses kByteClasses = MakeByteClasses();

ByteClass ClassOf(char c) {
  return kByteClasses[static_cast<unsigned char>(c)];
}

bool IsBase64Letter(char c) {
  return ClassOf(c) == ByteClass::LETTER;
}

std::string RemoveWhiteSpace(const std::string& text) {
  std::string letters = text;
  const auto end = std::remove_if(letters.begin(), letters.end(),
                                  [](char c) { return ClassOf(c) == ByteClass::WHITE_SPACE; });
  letters.erase(end, letters.end());
  return letters;
}

/// How many "=" end `letters`; 0 to 2 count as padding, a third is an error like any other stray character.
std::size_t CountPadding(const std::string& letters) {
  const std::size_t size = letters.size();
  if (size == 0 || letters[size - 1] != '=') {
    return 0;
  }
  return letters[size - 2] == '=' ? 2 : 1;
}

// EVP_DecodeBlock is lenient about its surroundings, so the form is settled before it sees the text.
std::size_t RequireBase64Form(const std::string& letters) {
  if (letters.size() % kLettersPerGroup != 0) {
    throw Base64FormatException("Invalid base64 text: the length is not a multiple of four");
  }
  const std::size_t padding = CountPadding(letters);
  const auto end = letters.end() - static_cast<std::ptrdiff_t>(padding);
  if (!std::all_of(letters.begin(), end, IsBase64Letter)) {
    throw Base64FormatException("Invalid base64 text: unexpected character");
  }
  return padding;
}

void DecodeGroups(const std::string& letters, std::vector<unsigned char>& bytes) {
  const auto* const source = reinterpret_cast<const unsigned char*>(letters.data());
  const std::size_t groups = letters.size() / kLettersPerGroup;
  bytes.resize(groups * kBytesPerGroup);
  for (std::size_t group = 0; group < groups; group += kMaxGroupsPerCall) {
    const std::size_t count = std::min(kMaxGroupsPerCall, groups - group);
    const int written =
        EVP_DecodeBlock(bytes.data() + group * kBytesPerGroup, source + group * kLettersPerGroup,
                        static_cast<int>(count * kLettersPerGroup));
    if (written != static_cast<int>(count * kBytesPerGroup)) {
      throw Base64FormatException("Invalid base64 text: it cannot be decoded");
    }
  }
}

// Each "=" decodes to zero bits, so the bytes in its place hold exactly the unused trailing bits of the last
// letter. Two texts for the same bytes would let a signed value be rewritten without notice; RFC 4648,
// section 3.5, allows refusing.
void RemovePadding(std::vector<unsigned char>& bytes, std::size_t padding) {
  for (; padding > 0; --padding) {
    if (bytes.back() != 0) {
      throw Base64FormatException("Invalid base64 text: the trailing bits are not zero");
    }
    bytes.pop_back();
  }
}

}  // namespace

std::string Base64Encode(const std::vector<unsigned char>& bytes) {
  const std::size_t size = (bytes.size() + kBytesPerGroup - 1) / kBytesPerGroup * kLettersPerGroup;
  std::string letters(size + 1, '\0');  // EVP_EncodeBlock closes every piece with a NUL.
  constexpr std::size_t kPiece = kMaxGroupsPerCall * kBytesPerGroup;
  for (std::size_t done = 0; done < bytes.size(); done += kPiece) {
    const std::size_t count = std::min(kPiece, bytes.size() - done);
    EVP_EncodeBlock(reinterpret_cast<unsigned char*>(&letters[done / kBytesPerGroup * kLettersPerGroup]),
                    bytes.data() + done, static_cast<int>(count));
  }
  letters.resize(size);
  return letters;
}

std::vector<unsigned char> Base64Decode(const std::string& text) {
  const std::string letters = RemoveWhiteSpace(text);
  const std::size_t padding = RequireBase64Form(letters);
  std::vector<unsigned char> bytes;
  DecodeGroups(letters, bytes);
  RemovePadding(bytes, padding);
  return bytes;
}

}  // namespace StringUtil
}  // namespace Pelmar
