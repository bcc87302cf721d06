// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Kerberos.h"
#include "quorlin/doctor/Steps.h"

#include <quorlin/Exceptions.h>

namespace Cli {
namespace Doctor {

namespace {

Outcome GetTicket(const std::string& service) {
  try {
    GetKerberosTicket(service);
  } catch (const Quorlin::InvalidCredentialsException& e) {
    return Fail(EXIT_REFUSED, e.what(),
                "Look at your Kerberos tickets with klist, and get a new one with kinit.");
  } catch (const Pelmar::Exception& e) {
    return Fail(
        EXIT_REFUSED, e.what(),
        "See whether Kerberos knows " + service +
            " and its key distribution center can be reached: kvno asks for the same ticket. Another service is "
            "named with --gss SERVICE@HOST.");
  }
  return Pass("there is a ticket for " + service);
}

}  // namespace

Outcome CheckKerberos(const Patient& patient, Findings&) {
  if (!patient.kerberosService) {
    return Skip("--gss was not given");
  }
  Outcome outcome = GetTicket(*patient.kerberosService);
  outcome.data["service"] = *patient.kerberosService;
  return outcome;
}

}  // namespace Doctor
}  // namespace Cli
