// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Kerberos.h"

#include "quorlin/Failure.h"

#include "devsts/KerberosNegotiation.h"

#include <pelmar/service/Logger.h>
#include <quorlin-gssapi/GssapiNegotiation.h>

namespace Cli {

namespace {

/// A Kerberos client has nothing to answer to the service's last leg, and the library warns of just that. Who
/// asked for the lines (--log) gets this one too.
void MuteExpectedWarning() {
  Pelmar::Service::LogManager* const log = Pelmar::Service::GetApp()->GetLogManager();
  if (log->GetEnabledLevels() == Pelmar::Service::kDefaultLogLevels) {
    log->SetEnabledLevels(Pelmar::Service::kDefaultLogLevels & ~Pelmar::Service::LOG_WARNING);
  }
}

}  // namespace

void RequireKerberos() {}

boost::shared_ptr<const Quorlin::SamlToken> AcquireByKerberos(const Quorlin::SecurityTokenService& service,
                                                              const Quorlin::TokenSpec& spec,
                                                              const KerberosOptions& options) {
  Quorlin::GssapiOptions gssapi;
  gssapi.targetService = options.target;
  gssapi.principal = options.principal;
  gssapi.credentialCache = options.cache;
  const boost::shared_ptr<Quorlin::GssapiNegotiationHandler> handler =
      Quorlin::CreateGssapiNegotiationHandler(gssapi);
  MuteExpectedWarning();
  const boost::shared_ptr<const Quorlin::SamlToken> token = service.AcquireTokenByGSS(spec, *handler);
  handler->RequireComplete();
  return token;
}

void GetKerberosTicket(const std::string& target) {
  Quorlin::GssapiOptions options;
  options.targetService = target;
  // The first leg cannot be made without the ticket.
  Quorlin::CreateGssapiNegotiationHandler(options)->Negotiate(Quorlin::Leg());
}

std::shared_ptr<const DevSts::NegotiationMechanism> MakeKerberosMechanism(const std::string& keytab,
                                                                          const std::string& service) {
  try {
    return std::make_shared<DevSts::KerberosMechanism>(DevSts::KerberosOptions{keytab, service});
  } catch (const DevSts::KerberosException& e) {
    throw UsageException(e.what());
  }
}

}  // namespace Cli
