// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/ResponseHead.h"

#include <pelmar/StringUtil.h>
#include <pelmar/http/Client.h>

#include <algorithm>

namespace Pelmar {
namespace Http {

namespace {

constexpr std::size_t kStatusCodeOffset = 9;  // After "HTTP/1.x ".
constexpr std::size_t kStatusCodeDigits = 3;

bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

std::string TrimBlanks(const std::string& text) {
  const char* const blanks = " \t\r\n";
  const std::size_t start = text.find_first_not_of(blanks);
  return start == std::string::npos ? std::string()
                                    : text.substr(start, text.find_last_not_of(blanks) + 1 - start);
}

std::string RemoveLineEnd(std::string line) {
  while (!line.empty() && (line.back() == '\n' || line.back() == '\r')) {
    line.pop_back();
  }
  return line;
}

bool IsInterim(int statusCode) {
  return statusCode < 200;
}

}  // namespace

std::string MaskControlCharacters(std::string text) {
  std::replace_if(
      text.begin(), text.end(), [](char c) { return (c >= '\0' && c < ' ') || c == '\x7f'; }, '?');
  return text;
}

HeadFault ResponseHead::TakeLine(const char* line, std::size_t size) {
  if (_fault != HeadFault::NONE) {
    return _fault;
  }
  _bytes += size;
  _fault =
      _bytes > kMaxResponseHeaderBytes ? HeadFault::TOO_LARGE : Judge(RemoveLineEnd(std::string(line, size)));
  return _fault;
}

bool ResponseHead::IsEndedByConnection() const {
  constexpr int kNoContent = 204;
  constexpr int kNotModified = 304;
  return _isComplete && !_hasLength && _statusCode != kNoContent && _statusCode != kNotModified;
}

HeadFault ResponseHead::Judge(const std::string& line) {
  if (_isComplete) {
    return HeadFault::NONE;  // A trailer.
  }
  if (IsInterim(_statusCode) && line.compare(0, 5, "HTTP/") == 0) {
    return TakeStatusLine(line);
  }
  if (line.empty()) {
    _isComplete = !IsInterim(_statusCode);
    return HeadFault::NONE;
  }
  return IsInterim(_statusCode) ? HeadFault::NONE : TakeField(line);
}

HeadFault ResponseHead::TakeStatusLine(const std::string& line) {
  const std::string code = line.substr(0, 7) == "HTTP/1." && line.size() >= kStatusCodeOffset
                               ? line.substr(kStatusCodeOffset, kStatusCodeDigits)
                               : std::string();
  if (code.size() != kStatusCodeDigits || !std::all_of(code.begin(), code.end(), IsDigit)) {
    return HeadFault::NOT_HTTP_1;
  }
  _statusCode = std::stoi(code);
  _reason = MaskControlCharacters(TrimBlanks(line.substr(kStatusCodeOffset + kStatusCodeDigits)));
  return HeadFault::NONE;
}

HeadFault ResponseHead::TakeField(const std::string& line) {
  const std::size_t colon = line.find(':');
  if (colon == std::string::npos) {
    return HeadFault::NONE;
  }
  const std::string name = StringUtil::ToLower(TrimBlanks(line.substr(0, colon)));
  const std::string value = StringUtil::ToLower(TrimBlanks(line.substr(colon + 1)));
  _hasLength = _hasLength || name == "content-length" || name == "transfer-encoding";
  if (name == "content-encoding" && !value.empty() && value != "identity") {
    return HeadFault::CONTENT_CODING;
  }
  if (name == "transfer-encoding" && value != "chunked") {
    return HeadFault::TRANSFER_CODING;
  }
  return HeadFault::NONE;
}

}  // namespace Http
}  // namespace Pelmar
