// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/ClientRequestImpl.h"

#include "pelmar/http/UrlSyntax.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>

#include <algorithm>
#include <cstring>
#include <iterator>

namespace Pelmar {
namespace Http {

namespace {

// They say where a message ends, what becomes of the connection or how the body is coded, which the client
// decides; a second opinion on any of them is how requests are smuggled.
const char* const kReservedHeaders[] = {
    "accept-encoding",
    "connection",
    "content-length",
    "cookie",
    "expect",
    "host",
    "keep-alive",
    "proxy-connection",
    "te",
    "trailer",
    "transfer-encoding",
    "upgrade",
};

// RFC 9110, section 5.6.2.
bool IsTokenCharacter(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
         (c != '\0' && std::strchr("!#$%&'*+-.^_`|~", c) != nullptr);
}

bool IsVisibleOrBlank(char c) {
  return c >= ' ' && c <= '~';
}

void RequireHeaderName(const std::string& name) {
  if (name.empty() || !std::all_of(name.begin(), name.end(), IsTokenCharacter)) {
    throw InvalidArgumentException("the header name is empty or has a character that is not allowed");
  }
  const std::string lowerName = StringUtil::ToLower(name);
  const bool isReserved = std::any_of(std::begin(kReservedHeaders), std::end(kReservedHeaders),
                                      [&](const char* reserved) { return lowerName == reserved; });
  if (isReserved) {
    throw InvalidArgumentException("the header " + lowerName + " is set by the HTTP client alone");
  }
}

// Values may be secret and are not repeated.
void RequireHeaderValue(const std::string& name, const std::string& value) {
  if (!std::all_of(value.begin(), value.end(), IsVisibleOrBlank)) {
    throw InvalidArgumentException("the value of the header " + name +
                                   " has a control character or is not ASCII");
  }
}

}  // namespace

ClientRequest::~ClientRequest() = default;

ClientRequestImpl::ClientRequestImpl(Method method, const std::string& path)
    : _parts{method, path, {}, SecretText()}, _body(CreateSecretStringWriter()) {}

ClientRequestImpl::~ClientRequestImpl() = default;

void ClientRequestImpl::SetHeader(const std::string& name, const std::string& value) {
  RequireHeaderName(name);
  RequireHeaderValue(name, value);
  _parts.headers.emplace_back(name, value);
}

Writer* ClientRequestImpl::GetBodyWriter() {
  return _body.Get();
}

RequestParts ClientRequestImpl::TakeParts() {
  if (_sent) {
    throw InvalidStateException("The request has been sent already");
  }
  if (_parts.method == METHOD_GET && !_body->GetText().empty()) {
    throw InvalidArgumentException("a GET request has no body");
  }
  _sent = true;
  _parts.body = _body->GetText();
  return std::move(_parts);
}

Ref<ClientRequest> CreateHttpRequest(Method method, const std::string& path) {
  const std::string fault = FindPathFault(path);
  if (!fault.empty()) {
    throw InvalidArgumentException(fault);
  }
  return MakeRef<ClientRequestImpl>(method, path);
}

}  // namespace Http
}  // namespace Pelmar
