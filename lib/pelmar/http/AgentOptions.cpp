// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/AgentOptions.h"

#include "pelmar/http/TransferFailure.h"
#include "pelmar/http/UrlSyntax.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/http/Url.h>

#include <algorithm>

namespace Pelmar {
namespace Http {

namespace {

constexpr long long kMicrosecondsPerSecond = 1000000;

bool IsControl(char c) {
  return static_cast<unsigned char>(c) < ' ' || c == '\x7f';
}

bool IsVisibleOrBlank(char c) {
  return c >= ' ' && c <= '~';
}

void Require(bool condition, const std::string& fault) {
  if (!condition) {
    throw InvalidArgumentException(fault);
  }
}

void RequireConnectTimeout(long long microseconds) {
  Require(microseconds >= 1 && microseconds <= kMaxConnectTimeoutMicroseconds,
          "the connect time-out is not from 1 to " + std::to_string(kMaxConnectTimeoutMicroseconds) +
              " microseconds");
}

// RFC 7617, section 2: a colon would end the user's name, and control characters are not allowed.
void RequireProxyCredentials(const ClientOptions& options) {
  const bool hasUser = !options.proxyUser.empty();
  Require(hasUser || options.proxyPassword.empty(), "the proxy's password has no user");
  Require(!hasUser || !options.proxyUrl.empty(), "the proxy's user has no proxy");
  Require(std::none_of(options.proxyUser.begin(), options.proxyUser.end(),
                       [](char c) { return IsControl(c) || c == ':'; }),
          "the proxy's user has a colon or a control character");
  Require(std::none_of(options.proxyPassword.begin(), options.proxyPassword.end(), IsControl),
          "the proxy's password has a control character");
}

void RequireUserAgent(const std::string& text) {
  Require(text.size() <= kMaxUserAgentBytes,
          "the user agent's text has more than " + std::to_string(kMaxUserAgentBytes) + " bytes");
  Require(std::all_of(text.begin(), text.end(), IsVisibleOrBlank),
          "the user agent's text has a control character or is not ASCII");
  Require(text.empty() || (text.front() != ' ' && text.back() != ' '),
          "the user agent's text starts or ends with a blank");
}

HttpURL ParseProxyUrl(const std::string& url) {
  HttpURL parts = ParseHttpURL(url);
  // A TLS connection to the proxy would be verified by the anchors and pins that are meant for the server.
  Require(!parts.isHttps, "the proxy's URL is not http:");
  Require(parts.path == "/", "the proxy's URL has a path");
  return parts;
}

}  // namespace

ClientOptions::ClientOptions() : connectTimeoutMicroseconds(kMaxConnectSeconds * kMicrosecondsPerSecond) {}

ClientOptions::~ClientOptions() {
  StringUtil::Wipe(proxyPassword);
}

ClientOptions::ClientOptions(const ClientOptions& other) = default;

ClientOptions& ClientOptions::operator=(const ClientOptions& other) {
  if (this != &other) {
    // The longer text may get other memory, and would leave the old one as it is.
    StringUtil::Wipe(proxyPassword);
    connectTimeoutMicroseconds = other.connectTimeoutMicroseconds;
    proxyUrl = other.proxyUrl;
    proxyUser = other.proxyUser;
    proxyPassword = other.proxyPassword;
    userAgent = other.userAgent;
  }
  return *this;
}

AgentOptions::AgentOptions(const ClientOptions& options) : _options(options) {
  RequireConnectTimeout(options.connectTimeoutMicroseconds);
  RequireProxyCredentials(options);
  RequireUserAgent(options.userAgent);
  if (HasProxy()) {
    const HttpURL proxy = ParseProxyUrl(options.proxyUrl);
    _proxyHost = proxy.host;
    _proxyEndpoint = FormatEndpoint(proxy.host, proxy.port);
  }
}

}  // namespace Http
}  // namespace Pelmar
