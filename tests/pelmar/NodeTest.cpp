// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/XmlText.h"

#include <pelmar/Exception.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>

#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace {

using TestSupport::ParseXmlText;
using TestSupport::WriteXmlText;

Ref<ElementNode> MakeElement(const std::string& prefix, const std::string& localName) {
  Ref<ElementNode> element;
  CreateElementNode(prefix, localName, element);
  return element;
}

Ref<TextNode> MakeText(const std::string& text) {
  Ref<TextNode> node;
  CreateTextNode(node);
  node->SetText(text);
  return node;
}

std::string ArgumentMessage(const std::function<void()>& action) {
  try {
    action();
  } catch (const InvalidArgumentException& error) {
    return error.what();
  }
  return "nothing was thrown";
}

std::vector<const Node*> ChildrenOf(const ParentNode* parent) {
  std::vector<const Node*> children;
  for (const Node* child = parent->GetFirstChildNode(); child != nullptr; child = child->GetNextSibling()) {
    children.push_back(child);
  }
  return children;
}

std::vector<const Node*> ChildrenFromTheBack(const ParentNode* parent) {
  std::vector<const Node*> children;
  for (const Node* child = parent->GetLastChildNode(); child != nullptr;
       child = child->GetPreviousSibling()) {
    children.insert(children.begin(), child);
  }
  return children;
}

// ---- Structure

TEST(Node, KnowsItsNeighbours) {
  const Ref<ElementNode> parent = MakeElement("", "a");
  const Ref<Node> first = MakeElement("", "b");
  const Ref<Node> second = MakeText("t");
  parent->AppendChild(first);
  parent->AppendChild(second);

  EXPECT_EQ(parent->GetChildCount(), 2u);
  EXPECT_EQ(ChildrenOf(parent.Get()), (std::vector<const Node*>{first.Get(), second.Get()}));
  EXPECT_EQ(ChildrenFromTheBack(parent.Get()), (std::vector<const Node*>{first.Get(), second.Get()}));
  EXPECT_EQ(parent->GetFirstChild(), first.Get());
  EXPECT_EQ(first->GetParent(), parent.Get());
  EXPECT_EQ(first->GetFirstChild(), nullptr);
  EXPECT_EQ(second->GetFirstChild(), nullptr);
}

TEST(Node, MovesToItsNewParent) {
  const Ref<ElementNode> before = MakeElement("", "a");
  const Ref<ElementNode> after = MakeElement("", "b");
  const Ref<Node> child = MakeText("t");
  before->AppendChild(child);
  after->AppendChild(child);
  EXPECT_EQ(before->GetChildCount(), 0u);
  EXPECT_EQ(before->GetFirstChild(), nullptr);
  EXPECT_EQ(after->GetFirstChild(), child.Get());
  EXPECT_EQ(child->GetParent(), after.Get());
}

TEST(Node, MovesToTheEndOfItsOwnParent) {
  const Ref<ElementNode> parent = MakeElement("", "a");
  const std::vector<Ref<Node>> nodes = {MakeText("1"), MakeText("2"), MakeText("3")};
  for (const Ref<Node>& node : nodes) {
    parent->AppendChild(node);
  }
  parent->AppendChild(nodes[0]);
  const std::vector<const Node*> expected = {nodes[1].Get(), nodes[2].Get(), nodes[0].Get()};
  EXPECT_EQ(ChildrenOf(parent.Get()), expected);
  EXPECT_EQ(ChildrenFromTheBack(parent.Get()), expected);
  EXPECT_EQ(parent->GetChildCount(), 3u);
}

TEST(Node, LeavesItsParentFromEveryPlace) {
  for (std::size_t removed = 0; removed < 3; ++removed) {
    const Ref<ElementNode> parent = MakeElement("", "a");
    const std::vector<Ref<Node>> nodes = {MakeText("1"), MakeText("2"), MakeText("3")};
    std::vector<const Node*> expected;
    for (std::size_t i = 0; i < nodes.size(); ++i) {
      parent->AppendChild(nodes[i]);
      if (i != removed) {
        expected.push_back(nodes[i].Get());
      }
    }
    parent->RemoveChild(nodes[removed].Get());
    EXPECT_EQ(ChildrenOf(parent.Get()), expected);
    EXPECT_EQ(ChildrenFromTheBack(parent.Get()), expected);
    EXPECT_EQ(parent->GetChildCount(), 2u);
    EXPECT_EQ(nodes[removed]->GetParent(), nullptr);
    EXPECT_EQ(nodes[removed]->GetNextSibling(), nullptr);
    EXPECT_EQ(nodes[removed]->GetPreviousSibling(), nullptr);
  }
}

TEST(Node, RefusesImpossibleChildren) {
  const Ref<ElementNode> outer = MakeElement("", "a");
  const Ref<ElementNode> inner = MakeElement("", "b");
  const Ref<ElementNode> innermost = MakeElement("", "c");
  outer->AppendChild(inner);
  inner->AppendChild(innermost);
  const Ref<Document> document = ParseXmlText("<d/>");

  EXPECT_EQ(ArgumentMessage([&] { outer->AppendChild(Ref<Node>()); }),
            "Invalid argument : the child is null");
  EXPECT_EQ(ArgumentMessage([&] { outer->AppendChild(document); }),
            "Invalid argument : a document cannot be a child");
  EXPECT_EQ(ArgumentMessage([&] { innermost->AppendChild(innermost); }),
            "Invalid argument : a node cannot be its own descendant");
  EXPECT_EQ(ArgumentMessage([&] { innermost->AppendChild(outer); }),
            "Invalid argument : a node cannot be its own descendant");
  EXPECT_EQ(WriteXmlText(outer.Get()), "<a><b><c/></b></a>");
}

TEST(Node, RefusesToRemoveAStranger) {
  const Ref<ElementNode> parent = MakeElement("", "a");
  const Ref<Node> stranger = MakeText("t");
  EXPECT_EQ(ArgumentMessage([&] { parent->RemoveChild(nullptr); }),
            "Invalid argument : the node is not a child of this node");
  EXPECT_EQ(ArgumentMessage([&] { parent->RemoveChild(stranger.Get()); }),
            "Invalid argument : the node is not a child of this node");
}

TEST(Document, KeepsToOneElementAndNoText) {
  const Ref<Document> document = ParseXmlText("<!--c--><a/>");
  EXPECT_EQ(ArgumentMessage([&] { document->AppendChild(MakeText(" ")); }),
            "Invalid argument : a document cannot have text outside its element");
  EXPECT_EQ(ArgumentMessage([&] { document->AppendChild(MakeElement("", "b")); }),
            "Invalid argument : a document cannot have a second element");
  EXPECT_EQ(document->GetChildCount(), 2u);

  document->RemoveChild(document->GetDocumentElement());
  EXPECT_EQ(document->GetDocumentElement(), nullptr);
  document->AppendChild(MakeElement("", "b"));
  EXPECT_EQ(document->GetDocumentElement()->GetLocalName(), "b");
}

// ---- Ownership

TEST(Node, OutlivesItsParentWhenHeld) {
  Ref<ElementNode> parent = MakeElement("", "a");
  const Ref<ElementNode> held = MakeElement("", "b");
  held->AppendChild(MakeText("t"));
  parent->AppendChild(MakeElement("", "x"));
  parent->AppendChild(held);
  parent->AppendChild(MakeElement("", "y"));
  parent = nullptr;
  EXPECT_EQ(held->GetParent(), nullptr);
  EXPECT_EQ(held->GetNextSibling(), nullptr);
  EXPECT_EQ(held->GetPreviousSibling(), nullptr);
  EXPECT_EQ(WriteXmlText(held.Get()), "<b>t</b>");
}

TEST(Node, KeepsAllBelowItAlive) {
  Ref<Node> held(ParseXmlText("<a><b><c>text</c></b></a>")->GetDocumentElement()->GetFirstChild());
  EXPECT_EQ(WriteXmlText(AsElement(held.Get())), "<b><c>text</c></b>");
}

// Released one inside the other, so many elements would need more stack than there is.
TEST(Node, ReleasesAVeryDeepTree) {
  Ref<ElementNode> root = MakeElement("", "a");
  ElementNode* innermost = root.Get();
  for (int i = 0; i < 500000; ++i) {
    const Ref<ElementNode> child = MakeElement("", "a");
    innermost->AppendChild(MakeText("t"));
    innermost->AppendChild(child);
    innermost = child.Get();
  }
  const Ref<ElementNode> last(innermost);
  root = nullptr;
  EXPECT_EQ(last->GetParent(), nullptr);
}

// ---- Attributes

TEST(ElementNode, KeepsAttributesInTheirOrder) {
  const Ref<ElementNode> element = MakeElement("p", "a");
  element->DefineAttribute("z", "1");
  element->DefineAttribute("xmlns:p", "urn:p");
  element->DefineAttribute("b", "2");
  ASSERT_EQ(element->GetAttributes().size(), 3u);
  EXPECT_EQ(element->GetAttributes()[0].name, "z");
  EXPECT_EQ(element->GetAttributes()[1].name, "xmlns:p");
  EXPECT_EQ(element->GetAttributes()[2].value, "2");
  EXPECT_EQ(element->GetAttributeNames(), (std::set<std::string>{"b", "xmlns:p", "z"}));
  EXPECT_EQ(element->GetQualifiedName(), "p:a");
  EXPECT_EQ(element->GetLine(), 0u);
  EXPECT_EQ(element->GetColumn(), 0u);
}

TEST(ElementNode, FindsAttributesByWrittenName) {
  const Ref<ElementNode> element = MakeElement("", "a");
  element->DefineAttribute("p:x", "1");
  std::string value = "unchanged";
  EXPECT_FALSE(element->GetAttribute(std::string("x"), value));
  EXPECT_EQ(value, "unchanged");
  EXPECT_TRUE(element->GetAttribute(std::string("p:x"), value));
  EXPECT_EQ(value, "1");
}

TEST(ElementNode, FindsAttributesByExpandedName) {
  const Ref<Document> document = ParseXmlText(
      "<r xmlns:p='urn:1' xmlns='urn:d'><a x='plain' p:x='one' q:x='two' u:x='undeclared' xml:lang='e' xmlns:q='urn:2'/></r>");
  const ElementNode* const a = document->GetDocumentElement()->FindChildElement("a");
  const auto find = [a](const std::string& uri, const std::string& name) {
    std::string value = "absent";
    a->GetAttribute(QName(uri, name), value);
    return value;
  };
  EXPECT_EQ(find("", "x"), "plain");
  EXPECT_EQ(find("urn:1", "x"), "one");
  EXPECT_EQ(find("urn:2", "x"), "two");
  EXPECT_EQ(find("http://www.w3.org/XML/1998/namespace", "lang"), "e");
  EXPECT_EQ(find("urn:d", "x"), "absent");
  EXPECT_EQ(find("", "p:x"), "absent");
  EXPECT_EQ(find("", "xmlns"), "absent");
  EXPECT_EQ(find("http://www.w3.org/2000/xmlns/", "q"), "absent");
}

TEST(ElementNode, DefinesTheSameAttributeOnce) {
  const Ref<ElementNode> element = MakeElement("", "a");
  element->DefineAttribute("x", "1");
  element->DefineAttribute("x", "1");
  EXPECT_EQ(element->GetAttributes().size(), 1u);
}

struct BadAttribute {
  const char* name;
  std::string value;
  const char* message;
};

TEST(ElementNode, RefusesBadAttributes) {
  const std::string kMalformed = "Invalid argument : malformed attribute name";
  for (const char* const name :
       {"",    ":",      "p:",        ":x",          "p:x:y",    "1x",           "p:1x",
        "-x",  ".x",     "x y",       "x=",          "x>",       "x\xFF",        "x\xC3",
        "x\n", "xmlns:", "\xC2\xB7x", "p:\xC2\xB7x", "\xCC\x80", "\xE2\x80\xBF", "x\xE2\x82\xAC"}) {
    EXPECT_EQ(ArgumentMessage([&] { MakeElement("", "a")->DefineAttribute(name, "v"); }), kMalformed) << name;
  }
  const std::vector<BadAttribute> cases = {
      {"x", "secret\x01", "Invalid argument : the value of attribute 'x' is not XML text"},
      {"x", "secret\xFF", "Invalid argument : the value of attribute 'x' is not XML text"},
      {"x", std::string("secret\0", 7), "Invalid argument : the value of attribute 'x' is not XML text"},
      {"xmlns:xmlns", "urn:x", "Invalid argument : the prefix xmlns is declared"},
      {"xmlns:xml", "urn:x",
       "Invalid argument : the prefix xml and its namespace belong to each other alone"},
      {"xmlns:p", "", "Invalid argument : a prefix is declared without a namespace"},
      {"xmlns:p", std::string(2049, 'u'), "Invalid argument : more than 2048 bytes in a namespace URI"},
      {"xmlns", "http://www.w3.org/2000/xmlns/",
       "Invalid argument : the namespace of declarations is bound to a prefix"},
      {"present", "secret", "Invalid argument : attribute 'present' is already defined with another value"}};
  for (const BadAttribute& bad : cases) {
    const Ref<ElementNode> element = MakeElement("", "a");
    element->DefineAttribute("present", "value");
    EXPECT_EQ(ArgumentMessage([&] { element->DefineAttribute(bad.name, bad.value); }), bad.message);
    EXPECT_EQ(WriteXmlText(element.Get()), "<a present=\"value\"/>");
  }
}

TEST(ElementNode, RefusesBadNames) {
  const std::string kMalformed = "Invalid argument : malformed element name";
  for (const char* const name : {"", "p:a", ":", "1", "a b", "a/", "<a", "a\xFF"}) {
    EXPECT_EQ(ArgumentMessage([&] { MakeElement("", name); }), kMalformed) << name;
  }
  for (const char* const prefix : {"xmlns", "1", ":", "p:q", "p "}) {
    EXPECT_EQ(ArgumentMessage([&] { MakeElement(prefix, "a"); }), kMalformed) << prefix;
  }
}

// Names that were made before are remembered; neither those nor what somebody feeds to the handler of
// documents, which leaves names to the parser, may let a malformed one pass.
TEST(ElementNode, RefusesBadNamesLikeGoodOnesBefore) {
  const std::string kMalformed = "Invalid argument : malformed element name";
  EXPECT_EQ(MakeElement("p", "a")->GetQualifiedName(), "p:a");
  EXPECT_EQ(MakeElement("p", "a")->GetQualifiedName(), "p:a");
  EXPECT_EQ(MakeElement("", "a")->GetQualifiedName(), "a");
  EXPECT_EQ(ArgumentMessage([] { MakeElement("", "p:a"); }), kMalformed);
  EXPECT_EQ(ArgumentMessage([] { MakeElement("p:a", ""); }), kMalformed);
  const Ref<XMLHandler> handler = CreateXMLDocumentHandler();
  handler->StartElement({{"a b", 3}, 0}, nullptr, 0, 1, 1);
  EXPECT_EQ(ArgumentMessage([] { MakeElement("", "a b"); }), kMalformed);
  EXPECT_EQ(ArgumentMessage([] { MakeElement("", "a b"); }), kMalformed);
}

// Whether or not they take each other's place in what is remembered.
TEST(ElementNode, HasTheNameThatItWasGiven) {
  for (int round = 0; round < 2; ++round) {
    for (char first = 'a'; first <= 'z'; ++first) {
      for (const char* const rest : {"", "a", "b", "aa", "ba"}) {
        const std::string name = first + std::string(rest);
        EXPECT_EQ(MakeElement("", name)->GetQualifiedName(), name);
        EXPECT_EQ(MakeElement(name, name)->GetQualifiedName(), name + ":" + name);
        const Ref<Document> parsed = ParseXmlText("<" + name + "/>");
        EXPECT_EQ(parsed->GetDocumentElement()->GetQualifiedName(), name);
      }
    }
  }
}

TEST(ElementNode, TakesNamesBeyondAscii) {
  const Ref<ElementNode> element = MakeElement("\xC3\xA9", "\xE5\xAD\x97");
  element->DefineAttribute("\xC3\xA9\xCC\x81:x", "v");
  EXPECT_EQ(WriteXmlText(element.Get()), "<\xC3\xA9:\xE5\xAD\x97 \xC3\xA9\xCC\x81:x=\"v\"/>");
}

// Elements with the same attributes may share them, which must not show when one of them changes.
TEST(ElementNode, KeepsItsAttributesWhenOneLikeItGetsAnother) {
  const char* const kText =
      "<r><a p='1' xmlns:x='urn:x'/><a p='1' xmlns:x='urn:x'/><a p='1' xmlns:x='urn:x'/></r>";
  for (int changed = 0; changed < 3; ++changed) {
    const Ref<Document> document = ParseXmlText(kText);
    std::vector<ElementNode*> elements;
    for (Node* child = document->GetDocumentElement()->GetFirstChild(); child != nullptr;
         child = child->GetNextSibling()) {
      elements.push_back(AsElement(child));
    }
    elements[changed]->DefineAttribute("xmlns:y", "urn:y");
    elements[changed]->DefineAttribute("y:q", "2");
    for (int i = 0; i < 3; ++i) {
      EXPECT_EQ(WriteXmlText(elements[i]), i == changed
                                               ? "<a p=\"1\" xmlns:x=\"urn:x\" xmlns:y=\"urn:y\" y:q=\"2\"/>"
                                               : "<a p=\"1\" xmlns:x=\"urn:x\"/>");
      EXPECT_EQ(*elements[i]->FindNamespaceUri("x"), "urn:x");
      EXPECT_EQ(elements[i]->FindNamespaceUri("y") != nullptr, i == changed);
    }
  }
}

TEST(ElementNode, KeepsItsAttributesWhenTheDocumentGoes) {
  Ref<Document> document = ParseXmlText("<r><a p='1'/><a p='1'/></r>");
  const Ref<ElementNode> last(AsElement(document->GetDocumentElement()->GetLastChildNode()));
  document = nullptr;
  EXPECT_EQ(WriteXmlText(last.Get()), "<a p=\"1\"/>");
}

// Names, values, number and order: all count.
TEST(ElementNode, HasTheAttributesThatItWasWrittenWith) {
  const std::string text =
      "<r><a p=\"1\"/><a p=\"2\"/><a q=\"2\"/><a q=\"2\" p=\"1\"/><a p=\"1\" q=\"2\"/><a/><a p=\"1\" q=\"2\"/>"
      "<b p=\"1\" q=\"2\"/><b p=\"1\" q=\"2\"><b p=\"1\"/></b><a p=\"1\"/><a p=\"\"/><a xmlns:p=\"urn:1\"/></r>";
  EXPECT_EQ(WriteXmlText(ParseXmlText(text)->GetDocumentElement()), text);
}

// ---- Namespaces

TEST(ElementNode, FindsNamespacesOutward) {
  const Ref<Document> document = ParseXmlText(
      "<r xmlns='urn:d' xmlns:p='urn:1' xmlns:q='urn:2'><a xmlns:p='urn:3'><b xmlns=''/></a></r>");
  const ElementNode* const a = document->GetDocumentElement()->FindChildElement("a");
  const ElementNode* const b = a->FindChildElement("b");
  ASSERT_NE(a->FindNamespaceUri(""), nullptr);
  EXPECT_EQ(*a->FindNamespaceUri(""), "urn:d");
  EXPECT_EQ(*b->FindNamespaceUri("p"), "urn:3");
  EXPECT_EQ(*b->FindNamespaceUri("q"), "urn:2");
  EXPECT_EQ(*b->FindNamespaceUri("xml"), "http://www.w3.org/XML/1998/namespace");
  EXPECT_EQ(b->FindNamespaceUri(""), nullptr);
  EXPECT_EQ(b->FindNamespaceUri("absent"), nullptr);
  EXPECT_EQ(b->FindNamespaceUri("xmlns"), nullptr);
}

TEST(ElementNode, FindsChildElements) {
  const Ref<Document> document =
      ParseXmlText("<r xmlns:p='urn:p'>a<!--a--><p:a n='1'/><a n='2'/><u:a n='3'/><b/></r>");
  const ElementNode* const root = document->GetDocumentElement();
  const auto numberOf = [](const ElementNode* element) {
    std::string number = "absent";
    if (element != nullptr) {
      element->GetAttribute("n", number);
    }
    return number;
  };
  EXPECT_EQ(numberOf(root->FindChildElement("a")), "1");
  EXPECT_EQ(numberOf(root->FindChildElement("urn:p", "a")), "1");
  EXPECT_EQ(numberOf(root->FindChildElement("", "a")), "2");
  EXPECT_EQ(numberOf(root->FindChildElement("urn:q", "a")), "absent");
  EXPECT_EQ(numberOf(root->FindChildElement("c")), "absent");
}

// ---- Text and views

TEST(TextNode, RefusesWhatXmlCannotCarry) {
  const Ref<TextNode> text = MakeText("kept");
  for (const std::string& bad : {std::string("secret\0", 7), std::string("\x1F"), std::string("\xC0\x80"),
                                 std::string("\xED\xA0\x80"), std::string("\xEF\xBF\xBE")}) {
    EXPECT_EQ(ArgumentMessage([&] { text->SetText(bad); }),
              "Invalid argument : the text of a node is not XML text");
  }
  EXPECT_EQ(text->GetText(), "kept");
}

TEST(Node, IsViewedAsWhatItIs) {
  const Ref<Node> element = MakeElement("", "a");
  const Ref<Node> text = MakeText("t");
  const Node* const constElement = element.Get();
  const Node* const constText = text.Get();
  EXPECT_EQ(AsElement(element.Get()), element.Get());
  EXPECT_EQ(AsElement(constElement), constElement);
  EXPECT_EQ(AsText(text.Get()), text.Get());
  EXPECT_EQ(AsText(constText), constText);
  EXPECT_EQ(AsElement(text.Get()), nullptr);
  EXPECT_EQ(AsElement(constText), nullptr);
  EXPECT_EQ(AsText(element.Get()), nullptr);
  EXPECT_EQ(AsText(constElement), nullptr);
  EXPECT_EQ(AsElement(static_cast<Node*>(nullptr)), nullptr);
  EXPECT_EQ(AsText(static_cast<const Node*>(nullptr)), nullptr);
}

std::string MismatchMessage(const Ref<Object>& object) {
  try {
    ViewAsDocument(object);
  } catch (const TypeMismatchException& error) {
    return error.what();
  }
  return "nothing was thrown";
}

TEST(Document, IsViewedOnlyWhereItIsOne) {
  const Ref<Object> document = ParseXmlText("<a/>");
  EXPECT_EQ(ViewAsDocument(document).Get(), document.Get());
  EXPECT_EQ(MismatchMessage(Ref<Object>()), "The object is not an XML document");
  EXPECT_EQ(MismatchMessage(MakeElement("", "a")), "The object is not an XML document");
}

}  // namespace
}  // namespace Xml
}  // namespace Pelmar
