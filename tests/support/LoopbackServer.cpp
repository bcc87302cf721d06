// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/LoopbackServer.h"

#include "support/LoopbackSocket.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <pthread.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <thread>
#include <utility>

namespace TestSupport {

namespace {

/// Thrown to break a script off.
struct Broken {};

constexpr int kBacklog = 512;
constexpr std::size_t kReadSize = 16384;

// OpenSSL writes without MSG_NOSIGNAL.
void BlockSigpipe() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGPIPE);
  pthread_sigmask(SIG_BLOCK, &signals, nullptr);
}

struct X509Deleter {
  void operator()(X509* certificate) const noexcept { X509_free(certificate); }
};
using X509Owner = std::unique_ptr<X509, X509Deleter>;

X509Owner ToX509(const Identity& identity) {
  const std::vector<unsigned char>& der = identity.certificate->GetDer();
  const unsigned char* data = der.data();
  X509Owner certificate(d2i_X509(nullptr, &data, static_cast<long>(der.size())));
  Require(certificate != nullptr, "bad certificate");
  return certificate;
}

void DemandClientCertificate(SSL_CTX* context, const Identity& ca) {
  Require(X509_STORE_add_cert(SSL_CTX_get_cert_store(context), ToX509(ca).get()) == 1, "bad client CA");
  SSL_CTX_set_verify(context, SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, nullptr);
}

/// Called within `StartTls`, which has said where to. None is chosen.
int NoteProtocols(SSL* tls, const unsigned char**, unsigned char*, const unsigned char* data, unsigned size,
                  void*) {
  static_cast<std::string*>(SSL_get_app_data(tls))->assign(data, data + size);
  return SSL_TLSEXT_ERR_NOACK;
}

SSL_CTX* MakeTlsContext(const TlsServerSettings& settings) {
  SSL_CTX* const context = SSL_CTX_new(TLS_server_method());
  Require(context != nullptr, "no TLS context");
  const std::string sessionContext = "test";
  SSL_CTX_set_session_id_context(context, reinterpret_cast<const unsigned char*>(sessionContext.data()),
                                 static_cast<unsigned>(sessionContext.size()));
  // Old protocol versions need SHA-1.
  SSL_CTX_set_security_level(context, settings.maxVersion == 0 ? 2 : 0);
  SSL_CTX_set_min_proto_version(context, 0);
  SSL_CTX_set_max_proto_version(context, settings.maxVersion);
  SSL_CTX_set_alpn_select_cb(context, NoteProtocols, nullptr);
  Require(SSL_CTX_use_certificate(context, ToX509(settings.identity).get()) == 1, "bad server certificate");
  Require(SSL_CTX_use_PrivateKey(context, settings.identity.keyPair.GetHandle()) == 1, "bad server key");
  for (const Identity& issuer : settings.chain) {
    Require(SSL_CTX_add1_chain_cert(context, ToX509(issuer).get()) == 1, "bad chain");
  }
  SSL_CTX_set_mode(context, SSL_MODE_NO_AUTO_CHAIN);
  if (settings.clientCa) {
    DemandClientCertificate(context, *settings.clientCa);
  }
  return context;
}

int WriteToConnection(BIO* bio, const char* data, int size) {
  auto* const connection = static_cast<ServerConnection*>(BIO_get_data(bio));
  return connection->SendSlowly(data, static_cast<std::size_t>(size)) ? size : -1;
}

long ControlSlowBio(BIO*, int command, long, void*) {
  return command == BIO_CTRL_FLUSH ? 1 : 0;
}

/// Sends through `connection`.
BIO* MakeSlowBio(ServerConnection* connection) {
  static BIO_METHOD* const method = [] {
    BIO_METHOD* const made = BIO_meth_new(BIO_get_new_index() | BIO_TYPE_SOURCE_SINK, "slow");
    BIO_meth_set_write(made, WriteToConnection);
    BIO_meth_set_ctrl(made, ControlSlowBio);
    return made;
  }();
  BIO* const bio = BIO_new(method);
  Require(bio != nullptr, "no BIO");
  BIO_set_data(bio, connection);
  BIO_set_init(bio, 1);
  return bio;
}

/// How many connections of this machine to that port await the answer to their SYN.
int CountAttempts(int port) {
  char address[16];
  std::snprintf(address, sizeof address, "0100007F:%04X", static_cast<unsigned>(port));
  std::ifstream table("/proc/net/tcp");
  Require(table.is_open(), "no table of connections");
  int count = 0;
  std::string line;
  while (std::getline(table, line)) {
    std::istringstream fields(line);
    std::string number, local, remote, state;
    fields >> number >> local >> remote >> state;
    count += remote == address && state == "02" ? 1 : 0;
  }
  return count;
}

/// How many bytes of body the head announces.
std::size_t ReadContentLength(const std::string& head) {
  const std::string name = "Content-Length: ";
  const std::size_t start = head.find(name);
  return start == std::string::npos ? 0 : std::strtoul(head.c_str() + start + name.size(), nullptr, 10);
}

}  // namespace

// --- ServerConnection ---

void ServerConnection::TlsDeleter::operator()(SSL* tls) const noexcept {
  SSL_free(tls);
}

ServerConnection::ServerConnection(LoopbackServer& server, std::size_t index, int socket)
    : _server(server),
      _index(index),
      _socket(socket),
      _bytesBeforeSilence(server._tlsSettings ? server._tlsSettings->bytesBeforeSilence : 0) {}

ServerConnection::~ServerConnection() {
  const std::lock_guard<std::mutex> lock(_server._mutex);
  _server._sockets[_index] = -1;
  if (_socket >= 0) {
    ::close(_socket);
  }
}

void ServerConnection::StartTls() {
  _tls.reset(SSL_new(_server._tlsContext.get()));
  Require(_tls != nullptr, "no TLS");
  SSL_set_fd(_tls.get(), _socket);
  std::string protocols;
  SSL_set_app_data(_tls.get(), &protocols);
  if (_server._tlsSettings->inSingleBytes) {
    SSL_set0_wbio(_tls.get(), MakeSlowBio(this));
  }
  const bool isSecured = SSL_accept(_tls.get()) == 1;
  const char* const name = SSL_get_servername(_tls.get(), TLSEXT_NAMETYPE_host_name);
  _server.Change(_index, [&](ConnectionRecord& record) {
    record.isSecured = isSecured;
    record.wasResumed = isSecured && SSL_session_reused(_tls.get()) == 1;
    record.serverNameAsked = name == nullptr ? "" : name;
    record.protocolsAsked = protocols;
  });
  SSL_set_app_data(_tls.get(), nullptr);
  if (!isSecured) {
    // Read on, for closing over unread bytes would reset the connection and could take the alert with it.
    _tls.reset();
    CloseWithoutNotice();
    throw Broken();
  }
}

bool ServerConnection::SendSlowly(const char* data, std::size_t size) {
  for (; size > 0 && _bytesBeforeSilence > 0; --size, --_bytesBeforeSilence) {
    if (::send(_socket, data++, 1, MSG_NOSIGNAL) != 1) {
      return false;
    }
  }
  return true;
}

std::string ServerConnection::Receive() {
  char buffer[kReadSize];
  const long count =
      _tls ? SSL_read(_tls.get(), buffer, sizeof buffer) : ::recv(_socket, buffer, sizeof buffer, 0);
  if (count <= 0) {
    throw Broken();
  }
  std::string bytes(buffer, static_cast<std::size_t>(count));
  _server.Change(_index, [&](ConnectionRecord& record) { record.received += bytes; });
  return bytes;
}

void ServerConnection::ReadSome() {
  Receive();
}

void ServerConnection::ReadRequest() {
  const std::string headEnd = "\r\n\r\n";
  while (_unread.find(headEnd) == std::string::npos) {
    _unread += Receive();
  }
  const std::size_t headSize = _unread.find(headEnd) + headEnd.size();
  const std::size_t size = headSize + ReadContentLength(_unread.substr(0, headSize));
  while (_unread.size() < size) {
    _unread += Receive();
  }
  _unread.erase(0, size);
  _server.Change(_index, [](ConnectionRecord& record) { ++record.requests; });
}

void ServerConnection::Write(const char* data, std::size_t size) {
  const long count =
      _tls ? SSL_write(_tls.get(), data, static_cast<int>(size)) : ::send(_socket, data, size, MSG_NOSIGNAL);
  if (count != static_cast<long>(size)) {
    throw Broken();
  }
}

void ServerConnection::Send(const std::string& bytes) {
  if (!bytes.empty()) {
    Write(bytes.data(), bytes.size());
  }
}

void ServerConnection::SendForever(const std::string& bytes) {
  for (;;) {
    Send(bytes);
  }
}

void ServerConnection::AwaitRelease() {
  std::unique_lock<std::mutex> lock(_server._mutex);
  _server._changed.wait(lock, [&] { return _server._isReleased || _server._isStopping; });
  if (_server._isStopping) {
    throw Broken();
  }
}

void ServerConnection::AwaitPeerEnd() {
  try {
    for (;;) {
      Receive();
    }
  } catch (const Broken&) {
    // That is what was waited for.
  }
}

void ServerConnection::Close() {
  if (_tls) {
    SSL_shutdown(_tls.get());
  }
  CloseWithoutNotice();
}

void ServerConnection::EndSending() {
  if (_tls) {
    SSL_shutdown(_tls.get());
  }
  ::shutdown(_socket, SHUT_WR);
  // The acknowledgement of our end is on its way; nothing else tells of it.
  tcp_info info = {};
  do {
    std::this_thread::yield();
    socklen_t size = sizeof info;
    Require(::getsockopt(_socket, IPPROTO_TCP, TCP_INFO, &info, &size) == 0, "no state");
  } while (info.tcpi_state == TCP_FIN_WAIT1);
}

void ServerConnection::CloseWithoutNotice() {
  ::shutdown(_socket, SHUT_WR);
  char buffer[kReadSize];
  while (::recv(_socket, buffer, sizeof buffer, 0) > 0) {
  }
}

void ServerConnection::Reset() {
  const linger hard = {1, 0};
  ::setsockopt(_socket, SOL_SOCKET, SO_LINGER, &hard, sizeof hard);
  _tls.reset();
  const std::lock_guard<std::mutex> lock(_server._mutex);
  _server._sockets[_index] = -1;
  ::close(_socket);
  _socket = -1;
}

// --- LoopbackServer ---

void LoopbackServer::TlsContextDeleter::operator()(SSL_CTX* context) const noexcept {
  SSL_CTX_free(context);
}

LoopbackServer::LoopbackServer(std::vector<Script> scripts) : _scripts(std::move(scripts)) {
  Bind();
  Listen();
}

LoopbackServer::LoopbackServer(ClosedPort& port, std::vector<Script> scripts)
    : _scripts(std::move(scripts)), _listener(port.TakeSocket()), _port(port.GetPort()) {
  Listen();
}

LoopbackServer::LoopbackServer(const TlsServerSettings& settings, std::vector<Script> scripts)
    : _scripts(std::move(scripts)), _tlsSettings(settings), _tlsContext(MakeTlsContext(settings)) {
  Bind();
  Listen();
}

LoopbackServer::~LoopbackServer() {
  {
    const std::lock_guard<std::mutex> lock(_mutex);
    _isStopping = true;
    for (const int socket : _sockets) {
      if (socket >= 0) {
        ::shutdown(socket, SHUT_RDWR);
      }
    }
  }
  _changed.notify_all();
  ::shutdown(_listener, SHUT_RDWR);
  _acceptor.join();
  for (std::thread& thread : _threads) {
    thread.join();
  }
  ::close(_listener);
}

std::string LoopbackServer::GetEndpoint() const {
  return "127.0.0.1:" + std::to_string(_port);
}

void LoopbackServer::Bind() {
  _listener = BindSocket(_port);
}

void LoopbackServer::Listen() {
  Require(::listen(_listener, kBacklog) == 0, "cannot listen");
  _acceptor = std::thread([this] { Accept(); });
}

void LoopbackServer::Accept() {
  BlockSigpipe();
  for (;;) {
    const int socket = ::accept4(_listener, nullptr, nullptr, SOCK_CLOEXEC);
    if (socket < 0 && errno == EMFILE) {
      // A test may take all descriptors away for a while, and this thread may have come late.
      std::this_thread::yield();
      continue;
    }
    const std::lock_guard<std::mutex> lock(_mutex);
    if (socket < 0 || _isStopping) {
      if (socket >= 0) {
        ::close(socket);
      }
      return;
    }
    // Or a script that sends twice would wait for the peer's delayed acknowledgement in between.
    const int noDelay = 1;
    ::setsockopt(socket, IPPROTO_TCP, TCP_NODELAY, &noDelay, sizeof noDelay);
    const std::size_t index = _records.size();
    _records.emplace_back();
    _sockets.push_back(socket);
    _threads.emplace_back([this, index, socket] { Serve(index, socket); });
    _changed.notify_all();
  }
}

void LoopbackServer::Serve(std::size_t index, int socket) {
  {
    ServerConnection connection(*this, index, socket);
    try {
      if (_tlsContext && !_tlsSettings->startsByScript) {
        connection.StartTls();
      }
      _scripts[std::min(index, _scripts.size() - 1)](connection);
    } catch (const Broken&) {
      // The peer is gone, or the test is over.
    }
  }
  Change(index, [](ConnectionRecord& record) { record.isEnded = true; });
}

void LoopbackServer::Change(std::size_t connection, const std::function<void(ConnectionRecord&)>& change) {
  const std::lock_guard<std::mutex> lock(_mutex);
  change(_records[connection]);
  _changed.notify_all();
}

void LoopbackServer::Release() {
  const std::lock_guard<std::mutex> lock(_mutex);
  _isReleased = true;
  _changed.notify_all();
}

void LoopbackServer::StopListening() {
  ::shutdown(_listener, SHUT_RDWR);
}

void LoopbackServer::AwaitConnections(std::size_t count) {
  std::unique_lock<std::mutex> lock(_mutex);
  _changed.wait(lock, [&] { return _records.size() >= count; });
}

void LoopbackServer::AwaitRequests(std::size_t count) {
  std::unique_lock<std::mutex> lock(_mutex);
  _changed.wait(lock, [&] {
    std::size_t requests = 0;
    for (const ConnectionRecord& record : _records) {
      requests += record.requests;
    }
    return requests >= count;
  });
}

void LoopbackServer::AwaitEnd(std::size_t connection) {
  std::unique_lock<std::mutex> lock(_mutex);
  _changed.wait(lock, [&] { return _records.size() > connection && _records[connection].isEnded; });
}

std::size_t LoopbackServer::CountConnections() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _records.size();
}

ConnectionRecord LoopbackServer::GetRecord(std::size_t connection) const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _records.at(connection);
}

// --- FullListener ---

FullListener::FullListener() {
  _sockets.push_back(BindSocket(_port));
  Require(::listen(_sockets[0], 0) == 0, "cannot listen");
  const sockaddr_in address = MakeAddress(_port);
  tcp_info info = {};
  // Loopback connections that find room are established when connect() returns; the first that is not found
  // the queue full.
  do {
    const int socket = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    Require(socket >= 0, "no socket");
    _sockets.push_back(socket);
    static_cast<void>(::connect(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address));
    socklen_t size = sizeof info;
    Require(::getsockopt(socket, IPPROTO_TCP, TCP_INFO, &info, &size) == 0, "no socket state");
  } while (info.tcpi_state != TCP_SYN_SENT);
}

void FullListener::AwaitAttempt() const {
  // There is one attempt of our own. Nobody but the system knows of such; it tells nobody unasked.
  constexpr int kOwnAttempts = 1;
  while (CountAttempts(_port) <= kOwnAttempts) {
    std::this_thread::yield();
  }
}

FullListener::~FullListener() {
  for (const int socket : _sockets) {
    ::close(socket);
  }
}

// --- ClosedPort ---

ClosedPort::ClosedPort() : _socket(BindSocket(_port)) {}

ClosedPort::~ClosedPort() {
  if (_socket >= 0) {
    ::close(_socket);
  }
}

int ClosedPort::TakeSocket() {
  return std::exchange(_socket, -1);
}

}  // namespace TestSupport
