// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/xmlCommonBuilders.h"

#include <pelmar/Exception.h>
#include <pelmar/xml/Parser.h>

#include <boost/make_shared.hpp>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <string>

#include "quorlin/RequestBuilderImpl.h"
#include "support/FakeSamlToken.h"

namespace Quorlin {
namespace {

using Pelmar::Ref;
using Pelmar::Xml::ElementNode;
using testing::Eq;
using testing::KilledBySignal;
using TestSupport::FakeSamlToken;

Ref<ElementNode> Build(const XMLBuilderPtr& builder) {
  Ref<ElementNode> element;
  builder->build(element);
  return element;
}

// What the platform says against the text, or "built".
std::string BuildFailure(const XMLBuilderPtr& builder) {
  try {
    Build(builder);
    return "built";
  } catch (const Pelmar::InvalidArgumentException& e) {
    return e.what();
  }
}

// --- Elements ---

TEST(ElementBuilder, YieldsAnEmptyElement) {
  EXPECT_EQ(SerializeToXML(ElementBuilder("wst", "UseKey")), "<wst:UseKey/>");
  EXPECT_EQ(SerializeToXML(ElementBuilder("", "UseKey")), "<UseKey/>");
}

TEST(ElementBuilder, SortsAttributesByTheirFullNames) {
  EXPECT_EQ(SerializeToXML(ElementBuilder("a", "b", {{"xmlns:wst", "urn:w"}, {"Context", "c"}})),
            "<a:b Context=\"c\" xmlns:wst=\"urn:w\"/>");
  EXPECT_EQ(SerializeToXML(ElementBuilder("a", "b", {{"OK", "1"}, {"Allow", "2"}})),
            "<a:b Allow=\"2\" OK=\"1\"/>");
  EXPECT_EQ(
      SerializeToXML(ElementBuilder(
          "a", "b", {{"xmlns:wsu", "urn:u"}, {"wsu:Id", "i"}, {"ValueType", "v"}, {"EncodingType", "e"}})),
      "<a:b EncodingType=\"e\" ValueType=\"v\" wsu:Id=\"i\" xmlns:wsu=\"urn:u\"/>");
}

TEST(ElementBuilder, SortsBytewise) {
  EXPECT_EQ(SerializeToXML(ElementBuilder("a", "b", {{"a", "1"}, {"Z", "2"}, {"A", "3"}, {"\xC3\xA9", "4"}})),
            "<a:b A=\"3\" Z=\"2\" a=\"1\" \xC3\xA9=\"4\"/>");
}

TEST(ElementBuilder, KeepsTheFirstValueOfANameGivenTwice) {
  EXPECT_EQ(SerializeToXML(ElementBuilder("a", "b", {{"c", "first"}, {"c", "second"}})),
            "<a:b c=\"first\"/>");
}

TEST(TextElementBuilder, YieldsAnElementWithOneText) {
  EXPECT_EQ(SerializeToXML(TextElementBuilder("wsse", "Username", "alice")),
            "<wsse:Username>alice</wsse:Username>");
  EXPECT_EQ(SerializeToXML(TextElementBuilder("a", "b", {{"z", "1"}, {"c", "2"}}, "text")),
            "<a:b c=\"2\" z=\"1\">text</a:b>");
}

TEST(TextElementBuilder, KeepsAnEmptyTextAsANode) {
  const Ref<ElementNode> element = Build(TextElementBuilder("a", "b", ""));
  ASSERT_EQ(element->GetChildCount(), 1u);
  const Pelmar::Xml::TextNode* const text = Pelmar::Xml::AsText(element->GetFirstChildNode());
  ASSERT_NE(text, nullptr);
  EXPECT_EQ(text->GetText(), "");
  EXPECT_EQ(SerializeToXML(TextElementBuilder("a", "b", "")), "<a:b/>");
}

TEST(TextElementBuilder, KeepsTextsAsTheyAre) {
  const std::string texts[] = {" leading and trailing ", "\t\r\n", "<>&\"'", "]]>", "\xF0\x9F\x94\x91"};
  for (const std::string& text : texts) {
    const Ref<ElementNode> element = Build(TextElementBuilder("a", "b", {{"c", text}}, text));
    EXPECT_EQ(Pelmar::Xml::AsText(element->GetFirstChildNode())->GetText(), text);
    std::string value;
    ASSERT_TRUE(element->GetAttribute("c", value));
    EXPECT_EQ(value, text);
  }
}

// What XML 1.0 (production 2) cannot carry, and what is no UTF-8.
const std::string kForbiddenTexts[] = {
    std::string("secret\0", 7), "secret\x01",         "secret\x0B", "secret\x1F", "secret\xEF\xBF\xBE",
    "secret\xEF\xBF\xBF",       "secret\xED\xA0\x80", "secret\xC3", "secret\xFF", "secret\xC0\x80",
    "secret\xF4\x90\x80\x80"};

TEST(TextElementBuilder, RefusesTextThatXmlCannotCarryWithoutRepeatingIt) {
  for (const std::string& text : kForbiddenTexts) {
    const std::string inText = BuildFailure(TextElementBuilder("a", "b", text));
    EXPECT_NE(inText, "built");
    EXPECT_EQ(inText.find("secret"), std::string::npos) << inText;
    const std::string inAttribute = BuildFailure(ElementBuilder("a", "b", {{"c", text}}));
    EXPECT_NE(inAttribute, "built");
    EXPECT_EQ(inAttribute.find("secret"), std::string::npos) << inAttribute;
  }
}

TEST(ElementDefineAttribute, AddsBehindWhatStands) {
  const Ref<ElementNode> element = Build(ElementBuilder("a", "b", {{"x", "1"}}));
  ElementDefineAttribute(element.Get(), {"c", "2"});
  EXPECT_EQ(SerializeToXML(boost::make_shared<PreBuiltElementImpl>(element)), "<a:b x=\"1\" c=\"2\"/>");
}

TEST(Builders, YieldAFreshTreeOnEachBuild) {
  const XMLBuilderPtr builder =
      CompositeBuilder(ElementBuilder("a", "b"), {TextElementBuilder("a", "c", "d")});
  const Ref<ElementNode> first = Build(builder);
  const Ref<ElementNode> second = Build(builder);
  EXPECT_NE(first.Get(), second.Get());
  EXPECT_NE(first->GetFirstChildNode(), second->GetFirstChildNode());
  EXPECT_EQ(first->GetParent(), nullptr);
}

TEST(PreBuiltElement, HandsOutTheVeryElement) {
  const Ref<ElementNode> element = Build(ElementBuilder("a", "b"));
  const XMLBuilderPtr builder = boost::make_shared<PreBuiltElementImpl>(element);
  EXPECT_EQ(Build(builder).Get(), element.Get());
  EXPECT_EQ(Build(builder).Get(), element.Get());
}

// --- Composites ---

TEST(CompositeBuilder, WithoutChildrenYieldsItsRootsElement) {
  EXPECT_EQ(SerializeToXML(CompositeBuilder(ElementBuilder("a", "b", {{"c", "d"}}), {})), "<a:b c=\"d\"/>");
  EXPECT_EQ(SerializeToXML(CompositeBuilder(TextElementBuilder("a", "b", "c"), {})), "<a:b>c</a:b>");
}

TEST(CompositeBuilder, ExtendsTheElementOfACompositeRoot) {
  const XMLBuilderPtr inner =
      CompositeBuilder(ElementBuilder("r", "root"), {ElementBuilder("r", "A"), ElementBuilder("r", "B")});
  XMLCompositeBuilder outer(inner);
  outer.Add(ElementBuilder("r", "C"));
  Ref<ElementNode> element;
  outer.build(element);
  EXPECT_EQ(SerializeToXML(boost::make_shared<PreBuiltElementImpl>(element)),
            "<r:root><r:A/><r:B/><r:C/></r:root>");
  EXPECT_EQ(SerializeToXML(inner), "<r:root><r:A/><r:B/></r:root>");
}

TEST(CompositeBuilder, AddChains) {
  const boost::shared_ptr<XMLCompositeBuilder> builder =
      boost::make_shared<XMLCompositeBuilder>(ElementBuilder("r", "root"));
  XMLCompositeBuilder& same = builder->Add(ElementBuilder("r", "A")).Add(TextElementBuilder("r", "B", "b"));
  EXPECT_EQ(&same, builder.get());
  EXPECT_EQ(SerializeToXML(builder), "<r:root><r:A/><r:B>b</r:B></r:root>");
}

TEST(BuildAndAppendChildTo, MakesTheChildTheLastOne) {
  const Ref<ElementNode> parent =
      Build(CompositeBuilder(ElementBuilder("r", "root"), {ElementBuilder("r", "A")}));
  BuildAndAppendChildTo(parent.Get(), ElementBuilder("r", "B"));
  EXPECT_EQ(SerializeToXML(boost::make_shared<PreBuiltElementImpl>(parent)), "<r:root><r:A/><r:B/></r:root>");
}

class CompositeBuilderDeathTest : public testing::Test {
 protected:
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(CompositeBuilderDeathTest, AbortsOnANullRoot) {
  const XMLBuilderPtr null;
  EXPECT_EXIT(XMLCompositeBuilder{null}, KilledBySignal(SIGABRT),
              Eq("Verify failed: rootBuilder != __null (lib/quorlin/xmlCommonBuilders)\n"));
}

TEST_F(CompositeBuilderDeathTest, FailsOnANullChildOnlyWhenBuilt) {
  const XMLBuilderPtr builder = CompositeBuilder(ElementBuilder("r", "root"), {XMLBuilderPtr()});
  EXPECT_EXIT(Build(builder), KilledBySignal(SIGABRT), testing::HasSubstr("px != 0"));
}

// --- Tokens ---

std::string Inserted(const std::string& xml) {
  return SerializeToXML(InsertSamlTokenBuilder(FakeSamlToken("_id", xml, SamlToken::CONFIRM_BEARER)));
}

TEST(InsertSamlToken, KeepsTheTextOfTheAssertion) {
  const FakeSamlToken token;
  EXPECT_EQ(SerializeToXML(InsertSamlTokenBuilder(token)), token.ToXml());
}

TEST(InsertSamlToken, KeepsHowEmptyElementsAndDeclarationsWereWritten) {
  const std::string texts[] = {
      "<a/>",
      "<a></a>",
      "<a xmlns=\"urn:a\"><b xmlns=\"\"></b><c/></a>",
      "<s:a xmlns:s=\"urn:s\" b=\"1\" xmlns:t=\"urn:t\"><t:c xmlns:t=\"urn:t\" a=\"2\"></t:c></s:a>",
      "<a>text <!--comment--> <?pi data?> text</a>",
      "<a b=\"&amp;&lt;&quot;&#x9;&#xA;&#xD;>'\">&amp;&lt;&gt;&#xD;\n\t\"'</a>",
  };
  for (const std::string& text : texts) {
    EXPECT_EQ(Inserted(text), text);
  }
}

TEST(InsertSamlToken, LeavesTheDeclarationAndWhatSurroundsTheAssertion) {
  EXPECT_EQ(Inserted("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<!-- before --><a>b</a>\n<!-- after -->\n"),
            "<a>b</a>");
}

TEST(InsertSamlToken, TakesTheElementOutOfItsDocument) {
  const Ref<ElementNode> element = Build(InsertSamlTokenBuilder(FakeSamlToken()));
  EXPECT_EQ(element->GetParent(), nullptr);
  EXPECT_EQ(element->GetLocalName(), "Assertion");
}

TEST(InsertSamlToken, PassesTheParsersExceptionOn) {
  EXPECT_THROW(Inserted("<a>"), Pelmar::Xml::XMLParseException);
  EXPECT_THROW(Inserted(""), Pelmar::Xml::XMLParseException);
  EXPECT_THROW(Inserted("<!DOCTYPE a><a/>"), Pelmar::Xml::XMLParseException);
}

}  // namespace
}  // namespace Quorlin
