// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/DocumentBuilder.h"

#include <cstring>

namespace Pelmar {
namespace Xml {

namespace {

void AssignName(const char* name, std::string& prefix, std::string& localName) {
  const char* const colon = std::strchr(name, ':');
  if (colon == nullptr) {
    localName.assign(name);
    return;
  }
  prefix.assign(name, colon);
  localName.assign(colon + 1);
}

void AssignAttributes(const char* const* attributes, std::vector<Attribute>& result) {
  std::size_t count = 0;
  while (attributes[2 * count] != nullptr) {
    ++count;
  }
  result.resize(count);
  for (std::size_t i = 0; i < count; ++i) {
    result[i].name.assign(attributes[2 * i]);
    result[i].value.assign(attributes[2 * i + 1]);
  }
}

}  // namespace

DocumentBuilder::DocumentBuilder() : _document(new Document()), _current(_document.Get()) {}

void DocumentBuilder::StartElement(const char* name, const char* const* attributes, unsigned long line,
                                   unsigned long column) {
  ElementNode* const element = new ElementNode(std::string(), std::string());
  Append(element);
  AssignName(name, element->_prefix, element->_localName);
  AssignAttributes(attributes, element->_attributes);
  element->_line = line;
  element->_column = column;
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
