// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/RandomXml.h"
#include "support/XmlText.h"

#include <pelmar/Exception.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/security/Algorithms.h>

#include <gtest/gtest.h>

#include <string>

namespace Pelmar {
namespace Xml {
namespace {

using TestSupport::ParseXmlText;
using TestSupport::WriteXmlText;

std::string Rewritten(const std::string& text) {
  return WriteXmlText(ParseXmlText(text)->GetDocumentElement());
}

Ref<ElementNode> MakeElement(const std::string& localName) {
  Ref<ElementNode> element;
  CreateElementNode("", localName, element);
  return element;
}

Ref<TextNode> MakeText(const std::string& text) {
  Ref<TextNode> node;
  CreateTextNode(node);
  node->SetText(text);
  return node;
}

TEST(XmlTextWriter, KeepsEmptyElementsAsTheyWereWritten) {
  EXPECT_EQ(Rewritten("<a><b/><c></c><d x=''/></a>"), "<a><b/><c></c><d x=\"\"/></a>");
  EXPECT_EQ(Rewritten("<a/>"), "<a/>");
  EXPECT_EQ(Rewritten("<a></a>"), "<a></a>");
}

TEST(XmlTextWriter, WritesBuiltElementsWithoutContentAsOneTag) {
  const Ref<ElementNode> element = MakeElement("a");
  EXPECT_EQ(WriteXmlText(element.Get()), "<a/>");
  element->AppendChild(MakeText(""));
  EXPECT_EQ(WriteXmlText(element.Get()), "<a/>");
  element->AppendChild(MakeElement("b"));
  EXPECT_EQ(WriteXmlText(element.Get()), "<a><b/></a>");
}

TEST(XmlTextWriter, KeepsCommentsAndInstructions) {
  EXPECT_EQ(Rewritten("<a>1<!-- <c> & -->2<?p d & <e>?><?q?></a>"),
            "<a>1<!-- <c> & -->2<?p d & <e>?><?q?></a>");
}

TEST(XmlTextWriter, LeavesOutWhatStandsAroundTheElement) {
  EXPECT_EQ(Rewritten("<?xml version='1.0'?>\n<!--c--><a>\n</a><?p?>"), "<a>\n</a>");
}

TEST(XmlTextWriter, KeepsAttributesInTheirOrder) {
  EXPECT_EQ(Rewritten("<p:a z='1' xmlns:p=\"urn:p\" a = '2' p:b='3'></p:a>"),
            "<p:a z=\"1\" xmlns:p=\"urn:p\" a=\"2\" p:b=\"3\"></p:a>");
}

TEST(XmlTextWriter, KeepsUndeclaredPrefixesAsTheyAre) {
  EXPECT_EQ(Rewritten("<p:a q:b=''><r:c/></p:a>"), "<p:a q:b=\"\"><r:c/></p:a>");
}

TEST(XmlTextWriter, EscapesWhatMarkupWouldBeAndWhatAParserWouldNormalise) {
  const Ref<ElementNode> element = MakeElement("a");
  const std::string nasty = "&<>\"'\t\n\r]]>\x7F\xC2\x85\xF0\x90\x80\x80";
  element->DefineAttribute("x", nasty);
  element->AppendChild(MakeText(nasty));
  const std::string written = WriteXmlText(element.Get());
  EXPECT_EQ(written,
            "<a x=\"&amp;&lt;>&quot;'&#x9;&#xA;&#xD;]]>\x7F\xC2\x85\xF0\x90\x80\x80\">"
            "&amp;&lt;&gt;\"'\t\n&#xD;]]&gt;\x7F\xC2\x85\xF0\x90\x80\x80</a>");

  const Ref<Document> read = ParseXmlText(written);
  std::string value;
  ASSERT_TRUE(read->GetDocumentElement()->GetAttribute("x", value));
  EXPECT_EQ(value, nasty);
  ASSERT_NE(AsText(read->GetDocumentElement()->GetFirstChild()), nullptr);
  EXPECT_EQ(AsText(read->GetDocumentElement()->GetFirstChild())->GetText(), nasty);
}

TEST(XmlTextWriter, WritesASubtreeAlone) {
  const Ref<Document> document = ParseXmlText("<r>1<a>2<b/>3</a>4</r>");
  EXPECT_EQ(WriteXmlText(document->GetDocumentElement()->FindChildElement("a")), "<a>2<b/>3</a>");
}

TEST(XmlTextWriter, RefusesANullWriter) {
  EXPECT_THROW(MakeElement("a")->WriteXml(nullptr), InvalidArgumentException);
}

TEST(XmlTextWriter, NeedsNoStackForADeepTree) {
  const Ref<ElementNode> root = MakeElement("a");
  ElementNode* innermost = root.Get();
  std::string start = "<a>";
  std::string end = "</a>";
  for (int i = 1; i < 200000; ++i) {
    const Ref<ElementNode> child = MakeElement("a");
    innermost->AppendChild(child);
    innermost = child.Get();
    start += "<a>";
    end += "</a>";
  }
  innermost->AppendChild(MakeText("x"));
  EXPECT_TRUE(WriteXmlText(root.Get()) == start + "x" + end);
}

TEST(XmlTextWriter, GivesCanonicalTextBackByteForByte) {
  TestSupport::RandomXml random(1);
  for (int i = 0; i < 500; ++i) {
    const Ref<Document> document = ParseXmlText(random.MakeDocument());
    const std::string canonical =
        TestSupport::CanonicalText(document->GetDocumentElement(), Security::kC14nWithComments);
    ASSERT_EQ(Rewritten(canonical), canonical);
  }
}

TEST(XmlTextWriter, WritesWhatParsesToTheSameTree) {
  TestSupport::RandomXml random(2);
  for (int i = 0; i < 500; ++i) {
    const Ref<Document> document = ParseXmlText(random.MakeDocument());
    const std::string written = WriteXmlText(document->GetDocumentElement());
    const Ref<Document> again = ParseXmlText(written);
    ASSERT_EQ(TestSupport::DescribeTree(again->GetDocumentElement()),
              TestSupport::DescribeTree(document->GetDocumentElement()));
    ASSERT_EQ(WriteXmlText(again->GetDocumentElement()), written);
  }
}

}  // namespace
}  // namespace Xml
}  // namespace Pelmar
