// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/UrlSyntax.h"

#include <arpa/inet.h>
#include <netinet/in.h>

#include <cstring>

namespace Pelmar {
namespace Http {

namespace {

// The C library's classification follows the process's locale; these do not.
bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

bool IsHexDigit(char c) {
  return IsDigit(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

bool IsAlphanumeric(char c) {
  return IsDigit(c) || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

// Unreserved characters, sub-delimiters, and the four that stand for themselves in paths and queries.
bool IsPathCharacter(char c) {
  return IsAlphanumeric(c) || (c != '\0' && std::strchr("-._~!$&'()*+,;=:@/?", c) != nullptr);
}

bool IsIPv4Address(const std::string& host) {
  in_addr address;
  return ::inet_pton(AF_INET, host.c_str(), &address) == 1;
}

std::string FindLabelFault(const std::string& label) {
  if (label.empty()) {
    return "the host has an empty label";
  }
  if (label.size() > kMaxHostLabelBytes) {
    return "the host has a label of more than " + std::to_string(kMaxHostLabelBytes) + " bytes";
  }
  for (const char c : label) {
    if (!IsAlphanumeric(c) && c != '-' && c != '_') {
      return "the host has a character that is not allowed";
    }
  }
  return std::string();
}

// "127.1", "0x7f.0.0.1" and "017700000001" mean an address to some resolvers and a name to others, so that
// what is checked and what is connected to could differ.
bool EndsInNumber(const std::string& host) {
  const std::string last = host.substr(host.rfind('.') + 1);
  return IsDigit(last[0]) && (last.find_first_not_of("0123456789") == std::string::npos ||
                              last.compare(0, 2, "0x") == 0 || last.compare(0, 2, "0X") == 0);
}

std::string FindNameFault(const std::string& host) {
  std::size_t start = 0;
  for (;;) {
    const std::size_t end = host.find('.', start);
    std::string fault = FindLabelFault(host.substr(start, end == std::string::npos ? end : end - start));
    if (!fault.empty()) {
      return fault;
    }
    if (end == std::string::npos) {
      return EndsInNumber(host) ? "the host is not an IPv4 address of four decimal numbers" : std::string();
    }
    start = end + 1;
  }
}

bool IsPercentEscape(const std::string& text, std::size_t position) {
  return position + 2 < text.size() && IsHexDigit(text[position + 1]) && IsHexDigit(text[position + 2]);
}

}  // namespace

bool IsIPv6Address(const std::string& host) {
  in6_addr address;
  return host.find('\0') == std::string::npos && ::inet_pton(AF_INET6, host.c_str(), &address) == 1;
}

bool IsIPAddress(const std::string& host) {
  return IsIPv6Address(host) || (host.find('\0') == std::string::npos && IsIPv4Address(host));
}

std::string FindHostFault(const std::string& host) {
  if (host.empty()) {
    return "the host is empty";
  }
  if (host.size() > kMaxHostBytes) {
    return "the host has more than " + std::to_string(kMaxHostBytes) + " bytes";
  }
  if (host.find(':') != std::string::npos) {
    return IsIPv6Address(host) ? std::string() : "the host is not an IPv6 address";
  }
  return IsIPAddress(host) ? std::string() : FindNameFault(host);
}

std::string FindPathFault(const std::string& path) {
  if (path.empty() || path[0] != '/') {
    return "the path does not start with a slash";
  }
  if (path.size() > kMaxUrlBytes) {
    return "the path has more than " + std::to_string(kMaxUrlBytes) + " bytes";
  }
  for (std::size_t i = 0; i < path.size(); ++i) {
    if (path[i] == '%') {
      if (!IsPercentEscape(path, i)) {
        return "the path has a percent sign without two hexadecimal digits";
      }
    } else if (!IsPathCharacter(path[i])) {
      return "the path has a character that is not allowed";
    }
  }
  return std::string();
}

std::string FormatUrlHost(const std::string& host) {
  return host.find(':') == std::string::npos ? host : "[" + host + "]";
}

std::string FormatEndpoint(const std::string& host, int port) {
  return FormatUrlHost(host) + ":" + std::to_string(port);
}

}  // namespace Http
}  // namespace Pelmar
