// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/XmlReading.h"

#include "devsts/Fault.h"

#include <pelmar/Reader.h>
#include <pelmar/xml/Parser.h>

#include <algorithm>
#include <cstring>

namespace DevSts {

using Pelmar::Ref;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;

namespace {

[[noreturn]] void Refuse(const ElementNode& element, const std::string& what) {
  throw Fault(FaultCode::CLIENT, "Element " + element.GetLocalName() + " " + what);
}

bool IsBlank(const std::string& text) {
  return text.find_first_not_of("\t\n\r ") == std::string::npos;
}

bool IsSkipped(const Node& node) {
  if (node.GetKind() == Pelmar::Xml::COMMENT_NODE) {
    return true;
  }
  const Pelmar::Xml::TextNode* const text = AsText(&node);
  return text != nullptr && IsBlank(text->GetText());
}

bool IsNamespaceDeclaration(const std::string& attributeName) {
  return attributeName == "xmlns" || attributeName.rfind("xmlns:", 0) == 0;
}

}  // namespace

Ref<Pelmar::Xml::Document> ParseMessage(const std::string& text) {
  try {
    const Ref<Pelmar::Reader> reader = Pelmar::CreateStringReader(text);
    Ref<Pelmar::Object> result;
    Pelmar::Xml::CreateXMLParser(Pelmar::Xml::CreateXMLDocumentHandler())->Parse(reader.Get(), result);
    return Pelmar::Xml::ViewAsDocument(result);
  } catch (const Pelmar::Xml::XMLParseException& e) {
    throw Fault(FaultCode::CLIENT, std::string("The request is not acceptable XML: ") + e.what());
  }
}

bool Is(const ElementNode& element, const char* namespaceUri, const char* localName) {
  if (element.GetLocalName() != localName) {
    return false;
  }
  const std::string* const uri = element.FindNamespaceUri(element.GetPrefix());
  return uri != nullptr && *uri == namespaceUri;
}

std::vector<ElementNode*> GetChildElements(const ElementNode& parent) {
  std::vector<ElementNode*> children;
  for (Node* node = parent.GetFirstChildNode(); node != nullptr; node = node->GetNextSibling()) {
    ElementNode* const element = Pelmar::Xml::AsElement(node);
    if (element != nullptr) {
      children.push_back(element);
    } else if (!IsSkipped(*node)) {
      Refuse(parent, "may hold elements only");
    }
  }
  return children;
}

ElementNode* FindOnlyChild(const ElementNode& parent, const char* namespaceUri, const char* localName) {
  ElementNode* found = nullptr;
  for (ElementNode* const child : GetChildElements(parent)) {
    if (!Is(*child, namespaceUri, localName)) {
      continue;
    }
    if (found != nullptr) {
      Refuse(parent, std::string("holds more than one ") + localName);
    }
    found = child;
  }
  return found;
}

ElementNode& GetOnlyChild(const ElementNode& parent, const char* namespaceUri, const char* localName) {
  ElementNode* const child = FindOnlyChild(parent, namespaceUri, localName);
  if (child == nullptr) {
    Refuse(parent, std::string("holds no ") + localName);
  }
  return *child;
}

void RequireChildren(const ElementNode& parent, const char* namespaceUri,
                     std::initializer_list<const char*> localNames) {
  const std::vector<ElementNode*> children = GetChildElements(parent);
  const bool asExpected =
      std::equal(children.begin(), children.end(), localNames.begin(), localNames.end(),
                 [&](const ElementNode* child, const char* name) { return Is(*child, namespaceUri, name); });
  if (asExpected) {
    return;
  }
  std::string expected;
  for (const char* const name : localNames) {
    expected += (expected.empty() ? "" : ", ") + std::string(name);
  }
  Refuse(parent, "must hold exactly " + (expected.empty() ? "nothing" : expected));
}

std::string GetTextOf(const ElementNode& element) {
  if (element.GetChildCount() == 0) {
    return "";
  }
  const Pelmar::Xml::TextNode* const text = AsText(element.GetFirstChildNode());
  if (text == nullptr || element.GetChildCount() != 1) {
    Refuse(element, "must hold text only");
  }
  return text->GetText();
}

std::string GetRequiredAttribute(const ElementNode& element, const char* name) {
  std::string value;
  if (!element.GetAttribute(name, value)) {
    Refuse(element, std::string("has no attribute ") + name);
  }
  return value;
}

void RequireNoOtherAttributes(const ElementNode& element, std::initializer_list<const char*> names) {
  for (const Pelmar::Xml::Attribute& attribute : element.GetAttributes()) {
    const bool known =
        std::any_of(names.begin(), names.end(), [&](const char* name) { return attribute.name == name; });
    if (!known && !IsNamespaceDeclaration(attribute.name)) {
      Refuse(element, "has an unknown attribute " + attribute.name);
    }
  }
}

bool ReadBoolean(const ElementNode& element, const std::string& text) {
  if (text == "true" || text == "1") {
    return true;
  }
  if (text == "false" || text == "0") {
    return false;
  }
  Refuse(element, "has no boolean value");
}

Pelmar::System::DateTime ReadDate(const ElementNode& element) {
  try {
    return Pelmar::System::DateTime(GetTextOf(element));
  } catch (const Pelmar::System::DateFormatException&) {
    Refuse(element, "is not a date");
  }
}

}  // namespace DevSts
