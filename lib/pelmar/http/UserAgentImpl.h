// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The HTTP client as its users see it.

#ifndef PELMAR_HTTP_USERAGENTIMPL_H
#define PELMAR_HTTP_USERAGENTIMPL_H

#include <pelmar/http/Client.h>

#include "pelmar/http/Exchange.h"

namespace Pelmar {
namespace Http {

class UserAgentImpl final : public UserAgent {
 public:
  UserAgentImpl(const Ref<const ConnectionSpecImpl>& spec, const Ref<CookieStoreImpl>& cookies,
                const ClientOptions& options);

  void SendAsync(const Ref<ClientRequest>& request, const CompletionFunctor& completion,
                 Ref<PendingRequestItem>& item) override;
  void WaitFor(const Ref<PendingRequestItem>& item, long long timeoutMicroseconds,
               Ref<ClientResponse>& response) override;

 private:
  ~UserAgentImpl() override;

  const AgentParts _parts;
  LoopCommands _farewell;  // To the HTTP loop.
};

}  // namespace Http
}  // namespace Pelmar

#endif  // PELMAR_HTTP_USERAGENTIMPL_H
