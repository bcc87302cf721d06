// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Fault.h"

namespace DevSts {

const char* ToText(FaultCode code) {
  switch (code) {
    case FaultCode::CLIENT:
      return "soapenv:Client";
    case FaultCode::SERVER:
      return "soapenv:Server";
    case FaultCode::FAILED_AUTHENTICATION:
      return "wst:FailedAuthentication";
    case FaultCode::INVALID_TOKEN:
      return "wst:InvalidSecurityToken";
    case FaultCode::INVALID_HEADER_TOKEN:
      return "wsse:InvalidSecurityToken";
    case FaultCode::REQUEST_FAILED:
      return "wst:RequestFailed";
  }
  throw std::logic_error("unknown fault code");
}

}  // namespace DevSts
