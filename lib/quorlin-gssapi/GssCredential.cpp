// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin-gssapi/GssCredential.h"

#include "quorlin-gssapi/GssStatus.h"

#include <quorlin/Exceptions.h>

#include <gssapi/gssapi_ext.h>
#include <gssapi/gssapi_krb5.h>

namespace Quorlin {
namespace InternalApi {

namespace {

void RequireSuccess(const GssStatus& status) {
  if (GSS_ERROR(status.major)) {
    throw InvalidCredentialsException("Kerberos credentials cannot be used: " + DescribeStatus(status));
  }
}

GssName ImportPrincipal(const std::string& principal) {
  gss_buffer_desc text = {principal.size(), const_cast<char*>(principal.c_str())};
  GssName name;
  GssStatus status;
  status.major = gss_import_name(&status.minor, &text, GSS_KRB5_NT_PRINCIPAL_NAME, name.Place());
  RequireSuccess(status);
  return name;
}

GssCredential Acquire(const GssName& name, const std::string& credentialCache, gss_OID mechanism) {
  gss_key_value_element_desc element = {"ccache", credentialCache.c_str()};
  const gss_key_value_set_desc store = {1, &element};
  gss_OID_set_desc mechanisms = {1, mechanism};
  GssCredential credential;
  GssStatus status;
  status.mechanism = mechanism;
  status.major =
      gss_acquire_cred_from(&status.minor, name.Get(), GSS_C_INDEFINITE, &mechanisms, GSS_C_INITIATE,
                            credentialCache.empty() ? nullptr : &store, credential.Place(), nullptr, nullptr);
  RequireSuccess(status);
  return credential;
}

// Leaves the service no other mechanism to choose.
void AllowOnlyKerberos(GssCredential& credential) {
  gss_OID_set_desc mechanisms = {1, gss_mech_krb5};
  GssStatus status;
  status.mechanism = GetSpnegoMechanism();
  status.major = gss_set_neg_mechs(&status.minor, credential.Get(), &mechanisms);
  RequireSuccess(status);
}

}  // namespace

gss_OID GetSpnegoMechanism() {
  static char elements[] = {0x2b, 0x06, 0x01, 0x05, 0x05, 0x02};
  static gss_OID_desc mechanism = {sizeof(elements), elements};
  return &mechanism;
}

GssCredential AcquireSpnegoCredential(const std::string& principal, const std::string& credentialCache) {
  const GssName name = principal.empty() ? GssName() : ImportPrincipal(principal);
  // Kerberos itself is asked first because it says what is missing; SPNEGO would only say that it has no
  // mechanism to negotiate.
  Acquire(name, credentialCache, gss_mech_krb5);
  GssCredential credential = Acquire(name, credentialCache, GetSpnegoMechanism());
  AllowOnlyKerberos(credential);
  return credential;
}

bool IsFaultOf(const GssCredential& credential, OM_uint32 major) {
  if (GSS_ROUTINE_ERROR(major) == GSS_S_NO_CRED) {
    return true;
  }
  // That a ticket has expired is reported as a failure of no particular kind.
  OM_uint32 minor = 0;
  OM_uint32 lifetime = GSS_C_INDEFINITE;
  const OM_uint32 inquiry = gss_inquire_cred(&minor, credential.Get(), nullptr, &lifetime, nullptr, nullptr);
  return GSS_ROUTINE_ERROR(inquiry) == GSS_S_CREDENTIALS_EXPIRED || (!GSS_ERROR(inquiry) && lifetime == 0);
}

}  // namespace InternalApi
}  // namespace Quorlin
