// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What a signature says of itself.

#ifndef QUORLIN_CLI_INSPECT_SIGNATURECLAIMS_H
#define QUORLIN_CLI_INSPECT_SIGNATURECLAIMS_H

#include "quorlin/inspect/ClaimsReader.h"

namespace Cli {
namespace Inspect {

/// The algorithms, references and certificates of a ds:Signature (XML Signature 1.1, section 4). Nothing of
/// it is computed.
Json ReadSignature(const Pelmar::Xml::ElementNode& signature, ListReader& lists);

/// Adds the certificates of all ds:KeyInfo children (XML Signature 1.1, section 4.5.4).
void AddCertificates(const Pelmar::Xml::ElementNode& parent, Json& json, ListReader& lists);

}  // namespace Inspect
}  // namespace Cli

#endif  // QUORLIN_CLI_INSPECT_SIGNATURECLAIMS_H
