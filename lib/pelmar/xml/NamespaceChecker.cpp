// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/NamespaceChecker.h"

#include "pelmar/xml/NameRules.h"

namespace Pelmar {
namespace Xml {

namespace {

// No index of a binding, so it cannot meet the number of a declared namespace.
constexpr std::size_t kNumberOfXmlNamespace = static_cast<std::size_t>(-1);

}  // namespace

NamespaceChecker::NamespaceChecker() {
  constexpr std::size_t kUsualDepth = 16;
  constexpr std::size_t kUsualDeclarations = 8;
  _outerCounts.reserve(kUsualDepth);
  _bindings.reserve(kUsualDeclarations);
}

const char* NamespaceChecker::EnterElement(const NameRange& name,
                                           const std::vector<AttributeRange>& attributes) {
  if (!IsQualifiedName(name)) {
    return "malformed element name";
  }
  if (PartsOf(name).prefix == "xmlns") {
    return "an element has the prefix xmlns";
  }
  _outerCounts.push_back(_bindingCount);
  _prefixedCount = 0;
  for (const AttributeRange& attribute : attributes) {
    const char* const fault = TakeAttribute(attribute);
    if (fault != nullptr) {
      return fault;
    }
  }
  // One prefixed attribute has no other to be equal to, and two of the same written name were refused by the
  // tokeniser.
  return _prefixedCount > 1 && HasDuplicate(attributes) ? "duplicate attribute" : nullptr;
}

void NamespaceChecker::LeaveElement() noexcept {
  _bindingCount = _outerCounts.back();
  _outerCounts.pop_back();
}

const char* NamespaceChecker::TakeAttribute(const AttributeRange& attribute) {
  const NameRange& name = attribute.name;
  if (!IsQualifiedName(name)) {
    return "malformed attribute name";
  }
  if (!IsNamespaceDeclaration(name)) {
    _prefixedCount += name.localStart != 0 ? 1 : 0;
    return nullptr;
  }
  // "xmlns" declares the default namespace, "xmlns:" and a prefix that prefix.
  const std::string_view prefix = name.localStart == 0 ? std::string_view() : PartsOf(name).localName;
  const std::string_view value = ViewOf(attribute.value);
  const char* const fault = FindDeclarationFault(prefix, value);
  if (fault != nullptr) {
    return fault;
  }
  Declare(prefix, value);
  return nullptr;
}

void NamespaceChecker::Declare(std::string_view prefix, std::string_view uri) {
  const std::size_t number = NumberOf(uri);
  if (_bindingCount == _bindings.size()) {
    _bindings.emplace_back();
  }
  Binding& binding = _bindings[_bindingCount];
  binding.prefix.assign(prefix);
  binding.uri.assign(uri);
  binding.namespaceNumber = number;
  ++_bindingCount;
}

// Equal URIs get one number when they are declared, so that attributes are compared by number: comparing the
// URIs for each pair of attributes would let a few long ones cost quadratic time.
std::size_t NamespaceChecker::NumberOf(std::string_view uri) const noexcept {
  for (std::size_t i = 0; i < _bindingCount; ++i) {
    if (_bindings[i].uri == uri) {
      return _bindings[i].namespaceNumber;
    }
  }
  return _bindingCount;
}

bool NamespaceChecker::FindNamespaceNumber(std::string_view prefix, std::size_t& number) const noexcept {
  if (prefix == "xml") {
    number = kNumberOfXmlNamespace;
    return true;
  }
  for (std::size_t i = _bindingCount; i > 0; --i) {
    if (_bindings[i - 1].prefix == prefix) {
      number = _bindings[i - 1].namespaceNumber;
      return true;
    }
  }
  return false;
}

// Namespaces in XML 1.0, section 6.3: no two attributes with the same expanded name. Attributes whose prefix
// is not declared have none.
bool NamespaceChecker::HasDuplicate(const std::vector<AttributeRange>& attributes) {
  _prefixedAttributes.clear();
  for (const AttributeRange& attribute : attributes) {
    const NameParts parts = PartsOf(attribute.name);
    std::size_t number = 0;
    if (parts.prefix.empty() || parts.prefix == "xmlns" || !FindNamespaceNumber(parts.prefix, number)) {
      continue;
    }
    for (const PrefixedAttribute& earlier : _prefixedAttributes) {
      if (earlier.namespaceNumber == number && earlier.localName == parts.localName) {
        return true;
      }
    }
    _prefixedAttributes.push_back({parts.localName, number});
  }
  return false;
}

}  // namespace Xml
}  // namespace Pelmar
