// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Where and how to connect, as the HTTP layer sees it.

#ifndef PELMAR_HTTP_CONNECTIONSPECIMPL_H
#define PELMAR_HTTP_CONNECTIONSPECIMPL_H

#include <pelmar/http/Client.h>

#include "pelmar/http/LoopCommand.h"
#include "pelmar/ssl/SSLContextImpl.h"

#include <cstdint>
#include <string>

namespace Pelmar {
namespace Http {

class ConnectionSpecImpl final : public ConnectionSpec {
 public:
  ConnectionSpecImpl(const std::string& host, int port);
  ConnectionSpecImpl(const ConnectionSpecImpl& tcp, const Ref<const Ssl::SSLContextImpl>& context,
                     const std::string& tlsHost, const std::string& pins);

  bool IsTls() const { return static_cast<bool>(_context); }
  /// Where the TCP connection goes.
  const std::string& GetHost() const { return _host; }
  int GetPort() const { return _port; }
  /// Whom the server has to prove to be and is addressed as; the same as `GetHost` without TLS.
  const std::string& GetServerName() const { return _serverName; }
  const Ssl::SSLContextImpl* GetContext() const { return _context.Get(); }
  const std::string& GetPins() const { return _pins; }
  /// "HOST:PORT" for messages.
  std::string GetEndpoint() const;
  /// Never the same for two specs of one process.
  std::uint64_t GetId() const { return _id; }

 private:
  /// What the HTTP loop keeps for this spec (the TLS sessions) goes with it.
  ~ConnectionSpecImpl() override;

  const std::string _host;
  const int _port;
  const std::string _serverName;
  const Ref<const Ssl::SSLContextImpl> _context;
  const std::string _pins;
  const std::uint64_t _id;
  LoopCommands _farewell;  // To the HTTP loop.
};

/// Throws InvalidArgumentException when `spec` is null or of a foreign class.
Ref<const ConnectionSpecImpl> ToConnectionSpecImpl(const ConnectionSpec* spec);

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CONNECTIONSPECIMPL_H
