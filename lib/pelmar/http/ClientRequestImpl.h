// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A request while its sender is filling it in.

#ifndef PELMAR_HTTP_CLIENTREQUESTIMPL_H
#define PELMAR_HTTP_CLIENTREQUESTIMPL_H

#include <pelmar/SecretText.h>
#include <pelmar/http/Client.h>

#include <string>
#include <utility>
#include <vector>

namespace Pelmar {
namespace Http {

/// What goes over the wire. Not changed once it is on its way.
struct RequestParts {
  Method method;
  std::string path;
  std::vector<std::pair<std::string, std::string>> headers;
  SecretText body;  ///< Logins are among what is posted.
};

class ClientRequestImpl final : public ClientRequest {
 public:
  ClientRequestImpl(Method method, const std::string& path);

  void SetHeader(const std::string& name, const std::string& value) override;
  Writer* GetBodyWriter() override;

  /// Gives the parts away. Throws InvalidStateException when that has been done, InvalidArgumentException for
  /// a GET with a body.
  RequestParts TakeParts();

 private:
  ~ClientRequestImpl() override;

  RequestParts _parts;
  const Ref<StringWriter> _body;
  bool _sent = false;
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_CLIENTREQUESTIMPL_H
