// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The one walk behind all forms of Canonical XML.

#ifndef PELMAR_XML_CANONICALWALK_H
#define PELMAR_XML_CANONICALWALK_H

#include "pelmar/xml/XmlTextSink.h"

#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

struct CanonicalForm {
  bool exclusive = false;
  bool withComments = false;
  /// Only for the exclusive form: prefixes that are treated as the inclusive form treats all; empty: the
  /// default namespace.
  std::vector<std::string> inclusivePrefixes;
};

/// Writes one document or subtree in a canonical form. Used once; keeps pointers into the tree while it
/// writes.
///
/// Namespaces are two stacks, those in scope and those already rendered, searched from the back. The parser's
/// limit on declarations bounds the search, whatever a hostile document does.
class CanonicalWalk final {
 public:
  /// What is given must outlive the walk. `omitted` may be null.
  CanonicalWalk(const CanonicalForm& form, Writer* writer, const Node* omitted);
  CanonicalWalk(const CanonicalWalk&) = delete;
  CanonicalWalk& operator=(const CanonicalWalk&) = delete;

  /// Writes `node`, a document or an element. Throws XmlSecurityException.
  void Write(const Node* node);

 private:
  struct Binding {
    std::string_view prefix;
    const std::string* uri;
  };
  // An attribute that declares no namespace. The URI is null until it is resolved.
  struct PlainAttribute {
    std::string_view prefix;
    std::string_view localName;
    const std::string* uri;
    const Attribute* attribute;
  };
  // What the stacks held outside an open element.
  struct Frame {
    std::size_t inScope;
    std::size_t rendered;
    const ElementNode* element;
    const std::string* uri;  // What the element's own prefix stands for.
  };

  void WriteDocument(const Document* document);
  void WriteTree(const ElementNode* apex);
  const Node* Enter(const Node* node);
  void StartElement(const ElementNode* element);
  bool IsLikeLastLeaf(const ElementNode* element) const noexcept;
  void RememberLeaf(const ElementNode* element, std::string_view startTag);
  void EndElement(const ElementNode* element);
  bool IsWritten(const Node* node) const noexcept;
  void WriteLeaf(const Node* node);

  void TakeAncestors(const ElementNode* apex);
  void TakeAttributes(const ElementNode* element);
  void TakePlainAttribute(const Attribute& attribute);
  void Declare(const ElementNode* element, std::string_view prefix, const std::string& uri);
  void InheritXmlAttributes(const ElementNode* apex);
  bool HasAttribute(std::string_view name) const noexcept;
  void ResolveAttributes(const ElementNode* element);
  void SortAttributes();

  bool HasPrefixOfParent(const ElementNode* element, const Frame& frame) const noexcept;
  void RenderNamespaces(const Frame& frame, bool isPrefixRendered);
  void RenderDeclared(std::size_t first);
  void RenderUsed(const Frame& frame, bool isPrefixRendered);
  void Render(std::string_view prefix, const std::string* uri);
  bool IsInclusive(std::string_view prefix) const noexcept;

  static const std::string* Find(const std::vector<Binding>& bindings, std::string_view prefix) noexcept;
  const std::string* RequireDeclared(const ElementNode* element, std::string_view prefix) const;

  const CanonicalForm& _form;
  XmlTextSink _sink;
  const Node* _omitted;
  bool _atApex = false;
  std::vector<Binding> _inScope;
  std::vector<Binding> _rendered;
  std::vector<Frame> _frames;
  // An element without child elements, the last one if its start tag is known; else null.
  const ElementNode* _lastLeaf = nullptr;
  std::string _startTagOfLastLeaf;
  std::vector<PlainAttribute> _attributes;  // Those of the element being started.
};

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_CANONICALWALK_H
