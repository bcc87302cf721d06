// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A complete response.

#ifndef PELMAR_HTTP_CLIENTRESPONSEIMPL_H
#define PELMAR_HTTP_CLIENTRESPONSEIMPL_H

#include <pelmar/http/Client.h>

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Http {

class ClientResponseImpl final : public ClientResponse {
 public:
  ClientResponseImpl(int statusCode, std::string reason, std::string body);

  std::size_t Read(char* buffer, std::size_t size) override;
  int GetStatusCode() const override;
  const std::string& GetReason() const override;

 private:
  ~ClientResponseImpl() override;

  const int _statusCode;
  const std::string _reason;
  const std::string _body;
  std::size_t _position = 0;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CLIENTRESPONSEIMPL_H
