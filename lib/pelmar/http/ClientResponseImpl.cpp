// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/ClientResponseImpl.h"

#include <pelmar/StringUtil.h>

#include <utility>

namespace Pelmar {
namespace Http {

ClientResponse::~ClientResponse() = default;

ClientResponseImpl::ClientResponseImpl(int statusCode, std::string reason, ResponseHeaders headers,
                                       std::string body)
    : _statusCode(statusCode),
      _reason(std::move(reason)),
      _headers(std::move(headers)),
      _body(std::move(body)) {}

ClientResponseImpl::~ClientResponseImpl() = default;

std::size_t ClientResponseImpl::Read(char* buffer, std::size_t size) {
  const std::size_t copied = _body.copy(buffer, size, _position);
  _position += copied;
  return copied;
}

int ClientResponseImpl::GetStatusCode() const {
  return _statusCode;
}

const std::string& ClientResponseImpl::GetReason() const {
  return _reason;
}

bool ClientResponseImpl::GetHeader(const std::string& name, std::string& value) const {
  const std::string wanted = StringUtil::ToLower(name);
  bool isFound = false;
  for (const auto& header : _headers) {
    if (StringUtil::ToLower(header.first) == wanted) {
      value = isFound ? value + ", " + header.second : header.second;
      isFound = true;
    }
  }
  return isFound;
}

}  // namespace Http
}  // namespace Pelmar
