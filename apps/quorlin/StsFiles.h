// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The development token service's certificates as files.

#ifndef QUORLIN_CLI_STSFILES_H
#define QUORLIN_CLI_STSFILES_H

#include "devsts/Service.h"

#include <string>

namespace Cli {

struct StsFiles {
  std::string ca;  ///< Empty for a service without TLS.
  std::string stsCertificate;
};

/// Writes sts.pem and, for a service with TLS, ca.pem and server.pem into `directory`; certificates only, no
/// keys. Throws UsageException.
StsFiles WriteCertificates(const DevSts::Service& service, const std::string& directory);

}  // namespace Cli

#endif  // QUORLIN_CLI_STSFILES_H
