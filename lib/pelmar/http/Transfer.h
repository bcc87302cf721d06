// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The HTTP engine's side of one exchange: its settings, and what it has received so far.

#ifndef PELMAR_HTTP_TRANSFER_H
#define PELMAR_HTTP_TRANSFER_H

#include "pelmar/http/CurlHandles.h"
#include "pelmar/http/Exchange.h"
#include "pelmar/http/OpenSockets.h"
#include "pelmar/http/ResponseHead.h"
#include "pelmar/http/SpecShare.h"
#include "pelmar/http/TlsRecord.h"
#include "pelmar/http/TransferFailure.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace Pelmar {
namespace Http {

/// Lives on the HTTP loop's thread.
class Transfer final {
 public:
  /// `shared` has the TLS sessions and addresses of the spec, `sockets` those of the user agent. Throws
  /// HttpException when the engine refuses a setting.
  Transfer(const Ref<Exchange>& exchange, const SharedState& shared, OpenSockets& sockets);
  Transfer(const Transfer&) = delete;
  Transfer& operator=(const Transfer&) = delete;
  ~Transfer() = default;

  CURL* GetHandle() const { return _easy.get(); }
  const Ref<Exchange>& GetExchange() const { return _exchange; }

  /// Takes the cookies over and settles the exchange.
  void Finish(CURLcode code);

 private:
  template <typename T>
  void Set(CURLoption option, T value);
  void SetAddress();
  void SetIsolation();
  void SetProxy();
  void SetRequest();
  void SetHeaders();
  void SetTls();
  void SetReceivers();
  void SetSockets();
  void SetCookies();

  static std::size_t OnHeader(char* data, std::size_t size, std::size_t count, void* transfer) noexcept;
  static std::size_t OnBody(char* data, std::size_t size, std::size_t count, void* transfer) noexcept;
  static CURLcode OnTlsContext(CURL* easy, void* tls, void* transfer) noexcept;
  static int OnReady(void* transfer, char*, char*, int, int localPort) noexcept;

  void NoteTlsSetupFault(const char* text) noexcept;
  void NoteConnection();
  void SaveCookies();
  bool HasSucceeded(CURLcode code) const;
  TransferFacts CollectFacts(CURLcode code) const;
  void SettleAsFailed(CURLcode code);

  const Ref<Exchange> _exchange;
  const SharedState _shared;
  OpenSockets& _sockets;
  char _engineText[CURL_ERROR_SIZE] = "";
  TextList _headers;
  TextList _proxyHeaders;
  TextList _route;
  std::vector<std::string> _cookiesBefore;
  ResponseHead _head;
  std::string _body;
  bool _isBodyTooLarge = false;
  bool _wasReady = false;         // A connection stood, and the request was about to be sent.
  bool _mayHaveBeenRead = false;  // The peer had not ended that connection by then.
  bool _hasTlsStarted = false;
  bool _lacksMemory = false;  // For what has come.
  std::shared_ptr<TlsRecord> _tls;
  std::shared_ptr<const TlsRecord> _connectionTls;  // Another's if the connection was open already.
  std::string _tlsSetupFault;
  // Last, so that it goes first: it refers to the members above.
  EasyHandle _easy;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_TRANSFER_H
