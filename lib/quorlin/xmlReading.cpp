// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/xmlReading.h"

#include "quorlin/Namespaces.h"

#include <pelmar/StringUtil.h>
#include <pelmar/Verify.h>
#include <pelmar/xml/Parser.h>
#include <quorlin/Exceptions.h>

#include <algorithm>
#include <charconv>
#include <cstring>
#include <set>
#include <utility>

namespace Quorlin {

using Pelmar::Xml::AsElement;
using Pelmar::Xml::AsText;
using Pelmar::Xml::Attribute;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;
using Pelmar::Xml::QName;
using Pelmar::Xml::TextNode;

const QName kXsiType(kXsi, "type");
const QName kKeyInfoConfirmationDataType(kSaml, "KeyInfoConfirmationDataType");
const QName kDelegationRestrictionType(kSamlDelegation, "DelegationRestrictionType");
const QName kRenewRestrictionType(kSamlExt, "RenewRestrictionType");

namespace {

// Reports the fatal checks of the token component, of which these functions are the lower half.
const char* const kSource = "lib/quorlin/SamlTokenImpl";

bool IsInsignificant(const std::string& text) {
  return std::all_of(text.begin(), text.end(),
                     [](char c) { return c == '\t' || c == '\n' || c == '\r' || c == ' '; });
}

bool IsNamespaceDeclaration(const std::string& attributeName) {
  return attributeName == "xmlns" || attributeName.compare(0, 6, "xmlns:") == 0;
}

// XML text has no zero bytes; so this is the comparison of the whole, without measuring `known` first.
bool Equals(const std::string& text, const char* known) {
  return std::strcmp(text.c_str(), known) == 0;
}

bool IsInNamespace(const ElementNode* element, const char* namespaceUri) {
  const std::string* const uri = element->FindNamespaceUri(element->GetPrefix());
  return uri != nullptr && Equals(*uri, namespaceUri);
}

bool Contains(const std::vector<QName>& names, const QName& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

std::string AttributeText(const ElementNode* element, const char* name) {
  std::string text;
  element->GetAttribute(name, text);
  return text;
}

[[noreturn]] void ThrowBadAttribute(const ElementNode* element, const char* name, const char* complaint) {
  throw ParseException(element->GetLocalName() + "/@" + name + complaint);
}

// The wording, with its one apostrophe too few, is what existing log tools search for.
[[noreturn]] void ThrowMissingAttribute(const ElementNode* element, const std::string& name) {
  throw ParseException("Node '" + element->GetLocalName() + " is missing required attribute '" + name + "'");
}

bool HasAttribute(const ElementNode* element, const std::string& name) {
  const Pelmar::Xml::AttributeList& attributes = element->GetAttributes();
  return std::any_of(attributes.begin(), attributes.end(),
                     [&name](const Attribute& attribute) { return attribute.name == name; });
}

bool Contains(const std::vector<std::string>& names, const std::string& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

// `source` is a reader or a text.
template <typename Source>
void ParseInto(const Source& source, Pelmar::Ref<Pelmar::Xml::Document>& document) {
  const Pelmar::Ref<Pelmar::Xml::XMLHandler> handler = Pelmar::Xml::CreateXMLDocumentHandler();
  const Pelmar::Ref<Pelmar::Xml::XMLParser> parser = Pelmar::Xml::CreateXMLParser(handler);
  Pelmar::Ref<Pelmar::Object> result;
  parser->Parse(source, result);
  document = Pelmar::Xml::ViewAsDocument(result);
}

[[noreturn]] void ThrowNotTextual(const ElementNode* element) {
  throw ParseException("Element '" + element->GetLocalName() + "' must only have textual content");
}

// Unlike lexical_cast this does not look at the process's locale, in which "1,000" may be a number.
bool ParseSigned64(const std::string& text, long long& value) {
  const char* first = text.data();
  const char* const last = first + text.size();
  if (first != last && *first == '+') {
    ++first;
    if (first != last && *first == '-') {
      return false;
    }
  }
  const std::from_chars_result parsed = std::from_chars(first, last, value);
  return parsed.ec == std::errc() && parsed.ptr == last;
}

}  // namespace

bool SkipWsAndCommentsFilter::Accept(Node* node) const {
  if (node->GetKind() == Pelmar::Xml::COMMENT_NODE) {
    return false;
  }
  const TextNode* text = AsText(node);
  return text == nullptr || !IsInsignificant(text->GetText());
}

NodeFilterIterator::NodeFilterIterator(Node* startNode, const boost::shared_ptr<const NodeFilter>& nodeFilter)
    : node(startNode), filter(nodeFilter) {}

NodeFilterIterator& NodeFilterIterator::MoveToSibling() {
  do {
    node = node->GetNextSibling();
  } while (node != nullptr && !filter->Accept(node));
  return *this;
}

NodeFilterIterator& NodeFilterIterator::MoveToChild() {
  node = node->GetFirstChild();
  if (node != nullptr && !filter->Accept(node)) {
    MoveToSibling();
  }
  return *this;
}

NodeFilterIterator NodeFilterIterator::GetChild() const {
  NodeFilterIterator child(*this);
  child.MoveToChild();
  return child;
}

ElementNode* IteratorToElement(const NodeFilterIterator& it) {
  return AsElement(it.node);
}

QName LocalName(const char* name) {
  return QName(std::string(), name);
}

bool ElementQNameIs(const ElementNode* element, const char* localName, const char* namespaceUri) {
  return element != nullptr && Equals(element->GetLocalName(), localName) &&
         IsInNamespace(element, namespaceUri);
}

bool ElementXsiTypeIs(const ElementNode* element, const QName& type) {
  std::string text;
  if (!element->GetAttribute(kXsiType, text)) {
    return false;
  }
  const std::string* defaultNamespace = element->FindNamespaceUri(std::string());
  QName resolved;
  ResolveQName(element, text, defaultNamespace == nullptr ? std::string() : *defaultNamespace, resolved);
  return resolved == type;
}

void ResolveQName(const ElementNode* element, const std::string& text, const std::string& defaultNamespace,
                  QName& result) {
  const std::size_t colon = text.find(':');
  if (colon == std::string::npos) {
    result = QName(defaultNamespace, text);
    return;
  }
  const std::string prefix = text.substr(0, colon);
  const std::string* uri = element->FindNamespaceUri(prefix);
  if (uri == nullptr) {
    throw ParseException("Element " + element->GetLocalName() + "at " + std::to_string(element->GetLine()) +
                         "," + std::to_string(element->GetColumn()) + " uses undefined prefix: `" + prefix +
                         "'");
  }
  result = QName(*uri, text.substr(colon + 1));
}

void RequireElementQName(const ElementNode* element, const char* localName, const char* namespaceUri) {
  if (element == nullptr || !Equals(element->GetLocalName(), localName)) {
    throw ParseException(std::string("Expected element '") + localName + "' not found.");
  }
  if (!IsInNamespace(element, namespaceUri)) {
    throw ParseException("Element '" + element->GetLocalName() + "' has unexpected namespace");
  }
}

void RequireEmptyElement(NodeFilterIterator it) {
  const ElementNode* element = IteratorToElement(it);
  if (it.MoveToChild().node != nullptr) {
    throw ParseException("Element '" + element->GetLocalName() + "' must be empty");
  }
}

void RequireTextualContent(NodeFilterIterator it, std::string& text) {
  text = RequireTextualContent(it);
}

const std::string& RequireTextualContent(NodeFilterIterator it) {
  const ElementNode* element = IteratorToElement(it);
  const TextNode* content = AsText(it.MoveToChild().node);
  if (content == nullptr) {
    ThrowNotTextual(element);
  }
  // A second significant child means that a comment or an instruction splits the text: its readers would
  // disagree on the value.
  if (it.MoveToSibling().node != nullptr) {
    ThrowNotTextual(element);
  }
  return content->GetText();
}

void RequireNoAttributes(const ElementNode* element) {
  RequireElementAttributesNames(element, std::vector<std::string>(), std::vector<std::string>());
}

void RequireElementAttributesNames(const ElementNode* element, const std::vector<std::string>& required,
                                   const std::vector<std::string>& allowed) {
  for (const std::string& name : required) {
    if (!HasAttribute(element, name)) {
      ThrowMissingAttribute(element, name);
    }
  }
  for (const Attribute& attribute : element->GetAttributes()) {
    const std::string& name = attribute.name;
    if (!Contains(required, name) && !Contains(allowed, name) && !IsNamespaceDeclaration(name)) {
      throw ParseException("Unexpected attributes on element '" + element->GetLocalName() + "'");
    }
  }
}

void RequireElementAttributesQNames(const ElementNode* element, const std::vector<QName>& required,
                                    const std::vector<QName>& allowed) {
  std::size_t found = 0;
  for (const std::string& rawName : element->GetAttributeNames()) {
    if (IsNamespaceDeclaration(rawName)) {
      continue;
    }
    QName name;
    ResolveQName(element, rawName, std::string(), name);
    if (Contains(required, name)) {
      ++found;
    } else if (!Contains(allowed, name)) {
      throw ParseException("Unexpected attribute '" + name.ToString() + "' on element '" +
                           element->GetLocalName() + "'");
    }
  }
  if (found >= required.size()) {
    return;
  }
  std::string ignored;
  const auto missing = std::find_if(required.begin(), required.end(),
                                    [&](const QName& name) { return !element->GetAttribute(name, ignored); });
  Pelmar::Verify(missing != required.end(), "missing != required.end()", kSource);
  ThrowMissingAttribute(element, missing->ToString());
}

void GetDateAttribute(const ElementNode* element, const char* name, Pelmar::System::DateTime& value) {
  try {
    value = Pelmar::System::DateTime(AttributeText(element, name));
  } catch (const Pelmar::System::DateFormatException&) {
    ThrowBadAttribute(element, name, " is not a date");
  }
}

void GetBoolAttribute(const ElementNode* element, const char* name, bool& value) {
  const std::string text = Pelmar::StringUtil::ToLower(AttributeText(element, name));
  const bool isTrue = text == "1" || text == "true";
  if (!isTrue && text != "0" && text != "false") {
    ThrowBadAttribute(element, name, " is not a Boolean");
  }
  value = isTrue;
}

void GetULongOptionalAttribute(const ElementNode* element, const char* name,
                               boost::optional<unsigned long long>& value) {
  std::string text;
  if (!element->GetAttribute(name, text)) {
    return;
  }
  long long number = 0;
  if (!ParseSigned64(text, number) || number < 0) {
    ThrowBadAttribute(element, name, " is not a non-negative integer.");
  }
  value = static_cast<unsigned long long>(number);
}

void ParseXML(Pelmar::Reader* reader, Pelmar::Ref<Pelmar::Xml::Document>& document) {
  ParseInto(reader, document);
}

// Like the reader's form with a string reader, but the text is not copied, which would be two more in memory.
void ParseXML(const std::string& text, Pelmar::Ref<Pelmar::Xml::Document>& document) {
  ParseInto(text, document);
}

const TextNode* GetTextNode(const Node* node) {
  return node == nullptr ? nullptr : AsText(node->GetFirstChild());
}

std::string GetText(const TextNode* node) {
  return node == nullptr ? std::string() : node->GetText();
}

}  // namespace Quorlin
