// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A TCP or TLS server on 127.0.0.1 that does to its peers exactly what a test tells it to.

#ifndef QUORLIN_TESTS_SUPPORT_LOOPBACKSERVER_H
#define QUORLIN_TESTS_SUPPORT_LOOPBACKSERVER_H

#include "support/Pki.h"

#include <condition_variable>
#include <cstddef>
#include <functional>
#include <limits>
#include <list>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

struct ssl_st;
struct ssl_ctx_st;

namespace TestSupport {

class ClosedPort;
class LoopbackServer;

/// What the server keeps of one connection.
struct ConnectionRecord {
  std::string received;         ///< Every byte read, decrypted.
  std::size_t requests = 0;     ///< How many whole requests were read.
  bool isSecured = false;       ///< A TLS handshake was completed.
  bool wasResumed = false;      ///< ... by resuming an earlier session.
  std::string serverNameAsked;  ///< The name of the server_name extension.
  std::string protocolsAsked;   ///< What the ALPN extension holds: names, each behind a byte with its length.
  bool isEnded = false;         ///< The script is done, or the peer or the test broke it off.
};

/// The server's end of one connection, for the thread that runs its script. What cannot be done because the
/// peer is gone or the server ends breaks the script off.
class ServerConnection final {
 public:
  ServerConnection(LoopbackServer& server, std::size_t index, int socket);
  ServerConnection(const ServerConnection&) = delete;
  ServerConnection& operator=(const ServerConnection&) = delete;
  ~ServerConnection();

  /// The server's side of the handshake, as the server's settings say.
  void StartTls();
  /// For OpenSSL: sends byte by byte, and nothing after as many as the settings say. All is taken.
  bool SendSlowly(const char* data, std::size_t size);
  /// Reads up to the end of one request: the empty line, and as many bytes as its Content-Length says.
  void ReadRequest();
  /// Reads at least one byte.
  void ReadSome();
  void Send(const std::string& bytes);
  /// Sends `bytes` over and over until the peer breaks it off.
  void SendForever(const std::string& bytes);
  /// Blocks until the test releases the server.
  void AwaitRelease();
  /// Reads until the peer closes or resets the connection.
  void AwaitPeerEnd();
  /// Ends the connection the proper way (with TLS: close_notify), and reads what the peer still sends.
  void Close();
  /// Ends its own direction the proper way, and comes back when the peer's system knows.
  void EndSending();
  /// The same as `Close` without TLS's close_notify.
  void CloseWithoutNotice();
  /// Ends it with a TCP reset.
  void Reset();

  std::size_t GetIndex() const { return _index; }

 private:
  std::string Receive();
  void Write(const char* data, std::size_t size);

  LoopbackServer& _server;
  const std::size_t _index;
  int _socket;
  struct TlsDeleter {
    void operator()(ssl_st* tls) const noexcept;
  };
  std::size_t _bytesBeforeSilence;
  std::unique_ptr<ssl_st, TlsDeleter> _tls;
  std::string _unread;
};

struct TlsServerSettings {
  explicit TlsServerSettings(const Identity& serverIdentity) : identity(serverIdentity) {}

  Identity identity;
  std::vector<Identity> chain;       ///< Sent after the identity's own certificate.
  std::optional<Identity> clientCa;  ///< Demand a client certificate issued by it.
  int maxVersion = 0;                ///< One of OpenSSL's version numbers; 0: the newest.
  bool startsByScript = false;       ///< Connections begin without TLS, and scripts call `StartTls`.
  bool inSingleBytes = false;        ///< Everything is sent byte by byte.
  /// With inSingleBytes: after so many bytes of TLS nothing is sent any more.
  std::size_t bytesBeforeSilence = std::numeric_limits<std::size_t>::max();
};

/// Runs one script per connection, each on a thread of its own, in the order in which the connections come.
/// The last script serves all further ones too. The destructor breaks off what still runs.
class LoopbackServer final {
 public:
  using Script = std::function<void(ServerConnection&)>;

  explicit LoopbackServer(std::vector<Script> scripts);
  /// At that port, from now on.
  LoopbackServer(ClosedPort& port, std::vector<Script> scripts);
  /// Every script starts after `StartTls`, unless the settings leave that to it.
  LoopbackServer(const TlsServerSettings& settings, std::vector<Script> scripts);
  LoopbackServer(const LoopbackServer&) = delete;
  LoopbackServer& operator=(const LoopbackServer&) = delete;
  ~LoopbackServer();

  int GetPort() const { return _port; }
  /// "127.0.0.1:PORT".
  std::string GetEndpoint() const;

  /// Lets all current and later `AwaitRelease` go on.
  void Release();

  /// Refuses further connections; those that stand go on.
  void StopListening();

  /// Block until it is so.
  void AwaitConnections(std::size_t count);
  void AwaitRequests(std::size_t count);
  void AwaitEnd(std::size_t connection);

  std::size_t CountConnections() const;
  ConnectionRecord GetRecord(std::size_t connection) const;

 private:
  friend class ServerConnection;

  struct TlsContextDeleter {
    void operator()(ssl_ctx_st* context) const noexcept;
  };

  void Bind();
  void Listen();
  void Accept();
  void Serve(std::size_t index, int socket);
  void Change(std::size_t connection, const std::function<void(ConnectionRecord&)>& change);

  const std::vector<Script> _scripts;
  const std::optional<TlsServerSettings> _tlsSettings;
  std::unique_ptr<ssl_ctx_st, TlsContextDeleter> _tlsContext;
  int _listener = -1;
  int _port = 0;
  std::thread _acceptor;

  mutable std::mutex _mutex;
  std::condition_variable _changed;
  // Guarded by the mutex.
  std::vector<ConnectionRecord> _records;
  std::vector<int> _sockets;  // -1 once closed.
  std::list<std::thread> _threads;
  bool _isReleased = false;
  bool _isStopping = false;
};

/// Listens, but its queue is full: connections to it are neither accepted nor refused.
class FullListener final {
 public:
  FullListener();
  FullListener(const FullListener&) = delete;
  FullListener& operator=(const FullListener&) = delete;
  ~FullListener();

  int GetPort() const { return _port; }
  /// Blocks until somebody tries to connect.
  void AwaitAttempt() const;

 private:
  std::vector<int> _sockets;
  int _port = 0;
};

/// A port of 127.0.0.1 at which nobody listens, and nobody will while this lives.
class ClosedPort final {
 public:
  ClosedPort();
  ClosedPort(const ClosedPort&) = delete;
  ClosedPort& operator=(const ClosedPort&) = delete;
  ~ClosedPort();

  int GetPort() const { return _port; }
  /// The bound socket, which is the caller's from now on. Once.
  int TakeSocket();

 private:
  int _port = 0;  // Before the socket, whose making sets it.
  int _socket;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_LOOPBACKSERVER_H
