// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A name with its namespace.

#ifndef PELMAR_XML_QNAME_H
#define PELMAR_XML_QNAME_H

#include <pelmar/Export.h>

#include <string>

namespace Pelmar {
namespace Xml {

/// An expanded name (Namespaces in XML 1.0, section 2.1): namespace URI (empty: none) and local name. A plain
/// value.
class PELMAR_API QName {
 public:
  QName();
  QName(const std::string& namespaceUri, const std::string& localName);

  const std::string& GetNamespace() const noexcept { return _namespaceUri; }
  const std::string& GetLocalName() const noexcept { return _localName; }

  /// "namespace:local", or the local name alone when there is no namespace.
  std::string ToString() const;

 private:
  std::string _namespaceUri;
  std::string _localName;
};

/// Exact, case-sensitive comparison of both members.
PELMAR_API bool operator==(const QName& a, const QName& b) noexcept;
PELMAR_API bool operator!=(const QName& a, const QName& b) noexcept;

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_QNAME_H
