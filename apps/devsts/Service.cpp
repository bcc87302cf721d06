// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Service.h"

#include "devsts/HttpServer.h"

#include <algorithm>

namespace DevSts {

namespace {

std::vector<std::string> GetServerNames(const ServiceConfig& config) {
  if (!config.serverNames.empty()) {
    return config.serverNames;
  }
  std::vector<std::string> names = {"localhost", "127.0.0.1", "::1"};
  if (std::find(names.begin(), names.end(), config.address) == names.end()) {
    names.push_back(config.address);
  }
  return names;
}

/// An IPv6 address stands in brackets (RFC 3986, section 3.2.2). The addresses that stand for all of the
/// machine's are none to connect to.
std::string GetUrlHost(const std::string& address) {
  if (address == "0.0.0.0" || address == "::") {
    return "localhost";
  }
  return address.find(':') != std::string::npos ? "[" + address + "]" : address;
}

std::string MakeUrl(const ServiceConfig& config, std::uint16_t port) {
  const std::string host = GetUrlHost(config.address);
  return (config.tls ? "https://" : "http://") + host + ":" + std::to_string(port) + kServicePath;
}

HttpResponse Respond(RequestHandler& handler, const HttpRequest& request) {
  if (request.target != kServicePath) {
    return {404, "text/plain", std::string("The token service is at ") + kServicePath + ".\n", ""};
  }
  if (request.method != "POST") {
    return {405, "text/plain", "SOAP requests are posted.\n", "POST"};
  }
  Answer answer = handler.HandleRequest(request.soapAction, request.contentType, request.body);
  return {answer.status, answer.contentType, std::move(answer.body), ""};
}

}  // namespace

Service::Service(const ServiceConfig& config)
    : _signer(config.signer ? *config.signer : _authority.IssueSigner()),
      _handler(config.handler, config.directory,
               TokenIssuer(_signer, "urn:quorlin:development-token-service"),
               MakeSystemClock(config.clockOffsetSec), config.log) {
  HttpServerOptions options;
  options.address = config.address;
  options.port = config.port;
  if (config.tls) {
    options.tls = _authority.IssueServer(GetServerNames(config));
    _serverCertificate = options.tls->certificate;
  }
  _server = std::make_unique<HttpServer>(
      options, [this](const HttpRequest& request) { return Respond(_handler, request); });
  _url = MakeUrl(config, _server->GetPort());
}

Service::~Service() = default;

void Service::Stop() {
  _server.reset();
}

}  // namespace DevSts
