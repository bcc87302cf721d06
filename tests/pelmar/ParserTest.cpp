// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/RandomXml.h"
#include "support/XmlText.h"

#include <pelmar/Exception.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace {

using TestSupport::DescribeTree;
using TestSupport::ParseXmlText;

// Gives its text in steps of one size.
class SteppingReader final : public Reader {
 public:
  SteppingReader(const std::string& text, std::size_t step) : _text(text), _step(step) {}

  std::size_t Read(char* buffer, std::size_t size) override {
    const std::size_t count = std::min({size, _step, _text.size() - _position});
    std::copy_n(_text.data() + _position, count, buffer);
    _position += count;
    return count;
  }

 private:
  const std::string _text;
  const std::size_t _step;
  std::size_t _position = 0;
};

std::string DescribePlaces(const Node* node) {
  std::string places;
  if (const ElementNode* const element = AsElement(node)) {
    places = element->GetQualifiedName() + " " + std::to_string(element->GetLine()) + ":" +
             std::to_string(element->GetColumn()) + "\n";
  }
  for (const Node* child = node->GetFirstChild(); child != nullptr; child = child->GetNextSibling()) {
    places += DescribePlaces(child);
  }
  return places;
}

// The tree with all places, or the refusal.
std::string Outcome(const std::string& text, std::size_t step) {
  const Ref<Reader> reader = MakeRef<SteppingReader>(text, step);
  Ref<Object> result;
  try {
    CreateXMLParser(CreateXMLDocumentHandler())->Parse(reader.Get(), result);
  } catch (const XMLParseException& error) {
    EXPECT_FALSE(result);
    return std::string("refused: ") + error.what();
  }
  const Ref<Document> document = ViewAsDocument(result);
  return DescribeTree(document.Get()) + DescribePlaces(document.Get());
}

std::string TreeOf(const std::string& text) {
  return DescribeTree(ParseXmlText(text)->GetDocumentElement());
}

// ---- What is read

TEST(XMLParser, BuildsTheTreeInDocumentOrder) {
  EXPECT_EQ(
      DescribeTree(
          ParseXmlText(
              "<?xml version='1.0'?><!--c-->\n<?p d?><r xmlns:q='urn:q' a='1'>t<q:b/>u<!-- v --><?w?></r><!--e-->")
              .Get()),
      "document\n"
      " comment [c]\n"
      " instruction [p|d]\n"
      " element |r [xmlns:q=urn:q] [a=1]\n"
      "  text [t]\n"
      "  element q|b\n"
      "  text [u]\n"
      "  comment [ v ]\n"
      "  instruction [w|]\n"
      " comment [e]\n");
}

TEST(XMLParser, MakesOneTextOfAdjacentCharacterData) {
  EXPECT_EQ(TreeOf("<a>x\n&lt;&#65;<![CDATA[<&>]]><![CDATA[]]>\r\ny</a>"),
            "element |a\n text [x\n<A<&>\ny]\n");
}

TEST(XMLParser, PartsTextAtCommentsAndInstructions) {
  EXPECT_EQ(TreeOf("<a>x<!----><?p?>y</a>"),
            "element |a\n text [x]\n comment []\n instruction [p|]\n text [y]\n");
}

TEST(XMLParser, NormalisesAttributeValuesAndLineEnds) {
  EXPECT_EQ(TreeOf("<a x='1\r\n2\t3 &#10;&#9;&#13;&quot;&apos;'>\r\n\r&#13;</a>"),
            "element |a [x=1 2 3 \n\t\r\"']\n text [\n\n\r]\n");
}

TEST(XMLParser, TellsEmptyTagsFromEmptyElements) {
  const Ref<Document> document = ParseXmlText("<a><b/><c></c></a>");
  EXPECT_EQ(TestSupport::WriteXmlText(document->GetDocumentElement()), "<a><b/><c></c></a>");
}

TEST(XMLParser, AcceptsUtf8Declared) {
  for (const std::string encoding : {"UTF-8", "utf-8", "Utf-8"}) {
    EXPECT_EQ(TreeOf("<?xml version=\"1.0\" encoding=\"" + encoding + "\" standalone='yes'?><a>\xC3\xA9</a>"),
              "element |a\n text [\xC3\xA9]\n");
  }
}

TEST(XMLParser, LeavesUndeclaredPrefixesToItsCaller) {
  EXPECT_EQ(TreeOf("<p:a q:b='1' q:c='2' r:b='3'/>"), "element p|a [q:b=1] [q:c=2] [r:b=3]\n");
}

TEST(XMLParser, AcceptsEqualLocalNamesInDifferentNamespaces) {
  EXPECT_EQ(TreeOf("<a xmlns:p='urn:1' xmlns:q='urn:2' xmlns='urn:1' x='' p:x='' q:x='' xml:x=''/>"),
            "element |a [xmlns:p=urn:1] [xmlns:q=urn:2] [xmlns=urn:1] [x=] [p:x=] [q:x=] [xml:x=]\n");
}

// What was declared inside an element is forgotten after it.
TEST(XMLParser, EndsTheScopeOfDeclarations) {
  EXPECT_EQ(
      TreeOf("<a xmlns:p='urn:1' xmlns:q='urn:2'><b xmlns:q='urn:1'/><c p:x='' q:x=''/></a>"),
      "element |a [xmlns:p=urn:1] [xmlns:q=urn:2]\n element |b [xmlns:q=urn:1]\n element |c [p:x=] [q:x=]\n");
}

TEST(XMLParser, TellsTheLineAndColumnOfEachElement) {
  const std::string text =
      "<?xml version='1.0'?>\r\n<a>\xC3\xA9\xF0\x90\x80\x80<b\r\n x=''/>\r<c/>\n\n  <d/><!--\n--><e/></a>";
  EXPECT_EQ(DescribePlaces(ParseXmlText(text).Get()), "a 2:1\nb 2:6\nc 4:1\nd 6:3\ne 7:4\n");
}

// An element that is refused for its namespaces is placed by expat, an accepted one by us.
TEST(XMLParser, PlacesElementsWhereExpatDoes) {
  TestSupport::RandomXml random(4);
  int compared = 0;
  for (int i = 0; i < 300; ++i) {
    const std::string text = random.MakeDocument();
    const std::size_t tag = text.find("</");
    const std::string before = text.substr(0, tag);
    if (tag == std::string::npos || before.find("<![CDATA[") != std::string::npos) {
      continue;
    }
    const std::string refused = Outcome(before + "<:z/>" + text.substr(tag), text.size() + 5);
    const Ref<Document> accepted = ParseXmlText(before + "<z/>" + text.substr(tag));
    const std::string places = DescribePlaces(accepted.Get());
    unsigned long line = 0;
    unsigned long column = 0;
    char colon = 0;
    std::istringstream(places.substr(places.find("z ") + 2)) >> line >> colon >> column;
    ASSERT_EQ(refused,
              std::string("refused: ") + XMLParseException("malformed element name", line, column).what())
        << text;
    ++compared;
  }
  EXPECT_GT(compared, 100);
}

TEST(XMLParser, TakesAByteOrderMarkForNoCharacter) {
  const Ref<Document> document = ParseXmlText("\xEF\xBB\xBF<a> <b/></a>");
  EXPECT_EQ(DescribePlaces(document.Get()), "a 1:1\nb 1:5\n");
}

// ---- What is refused

struct Refusal {
  std::string text;
  const char* message;
};

const std::vector<Refusal>& GetRefusals() {
  static const std::vector<Refusal> refusals = {
      // Not well-formed (XML 1.0).
      {"", "no element found at line 1, column 1"},
      {" \n", "no element found at line 2, column 1"},
      {"<!-- only -->", "no element found at line 1, column 14"},
      {"text", "syntax error at line 1, column 1"},
      {"<a>", "no element found at line 1, column 4"},
      {"<a", "unclosed token at line 1, column 1"},
      {"<a>\n</b>", "mismatched tag at line 2, column 3"},
      {"<a/><b/>", "junk after document element at line 1, column 5"},
      {"<a/>text", "junk after document element at line 1, column 5"},
      {"<a/>&#32;", "not well-formed (invalid token) at line 1, column 5"},
      {"<a x='1' x='2'/>", "duplicate attribute at line 1, column 10"},
      {"<a x=1/>", "not well-formed (invalid token) at line 1, column 6"},
      {"<a x='<'/>", "not well-formed (invalid token) at line 1, column 7"},
      {"<a>]]></a>", "not well-formed (invalid token) at line 1, column 6"},
      {"<a><!-- -- --></a>", "not well-formed (invalid token) at line 1, column 11"},
      {"<a>&#0;</a>", "reference to invalid character number at line 1, column 4"},
      {"<a>&#x1F;</a>", "reference to invalid character number at line 1, column 4"},
      {"<a>&#xD800;</a>", "reference to invalid character number at line 1, column 4"},
      {"<a>&#xFFFE;</a>", "reference to invalid character number at line 1, column 4"},
      {"<a>&#x110000;</a>", "reference to invalid character number at line 1, column 4"},
      {"<a>&undeclared;</a>", "undefined entity at line 1, column 4"},
      {"<a x='&undeclared;'/>", "undefined entity at line 1, column 1"},
      {"<a>\x01</a>", "not well-formed (invalid token) at line 1, column 4"},
      {std::string("<a>\0</a>", 8), "not well-formed (invalid token) at line 1, column 4"},
      {std::string("<a/>\0", 5), "not well-formed (invalid token) at line 1, column 5"},
      {" <?xml version='1.0'?><a/>", "XML or text declaration not at start of entity at line 1, column 2"},
      {"<a><?xml version='1.0'?></a>", "XML or text declaration not at start of entity at line 1, column 4"},
      {"<a><?XML d?></a>", "not well-formed (invalid token) at line 1, column 9"},
      // Not UTF-8.
      {"<a>\xFF</a>", "not well-formed (invalid token) at line 1, column 4"},
      {"<a>\xC0\x80</a>", "not well-formed (invalid token) at line 1, column 4"},
      {"<a>\xE0\x80\x80</a>", "not well-formed (invalid token) at line 1, column 4"},
      {"<a>\xED\xA0\x80</a>", "not well-formed (invalid token) at line 1, column 4"},
      {"<a>\xEF\xBF\xBF</a>", "not well-formed (invalid token) at line 1, column 4"},
      {"<a>\xF4\x90\x80\x80</a>", "not well-formed (invalid token) at line 1, column 4"},
      {"<a>\xC3", "partial character at line 1, column 4"},
      {std::string("\xFF\xFE<\0a\0/\0>\0", 10), "only UTF-8 is accepted at line 1, column 1"},
      {std::string("\xFE\xFF\0<\0a\0/\0>", 10), "only UTF-8 is accepted at line 1, column 1"},
      {std::string("<\0a\0/\0>\0", 8), "only UTF-8 is accepted at line 1, column 1"},
      {std::string("\0<\0a\0/\0>", 8), "only UTF-8 is accepted at line 1, column 1"},
      {"\xEF\xBB\xBF\xEF\xBB\xBF<a/>", "only UTF-8 is accepted at line 1, column 1"},
      {"\xEF\xBB\xBF\xFF\xFE<", "only UTF-8 is accepted at line 1, column 1"},
      {"<a/>\xEF\xBB\xBF", "not well-formed (invalid token) at line 1, column 5"},
      {"\xEF\xBB", "unclosed token at line 1, column 1"},
      {"<?xml version='1.0' encoding='ISO-8859-1'?><a/>", "only UTF-8 is accepted at line 1, column 1"},
      {"<?xml version='1.0' encoding='UTF-16'?><a/>", "only UTF-8 is accepted at line 1, column 1"},
      {"<?xml version='1.0' encoding='UTF8'?><a/>", "only UTF-8 is accepted at line 1, column 1"},
      {"<?xml version='1.1'?><a/>", "only XML 1.0 is accepted at line 1, column 1"},
      {"<?xml version='1.00'?><a/>", "only XML 1.0 is accepted at line 1, column 1"},
      // Document types, in any form.
      {"<!DOCTYPE a><a/>", "DOCTYPE is not allowed at line 1, column 1"},
      {"\n <!DOCTYPE a SYSTEM 'file:///etc/passwd'><a/>", "DOCTYPE is not allowed at line 2, column 2"},
      {"<!DOCTYPE a PUBLIC '-//A' 'http://127.0.0.1/a'><a/>", "DOCTYPE is not allowed at line 1, column 1"},
      {"<!DOCTYPE a [<!ENTITY e 'x'>]><a>&e;</a>", "DOCTYPE is not allowed at line 1, column 1"},
      {"<!DOCTYPE a [<!ATTLIST a x CDATA 'default'>]><a/>", "DOCTYPE is not allowed at line 1, column 1"},
      {"<!DOCTYPE a [<!ENTITY % p SYSTEM 'http://127.0.0.1/'>%p;]><a/>",
       "DOCTYPE is not allowed at line 1, column 1"},
      {"<a><!DOCTYPE a></a>", "not well-formed (invalid token) at line 1, column 6"},
      // Not well-formed in their namespaces (Namespaces in XML 1.0).
      {"<a>\n <:b/></a>", "malformed element name at line 2, column 2"},
      {"<p:/>", "malformed element name at line 1, column 1"},
      {"<p:q:r/>", "malformed element name at line 1, column 1"},
      {"<p:1/>", "malformed element name at line 1, column 1"},
      {"<p:-a/>", "malformed element name at line 1, column 1"},
      {"<p:\xC2\xB7/>", "malformed element name at line 1, column 1"},
      {"<xmlns:a/>", "an element has the prefix xmlns at line 1, column 1"},
      {"<a :b=''/>", "malformed attribute name at line 1, column 1"},
      {"<a p:=''/>", "malformed attribute name at line 1, column 1"},
      {"<a p:q:r=''/>", "malformed attribute name at line 1, column 1"},
      {"<a xmlns:='urn:p'/>", "malformed attribute name at line 1, column 1"},
      {"<a xmlns:p:q='urn:p'/>", "malformed attribute name at line 1, column 1"},
      {"<a xmlns:p=''/>", "a prefix is declared without a namespace at line 1, column 1"},
      {"<a xmlns:xmlns='urn:p'/>", "the prefix xmlns is declared at line 1, column 1"},
      {"<a xmlns:xmlns='http://www.w3.org/2000/xmlns/'/>",
       "the prefix xmlns is declared at line 1, column 1"},
      {"<a xmlns:xml='urn:p'/>",
       "the prefix xml and its namespace belong to each other alone at line 1, column 1"},
      {"<a xmlns:p='http://www.w3.org/XML/1998/namespace'/>",
       "the prefix xml and its namespace belong to each other alone at line 1, column 1"},
      {"<a xmlns='http://www.w3.org/XML/1998/namespace'/>",
       "the prefix xml and its namespace belong to each other alone at line 1, column 1"},
      {"<a xmlns:p='http://www.w3.org/2000/xmlns/'/>",
       "the namespace of declarations is bound to a prefix at line 1, column 1"},
      {"<a xmlns='http://www.w3.org/2000/xmlns/'/>",
       "the namespace of declarations is bound to a prefix at line 1, column 1"},
      {"<a xmlns:p='urn:1' xmlns:q='urn:1' p:x='' q:x=''/>", "duplicate attribute at line 1, column 1"},
      {"<r xmlns:p='urn:1'>\n<a q:x='' p:x='' xmlns:q='urn:1'/></r>",
       "duplicate attribute at line 2, column 1"},
      {"<r xmlns:p='urn:2'><a xmlns:q='urn:1'><b xmlns:p='urn:1' p:y='' q:x='' p:x=''/></a></r>",
       "duplicate attribute at line 1, column 39"},
      {"<?p:q?><a/>", "malformed processing instruction target at line 1, column 1"},
      {"<a><?p: d?></a>", "malformed processing instruction target at line 1, column 4"}};
  return refusals;
}

TEST(XMLParser, RefusesWithReasonLineAndColumn) {
  for (const Refusal& refusal : GetRefusals()) {
    EXPECT_EQ(Outcome(refusal.text, refusal.text.size() + 1), std::string("refused: ") + refusal.message)
        << refusal.text;
  }
}

TEST(XMLParser, DecidesTheSameOnSingleBytes) {
  for (const Refusal& refusal : GetRefusals()) {
    EXPECT_EQ(Outcome(refusal.text, 1), std::string("refused: ") + refusal.message) << refusal.text;
  }
  TestSupport::RandomXml random(3);
  for (int i = 0; i < 200; ++i) {
    const std::string text = random.MakeDocument();
    ASSERT_EQ(Outcome(text, 1), Outcome(text, text.size())) << text;
  }
}

TEST(XMLParser, RefusesEveryTruncation) {
  const std::string text =
      "<?xml version='1.0'?><!--c--><a xmlns:p='urn:p'><p:b x='&lt;'>t<![CDATA[u]]></p:b></a>";
  for (std::size_t size = 0; size < text.size(); ++size) {
    EXPECT_EQ(Outcome(text.substr(0, size), size + 1).rfind("refused: ", 0), 0u) << size;
  }
}

// ---- Limits

// Takes the events and forgets them, so that a limit can be reached without a tree.
class CountingHandler final : public XMLHandler {
 public:
  void StartElement(const NameRange&, const AttributeRange*, std::size_t, unsigned long,
                    unsigned long) override {
    ++elements;
  }
  void EndElement(bool) override {}
  void Characters(const char*, std::size_t size) override { characters += size; }
  void Comment(const char*) override {}
  void ProcessingInstruction(const char*, const char*) override {}
  Ref<Object> GetResult() override { return Ref<Object>(this); }

  std::size_t elements = 0;
  std::size_t characters = 0;
};

std::string LimitOutcome(const std::string& text) {
  Ref<Object> result;
  try {
    CreateXMLParser(MakeRef<CountingHandler>())->Parse(CreateStringReader(text).Get(), result);
  } catch (const XMLParseException& error) {
    return error.what();
  }
  return "accepted";
}

std::string Repeated(const std::string& text, std::size_t count) {
  std::string result;
  result.reserve(text.size() * count);
  for (std::size_t i = 0; i < count; ++i) {
    result += text;
  }
  return result;
}

std::string Nested(std::size_t depth) {
  return Repeated("<a>", depth) + Repeated("</a>", depth);
}

std::string Numbered(const std::string& before, std::size_t count, const std::string& after) {
  std::string result;
  for (std::size_t i = 0; i < count; ++i) {
    result.append(before).append(std::to_string(i)).append(after);
  }
  return result;
}

TEST(XMLParserLimits, BoundDepth) {
  EXPECT_EQ(LimitOutcome(Nested(kMaxElementDepth)), "accepted");
  EXPECT_EQ(LimitOutcome(Nested(kMaxElementDepth + 1)),
            "more than 256 elements inside each other at line 1, column 769");
  EXPECT_EQ(LimitOutcome(Repeated("<a>", 20000)),
            "more than 256 elements inside each other at line 1, column 769");
  EXPECT_EQ(LimitOutcome("<r>" + Repeated(Nested(kMaxElementDepth - 1), 3) + "</r>"), "accepted");
}

TEST(XMLParserLimits, BoundAttributesOfAnElement) {
  const auto document = [](std::size_t count) {
    return "<r>\n<a" + Numbered(" a", count, "=''") + "/></r>";
  };
  EXPECT_EQ(LimitOutcome(document(kMaxAttributesPerElement)), "accepted");
  EXPECT_EQ(LimitOutcome(document(kMaxAttributesPerElement + 1)),
            "more than 256 attributes on one element at line 2, column 1");
  EXPECT_EQ(LimitOutcome(document(20000)), "more than 256 attributes on one element at line 2, column 1");
}

TEST(XMLParserLimits, BoundNamespaceDeclarationsInScope) {
  const auto document = [](std::size_t outer, std::size_t inner) {
    return "<r" + Numbered(" xmlns:p", outer, "='urn:p'") + ">\n<a" +
           Numbered(" xmlns:p", inner, "='urn:q'") + "/></r>";
  };
  EXPECT_EQ(LimitOutcome(document(kMaxNamespaceDeclarationsInScope, 0)), "accepted");
  EXPECT_EQ(LimitOutcome(document(200, kMaxNamespaceDeclarationsInScope - 200)), "accepted");
  EXPECT_EQ(LimitOutcome(document(200, kMaxNamespaceDeclarationsInScope - 199)),
            "more than 256 namespace declarations in scope at line 2, column 1");
  EXPECT_EQ(LimitOutcome("<r>" + Repeated("<a" + Numbered(" xmlns:p", 255, "='urn:p'") + "/>", 3) + "</r>"),
            "accepted");
}

TEST(XMLParserLimits, BoundAttributesInScope) {
  const auto document = [](std::size_t innermost) {
    const std::string full = "<a" + Numbered(" a", kMaxAttributesPerElement, "=''");
    return full + ">\n<b" + Numbered(" a", kMaxAttributesPerElement - 1, "=''") + ">\n<c" +
           Numbered(" a", innermost, "=''") + "/><c b=''/></b></a>";
  };
  EXPECT_EQ(LimitOutcome(document(1)), "accepted");
  EXPECT_EQ(LimitOutcome(document(2)), "more than 512 attributes in scope at line 3, column 1");
  // Declarations count too.
  EXPECT_EQ(LimitOutcome("<a" + Numbered(" a", 256, "=''") + "><b" + Numbered(" a", 255, "=''") +
                         ">\n<c xmlns='urn:a' xmlns:p='urn:b'/></b></a>"),
            "more than 512 attributes in scope at line 2, column 1");
}

TEST(XMLParserLimits, BoundNamespaceUris) {
  const auto document = [](const std::string& declaration, std::size_t size) {
    return "<r>\n<a " + declaration + "='" + std::string(size, 'u') + "'/></r>";
  };
  for (const char* const declaration : {"xmlns", "xmlns:p"}) {
    EXPECT_EQ(LimitOutcome(document(declaration, kMaxNamespaceUriBytes)), "accepted");
    EXPECT_EQ(LimitOutcome(document(declaration, kMaxNamespaceUriBytes + 1)),
              "more than 2048 bytes in a namespace URI at line 2, column 1");
  }
  EXPECT_EQ(LimitOutcome(document("p", kMaxNamespaceUriBytes + 1)), "accepted");
}

TEST(XMLParserLimits, BoundNodes) {
  EXPECT_EQ(LimitOutcome("<r>" + Repeated("<a/>", kMaxNodes - 1) + "</r>"), "accepted");
  EXPECT_EQ(LimitOutcome("<r>\n" + Repeated("<a/>", kMaxNodes) + "</r>"),
            "more than 262144 nodes at line 2, column 1048573");
  EXPECT_EQ(LimitOutcome("<r>\n" + Repeated("<a b=''/>", kMaxNodes / 2) + "</r>"),
            "more than 262144 nodes at line 2, column 1179640");
  EXPECT_EQ(LimitOutcome("<r>\n" + Repeated("<!---->", kMaxNodes) + "</r>"),
            "more than 262144 nodes at line 2, column 1835002");
  EXPECT_EQ(LimitOutcome("<r>\n" + Repeated("<?p?>", kMaxNodes) + "</r>"),
            "more than 262144 nodes at line 2, column 1310716");
}

TEST(XMLParserLimits, BoundTheDocument) {
  const std::string within = "<a>" + std::string(kMaxDocumentBytes - 7, 'x') + "</a>";
  EXPECT_EQ(LimitOutcome(within), "accepted");
  EXPECT_EQ(LimitOutcome(within + " "), "more than 16777216 bytes at line 1, column 1");
}

class EndlessReader final : public Reader {
 public:
  std::size_t Read(char* buffer, std::size_t size) override {
    std::fill_n(buffer, size, ' ');
    given += size;
    return size;
  }

  std::size_t given = 0;
};

TEST(XMLParserLimits, EndAnEndlessReader) {
  const Ref<EndlessReader> reader = MakeRef<EndlessReader>();
  Ref<Object> result;
  EXPECT_THROW(CreateXMLParser(CreateXMLDocumentHandler())->Parse(reader.Get(), result), XMLParseException);
  EXPECT_EQ(reader->given, kMaxDocumentBytes + 1u);
}

TEST(XMLParserLimits, HoldForATextInMemory) {
  const std::string within = "<a>" + std::string(kMaxDocumentBytes - 7, 'x') + "</a>";
  Ref<Object> result;
  EXPECT_NO_THROW(CreateXMLParser(MakeRef<CountingHandler>())->Parse(within, result));
  result = nullptr;
  try {
    CreateXMLParser(MakeRef<CountingHandler>())->Parse(within + " ", result);
    ADD_FAILURE() << "accepted";
  } catch (const XMLParseException& error) {
    EXPECT_STREQ(error.what(), "more than 16777216 bytes at line 1, column 1");
  }
  EXPECT_EQ(result.Get(), nullptr);
}

TEST(XMLParser, ReadsATextInMemoryLikeAReader) {
  for (const std::string text : {"\xEF\xBB\xBF<a>\n<b/></a>", "<a><b></a>", "", "<a>\xC3\xA9</a>\xFF"}) {
    const auto outcome = [](auto&& source) -> std::string {
      Ref<Object> result;
      try {
        CreateXMLParser(CreateXMLDocumentHandler())->Parse(source, result);
        const Ref<StringWriter> writer = CreateStringWriter();
        ViewAsDocument(result)->GetDocumentElement()->WriteXml(writer.Get());
        return writer->GetText();
      } catch (const XMLParseException& error) {
        return error.what();
      }
    };
    const Ref<Reader> reader = CreateStringReader(text);
    EXPECT_EQ(outcome(text), outcome(reader.Get()));
  }
}

TEST(XMLParser, IsUsedOnceWhereverTheTextIs) {
  const Ref<XMLParser> parser = CreateXMLParser(CreateXMLDocumentHandler());
  Ref<Object> result;
  parser->Parse(std::string("<a/>"), result);
  EXPECT_THROW(parser->Parse(std::string("<a/>"), result), InvalidStateException);
  EXPECT_THROW(parser->Parse(CreateStringReader("<a/>").Get(), result), InvalidStateException);
}

// ---- Handlers

std::string Text(const TextRange& range) {
  EXPECT_EQ(range.data[range.size], '\0');
  return std::string(range.data, range.size);
}

class RecordingHandler final : public XMLHandler {
 public:
  void StartElement(const NameRange& name, const AttributeRange* attributes, std::size_t attributeCount,
                    unsigned long line, unsigned long column) override {
    events += "<" + Text(name.text);
    for (std::size_t i = 0; i < attributeCount; ++i) {
      events += " " + Text(attributes[i].name.text) + "=" + Text(attributes[i].value);
    }
    events += "@" + std::to_string(line) + ":" + std::to_string(column) + ">";
  }
  void EndElement(bool emptyTag) override { events += emptyTag ? "(empty)" : "(end)"; }
  void Characters(const char* text, std::size_t size) override { events.append(text, size); }
  void Comment(const char* text) override { events += "{" + std::string(text) + "}"; }
  void ProcessingInstruction(const char* target, const char* data) override {
    events += "[" + std::string(target) + "|" + data + "]";
  }
  Ref<Object> GetResult() override {
    events += "(result)";
    return Ref<Object>(this);
  }

  std::string events;
};

TEST(XMLParser, ReportsEventsInOrder) {
  const Ref<RecordingHandler> handler = MakeRef<RecordingHandler>();
  Ref<Object> result;
  CreateXMLParser(handler)->Parse(CreateStringReader("<?p d?><a x='1' y='2'>t<!--c-->\n<b/></a>").Get(),
                                  result);
  EXPECT_EQ(handler->events, "[p|d]<a x=1 y=2@1:8>t{c}\n<b@2:1>(empty)(end)(result)");
  EXPECT_EQ(result.Get(), handler.Get());
}

enum class Event { START, END, CHARACTERS, COMMENT, INSTRUCTION, RESULT };

class ThrowingHandler final : public XMLHandler {
 public:
  explicit ThrowingHandler(Event event) : _event(event) {}

  void StartElement(const NameRange&, const AttributeRange*, std::size_t, unsigned long,
                    unsigned long) override {
    Happened(Event::START);
  }
  void EndElement(bool) override { Happened(Event::END); }
  void Characters(const char*, std::size_t) override { Happened(Event::CHARACTERS); }
  void Comment(const char*) override { Happened(Event::COMMENT); }
  void ProcessingInstruction(const char*, const char*) override { Happened(Event::INSTRUCTION); }
  Ref<Object> GetResult() override {
    Happened(Event::RESULT);
    return Ref<Object>();
  }

  bool hasThrown = false;

 private:
  void Happened(Event event) {
    EXPECT_FALSE(hasThrown) << "an event after the failure";
    if (event == _event) {
      hasThrown = true;
      throw std::domain_error("from the handler");
    }
  }

  const Event _event;
};

TEST(XMLParser, PassesOnWhatAHandlerThrowsAndEndsThere) {
  for (const Event event :
       {Event::START, Event::END, Event::CHARACTERS, Event::COMMENT, Event::INSTRUCTION, Event::RESULT}) {
    const Ref<ThrowingHandler> handler = MakeRef<ThrowingHandler>(event);
    Ref<Object> result;
    const Ref<Reader> reader = CreateStringReader("<a>t<!--c--><?p?><b/></a>");
    EXPECT_THROW(CreateXMLParser(handler)->Parse(reader.Get(), result), std::domain_error);
    EXPECT_TRUE(handler->hasThrown);
    EXPECT_FALSE(result);
  }
}

TEST(XMLParser, RefusesMissingPartners) {
  EXPECT_THROW(CreateXMLParser(Ref<XMLHandler>()), InvalidArgumentException);
  Ref<Object> result;
  EXPECT_THROW(CreateXMLParser(CreateXMLDocumentHandler())->Parse(nullptr, result), InvalidArgumentException);
}

TEST(XMLParser, ServesOneDocument) {
  const Ref<XMLParser> parser = CreateXMLParser(CreateXMLDocumentHandler());
  Ref<Object> result;
  parser->Parse(CreateStringReader("<a/>").Get(), result);
  EXPECT_THROW(parser->Parse(CreateStringReader("<b/>").Get(), result), InvalidStateException);
  EXPECT_EQ(DescribeTree(ViewAsDocument(result).Get()), "document\n element |a\n");
}

TEST(XMLParser, PassesOnWhatTheReaderThrows) {
  class FailingReader final : public Reader {
   public:
    std::size_t Read(char*, std::size_t) override { throw std::domain_error("from the reader"); }
  };
  Ref<Object> result;
  EXPECT_THROW(CreateXMLParser(CreateXMLDocumentHandler())->Parse(MakeRef<FailingReader>().Get(), result),
               std::domain_error);
}

TEST(XMLParseException, CarriesReasonLineAndColumn) {
  const XMLParseException original("reason", 3, 7);
  const std::unique_ptr<Exception> clone(original.Clone());
  EXPECT_STREQ(clone->what(), "reason at line 3, column 7");
  try {
    clone->Throw();
    FAIL();
  } catch (const XMLParseException& error) {
    EXPECT_EQ(error.GetLine(), 3u);
    EXPECT_EQ(error.GetColumn(), 7u);
  }
}

}  // namespace
}  // namespace Xml
}  // namespace Pelmar
