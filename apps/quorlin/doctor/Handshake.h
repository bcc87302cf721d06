// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A TLS handshake under the rules of the library's own client, with open eyes.

#ifndef QUORLIN_CLI_DOCTOR_HANDSHAKE_H
#define QUORLIN_CLI_DOCTOR_HANDSHAKE_H

#include "quorlin/doctor/Examination.h"
#include "quorlin/doctor/ServerChain.h"

#include <string>

namespace Cli {
namespace Doctor {

struct Handshake {
  bool isDone = false;
  std::string protocol;  ///< "TLSv1.3"
  std::string cipher;
  ServerChain chain;
  /// Why it failed, if not for the certificate; in the words of the library where it has some.
  std::string failure;
};

/// Makes a handshake on the connected, non-blocking `socket`, fills `result`, and ends TLS. The rules are the
/// library's: TLS 1.2 or newer at OpenSSL's security level 2; a chain to an authority of `patient`; the host
/// among the subject alternative names, where the common name and partial wildcards do not count (RFC 9525,
/// section 6.3). Throws UsageException when TLS cannot be set up.
void MakeHandshake(const Patient& patient, int socket, Handshake& result);

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_HANDSHAKE_H
