// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/xmlCommonBuilders.h"

#include <pelmar/Verify.h>

#include <boost/make_shared.hpp>

#include "quorlin/xmlReading.h"

namespace Quorlin {

using Pelmar::Ref;
using Pelmar::Xml::Document;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::TextNode;

namespace {

constexpr const char* kSource = "lib/quorlin/xmlCommonBuilders";

void BuildElement(const std::string& prefix, const std::string& localName, const AttributeMap& attributes,
                  Ref<ElementNode>& result) {
  Pelmar::Xml::CreateElementNode(prefix, localName, result);
  for (const AttributeMap::value_type& attribute : attributes) {
    ElementDefineAttribute(result.Get(), attribute);
  }
}

}  // namespace

// --- Builders ---

ElementBuilderImpl::ElementBuilderImpl(std::string prefix, std::string localName, AttributeMap attributes)
    : _prefix(std::move(prefix)), _localName(std::move(localName)), _attributes(std::move(attributes)) {}

void ElementBuilderImpl::build(Ref<ElementNode>& result) const {
  BuildElement(_prefix, _localName, _attributes, result);
}

TextElementBuilderImpl::TextElementBuilderImpl(std::string prefix, std::string localName,
                                               AttributeMap attributes, const std::string& text)
    : _prefix(std::move(prefix)),
      _localName(std::move(localName)),
      _attributes(std::move(attributes)),
      _text(text) {}

void TextElementBuilderImpl::build(Ref<ElementNode>& result) const {
  BuildElement(_prefix, _localName, _attributes, result);
  Ref<TextNode> text;
  Pelmar::Xml::CreateTextNode(text);
  text->SetText(_text);
  result->AppendChild(text);
}

PreBuiltElementImpl::PreBuiltElementImpl(Ref<ElementNode> element) : _element(std::move(element)) {}

void PreBuiltElementImpl::build(Ref<ElementNode>& result) const {
  result = _element;
}

XMLCompositeBuilder::XMLCompositeBuilder(XMLBuilderPtr rootBuilder)
    : XMLCompositeBuilder(std::move(rootBuilder), std::vector<XMLBuilderPtr>()) {}

XMLCompositeBuilder::XMLCompositeBuilder(XMLBuilderPtr rootBuilder, std::vector<XMLBuilderPtr> childBuilders)
    : _rootBuilder(std::move(rootBuilder)), _childBuilders(std::move(childBuilders)) {
  Pelmar::Verify(_rootBuilder.get() != nullptr, "rootBuilder != __null", kSource);
}

XMLCompositeBuilder& XMLCompositeBuilder::Add(const XMLBuilderPtr& childBuilder) {
  _childBuilders.push_back(childBuilder);
  return *this;
}

void XMLCompositeBuilder::build(Ref<ElementNode>& result) const {
  _rootBuilder->build(result);
  for (const XMLBuilderPtr& childBuilder : _childBuilders) {
    BuildAndAppendChildTo(result.Get(), childBuilder);
  }
}

// --- Factories ---

XMLBuilderPtr ElementBuilder(std::string prefix, std::string localName) {
  return ElementBuilder(std::move(prefix), std::move(localName), AttributeMap());
}

XMLBuilderPtr ElementBuilder(std::string prefix, std::string localName, AttributeMap attributes) {
  return boost::make_shared<ElementBuilderImpl>(std::move(prefix), std::move(localName),
                                                std::move(attributes));
}

XMLBuilderPtr TextElementBuilder(std::string prefix, std::string localName, const std::string& text) {
  return TextElementBuilder(std::move(prefix), std::move(localName), AttributeMap(), text);
}

XMLBuilderPtr TextElementBuilder(std::string prefix, std::string localName, AttributeMap attributes,
                                 const std::string& text) {
  return boost::make_shared<TextElementBuilderImpl>(std::move(prefix), std::move(localName),
                                                    std::move(attributes), text);
}

XMLBuilderPtr CompositeBuilder(const XMLBuilderPtr& rootBuilder,
                               std::initializer_list<XMLBuilderPtr> childBuilders) {
  return boost::make_shared<XMLCompositeBuilder>(rootBuilder, std::vector<XMLBuilderPtr>(childBuilders));
}

XMLBuilderPtr InsertSamlTokenBuilder(const SamlToken& token) {
  Ref<Document> document;
  ParseXML(token.ToXml(), document);
  const Ref<ElementNode> assertion(document->GetDocumentElement());
  document->RemoveChild(assertion.Get());
  return boost::make_shared<PreBuiltElementImpl>(assertion);
}

// --- Steps ---

void BuildAndAppendChildTo(ElementNode* parent, const XMLBuilderPtr& childBuilder) {
  Ref<ElementNode> child;
  childBuilder->build(child);
  parent->AppendChild(child);
}

void ElementDefineAttribute(ElementNode* element, const AttributeMap::value_type& attribute) {
  element->DefineAttribute(attribute.first, attribute.second);
}

}  // namespace Quorlin
