// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Strict reading of requests. Whatever is not as it should be is a soapenv:Client fault that names the
// element.

#ifndef QUORLIN_DEVSTS_XMLREADING_H
#define QUORLIN_DEVSTS_XMLREADING_H

#include <pelmar/Ref.h>
#include <pelmar/system/DateTime.h>
#include <pelmar/xml/Node.h>

#include <initializer_list>
#include <string>
#include <vector>

namespace DevSts {

/// Reads a message. SOAP 1.1, section 3, forbids processing instructions, which are refused wherever they are
/// met.
Pelmar::Ref<Pelmar::Xml::Document> ParseMessage(const std::string& text);

bool Is(const Pelmar::Xml::ElementNode& element, const char* namespaceUri, const char* localName);

/// The child elements in order. Comments and white space between them are skipped, anything else is refused.
std::vector<Pelmar::Xml::ElementNode*> GetChildElements(const Pelmar::Xml::ElementNode& parent);

/// The one child of that name. Refuses none and more than one; other children are not looked at.
Pelmar::Xml::ElementNode& GetOnlyChild(const Pelmar::Xml::ElementNode& parent, const char* namespaceUri,
                                       const char* localName);

/// The same, but null when there is none.
Pelmar::Xml::ElementNode* FindOnlyChild(const Pelmar::Xml::ElementNode& parent, const char* namespaceUri,
                                        const char* localName);

/// Refuses an element whose children are not exactly those of these names and this namespace, each once, in
/// this order.
void RequireChildren(const Pelmar::Xml::ElementNode& parent, const char* namespaceUri,
                     std::initializer_list<const char*> localNames);

/// The text of an element that holds nothing else. A comment inside would split it, so that is refused.
std::string GetTextOf(const Pelmar::Xml::ElementNode& element);

/// An attribute without namespace.
std::string GetRequiredAttribute(const Pelmar::Xml::ElementNode& element, const char* name);

/// Refuses an attribute that is none of `names` (as written) and no namespace declaration.
void RequireNoOtherAttributes(const Pelmar::Xml::ElementNode& element,
                              std::initializer_list<const char*> names);

/// "true" or "false", "1" or "0" (XML Schema Part 2, section 3.2.2).
bool ReadBoolean(const Pelmar::Xml::ElementNode& element, const std::string& text);

Pelmar::System::DateTime ReadDate(const Pelmar::Xml::ElementNode& element);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_XMLREADING_H
