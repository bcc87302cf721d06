// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the HTTP client raises.

#ifndef PELMAR_HTTP_HTTPEXCEPTION_H
#define PELMAR_HTTP_HTTPEXCEPTION_H

#include <pelmar/Exception.h>
#include <pelmar/Export.h>

#include <string>

namespace Pelmar {
namespace Http {

/// A URL cannot be used, or an exchange failed: connecting, TLS, sending, receiving, cancelling.
class PELMAR_API HttpException : public Exception {
 public:
  explicit HttpException(const std::string& message);
  HttpException(const HttpException& other);
  ~HttpException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// An exchange took longer than it was allowed to.
class PELMAR_API HttpTimeoutException : public HttpException {
 public:
  explicit HttpTimeoutException(const std::string& message);
  HttpTimeoutException(const HttpTimeoutException& other);
  ~HttpTimeoutException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_HTTPEXCEPTION_H
