// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Canonical XML.

#ifndef PELMAR_XML_SECURITY_CANONICALIZER_H
#define PELMAR_XML_SECURITY_CANONICALIZER_H

#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Ref.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>

#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

/// Writes a document or a subtree in a canonical form. Immutable; may be shared between threads.
class PELMAR_API Canonicalizer : public Object {
 public:
  /// Writes the canonical form of `node`, an element with all below it or a whole document, to `writer`. Null
  /// writes nothing. `omitted`, when given, is left out with all below it (the effect of the
  /// enveloped-signature transform). An element is treated as the apex of a document subset: inclusive
  /// canonical XML gives it the namespace declarations and xml: attributes of its ancestors (Canonical
  /// XML 1.0, section 2.4), exclusive gives it the declarations it visibly uses. Throws XmlSecurityException
  /// for a prefix that is not declared; what was written until then is worthless.
  virtual void Canonicalize(const Node* node, Writer* writer, const Node* omitted = nullptr) const = 0;

 protected:
  ~Canonicalizer() override;
};

/// A canonicaliser for one of the four algorithms of Algorithms.h. Throws XmlSecurityException for any other.
PELMAR_API Ref<Canonicalizer> CreateCanonicalizer(const std::string& algorithm);

/// The same with the PrefixList of an InclusiveNamespaces parameter (Exclusive XML Canonicalization 1.0,
/// section 3): these prefixes
/// ("#default" for the empty one) are treated as inclusive canonicalisation treats all. Only for the
/// exclusive algorithms.
PELMAR_API Ref<Canonicalizer> CreateCanonicalizer(const std::string& algorithm,
                                                  const std::vector<std::string>& inclusivePrefixes);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SECURITY_CANONICALIZER_H
