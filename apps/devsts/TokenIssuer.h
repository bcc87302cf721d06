// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Signs assertions.

#ifndef QUORLIN_DEVSTS_TOKENISSUER_H
#define QUORLIN_DEVSTS_TOKENISSUER_H

#include "devsts/Assertion.h"
#include "devsts/Identity.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>

#include <string>
#include <vector>

namespace DevSts {

/// Immutable; may be used from several threads at once.
class TokenIssuer final {
 public:
  /// `name` stands in the tokens as their issuer.
  TokenIssuer(const Identity& signer, const std::string& name);

  /// The assertion's XML, which can stand alone or in any document: its signature is over its exclusive
  /// canonical form (rsa-sha256), so that nothing around it matters. Throws std::invalid_argument when
  /// `content` holds text that XML cannot carry.
  std::string Issue(const AssertionContent& content) const;

  /// The certificate that the tokens are signed with.
  const Pelmar::Ref<const Pelmar::Crypto::Certificate>& GetCertificate() const {
    return _certificates.front();
  }

 private:
  std::string _name;
  Pelmar::Ref<const Pelmar::Crypto::PrivateKey> _key;
  std::vector<Pelmar::Ref<const Pelmar::Crypto::Certificate>> _certificates;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_TOKENISSUER_H
