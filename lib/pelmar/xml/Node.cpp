// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/xml/Node.h>

#include "pelmar/core/PerThread.h"
#include "pelmar/xml/NameRules.h"
#include "pelmar/xml/RememberedNames.h"
#include "pelmar/xml/XmlTextWriter.h"

#include <pelmar/Exception.h>
#include <pelmar/SecretText.h>
#include <pelmar/StringUtil.h>

#include <algorithm>
#include <utility>

namespace Pelmar {
namespace Xml {

// ---- Node and ParentNode

Node::Node(NodeKind kind) noexcept
    : _kind(kind), _parent(nullptr), _previousSibling(nullptr), _nextSibling(nullptr) {}

Node::~Node() = default;

ParentNode::ParentNode(NodeKind kind) noexcept
    : Node(kind), _firstChild(nullptr), _lastChild(nullptr), _childCount(0) {}

// Leaves are released here; children with children by the outermost destructor, one by one, and not each by
// its parent's: a deep tree would need a deep stack. Those that wait are chained by their sibling pointers,
// which needs no memory.
ParentNode::~ParentNode() {
  thread_local Node* waiting = nullptr;
  thread_local bool isReleasing = false;

  bool mustRelease = false;
  for (Node* child = _firstChild; child != nullptr;) {
    Node* const next = child->_nextSibling;
    child->_parent = nullptr;
    child->_previousSibling = nullptr;
    child->_nextSibling = nullptr;
    if (child->GetFirstChild() == nullptr) {
      child->Release();
    } else {
      child->_nextSibling = waiting;
      waiting = child;
      mustRelease = true;
    }
    child = next;
  }
  if (!mustRelease || isReleasing) {
    return;
  }
  isReleasing = true;
  while (waiting != nullptr) {
    Node* const child = waiting;
    waiting = child->_nextSibling;
    child->_nextSibling = nullptr;
    child->Release();
  }
  isReleasing = false;
}

namespace {

bool IsSelfOrAncestor(const Node* candidate, const Node* node) noexcept {
  if (candidate == node) {
    return true;
  }
  // Only a node with children can be an ancestor, which spares the walk for nearly all.
  const Node* ancestor = candidate->GetFirstChild() != nullptr ? node->GetParent() : nullptr;
  while (ancestor != nullptr && ancestor != candidate) {
    ancestor = ancestor->GetParent();
  }
  return ancestor != nullptr;
}

void RequireChildOf(const ParentNode* parent, const Node* child) {
  if (child == nullptr) {
    throw InvalidArgumentException("the child is null");
  }
  if (child->GetKind() == DOCUMENT_NODE) {
    throw InvalidArgumentException("a document cannot be a child");
  }
  if (IsSelfOrAncestor(child, parent)) {
    throw InvalidArgumentException("a node cannot be its own descendant");
  }
}

// XML 1.0, production 1: beside its one element a document has comments and processing instructions only.
void RequireChildOfDocument(const Document* document, const Node* child) {
  if (child->GetKind() == TEXT_NODE) {
    throw InvalidArgumentException("a document cannot have text outside its element");
  }
  const ElementNode* const present = document->GetDocumentElement();
  if (child->GetKind() == ELEMENT_NODE && present != nullptr && present != child) {
    throw InvalidArgumentException("a document cannot have a second element");
  }
}

}  // namespace

void ParentNode::AppendChild(const Ref<Node>& child) {
  RequireChildOf(this, child.Get());
  if (GetKind() == DOCUMENT_NODE) {
    RequireChildOfDocument(static_cast<const Document*>(this), child.Get());
  }
  ParentNode* const parent = child->GetParent();
  if (parent != nullptr) {
    parent->RemoveChild(child.Get());  // The caller's reference keeps it alive.
  }
  LinkLast(child.Get());
}

// `child` has no parent, and becomes this node's.
void ParentNode::LinkLast(Node* child) noexcept {
  child->AddRef();
  child->_parent = this;
  child->_previousSibling = _lastChild;
  (_lastChild != nullptr ? _lastChild->_nextSibling : _firstChild) = child;
  _lastChild = child;
  ++_childCount;
}

void ParentNode::RemoveChild(Node* child) {
  if (child == nullptr || child->_parent != this) {
    throw InvalidArgumentException("the node is not a child of this node");
  }
  Unlink(child);
  child->Release();
}

void ParentNode::Unlink(Node* child) noexcept {
  Node* const previous = child->_previousSibling;
  Node* const next = child->_nextSibling;
  (previous != nullptr ? previous->_nextSibling : _firstChild) = next;
  (next != nullptr ? next->_previousSibling : _lastChild) = previous;
  child->_parent = nullptr;
  child->_previousSibling = nullptr;
  child->_nextSibling = nullptr;
  --_childCount;
}

// ---- ElementNode

ElementNode::ElementNode(Ref<const ElementName> name)
    : ParentNode(ELEMENT_NODE),
      _line(0),
      _column(0),
      _writtenWithEndTag(false),
      _declaresNamespaces(false),
      _name(std::move(name)) {}

ElementNode::~ElementNode() = default;

const AttributeList ElementNode::kNoAttributes;

std::set<std::string> ElementNode::GetAttributeNames() const {
  std::set<std::string> names;
  for (const Attribute& attribute : GetAttributes()) {
    names.insert(attribute.name);
  }
  return names;
}

namespace {

const std::string* FindValue(const AttributeList& attributes, const std::string& name) noexcept {
  for (const Attribute& attribute : attributes) {
    if (attribute.name == name) {
      return &attribute.value;
    }
  }
  return nullptr;
}

}  // namespace

bool ElementNode::GetAttribute(const std::string& name, std::string& value) const {
  const std::string* const found = FindValue(GetAttributes(), name);
  if (found != nullptr) {
    value = *found;
  }
  return found != nullptr;
}

bool ElementNode::GetAttribute(const QName& name, std::string& value) const {
  if (name.GetNamespace().empty()) {
    return name.GetLocalName().find(':') == std::string::npos && name.GetLocalName() != "xmlns" &&
           GetAttribute(name.GetLocalName(), value);
  }
  for (const Attribute& attribute : GetAttributes()) {
    const NameParts parts = SplitName(attribute.name);
    if (parts.prefix.empty() || parts.localName != name.GetLocalName()) {
      continue;
    }
    const std::string* const uri = FindNamespaceUri(std::string(parts.prefix));
    if (uri != nullptr && *uri == name.GetNamespace()) {
      value = attribute.value;
      return true;
    }
  }
  return false;
}

namespace {

// The value of the declaration of `prefix` that stands on `element` itself; null when there is none.
const std::string* FindDeclaration(const ElementNode* element, const std::string& prefix) noexcept {
  for (const Attribute& attribute : element->GetAttributes()) {
    std::string_view declared;
    if (IsNamespaceDeclaration(attribute.name, declared) && declared == prefix) {
      return &attribute.value;
    }
  }
  return nullptr;
}

}  // namespace

const std::string* ElementNode::FindNamespaceUri(const std::string& prefix) const noexcept {
  if (prefix == "xml") {
    static const std::string xmlNamespace(kXmlNamespace);
    return &xmlNamespace;
  }
  for (const Node* node = this; node != nullptr; node = node->GetParent()) {
    const ElementNode* const element = AsElement(node);
    if (element == nullptr || !element->_declaresNamespaces) {
      continue;
    }
    const std::string* const uri = FindDeclaration(element, prefix);
    if (uri != nullptr) {
      // An empty value takes the default namespace back (Namespaces in XML 1.0, section 6.2).
      return uri->empty() ? nullptr : uri;
    }
  }
  return nullptr;
}

namespace {

bool IsAttributeName(std::string_view name) {
  const std::size_t colon = name.find(':');
  if (colon == std::string_view::npos) {
    return IsNcName(name);
  }
  return IsNcName(name.substr(0, colon)) && IsNcName(name.substr(colon + 1));
}

void RequireAttribute(const std::string& name, const std::string& value) {
  if (!IsAttributeName(name)) {
    throw InvalidArgumentException("malformed attribute name");
  }
  if (!StringUtil::IsXmlText(value)) {
    throw InvalidArgumentException("the value of attribute '" + name + "' is not XML text");
  }
  std::string_view prefix;
  const char* const fault =
      IsNamespaceDeclaration(name, prefix) ? FindDeclarationFault(prefix, value) : nullptr;
  if (fault != nullptr) {
    throw InvalidArgumentException(fault);
  }
}

}  // namespace

void ElementNode::DefineAttribute(const std::string& name, const std::string& value) {
  RequireAttribute(name, value);
  const std::string* const present = FindValue(GetAttributes(), name);
  if (present == nullptr) {
    std::string_view prefix;
    GetOwnAttributes().push_back(Attribute{name, value});
    _declaresNamespaces = _declaresNamespaces || IsNamespaceDeclaration(name, prefix);
    return;
  }
  if (*present != value) {
    throw InvalidArgumentException("attribute '" + name + "' is already defined with another value");
  }
}

// A shared list stays with the others.
AttributeList& ElementNode::GetOwnAttributes() {
  if (!_attributes || _attributes->_isShared) {
    const Ref<AttributeHolder> own(new AttributeHolder());
    // So that the usual few do not move from one place to the next as they come.
    constexpr std::size_t kUsualAttributes = 4;
    own->_list.reserve(std::max(kUsualAttributes, GetAttributes().size() + 1));
    own->_list = GetAttributes();
    _attributes = own;
  }
  return _attributes->_list;
}

ElementNode* ElementNode::FindChildElement(const std::string& localName) const noexcept {
  for (Node* child = GetFirstChildNode(); child != nullptr; child = child->GetNextSibling()) {
    ElementNode* const element = AsElement(child);
    if (element != nullptr && element->GetLocalName() == localName) {
      return element;
    }
  }
  return nullptr;
}

ElementNode* ElementNode::FindChildElement(const std::string& namespaceUri,
                                           const std::string& localName) const noexcept {
  for (Node* child = GetFirstChildNode(); child != nullptr; child = child->GetNextSibling()) {
    ElementNode* const element = AsElement(child);
    if (element == nullptr || element->GetLocalName() != localName) {
      continue;
    }
    const std::string* const uri = element->FindNamespaceUri(element->GetPrefix());
    if (uri != nullptr ? *uri == namespaceUri : namespaceUri.empty() && element->GetPrefix().empty()) {
      return element;
    }
  }
  return nullptr;
}

void ElementNode::WriteXml(Writer* writer) const {
  if (writer == nullptr) {
    throw InvalidArgumentException("the writer is null");
  }
  XmlTextWriter(writer).WriteElement(this);
}

// ---- The other nodes

TextNode::TextNode() : Node(TEXT_NODE), _wasSet(false) {}

TextNode::~TextNode() {
  if (_wasSet) {
    Wipe(_text);
  }
}

void TextNode::SetText(const std::string& text) {
  if (!StringUtil::IsXmlText(text)) {
    throw InvalidArgumentException("the text of a node is not XML text");
  }
  if (_wasSet && &text != &_text) {
    Wipe(_text);
  }
  _wasSet = true;
  _text = text;
}

CommentNode::CommentNode(const std::string& text) : Node(COMMENT_NODE), _text(text) {}

CommentNode::~CommentNode() = default;

ProcessingInstructionNode::ProcessingInstructionNode(const std::string& target, const std::string& data)
    : Node(PROCESSING_INSTRUCTION_NODE), _target(target), _data(data) {}

ProcessingInstructionNode::~ProcessingInstructionNode() = default;

Document::Document() : ParentNode(DOCUMENT_NODE) {}

Document::~Document() = default;

ElementNode* Document::GetDocumentElement() const noexcept {
  for (Node* child = GetFirstChildNode(); child != nullptr; child = child->GetNextSibling()) {
    if (child->GetKind() == ELEMENT_NODE) {
      return static_cast<ElementNode*>(child);
    }
  }
  return nullptr;
}

// ---- Creation and views

namespace {

// Apart from those of the parser, which anybody can feed with names that nobody has checked.
struct CreatedNames {
  RememberedNames names;
};

Ref<const ElementName> MakeName(const std::string& prefix, const std::string& localName) {
  if (!IsNcName(localName) || !(prefix.empty() || IsNcName(prefix)) || prefix == "xmlns") {
    throw InvalidArgumentException("malformed element name");
  }
  return MakeRef<const ElementName>(prefix, localName);
}

}  // namespace

// A name that was checked once, and is remembered, is not checked again: the elements of a request have the
// same names each time.
void CreateElementNode(const std::string& prefix, const std::string& localName, Ref<ElementNode>& result) {
  CreatedNames* const created = PerThread<CreatedNames>::Get();
  Ref<const ElementName> name = created != nullptr ? created->names.Find({prefix, localName}) : nullptr;
  if (!name) {
    name = MakeName(prefix, localName);
    if (created != nullptr) {
      created->names.Remember(name);
    }
  }
  result = Ref<ElementNode>(new ElementNode(std::move(name)));
}

void CreateTextNode(Ref<TextNode>& result) {
  result = Ref<TextNode>(new TextNode());
}

Ref<Document> ViewAsDocument(const Ref<Object>& object) {
  Document* const document = dynamic_cast<Document*>(object.Get());
  if (document == nullptr) {
    throw TypeMismatchException("The object is not an XML document");
  }
  return Ref<Document>(document);
}

}  // namespace Xml
}  // namespace Pelmar
