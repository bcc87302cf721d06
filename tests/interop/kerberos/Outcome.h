// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// How a call ended, as one text.

#ifndef QUORLIN_TESTS_INTEROP_KERBEROS_OUTCOME_H
#define QUORLIN_TESTS_INTEROP_KERBEROS_OUTCOME_H

#include "devsts/Fault.h"
#include "devsts/KerberosNegotiation.h"

#include <pelmar/Exception.h>
#include <quorlin/Exceptions.h>

#include <functional>
#include <string>
#include <typeinfo>

namespace KerberosTests {

inline std::string NameOf(const std::exception& error) {
  const std::type_info& type = typeid(error);
  return type == typeid(Quorlin::InvalidCredentialsException) ? "InvalidCredentialsException"
         : type == typeid(Quorlin::SsoException)              ? "SsoException"
         : type == typeid(Pelmar::InvalidArgumentException)   ? "InvalidArgumentException"
         : type == typeid(Pelmar::InvalidStateException)      ? "InvalidStateException"
         : type == typeid(DevSts::KerberosException)          ? "KerberosException"
         : type == typeid(DevSts::Fault)                      ? "Fault"
                                                              : type.name();
}

/// "Class: message" of what `call` throws, or "done".
inline std::string OutcomeOf(const std::function<void()>& call) {
  try {
    call();
    return "done";
  } catch (const std::exception& error) {
    return NameOf(error) + ": " + error.what();
  }
}

/// The texts of GSS-API's major codes, as MIT Kerberos words them; the mechanism's own text follows.
constexpr const char* kNoCredentials =
    "No credentials were supplied, or the credentials were unavailable or inaccessible: ";
constexpr const char* kUnspecified = "Unspecified GSS failure.  Minor code may provide more information: ";

}  // namespace KerberosTests

#endif  // QUORLIN_TESTS_INTEROP_KERBEROS_OUTCOME_H
