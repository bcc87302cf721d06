// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The decoders stay within the buffers they are given and agree with each other; what was encoded decodes to
// the same bytes, and what the platform's strict decoder accepts, this one reads the same way.

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <quorlin/Base64.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

using Bytes = std::vector<unsigned char>;

void Require(bool holds) {
  if (!holds) {
    std::abort();
  }
}

// A buffer of exactly `size` bytes, so that the address sanitizer sees the first byte beyond.
bool ChunkDecode(const std::string& text, std::size_t size, Bytes& result) {
  Bytes buffer(size);
  std::size_t written = size + 1;
  const bool succeeded = Base64_ChunkDecode(text.data(), text.size(), buffer.data(), size, &written);
  Require(written <= size && (succeeded || written == 0));
  buffer.resize(written);
  result = buffer;
  return succeeded;
}

void CheckDecoding(const std::string& text) {
  // Enough for every text.
  const std::size_t enough = text.size();
  Bytes whole;
  const bool succeeded = ChunkDecode(text, enough, whole);
  Bytes again;
  if (succeeded) {
    Require(ChunkDecode(text, whole.size() + 1, again) && again == whole);
  }
  if (!whole.empty()) {
    Require(!ChunkDecode(text, whole.size() - 1, again));
  }

  Bytes buffer(enough);
  std::size_t written = 0;
  const bool toNul = Base64_Decode(text.c_str(), buffer.data(), buffer.size(), &written);
  buffer.resize(written);
  Require(toNul == succeeded && buffer == whole);
}

void CheckEasyDecoding(const std::string& text) {
  void* result = nullptr;
  std::size_t length = 0;
  const bool succeeded = Base64_EasyDecode(text.c_str(), &result, &length);
  Require(succeeded == (result != nullptr) && (succeeded || length == 0));
  Require(length <= Base64_DecodedLength(text.c_str(), std::char_traits<char>::length(text.c_str())));
  std::free(result);
}

void CheckAgainstThePlatform(const std::string& text) {
  try {
    const Bytes expected = Pelmar::StringUtil::Base64Decode(text);
    Bytes whole;
    Require(ChunkDecode(text, text.size(), whole) && whole == expected);
  } catch (const Pelmar::Base64FormatException&) {
    return;
  }
}

void CheckRoundTrip(const std::string& bytes) {
  char* text = nullptr;
  Require(Base64_EasyEncode(bytes.data(), bytes.size(), &text));
  const std::string encoded = text;
  std::free(text);
  Require(encoded.size() + 1 == Base64_EncodedLength(bytes.data(), bytes.size()));
  Require(Base64_ValidEncoding(encoded.data(), encoded.size()));
  Require(Base64_DecodedLength(encoded.data(), encoded.size()) == bytes.size());

  void* result = nullptr;
  std::size_t length = 0;
  Require(Base64_EasyDecode(encoded.c_str(), &result, &length));
  Require(std::string(static_cast<const char*>(result), length) == bytes);
  std::free(result);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string input(data, data + size);
  CheckDecoding(input);
  CheckEasyDecoding(input);
  CheckAgainstThePlatform(input);
  CheckRoundTrip(input);
  Base64_ValidEncoding(input.data(), input.size());
  return 0;
}
