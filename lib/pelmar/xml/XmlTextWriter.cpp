// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/XmlTextWriter.h"

namespace Pelmar {
namespace Xml {

void XmlTextWriter::WriteElement(const ElementNode* element) {
  const Node* node = element;
  for (;;) {
    const Node* const child = Enter(node);
    if (child != nullptr) {
      node = child;
      continue;
    }
    while (node != element && node->GetNextSibling() == nullptr) {
      node = node->GetParent();
      LeaveElement(static_cast<const ElementNode*>(node));
    }
    if (node == element) {
      break;
    }
    node = node->GetNextSibling();
  }
  _sink.Flush();
}

// Writes what stands before the node's children, and gives the first of these; null when there are none and
// the node is written.
const Node* XmlTextWriter::Enter(const Node* node) {
  const ElementNode* const element = AsElement(node);
  if (element != nullptr) {
    return EnterElement(element);
  }
  WriteLeaf(node);
  return nullptr;
}

const Node* XmlTextWriter::EnterElement(const ElementNode* element) {
  _sink.Put('<');
  _sink.PutQualifiedName(element);
  for (const Attribute& attribute : element->GetAttributes()) {
    _sink.PutAttribute(attribute.name, attribute.value);
  }
  if (!IsWithoutContent(element)) {
    _sink.Put('>');
    return element->GetFirstChildNode();
  }
  if (!element->_writtenWithEndTag) {
    _sink.Put("/>");
    return nullptr;
  }
  _sink.Put('>');
  LeaveElement(element);
  return nullptr;
}

void XmlTextWriter::LeaveElement(const ElementNode* element) {
  _sink.Put("</");
  _sink.PutQualifiedName(element);
  _sink.Put('>');
}

bool XmlTextWriter::IsWithoutContent(const ElementNode* element) noexcept {
  for (const Node* child = element->GetFirstChildNode(); child != nullptr; child = child->GetNextSibling()) {
    const TextNode* const text = AsText(child);
    if (text == nullptr || !text->GetText().empty()) {
      return false;
    }
  }
  return true;
}

void XmlTextWriter::WriteLeaf(const Node* node) {
  switch (node->GetKind()) {
    case TEXT_NODE:
      return _sink.PutText(static_cast<const TextNode*>(node)->GetText());
    case COMMENT_NODE:
      return _sink.PutComment(static_cast<const CommentNode*>(node));
    case PROCESSING_INSTRUCTION_NODE:
      return _sink.PutProcessingInstruction(static_cast<const ProcessingInstructionNode*>(node));
    case ELEMENT_NODE:
    case DOCUMENT_NODE:
      break;  // An element is no leaf, and a document is nobody's child.
  }
}

}  // namespace Xml
}  // namespace Pelmar
