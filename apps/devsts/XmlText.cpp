// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/XmlText.h"

#include <pelmar/StringUtil.h>

#include <stdexcept>

namespace DevSts {

namespace {

/// Null for a character that stands for itself.
const char* FindReference(char character) {
  switch (character) {
    case '&':
      return "&amp;";
    case '<':
      return "&lt;";
    case '>':
      return "&gt;";
    case '"':
      return "&quot;";
    case '\t':
      return "&#x9;";
    case '\n':
      return "&#xA;";
    case '\r':
      return "&#xD;";
    default:
      return nullptr;
  }
}

}  // namespace

std::string Escape(const std::string& text) {
  if (!Pelmar::StringUtil::IsXmlText(text)) {
    throw std::invalid_argument("text that XML cannot carry");
  }
  std::string result;
  for (const char character : text) {
    const char* const reference = FindReference(character);
    if (reference == nullptr) {
      result += character;
    } else {
      result += reference;
    }
  }
  return result;
}

}  // namespace DevSts
