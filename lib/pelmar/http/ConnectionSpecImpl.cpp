// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/ConnectionSpecImpl.h"

#include "pelmar/http/HttpLoop.h"
#include "pelmar/http/PublicKeyPins.h"
#include "pelmar/http/UrlSyntax.h"

#include <pelmar/Exception.h>

#include <atomic>

namespace Pelmar {
namespace Http {

namespace {

std::uint64_t DrawId() {
  static std::atomic<std::uint64_t> last(0);
  return ++last;
}

LoopCommands MakeFarewell(std::uint64_t id) {
  // Made with the first spec: to be without memory is for a constructor to tell, not for a destructor.
  HttpLoop::Get();
  return HttpLoop::MakeFarewell(LoopVerb::DROP_SPEC, id);
}

void RequireHost(const std::string& host) {
  const std::string fault = FindHostFault(host);
  if (!fault.empty()) {
    throw InvalidArgumentException(fault);
  }
}

}  // namespace

ConnectionSpec::~ConnectionSpec() = default;

ConnectionSpecImpl::ConnectionSpecImpl(const std::string& host, int port)
    : _host(host), _port(port), _serverName(host), _id(DrawId()), _farewell(MakeFarewell(_id)) {}

ConnectionSpecImpl::ConnectionSpecImpl(const ConnectionSpecImpl& tcp,
                                       const Ref<const Ssl::SSLContextImpl>& context,
                                       const std::string& tlsHost, const std::string& pins)
    : _host(tcp._host),
      _port(tcp._port),
      _serverName(tlsHost),
      _context(context),
      _pins(pins),
      _id(DrawId()),
      _farewell(MakeFarewell(_id)) {}

ConnectionSpecImpl::~ConnectionSpecImpl() {
  HttpLoop::Get().TakeFarewell(_farewell);
}

std::string ConnectionSpecImpl::GetEndpoint() const {
  return FormatEndpoint(_host, _port);
}

Ref<const ConnectionSpecImpl> ToConnectionSpecImpl(const ConnectionSpec* spec) {
  const auto* const own = dynamic_cast<const ConnectionSpecImpl*>(spec);
  if (own == nullptr) {
    throw InvalidArgumentException("the connection spec is null or was not made by this platform");
  }
  return own;
}

Ref<ConnectionSpec> CreateTCPConnectionSpec(const std::string& host, int port) {
  RequireHost(host);
  if (port < 1 || port > kMaxPort) {
    throw InvalidArgumentException("the port is not from 1 to 65535");
  }
  return MakeRef<ConnectionSpecImpl>(host, port);
}

Ref<ConnectionSpec> CreateSSLConnectionSpec(const Ref<ConnectionSpec>& tcp,
                                            const Ref<Ssl::SSLContext>& context, const std::string& host,
                                            const std::string& connectionParam) {
  const Ref<const ConnectionSpecImpl> base = ToConnectionSpecImpl(tcp.Get());
  if (base->IsTls()) {
    throw InvalidArgumentException("the connection spec uses TLS already");
  }
  const auto* const ownContext = dynamic_cast<const Ssl::SSLContextImpl*>(context.Get());
  if (ownContext == nullptr) {
    throw InvalidArgumentException("the SSL context is null or was not made by this platform");
  }
  RequireHost(host);
  RequirePublicKeyPins(connectionParam);
  return MakeRef<ConnectionSpecImpl>(*base, Ref<const Ssl::SSLContextImpl>(ownContext), host,
                                     connectionParam);
}

}  // namespace Http
}  // namespace Pelmar
