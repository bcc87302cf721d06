// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The certificates that a ds:KeyInfo carries.

#ifndef PELMAR_XML_KEYINFOCERTIFICATES_H
#define PELMAR_XML_KEYINFOCERTIFICATES_H

#include <pelmar/xml/Node.h>

#include <cstddef>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

/// A chain of usual length; every further one would be parsed on a stranger's word.
constexpr std::size_t kMaxKeyInfoCertificates = 10;

/// The contents of all ds:X509Data/ds:X509Certificate (XML Signature 1.1, section 4.5.4) of `keyInfo` in
/// document order; one at least. Everything else in it is passed over. Throws XmlSecurityException, also for
/// null.
std::vector<std::vector<unsigned char>> ReadKeyInfoCertificates(const ElementNode* keyInfo);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_KEYINFOCERTIFICATES_H
