// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/DocumentBuilder.h"

#include "pelmar/core/PerThread.h"
#include "pelmar/xml/NameRules.h"

#include <array>
#include <cstdint>
#include <string>
#include <string_view>

namespace Pelmar {
namespace Xml {

namespace {

Ref<const ElementName> MakeName(const NameParts& parts) {
  return MakeRef<const ElementName>(std::string(parts.prefix), std::string(parts.localName));
}

constexpr std::size_t kRememberedNames = 64;
constexpr std::size_t kMaxBytesOfRememberedName = 64;

using RememberedNames = std::array<Ref<const ElementName>, kRememberedNames>;

// Names repeat, within a document and from one to the next. Each has one place where it may be remembered,
// and whoever comes later to that place takes it over: a foreign document can have a hundred thousand names,
// chosen so as to meet in any table that keeps them all.
Ref<const ElementName> ShareName(const NameRange& name) {
  const std::string_view text = ViewOf(name.text);
  const NameParts parts = PartsOf(name);
  RememberedNames* const names = PerThread<RememberedNames>::Get();
  if (names == nullptr || text.size() > kMaxBytesOfRememberedName) {
    return MakeName(parts);
  }
  const std::size_t mix = text.size() * 31 + static_cast<unsigned char>(text.back()) * 7 +
                          static_cast<unsigned char>(text[text.size() / 2]);
  Ref<const ElementName>& place = (*names)[mix % kRememberedNames];
  if (!place || place->qualifiedName != text) {
    place = MakeName(parts);
  }
  return place;
}

}  // namespace

DocumentBuilder::DocumentBuilder() : _document(new Document()), _current(_document.Get()) {}

void DocumentBuilder::StartElement(const NameRange& name, const AttributeRange* attributes,
                                   std::size_t attributeCount, unsigned long line, unsigned long column) {
  ElementNode* const element = new ElementNode(ShareName(name));
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
