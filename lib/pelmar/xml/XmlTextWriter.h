// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Writes a tree as XML text, as it was read or built.

#ifndef PELMAR_XML_XMLTEXTWRITER_H
#define PELMAR_XML_XMLTEXTWRITER_H

#include "pelmar/xml/XmlTextSink.h"

#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>

namespace Pelmar {
namespace Xml {

/// The serialiser behind `ElementNode::WriteXml`. It escapes as Canonical XML does, so that text that came in
/// canonical form goes out byte for byte. Its walk needs no stack: a tree built in a program may be deeper
/// than any that is parsed.
class XmlTextWriter final {
 public:
  explicit XmlTextWriter(Writer* writer) noexcept : _sink(writer) {}

  void WriteElement(const ElementNode* element);

 private:
  static bool IsWithoutContent(const ElementNode* element) noexcept;

  const Node* Enter(const Node* node);
  const Node* EnterElement(const ElementNode* element);
  void LeaveElement(const ElementNode* element);
  void WriteLeaf(const Node* node);

  XmlTextSink _sink;
};

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_XMLTEXTWRITER_H
