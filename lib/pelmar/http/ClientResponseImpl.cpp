// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/http/ClientResponseImpl.h"

#include <utility>

namespace Pelmar {
namespace Http {

ClientResponse::~ClientResponse() = default;

ClientResponseImpl::ClientResponseImpl(int statusCode, std::string reason, std::string body)
    : _statusCode(statusCode), _reason(std::move(reason)), _body(std::move(body)) {}

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

}  // namespace Http
}  // namespace Pelmar
