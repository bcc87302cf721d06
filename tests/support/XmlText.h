// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Text to tree and back, for tests.

#ifndef QUORLIN_TESTS_SUPPORT_XMLTEXT_H
#define QUORLIN_TESTS_SUPPORT_XMLTEXT_H

#include <pelmar/Reader.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/security/Canonicalizer.h>

#include <cstddef>
#include <string>
#include <vector>

namespace TestSupport {

/// Throws XMLParseException.
inline Pelmar::Ref<Pelmar::Xml::Document> ParseXmlText(const std::string& text) {
  const Pelmar::Ref<Pelmar::Reader> reader = Pelmar::CreateStringReader(text);
  Pelmar::Ref<Pelmar::Object> result;
  Pelmar::Xml::CreateXMLParser(Pelmar::Xml::CreateXMLDocumentHandler())->Parse(reader.Get(), result);
  return Pelmar::Xml::ViewAsDocument(result);
}

inline std::string WriteXmlText(const Pelmar::Xml::ElementNode* element) {
  const Pelmar::Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  element->WriteXml(writer.Get());
  return writer->GetText();
}

/// Throws XmlSecurityException.
inline std::string CanonicalText(const Pelmar::Xml::Node* node, const std::string& algorithm,
                                 const std::vector<std::string>& inclusivePrefixes = {},
                                 const Pelmar::Xml::Node* omitted = nullptr) {
  const Pelmar::Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  Pelmar::Xml::Security::CreateCanonicalizer(algorithm, inclusivePrefixes)
      ->Canonicalize(node, writer.Get(), omitted);
  return writer->GetText();
}

/// One line for each node of the tree: depth, kind, and all that the tree says about it but the place in the
/// text.
inline void DescribeTree(const Pelmar::Xml::Node* node, std::size_t depth, std::string& description) {
  using namespace Pelmar::Xml;
  description += std::string(depth, ' ');
  if (const ElementNode* const element = AsElement(node)) {
    description += "element " + element->GetPrefix() + "|" + element->GetLocalName();
    for (const Attribute& attribute : element->GetAttributes()) {
      description += " [" + attribute.name + "=" + attribute.value + "]";
    }
  } else if (const TextNode* const text = AsText(node)) {
    description += "text [" + text->GetText() + "]";
  } else if (node->GetKind() == COMMENT_NODE) {
    description += "comment [" + static_cast<const CommentNode*>(node)->GetText() + "]";
  } else if (node->GetKind() == PROCESSING_INSTRUCTION_NODE) {
    const ProcessingInstructionNode* const instruction = static_cast<const ProcessingInstructionNode*>(node);
    description += "instruction [" + instruction->GetTarget() + "|" + instruction->GetData() + "]";
  } else {
    description += "document";
  }
  description += "\n";
  for (const Node* child = node->GetFirstChild(); child != nullptr; child = child->GetNextSibling()) {
    DescribeTree(child, depth + 1, description);
  }
}

inline std::string DescribeTree(const Pelmar::Xml::Node* node) {
  std::string description;
  DescribeTree(node, 0, description);
  return description;
}

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_XMLTEXT_H
