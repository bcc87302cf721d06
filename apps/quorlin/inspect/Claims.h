// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What an assertion claims, read without judging it.

#ifndef QUORLIN_CLI_INSPECT_CLAIMS_H
#define QUORLIN_CLI_INSPECT_CLAIMS_H

#include "quorlin/TokenOutput.h"

#include <pelmar/xml/Node.h>

#include <cstddef>
#include <string>

namespace Cli {
namespace Inspect {

/// SAML 2.0 Core, section 1.1.
constexpr const char* kSamlNs = "urn:oasis:names:tc:SAML:2.0:assertion";

/// So many entries of lists are shown of the whole assertion, and so much of each text. What is beyond is
/// counted or cut.
constexpr std::size_t kMaxEntriesShown = 300;
constexpr std::size_t kMaxTextBytesShown = 1000;

/// All claims of the assertion that are known, in document order, and the names of elements that are not.
/// Nothing is demanded: what is missing is left out, what comes twice is there twice. Texts are as in the
/// document, but shortened; a list that was cut is followed by "...Omitted" with the number of entries left
/// out.
Json ReadClaims(const Pelmar::Xml::ElementNode& assertion);

}  // namespace Inspect
}  // namespace Cli

#endif  // QUORLIN_CLI_INSPECT_CLAIMS_H
