// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/Transfer.h"

#include "pelmar/http/ClientResponseImpl.h"
#include "pelmar/http/SpareFailures.h"
#include "pelmar/http/UrlSyntax.h"

#include <pelmar/StringUtil.h>

#include <algorithm>
#include <exception>
#include <utility>

namespace Pelmar {
namespace Http {

namespace {

constexpr long kOn = 1;
constexpr long kOff = 0;
/// The host name of the certificate is checked.
constexpr long kVerifyHost = 2;
constexpr long long kMicrosecondsPerMillisecond = 1000;

// The list is given to the owner only when the new line is in it; on failure the engine leaves the list as it
// was.
void Append(TextList& list, const std::string& line) {
  curl_slist* const longer = curl_slist_append(list.get(), line.c_str());
  if (longer == nullptr) {
    throw std::bad_alloc();
  }
  static_cast<void>(list.release());
  list.reset(longer);
}

/// The engine leaves part of the line's end in a value that is empty.
std::string TrimBlanks(const std::string& text) {
  const char* const blanks = " \t\r\n";
  const std::size_t start = text.find_first_not_of(blanks);
  return start == std::string::npos ? std::string()
                                    : text.substr(start, text.find_last_not_of(blanks) + 1 - start);
}

/// Those of the final response. There are no more bytes of them than were let through as they arrived.
ResponseHeaders CollectHeaders(CURL* easy) {
  constexpr int kLastResponse = -1;
  ResponseHeaders headers;
  curl_header* header = nullptr;
  while ((header = curl_easy_nextheader(easy, CURLH_HEADER, kLastResponse, header)) != nullptr) {
    headers.emplace_back(header->name, TrimBlanks(header->value));
  }
  return headers;
}

bool HasHeader(const RequestParts& request, const std::string& lowerName) {
  return std::any_of(request.headers.begin(), request.headers.end(),
                     [&](const auto& header) { return StringUtil::ToLower(header.first) == lowerName; });
}

}  // namespace

Transfer::Transfer(const Ref<Exchange>& exchange, const SharedState& shared, OpenSockets& sockets)
    : _exchange(exchange), _shared(shared), _sockets(sockets), _easy(curl_easy_init()) {
  if (!_easy) {
    throw HttpException("The HTTP engine cannot be set up");
  }
  Set(CURLOPT_ERRORBUFFER, _engineText);
  Set(CURLOPT_SHARE, _shared.handle.get());
  SetIsolation();
  SetProxy();
  SetAddress();
  SetRequest();
  SetHeaders();
  if (_exchange->GetAgent().spec->IsTls()) {
    SetTls();
  }
  SetReceivers();
  SetSockets();
  SetCookies();
}

template <typename T>
void Transfer::Set(CURLoption option, T value) {
  const CURLcode code = curl_easy_setopt(_easy.get(), option, value);
  if (code != CURLE_OK) {
    throw HttpException(std::string("The HTTP engine refuses a setting: ") + curl_easy_strerror(code));
  }
}

/// Nothing but the spec decides where a request goes and how.
void Transfer::SetIsolation() {
  Set(CURLOPT_NOSIGNAL, kOn);
  Set(CURLOPT_FOLLOWLOCATION, kOff);
  Set(CURLOPT_NETRC, static_cast<long>(CURL_NETRC_IGNORED));
  Set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
  Set(CURLOPT_HTTP09_ALLOWED, kOff);
  // Rounded up: 0 would stand for the engine's own default.
  Set(CURLOPT_CONNECTTIMEOUT_MS,
      static_cast<long>(
          (_exchange->GetAgent().options->GetConnectTimeoutMicroseconds() + kMicrosecondsPerMillisecond - 1) /
          kMicrosecondsPerMillisecond));
  Set(CURLOPT_TCP_NODELAY, kOn);
  Set(CURLOPT_TCP_KEEPALIVE,
      kOn);  // Nobody may be waiting with a time-out: a vanished peer shall be noticed.
  // A cancelled exchange must not hold up the loop until its name look-up returns.
  Set(CURLOPT_QUICK_EXIT, kOn);
}

void Transfer::SetProxy() {
  const AgentOptions& options = *_exchange->GetAgent().options;
  // Empty texts, unlike none, keep the environment's proxies and its exceptions from them out.
  Set(CURLOPT_NOPROXY, "");
  Set(CURLOPT_PROXY, options.HasProxy() ? ("http://" + options.GetProxyEndpoint()).c_str() : "");
  if (!options.HasProxy()) {
    return;
  }
  // What the proxy says in answer to CONNECT is not the service's answer, and what we tell the service is not
  // for the proxy.
  Set(CURLOPT_SUPPRESS_CONNECT_HEADERS, kOn);
  Set(CURLOPT_HEADEROPT, static_cast<long>(CURLHEADER_SEPARATE));
  // The engine would add it on its own; no standard knows it (RFC 9112, appendix C.2.2).
  Append(_proxyHeaders, "Proxy-Connection:");
  Set(CURLOPT_PROXYHEADER, _proxyHeaders.get());
  if (!options.GetProxyUser().empty()) {
    Set(CURLOPT_PROXYAUTH, static_cast<long>(CURLAUTH_BASIC));
    Set(CURLOPT_PROXYUSERNAME, options.GetProxyUser().c_str());
    Set(CURLOPT_PROXYPASSWORD, options.GetProxyPassword().c_str());
  }
}

void Transfer::SetAddress() {
  const ConnectionSpecImpl& spec = *_exchange->GetAgent().spec;
  const std::string& path = _exchange->GetRequest().path;
  const char* const scheme = spec.IsTls() ? "https" : "http";
  const std::string url = scheme + ("://" + FormatEndpoint(spec.GetServerName(), spec.GetPort())) + path;
  Set(CURLOPT_PROTOCOLS_STR, scheme);
  Set(CURLOPT_PATH_AS_IS, kOn);
  Set(CURLOPT_URL, url.c_str());
  // A proxy that is not tunnelled through is told the whole URL (RFC 9112, section 3.2.2).
  const bool isForProxy = _exchange->GetAgent().options->HasProxy() && !spec.IsTls();
  Set(CURLOPT_REQUEST_TARGET, isForProxy ? url.c_str() : path.c_str());
  if (spec.GetServerName() != spec.GetHost()) {
    Append(_route, "::" + spec.GetEndpoint());
    Set(CURLOPT_CONNECT_TO, _route.get());
  }
}

void Transfer::SetRequest() {
  const RequestParts& request = _exchange->GetRequest();
  if (request.method == METHOD_POST) {
    Set(CURLOPT_POST, kOn);
    Set(CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(request.body.Reveal().size()));
    Set(CURLOPT_POSTFIELDS, request.body.Reveal().c_str());
  } else {
    Set(CURLOPT_HTTPGET, kOn);
  }
}

void Transfer::SetHeaders() {
  const RequestParts& request = _exchange->GetRequest();
  // Without it a server may choose any content coding (RFC 9110, section 12.5.3); we decode none.
  Append(_headers, "Accept-Encoding: identity");
  // A name with a colon and nothing else takes out what the engine would add on its own.
  Append(_headers, "Expect:");
  for (const char* const name : {"accept", "content-type"}) {
    if (!HasHeader(request, name)) {
      Append(_headers, std::string(name) + ":");
    }
  }
  const std::string& userAgent = _exchange->GetAgent().options->GetUserAgent();
  if (!userAgent.empty()) {
    Set(CURLOPT_USERAGENT, userAgent.c_str());
  }
  for (const auto& header : request.headers) {
    // The engine's notation for an empty value.
    const bool isBlank = header.second.find_first_not_of(' ') == std::string::npos;
    Append(_headers, isBlank ? header.first + ";" : header.first + ": " + header.second);
  }
  Set(CURLOPT_HTTPHEADER, _headers.get());
}

void Transfer::SetTls() {
  const ConnectionSpecImpl& spec = *_exchange->GetAgent().spec;
  _tls = std::make_shared<TlsRecord>();
  Set(CURLOPT_SSL_VERIFYPEER, kOn);
  Set(CURLOPT_SSL_VERIFYHOST, kVerifyHost);
  Set(CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
  // The anchors come from the SSL context alone, and are not to be mixed with another context's.
  Set(CURLOPT_CAINFO, static_cast<char*>(nullptr));
  Set(CURLOPT_CAPATH, static_cast<char*>(nullptr));
  Set(CURLOPT_CA_CACHE_TIMEOUT, kOff);
  if (!spec.GetPins().empty()) {
    Set(CURLOPT_PINNEDPUBLICKEY, spec.GetPins().c_str());
  }
  Set(CURLOPT_SSL_CTX_FUNCTION, &Transfer::OnTlsContext);
  Set(CURLOPT_SSL_CTX_DATA, this);
}

void Transfer::SetReceivers() {
  Set(CURLOPT_PREREQFUNCTION, &Transfer::OnReady);
  Set(CURLOPT_PREREQDATA, this);
  Set(CURLOPT_HEADERFUNCTION, &Transfer::OnHeader);
  Set(CURLOPT_HEADERDATA, this);
  Set(CURLOPT_WRITEFUNCTION, &Transfer::OnBody);
  Set(CURLOPT_WRITEDATA, this);
  // An announced length beyond the bound is refused before the first byte of the body.
  Set(CURLOPT_MAXFILESIZE_LARGE, static_cast<curl_off_t>(kMaxResponseBytes));
}

void Transfer::SetSockets() {
  Set(CURLOPT_OPENSOCKETFUNCTION, &OpenSockets::OnOpen);
  Set(CURLOPT_OPENSOCKETDATA, &_sockets);
  Set(CURLOPT_CLOSESOCKETFUNCTION, &OpenSockets::OnClose);
  Set(CURLOPT_CLOSESOCKETDATA, &_sockets);
}

void Transfer::SetCookies() {
  Set(CURLOPT_COOKIEFILE, "");  // Reads no file, but handles cookies.
  _cookiesBefore = _exchange->GetAgent().cookies->GetLines();
  // The engine sends the one it was given last first; older cookies belong before newer ones (RFC 6265,
  // section 5.4, step 2).
  for (auto line = _cookiesBefore.rbegin(); line != _cookiesBefore.rend(); ++line) {
    Set(CURLOPT_COOKIELIST, line->c_str());
  }
}

// Returning less than was offered makes the engine give the exchange up. No exception may pass through it.
std::size_t Transfer::OnHeader(char* data, std::size_t size, std::size_t count, void* transfer) noexcept {
  auto* const self = static_cast<Transfer*>(transfer);
  try {
    self->NoteConnection();
    return self->_head.TakeLine(data, size * count) == HeadFault::NONE ? size * count : 0;
  } catch (const std::exception&) {
    self->_lacksMemory = true;
    return 0;
  }
}

std::size_t Transfer::OnBody(char* data, std::size_t size, std::size_t count, void* transfer) noexcept {
  auto* const self = static_cast<Transfer*>(transfer);
  try {
    if (size * count > kMaxResponseBytes - self->_body.size()) {
      self->_isBodyTooLarge = true;
      return 0;
    }
    self->_body.append(data, size * count);
    return size * count;
  } catch (const std::exception&) {
    self->_lacksMemory = true;
    return 0;
  }
}

CURLcode Transfer::OnTlsContext(CURL*, void* tls, void* transfer) noexcept {
  auto* const self = static_cast<Transfer*>(transfer);
  self->_hasTlsStarted = true;
  try {
    const ConnectionSpecImpl& spec = *self->_exchange->GetAgent().spec;
    ConfigureTls(static_cast<ssl_ctx_st*>(tls), *spec.GetContext(), spec.GetServerName(), self->_tls,
                 self->_shared.expiry);
    return CURLE_OK;
  } catch (const Exception& e) {
    self->NoteTlsSetupFault(e.what());
  } catch (const std::exception&) {
    self->NoteTlsSetupFault("TLS cannot be set up");
  }
  return CURLE_SSL_CERTPROBLEM;
}

// Called again when the engine has replaced a kept connection that broke before any byte of an answer had
// come. What the server may have read is not to be sent twice unless it is idempotent (RFC 9110,
// section 9.2.2); a connection that the server had ended before is one over which it reads nothing (RFC 9112,
// section 9.6).
int Transfer::OnReady(void* transfer, char*, char*, int, int localPort) noexcept {
  auto* const self = static_cast<Transfer*>(transfer);
  if (self->_mayHaveBeenRead && self->_exchange->GetRequest().method == METHOD_POST) {
    return CURL_PREREQFUNC_ABORT;
  }
  self->_wasReady = true;
  self->_mayHaveBeenRead = !self->_sockets.HasPeerEnded(localPort);
  return CURL_PREREQFUNC_OK;
}

void Transfer::NoteTlsSetupFault(const char* text) noexcept {
  try {
    _tlsSetupFault = text;
  } catch (const std::exception&) {
    // Out of memory; what the engine then says has to do.
  }
}

void Transfer::Finish(CURLcode code) {
  SaveCookies();
  if (HasSucceeded(code)) {
    _exchange->Settle(nullptr, MakeRef<ClientResponseImpl>(_head.GetStatusCode(), _head.GetReason(),
                                                           CollectHeaders(_easy.get()), std::move(_body)));
  } else {
    SettleAsFailed(code);
  }
}

/// The engine tells the connection only while the exchange runs.
void Transfer::NoteConnection() {
  curl_tlssessioninfo* session = nullptr;
  if (_tls && !_connectionTls && curl_easy_getinfo(_easy.get(), CURLINFO_TLS_SSL_PTR, &session) == CURLE_OK &&
      session->internals != nullptr) {
    _connectionTls = GetTlsRecord(static_cast<const ssl_st*>(session->internals));
  }
}

void Transfer::SaveCookies() {
  curl_slist* lines = nullptr;
  if (curl_easy_getinfo(_easy.get(), CURLINFO_COOKIELIST, &lines) != CURLE_OK) {
    return;
  }
  const TextList owner(lines);
  std::vector<std::string> after;
  for (const curl_slist* line = lines; line != nullptr; line = line->next) {
    after.emplace_back(line->data);
  }
  _exchange->GetAgent().cookies->Merge(_cookiesBefore, after);
}

bool Transfer::HasSucceeded(CURLcode code) const {
  if (code != CURLE_OK || !_head.IsComplete() || _head.GetFault() != HeadFault::NONE) {
    return false;
  }
  // Anyone on the way can end the TCP connection, so with TLS only close_notify shows that the body is whole
  // (RFC 9112, section 9.8).
  return !_tls || !_head.IsEndedByConnection() || (_connectionTls && _connectionTls->hasServerEnded);
}

void Transfer::SettleAsFailed(CURLcode code) {
  if (_lacksMemory) {
    _exchange->Settle(GetSpareFailures().outOfMemory, nullptr);
    return;
  }
  if (!_tlsSetupFault.empty()) {
    _exchange->Settle(std::make_shared<const HttpException>(_tlsSetupFault), nullptr);
    return;
  }
  const TransferFacts facts = CollectFacts(code);
  _exchange->Settle(DescribeFailure(facts), nullptr, IsSafeToRetry(facts));
}

TransferFacts Transfer::CollectFacts(CURLcode code) const {
  const AgentParts& agent = _exchange->GetAgent();
  TransferFacts facts;
  facts.code = code;
  facts.engineText = _engineText;
  long value = 0;
  curl_easy_getinfo(_easy.get(), CURLINFO_OS_ERRNO, &value);
  facts.systemError = static_cast<int>(value);
  value = 0;
  curl_easy_getinfo(_easy.get(), CURLINFO_HTTP_CONNECTCODE, &value);
  facts.proxyStatus = static_cast<int>(value);
  facts.host = agent.spec->GetHost();
  facts.endpoint = agent.DescribeRoute();
  facts.serverName = agent.spec->GetServerName();
  facts.proxyHost = agent.options->GetProxyHost();
  facts.proxyEndpoint = agent.options->GetProxyEndpoint();
  facts.hasProxyCredentials = !agent.options->GetProxyUser().empty();
  facts.connectTimeoutMicroseconds = agent.options->GetConnectTimeoutMicroseconds();
  facts.head = _head;
  facts.isBodyTooLarge = _isBodyTooLarge;
  facts.wasReady = _wasReady;
  facts.hasTlsStarted = _hasTlsStarted;
  facts.tls = _tls;
  return facts;
}

}  // namespace Http
}  // namespace Pelmar
