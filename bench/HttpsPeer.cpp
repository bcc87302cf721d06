// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "bench/HttpsPeer.h"

#include "pelmar/crypto/CertificateImpl.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <openssl/ssl.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <memory>
#include <stdexcept>
#include <thread>

namespace Bench {

namespace {

struct TlsDeleter {
  void operator()(SSL_CTX* context) const noexcept { SSL_CTX_free(context); }
  void operator()(SSL* connection) const noexcept { SSL_free(connection); }
};

using TlsContext = std::unique_ptr<SSL_CTX, TlsDeleter>;

class Socket final {
 public:
  explicit Socket(int number) : _number(number) {}
  Socket(const Socket&) = delete;
  Socket& operator=(const Socket&) = delete;
  ~Socket() { close(_number); }
  int Get() const { return _number; }

 private:
  const int _number;
};

void Require(bool holds, const char* what) {
  if (!holds) {
    throw std::runtime_error(what);
  }
}

TlsContext MakeContext(const TestSupport::Identity& identity, HttpsPeer::Resumption resumption) {
  TlsContext context(SSL_CTX_new(TLS_server_method()));
  const auto certificate = Pelmar::Crypto::ToCertificateImpl(identity.certificate.Get());
  Require(context && SSL_CTX_use_certificate(context.get(), certificate->GetX509()) == 1 &&
              SSL_CTX_use_PrivateKey(context.get(), identity.keyPair.GetHandle()) == 1,
          "the TLS server cannot be set up");
  if (resumption == HttpsPeer::NEVER_RESUMES) {
    SSL_CTX_set_session_cache_mode(context.get(), SSL_SESS_CACHE_OFF);
    SSL_CTX_set_num_tickets(context.get(), 0);
    SSL_CTX_set_options(context.get(), SSL_OP_NO_TICKET);
  }
  return context;
}

/// Listens; the port is left in `port`.
int Listen(int& port) {
  const int listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t size = sizeof address;
  auto* const anyAddress = reinterpret_cast<sockaddr*>(&address);
  Require(listener >= 0 && bind(listener, anyAddress, size) == 0 && listen(listener, SOMAXCONN) == 0 &&
              getsockname(listener, anyAddress, &size) == 0,
          "the TLS server cannot listen");
  port = ntohs(address.sin_port);
  return listener;
}

/// Reads one request with its body; false at the connection's end.
bool ReadRequest(SSL* connection, std::string& unread) {
  static const std::string kLength = "Content-Length: ";
  char buffer[16384];
  for (;;) {
    const std::size_t end = unread.find("\r\n\r\n");
    const std::size_t length = end == std::string::npos ? end : unread.find(kLength);
    if (length != std::string::npos) {
      const std::size_t size = end + 4 + std::strtoul(unread.c_str() + length + kLength.size(), nullptr, 10);
      if (unread.size() >= size) {
        unread.erase(0, size);
        return true;
      }
    }
    const int count = SSL_read(connection, buffer, sizeof buffer);
    if (count <= 0) {
      return false;
    }
    unread.append(buffer, static_cast<std::size_t>(count));
  }
}

void ServeConnection(SSL_CTX* context, int number, const std::string& answer) {
  const Socket socket(number);
  const int on = 1;
  setsockopt(number, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
  const std::unique_ptr<SSL, TlsDeleter> connection(SSL_new(context));
  if (!connection || SSL_set_fd(connection.get(), number) != 1 || SSL_accept(connection.get()) != 1) {
    return;
  }
  std::string unread;
  while (ReadRequest(connection.get(), unread) &&
         SSL_write(connection.get(), answer.data(), static_cast<int>(answer.size())) > 0) {
  }
  SSL_shutdown(connection.get());
}

[[noreturn]] void Serve(SSL_CTX* context, int listener, const std::string& answer) {
  // It ends with its parent, also when that is killed.
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  std::signal(SIGPIPE, SIG_IGN);
  for (;;) {
    const int number = accept(listener, nullptr, nullptr);
    if (number < 0) {
      _exit(EXIT_FAILURE);
    }
    std::thread([=, &answer] { ServeConnection(context, number, answer); }).detach();
  }
}

}  // namespace

HttpsPeer::HttpsPeer(const TestSupport::Identity& identity, const std::string& body, Resumption resumption) {
  const std::string answer =
      "HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\nContent-Length: " + std::to_string(body.size()) +
      "\r\n\r\n" + body;
  const TlsContext context = MakeContext(identity, resumption);
  const Socket listener(Listen(_port));
  _process = fork();
  Require(_process >= 0, "the TLS server cannot be started");
  if (_process == 0) {
    Serve(context.get(), listener.Get(), answer);
  }
}

HttpsPeer::~HttpsPeer() {
  kill(_process, SIGKILL);
  waitpid(_process, nullptr, 0);
}

}  // namespace Bench
