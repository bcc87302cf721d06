// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The cookies of one user agent, between its exchanges.

#ifndef PELMAR_HTTP_COOKIESTOREIMPL_H
#define PELMAR_HTTP_COOKIESTOREIMPL_H

#include <pelmar/http/Client.h>

#include <cstddef>
#include <string>
#include <vector>

namespace Pelmar {
namespace Http {

/// A store keeps at most this many cookies; the oldest go first (RFC 6265, section 6.1, asks for 50 per
/// domain).
constexpr std::size_t kMaxCookies = 200;

/// Cookies as lines of seven fields separated by tabs: domain, whether subdomains match, path, whether
/// secure, expiry, name, value. Which cookie to accept and to send (RFC 6265) is decided by the HTTP engine,
/// which is given the lines before an exchange and asked for them after it. Once an exchange has been sent
/// the store is used by the HTTP loop's thread only.
class CookieStoreImpl final : public CookieStore {
 public:
  const std::vector<std::string>& GetLines() const { return _lines; }

  /// Takes over what an exchange that was given `before` and ended with `after` has changed. Changes made by
  /// other exchanges in the meantime stay.
  void Merge(const std::vector<std::string>& before, const std::vector<std::string>& after);

 private:
  ~CookieStoreImpl() override;

  std::vector<std::string> _lines;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_COOKIESTOREIMPL_H
