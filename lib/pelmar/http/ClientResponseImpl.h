// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A complete response.

#ifndef PELMAR_HTTP_CLIENTRESPONSEIMPL_H
#define PELMAR_HTTP_CLIENTRESPONSEIMPL_H

#include <pelmar/http/Client.h>

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace Pelmar {
namespace Http {

/// Names and values in the order in which they came.
using ResponseHeaders = std::vector<std::pair<std::string, std::string>>;

class ClientResponseImpl final : public ClientResponse {
 public:
  ClientResponseImpl(int statusCode, std::string reason, ResponseHeaders headers, std::string body);

  std::size_t Read(char* buffer, std::size_t size) override;
  int GetStatusCode() const override;
  const std::string& GetReason() const override;
  bool GetHeader(const std::string& name, std::string& value) const override;

 private:
  ~ClientResponseImpl() override;

  const int _statusCode;
  const std::string _reason;
  const ResponseHeaders _headers;
  const std::string _body;
  std::size_t _position = 0;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CLIENTRESPONSEIMPL_H
