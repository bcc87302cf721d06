// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What GSS-API's status codes mean.

#ifndef QUORLIN_GSSAPI_GSSSTATUS_H
#define QUORLIN_GSSAPI_GSSSTATUS_H

#include <gssapi/gssapi.h>

#include <string>

namespace Quorlin {
namespace InternalApi {

/// What a GSS-API call came to, with the mechanism that was asked.
struct GssStatus {
  OM_uint32 major = GSS_S_COMPLETE;
  OM_uint32 minor = 0;
  gss_OID mechanism = GSS_C_NO_OID;
};

/// All texts of the major and of the minor code, as GSS-API and the mechanism word them: "<major>: <minor>",
/// or
/// "<major>" when the mechanism has nothing to add. Has to be called by the thread that made the call, before
/// its next one.
std::string DescribeStatus(const GssStatus& status);

}  // namespace InternalApi
}  // namespace Quorlin

#endif  // QUORLIN_GSSAPI_GSSSTATUS_H
