// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/HttpServer.h"

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/strand.hpp>
#include <boost/beast/core.hpp>
#include <boost/beast/http.hpp>
#include <boost/beast/ssl/ssl_stream.hpp>

#include <algorithm>
#include <chrono>
#include <stdexcept>
#include <thread>
#include <utility>
#include <vector>

#include <fcntl.h>

namespace DevSts {

namespace {

namespace asio = boost::asio;
namespace beast = boost::beast;
namespace http = boost::beast::http;
using Tcp = asio::ip::tcp;
using boost::system::error_code;

/// A client that takes longer to send or to read is dropped.
constexpr std::chrono::seconds kIdleTimeout{30};

/// After a failed accept.
constexpr std::chrono::milliseconds kAcceptPause{100};

HttpRequest ToRequest(const http::request<http::string_body>& message) {
  HttpRequest request;
  request.method = message.method_string().to_string();
  request.target = message.target().to_string();
  request.contentType = message[http::field::content_type].to_string();
  request.soapAction = message[http::field::soapaction].to_string();
  request.cookie = message[http::field::cookie].to_string();
  request.body = message.body();
  return request;
}

HttpResponse Call(const HttpServer::Handler& handler, const HttpRequest& request) {
  try {
    return handler(request);
  } catch (const std::exception&) {
    HttpResponse response;
    response.status = 500;
    response.contentType = "text/plain";
    response.body = "The service failed.\n";
    return response;
  }
}

http::response<http::string_body> ToMessage(HttpResponse response,
                                            const http::request<http::string_body>& request) {
  http::response<http::string_body> message(static_cast<http::status>(response.status), request.version());
  message.set(http::field::content_type, response.contentType);
  if (!response.date.empty()) {
    message.set(http::field::date, response.date);
  }
  if (!response.allow.empty()) {
    message.set(http::field::allow, response.allow);
  }
  if (!response.setCookie.empty()) {
    message.set(http::field::set_cookie, response.setCookie);
  }
  message.keep_alive(request.keep_alive());
  message.body() = std::move(response.body);
  message.prepare_payload();
  return message;
}

/// One connection: reads a request, answers it, and starts over until either side ends it. Kept alive by the
/// operation that is under way.
template <typename Stream>
class Session final : public std::enable_shared_from_this<Session<Stream>> {
 public:
  template <typename... StreamArguments>
  explicit Session(const HttpServer::Handler& handler, StreamArguments&&... arguments)
      : _stream(std::forward<StreamArguments>(arguments)...),
        _handler(handler),
        _delay(_stream.get_executor()) {}

  void Run() {
    beast::get_lowest_layer(_stream).expires_after(kIdleTimeout);
    if constexpr (kHasTls) {
      _stream.async_handshake(asio::ssl::stream_base::server,
                              [self = this->shared_from_this()](error_code error) {
                                if (!error) {
                                  self->Read();
                                }
                              });
    } else {
      Read();
    }
  }

 private:
  static constexpr bool kHasTls = !std::is_same_v<Stream, beast::tcp_stream>;

  void Read() {
    _parser.emplace();
    _parser->body_limit(kMaxRequestBytes);
    _parser->header_limit(kMaxRequestHeaderBytes);
    beast::get_lowest_layer(_stream).expires_after(kIdleTimeout);
    http::async_read(_stream, _buffer, *_parser,
                     [self = this->shared_from_this()](error_code error, std::size_t) {
                       if (!error) {
                         self->Answer();
                       } else {
                         self->Close();
                       }
                     });
  }

  void Answer() {
    HttpResponse response = Call(_handler, ToRequest(_parser->get()));
    if (response.delay <= response.delay.zero()) {
      Finish(std::move(response));
      return;
    }
    beast::get_lowest_layer(_stream).expires_never();
    _delay.expires_after(response.delay);
    _delay.async_wait([self = this->shared_from_this(), response](error_code error) {
      if (!error) {
        self->Finish(response);
      }
    });
  }

  void Finish(HttpResponse response) {
    if (response.isDropped) {
      beast::get_lowest_layer(_stream).close();
      return;
    }
    _response = ToMessage(std::move(response), _parser->get());
    beast::get_lowest_layer(_stream).expires_after(kIdleTimeout);
    http::async_write(_stream, _response, [self = this->shared_from_this()](error_code error, std::size_t) {
      if (!error && self->_response.keep_alive()) {
        self->Read();
      } else {
        self->Close();
      }
    });
  }

  void Close() {
    if constexpr (kHasTls) {
      beast::get_lowest_layer(_stream).expires_after(kIdleTimeout);
      _stream.async_shutdown([self = this->shared_from_this()](error_code) {});
    } else {
      error_code ignored;
      _stream.socket().shutdown(Tcp::socket::shutdown_send, ignored);
    }
  }

  Stream _stream;
  const HttpServer::Handler& _handler;
  beast::flat_buffer _buffer;
  std::optional<http::request_parser<http::string_body>> _parser;
  http::response<http::string_body> _response;
  asio::steady_timer _delay;
};

void RequireOk(long result, const char* what) {
  if (result != 1) {
    throw std::runtime_error(std::string("the TLS server cannot use its ") + what);
  }
}

void SetUpTls(asio::ssl::context& context, const Identity& identity) {
  SSL_CTX* const handle = context.native_handle();
  RequireOk(SSL_CTX_set_min_proto_version(handle, TLS1_2_VERSION), "protocol version");
  context.use_certificate_chain(asio::buffer(identity.certificate));
  RequireOk(SSL_CTX_use_PrivateKey(handle, identity.key.get()), "key");
  // Session tickets need no identifier of the sessions, resumption by session identifier does
  // (SSL_CTX_set_session_id_context(3)).
  static const unsigned char kSessionContext[] = "quorlin-devsts";
  RequireOk(SSL_CTX_set_session_id_context(handle, kSessionContext, sizeof(kSessionContext) - 1),
            "session context");
}

Tcp::endpoint ToEndpoint(const HttpServerOptions& options) {
  error_code error;
  const asio::ip::address address = asio::ip::make_address(options.address, error);
  if (error) {
    throw std::runtime_error("not an IP address: " + options.address);
  }
  return Tcp::endpoint(address, options.port);
}

/// A program that the process starts must not hold our sockets: the port would stay open after our end, and
/// clients would wait for answers that nobody gives.
void KeepFromChildren(int socket) {
  fcntl(socket, F_SETFD, FD_CLOEXEC);
}

Tcp::acceptor Listen(asio::io_context& context, const HttpServerOptions& options) {
  const Tcp::endpoint endpoint = ToEndpoint(options);
  try {
    Tcp::acceptor acceptor(context, endpoint, true);
    KeepFromChildren(acceptor.native_handle());
    return acceptor;
  } catch (const boost::system::system_error& e) {
    throw std::runtime_error("cannot listen on " + options.address + " port " + std::to_string(options.port) +
                             ": " + e.code().message());
  }
}

}  // namespace

class HttpServer::Impl final {
 public:
  Impl(const HttpServerOptions& options, const Handler& handler)
      : _tls(asio::ssl::context::tls_server),
        _hasTls(options.tls.has_value()),
        _handler(handler),
        _acceptor(Listen(_context, options)),
        _retry(_context),
        _port(_acceptor.local_endpoint().port()) {
    if (_hasTls) {
      SetUpTls(_tls, *options.tls);
    }
    Accept();
    StartThreads();
  }

  ~Impl() { Stop(); }

  std::uint16_t GetPort() const { return _port; }

 private:
  void StartThreads() {
    const unsigned count = std::max(2U, std::thread::hardware_concurrency());
    try {
      for (unsigned i = 0; i < count; ++i) {
        _threads.emplace_back([this] { _context.run(); });
      }
    } catch (...) {
      Stop();
      throw;
    }
  }

  /// What is still under way is dropped with the context, after the last thread has left it.
  void Stop() {
    _context.stop();
    for (std::thread& thread : _threads) {
      thread.join();
    }
    _threads.clear();
  }

  void Accept() {
    _acceptor.async_accept(asio::make_strand(_context), [this](error_code error, Tcp::socket socket) {
      if (error == asio::error::operation_aborted) {
        return;
      }
      if (error) {
        AcceptLater();
        return;
      }
      KeepFromChildren(socket.native_handle());
      Serve(std::move(socket));
      Accept();
    });
  }

  /// Out of descriptors, most likely: waiting gives connections time to end.
  void AcceptLater() {
    _retry.expires_after(kAcceptPause);
    _retry.async_wait([this](error_code error) {
      if (!error) {
        Accept();
      }
    });
  }

  void Serve(Tcp::socket socket) {
    // Answers are written in one go. Without this the last segment of one may wait for the client's delayed
    // acknowledgement, which takes 40 ms.
    error_code ignored;
    socket.set_option(Tcp::no_delay(true), ignored);
    if (_hasTls) {
      std::make_shared<Session<beast::ssl_stream<beast::tcp_stream>>>(_handler, std::move(socket), _tls)
          ->Run();
    } else {
      std::make_shared<Session<beast::tcp_stream>>(_handler, std::move(socket))->Run();
    }
  }

  // The order matters: sessions live in the context's queues, and they use the handler and the TLS settings.
  asio::ssl::context _tls;
  bool _hasTls;
  Handler _handler;
  asio::io_context _context;
  Tcp::acceptor _acceptor;
  asio::steady_timer _retry;
  std::uint16_t _port;
  std::vector<std::thread> _threads;
};

HttpServer::HttpServer(const HttpServerOptions& options, const Handler& handler)
    : _impl(std::make_unique<Impl>(options, handler)) {}

HttpServer::~HttpServer() = default;

std::uint16_t HttpServer::GetPort() const {
  return _impl->GetPort();
}

}  // namespace DevSts
