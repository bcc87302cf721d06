// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Descriptions of XML elements: small immutable objects that a request is put together from before any tree
// exists.
//
// Names are given as they stand on the wire, prefix included; a namespace is declared by an ordinary
// attribute of the element that introduces it. Text and attribute values come from callers: building throws
// Pelmar::InvalidArgumentException for what XML 1.0 cannot carry, and its message does not repeat the text.

#ifndef QUORLIN_XMLCOMMONBUILDERS_H
#define QUORLIN_XMLCOMMONBUILDERS_H

#include <pelmar/Ref.h>
#include <pelmar/SecretText.h>
#include <pelmar/xml/Node.h>
#include <quorlin/SamlToken.h>

#include <boost/shared_ptr.hpp>

#include <initializer_list>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace Quorlin {

/// Describes one element with all below it. Immutable; may be built on any thread, and more than once.
class XMLBaseBuilder {
 public:
  /// Stores a new element into `result` (a pre-built one: the very element it was made of).
  virtual void build(Pelmar::Ref<Pelmar::Xml::ElementNode>& result) const = 0;

 protected:
  /// Not virtual: builders are held by shared pointers that were made with the concrete class.
  ~XMLBaseBuilder() = default;
};

/// How builders are held and handed around.
using XMLBuilderPtr = boost::shared_ptr<const XMLBaseBuilder>;

/// Attributes by their full names, sorted bytewise: the order in which they come out.
using AttributeMap = std::map<std::string, std::string>;

/// An element without content.
class ElementBuilderImpl final : public XMLBaseBuilder {
 public:
  ElementBuilderImpl(std::string prefix, std::string localName, AttributeMap attributes);
  void build(Pelmar::Ref<Pelmar::Xml::ElementNode>& result) const override;

 private:
  std::string _prefix;
  std::string _localName;
  AttributeMap _attributes;
};

/// An element with one text, which may be empty. The text may be a password: it is copied from the caller's
/// string into this object alone, and wiped with it.
class TextElementBuilderImpl final : public XMLBaseBuilder {
 public:
  TextElementBuilderImpl(std::string prefix, std::string localName, AttributeMap attributes,
                         const std::string& text);
  void build(Pelmar::Ref<Pelmar::Xml::ElementNode>& result) const override;

 private:
  std::string _prefix;
  std::string _localName;
  AttributeMap _attributes;
  Pelmar::SecretText _text;
};

/// An element that exists already. It is handed out itself, not as a copy, so such a builder is built once
/// and by one thread.
class PreBuiltElementImpl final : public XMLBaseBuilder {
 public:
  explicit PreBuiltElementImpl(Pelmar::Ref<Pelmar::Xml::ElementNode> element);
  void build(Pelmar::Ref<Pelmar::Xml::ElementNode>& result) const override;

 private:
  Pelmar::Ref<Pelmar::Xml::ElementNode> _element;
};

/// The element of a root builder, with the elements of further builders appended in the order in which they
/// were added. The root may be a composite itself: its children then come first.
class XMLCompositeBuilder final : public XMLBaseBuilder {
 public:
  /// A null root is a programming error and aborts the process.
  explicit XMLCompositeBuilder(XMLBuilderPtr rootBuilder);
  XMLCompositeBuilder(XMLBuilderPtr rootBuilder, std::vector<XMLBuilderPtr> childBuilders);

  XMLCompositeBuilder& Add(const XMLBuilderPtr& childBuilder);
  void build(Pelmar::Ref<Pelmar::Xml::ElementNode>& result) const override;

 private:
  XMLBuilderPtr _rootBuilder;
  std::vector<XMLBuilderPtr> _childBuilders;
};

XMLBuilderPtr ElementBuilder(std::string prefix, std::string localName);
XMLBuilderPtr ElementBuilder(std::string prefix, std::string localName, AttributeMap attributes);
XMLBuilderPtr TextElementBuilder(std::string prefix, std::string localName, const std::string& text);
XMLBuilderPtr TextElementBuilder(std::string prefix, std::string localName, AttributeMap attributes,
                                 const std::string& text);

/// A composite of `rootBuilder` and `childBuilders`.
XMLBuilderPtr CompositeBuilder(const XMLBuilderPtr& rootBuilder,
                               std::initializer_list<XMLBuilderPtr> childBuilders);

/// The token's assertion, read again from its text, so that its own signature holds in the request as well.
/// Throws Pelmar::Xml::XMLParseException.
XMLBuilderPtr InsertSamlTokenBuilder(const SamlToken& token);

/// Builds the child and makes it the last one of `parent`.
void BuildAndAppendChildTo(Pelmar::Xml::ElementNode* parent, const XMLBuilderPtr& childBuilder);

/// Defines one attribute, given as name and value, after those that the element has.
void ElementDefineAttribute(Pelmar::Xml::ElementNode* element, const AttributeMap::value_type& attribute);

}  // namespace Quorlin

#endif  // QUORLIN_XMLCOMMONBUILDERS_H
