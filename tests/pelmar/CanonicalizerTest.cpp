// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/XmlText.h"

#include <pelmar/Exception.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>
#include <pelmar/xml/security/Exceptions.h>

#include <gtest/gtest.h>

#include <fstream>
#include <functional>
#include <iterator>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {
namespace {

using TestSupport::CanonicalText;
using TestSupport::ParseXmlText;

const char* const kC14nOnTheWire = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315";

// Whole documents and the element in question are looked for by local name, in document order.
const ElementNode* FindElement(const Node* node, const std::string& localName) {
  const ElementNode* const element = AsElement(node);
  if (element != nullptr && element->GetLocalName() == localName) {
    return element;
  }
  for (const Node* child = node->GetFirstChild(); child != nullptr; child = child->GetNextSibling()) {
    const ElementNode* const found = FindElement(child, localName);
    if (found != nullptr) {
      return found;
    }
  }
  return nullptr;
}

std::string RootText(const std::string& text, const std::string& algorithm,
                     const std::vector<std::string>& prefixes = {}) {
  return CanonicalText(ParseXmlText(text)->GetDocumentElement(), algorithm, prefixes);
}

std::string SubtreeText(const std::string& text, const std::string& localName, const std::string& algorithm,
                        const std::vector<std::string>& prefixes = {}) {
  const Ref<Document> document = ParseXmlText(text);
  return CanonicalText(FindElement(document.Get(), localName), algorithm, prefixes);
}

std::string SecurityMessage(const std::function<void()>& action) {
  try {
    action();
  } catch (const XmlSecurityException& error) {
    return error.what();
  }
  return "nothing was thrown";
}

// ---- The standards' examples

std::string ReadVector(const std::string& name) {
  std::ifstream stream(std::string(QUORLIN_TEST_VECTORS_DIR) + "/c14n/" + name, std::ios::binary);
  if (!stream) {
    throw std::runtime_error("cannot read " + name);
  }
  return std::string(std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>());
}

std::string AlgorithmNamed(const std::string& name) {
  if (name == "inclusive") {
    return kC14n;
  }
  return name == "inclusive-commented" ? kC14nWithComments : kExclusiveC14n;
}

TEST(Canonicalizer, EqualsTheExamplesOfTheStandards) {
  std::istringstream cases(ReadVector("cases.txt"));
  std::size_t count = 0;
  for (std::string line; std::getline(cases, line);) {
    if (line[0] == '#') {
      continue;
    }
    SCOPED_TRACE(line);
    std::string input, algorithm, apex, prefix, expected;
    ASSERT_TRUE(std::istringstream(line) >> input >> algorithm >> apex >> prefix >> expected);
    const Ref<Document> document = ParseXmlText(ReadVector(input));
    const Node* const node =
        apex == "-" ? static_cast<const Node*>(document.Get()) : FindElement(document.Get(), apex);
    const std::vector<std::string> prefixes =
        prefix == "-" ? std::vector<std::string>() : std::vector<std::string>{prefix};
    EXPECT_EQ(CanonicalText(node, AlgorithmNamed(algorithm), prefixes), ReadVector(expected));
    ++count;
  }
  EXPECT_EQ(count, 15u);
}

// ---- Algorithms

TEST(Canonicalizer, KnowsTheInclusiveFormWithAndWithoutTheFinalHash) {
  EXPECT_EQ(RootText("<a xmlns:p='urn:p'/>", kC14n), "<a xmlns:p=\"urn:p\"></a>");
  EXPECT_EQ(RootText("<a xmlns:p='urn:p'/>", kC14nOnTheWire), "<a xmlns:p=\"urn:p\"></a>");
}

TEST(Canonicalizer, WritesCommentsOnlyWhenAsked) {
  const std::string text = "<a>x<!-- c -->y</a>";
  EXPECT_EQ(RootText(text, kC14n), "<a>xy</a>");
  EXPECT_EQ(RootText(text, kC14nWithComments), "<a>x<!-- c -->y</a>");
  EXPECT_EQ(RootText(text, kExclusiveC14n), "<a>xy</a>");
  EXPECT_EQ(RootText(text, kExclusiveC14nWithComments), "<a>x<!-- c -->y</a>");
}

TEST(Canonicalizer, RefusesEveryOtherAlgorithm) {
  for (const std::string algorithm :
       {"", "http://www.w3.org/2001/10/xml-exc-c14n", "http://www.w3.org/2006/12/xml-c14n11",
        "http://www.w3.org/TR/2001/REC-xml-c14n-20010315##",
        "http://www.w3.org/TR/2001/REC-xml-c14n-20010315#withcomments"}) {
    EXPECT_EQ(SecurityMessage([&] { CreateCanonicalizer(algorithm); }),
              "Unknown canonicalization algorithm '" + algorithm + "'");
  }
}

TEST(Canonicalizer, RefusesAPrefixListForTheInclusiveForms) {
  EXPECT_EQ(
      SecurityMessage([] { CreateCanonicalizer(kC14n, {"p"}); }),
      "Canonicalization algorithm 'http://www.w3.org/TR/2001/REC-xml-c14n-20010315#' takes no prefix list");
  EXPECT_EQ(RootText("<a/>", kC14n, {}), "<a></a>");
}

// ---- Namespaces

TEST(Canonicalizer, SortsDeclarationsByPrefixAndAttributesByNamespaceAndName) {
  EXPECT_EQ(
      RootText(
          "<a z='1' c:y='2' b:x='3' b:w='4' xmlns:c='urn:1' a='5' xmlns:b='urn:2' xmlns='urn:3' xml:lang='e'/>",
          kC14n),
      "<a xmlns=\"urn:3\" xmlns:b=\"urn:2\" xmlns:c=\"urn:1\" a=\"5\" z=\"1\" xml:lang=\"e\" c:y=\"2\" b:w=\"4\" b:x=\"3\"></a>");
}

TEST(Canonicalizer, TakesTheNearestOfShadowedDeclarationsAndXmlAttributes) {
  EXPECT_EQ(
      SubtreeText(
          "<a xmlns:p='urn:1' xmlns='urn:d' xml:lang='e' xml:base='b'><b xmlns:p='urn:2' xmlns='' xml:lang='f'>"
          "<c xml:base='c'/></b></a>",
          "c", kC14n),
      "<c xmlns:p=\"urn:2\" xml:base=\"c\" xml:lang=\"f\"></c>");
}

TEST(Canonicalizer, TakesTheDefaultNamespaceBackWhereItIsUsed) {
  const std::string text =
      "<a xmlns='urn:d'><b xmlns=''><c xmlns=''/></b><p:e xmlns:p='urn:p' xmlns=''><f/></p:e></a>";
  EXPECT_EQ(
      RootText(text, kC14n),
      "<a xmlns=\"urn:d\"><b xmlns=\"\"><c></c></b><p:e xmlns=\"\" xmlns:p=\"urn:p\"><f></f></p:e></a>");
  EXPECT_EQ(
      RootText(text, kExclusiveC14n),
      "<a xmlns=\"urn:d\"><b xmlns=\"\"><c></c></b><p:e xmlns:p=\"urn:p\"><f xmlns=\"\"></f></p:e></a>");
}

TEST(Canonicalizer, DeclaresExclusivelyWhereAPrefixIsVisiblyUsed) {
  EXPECT_EQ(
      RootText("<a xmlns:p='urn:p' xmlns:q='urn:q' v='p:x'><b p:y=''><p:c/></b><p:d/></a>", kExclusiveC14n),
      "<a v=\"p:x\"><b xmlns:p=\"urn:p\" p:y=\"\"><p:c></p:c></b><p:d xmlns:p=\"urn:p\"></p:d></a>");
}

TEST(Canonicalizer, TreatsListedPrefixesInclusively) {
  const std::string text =
      "<r xmlns='urn:d' xmlns:xs='urn:xs' xmlns:q='urn:q'><q:a><b t='xs:string'/></q:a></r>";
  EXPECT_EQ(SubtreeText(text, "a", kExclusiveC14n),
            "<q:a xmlns:q=\"urn:q\"><b xmlns=\"urn:d\" t=\"xs:string\"></b></q:a>");
  EXPECT_EQ(SubtreeText(text, "a", kExclusiveC14n, {"xs"}),
            "<q:a xmlns:q=\"urn:q\" xmlns:xs=\"urn:xs\"><b xmlns=\"urn:d\" t=\"xs:string\"></b></q:a>");
  EXPECT_EQ(SubtreeText(text, "a", kExclusiveC14n, {"#default", "absent"}),
            "<q:a xmlns=\"urn:d\" xmlns:q=\"urn:q\"><b t=\"xs:string\"></b></q:a>");
}

TEST(Canonicalizer, NeverDeclaresThePrefixXml) {
  const std::string text = "<a xmlns:xml='http://www.w3.org/XML/1998/namespace' xml:lang='e'/>";
  EXPECT_EQ(RootText(text, kC14n), "<a xml:lang=\"e\"></a>");
  EXPECT_EQ(RootText(text, kExclusiveC14n, {"xml"}), "<a xml:lang=\"e\"></a>");
}

TEST(Canonicalizer, EscapesNamespaceUris) {
  EXPECT_EQ(RootText("<p:a xmlns:p='urn:&amp;&lt;&quot;'/>", kExclusiveC14n),
            "<p:a xmlns:p=\"urn:&amp;&lt;&quot;\"></p:a>");
}

TEST(Canonicalizer, RefusesAnUndeclaredPrefix) {
  const char* const algorithms[] = {kC14n, kC14nWithComments, kExclusiveC14n, kExclusiveC14nWithComments};
  for (const std::string algorithm : algorithms) {
    SCOPED_TRACE(algorithm);
    EXPECT_EQ(SecurityMessage([&] { RootText("<a><p:b/></a>", algorithm); }),
              "Undeclared namespace prefix 'p' on element 'p:b'");
    EXPECT_EQ(SecurityMessage([&] { RootText("<a xmlns:p='urn:p'><p:b p:x='' q:y=''/></a>", algorithm); }),
              "Undeclared namespace prefix 'q' on element 'p:b'");
    EXPECT_EQ(SecurityMessage([&] { RootText("<a><b xmlns:p='urn:p'/><p:c/></a>", algorithm); }),
              "Undeclared namespace prefix 'p' on element 'p:c'");
  }
}

// Canonical XML 1.0, section 1.3.
TEST(Canonicalizer, TakesEveryKindOfScheme) {
  for (const std::string uri : {"urn:x", "URN:x", "a1:x", "a9+b-c.d:x"}) {
    EXPECT_EQ(SubtreeText("<a><b xmlns='" + uri + "'/></a>", "b", kExclusiveC14n),
              "<b xmlns=\"" + uri + "\"></b>");
  }
}

TEST(Canonicalizer, RefusesARelativeNamespaceUri) {
  for (const std::string uri : {"relative", "../up", "/path", "#part", ":", "1a:b", "a/b:c"}) {
    SCOPED_TRACE(uri);
    EXPECT_EQ(SecurityMessage([&] { RootText("<a><b xmlns:p='" + uri + "'/></a>", kExclusiveC14n); }),
              "Relative namespace URI on element 'b'");
  }
  EXPECT_EQ(SecurityMessage([] { SubtreeText("<a xmlns='relative'><b/></a>", "b", kC14n); }),
            "Relative namespace URI on element 'a'");
}

// ---- What is written

TEST(Canonicalizer, WritesNothingForNull) {
  EXPECT_EQ(CanonicalText(nullptr, kC14n), "");
}

TEST(Canonicalizer, WritesAnElementWithoutItsSurroundings) {
  EXPECT_EQ(RootText("<!-- c --><?p d?><a/><!-- e -->", kC14nWithComments), "<a></a>");
}

TEST(Canonicalizer, WritesADocumentWithItsSurroundings) {
  const Ref<Document> document = ParseXmlText("\n<!--1--> <?p d?><a>\n</a><!--2-->\n");
  EXPECT_EQ(CanonicalText(document.Get(), kExclusiveC14nWithComments),
            "<!--1-->\n<?p d?>\n<a>\n</a>\n<!--2-->");
}

TEST(Canonicalizer, RefusesANodeThatIsNeitherDocumentNorElement) {
  const Ref<Document> document = ParseXmlText("<a>text</a>");
  const Node* const text = document->GetDocumentElement()->GetFirstChild();
  EXPECT_EQ(SecurityMessage([&] { CanonicalText(text, kC14n); }),
            "Only a document or an element can be canonicalized");
}

TEST(Canonicalizer, RefusesADocumentWithoutElement) {
  const Ref<Document> document = ParseXmlText("<a/>");
  document->RemoveChild(document->GetDocumentElement());
  EXPECT_EQ(SecurityMessage([&] { CanonicalText(document.Get(), kC14n); }),
            "Only a document or an element can be canonicalized");
}

TEST(Canonicalizer, RefusesANullWriter) {
  const Ref<Document> document = ParseXmlText("<a/>");
  const Ref<Canonicalizer> canonicalizer = CreateCanonicalizer(kC14n);
  EXPECT_THROW(canonicalizer->Canonicalize(document.Get(), nullptr), InvalidArgumentException);
}

TEST(Canonicalizer, OmitsTheGivenSubtreeAndNothingElse) {
  const Ref<Document> document = ParseXmlText("<a xmlns:p='urn:p'>1<s><p:t/>2</s>3<s/></a>");
  const Node* const omitted = FindElement(document.Get(), "s");
  EXPECT_EQ(CanonicalText(document->GetDocumentElement(), kC14n, {}, omitted),
            "<a xmlns:p=\"urn:p\">13<s></s></a>");
  EXPECT_EQ(CanonicalText(document.Get(), kExclusiveC14n, {}, omitted), "<a>13<s></s></a>");
}

TEST(Canonicalizer, OmitsTheOnlyChild) {
  const Ref<Document> document = ParseXmlText("<a><s/></a>");
  EXPECT_EQ(CanonicalText(document.Get(), kC14n, {}, FindElement(document.Get(), "s")), "<a></a>");
}

TEST(Canonicalizer, RefusesToOmitEverything) {
  const Ref<Document> document = ParseXmlText("<!-- c --><a><b><c/></b></a>");
  const Node* const b = FindElement(document.Get(), "b");
  for (const Node* const omitted : std::vector<const Node*>{b, b->GetParent(), document.Get()}) {
    EXPECT_EQ(SecurityMessage([&] { CanonicalText(b, kC14n, {}, omitted); }),
              "Nothing would be left of the canonicalized element");
  }
  EXPECT_EQ(SecurityMessage([&] {
              CanonicalText(document.Get(), kC14nWithComments, {}, document->GetDocumentElement());
            }),
            "Nothing would be left of the canonicalized element");
}

// ---- Size and failure

// The text passes a buffer; wherever its bounds fall, nothing is lost.
TEST(Canonicalizer, KeepsTextOfEveryLengthWhole) {
  for (std::size_t size = 4080; size < 4110; ++size) {
    const std::string text(size, 'x');
    ASSERT_EQ(RootText("<a>&lt;" + text + "&#13;</a>", kC14n), "<a>&lt;" + text + "&#xD;</a>") << size;
  }
  const std::string large(100000, 'y');
  EXPECT_EQ(RootText("<a b='" + large + "'>" + large + "&amp;" + large + "</a>", kC14n),
            "<a b=\"" + large + "\">" + large + "&amp;" + large + "</a>");
}

TEST(Canonicalizer, NeedsNoStackForADeepTree) {
  constexpr std::size_t kDepth = 200000;
  Ref<ElementNode> root;
  CreateElementNode("", "a", root);
  ElementNode* innermost = root.Get();
  std::string expected = "<a>";
  for (std::size_t i = 1; i < kDepth; ++i) {
    Ref<ElementNode> child;
    CreateElementNode("", "a", child);
    innermost->AppendChild(child);
    innermost = child.Get();
    expected += "<a>";
  }
  for (std::size_t i = 0; i < kDepth; ++i) {
    expected += "</a>";
  }
  EXPECT_TRUE(CanonicalText(root.Get(), kExclusiveC14n) == expected);
}

class FailingWriter final : public Writer {
 public:
  void Write(const char*, std::size_t) override { throw std::runtime_error("disk full"); }
};

TEST(Canonicalizer, PassesOnWhatTheWriterThrows) {
  const Ref<Document> document = ParseXmlText("<a/>");
  const Ref<Writer> writer = MakeRef<FailingWriter>();
  EXPECT_THROW(CreateCanonicalizer(kC14n)->Canonicalize(document.Get(), writer.Get()), std::runtime_error);
}

TEST(Canonicalizer, MayBeUsedAgainAfterAFailure) {
  const Ref<Canonicalizer> canonicalizer = CreateCanonicalizer(kExclusiveC14n);
  const Ref<Document> bad = ParseXmlText("<a xmlns:p='urn:p'><p:b><q:c/></p:b></a>");
  const Ref<Document> good = ParseXmlText("<p:a xmlns:p='urn:p'/>");
  EXPECT_THROW(canonicalizer->Canonicalize(bad.Get(), CreateStringWriter().Get()), XmlSecurityException);
  const Ref<StringWriter> writer = CreateStringWriter();
  canonicalizer->Canonicalize(good.Get(), writer.Get());
  EXPECT_EQ(writer->GetText(), "<p:a xmlns:p=\"urn:p\"></p:a>");
}

// ---- Elements that are like each other

// The same tree, in which nothing is shared with anything.
Ref<ElementNode> MakeCopy(const ElementNode* element) {
  Ref<ElementNode> copy;
  CreateElementNode(element->GetPrefix(), element->GetLocalName(), copy);
  for (const Attribute& attribute : element->GetAttributes()) {
    copy->DefineAttribute(attribute.name, attribute.value);
  }
  for (const Node* child = element->GetFirstChild(); child != nullptr; child = child->GetNextSibling()) {
    if (const TextNode* const text = AsText(child)) {
      Ref<TextNode> textCopy;
      CreateTextNode(textCopy);
      textCopy->SetText(text->GetText());
      copy->AppendChild(textCopy);
    } else if (const ElementNode* const childElement = AsElement(child)) {
      copy->AppendChild(MakeCopy(childElement));
    }
  }
  return copy;
}

void ExpectSameAsCopy(const std::string& text) {
  const Ref<Document> document = ParseXmlText(text);
  const Ref<ElementNode> copy = MakeCopy(document->GetDocumentElement());
  for (const char* const algorithm : {kC14nOnTheWire, kExclusiveC14n, kExclusiveC14nWithComments}) {
    EXPECT_EQ(CanonicalText(document->GetDocumentElement(), algorithm), CanonicalText(copy.Get(), algorithm));
  }
}

TEST(Canonicalizer, WritesSiblingsThatAreAlikeAlike) {
  const std::string a = "<p:a q:t='1' s='&lt;'>";
  EXPECT_EQ(
      RootText("<r xmlns:p='urn:p' xmlns:q='urn:q'>" + a + "1</p:a>" + a + "2</p:a> " + a + "</p:a></r>",
               kExclusiveC14n),
      "<r><p:a xmlns:p=\"urn:p\" xmlns:q=\"urn:q\" s=\"&lt;\" q:t=\"1\">1</p:a>"
      "<p:a xmlns:p=\"urn:p\" xmlns:q=\"urn:q\" s=\"&lt;\" q:t=\"1\">2</p:a> "
      "<p:a xmlns:p=\"urn:p\" xmlns:q=\"urn:q\" s=\"&lt;\" q:t=\"1\"></p:a></r>");
}

// The prefixes of equal tags stand for what the nearest declarations say.
TEST(Canonicalizer, TellsElementsApartThatOnlyLookAlike) {
  const std::string a = "<p:a p:t='1'>1</p:a>";
  EXPECT_EQ(RootText("<r xmlns:p='urn:1'>" + a + "<b xmlns:p='urn:2'>" + a + "</b>" + a + "<b>" + a +
                         "</b><p:a p:t='1'><p:a p:t='1'/></p:a></r>",
                     kExclusiveC14n),
            "<r><p:a xmlns:p=\"urn:1\" p:t=\"1\">1</p:a><b><p:a xmlns:p=\"urn:2\" p:t=\"1\">1</p:a></b>"
            "<p:a xmlns:p=\"urn:1\" p:t=\"1\">1</p:a><b><p:a xmlns:p=\"urn:1\" p:t=\"1\">1</p:a></b>"
            "<p:a xmlns:p=\"urn:1\" p:t=\"1\"><p:a p:t=\"1\"></p:a></p:a></r>");
  EXPECT_EQ(
      RootText("<r><a t='1' u='2'/><a t='1'/><b t='1'/><b t='2'/><b/><b/><b t='1'/></r>", kExclusiveC14n),
      "<r><a t=\"1\" u=\"2\"></a><a t=\"1\"></a><b t=\"1\"></b><b t=\"2\"></b><b></b><b></b>"
      "<b t=\"1\"></b></r>");
}

// Declarations of their own, children, the buffer's end at each byte of a tag, and tags longer than it.
TEST(Canonicalizer, WritesElementsThatAreAlikeLikeOthers) {
  ExpectSameAsCopy("<r xmlns:p='urn:1'><a xmlns:p='urn:2' p:t='1'/><a xmlns:p='urn:2' p:t='1'/><p:a/></r>");
  ExpectSameAsCopy("<r xmlns:p='urn:1'><a p:t='1'/><a p:t='1'><a p:t='1'/><a p:t='1'/></a><a p:t='1'/></r>");
  ExpectSameAsCopy("<r><a xmlns='urn:1'/><a xmlns='urn:1'/><a/><a/><a xmlns=''/><a xmlns=''/></r>");
  for (std::size_t shift = 0; shift < 64; ++shift) {
    std::string text = "<r xmlns:p='urn:1'>" + std::string(4000 + shift, '.');
    for (int i = 0; i < 8; ++i) {
      text += "<a p:t='" + std::string(i < 6 ? 9 : 5000, 'v') + "'>text</a>";
    }
    ExpectSameAsCopy(text + "</r>");
  }
}

// What is left out stays out, also when it is like what is not.
TEST(Canonicalizer, LeavesOutOneOfElementsThatAreAlike) {
  const Ref<Document> document = ParseXmlText("<r><a t='1'>1</a><a t='1'>2</a><a t='1'>3</a></r>");
  const Node* const second = document->GetDocumentElement()->GetFirstChild()->GetNextSibling();
  EXPECT_EQ(CanonicalText(document.Get(), kExclusiveC14n, {}, second),
            "<r><a t=\"1\">1</a><a t=\"1\">3</a></r>");
}

// An attribute that is added after parsing belongs to one element only.
TEST(Canonicalizer, SeesWhatWasAddedToOneOfElementsThatAreAlike) {
  const Ref<Document> document = ParseXmlText("<r><a t='1'>1</a><a t='1'>2</a><a t='1'>3</a></r>");
  AsElement(document->GetDocumentElement()->GetFirstChild()->GetNextSibling())->DefineAttribute("s", "2");
  EXPECT_EQ(CanonicalText(document.Get(), kExclusiveC14n),
            "<r><a t=\"1\">1</a><a s=\"2\" t=\"1\">2</a><a t=\"1\">3</a></r>");
}

// ---- The exceptions

TEST(XmlSecurityException, KeepsItsClassAndTextInCopies) {
  const XmlSecurityException original("reason");
  const std::unique_ptr<Exception> clone(original.Clone());
  EXPECT_STREQ(clone->what(), "reason");
  EXPECT_THROW(clone->Throw(), XmlSecurityException);
}

TEST(SignatureSyntaxException, KeepsItsClassAndTextInCopies) {
  const SignatureSyntaxException original("reason");
  const std::unique_ptr<Exception> clone(original.Clone());
  EXPECT_STREQ(clone->what(), "reason");
  EXPECT_THROW(clone->Throw(), SignatureSyntaxException);
}

}  // namespace
}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
