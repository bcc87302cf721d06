// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A small HTTP/1.1 server, with TLS or without.

#ifndef QUORLIN_DEVSTS_HTTPSERVER_H
#define QUORLIN_DEVSTS_HTTPSERVER_H

#include "devsts/Identity.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace DevSts {

struct HttpRequest {
  std::string method;
  std::string target;
  std::string contentType;  ///< Empty: no such header.
  std::string soapAction;   ///< Empty: no such header.
  std::string cookie;       ///< Empty: no such header.
  std::string body;
};

struct HttpResponse {
  int status = 200;
  std::string contentType;
  std::string body;
  std::string allow;                   ///< For the Allow header; empty: none.
  std::string setCookie;               ///< For the Set-Cookie header; empty: none.
  std::string date;                    ///< For the Date header; empty: none.
  std::chrono::milliseconds delay{0};  ///< How long to hold the answer back. Keeps no thread busy.
  bool isDropped = false;              ///< Instead of an answer the connection is closed.
};

struct HttpServerOptions {
  std::string address = "127.0.0.1";  ///< A literal IP address.
  std::uint16_t port = 0;             ///< 0: any free port.
  std::optional<Identity> tls;        ///< Absent: plain HTTP.
};

/// What the server refuses before the handler sees it.
constexpr std::size_t kMaxRequestBytes = 1024 * 1024;
constexpr std::uint32_t kMaxRequestHeaderBytes = 16 * 1024;

/// Serves from its own threads as long as it lives.
class HttpServer final {
 public:
  /// Called on the server's threads, several at once. An exception that escapes it becomes a plain 500.
  using Handler = std::function<HttpResponse(const HttpRequest&)>;

  /// Listens from here on. Throws std::runtime_error, saying why, when it cannot.
  HttpServer(const HttpServerOptions& options, const Handler& handler);
  HttpServer(const HttpServer&) = delete;
  HttpServer& operator=(const HttpServer&) = delete;
  /// Closes all connections and waits for running handlers.
  ~HttpServer();

  std::uint16_t GetPort() const;

 private:
  class Impl;
  std::unique_ptr<Impl> _impl;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_HTTPSERVER_H
