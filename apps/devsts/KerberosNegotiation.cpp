// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/KerberosNegotiation.h"

#include "devsts/Fault.h"
#include "devsts/GssHandles.h"

#include <gssapi/gssapi_ext.h>
#include <gssapi/gssapi_krb5.h>

namespace DevSts {

struct KerberosCredential {
  GssCredential credential;
};

namespace {

/// SPNEGO, 1.3.6.1.5.5.2 (RFC 4178, section 3).
gss_OID GetSpnegoMechanism() {
  static char elements[] = {0x2b, 0x06, 0x01, 0x05, 0x05, 0x02};
  static gss_OID_desc mechanism = {sizeof(elements), elements};
  return &mechanism;
}

std::string DescribeCode(OM_uint32 code, int codeType, gss_OID mechanism) {
  std::string all;
  OM_uint32 next = 0;
  do {
    OM_uint32 minor = 0;
    GssBuffer text;
    if (GSS_ERROR(gss_display_status(&minor, code, codeType, mechanism, &next, text.Place()))) {
      break;
    }
    all += (all.empty() ? "" : "; ") + text.ToString();
  } while (next != 0);
  return all;
}

std::string DescribeStatus(OM_uint32 major, OM_uint32 minor, gss_OID mechanism) {
  const std::string text = DescribeCode(major, GSS_C_GSS_CODE, GSS_C_NO_OID);
  const std::string detail = DescribeCode(minor, GSS_C_MECH_CODE, mechanism);
  // A mechanism with nothing to add leaves the code at 0, which GSS-API may give another number but calls by
  // the same text: an "Unknown error".
  return detail == DescribeCode(0, GSS_C_MECH_CODE, mechanism) ? text : text + ": " + detail;
}

void RequireUsable(OM_uint32 major, OM_uint32 minor, gss_OID mechanism, const KerberosOptions& options) {
  if (GSS_ERROR(major)) {
    throw KerberosException("cannot use the keytab " + options.keytab + ": " +
                            DescribeStatus(major, minor, mechanism));
  }
}

void ImportService(const KerberosOptions& options, GssName& name) {
  gss_buffer_desc text = {options.service.size(), const_cast<char*>(options.service.c_str())};
  OM_uint32 minor = 0;
  const OM_uint32 major = gss_import_name(&minor, &text, GSS_C_NT_HOSTBASED_SERVICE, name.Place());
  RequireUsable(major, minor, GSS_C_NO_OID, options);
}

void Acquire(const KerberosOptions& options, gss_OID mechanism, GssCredential& credential) {
  GssName name;
  if (!options.service.empty()) {
    ImportService(options, name);
  }
  // The type is given, so that a path with a colon in it is not taken for another type of keytab.
  const std::string keytab = "FILE:" + options.keytab;
  gss_key_value_element_desc element = {"keytab", keytab.c_str()};
  const gss_key_value_set_desc store = {1, &element};
  gss_OID_set_desc mechanisms = {1, mechanism};
  OM_uint32 minor = 0;
  const OM_uint32 major = gss_acquire_cred_from(&minor, name.Get(), GSS_C_INDEFINITE, &mechanisms,
                                                GSS_C_ACCEPT, &store, credential.Place(), nullptr, nullptr);
  RequireUsable(major, minor, mechanism, options);
}

/// Leaves the client no other mechanism to choose.
void AllowOnlyKerberos(const KerberosOptions& options, GssCredential& credential) {
  gss_OID_set_desc mechanisms = {1, gss_mech_krb5};
  OM_uint32 minor = 0;
  const OM_uint32 major = gss_set_neg_mechs(&minor, credential.Get(), &mechanisms);
  RequireUsable(major, minor, GetSpnegoMechanism(), options);
}

/// The directory knows name@domain. Names of services and hosts (host/a.example.com), and those with escaped
/// characters, could be read as something else there.
std::string RequireUser(const std::string& principal) {
  const std::size_t at = principal.find('@');
  const bool isUser = at != std::string::npos && at != 0 && at + 1 != principal.size() &&
                      principal.find('@', at + 1) == std::string::npos &&
                      principal.find_first_of("/\\") == std::string::npos;
  if (!isUser) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The Kerberos principal is not a user");
  }
  return principal;
}

std::string GetPrincipal(const GssName& client) {
  GssBuffer text;
  OM_uint32 minor = 0;
  if (GSS_ERROR(gss_display_name(&minor, client.Get(), text.Place(), nullptr))) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The Kerberos principal has no name");
  }
  return RequireUser(text.ToString());
}

class KerberosNegotiation final : public Negotiation {
 public:
  explicit KerberosNegotiation(const std::shared_ptr<const KerberosCredential>& credential)
      : _credential(credential) {}

  NegotiationStep Accept(const NegotiationLeg& leg) override;

 private:
  const std::shared_ptr<const KerberosCredential> _credential;
  GssContext _context;
};

NegotiationStep KerberosNegotiation::Accept(const NegotiationLeg& leg) {
  // To GSS-API it would be a request to propose mechanisms first, which the protocol has no room for.
  if (leg.empty()) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "Kerberos: the leg is empty");
  }
  gss_buffer_desc input = {leg.size(), const_cast<std::uint8_t*>(leg.data())};
  GssBuffer output;
  GssName client;
  OM_uint32 minor = 0;
  const OM_uint32 major = gss_accept_sec_context(&minor, _context.Place(), _credential->credential.Get(),
                                                 &input, GSS_C_NO_CHANNEL_BINDINGS, client.Place(), nullptr,
                                                 output.Place(), nullptr, nullptr, nullptr);
  if (GSS_ERROR(major)) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION,
                "Kerberos: " + DescribeStatus(major, minor, GetSpnegoMechanism()));
  }
  NegotiationStep step;
  const std::string answer = output.ToString();
  step.leg.assign(answer.begin(), answer.end());
  if ((major & GSS_S_CONTINUE_NEEDED) == 0) {
    step.principal = GetPrincipal(client);
  }
  return step;
}

}  // namespace

KerberosMechanism::KerberosMechanism(const KerberosOptions& options) {
  // Kerberos itself is asked first because it says what is missing; SPNEGO would only say that it has no
  // mechanism.
  GssCredential probe;
  Acquire(options, gss_mech_krb5, probe);
  const auto credential = std::make_shared<KerberosCredential>();
  Acquire(options, GetSpnegoMechanism(), credential->credential);
  AllowOnlyKerberos(options, credential->credential);
  _credential = credential;
}

std::unique_ptr<Negotiation> KerberosMechanism::Begin() const {
  return std::make_unique<KerberosNegotiation>(_credential);
}

}  // namespace DevSts
