// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The checks that a signature goes through.

#ifndef QUORLIN_CLI_EXPLAIN_SIGNATURECHECKS_H
#define QUORLIN_CLI_EXPLAIN_SIGNATURECHECKS_H

#include "quorlin/explain/Explanation.h"

#include <pelmar/xml/Node.h>
#include <pelmar/xml/security/Signature.h>

namespace Cli {

struct SignatureChecks {
  Check algorithms;
  Check signer;
  Check references;
  Check value;
};

/// Verifies `signature` of `assertion` as the library does, and says how far it got. True when it holds.
bool ExplainSignature(const Pelmar::Xml::ElementNode* assertion,
                      const Pelmar::Xml::Security::Signature& signature, const Trust& trust,
                      SignatureChecks& checks);

}  // namespace Cli

#endif  // QUORLIN_CLI_EXPLAIN_SIGNATURECHECKS_H
