// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Follows the library's reader through a document.

#ifndef QUORLIN_CLI_EXPLAIN_ELEMENTTRAIL_H
#define QUORLIN_CLI_EXPLAIN_ELEMENTTRAIL_H

#include "quorlin/explain/Explanation.h"
#include "quorlin/xmlReading.h"

#include <pelmar/xml/Node.h>

#include <vector>

namespace Cli {

/// Finds the same nodes significant as the library does, and remembers the elements among them that the
/// reader came to, in order. The last is where the reader stopped.
class ElementTrail final : public Quorlin::NodeFilter {
 public:
  /// `visited` must outlive the trail.
  explicit ElementTrail(std::vector<const Pelmar::Xml::ElementNode*>& visited) : _visited(visited) {}
  bool Accept(Pelmar::Xml::Node* node) const override;

 private:
  const Quorlin::SkipWsAndCommentsFilter _filter;
  std::vector<const Pelmar::Xml::ElementNode*>& _visited;
};

/// Where `element` stands, seen from `root`.
Place FindPlace(const Pelmar::Xml::ElementNode* element, const Pelmar::Xml::ElementNode* root);

/// The first SAML assertion in document order; null when there is none. The parser bounds how deep this can
/// go.
Pelmar::Xml::ElementNode* FindAssertion(Pelmar::Xml::ElementNode* element);

}  // namespace Cli

#endif  // QUORLIN_CLI_EXPLAIN_ELEMENTTRAIL_H
