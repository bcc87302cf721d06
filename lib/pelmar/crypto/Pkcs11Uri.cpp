// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/crypto/Pkcs11Uri.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Pkcs11.h>

#include <algorithm>
#include <cstring>
#include <iterator>
#include <map>

namespace Pelmar {
namespace Crypto {

namespace {

constexpr const char* kScheme = "pkcs11:";
constexpr const char* kPathNames[] = {"token", "serial", "manufacturer", "model", "object", "id", "type"};
constexpr const char* kQueryNames[] = {"module-path", "pin-source"};

/// Names and their decoded values.
using Attributes = std::map<std::string, std::string>;

[[noreturn]] void Refuse(const std::string& what) {
  throw CryptoException("The PKCS #11 URI " + what);
}

bool IsUnreserved(char c) {
  return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') ||
         std::strchr("-._~", c) != nullptr;
}

// RFC 7512, 2.3: what may stand for itself in the path and in the query.
bool MayStandForItself(char c, bool inQuery) {
  return c != '\0' && (IsUnreserved(c) || std::strchr(":[]@!$'()*+,=&", c) != nullptr ||
                       (inQuery && std::strchr("/?|", c) != nullptr));
}

int HexValue(char c) {
  static const char* const kDigits = "0123456789abcdef";
  const char lower = c >= 'A' && c <= 'F' ? static_cast<char>(c + ('a' - 'A')) : c;
  const char* const found = c == '\0' ? nullptr : std::strchr(kDigits, lower);
  return found == nullptr ? -1 : static_cast<int>(found - kDigits);
}

char DecodeEscape(const std::string& text, std::size_t percent) {
  const int high = percent + 2 < text.size() ? HexValue(text[percent + 1]) : -1;
  const int low = high < 0 ? -1 : HexValue(text[percent + 2]);
  if (low < 0) {
    Refuse("has a percent sign without two hexadecimal digits");
  }
  return static_cast<char>(high * 16 + low);
}

std::string Decode(const std::string& text, bool inQuery) {
  std::string decoded;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] == '%') {
      decoded += DecodeEscape(text, i);
      i += 2;
    } else if (MayStandForItself(text[i], inQuery)) {
      decoded += text[i];
    } else {
      Refuse("has a character that must be percent-encoded");
    }
  }
  return decoded;
}

std::string Encode(const std::string& value) {
  static const char* const kDigits = "0123456789ABCDEF";
  std::string encoded;
  for (const char c : value) {
    if (c != '\0' && IsUnreserved(c)) {
      encoded += c;
    } else {
      const auto byte = static_cast<unsigned char>(c);
      encoded += {'%', kDigits[byte / 16], kDigits[byte % 16]};
    }
  }
  return encoded;
}

template <std::size_t Count>
void RequireKnownName(const std::string& name, const char* const (&names)[Count]) {
  if (name == "pin-value") {
    Refuse(
        "holds pin-value: a PIN in a URI is seen in argument lists and logs, so it is not taken from there; use "
        "pin-source (and change that PIN)");
  }
  if (std::none_of(std::begin(names), std::end(names), [&](const char* known) { return name == known; })) {
    // The name may be a value that went astray, so it is not repeated.
    Refuse("has an attribute that is not accepted there");
  }
}

template <std::size_t Count>
void ReadAttribute(const std::string& part, const char* const (&names)[Count], bool inQuery,
                   Attributes& attributes) {
  const std::size_t equals = part.find('=');
  const std::string name = part.substr(0, equals);
  RequireKnownName(name, names);
  if (equals == std::string::npos || equals + 1 == part.size()) {
    Refuse("has no value for " + name);
  }
  const std::string value = Decode(part.substr(equals + 1), inQuery);
  // Programs in C would take the rest away.
  if (name != "id" && value.find('\0') != std::string::npos) {
    Refuse("has a zero byte in " + name);
  }
  if (!attributes.emplace(name, value).second) {
    Refuse("has two values for " + name);
  }
}

template <std::size_t Count>
Attributes ReadAttributes(const std::string& text, char separator, const char* const (&names)[Count],
                          bool inQuery) {
  Attributes attributes;
  for (std::size_t begin = 0; begin <= text.size();) {
    const std::size_t end = std::min(text.find(separator, begin), text.size());
    ReadAttribute(text.substr(begin, end - begin), names, inQuery, attributes);
    begin = end + 1;
  }
  return attributes;
}

std::string ToPinFile(const std::string& source) {
  const bool isUri = source.compare(0, 5, "file:") == 0;
  const bool hasEmptyHost = source.compare(0, 7, "file://") == 0;
  const std::string path = source.substr(hasEmptyHost ? 7 : isUri ? 5 : 0);
  if (path.empty() || path[0] != '/') {
    Refuse("has a pin-source that is not the absolute path of a file");
  }
  return path;
}

std::string Find(const Attributes& attributes, const char* name) {
  const auto found = attributes.find(name);
  return found == attributes.end() ? std::string() : found->second;
}

// A key is looked for in one token: a PIN that is tried elsewhere counts as a wrong one there.
void RequireWholeName(const Attributes& path) {
  if (path.count("token") == 0 && path.count("serial") == 0) {
    Refuse("has neither token nor serial");
  }
  if (path.count("object") == 0 && path.count("id") == 0) {
    Refuse("has neither object nor id");
  }
  if (path.count("type") == 1 && path.at("type") != "private") {
    Refuse("has a type other than private");
  }
}

std::string WritePath(const Attributes& path) {
  std::string text = kScheme;
  for (const auto& attribute : path) {
    if (attribute.first != "type") {
      text += attribute.first + "=" + Encode(attribute.second) + ";";
    }
  }
  return text + "type=private";
}

}  // namespace

bool IsPkcs11Uri(const std::string& text) {
  return text.compare(0, std::strlen(kScheme), kScheme) == 0;
}

Pkcs11Uri ParsePkcs11Uri(const std::string& uri) {
  if (!IsPkcs11Uri(uri)) {
    Refuse("does not start with pkcs11:");
  }
  if (uri.size() > kMaxPkcs11UriBytes) {
    Refuse("has more than " + std::to_string(kMaxPkcs11UriBytes) + " bytes");
  }
  const std::size_t pathBegin = std::strlen(kScheme);
  const std::size_t question = std::min(uri.find('?'), uri.size());
  const Attributes path = ReadAttributes(uri.substr(pathBegin, question - pathBegin), ';', kPathNames, false);
  Attributes query;
  if (question < uri.size()) {
    query = ReadAttributes(uri.substr(question + 1), '&', kQueryNames, true);
  }
  RequireWholeName(path);
  const std::string source = Find(query, "pin-source");
  return {WritePath(path), Find(query, "module-path"), source.empty() ? source : ToPinFile(source)};
}

}  // namespace Crypto
}  // namespace Pelmar
