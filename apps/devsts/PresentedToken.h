// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tokens that come back to the service that issued them.

#ifndef QUORLIN_DEVSTS_PRESENTEDTOKEN_H
#define QUORLIN_DEVSTS_PRESENTEDTOKEN_H

#include "devsts/Assertion.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/xml/Node.h>

#include <stdexcept>
#include <string>

namespace DevSts {

/// A token that is not one of this service, or not valid now.
class TokenException final : public std::runtime_error {
 public:
  explicit TokenException(const std::string& message) : std::runtime_error(message) {}
};

/// Reads an assertion after it has verified that `signer` signed all of it, and that it is valid at `now`
/// (microseconds since the epoch). What is read is the very element that was verified. Throws TokenException.
AssertionContent ReadPresentedToken(Pelmar::Xml::ElementNode& assertion,
                                    const Pelmar::Ref<const Pelmar::Crypto::Certificate>& signer,
                                    long long now);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_PRESENTEDTOKEN_H
