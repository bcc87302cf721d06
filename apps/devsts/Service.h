// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The development token service as one object.

#ifndef QUORLIN_DEVSTS_SERVICE_H
#define QUORLIN_DEVSTS_SERVICE_H

#include "devsts/Clock.h"
#include "devsts/Directory.h"
#include "devsts/Identity.h"
#include "devsts/RequestHandler.h"
#include "devsts/RequestLog.h"

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace DevSts {

/// The one path that the service answers on.
constexpr const char* kServicePath = "/sts";

struct ServiceConfig {
  std::string address = "127.0.0.1";  ///< A literal IP address to listen on.
  std::uint16_t port = 0;             ///< 0: any free port.
  bool tls = true;
  Directory directory = Directory::MakeSample();
  HandlerOptions handler;
  /// By how many seconds the service's clock is ahead of the system's.
  long long clockOffsetSec = 0;
  /// How long every answer is held back.
  std::chrono::milliseconds delay{0};
  /// What the tokens are signed with; absent: a new key with a certificate from the service's own authority.
  std::optional<Identity> signer;
  /// What TLS clients are shown; absent: a new key with a certificate from the service's own authority.
  std::optional<Identity> server;
  /// The names in the new TLS certificate; empty: localhost, its addresses, and `address`.
  std::vector<std::string> serverNames;
  /// Takes the request log; empty: nobody does.
  LogSink log;
};

/// A token service that runs inside this process from construction to destruction, on threads of its own.
/// Several may run at once. It is made for development and tests: its authority is new each time, and its
/// passwords are kept in the clear.
class Service final {
 public:
  /// Makes keys and certificates and starts to serve. Throws std::exception of some kind, saying why, when it
  /// cannot.
  explicit Service(const ServiceConfig& config);
  Service(const Service&) = delete;
  Service& operator=(const Service&) = delete;
  /// Stops it.
  ~Service();

  /// Stops serving: all connections are closed, running requests are waited for. May be called more than
  /// once.
  void Stop();

  /// From the next request on the service knows these users; tokens of others are no longer valid subjects to
  /// it.
  void SetDirectory(const Directory& directory) { _handler.SetDirectory(directory); }

  /// Where the service is reached: "https://127.0.0.1:41234/sts".
  const std::string& GetUrl() const { return _url; }

  /// PEM of the authority that a TLS client has to trust.
  const std::string& GetCaCertificate() const { return _authority.GetCertificate(); }
  /// PEM of the TLS server's certificate; empty without TLS.
  const std::string& GetServerCertificate() const { return _serverCertificate; }
  /// PEM of the certificate that tokens are signed with.
  const std::string& GetSigningCertificate() const { return _signer.certificate; }

 private:
  CertificateAuthority _authority;
  Identity _signer;
  std::string _serverCertificate;
  RequestHandler _handler;
  std::unique_ptr<class HttpServer> _server;
  std::string _url;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_SERVICE_H
