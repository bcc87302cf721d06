// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/NameRules.h"

#include "pelmar/xml/ExpatHandle.h"

#include <pelmar/xml/Parser.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <string>

namespace Pelmar {
namespace Xml {

namespace {

constexpr bool IsAsciiLetter(char c) noexcept {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

constexpr bool IsAscii(char c) noexcept {
  return static_cast<unsigned char>(c) < 0x80;
}

constexpr std::array<bool, 256> MarkNameBytes() noexcept {
  std::array<bool, 256> marks = {};
  for (std::size_t byte = 0; byte < marks.size(); ++byte) {
    const char c = static_cast<char>(byte);
    marks[byte] =
        !IsAscii(c) || IsAsciiLetter(c) || (c >= '0' && c <= '9') || c == '_' || c == '-' || c == '.';
  }
  return marks;
}

bool MayContinueName(char c) noexcept {
  static constexpr std::array<bool, 256> kMarks = MarkNameBytes();
  return kMarks[static_cast<unsigned char>(c)];
}

template <typename Predicate>
bool ConsistsOf(std::string_view text, Predicate predicate) {
  return std::all_of(text.begin(), text.end(), predicate);
}

// Of the characters that may stand in a name, those that must not begin one (XML 1.0, productions 4 and 4a).
// Beyond ASCII they are U+00B7, U+0300 to U+036F, U+203F and U+2040.
bool MayBeginName(std::string_view name) noexcept {
  const char first = name.front();
  if (IsAscii(first)) {
    return IsAsciiLetter(first) || first == '_';
  }
  const std::string_view pair = name.substr(0, 2);
  const std::string_view triple = name.substr(0, 3);
  return pair != "\xC2\xB7" && !(pair >= "\xCC\x80" && pair <= "\xCD\xAF") && triple != "\xE2\x80\xBF" &&
         triple != "\xE2\x81\x80";
}

// The tables of the characters beyond ASCII are the tokeniser's; ours could only differ from them.
bool IsNameToTheParser(std::string_view name) {
  const ExpatHandle parser = CreateExpat();
  const std::string document = "<" + std::string(name) + "/>";
  return XML_Parse(parser.get(), document.data(), static_cast<int>(document.size()), XML_TRUE) ==
         XML_STATUS_OK;
}

}  // namespace

NameParts SplitName(std::string_view name) noexcept {
  const std::size_t colon = name.find(':');
  if (colon == std::string_view::npos) {
    return {std::string_view(), name};
  }
  return {name.substr(0, colon), name.substr(colon + 1)};
}

bool IsNamespaceDeclaration(std::string_view attributeName, std::string_view& prefix) noexcept {
  constexpr std::string_view kXmlns = "xmlns";
  if (attributeName.substr(0, kXmlns.size()) != kXmlns) {
    return false;
  }
  if (attributeName.size() == kXmlns.size()) {
    prefix = std::string_view();
    return true;
  }
  if (attributeName[kXmlns.size()] != ':') {
    return false;
  }
  prefix = attributeName.substr(kXmlns.size() + 1);
  return true;
}

bool IsNamespaceDeclaration(const NameRange& attributeName) noexcept {
  constexpr std::string_view kXmlns = "xmlns";
  const std::string_view text = ViewOf(attributeName.text);
  return attributeName.localStart == 0
             ? text == kXmlns
             : attributeName.localStart == kXmlns.size() + 1 && text.substr(0, kXmlns.size()) == kXmlns;
}

bool IsQualifiedName(const NameRange& name) noexcept {
  if (name.localStart == 0) {
    return true;
  }
  const NameParts parts = PartsOf(name);
  return !parts.prefix.empty() && !parts.localName.empty() &&
         parts.localName.find(':') == std::string_view::npos && MayBeginName(parts.localName);
}

const char* FindDeclarationFault(std::string_view prefix, std::string_view uri) noexcept {
  static_assert(kMaxNamespaceUriBytes == 2048, "the text below names the limit");
  if (uri.size() > kMaxNamespaceUriBytes) {
    return "more than 2048 bytes in a namespace URI";
  }
  if (prefix == "xmlns") {
    return "the prefix xmlns is declared";
  }
  if ((prefix == "xml") != (uri == kXmlNamespace)) {
    return "the prefix xml and its namespace belong to each other alone";
  }
  if (uri == kXmlnsNamespace) {
    return "the namespace of declarations is bound to a prefix";
  }
  if (uri.empty() && !prefix.empty()) {
    return "a prefix is declared without a namespace";
  }
  return nullptr;
}

bool IsNcName(std::string_view name) {
  constexpr std::size_t kMaxNameBytes = 65536;
  if (name.empty() || name.size() > kMaxNameBytes || !MayBeginName(name) ||
      !ConsistsOf(name, [](char c) { return MayContinueName(c); })) {
    return false;
  }
  return ConsistsOf(name, [](char c) { return IsAscii(c); }) || IsNameToTheParser(name);
}

}  // namespace Xml
}  // namespace Pelmar
