// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Finds what a ds:Reference refers to.

#ifndef PELMAR_XML_SIGNATUREREFERENCETARGET_H
#define PELMAR_XML_SIGNATUREREFERENCETARGET_H

#include <pelmar/xml/Node.h>

#include <string>

namespace Pelmar {
namespace Xml {
namespace Security {

/// What `uri` refers to in `context`; never null.
///
/// "": `context`; when it is the document element, the whole document with it, as XML Signature 1.1,
/// section 4.4.3.2, has it.
/// "#x": `context` when its "ID" attribute is x, else the element below it whose "ID" or wsu:Id is x. No
/// other element of the whole tree around `context` may carry x in an attribute that anybody could take for
/// an ID (local name "id", in any case and namespace): two elements of one ID are how a reader is led to
/// another element than the verifier. Throws XmlSecurityException when there is no such element or more than
/// one.
const Node* FindReferenceTarget(const ElementNode* context, const std::string& uri);

/// Whether `node` is `ancestor` or lies below it. No for null.
bool IsWithin(const Node* node, const Node* ancestor);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SIGNATUREREFERENCETARGET_H
