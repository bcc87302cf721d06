// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Follows a document's start and end tags and finds what Namespaces in XML 1.0 forbids.

#ifndef PELMAR_XML_NAMESPACECHECKER_H
#define PELMAR_XML_NAMESPACECHECKER_H

#include <pelmar/xml/Parser.h>

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace Pelmar {
namespace Xml {

/// The namespaces in scope while a document is read. The storage of what went out of scope is used again, so
/// that a start tag costs no allocation once the deepest nesting was seen.
class NamespaceChecker final {
 public:
  NamespaceChecker();
  NamespaceChecker(const NamespaceChecker&) = delete;
  NamespaceChecker& operator=(const NamespaceChecker&) = delete;

  /// Takes a start tag. Gives what is wrong with it, or null. After a fault the object is of no more use.
  const char* EnterElement(const NameRange& name, const std::vector<AttributeRange>& attributes);
  void LeaveElement() noexcept;

  /// Declarations on all open elements together.
  std::size_t GetDeclarationsInScope() const noexcept { return _bindingCount; }

 private:
  struct Binding {
    std::string prefix;
    std::string uri;
    std::size_t namespaceNumber;  // The same for equal URIs among the bindings in scope.
  };
  struct PrefixedAttribute {
    std::string_view localName;
    std::size_t namespaceNumber;
  };

  const char* TakeAttribute(const AttributeRange& attribute);
  void Declare(std::string_view prefix, std::string_view uri);
  std::size_t NumberOf(std::string_view uri) const noexcept;
  bool FindNamespaceNumber(std::string_view prefix, std::size_t& number) const noexcept;
  bool HasDuplicate(const std::vector<AttributeRange>& attributes);

  std::vector<Binding> _bindings;  // The first _bindingCount are in scope, innermost last.
  std::size_t _bindingCount = 0;
  std::vector<std::size_t> _outerCounts;  // For each open element, what _bindingCount was outside it.
  std::vector<PrefixedAttribute> _prefixedAttributes;
  std::size_t _prefixedCount = 0;
};

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_NAMESPACECHECKER_H
