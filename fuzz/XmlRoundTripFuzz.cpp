// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The parser refuses with XMLParseException and nothing else; what it accepts is written as text that parses
// to the same tree and is written the same again.

#include <pelmar/Reader.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

namespace {

using namespace Pelmar;
using namespace Pelmar::Xml;

void Require(bool holds) {
  if (!holds) {
    std::abort();
  }
}

Ref<Document> Parse(const std::string& text) {
  Ref<Object> result;
  CreateXMLParser(CreateXMLDocumentHandler())->Parse(CreateStringReader(text).Get(), result);
  return ViewAsDocument(result);
}

std::string Write(const ElementNode* element) {
  const Ref<StringWriter> writer = CreateStringWriter();
  element->WriteXml(writer.Get());
  return writer->GetText();
}

bool HasSameAttributes(const ElementNode* a, const ElementNode* b) {
  const AttributeList& left = a->GetAttributes();
  const AttributeList& right = b->GetAttributes();
  if (left.size() != right.size()) {
    return false;
  }
  for (std::size_t i = 0; i < left.size(); ++i) {
    if (left[i].name != right[i].name || left[i].value != right[i].value) {
      return false;
    }
  }
  return true;
}

bool SaysTheSame(const Node* a, const Node* b) {
  if (a->GetKind() != b->GetKind()) {
    return false;
  }
  switch (a->GetKind()) {
    case ELEMENT_NODE:
      return AsElement(a)->GetQualifiedName() == AsElement(b)->GetQualifiedName() &&
             HasSameAttributes(AsElement(a), AsElement(b));
    case TEXT_NODE:
      return AsText(a)->GetText() == AsText(b)->GetText();
    case COMMENT_NODE:
      return static_cast<const CommentNode*>(a)->GetText() == static_cast<const CommentNode*>(b)->GetText();
    case PROCESSING_INSTRUCTION_NODE:
      return static_cast<const ProcessingInstructionNode*>(a)->GetTarget() ==
                 static_cast<const ProcessingInstructionNode*>(b)->GetTarget() &&
             static_cast<const ProcessingInstructionNode*>(a)->GetData() ==
                 static_cast<const ProcessingInstructionNode*>(b)->GetData();
    case DOCUMENT_NODE:
      return true;
  }
  return false;
}

// As deep as the parser lets a tree be.
bool IsSameTree(const Node* a, const Node* b) {
  if (!SaysTheSame(a, b)) {
    return false;
  }
  const Node* left = a->GetFirstChild();
  const Node* right = b->GetFirstChild();
  while (left != nullptr && right != nullptr && IsSameTree(left, right)) {
    left = left->GetNextSibling();
    right = right->GetNextSibling();
  }
  return left == nullptr && right == nullptr;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Ref<Document> document;
  try {
    document = Parse(std::string(data, data + size));
  } catch (const XMLParseException&) {
    return 0;
  }
  const ElementNode* const root = document->GetDocumentElement();
  const std::string written = Write(root);
  // Escapes make text longer: what was just within the limit need not be so again.
  if (written.size() > kMaxDocumentBytes) {
    return 0;
  }
  const Ref<Document> again = Parse(written);
  Require(IsSameTree(root, again->GetDocumentElement()));
  Require(Write(again->GetDocumentElement()) == written);
  return 0;
}
