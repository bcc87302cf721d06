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

HttpResponse MakeResponse(int status, const std::string& contentType, std::string body) {
  HttpResponse response;
  response.status = status;
  response.contentType = contentType;
  response.body = std::move(body);
  return response;
}

/// Nobody but this service, and over TLS nobody who listens, is to see the cookie (RFC 6265, section 4.1.2).
std::string MakeSetCookie(const std::string& cookie, bool tls) {
  return cookie.empty() ? "" : cookie + "; Path=" + kServicePath + "; HttpOnly" + (tls ? "; Secure" : "");
}

HttpResponse Respond(RequestHandler& handler, const HttpRequest& request, bool tls) {
  if (request.target != kServicePath) {
    return MakeResponse(404, "text/plain", std::string("The token service is at ") + kServicePath + ".\n");
  }
  if (request.method != "POST") {
    HttpResponse response = MakeResponse(405, "text/plain", "SOAP requests are posted.\n");
    response.allow = "POST";
    return response;
  }
  Answer answer =
      handler.HandleRequest(request.soapAction, request.contentType, request.body, request.cookie);
  HttpResponse response = MakeResponse(answer.status, answer.contentType, std::move(answer.body));
  response.setCookie = MakeSetCookie(answer.cookie, tls);
  response.isDropped = answer.status == 0;
  return response;
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
    options.tls = config.server ? *config.server : _authority.IssueServer(GetServerNames(config));
    _serverCertificate = options.tls->certificate;
  }
  _server = std::make_unique<HttpServer>(
      options, [this, tls = config.tls, delay = config.delay,
                clock = MakeSystemClock(config.clockOffsetSec)](const HttpRequest& request) {
        HttpResponse response = Respond(_handler, request, tls);
        response.date = ToHttpDate(clock());
        response.delay = delay;
        return response;
      });
  _url = MakeUrl(config, _server->GetPort());
}

Service::~Service() = default;

void Service::Stop() {
  _server.reset();
}

}  // namespace DevSts
