// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SignatureReferenceTarget.h"

#include "pelmar/xml/SignatureProfile.h"

#include <pelmar/xml/security/Exceptions.h>

#include <algorithm>
#include <cstddef>

namespace Pelmar {
namespace Xml {
namespace Security {

namespace {

constexpr const char* kSecurityUtilityNamespace =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";

const Node* GetRoot(const Node* node) {
  while (node->GetParent() != nullptr) {
    node = node->GetParent();
  }
  return node;
}

/// The node after `node` in document order, within the tree below `root`; null at its end. No recursion:
/// trees may be deep.
const Node* GetNextNode(const Node* node, const Node* root) {
  if (const Node* const child = node->GetFirstChild()) {
    return child;
  }
  while (node != root && node->GetNextSibling() == nullptr) {
    node = node->GetParent();
  }
  return node == root ? nullptr : node->GetNextSibling();
}

bool MayBeIdName(const std::string& attributeName) {
  const std::size_t size = attributeName.size();
  return size >= 2 && (attributeName[size - 2] | 0x20) == 'i' && (attributeName[size - 1] | 0x20) == 'd' &&
         (size == 2 || attributeName[size - 3] == ':') && attributeName.compare(0, 6, "xmlns:") != 0;
}

bool MayHaveId(const ElementNode& element, const std::string& id) {
  const AttributeList& attributes = element.GetAttributes();
  return std::any_of(attributes.begin(), attributes.end(), [&id](const Attribute& attribute) {
    return attribute.value == id && MayBeIdName(attribute.name);
  });
}

/// The one element of the tree around `context` that may be said to have this ID.
const ElementNode* FindOnlyElement(const ElementNode* context, const std::string& uri) {
  const std::string id = uri.substr(1);
  const Node* const root = GetRoot(context);
  const ElementNode* found = nullptr;
  for (const Node* node = root; node != nullptr; node = GetNextNode(node, root)) {
    const ElementNode* const element = AsElement(node);
    if (element == nullptr || !MayHaveId(*element, id)) {
      continue;
    }
    if (found != nullptr) {
      throw XmlSecurityException("Reference " + QuoteForMessage(uri) +
                                 " is ambiguous: several elements have this ID");
    }
    found = element;
  }
  return found;
}

/// Whether `element` has the ID by an attribute that counts for references.
bool HasId(const ElementNode& element, const ElementNode* context, const std::string& id) {
  std::string value;
  if (element.GetAttribute("ID", value) && value == id) {
    return true;
  }
  return &element != context && element.GetAttribute(QName(kSecurityUtilityNamespace, "Id"), value) &&
         value == id;
}

}  // namespace

const Node* FindReferenceTarget(const ElementNode* context, const std::string& uri) {
  if (uri.empty()) {
    const ParentNode* const parent = context->GetParent();
    return parent != nullptr && parent->GetKind() == DOCUMENT_NODE ? static_cast<const Node*>(parent)
                                                                   : context;
  }
  const ElementNode* const element = FindOnlyElement(context, uri);
  if (element == nullptr || !IsWithin(element, context) || !HasId(*element, context, uri.substr(1))) {
    throw XmlSecurityException("Reference " + QuoteForMessage(uri) +
                               " refers to no element that could be signed");
  }
  return element;
}

bool IsWithin(const Node* node, const Node* ancestor) {
  while (node != nullptr && node != ancestor) {
    node = node->GetParent();
  }
  return node != nullptr;
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
