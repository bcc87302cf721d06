// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Public-key pins: a text that is accepted is made of nothing but whole hashes, each with its prefix.

#include "pelmar/http/PublicKeyPins.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

void Require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::size_t kPinSize = 8 + 44;  // "sha256//" and the base64 text of 32 bytes.
  const std::string pins(data, data + size);
  try {
    Pelmar::Http::RequirePublicKeyPins(pins);
  } catch (const Pelmar::InvalidArgumentException&) {
    return 0;
  }
  Require(pins.empty() || pins.size() % (kPinSize + 1) == kPinSize);
  for (std::size_t start = 0; start < pins.size(); start += kPinSize + 1) {
    Require(pins.compare(start, 8, "sha256//") == 0);
    const std::string hash = pins.substr(start + 8, 44);
    Require(Pelmar::StringUtil::Base64Encode(Pelmar::StringUtil::Base64Decode(hash)) == hash);
    Require(start + kPinSize == pins.size() || pins[start + kPinSize] == ';');
  }
  return 0;
}
