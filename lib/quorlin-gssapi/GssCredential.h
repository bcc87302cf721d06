// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The caller's Kerberos credential.

#ifndef QUORLIN_GSSAPI_GSSCREDENTIAL_H
#define QUORLIN_GSSAPI_GSSCREDENTIAL_H

#include "quorlin-gssapi/GssHandles.h"

#include <string>

namespace Quorlin {
namespace InternalApi {

/// SPNEGO, 1.3.6.1.5.5.2 (RFC 4178, section 3).
gss_OID GetSpnegoMechanism();

/// The credential of `principal` in `credentialCache`, as SPNEGO uses it and for Kerberos V5 only. An empty
/// text leaves the choice to Kerberos. Throws InvalidCredentialsException.
GssCredential AcquireSpnegoCredential(const std::string& principal, const std::string& credentialCache);

/// Whether a call that came to `major` failed because of the credential that it was given: because it holds
/// no ticket, or one that has expired.
bool IsFaultOf(const GssCredential& credential, OM_uint32 major);

}  // namespace InternalApi
}  // namespace Quorlin

#endif  // QUORLIN_GSSAPI_GSSCREDENTIAL_H
