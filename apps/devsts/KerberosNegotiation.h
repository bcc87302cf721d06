// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Negotiation by Kerberos V5 (RFC 4121) inside SPNEGO (RFC 4178), with the system's GSS-API. Only there when
// the program is built with MIT Kerberos.

#ifndef QUORLIN_DEVSTS_KERBEROSNEGOTIATION_H
#define QUORLIN_DEVSTS_KERBEROSNEGOTIATION_H

#include "devsts/Negotiation.h"

#include <memory>
#include <stdexcept>
#include <string>

namespace DevSts {

/// The keytab cannot be used. The message says why.
class KerberosException final : public std::runtime_error {
 public:
  explicit KerberosException(const std::string& message) : std::runtime_error(message) {}
};

struct KerberosOptions {
  /// The file with the service's keys.
  std::string keytab;
  /// The service as SERVICE@HOST whose key counts; empty: any key of the keytab.
  std::string service;
};

/// Accepts clients with a ticket for the service. The principal it reports is a Kerberos user's, name@REALM,
/// never that of a service or a host.
class KerberosMechanism final : public NegotiationMechanism {
 public:
  /// Reads the keytab. Throws KerberosException.
  explicit KerberosMechanism(const KerberosOptions& options);

  std::unique_ptr<Negotiation> Begin() const override;

 private:
  std::shared_ptr<const struct KerberosCredential> _credential;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_KERBEROSNEGOTIATION_H
