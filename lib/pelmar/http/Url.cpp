// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/http/Url.h>

#include "pelmar/http/UrlSyntax.h"

#include <pelmar/StringUtil.h>
#include <pelmar/http/HttpException.h>

namespace Pelmar {
namespace Http {

namespace {

constexpr int kHttpPort = 80;
constexpr int kHttpsPort = 443;
constexpr std::size_t kMaxPortDigits = 5;

// The text itself is never repeated: it may hold a password where nobody expects one.
[[noreturn]] void Refuse(const std::string& fault) {
  throw HttpException("Bad URL: " + fault);
}

void RefuseIf(bool isFaulty, const char* fault) {
  if (isFaulty) {
    Refuse(fault);
  }
}

void RequireVisibleAscii(const std::string& url) {
  for (std::size_t i = 0; i < url.size(); ++i) {
    if (url[i] <= ' ' || url[i] > '~') {
      Refuse("character " + std::to_string(i + 1) + " is white space, a control character or not ASCII");
    }
  }
}

/// Takes the scheme and the two slashes off `rest`; whether it is https.
bool TakeScheme(std::string& rest) {
  const std::size_t end = rest.find("://");
  const std::string scheme = StringUtil::ToLower(rest.substr(0, end));
  if (end == std::string::npos || (scheme != "http" && scheme != "https")) {
    Refuse("it does not start with http:// or https://");
  }
  rest.erase(0, end + 3);
  return scheme == "https";
}

/// Takes everything up to the path or query off `rest`.
std::string TakeAuthority(std::string& rest) {
  const std::size_t end = rest.find_first_of("/?");
  std::string authority = rest.substr(0, end);
  rest.erase(0, authority.size());
  return authority;
}

/// Takes the host off `authority`, so that nothing or a port with its colon is left.
std::string TakeHost(std::string& authority) {
  if (authority[0] != '[') {
    std::string host = authority.substr(0, authority.find(':'));
    authority.erase(0, host.size());
    return host;
  }
  const std::size_t end = authority.find(']');
  RefuseIf(end == std::string::npos, "the host has no closing bracket");
  std::string host = authority.substr(1, end - 1);
  RefuseIf(!IsIPv6Address(host), "the host is not an IPv6 address");
  authority.erase(0, end + 1);
  RefuseIf(!authority.empty() && authority[0] != ':', "something stands between the host and the port");
  return host;
}

/// `text` is empty or starts with a colon.
int ReadPort(const std::string& text, int defaultPort) {
  if (text.empty()) {
    return defaultPort;
  }
  const std::string digits = text.substr(1);
  const bool isDecimal = digits.find_first_not_of("0123456789") == std::string::npos;
  RefuseIf(digits.empty() || !isDecimal || digits[0] == '0' || digits.size() > kMaxPortDigits,
           "the port is not a number from 1 to 65535");
  const int port = std::stoi(digits);
  RefuseIf(port > kMaxPort, "the port is not a number from 1 to 65535");
  return port;
}

std::string ReadPath(const std::string& rest) {
  std::string path = !rest.empty() && rest[0] == '/' ? rest : "/" + rest;
  const std::string fault = FindPathFault(path);
  if (!fault.empty()) {
    Refuse(fault);
  }
  return path;
}

}  // namespace

HttpURL ParseHttpURL(const std::string& url) {
  RefuseIf(url.size() > kMaxUrlBytes, "it has more than 8192 bytes");
  RequireVisibleAscii(url);
  std::string rest = url;
  HttpURL parts;
  parts.isHttps = TakeScheme(rest);
  RefuseIf(rest.find('#') != std::string::npos, "a fragment is not allowed");
  std::string authority = TakeAuthority(rest);
  RefuseIf(authority.find('@') != std::string::npos, "user information is not allowed");
  RefuseIf(authority.empty(), "the host is empty");
  parts.host = TakeHost(authority);
  const std::string fault = FindHostFault(parts.host);
  if (!fault.empty()) {
    Refuse(fault);
  }
  parts.port = ReadPort(authority, parts.isHttps ? kHttpsPort : kHttpPort);
  parts.path = ReadPath(rest);
  return parts;
}

}  // namespace Http
}  // namespace Pelmar
