// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/DocumentBuilder.h"

#include "pelmar/core/PerThread.h"
#include "pelmar/xml/NameRules.h"
#include "pelmar/xml/RememberedNames.h"

#include <cstdint>
#include <string>

namespace Pelmar {
namespace Xml {

namespace {

Ref<const ElementName> ShareName(const NameParts& parts) {
  RememberedNames* const names = PerThread<RememberedNames>::Get();
  Ref<const ElementName> name = names != nullptr ? names->Find(parts) : nullptr;
  if (!name) {
    name = MakeRef<const ElementName>(std::string(parts.prefix), std::string(parts.localName));
    if (names != nullptr) {
      names->Remember(name);
    }
  }
  return name;
}

}  // namespace

DocumentBuilder::DocumentBuilder() : _document(new Document()), _current(_document.Get()) {}

void DocumentBuilder::StartElement(const NameRange& name, const AttributeRange* attributes,
                                   std::size_t attributeCount, unsigned long line, unsigned long column) {
  ElementNode* const element = new ElementNode(ShareName(PartsOf(name)));
  Append(element);
  element->_line = static_cast<std::uint32_t>(line);
  element->_column = static_cast<std::uint32_t>(column);
  element->_attributes.reserve(attributeCount);
  for (std::size_t i = 0; i < attributeCount; ++i) {
    const TextRange& attributeName = attributes[i].name.text;
    const TextRange& value = attributes[i].value;
    element->_attributes.emplace_back();
    element->_attributes.back().name.assign(attributeName.data, attributeName.size);
    element->_attributes.back().value.assign(value.data, value.size);
    element->_declaresNamespaces = element->_declaresNamespaces || IsNamespaceDeclaration(attributes[i].name);
  }
  _current = element;
}

void DocumentBuilder::EndElement(bool emptyTag) {
  ElementNode* const element = AsElement(_current);
  element->_writtenWithEndTag = !emptyTag;
  _current = element->GetParent();
}

// The tokeniser reports each line, reference and CDATA section on its own; in the tree they are one text.
void DocumentBuilder::Characters(const char* text, std::size_t size) {
  TextNode* last = AsText(_current->GetLastChildNode());
  if (last == nullptr) {
    last = new TextNode();
    Append(last);
  }
  last->_text.append(text, size);
}

void DocumentBuilder::Comment(const char* text) {
  Append(new CommentNode(text));
}

void DocumentBuilder::ProcessingInstruction(const char* target, const char* data) {
  Append(new ProcessingInstructionNode(target, data));
}

Ref<Object> DocumentBuilder::GetResult() {
  return _document;
}

void DocumentBuilder::Append(Node* node) {
  if (_current == _document.Get()) {
    _current->AppendChild(Ref<Node>(node));
  } else {
    _current->LinkLast(
        node);  // A new node below an element: nothing to check, and no other owner to count in and out.
  }
}

}  // namespace Xml
}  // namespace Pelmar
