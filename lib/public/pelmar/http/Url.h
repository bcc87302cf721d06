// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// HTTP URLs.

#ifndef PELMAR_HTTP_URL_H
#define PELMAR_HTTP_URL_H

#include <pelmar/Export.h>

#include <string>

namespace Pelmar {
namespace Http {

/// The parts of an HTTP or HTTPS URL that a client needs.
struct HttpURL {
  bool isHttps;
  std::string host;  ///< A name, an IPv4 address, or an IPv6 address without its brackets.
  int port;          ///< 1 to 65535; 80 or 443 when the URL names none.
  std::string path;  ///< Path and query as written, percent escapes kept; "/" when the URL has none.
};

/// Splits `url` (RFC 3986; RFC 9110, section 4.2). The scheme is accepted in any letter case. User
/// information, fragments, white space, control and non-ASCII characters, empty hosts and bad ports are
/// refused with HttpException, whose message never holds user information.
PELMAR_API HttpURL ParseHttpURL(const std::string& url);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_URL_H
