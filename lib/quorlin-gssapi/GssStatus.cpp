// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-gssapi/GssStatus.h"

#include "quorlin-gssapi/GssHandles.h"

namespace Quorlin {
namespace InternalApi {

namespace {

// One code may have several texts (RFC 2744, section 5.11).
std::string DescribeCode(OM_uint32 code, int codeType, gss_OID mechanism) {
  std::string all;
  OM_uint32 next = 0;
  do {
    OM_uint32 minor = 0;
    GssBuffer text;
    if (GSS_ERROR(gss_display_status(&minor, code, codeType, mechanism, &next, text.Place()))) {
      return all.empty() ? "status " + std::to_string(code) : all;
    }
    all += (all.empty() ? "" : "; ") + text.ToString();
  } while (next != 0);
  return all;
}

}  // namespace

std::string DescribeStatus(const GssStatus& status) {
  const std::string major = DescribeCode(status.major, GSS_C_GSS_CODE, GSS_C_NO_OID);
  const std::string minor = DescribeCode(status.minor, GSS_C_MECH_CODE, status.mechanism);
  // A mechanism with nothing to add leaves the code at 0, which GSS-API may give another number but calls by
  // the same text: an "Unknown error".
  return minor == DescribeCode(0, GSS_C_MECH_CODE, status.mechanism) ? major : major + ": " + minor;
}

}  // namespace InternalApi
}  // namespace Quorlin
