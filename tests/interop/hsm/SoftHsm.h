// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A hardware security module in software, SoftHSM, with tokens of our own.

#ifndef QUORLIN_TESTS_INTEROP_HSM_SOFTHSM_H
#define QUORLIN_TESTS_INTEROP_HSM_SOFTHSM_H

#include "support/Pki.h"
#include "support/TemporaryDirectory.h"

#include <string>
#include <vector>

namespace HsmTests {

constexpr const char* kPin = "1234-user";
constexpr const char* kSecondPin = "4321-user";

/// A key that was made in a token, and its certificate. The private half is nowhere else.
struct TokenKey {
  std::string label;
  Pelmar::Ref<const Pelmar::Crypto::Certificate> certificate;
};

/// The tokens "quorlin test" and "guarded" (with the PIN kPin) and "second" (kSecondPin), in a directory that
/// goes away with the process. The environment points to it, so that programs that are started find it too.
class SoftHsm final {
 public:
  /// A PKCS #11 module is set up once for a process, so there is one.
  static const SoftHsm& Shared();

  SoftHsm(const SoftHsm&) = delete;
  SoftHsm& operator=(const SoftHsm&) = delete;

  const std::string& GetModule() const { return _module; }
  const TestSupport::TemporaryDirectory& GetFiles() const { return _files; }

  /// Makes a key pair in the token, as pkcs11-tool names its `kind`, and a certificate for it under
  /// `GetAuthority()`. The label is its id too: a private EC key finds its public half by the id. `more` are
  /// further arguments of pkcs11-tool.
  TokenKey MakeKey(const std::string& label, const std::string& kind = "rsa:2048",
                   const std::string& token = "quorlin test",
                   const std::vector<std::string>& more = {}) const;

  /// The issuer of the keys' certificates.
  const TestSupport::Identity& GetAuthority() const { return _authority; }

  /// The URI of the key with this label. Without a PIN.
  std::string MakeUri(const std::string& label, const std::string& token = "quorlin%20test") const;

  /// Runs pkcs11-tool, logged in to the token, and gives its output. Throws std::runtime_error when it fails,
  /// naming the Debian package of a program that is missing.
  std::string RunTool(const std::string& token, const std::vector<std::string>& arguments) const;

 private:
  SoftHsm();

  TestSupport::TemporaryDirectory _files;
  std::string _module;
  TestSupport::Identity _authority;
};

}  // namespace HsmTests

#endif  // QUORLIN_TESTS_INTEROP_HSM_SOFTHSM_H
