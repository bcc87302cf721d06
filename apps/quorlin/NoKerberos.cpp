// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Stands in for Kerberos.cpp in a program that is built without Kerberos.

#include "quorlin/Failure.h"
#include "quorlin/Kerberos.h"

namespace Cli {

namespace {

[[noreturn]] void Refuse() {
  throw UsageException("this quorlin was built without Kerberos");
}

}  // namespace

void RequireKerberos() {
  Refuse();
}

boost::shared_ptr<const Quorlin::SamlToken> AcquireByKerberos(const Quorlin::SecurityTokenService&,
                                                              const Quorlin::TokenSpec&,
                                                              const KerberosOptions&) {
  Refuse();
}

void GetKerberosTicket(const std::string&) {
  Refuse();
}

std::shared_ptr<const DevSts::NegotiationMechanism> MakeKerberosMechanism(const std::string&,
                                                                          const std::string&) {
  Refuse();
}

}  // namespace Cli
