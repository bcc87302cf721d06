// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/PublicKeyPins.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>

#include <cstddef>

namespace Pelmar {
namespace Http {

namespace {

constexpr std::size_t kSha256Bytes = 32;
const char kPrefix[] = "sha256//";

// Decoding alone is not enough: the decoder passes over white space, and the pin is compared as text later
// on.
bool IsHashText(const std::string& text) {
  try {
    const std::vector<unsigned char> hash = StringUtil::Base64Decode(text);
    return hash.size() == kSha256Bytes && StringUtil::Base64Encode(hash) == text;
  } catch (const Base64FormatException&) {
    return false;
  }
}

bool IsPin(const std::string& text) {
  const std::size_t prefixSize = sizeof kPrefix - 1;
  return text.compare(0, prefixSize, kPrefix) == 0 && IsHashText(text.substr(prefixSize));
}

}  // namespace

void RequirePublicKeyPins(const std::string& pins) {
  if (pins.empty()) {
    return;
  }
  std::size_t number = 1;
  for (std::size_t start = 0; start != std::string::npos; ++number) {
    const std::size_t end = pins.find(';', start);
    if (!IsPin(pins.substr(start, end == std::string::npos ? end : end - start))) {
      throw InvalidArgumentException("public-key pin " + std::to_string(number) +
                                     " is not sha256// followed by the base64 text of 32 bytes");
    }
    start = end == std::string::npos ? end : end + 1;
  }
}

}  // namespace Http
}  // namespace Pelmar
