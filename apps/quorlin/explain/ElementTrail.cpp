// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/explain/ElementTrail.h"

#include "quorlin/XmlFile.h"

#include <cstddef>

namespace Cli {

using Pelmar::Xml::AsElement;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;

namespace {

constexpr const char* kSamlNs = "urn:oasis:names:tc:SAML:2.0:assertion";

bool IsNamesake(const Node* node, const ElementNode* element) {
  const ElementNode* const other = AsElement(node);
  return other != nullptr && other->GetLocalName() == element->GetLocalName();
}

/// "Attribute", or "Attribute[2]" where several siblings are called so.
std::string DescribeStep(const ElementNode* element, const ElementNode* root) {
  if (element == root) {
    return element->GetLocalName();
  }
  std::size_t before = 0;
  for (const Node* node = element->GetPreviousSibling(); node != nullptr; node = node->GetPreviousSibling()) {
    before += IsNamesake(node, element) ? 1 : 0;
  }
  bool isAlone = before == 0;
  for (const Node* node = element->GetNextSibling(); isAlone && node != nullptr;
       node = node->GetNextSibling()) {
    isAlone = !IsNamesake(node, element);
  }
  return element->GetLocalName() + (isAlone ? "" : "[" + std::to_string(before + 1) + "]");
}

}  // namespace

bool ElementTrail::Accept(Node* node) const {
  if (!_filter.Accept(node)) {
    return false;
  }
  if (const ElementNode* const element = AsElement(node)) {
    _visited.push_back(element);
  }
  return true;
}

Place FindPlace(const ElementNode* element, const ElementNode* root) {
  std::string path;
  for (const ElementNode* step = element; step != nullptr; step = AsElement(step->GetParent())) {
    path = "/" + DescribeStep(step, root) + path;
    if (step == root) {
      break;
    }
  }
  return {path, element->GetLine(), element->GetColumn()};
}

ElementNode* FindAssertion(ElementNode* element) {
  // The tree is the caller's own, so it may be handed out as it came.
  return const_cast<ElementNode*>(FindElement(*element, kSamlNs, "Assertion"));
}

}  // namespace Cli
