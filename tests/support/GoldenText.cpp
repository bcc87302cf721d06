// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/GoldenText.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/system/DateTime.h>

#include <cstddef>
#include <fstream>
#include <iterator>
#include <map>
#include <sstream>
#include <stdexcept>

namespace TestSupport {

namespace {

constexpr std::size_t kUuidSize = 36;
constexpr std::size_t kTimeSize = 24;  // 2012-03-05T07:04:09.045Z
constexpr std::size_t kSha256Bytes = 32;
constexpr std::size_t kRsa2048Bytes = 256;

bool IsUuid(const std::string& text, std::size_t position) {
  if (text.size() - position < kUuidSize) {
    return false;
  }
  for (std::size_t i = 0; i < kUuidSize; ++i) {
    const char c = text[position + i];
    const bool isDash = i == 8 || i == 13 || i == 18 || i == 23;
    const bool isHex = (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f');
    if (isDash ? c != '-' : !isHex) {
      return false;
    }
  }
  return true;
}

std::string MaskUuids(const std::string& text) {
  std::map<std::string, std::size_t> numbers;
  std::string masked;
  std::size_t position = 0;
  while (position < text.size()) {
    if (!IsUuid(text, position)) {
      masked += text[position++];
      continue;
    }
    const std::size_t next = numbers.size() + 1;
    const std::size_t number = numbers.emplace(text.substr(position, kUuidSize), next).first->second;
    masked += "{uuid " + std::to_string(number) + "}";
    position += kUuidSize;
  }
  return masked;
}

// "+ 600 s" between two times, or nothing when one is not a time with milliseconds in UTC.
std::string Difference(const std::string& from, const std::string& to) {
  using Pelmar::System::DateTime;
  if (from.size() != kTimeSize || to.size() != kTimeSize || from.back() != 'Z' || to.back() != 'Z') {
    return std::string();
  }
  try {
    const long long milliseconds = (DateTime(to).GetUtcTime() - DateTime(from).GetUtcTime()) / 1000;
    const std::string fraction =
        std::to_string(1000 + (milliseconds < 0 ? -milliseconds : milliseconds) % 1000);
    const std::string decimals = milliseconds % 1000 == 0 ? std::string() : "." + fraction.substr(1);
    const char* const sign = milliseconds < 0 ? "- " : "+ ";
    return sign + std::to_string((milliseconds < 0 ? -milliseconds : milliseconds) / 1000) + decimals + " s";
  } catch (const Pelmar::System::DateFormatException&) {
    return std::string();
  }
}

std::string MaskTimes(const std::string& text) {
  const std::string kOpen = "<wsu:Created>";
  const std::string kMiddle = "</wsu:Created><wsu:Expires>";
  const std::string kClose = "</wsu:Expires>";
  std::string masked;
  std::size_t position = 0;
  for (;;) {
    const std::size_t open = text.find(kOpen, position);
    const std::size_t middle = text.find(kMiddle, open == std::string::npos ? open : open + kOpen.size());
    const std::size_t close =
        text.find(kClose, middle == std::string::npos ? middle : middle + kMiddle.size());
    if (close == std::string::npos) {
      return masked + text.substr(position);
    }
    const std::string created = text.substr(open + kOpen.size(), middle - open - kOpen.size());
    const std::string expires = text.substr(middle + kMiddle.size(), close - middle - kMiddle.size());
    const std::string difference = Difference(created, expires);
    masked += text.substr(position, open + kOpen.size() - position);
    masked +=
        difference.empty() ? created + kMiddle + expires : "{time}" + kMiddle + "{time " + difference + "}";
    position = close;
  }
}

bool IsBase64Of(const std::string& text, std::size_t bytes) {
  try {
    return Pelmar::StringUtil::Base64Decode(text).size() == bytes;
  } catch (const Pelmar::Base64FormatException&) {
    return false;
  }
}

std::string MaskContent(const std::string& text, const std::string& element, std::size_t bytes,
                        const std::string& mask) {
  const std::string open = "<" + element + ">";
  const std::string close = "</" + element + ">";
  std::string masked;
  std::size_t position = 0;
  for (;;) {
    const std::size_t begin = text.find(open, position);
    const std::size_t end = begin == std::string::npos ? begin : text.find(close, begin);
    if (end == std::string::npos) {
      return masked + text.substr(position);
    }
    const std::size_t content = begin + open.size();
    const std::string value = text.substr(content, end - content);
    masked += text.substr(position, content - position) + (IsBase64Of(value, bytes) ? mask : value);
    position = end;
  }
}

std::string VectorPath(const std::string& name) {
  return std::string(QUORLIN_TEST_VECTORS_DIR) + "/" + name;
}

}  // namespace

std::string ReadVector(const std::string& name) {
  std::ifstream stream(VectorPath(name), std::ios::binary);
  if (!stream) {
    throw std::runtime_error("cannot read " + VectorPath(name));
  }
  return std::string((std::istreambuf_iterator<char>(stream)), std::istreambuf_iterator<char>());
}

std::string ReadGoldenText(const std::string& name) {
  std::istringstream lines(ReadVector(name));
  std::string text;
  for (std::string line; std::getline(lines, line);) {
    const std::size_t start = line.find_first_not_of(' ');
    text += start == std::string::npos ? std::string() : line.substr(start);
  }
  return ReplaceAll(text, "{vendor}", QUORLIN_VENDOR_URI_BASE);
}

std::string MaskVolatile(const std::string& text) {
  const std::string timed = MaskTimes(MaskUuids(text));
  const std::string digested = MaskContent(timed, "ds:DigestValue", kSha256Bytes, "{digest}");
  return MaskContent(digested, "ds:SignatureValue", kRsa2048Bytes, "{signature}");
}

std::string ReplaceAll(const std::string& text, const std::string& from, const std::string& to) {
  std::string result;
  std::size_t position = 0;
  for (std::size_t found; (found = text.find(from, position)) != std::string::npos;
       position = found + from.size()) {
    result += text.substr(position, found - position) + to;
  }
  return result + text.substr(position);
}

std::string CutBetween(const std::string& text, const std::string& open, const std::string& close) {
  const std::size_t begin = text.find(open);
  const std::size_t end = begin == std::string::npos ? begin : text.find(close, begin + open.size());
  if (end == std::string::npos) {
    throw std::runtime_error("no text between " + open + " and " + close);
  }
  return text.substr(begin + open.size(), end - begin - open.size());
}

}  // namespace TestSupport
