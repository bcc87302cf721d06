// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/XmlFile.h"

#include <pelmar/xml/Parser.h>

namespace Cli {

using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;

Pelmar::Ref<Pelmar::Xml::Document> ParseXml(const std::string& text) {
  Pelmar::Ref<Pelmar::Object> result;
  Pelmar::Xml::CreateXMLParser(Pelmar::Xml::CreateXMLDocumentHandler())
      ->Parse(Pelmar::CreateStringReader(text).Get(), result);
  return Pelmar::Xml::ViewAsDocument(result);
}

bool Is(const ElementNode& element, const std::string& namespaceUri, const std::string& localName) {
  const std::string* const uri = element.FindNamespaceUri(element.GetPrefix());
  return element.GetLocalName() == localName && uri != nullptr && *uri == namespaceUri;
}

// The parser bounds how deep this and the next can go.
const ElementNode* FindElement(const ElementNode& element, const std::string& namespaceUri,
                               const std::string& localName) {
  if (Is(element, namespaceUri, localName)) {
    return &element;
  }
  for (const Node* child = element.GetFirstChildNode(); child != nullptr; child = child->GetNextSibling()) {
    const ElementNode* const childElement = Pelmar::Xml::AsElement(child);
    const ElementNode* const found =
        childElement == nullptr ? nullptr : FindElement(*childElement, namespaceUri, localName);
    if (found != nullptr) {
      return found;
    }
  }
  return nullptr;
}

std::string GetAllText(const ElementNode& element) {
  std::string text;
  for (const Node* child = element.GetFirstChildNode(); child != nullptr; child = child->GetNextSibling()) {
    if (const auto* const run = Pelmar::Xml::AsText(child)) {
      text += run->GetText();
    } else if (const ElementNode* const childElement = Pelmar::Xml::AsElement(child)) {
      text += GetAllText(*childElement);
    }
  }
  return text;
}

std::string GetTrimmedText(const ElementNode& element) {
  constexpr const char* kWhiteSpace = " \t\r\n";
  const std::string text = GetAllText(element);
  const std::size_t start = text.find_first_not_of(kWhiteSpace);
  return start == std::string::npos ? "" : text.substr(start, text.find_last_not_of(kWhiteSpace) + 1 - start);
}

}  // namespace Cli
