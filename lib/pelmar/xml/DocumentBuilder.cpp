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

bool AreEqual(const AttributeList& list, const AttributeRange* attributes, std::size_t count) noexcept {
  if (list.size() != count) {
    return false;
  }
  for (std::size_t i = 0; i < count; ++i) {
    if (list[i].name != ViewOf(attributes[i].name.text) || list[i].value != ViewOf(attributes[i].value)) {
      return false;
    }
  }
  return true;
}

}  // namespace

DocumentBuilder::DocumentBuilder() : _document(new Document()), _current(_document.Get()) {}

void DocumentBuilder::StartElement(const NameRange& name, const AttributeRange* attributes,
                                   std::size_t attributeCount, unsigned long line, unsigned long column) {
  ElementNode* const element = new ElementNode(ShareName(PartsOf(name)));
  Append(element);
  element->_line = static_cast<std::uint32_t>(line);
  element->_column = static_cast<std::uint32_t>(column);
  if (attributeCount > 0) {
    TakeAttributes(element, attributes, attributeCount);
  }
  _current = element;
}

// Elements that come by the thousand, as the values of a token's attribute do, mostly have the same
// attributes as the one before, and share them: a tree of 5000 groups takes a seventh less memory, and the
// canonical form sees by the address of the list that they are the same.
void DocumentBuilder::TakeAttributes(ElementNode* element, const AttributeRange* attributes,
                                     std::size_t count) {
  if (_lastWithAttributes != nullptr && AreEqual(_lastWithAttributes->GetAttributes(), attributes, count)) {
    _lastWithAttributes->_attributes->_isShared = true;
    element->_attributes = _lastWithAttributes->_attributes;
    element->_declaresNamespaces = _lastWithAttributes->_declaresNamespaces;
    return;
  }
  element->_attributes = Ref<AttributeHolder>(new AttributeHolder());
  AttributeList& list = element->_attributes->_list;
  list.reserve(count);
  for (std::size_t i = 0; i < count; ++i) {
    const TextRange& name = attributes[i].name.text;
    const TextRange& value = attributes[i].value;
    list.emplace_back();
    list.back().name.assign(name.data, name.size);
    list.back().value.assign(value.data, value.size);
    element->_declaresNamespaces = element->_declaresNamespaces || IsNamespaceDeclaration(attributes[i].name);
  }
  _lastWithAttributes = element;
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
