// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The response handler: envelope, fault, result.

#ifndef QUORLIN_RESPONSEHANDLERIMPL_H
#define QUORLIN_RESPONSEHANDLERIMPL_H

#include <pelmar/xml/Node.h>

#include <string>

#include "quorlin/ResponseHandler.h"

namespace Quorlin {

/// Stateless.
class ResponseHandlerImpl final : public ResponseHandler {
 public:
  void HandleAcquireTokenResponse(Pelmar::Reader* response, std::string& token) const override;
  bool HandleValidateSubjectResponse(Pelmar::Reader* response) const override;
  void HandleRenewTokenResponse(Pelmar::Reader* response, std::string& token) const override;
  void HandleSPNegoResponse(Pelmar::Reader* response, SPNegoResponse& result) const override;
};

/// Throws what a fault in the envelope `rootNode` (SOAP 1.1, section 4.4) stands for; returns when there is
/// none.
void CheckForFault(const Pelmar::Xml::ElementNode* rootNode);

}  // namespace Quorlin

#endif  // QUORLIN_RESPONSEHANDLERIMPL_H
