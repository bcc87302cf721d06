// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// A host application that negotiates by Kerberos: makes a handler, and catches what it throws.

#include <quorlin-gssapi/GssapiNegotiation.h>

#include <iostream>

int main() {
  Quorlin::GssapiOptions options;
  options.targetService = "HTTP@localhost";
  options.credentialCache = "FILE:/nonexistent";
  try {
    Quorlin::CreateGssapiNegotiationHandler(options)->Negotiate(Quorlin::Leg());
  } catch (const Quorlin::InvalidCredentialsException& refusal) {
    std::cout << "refused: " << refusal.what() << '\n';
    return 0;
  } catch (const std::exception& error) {
    std::cerr << "an exception of another class: " << error.what() << '\n';
    return 1;
  }
  std::cerr << "negotiated without a ticket\n";
  return 1;
}
