// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Writing assertions.

#ifndef QUORLIN_DEVSTS_ASSERTIONTEXT_H
#define QUORLIN_DEVSTS_ASSERTIONTEXT_H

#include "devsts/Assertion.h"

#include <string>

namespace DevSts {

/// An assertion's text in two halves, between which its signature belongs (SAML 2.0 Core, section 5.4).
struct UnsignedAssertion {
  std::string id;
  std::string head;
  std::string tail;
};

/// Throws std::invalid_argument when `content` holds text that XML cannot carry.
UnsignedAssertion WriteAssertion(const AssertionContent& content, const std::string& issuer);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_ASSERTIONTEXT_H
