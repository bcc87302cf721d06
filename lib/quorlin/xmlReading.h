// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Strict reading of XML trees: the one way in which every reader of foreign XML in this library walks a
// document.
//
// These functions decide what counts as insignificant (white space and comments), how a prefix in a value is
// resolved, and the exact wording of every structural error. All errors are ParseException. Nothing is
// logged.

#ifndef QUORLIN_XMLREADING_H
#define QUORLIN_XMLREADING_H

#include <pelmar/Reader.h>
#include <pelmar/Ref.h>
#include <pelmar/system/DateTime.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/QName.h>

#include <boost/optional.hpp>
#include <boost/shared_ptr.hpp>

#include <string>
#include <vector>

namespace Quorlin {

/// Tells which nodes a reader cares about.
class NodeFilter {
 public:
  /// True when the node is significant.
  virtual bool Accept(Pelmar::Xml::Node* node) const = 0;

 protected:
  /// Not virtual: filters are held by shared pointers that were made with the concrete class.
  ~NodeFilter() {}
};

/// Rejects comments, and texts made of tab, line feed, carriage return and blank only. Accepts everything
/// else, processing instructions included: what is not understood must not be overlooked.
class SkipWsAndCommentsFilter final : public NodeFilter {
 public:
  bool Accept(Pelmar::Xml::Node* node) const override;
};

/// A cursor over sibling nodes that stops at significant ones only. Null means that it is at its end.
class NodeFilterIterator {
 public:
  /// Starts at `startNode` as it is; the filter is not asked about it.
  NodeFilterIterator(Pelmar::Xml::Node* startNode, const boost::shared_ptr<const NodeFilter>& nodeFilter);

  NodeFilterIterator& MoveToSibling();
  /// Must not be called at the end.
  NodeFilterIterator& MoveToChild();
  NodeFilterIterator GetChild() const;

  Pelmar::Xml::Node* node;                     ///< Not owned.
  boost::shared_ptr<const NodeFilter> filter;  ///< Shared by all copies.
};

/// The current node if it is an element, else null.
Pelmar::Xml::ElementNode* IteratorToElement(const NodeFilterIterator& it);

/// A name in no namespace: that of an unqualified attribute.
Pelmar::Xml::QName LocalName(const char* name);

/// The name of the xsi:type attribute (XML Schema Part 1, 2.6.1), and the types that assertions use.
extern const Pelmar::Xml::QName kXsiType;
extern const Pelmar::Xml::QName kKeyInfoConfirmationDataType;
extern const Pelmar::Xml::QName kDelegationRestrictionType;
extern const Pelmar::Xml::QName kRenewRestrictionType;

/// Whether the element is not null and has this expanded name.
bool ElementQNameIs(const Pelmar::Xml::ElementNode* element, const char* localName, const char* namespaceUri);

/// Whether the element carries an xsi:type that resolves to `type`. Throws what ResolveQName throws.
bool ElementXsiTypeIs(const Pelmar::Xml::ElementNode* element, const Pelmar::Xml::QName& type);

/// Expands the prefixed name `text` as it stands on `element`; an unprefixed one is in `defaultNamespace`.
void ResolveQName(const Pelmar::Xml::ElementNode* element, const std::string& text,
                  const std::string& defaultNamespace, Pelmar::Xml::QName& result);

void RequireElementQName(const Pelmar::Xml::ElementNode* element, const char* localName,
                         const char* namespaceUri);
void RequireEmptyElement(NodeFilterIterator it);
/// The element must have one significant child and that must be a text, which is returned untrimmed.
void RequireTextualContent(NodeFilterIterator it, std::string& text);
/// The same without a copy: the text where it lies in the tree.
const std::string& RequireTextualContent(NodeFilterIterator it);
void RequireNoAttributes(const Pelmar::Xml::ElementNode* element);
/// Compares attribute names as they are written, prefix included. Namespace declarations are always allowed.
void RequireElementAttributesNames(const Pelmar::Xml::ElementNode* element,
                                   const std::vector<std::string>& required,
                                   const std::vector<std::string>& allowed);
/// Compares attribute names by what their prefixes stand for. Namespace declarations are always allowed.
void RequireElementAttributesQNames(const Pelmar::Xml::ElementNode* element,
                                    const std::vector<Pelmar::Xml::QName>& required,
                                    const std::vector<Pelmar::Xml::QName>& allowed);

/// Typed attribute readers. A missing attribute reads as the empty text. On failure `value` is unchanged.
void GetDateAttribute(const Pelmar::Xml::ElementNode* element, const char* name,
                      Pelmar::System::DateTime& value);
void GetBoolAttribute(const Pelmar::Xml::ElementNode* element, const char* name, bool& value);
/// A missing attribute leaves `value` as it is. Accepts 0 to the largest signed 64-bit number.
void GetULongOptionalAttribute(const Pelmar::Xml::ElementNode* element, const char* name,
                               boost::optional<unsigned long long>& value);

/// Parses a whole document. The parser's exceptions pass unchanged.
void ParseXML(Pelmar::Reader* reader, Pelmar::Ref<Pelmar::Xml::Document>& document);
void ParseXML(const std::string& text, Pelmar::Ref<Pelmar::Xml::Document>& document);

/// The node's first child if that is a text, else null; null for null.
const Pelmar::Xml::TextNode* GetTextNode(const Pelmar::Xml::Node* node);
/// The text, empty for null.
std::string GetText(const Pelmar::Xml::TextNode* node);

}  // namespace Quorlin

#endif  // QUORLIN_XMLREADING_H
