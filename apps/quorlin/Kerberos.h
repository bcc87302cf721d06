// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the program does with Kerberos. A program that is built without it throws UsageException from all of
// these.

#ifndef QUORLIN_CLI_KERBEROS_H
#define QUORLIN_CLI_KERBEROS_H

#include "devsts/Negotiation.h"

#include <quorlin/SamlToken.h>
#include <quorlin/SecurityTokenService.h>

#include <boost/shared_ptr.hpp>

#include <memory>
#include <string>

namespace Cli {

/// With which Kerberos service a token service is reached, and as whom.
struct KerberosOptions {
  std::string target;     ///< SERVICE@HOST
  std::string principal;  ///< Empty: the one of the cache.
  std::string cache;      ///< Empty: the default credential cache.
};

/// Throws UsageException in a program without Kerberos.
void RequireKerberos();

/// A token for the owner of a Kerberos ticket, from a service that has proved to be the target. Throws what
/// AcquireTokenByGSS throws.
boost::shared_ptr<const Quorlin::SamlToken> AcquireByKerberos(const Quorlin::SecurityTokenService& service,
                                                              const Quorlin::TokenSpec& spec,
                                                              const KerberosOptions& options);

/// Gets a Kerberos ticket for `target` (SERVICE@HOST), of the default credential cache. Nothing is sent to
/// the target itself. Throws what the negotiation handler throws.
void GetKerberosTicket(const std::string& target);

/// Lets the development token service accept tickets for the keys in the file `keytab`; for that of `service`
/// (SERVICE@HOST) alone unless it is empty. Throws UsageException.
std::shared_ptr<const DevSts::NegotiationMechanism> MakeKerberosMechanism(const std::string& keytab,
                                                                          const std::string& service);

}  // namespace Cli

#endif  // QUORLIN_CLI_KERBEROS_H
