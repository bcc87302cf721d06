// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Single elements of an assertion, given to the functions that read them.

#ifndef QUORLIN_TESTS_SUPPORT_ASSERTIONFRAGMENTS_H
#define QUORLIN_TESTS_SUPPORT_ASSERTIONFRAGMENTS_H

#include "quorlin/Namespaces.h"
#include "quorlin/xmlReading.h"
#include "support/Verdict.h"
#include "support/XmlText.h"

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <functional>
#include <string>
#include <vector>

namespace TestSupport {

/// Gives `action` an iterator on the first node of `fragment`, around which all prefixes of an assertion are
/// declared.
template <typename Action>
void OnFragment(const std::string& fragment, Action action) {
  const std::string declarations =
      std::string(" xmlns:saml=\"") + Quorlin::kSaml + "\" xmlns:xsi=\"" + Quorlin::kXsi + "\" xmlns:xs=\"" +
      Quorlin::kXs + "\" xmlns:del=\"" + Quorlin::kSamlDelegation + "\" xmlns:ext=\"" + Quorlin::kSamlExt +
      "\" xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\" xmlns:other=\"urn:other\"";
  const auto document = ParseXmlText("<r" + declarations + ">" + fragment + "</r>");
  action(Quorlin::NodeFilterIterator(document->GetDocumentElement()->GetFirstChild(),
                                     boost::make_shared<Quorlin::SkipWsAndCommentsFilter>()));
}

using FragmentReader = std::function<void(Quorlin::NodeFilterIterator)>;

/// A fragment that is refused with ParseException and this whole message.
struct Refusal {
  const char* name;
  std::string fragment;
  std::string message;
};

inline void ExpectRefusals(const FragmentReader& read, const std::vector<Refusal>& refusals) {
  for (const Refusal& refusal : refusals) {
    OnFragment(refusal.fragment, [&](const Quorlin::NodeFilterIterator& it) {
      EXPECT_EQ(VerdictOf([&] { read(it); }), "Quorlin::ParseException: " + refusal.message) << refusal.name;
    });
  }
}

inline void ExpectAccepted(const FragmentReader& read, const std::vector<std::string>& fragments) {
  for (const std::string& fragment : fragments) {
    OnFragment(fragment, [&](const Quorlin::NodeFilterIterator& it) {
      EXPECT_EQ(VerdictOf([&] { read(it); }), "accepted") << fragment;
    });
  }
}

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_ASSERTIONFRAGMENTS_H
