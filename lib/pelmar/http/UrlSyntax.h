// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The pieces of an HTTP URL (RFC 3986, section 3): what is acceptable in each. Every check names the first
// thing that is wrong, in words that repeat nothing of the text.

#ifndef PELMAR_HTTP_URLSYNTAX_H
#define PELMAR_HTTP_URLSYNTAX_H

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Http {

/// Longer URLs are refused: RFC 9110, section 4.1, asks for 8000 bytes at least.
constexpr std::size_t kMaxUrlBytes = 8192;
/// The longest name the DNS can hold, as text (RFC 1035, section 2.3.4).
constexpr std::size_t kMaxHostBytes = 253;
constexpr std::size_t kMaxHostLabelBytes = 63;
constexpr int kMaxPort = 65535;

/// Whether `host` is an IPv6 address without brackets and zone.
bool IsIPv6Address(const std::string& host);
/// Whether `host` is an IP address of either kind.
bool IsIPAddress(const std::string& host);

/// What is wrong with a host (a name, an IPv4 address, or an IPv6 address without its brackets); empty when
/// nothing is.
std::string FindHostFault(const std::string& host);

/// What is wrong with a request target in origin form (RFC 9112, section 3.2.1): path and query. Empty when
/// nothing is.
std::string FindPathFault(const std::string& path);

/// "host:port", with brackets around an IPv6 address.
std::string FormatEndpoint(const std::string& host, int port);
/// The host as it stands in a URL.
std::string FormatUrlHost(const std::string& host);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_URLSYNTAX_H
