// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The ways to acquire a token, for the commands that do.

#ifndef QUORLIN_CLI_ACQUISITION_H
#define QUORLIN_CLI_ACQUISITION_H

#include "quorlin/Kerberos.h"
#include "quorlin/Options.h"
#include "quorlin/Password.h"
#include "quorlin/ServiceCall.h"

#include <quorlin/SamlToken.h>

#include <boost/shared_ptr.hpp>

#include <string>

namespace Cli {

/// What is asked of whom. A command has the flags of the members that it uses.
struct Acquisition {
  ServiceOptions service;
  CallOptions call;
  HolderOfKeyOptions holderOfKey;
  TokenOptions token;
  std::string userName;
  PasswordOptions password;
  KerberosOptions kerberos;
};

/// Adds --target, --principal and --ccache.
void AddKerberosOptions(CLI::App& command, KerberosOptions& options);

/// Each asks the service once. They throw UsageException before anything is sent, and what the operation
/// throws.
boost::shared_ptr<const Quorlin::SamlToken> AcquireByPassword(const Acquisition& acquisition);
boost::shared_ptr<const Quorlin::SamlToken> AcquireByCertificate(const Acquisition& acquisition);
boost::shared_ptr<const Quorlin::SamlToken> AcquireByGss(const Acquisition& acquisition);

}  // namespace Cli

#endif  // QUORLIN_CLI_ACQUISITION_H
