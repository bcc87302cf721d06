// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Certificates for people and programs.

#ifndef QUORLIN_CLI_CERTIFICATETEXT_H
#define QUORLIN_CLI_CERTIFICATETEXT_H

#include "quorlin/TokenOutput.h"

#include <pelmar/crypto/Certificate.h>

#include <string>

namespace Cli {

/// {"subject":...,"issuer":...,"notBefore":...,"notAfter":...,"sha256":...}
Json DescribeCertificate(const Pelmar::Crypto::Certificate& certificate);

/// "CN=a, issued by CN=b, valid from DATE until DATE", not made printable.
std::string PrintCertificate(const Pelmar::Crypto::Certificate& certificate);

}  // namespace Cli

#endif  // QUORLIN_CLI_CERTIFICATETEXT_H
