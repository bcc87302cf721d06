// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/http/HttpException.h>

namespace Pelmar {
namespace Http {

HttpException::HttpException(const std::string& message) : Exception(message) {}

HttpException::HttpException(const HttpException& other) = default;

HttpException::~HttpException() noexcept = default;

Exception* HttpException::Clone() const {
  return new HttpException(*this);
}

void HttpException::Throw() const {
  throw HttpException(*this);
}

HttpTimeoutException::HttpTimeoutException(const std::string& message) : HttpException(message) {}

HttpTimeoutException::HttpTimeoutException(const HttpTimeoutException& other) = default;

HttpTimeoutException::~HttpTimeoutException() noexcept = default;

Exception* HttpTimeoutException::Clone() const {
  return new HttpTimeoutException(*this);
}

void HttpTimeoutException::Throw() const {
  throw HttpTimeoutException(*this);
}

}  // namespace Http
}  // namespace Pelmar
