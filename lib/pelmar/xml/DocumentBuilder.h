// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Builds the tree from the parser's events.

#ifndef PELMAR_XML_DOCUMENTBUILDER_H
#define PELMAR_XML_DOCUMENTBUILDER_H

#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>

#include <cstddef>

namespace Pelmar {
namespace Xml {

/// The handler whose result is the `Document`.
class DocumentBuilder final : public XMLHandler {
 public:
  DocumentBuilder();

  void StartElement(const NameRange& name, const AttributeRange* attributes, std::size_t attributeCount,
                    unsigned long line, unsigned long column) override;
  void EndElement(bool emptyTag) override;
  void Characters(const char* text, std::size_t size) override;
  void Comment(const char* text) override;
  void ProcessingInstruction(const char* target, const char* data) override;
  Ref<Object> GetResult() override;

 private:
  void Append(Node* node);
  void TakeAttributes(ElementNode* element, const AttributeRange* attributes, std::size_t count);

  Ref<Document> _document;
  ElementNode* _lastWithAttributes = nullptr;  // In the document.
  ParentNode* _current;                        // The innermost open element, or the document.
};

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_DOCUMENTBUILDER_H
