// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/xml/QName.h>

namespace Pelmar {
namespace Xml {

QName::QName() = default;

QName::QName(const std::string& namespaceUri, const std::string& localName)
    : _namespaceUri(namespaceUri), _localName(localName) {}

std::string QName::ToString() const {
  return _namespaceUri.empty() ? _localName : _namespaceUri + ":" + _localName;
}

bool operator==(const QName& a, const QName& b) noexcept {
  return a.GetLocalName() == b.GetLocalName() && a.GetNamespace() == b.GetNamespace();
}

bool operator!=(const QName& a, const QName& b) noexcept {
  return !(a == b);
}

}  // namespace Xml
}  // namespace Pelmar
