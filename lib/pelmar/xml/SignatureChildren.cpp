// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/SignatureChildren.h"

#include "pelmar/xml/SignatureProfile.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>

#include <algorithm>

namespace Pelmar {
namespace Xml {
namespace Security {

namespace {

bool IsWhiteSpace(const std::string& text) {
  return text.find_first_not_of(" \t\r\n") == std::string::npos;
}

bool IsNamespaceDeclaration(const std::string& attributeName) {
  return attributeName == "xmlns" || attributeName.compare(0, 6, "xmlns:") == 0;
}

std::string Describe(const ElementNode& element) {
  return QuoteForMessage(element.GetQualifiedName());
}

}  // namespace

void ThrowSignatureSyntax(const std::string& message, const ElementNode& element) {
  if (element.GetLine() == 0) {
    throw SignatureSyntaxException(message);
  }
  throw SignatureSyntaxException(message + " at line " + std::to_string(element.GetLine()) + ", column " +
                                 std::to_string(element.GetColumn()));
}

bool IsElementOf(const ElementNode& element, const char* namespaceUri, const char* localName) {
  if (element.GetLocalName() != localName) {
    return false;
  }
  const std::string* const uri = element.FindNamespaceUri(element.GetPrefix());
  return uri != nullptr && *uri == namespaceUri;
}

SignatureChildren::SignatureChildren(const ElementNode& parent) : _parent(parent), _next(nullptr) {
  MoveToElement(parent.GetFirstChildNode());
}

bool SignatureChildren::IsNext(const char* localName) const {
  return IsNext(kSignatureNamespace, localName);
}

bool SignatureChildren::IsNext(const char* namespaceUri, const char* localName) const {
  return _next != nullptr && IsElementOf(*_next, namespaceUri, localName);
}

const ElementNode& SignatureChildren::Require(const char* localName) {
  const ElementNode* const element = TakeIf(localName);
  if (element == nullptr) {
    RequireEnd();
    ThrowSignatureSyntax(std::string("Element '") + localName + "' is missing in " + Describe(_parent),
                         _parent);
  }
  return *element;
}

const ElementNode* SignatureChildren::TakeIf(const char* localName) {
  return TakeIf(kSignatureNamespace, localName);
}

const ElementNode* SignatureChildren::TakeIf(const char* namespaceUri, const char* localName) {
  if (!IsNext(namespaceUri, localName)) {
    return nullptr;
  }
  const ElementNode* const element = _next;
  MoveToElement(element->GetNextSibling());
  return element;
}

void SignatureChildren::RequireEnd() const {
  if (_next != nullptr) {
    ThrowSignatureSyntax("Unexpected element " + Describe(*_next) + " in " + Describe(_parent), *_next);
  }
}

void SignatureChildren::MoveToElement(const Node* node) {
  for (; node != nullptr; node = node->GetNextSibling()) {
    if (node->GetKind() == ELEMENT_NODE) {
      break;
    }
    if (node->GetKind() == PROCESSING_INSTRUCTION_NODE) {
      ThrowSignatureSyntax("Unexpected processing instruction in " + Describe(_parent), _parent);
    }
    if (node->GetKind() == TEXT_NODE && !IsWhiteSpace(AsText(node)->GetText())) {
      ThrowSignatureSyntax("Unexpected text in " + Describe(_parent), _parent);
    }
  }
  _next = AsElement(node);
}

void RequireAttributes(const ElementNode& element, std::initializer_list<const char*> allowed) {
  for (const Attribute& attribute : element.GetAttributes()) {
    const bool known = std::any_of(allowed.begin(), allowed.end(),
                                   [&attribute](const char* name) { return attribute.name == name; });
    if (!known && !IsNamespaceDeclaration(attribute.name)) {
      ThrowSignatureSyntax(
          "Unexpected attribute " + QuoteForMessage(attribute.name) + " in " + Describe(element), element);
    }
  }
}

std::string RequireAttribute(const ElementNode& element, const char* name) {
  std::string value;
  if (!element.GetAttribute(name, value)) {
    ThrowSignatureSyntax(std::string("Attribute '") + name + "' is missing in " + Describe(element), element);
  }
  return value;
}

std::vector<unsigned char> RequireBase64Content(const ElementNode& element) {
  const TextNode* const text = AsText(element.GetFirstChildNode());
  if (text == nullptr || element.GetChildCount() != 1) {
    ThrowSignatureSyntax("Element " + Describe(element) + " must hold one text", element);
  }
  try {
    return StringUtil::Base64Decode(text->GetText());
  } catch (const Base64FormatException&) {
    ThrowSignatureSyntax("Element " + Describe(element) + " must hold base64 text", element);
  }
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
