// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A user agent's options, checked and taken apart.

#ifndef PELMAR_HTTP_AGENTOPTIONS_H
#define PELMAR_HTTP_AGENTOPTIONS_H

#include <pelmar/http/ClientOptions.h>

#include <string>

namespace Pelmar {
namespace Http {

/// Immutable; shared by the user agent and its exchanges.
class AgentOptions final {
 public:
  /// Throws like `CreateHttpUserAgent`.
  explicit AgentOptions(const ClientOptions& options);

  long long GetConnectTimeoutMicroseconds() const { return _options.connectTimeoutMicroseconds; }
  bool HasProxy() const { return !_options.proxyUrl.empty(); }
  const std::string& GetProxyHost() const { return _proxyHost; }
  /// "HOST:PORT"; empty without a proxy.
  const std::string& GetProxyEndpoint() const { return _proxyEndpoint; }
  const std::string& GetProxyUser() const { return _options.proxyUser; }
  const std::string& GetProxyPassword() const { return _options.proxyPassword; }
  const std::string& GetUserAgent() const { return _options.userAgent; }

 private:
  const ClientOptions _options;
  std::string _proxyHost;
  std::string _proxyEndpoint;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_AGENTOPTIONS_H
