// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The XML document tree: elements, texts, comments, processing instructions and the document that holds them.

#ifndef PELMAR_XML_NODE_H
#define PELMAR_XML_NODE_H

#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Ref.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/NodeMemory.h>
#include <pelmar/xml/QName.h>

#include <cstddef>
#include <cstdint>
#include <set>
#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {

class ElementNode;
class ParentNode;

enum NodeKind { DOCUMENT_NODE, ELEMENT_NODE, TEXT_NODE, COMMENT_NODE, PROCESSING_INSTRUCTION_NODE };

/// A node of a document tree.
///
/// Ownership: a parent owns its children; whoever holds a `Ref` to a node keeps that node and all below it
/// alive, but not what is above: when the parent dies, the node has no parent any more.
///
/// Threads: a tree that nobody changes may be read from several threads; a changing one belongs to one
/// thread.
class PELMAR_API Node : public Object {
 public:
  NodeKind GetKind() const noexcept { return static_cast<NodeKind>(_kind); }
  /// Null when there is none.
  ParentNode* GetParent() const noexcept { return _parent; }
  Node* GetNextSibling() const noexcept { return _nextSibling; }
  Node* GetPreviousSibling() const noexcept { return _previousSibling; }
  /// Null for a node without children and for every node that cannot have any.
  Node* GetFirstChild() const noexcept;

  static void* operator new(std::size_t size) { return AllocateNodeMemory(size); }
  static void operator delete(void* memory, std::size_t size) noexcept { FreeNodeMemory(memory, size); }

 protected:
  explicit Node(NodeKind kind) noexcept;
  ~Node() override;

 private:
  friend class ParentNode;

  // A tree takes several times the memory of its text, so its nodes are packed: what is small stands first.
  const unsigned char _kind;
  ParentNode* _parent;
  Node* _previousSibling;
  Node* _nextSibling;
};

/// A node that can have children.
class PELMAR_API ParentNode : public Node {
 public:
  Node* GetFirstChildNode() const noexcept { return _firstChild; }
  Node* GetLastChildNode() const noexcept { return _lastChild; }
  std::size_t GetChildCount() const noexcept { return _childCount; }

  /// Makes `child` the last child, taking it away from its present parent if it has one. Throws
  /// InvalidArgumentException for null, for a document, for a node that is this node or one of its ancestors,
  /// and, when this node is a document, for a text and for a second element (XML 1.0, production 1).
  void AppendChild(const Ref<Node>& child);

  /// Takes `child` out of the children; whoever holds a `Ref` to it may use it elsewhere. Throws
  /// InvalidArgumentException when it is not a child of this node.
  void RemoveChild(Node* child);

 protected:
  explicit ParentNode(NodeKind kind) noexcept;
  ~ParentNode() override;

 private:
  friend class DocumentBuilder;

  void LinkLast(Node* child) noexcept;
  void Unlink(Node* child) noexcept;

  Node* _firstChild;
  Node* _lastChild;
  std::uint32_t _childCount;
};

/// The name of an element as written. The elements of a parsed document share the names they have in common.
class ElementName final : public Object {
 public:
  ElementName(const std::string& namePrefix, const std::string& name)
      : prefix(namePrefix),
        localName(name),
        qualifiedName(namePrefix.empty() ? name : namePrefix + ":" + name) {}

  const std::string prefix;  ///< Empty when there is none.
  const std::string localName;
  const std::string qualifiedName;  ///< "prefix:local", or the local name alone.

 private:
  ~ElementName() override {}
};

inline Node* Node::GetFirstChild() const noexcept {
  const bool canHaveChildren = _kind == ELEMENT_NODE || _kind == DOCUMENT_NODE;
  return canHaveChildren ? static_cast<const ParentNode*>(this)->GetFirstChildNode() : nullptr;
}

/// One attribute as written: its name with prefix, and its value. Namespace declarations are attributes like
/// any other.
struct Attribute {
  std::string name;
  std::string value;
};

/// In the order in which they were read or defined.
typedef std::vector<Attribute, NodeAllocator<Attribute>> AttributeList;

/// Where the attributes of an element lie. The elements of a parsed document that follow each other with the
/// same ones share them, until one is given another.
class AttributeHolder final : public Object {
 public:
  static void* operator new(std::size_t size) { return AllocateNodeMemory(size); }
  static void operator delete(void* memory, std::size_t size) noexcept { FreeNodeMemory(memory, size); }

 private:
  friend class ElementNode;
  friend class DocumentBuilder;
  AttributeHolder() noexcept : _isShared(false) {}
  ~AttributeHolder() override {}

  AttributeList _list;
  bool _isShared;  // Then the list does not change any more.
};

/// An element: a name as written, an ordered list of attributes, and children.
class PELMAR_API ElementNode final : public ParentNode {
 public:
  /// The part of the name after the prefix.
  const std::string& GetLocalName() const noexcept { return _name->localName; }
  /// Empty when the name has no prefix.
  const std::string& GetPrefix() const noexcept { return _name->prefix; }
  /// "prefix:local", or the local name alone.
  const std::string& GetQualifiedName() const noexcept { return _name->qualifiedName; }

  /// Line and column, counted from 1, of the element's "<" in the parsed text, the column in characters. Both
  /// 0 for an element that was not parsed.
  unsigned long GetLine() const noexcept { return _line; }
  unsigned long GetColumn() const noexcept { return _column; }

  const AttributeList& GetAttributes() const noexcept {
    return _attributes ? _attributes->_list : kNoAttributes;
  }
  /// The names as written, declarations included, sorted bytewise.
  std::set<std::string> GetAttributeNames() const;

  /// Looks an attribute up by its name as written. True and the value when there is one; else false and
  /// `value` unchanged.
  bool GetAttribute(const std::string& name, std::string& value) const;
  /// Looks an attribute up by its expanded name; an unprefixed attribute is in no namespace (Namespaces in
  /// XML 1.0, section 6.2).
  bool GetAttribute(const QName& name, std::string& value) const;

  /// The URI that `prefix` is bound to here (empty prefix: the default namespace), looked for on this element
  /// and outward; null when it is not declared, or taken back by xmlns="". The prefix "xml" is always bound.
  /// The pointer is valid as long as the declaring element stays unchanged.
  const std::string* FindNamespaceUri(const std::string& prefix) const noexcept;

  /// Adds an attribute after those that stand. One with the same name and value is left as it is; one with
  /// the same name and another value, a malformed name, text that XML 1.0 cannot carry, and a declaration
  /// that Namespaces in XML 1.0 forbids are refused with InvalidArgumentException, which does not repeat the
  /// value.
  void DefineAttribute(const std::string& name, const std::string& value);

  /// The first child element with this local name, whatever its namespace; null when there is none.
  ElementNode* FindChildElement(const std::string& localName) const noexcept;
  /// The first child element with this namespace and local name; null when there is none.
  ElementNode* FindChildElement(const std::string& namespaceUri, const std::string& localName) const noexcept;

  /// Writes the element as XML text (XML 1.0), without XML declaration and without added white space.
  /// Attributes come in their order; an element that was built without content is written "<a/>", a parsed
  /// one as it was written. Parsing the text gives the same tree. No namespace declarations are added: a
  /// prefix that is declared further out is the caller's affair.
  void WriteXml(Writer* writer) const;

 private:
  friend class DocumentBuilder;
  friend PELMAR_API void CreateElementNode(const std::string& prefix, const std::string& localName,
                                           Ref<ElementNode>& result);
  friend class XmlTextWriter;

  explicit ElementNode(Ref<const ElementName> name);
  ~ElementNode() override;

  AttributeList& GetOwnAttributes();

  static const AttributeList kNoAttributes;

  // No text that is parsed has more lines, or columns, than these can count.
  std::uint32_t _line;
  std::uint32_t _column;
  bool _writtenWithEndTag;
  bool _declaresNamespaces;
  Ref<const ElementName> _name;
  Ref<AttributeHolder> _attributes;  // Null when there are none.
};

/// Character data. Adjacent runs of characters, references and CDATA sections are one text node after
/// parsing. A text that was set, and so may be a password, is wiped from memory when it is set anew or the
/// node goes; a parsed one is not.
class PELMAR_API TextNode final : public Node {
 public:
  const std::string& GetText() const noexcept { return _text; }
  /// Throws InvalidArgumentException for text that XML 1.0 cannot carry or that is not UTF-8; the message
  /// does not repeat it.
  void SetText(const std::string& text);

 private:
  friend class DocumentBuilder;
  friend PELMAR_API void CreateTextNode(Ref<TextNode>& result);
  TextNode();
  ~TextNode() override;

  std::string _text;
  bool _wasSet;
};

class PELMAR_API CommentNode final : public Node {
 public:
  const std::string& GetText() const noexcept { return _text; }

 private:
  friend class DocumentBuilder;
  explicit CommentNode(const std::string& text);
  ~CommentNode() override;

  std::string _text;
};

class PELMAR_API ProcessingInstructionNode final : public Node {
 public:
  const std::string& GetTarget() const noexcept { return _target; }
  const std::string& GetData() const noexcept { return _data; }

 private:
  friend class DocumentBuilder;
  ProcessingInstructionNode(const std::string& target, const std::string& data);
  ~ProcessingInstructionNode() override;

  std::string _target;
  std::string _data;
};

/// A parsed document: one element, and perhaps comments and processing instructions around it.
class PELMAR_API Document final : public ParentNode {
 public:
  /// Null only after the element was removed.
  ElementNode* GetDocumentElement() const noexcept;

 private:
  friend class DocumentBuilder;
  Document();
  ~Document() override;
};

/// A new element named prefix:localName (localName alone for an empty prefix) without parent, attributes and
/// children. Throws InvalidArgumentException for a malformed name.
PELMAR_API void CreateElementNode(const std::string& prefix, const std::string& localName,
                                  Ref<ElementNode>& result);

/// A new, empty text node.
PELMAR_API void CreateTextNode(Ref<TextNode>& result);

/// The node as an element or as a text; null when it is null or of another kind.
inline ElementNode* AsElement(Node* node) noexcept {
  return node != nullptr && node->GetKind() == ELEMENT_NODE ? static_cast<ElementNode*>(node) : nullptr;
}

inline const ElementNode* AsElement(const Node* node) noexcept {
  return node != nullptr && node->GetKind() == ELEMENT_NODE ? static_cast<const ElementNode*>(node) : nullptr;
}

inline TextNode* AsText(Node* node) noexcept {
  return node != nullptr && node->GetKind() == TEXT_NODE ? static_cast<TextNode*>(node) : nullptr;
}

inline const TextNode* AsText(const Node* node) noexcept {
  return node != nullptr && node->GetKind() == TEXT_NODE ? static_cast<const TextNode*>(node) : nullptr;
}

/// The object as a document. Throws TypeMismatchException when it is null or something else.
PELMAR_API Ref<Document> ViewAsDocument(const Ref<Object>& object);

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_NODE_H
