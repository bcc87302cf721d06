// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Putting text into XML.

#ifndef QUORLIN_DEVSTS_XMLTEXT_H
#define QUORLIN_DEVSTS_XMLTEXT_H

#include <string>

namespace DevSts {

/// `text` as element content or as the value of an attribute in double quotes; a reader gets exactly `text`
/// back, carriage returns, tabs and line feeds included (XML 1.0, sections 2.4, 2.11 and 3.3.3). Throws
/// std::invalid_argument for what XML 1.0 cannot carry.
std::string Escape(const std::string& text);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_XMLTEXT_H
