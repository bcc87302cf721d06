// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// XML that somebody else has written.

#ifndef QUORLIN_CLI_XMLFILE_H
#define QUORLIN_CLI_XMLFILE_H

#include <pelmar/Ref.h>
#include <pelmar/xml/Node.h>

#include <string>

namespace Cli {

/// Reads it with the library's parser. Throws Pelmar::Xml::XMLParseException.
Pelmar::Ref<Pelmar::Xml::Document> ParseXml(const std::string& text);

/// Whether this is the element's expanded name.
bool Is(const Pelmar::Xml::ElementNode& element, const std::string& namespaceUri,
        const std::string& localName);

/// The first element of this name in document order, `element` itself included; null when there is none.
const Pelmar::Xml::ElementNode* FindElement(const Pelmar::Xml::ElementNode& element,
                                            const std::string& namespaceUri, const std::string& localName);

/// All text inside the element, that of its descendants included.
std::string GetAllText(const Pelmar::Xml::ElementNode& element);

/// The same without white space around it.
std::string GetTrimmedText(const Pelmar::Xml::ElementNode& element);

}  // namespace Cli

#endif  // QUORLIN_CLI_XMLFILE_H
