// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What Namespaces in XML 1.0 says about names and about declarations, one name at a time.

#ifndef PELMAR_XML_NAMERULES_H
#define PELMAR_XML_NAMERULES_H

#include <pelmar/xml/Parser.h>

#include <string_view>

namespace Pelmar {
namespace Xml {

constexpr const char* kXmlNamespace = "http://www.w3.org/XML/1998/namespace";
constexpr const char* kXmlnsNamespace = "http://www.w3.org/2000/xmlns/";

/// A name cut at its first colon; the views are into the name.
struct NameParts {
  std::string_view prefix;  // Empty when there is no colon.
  std::string_view localName;
};

NameParts SplitName(std::string_view name) noexcept;

// What the parser hands on: measured, and cut at the colon, once.

inline std::string_view ViewOf(const TextRange& range) noexcept {
  return std::string_view(range.data, range.size);
}

inline NameParts PartsOf(const NameRange& name) noexcept {
  const std::string_view text = ViewOf(name.text);
  if (name.localStart == 0) {
    return {std::string_view(), text};
  }
  return {text.substr(0, name.localStart - 1), text.substr(name.localStart)};
}

bool IsNamespaceDeclaration(const NameRange& attributeName) noexcept;

/// Whether an attribute of this name declares a namespace; then `prefix` is the declared one, empty for the
/// default namespace.
bool IsNamespaceDeclaration(std::string_view attributeName, std::string_view& prefix) noexcept;

/// Whether `name`, known to be a Name of XML 1.0, is also a QName: at most one colon, and a name on both
/// sides of it (Namespaces in XML 1.0, section 4).
bool IsQualifiedName(const NameRange& name) noexcept;

/// What is wrong with binding `prefix` (empty: the default namespace) to `uri`; null when nothing is
/// (Namespaces in XML 1.0, sections 2.2 and 3).
const char* FindDeclarationFault(std::string_view prefix, std::string_view uri) noexcept;

/// Whether `name` is a Name of XML 1.0 without a colon, as the parser would accept it.
bool IsNcName(std::string_view name);

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_NAMERULES_H
