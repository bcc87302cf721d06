// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/ResponseHead.h"

#include <pelmar/StringUtil.h>
#include <pelmar/http/Client.h>

#include <algorithm>
#include <cstring>

namespace Pelmar {
namespace Http {

namespace {

constexpr std::size_t kMinorVersionOffset = 7;
constexpr std::size_t kStatusCodeOffset = 9;  // After "HTTP/1.x ".
constexpr std::size_t kStatusCodeDigits = 3;
constexpr int kSwitchingProtocols = 101;
constexpr int kNoContent = 204;

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

// RFC 9110, section 5.6.2.
bool IsTokenCharacter(char c) {
  return IsDigit(c) || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
         (c != '\0' && std::strchr("!#$%&'*+-.^_`|~", c) != nullptr);
}

bool IsControl(char c) {
  return (c >= '\0' && c < ' ') || c == '\x7f';
}

/// RFC 9112, section 5: a name, at once a colon, and a value without control characters (RFC 9110, section
/// 5.5). A line that starts with white space continues the one before (section 5.2), which is deprecated, and
/// which the HTTP engine does not join; it has no name.
bool IsField(const std::string& line, std::size_t colon) {
  return colon != std::string::npos && colon > 0 &&
         std::all_of(line.begin(), line.begin() + static_cast<std::ptrdiff_t>(colon), IsTokenCharacter) &&
         std::none_of(line.begin(), line.end(), [](char c) { return IsControl(c) && c != '\t'; });
}

/// "HTTP/1.x" and a code of three digits from 100 on, with a blank before it and after it, if anything
/// follows.
bool IsStatusLine(const std::string& line) {
  constexpr std::size_t kEnd = kStatusCodeOffset + kStatusCodeDigits;
  return line.compare(0, kMinorVersionOffset, "HTTP/1.") == 0 && line.size() >= kEnd &&
         IsDigit(line[kMinorVersionOffset]) && line[kStatusCodeOffset - 1] == ' ' &&
         line[kStatusCodeOffset] != '0' &&
         std::all_of(line.begin() + kStatusCodeOffset, line.begin() + kEnd, IsDigit) &&
         (line.size() == kEnd || line[kEnd] == ' ');
}

bool IsInterim(int statusCode) {
  return statusCode < 200;
}

}  // namespace

std::string MaskControlCharacters(std::string text) {
  std::replace_if(text.begin(), text.end(), IsControl, '?');
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
  constexpr int kNotModified = 304;
  return _isComplete && !_hasContentLength && !_hasTransferCoding && _statusCode != kNoContent &&
         _statusCode != kNotModified;
}

HeadFault ResponseHead::Judge(const std::string& line) {
  if (_isComplete) {
    return HeadFault::NONE;  // A trailer.
  }
  if (_awaitsStatusLine) {
    return TakeStatusLine(line);
  }
  if (line.empty()) {
    return TakeEnd();
  }
  return TakeField(line);
}

HeadFault ResponseHead::TakeStatusLine(const std::string& line) {
  if (!IsStatusLine(line)) {
    return HeadFault::NOT_HTTP_1;
  }
  _awaitsStatusLine = false;
  _isHttp10 = line[kMinorVersionOffset] == '0';
  _statusCode = std::stoi(line.substr(kStatusCodeOffset, kStatusCodeDigits));
  _reason = MaskControlCharacters(TrimBlanks(line.substr(kStatusCodeOffset + kStatusCodeDigits)));
  // What follows would be in the other protocol, which no request asks for (RFC 9110, section 7.8).
  return _statusCode == kSwitchingProtocols ? HeadFault::NOT_HTTP_1 : HeadFault::NONE;
}

HeadFault ResponseHead::TakeEnd() {
  _awaitsStatusLine = IsInterim(_statusCode);
  _isComplete = !_awaitsStatusLine;
  return _statusCode == kNoContent && _announcesBody ? HeadFault::BODY_LENGTH : HeadFault::NONE;
}

HeadFault ResponseHead::TakeField(const std::string& line) {
  const std::size_t colon = line.find(':');
  if (!IsField(line, colon)) {
    return HeadFault::BAD_FIELD;
  }
  if (IsInterim(_statusCode)) {
    return HeadFault::NONE;
  }
  const std::string name = StringUtil::ToLower(line.substr(0, colon));
  const std::string value = StringUtil::ToLower(TrimBlanks(line.substr(colon + 1)));
  if (name == "content-length") {
    return TakeContentLength(value);
  }
  if (name == "transfer-encoding") {
    return TakeTransferCoding(value);
  }
  const bool isCoded = name == "content-encoding" && !value.empty() && value != "identity";
  return isCoded ? HeadFault::CONTENT_CODING : HeadFault::NONE;
}

HeadFault ResponseHead::TakeContentLength(const std::string& value) {
  const bool isClear = !_hasContentLength && !_hasTransferCoding && !value.empty() &&
                       std::all_of(value.begin(), value.end(), IsDigit);
  _hasContentLength = true;
  _announcesBody = _announcesBody || value.find_first_not_of('0') != std::string::npos;
  return isClear ? HeadFault::NONE : HeadFault::BODY_LENGTH;
}

HeadFault ResponseHead::TakeTransferCoding(const std::string& value) {
  if (value != "chunked" || _hasTransferCoding || _isHttp10) {
    return HeadFault::TRANSFER_CODING;
  }
  _hasTransferCoding = true;
  _announcesBody = true;
  return _hasContentLength ? HeadFault::BODY_LENGTH : HeadFault::NONE;
}

}  // namespace Http
}  // namespace Pelmar
