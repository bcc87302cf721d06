// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/inspect/ClaimsReader.h"

#include "quorlin/Terminal.h"
#include "quorlin/XmlFile.h"
#include "quorlin/inspect/Claims.h"

namespace Cli {
namespace Inspect {

using Pelmar::Xml::ElementNode;

std::vector<const ElementNode*> GetChildren(const ElementNode& element, const std::string& namespaceUri,
                                            const std::string& localName) {
  std::vector<const ElementNode*> children;
  for (const Pelmar::Xml::Node* child = element.GetFirstChildNode(); child != nullptr;
       child = child->GetNextSibling()) {
    const ElementNode* const childElement = Pelmar::Xml::AsElement(child);
    if (childElement != nullptr && Is(*childElement, namespaceUri, localName)) {
      children.push_back(childElement);
    }
  }
  return children;
}

std::string GetExpandedName(const ElementNode& element) {
  const std::string* const uri = element.FindNamespaceUri(element.GetPrefix());
  return CutText((uri == nullptr ? "" : "{" + *uri + "}") + element.GetLocalName(), kMaxTextBytesShown);
}

std::string ReadText(const ElementNode& element) {
  return CutText(GetTrimmedText(element), kMaxTextBytesShown);
}

void AddAttribute(const ElementNode& element, const std::string& name, const std::string& key, Json& json) {
  std::string value;
  if (element.GetAttribute(name, value)) {
    json[key] = CutText(value, kMaxTextBytesShown);
  }
}

void ListReader::AddList(Json& json, const std::string& key, const std::vector<const ElementNode*>& elements,
                         const std::function<Json(const ElementNode&)>& read) {
  std::size_t shown = 0;
  while (shown < elements.size() && _left > 0) {
    --_left;
    json[key].push_back(read(*elements[shown++]));
  }
  if (shown < elements.size()) {
    json[key + "Omitted"] = elements.size() - shown;
  }
}

}  // namespace Inspect
}  // namespace Cli
