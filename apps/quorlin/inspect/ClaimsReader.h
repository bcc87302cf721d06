// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Reading what may be anything, within bounds.

#ifndef QUORLIN_CLI_INSPECT_CLAIMSREADER_H
#define QUORLIN_CLI_INSPECT_CLAIMSREADER_H

#include "quorlin/TokenOutput.h"

#include <pelmar/xml/Node.h>

#include <cstddef>
#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace Cli {
namespace Inspect {

/// The child elements of this expanded name, in document order.
std::vector<const Pelmar::Xml::ElementNode*> GetChildren(const Pelmar::Xml::ElementNode& element,
                                                         const std::string& namespaceUri,
                                                         const std::string& localName);

/// "{namespace}name"
std::string GetExpandedName(const Pelmar::Xml::ElementNode& element);

/// The element's text without white space around it, shortened.
std::string ReadText(const Pelmar::Xml::ElementNode& element);

/// Adds the unprefixed attribute `name` as `key`, if there is one.
void AddAttribute(const Pelmar::Xml::ElementNode& element, const std::string& name, const std::string& key,
                  Json& json);

/// Counts the entries of all lists of one assertion, so that their sum is bounded.
class ListReader final {
 public:
  explicit ListReader(std::size_t maxEntries) : _left(maxEntries) {}

  /// Adds the list `key` with what `read` makes of each element; no list when there are no elements.
  void AddList(Json& json, const std::string& key,
               const std::vector<const Pelmar::Xml::ElementNode*>& elements,
               const std::function<Json(const Pelmar::Xml::ElementNode&)>& read);

 private:
  std::size_t _left;
};

}  // namespace Inspect
}  // namespace Cli

#endif  // QUORLIN_CLI_INSPECT_CLAIMSREADER_H
