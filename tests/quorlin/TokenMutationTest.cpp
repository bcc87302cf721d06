// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Every alteration of a kind, tried one by one: whatever is done to a signed token, it is refused or still
// says what the service signed.

#include "quorlin/Namespaces.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"
#include "support/XmlText.h"

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using Pelmar::Ref;
using Pelmar::Xml::Document;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;

/// A token with one of everything.
std::string SignedRichToken(const std::string& uri) {
  TokenText text;
  text.delegateId = NameIdElement("proxy@example.com");
  text.HoldKey(TokenSigner());
  text.restrictions =
      "<saml:AudienceRestriction><saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>" +
      ProxyRestriction("Count=\"1\"") + RenewRestriction("Count=\"1\"") +
      DelegationRestriction(DelegateElement("2020-01-01T00:00:00Z", NameIdElement("proxy@example.com")));
  text.advice = "<saml:Advice><ext:RSAAdvice AdviceSource=\"s\">" + AttributeElement("n", {"v"}) +
                "</ext:RSAAdvice></saml:Advice>";
  text.attributes = AttributeElement(kAttrGroupIdentity, {"D\\users", "staff/E"}) +
                    AttributeElement(kAttrIsSolution, {"false"}) +
                    AttributeElement(kClaimSurname, {"Liddell"});
  TokenSigning signing;
  signing.references[0].uri = uri;
  return SignToken(text.Compose(), TokenSigner(), signing);
}

/// In document order.
std::vector<ElementNode*> ListElements(const Ref<Document>& document) {
  std::vector<ElementNode*> elements;
  const std::function<void(ElementNode*)> visit = [&](ElementNode* element) {
    elements.push_back(element);
    for (Node* child = element->GetFirstChild(); child != nullptr; child = child->GetNextSibling()) {
      if (ElementNode* const inner = Pelmar::Xml::AsElement(child)) {
        visit(inner);
      }
    }
  };
  visit(document->GetDocumentElement());
  return elements;
}

bool IsWithin(const Node* node, const Node* ancestor) {
  while (node != nullptr && node != ancestor) {
    node = node->GetParent();
  }
  return node != nullptr;
}

/// The meaning of a token text; empty when it is refused.
std::string MeaningOfText(const std::string& text) {
  std::string meaning;
  VerdictOf([&] { meaning = MeaningOf(*ReadToken(text)); });
  return meaning;
}

class TokenMutation : public testing::TestWithParam<const char*> {
 protected:
  const std::string good = SignedRichToken(GetParam());
  const std::string meaning = MeaningOf(*ReadToken(good));

  /// Counts the alterations that are accepted, all of which must mean the same.
  void Try(const std::string& text, const std::string& what) {
    const std::string now = MeaningOfText(text);
    if (!now.empty()) {
      ++accepted;
      EXPECT_EQ(now, meaning) << what;
    }
  }

  /// The same for every assertion in a message that holds `text`.
  void TryEachAssertion(const std::string& text, const std::string& what) {
    const Ref<Document> document = ParseXmlText("<m>" + text + "</m>");
    for (ElementNode* const element : ListElements(document)) {
      std::string now;
      VerdictOf([&] { now = MeaningOf(*CreateSamlTokenFromDom(element, Trust({TokenSigner()}))); });
      if (!now.empty()) {
        ++accepted;
        EXPECT_EQ(now, meaning) << what;
      }
    }
  }

  std::size_t accepted = 0;
};

INSTANTIATE_TEST_SUITE_P(, TokenMutation, testing::Values("", "#_4f0a9c1e"),
                         [](const auto& parameter) { return *parameter.param == '\0' ? "Whole" : "ById"; });

TEST_P(TokenMutation, OfAByteChangesNoMeaning) {
  for (std::size_t i = 0; i < good.size(); ++i) {
    for (const int bit : {0x01, 0x20}) {
      std::string text = good;
      text[i] = static_cast<char>(text[i] ^ bit);
      Try(text, "bit at " + std::to_string(i));
    }
    Try(good.substr(0, i) + good.substr(i + 1), "left out at " + std::to_string(i));
    Try(good.substr(0, i) + good[i] + good.substr(i), "twice at " + std::to_string(i));
  }
  // Blanks between attributes, and what only KeyInfo and the prefixes of nothing hold.
  EXPECT_GT(accepted, 0U);
  EXPECT_LT(accepted, good.size() / 4);
}

TEST_P(TokenMutation, ByInsertionChangesNoMeaning) {
  for (const char* const inserted : {" ", "<!---->", "<?p?>", "x", "<x/>", "\""}) {
    for (std::size_t i = 0; i <= good.size(); ++i) {
      Try(good.substr(0, i) + inserted + good.substr(i), std::string(inserted) + " at " + std::to_string(i));
    }
  }
  EXPECT_GT(accepted, 0U);
}

// --- Moving elements about ---

/// `text` with element `from` appended to element `to`, moved there or copied; empty when that cannot be.
std::string Transplant(const std::string& text, std::size_t from, std::size_t to, bool move) {
  const Ref<Document> target = ParseXmlText(text);
  const Ref<Document> source = move ? target : ParseXmlText(text);
  const Ref<ElementNode> element(ListElements(source)[from]);
  ElementNode* const place = ListElements(target)[to];
  if (element->GetParent() == source.Get() && move) {
    return "";
  }
  if (IsWithin(place, element.Get())) {
    return "";
  }
  place->AppendChild(element);
  return WriteXmlText(target->GetDocumentElement());
}

TEST_P(TokenMutation, OfAnElementsPlaceChangesNoMeaning) {
  const std::size_t count = ListElements(ParseXmlText(good)).size();
  for (std::size_t from = 0; from < count; ++from) {
    for (std::size_t to = 0; to < count; ++to) {
      for (const bool move : {false, true}) {
        const std::string text = Transplant(good, from, to, move);
        if (!text.empty()) {
          Try(text, std::to_string(from) + " into " + std::to_string(to));
        }
      }
    }
  }
  EXPECT_GT(accepted, 0U);
}

TEST_P(TokenMutation, ByLeavingAnElementOutChangesNoMeaning) {
  const std::size_t count = ListElements(ParseXmlText(good)).size();
  for (std::size_t i = 1; i < count; ++i) {
    const Ref<Document> document = ParseXmlText(good);
    ElementNode* const element = ListElements(document)[i];
    element->GetParent()->RemoveChild(element);
    Try(WriteXmlText(document->GetDocumentElement()), std::to_string(i));
  }
  EXPECT_EQ(accepted, 0U);
}

// --- Two assertions in every arrangement ---

/// The token with another subject, still with its signature; under another ID when one is given.
std::string Forge(const std::string& token, const std::string& id) {
  const std::string forged = ReplaceOnce(token, kTokenSubject, "mallory@example.com");
  return id.empty() ? forged : ReplaceOnce(forged, std::string(" ID=\"") + kTokenId, " ID=\"" + id);
}

/// `outer` with the document element of `inner` as the last child of its element number `place`.
std::string Nest(const std::string& outer, std::size_t place, const std::string& inner) {
  const Ref<Document> document = ParseXmlText(outer);
  const Ref<Document> guest = ParseXmlText(inner);
  ListElements(document)[place]->AppendChild(Ref<Node>(guest->GetDocumentElement()));
  return WriteXmlText(document->GetDocumentElement());
}

TEST_P(TokenMutation, ByAForgedAssertionAnywhereIsNeverBelieved) {
  const std::size_t count = ListElements(ParseXmlText(good)).size();
  for (const std::string id : {"", "_0ddba11"}) {
    const std::string forged = Forge(good, id);
    for (std::size_t place = 0; place < count; ++place) {
      // What is accepted means what was signed, whichever of the two is read.
      for (const std::string& text : {Nest(forged, place, good), Nest(good, place, forged)}) {
        Try(text, id + " at " + std::to_string(place));
        TryEachAssertion(text, id + " at " + std::to_string(place));
      }
    }
  }
}

}  // namespace
}  // namespace Quorlin
