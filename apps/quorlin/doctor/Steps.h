// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The doctor's steps, in their order. Each looks at one link of the chain from this machine to an answer of
// the service, and relies on those before it.

#ifndef QUORLIN_CLI_DOCTOR_STEPS_H
#define QUORLIN_CLI_DOCTOR_STEPS_H

#include "quorlin/doctor/Examination.h"

namespace Cli {
namespace Doctor {

/// Looks the host's name up.
Outcome CheckName(const Patient& patient, Findings& findings);
/// Connects to the first address that answers.
Outcome CheckTcp(const Patient& patient, Findings& findings);
/// Makes a TLS handshake on that connection and judges the server's certificate as the library does. Nothing
/// is sent to a server that has not proved to be the one of the URL.
Outcome CheckTls(const Patient& patient, Findings& findings);
/// Posts a request without credentials with the library's own client.
Outcome CheckHttp(const Patient& patient, Findings& findings);
/// Reads the answer's body.
Outcome CheckSoap(const Patient& patient, Findings& findings);
/// Compares the clocks.
Outcome CheckClock(const Patient& patient, Findings& findings);
/// The caller's certificate: its dates, and whether it belongs to the key.
Outcome CheckCertificate(const Patient& patient, Findings& findings);
/// Gets a Kerberos ticket for the service.
Outcome CheckKerberos(const Patient& patient, Findings& findings);

}  // namespace Doctor
}  // namespace Cli

#endif  // QUORLIN_CLI_DOCTOR_STEPS_H
