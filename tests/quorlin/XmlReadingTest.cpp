// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/xmlReading.h"

#include "quorlin/Namespaces.h"
#include "support/Verdict.h"
#include "support/VirtualSlot.h"
#include "support/XmlText.h"

#include <pelmar/Exception.h>
#include <pelmar/system/DateTime.h>
#include <quorlin/Exceptions.h>

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <string>
#include <type_traits>
#include <vector>

namespace Quorlin {
namespace {

using Pelmar::Ref;
using Pelmar::Xml::Document;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;
using Pelmar::Xml::QName;
using TestSupport::ParseXmlText;
using TestSupport::VerdictOf;

const char* const kParseException = "Quorlin::ParseException: ";

std::string Refused(const std::string& message) {
  return kParseException + message;
}

NodeFilterIterator Iterate(Node* node) {
  return NodeFilterIterator(node, boost::make_shared<SkipWsAndCommentsFilter>());
}

/// A parsed text whose document element the tests work on.
class Parsed final {
 public:
  explicit Parsed(const std::string& text) : _document(ParseXmlText(text)) {}

  ElementNode* Root() const { return _document->GetDocumentElement(); }
  NodeFilterIterator It() const { return Iterate(Root()); }

 private:
  Ref<Document> _document;
};

std::string NamesOfChildren(const std::string& text) {
  const Parsed parsed(text);
  std::string names;
  for (NodeFilterIterator it = parsed.It().GetChild(); it.node != nullptr; it.MoveToSibling()) {
    const ElementNode* const element = IteratorToElement(it);
    names += element != nullptr ? "<" + element->GetLocalName() + ">" : "(not an element)";
  }
  return names;
}

// --- Filter and iterator ---

TEST(NodeFilterIterator, PassesOverCommentsAndWhiteSpaceOnly) {
  EXPECT_EQ(NamesOfChildren("<r><a/><!--c--><b/></r>"), "<a><b>");
  EXPECT_EQ(NamesOfChildren("<r> <a/>\t\n\r <b/> </r>"), "<a><b>");
  EXPECT_EQ(NamesOfChildren("<r><a/>x<b/></r>"), "<a>(not an element)<b>");
  EXPECT_EQ(NamesOfChildren("<r><!--c--> </r>"), "");
  EXPECT_EQ(NamesOfChildren("<r/>"), "");
}

TEST(NodeFilterIterator, StopsAtProcessingInstructions) {
  EXPECT_EQ(NamesOfChildren("<r><a/><?p d?><b/></r>"), "<a>(not an element)<b>");
}

TEST(NodeFilterIterator, StopsAtWhiteSpaceThatXmlDoesNotCountAsSuch) {
  EXPECT_EQ(NamesOfChildren("<r><a/>\xC2\xA0<b/></r>"), "<a>(not an element)<b>");
  EXPECT_EQ(NamesOfChildren("<r><a/>\xE2\x80\x83<b/></r>"), "<a>(not an element)<b>");
}

TEST(NodeFilterIterator, SeesWhiteSpaceOfReferencesAndCDataAsWhiteSpace) {
  EXPECT_EQ(NamesOfChildren("<r>&#32;&#9;&#10;&#13;<a/><![CDATA[ ]]></r>"), "<a>");
}

TEST(NodeFilterIterator, DoesNotFilterTheNodeItStartsOn) {
  const Parsed parsed("<r><!--c--><a/></r>");
  Node* const comment = parsed.Root()->GetFirstChild();
  EXPECT_EQ(Iterate(comment).node, comment);
}

TEST(NodeFilterIterator, GivesAChildWithoutMovingItself) {
  const Parsed parsed("<r> <a/></r>");
  const NodeFilterIterator it = parsed.It();
  EXPECT_EQ(IteratorToElement(it.GetChild())->GetLocalName(), "a");
  EXPECT_EQ(it.node, parsed.Root());
}

TEST(NodeFilterIterator, ReturnsItselfFromEveryMove) {
  const Parsed parsed("<r><a/><b/></r>");
  NodeFilterIterator it = parsed.It();
  EXPECT_EQ(&it.MoveToChild(), &it);
  EXPECT_EQ(&it.MoveToSibling(), &it);
  EXPECT_EQ(IteratorToElement(it)->GetLocalName(), "b");
}

TEST(NodeFilterIterator, IsAtItsEndAfterTheLastSibling) {
  const Parsed parsed("<r><a/> <!--c--></r>");
  NodeFilterIterator it = parsed.It().GetChild();
  EXPECT_EQ(it.MoveToSibling().node, nullptr);
  EXPECT_EQ(IteratorToElement(it), nullptr);
}

TEST(NodeFilterIterator, SharesItsFilterWithCopies) {
  const Parsed parsed("<r/>");
  const NodeFilterIterator it = parsed.It();
  NodeFilterIterator copy(it);
  EXPECT_EQ(copy.filter, it.filter);
  EXPECT_EQ(copy.node, it.node);
  NodeFilterIterator assigned(nullptr, nullptr);
  assigned = it;
  EXPECT_EQ(assigned.filter, it.filter);
  EXPECT_EQ(assigned.node, it.node);
}

TEST(NodeFilterIteratorDeathTest, AbortsWhenItMovesWithoutAFilter) {
  const Parsed parsed("<r><a/><b/></r>");
  NodeFilterIterator it(parsed.Root()->GetFirstChild(), boost::shared_ptr<const NodeFilter>());
  EXPECT_DEATH(it.MoveToSibling(), "px != 0");
}

TEST(IteratorToElement, GivesNullForOtherNodes) {
  const Parsed parsed("<r>x</r>");
  EXPECT_EQ(IteratorToElement(parsed.It()), parsed.Root());
  EXPECT_EQ(IteratorToElement(parsed.It().GetChild()), nullptr);
  EXPECT_EQ(IteratorToElement(Iterate(nullptr)), nullptr);
}

TEST(NodeFilter, HasOneOperationAndNoVirtualDestructor) {
  EXPECT_EQ(TestSupport::SlotOf(&NodeFilter::Accept), 0);
  EXPECT_FALSE(std::has_virtual_destructor<NodeFilter>::value);
}

TEST(SkipWsAndCommentsFilter, RejectsAnEmptyText) {
  Ref<Pelmar::Xml::TextNode> text;
  Pelmar::Xml::CreateTextNode(text);
  EXPECT_FALSE(SkipWsAndCommentsFilter().Accept(text.Get()));
}

// --- Names ---

TEST(LocalName, IsInNoNamespace) {
  EXPECT_EQ(LocalName("Count"), QName("", "Count"));
}

TEST(KnownNames, AreThoseOfTheStandards) {
  EXPECT_EQ(kXsiType, QName("http://www.w3.org/2001/XMLSchema-instance", "type"));
  EXPECT_EQ(kKeyInfoConfirmationDataType,
            QName("urn:oasis:names:tc:SAML:2.0:assertion", "KeyInfoConfirmationDataType"));
  EXPECT_EQ(kDelegationRestrictionType,
            QName("urn:oasis:names:tc:SAML:2.0:conditions:delegation", "DelegationRestrictionType"));
  EXPECT_EQ(kRenewRestrictionType,
            QName(QUORLIN_VENDOR_URI_BASE "/names/2009/12/std-ext/SAML2.0", "RenewRestrictionType"));
}

TEST(ElementQNameIs, ComparesLocalNameAndResolvedNamespace) {
  const Parsed prefixed("<p:a xmlns:p='urn:x'/>");
  EXPECT_TRUE(ElementQNameIs(prefixed.Root(), "a", "urn:x"));
  EXPECT_FALSE(ElementQNameIs(prefixed.Root(), "A", "urn:x"));
  EXPECT_FALSE(ElementQNameIs(prefixed.Root(), "p:a", "urn:x"));
  EXPECT_FALSE(ElementQNameIs(prefixed.Root(), "a", "urn:X"));
  EXPECT_FALSE(ElementQNameIs(prefixed.Root(), "a", ""));
  EXPECT_TRUE(ElementQNameIs(Parsed("<a xmlns='urn:x'/>").Root(), "a", "urn:x"));
}

TEST(ElementQNameIs, IsFalseWithoutAnElementOrADeclaration) {
  EXPECT_FALSE(ElementQNameIs(nullptr, "a", "urn:x"));
  EXPECT_FALSE(ElementQNameIs(Parsed("<p:a/>").Root(), "a", "urn:x"));
  EXPECT_FALSE(ElementQNameIs(Parsed("<a/>").Root(), "a", "urn:x"));
}

std::string Resolve(const std::string& elementText, const std::string& name,
                    const std::string& defaultNamespace = "") {
  const Parsed parsed(elementText);
  QName result("unchanged", "unchanged");
  const std::string verdict = VerdictOf([&] { ResolveQName(parsed.Root(), name, defaultNamespace, result); });
  return verdict == "accepted" ? "{" + result.GetNamespace() + "}" + result.GetLocalName() : verdict;
}

TEST(ResolveQName, PutsUnprefixedNamesInTheDefaultNamespace) {
  EXPECT_EQ(Resolve("<e/>", "n", "urn:d"), "{urn:d}n");
  EXPECT_EQ(Resolve("<e xmlns='urn:ignored'/>", "n"), "{}n");
  EXPECT_EQ(Resolve("<e/>", "", "urn:d"), "{urn:d}");
}

TEST(ResolveQName, ResolvesPrefixesInScope) {
  EXPECT_EQ(Resolve("<e xmlns:p='urn:p'/>", "p:n", "urn:d"), "{urn:p}n");
  EXPECT_EQ(Resolve("<e xmlns:p='urn:p'/>", "p:n:m"), "{urn:p}n:m");
  EXPECT_EQ(Resolve("<e xmlns:p='urn:p'/>", "p:"), "{urn:p}");
}

TEST(ResolveQName, NamesElementPlaceAndPrefixOfAnUndeclaredOne) {
  EXPECT_EQ(Resolve("<Condition/>", "foo:n"),
            Refused("Element Conditionat 1,1 uses undefined prefix: `foo'"));
  EXPECT_EQ(Resolve("<e xmlns:p='urn:p'/>", ":n"), Refused("Element eat 1,1 uses undefined prefix: `'"));
  EXPECT_EQ(Resolve("<e xmlns:p='urn:p'/>", "P:n"), Refused("Element eat 1,1 uses undefined prefix: `P'"));
}

TEST(ResolveQName, CountsLinesAndColumnsFromOne) {
  const Parsed parsed("<r>\n\n      <Condition/></r>");
  const ElementNode* const condition = IteratorToElement(parsed.It().GetChild());
  QName result;
  EXPECT_EQ(VerdictOf([&] { ResolveQName(condition, "foo:n", "", result); }),
            Refused("Element Conditionat 3,7 uses undefined prefix: `foo'"));
}

TEST(ElementXsiTypeIs, ResolvesAnUnprefixedTypeInTheDefaultNamespace) {
  const std::string xsi = " xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance'";
  const std::string type = " xsi:type='KeyInfoConfirmationDataType'";
  const std::string saml = " xmlns='urn:oasis:names:tc:SAML:2.0:assertion'";
  EXPECT_TRUE(ElementXsiTypeIs(Parsed("<e" + xsi + saml + type + "/>").Root(), kKeyInfoConfirmationDataType));
  EXPECT_FALSE(ElementXsiTypeIs(Parsed("<e" + xsi + type + "/>").Root(), kKeyInfoConfirmationDataType));
}

TEST(ElementXsiTypeIs, ResolvesPrefixesOfAttributeAndValue) {
  const std::string bound =
      "<e xmlns:i='http://www.w3.org/2001/XMLSchema-instance' xmlns:s='urn:oasis:names:tc:SAML:2.0:assertion'";
  EXPECT_TRUE(ElementXsiTypeIs(Parsed(bound + " i:type='s:KeyInfoConfirmationDataType'/>").Root(),
                               kKeyInfoConfirmationDataType));
  EXPECT_FALSE(ElementXsiTypeIs(Parsed(bound + " i:type='i:KeyInfoConfirmationDataType'/>").Root(),
                                kKeyInfoConfirmationDataType));
  EXPECT_FALSE(ElementXsiTypeIs(Parsed(bound + " i:type='s:keyInfoConfirmationDataType'/>").Root(),
                                kKeyInfoConfirmationDataType));
}

TEST(ElementXsiTypeIs, IsFalseWithoutTheAttribute) {
  EXPECT_FALSE(ElementXsiTypeIs(Parsed("<e type='KeyInfoConfirmationDataType'/>").Root(),
                                kKeyInfoConfirmationDataType));
  EXPECT_FALSE(ElementXsiTypeIs(Parsed("<e xmlns:xsi='urn:other' xsi:type='x'/>").Root(),
                                kKeyInfoConfirmationDataType));
}

TEST(ElementXsiTypeIs, RefusesAnUndeclaredPrefixInTheValue) {
  const Parsed parsed("<e xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance' xsi:type='p:t'/>");
  EXPECT_EQ(VerdictOf([&] { ElementXsiTypeIs(parsed.Root(), kKeyInfoConfirmationDataType); }),
            Refused("Element eat 1,1 uses undefined prefix: `p'"));
}

// --- Requirements on elements ---

std::string RequireNamed(const ElementNode* element) {
  return VerdictOf([&] { RequireElementQName(element, "Subject", "urn:x"); });
}

TEST(RequireElementQName, TellsMissingElementsFromWrongNamespaces) {
  EXPECT_EQ(RequireNamed(Parsed("<p:Subject xmlns:p='urn:x'/>").Root()), "accepted");
  EXPECT_EQ(RequireNamed(nullptr), Refused("Expected element 'Subject' not found."));
  EXPECT_EQ(RequireNamed(Parsed("<Object xmlns='urn:x'/>").Root()),
            Refused("Expected element 'Subject' not found."));
  EXPECT_EQ(RequireNamed(Parsed("<subject xmlns='urn:x'/>").Root()),
            Refused("Expected element 'Subject' not found."));
  EXPECT_EQ(RequireNamed(Parsed("<Subject xmlns='urn:y'/>").Root()),
            Refused("Element 'Subject' has unexpected namespace"));
  EXPECT_EQ(RequireNamed(Parsed("<Subject/>").Root()), Refused("Element 'Subject' has unexpected namespace"));
  EXPECT_EQ(RequireNamed(Parsed("<p:Subject/>").Root()),
            Refused("Element 'Subject' has unexpected namespace"));
}

std::string RequireEmpty(const std::string& text) {
  const Parsed parsed(text);
  return VerdictOf([&] { RequireEmptyElement(parsed.It()); });
}

TEST(RequireEmptyElement, AllowsWhiteSpaceAndCommentsOnly) {
  const std::string refused = Refused("Element 'e' must be empty");
  EXPECT_EQ(RequireEmpty("<e/>"), "accepted");
  EXPECT_EQ(RequireEmpty("<e></e>"), "accepted");
  EXPECT_EQ(RequireEmpty("<e> </e>"), "accepted");
  EXPECT_EQ(RequireEmpty("<e>\n<!--c-->\t</e>"), "accepted");
  EXPECT_EQ(RequireEmpty("<e>x</e>"), refused);
  EXPECT_EQ(RequireEmpty("<p:e xmlns:p='urn:x'><a/></p:e>"), refused);
  EXPECT_EQ(RequireEmpty("<e> <!--c--><a/></e>"), refused);
  EXPECT_EQ(RequireEmpty("<e><?p?></e>"), refused);
  EXPECT_EQ(RequireEmpty("<e><![CDATA[x]]></e>"), refused);
}

std::string TextOf(const std::string& text) {
  const Parsed parsed(text);
  std::string content = "unchanged";
  const std::string verdict = VerdictOf([&] { RequireTextualContent(parsed.It(), content); });
  return verdict == "accepted" ? "(" + content + ")" : verdict;
}

TEST(RequireTextualContent, GivesTheOneTextUntrimmed) {
  EXPECT_EQ(TextOf("<e>x</e>"), "(x)");
  EXPECT_EQ(TextOf("<e> x y </e>"), "( x y )");
  EXPECT_EQ(TextOf("<e><!--c-->x</e>"), "(x)");
  EXPECT_EQ(TextOf("<e>x<!--c--></e>"), "(x)");
  EXPECT_EQ(TextOf("<e>x<!--c--> <!--d--></e>"), "(x)");
  EXPECT_EQ(TextOf("<e>a&amp;<![CDATA[b]]>&#99;</e>"), "(a&bc)");
}

TEST(RequireTextualContent, RefusesAnythingThatSplitsOrReplacesTheText) {
  const std::string refused = Refused("Element 'e' must only have textual content");
  EXPECT_EQ(TextOf("<e>x<!--c-->y</e>"), refused);
  EXPECT_EQ(TextOf("<e>x<?p?>y</e>"), refused);
  EXPECT_EQ(TextOf("<e>x<?p?></e>"), refused);
  EXPECT_EQ(TextOf("<e><?p?>x</e>"), refused);
  EXPECT_EQ(TextOf("<e>x<a/></e>"), refused);
  EXPECT_EQ(TextOf("<e><a/></e>"), refused);
  EXPECT_EQ(TextOf("<e><a>x</a></e>"), refused);
}

TEST(RequireTextualContent, RefusesNoContent) {
  const std::string refused = Refused("Element 'e' must only have textual content");
  EXPECT_EQ(TextOf("<e/>"), refused);
  EXPECT_EQ(TextOf("<e>  </e>"), refused);
  EXPECT_EQ(TextOf("<e> <!--c--> </e>"), refused);
}

// --- Requirements on attributes ---

std::string RequireNames(const std::string& text, const std::vector<std::string>& required,
                         const std::vector<std::string>& allowed) {
  const Parsed parsed(text);
  return VerdictOf([&] { RequireElementAttributesNames(parsed.Root(), required, allowed); });
}

TEST(RequireElementAttributesNames, AcceptsRequiredAndAllowedOnes) {
  EXPECT_EQ(RequireNames("<e a='1'/>", {"a"}, {}), "accepted");
  EXPECT_EQ(RequireNames("<e a='1' b='2'/>", {"a"}, {"b", "c"}), "accepted");
  EXPECT_EQ(RequireNames("<e p:a='1'/>", {"p:a"}, {}), "accepted");
}

TEST(RequireElementAttributesNames, NamesTheFirstMissingOneOfTheList) {
  EXPECT_EQ(RequireNames("<e/>", {"b", "a"}, {}), Refused("Node 'e is missing required attribute 'b'"));
  EXPECT_EQ(RequireNames("<e b=''/>", {"b", "a"}, {}), Refused("Node 'e is missing required attribute 'a'"));
  EXPECT_EQ(RequireNames("<e A='1'/>", {"a"}, {}), Refused("Node 'e is missing required attribute 'a'"));
  EXPECT_EQ(RequireNames("<e p:a='1'/>", {"a"}, {}), Refused("Node 'e is missing required attribute 'a'"));
}

TEST(RequireElementAttributesNames, ReportsMissingOnesBeforeUnexpectedOnes) {
  EXPECT_EQ(RequireNames("<e x='1'/>", {"a"}, {}), Refused("Node 'e is missing required attribute 'a'"));
}

TEST(RequireElementAttributesNames, RefusesUnexpectedOnesWithoutNamingThem) {
  const std::string refused = Refused("Unexpected attributes on element 'e'");
  EXPECT_EQ(RequireNames("<e a='1' x='2'/>", {"a"}, {"b"}), refused);
  EXPECT_EQ(RequireNames("<p:e xmlns:p='urn:x' a='1' p:a='2'/>", {"a"}, {}), refused);
  EXPECT_EQ(RequireNames("<e xml:lang='en'/>", {}, {}), refused);
  EXPECT_EQ(RequireNames("<e xmlnsa='en'/>", {}, {}), refused);
}

TEST(RequireElementAttributesNames, NeverMindsNamespaceDeclarations) {
  EXPECT_EQ(RequireNames("<e xmlns:foo='urn:x'/>", {}, {}), "accepted");
  EXPECT_EQ(RequireNames("<e xmlns='urn:x' a='1'/>", {"a"}, {}), "accepted");
}

TEST(RequireNoAttributes, AllowsDeclarationsOnly) {
  EXPECT_EQ(VerdictOf([] { RequireNoAttributes(Parsed("<e xmlns='urn:x' xmlns:p='urn:p'/>").Root()); }),
            "accepted");
  EXPECT_EQ(VerdictOf([] { RequireNoAttributes(Parsed("<e a=''/>").Root()); }),
            Refused("Unexpected attributes on element 'e'"));
}

std::string RequireQNames(const std::string& text, const std::vector<QName>& required,
                          const std::vector<QName>& allowed) {
  const Parsed parsed(text);
  return VerdictOf([&] { RequireElementAttributesQNames(parsed.Root(), required, allowed); });
}

TEST(RequireElementAttributesQNames, ComparesWhatPrefixesStandFor) {
  EXPECT_EQ(RequireQNames("<e xmlns:p='urn:x' p:a='1'/>", {QName("urn:x", "a")}, {}), "accepted");
  EXPECT_EQ(RequireQNames("<e xmlns:q='urn:x' q:a='1' b=''/>", {QName("urn:x", "a")}, {LocalName("b")}),
            "accepted");
  EXPECT_EQ(RequireQNames("<e xmlns='urn:x' a='1'/>", {LocalName("a")}, {}), "accepted");
}

TEST(RequireElementAttributesQNames, NamesTheUnexpectedOne) {
  EXPECT_EQ(RequireQNames("<e x='1'/>", {}, {}), Refused("Unexpected attribute 'x' on element 'e'"));
  EXPECT_EQ(RequireQNames("<e xmlns:p='urn:x' p:a='1'/>", {LocalName("a")}, {}),
            Refused("Unexpected attribute 'urn:x:a' on element 'e'"));
  EXPECT_EQ(RequireQNames("<e xml:lang='en'/>", {}, {}),
            Refused("Unexpected attribute 'http://www.w3.org/XML/1998/namespace:lang' on element 'e'"));
}

TEST(RequireElementAttributesQNames, ReportsTheFirstUnexpectedOneInTheOrderOfRawNames) {
  EXPECT_EQ(RequireQNames("<e xmlns:b='urn:1' xmlns:a='urn:2' c='' b:x='' a:y=''/>", {}, {}),
            Refused("Unexpected attribute 'urn:2:y' on element 'e'"));
  EXPECT_EQ(RequireQNames("<e a='' Z=''/>", {}, {}), Refused("Unexpected attribute 'Z' on element 'e'"));
}

TEST(RequireElementAttributesQNames, ReportsUnexpectedOnesBeforeMissingOnes) {
  EXPECT_EQ(RequireQNames("<e x='1'/>", {LocalName("a")}, {}),
            Refused("Unexpected attribute 'x' on element 'e'"));
}

TEST(RequireElementAttributesQNames, NamesTheFirstMissingOneOfTheList) {
  const std::vector<QName> required = {QName("urn:x", "b"), LocalName("a")};
  EXPECT_EQ(RequireQNames("<e/>", required, {}), Refused("Node 'e is missing required attribute 'urn:x:b'"));
  EXPECT_EQ(RequireQNames("<e xmlns:p='urn:x' p:b=''/>", required, {}),
            Refused("Node 'e is missing required attribute 'a'"));
}

TEST(RequireElementAttributesQNamesDeathTest, AbortsWhenTheCountDisagreesWithTheLookUp) {
  const Parsed parsed("<e a=''/>");
  EXPECT_DEATH(RequireElementAttributesQNames(parsed.Root(), {LocalName("a"), LocalName("a")}, {}),
               "missing != required\\.end\\(\\).*lib/quorlin/SamlTokenImpl");
}

TEST(RequireElementAttributesQNames, RefusesAnUndeclaredPrefix) {
  EXPECT_EQ(RequireQNames("<e p:a=''/>", {LocalName("a")}, {}),
            Refused("Element eat 1,1 uses undefined prefix: `p'"));
}

TEST(RequireElementAttributesQNames, NeverMindsNamespaceDeclarations) {
  EXPECT_EQ(RequireQNames("<e xmlns:foo='urn:x' xmlns='urn:y'/>", {}, {}), "accepted");
}

// --- Typed attributes ---

std::string DateOf(const std::string& text) {
  const Parsed parsed(text);
  Pelmar::System::DateTime value = Pelmar::System::DateTimeFromUtc(1, false);
  const std::string verdict = VerdictOf([&] { GetDateAttribute(parsed.Root(), "At", value); });
  EXPECT_TRUE(verdict == "accepted" || value.GetUtcTime() == 1) << "changed on failure";
  return verdict == "accepted" ? value.ToString() : verdict;
}

TEST(GetDateAttribute, ReadsDates) {
  EXPECT_EQ(DateOf("<e At='2012-03-05T07:04:09.045Z'/>"), "2012-03-05T07:04:09.045Z");
  EXPECT_EQ(DateOf("<e At='2012-03-05T07:04:09+01:00'/>"), "2012-03-05T06:04:09Z");
}

TEST(GetDateAttribute, RefusesMalformedAndMissingOnes) {
  const std::string refused = Refused("e/@At is not a date");
  EXPECT_EQ(DateOf("<e At='yesterday'/>"), refused);
  EXPECT_EQ(DateOf("<e At=''/>"), refused);
  EXPECT_EQ(DateOf("<e At='2012-02-30T00:00:00Z'/>"), refused);
  EXPECT_EQ(DateOf("<e At=' 2012-03-05T07:04:09Z'/>"), refused);
  EXPECT_EQ(DateOf("<e/>"), refused);
  EXPECT_EQ(DateOf("<p:e xmlns:p='urn:x'/>"), refused);
}

std::string BoolOf(const std::string& text) {
  const Parsed parsed(text);
  for (const bool before : {false, true}) {
    bool value = before;
    const std::string verdict = VerdictOf([&] { GetBoolAttribute(parsed.Root(), "Is", value); });
    if (verdict != "accepted") {
      EXPECT_EQ(value, before) << "changed on failure";
      return verdict;
    }
    if (value != before) {
      return value ? "true" : "false";
    }
  }
  return "left as it was";
}

TEST(GetBoolAttribute, IgnoresTheCaseOfTheWords) {
  for (const char* const text : {"true", "True", "TRUE", "tRuE", "1"}) {
    EXPECT_EQ(BoolOf(std::string("<e Is='") + text + "'/>"), "true") << text;
  }
  for (const char* const text : {"false", "False", "FALSE", "0"}) {
    EXPECT_EQ(BoolOf(std::string("<e Is='") + text + "'/>"), "false") << text;
  }
}

TEST(GetBoolAttribute, RefusesAllElse) {
  for (const char* const text : {"yes", "no", "", " true", "true ", "01", "+1", "t"}) {
    EXPECT_EQ(BoolOf(std::string("<e Is='") + text + "'/>"), Refused("e/@Is is not a Boolean")) << text;
  }
  EXPECT_EQ(BoolOf("<e/>"), Refused("e/@Is is not a Boolean"));
}

std::string NumberOf(const std::string& attributes) {
  const Parsed parsed("<e " + attributes + "/>");
  boost::optional<unsigned long long> value;
  const std::string verdict = VerdictOf([&] { GetULongOptionalAttribute(parsed.Root(), "Count", value); });
  if (verdict != "accepted") {
    EXPECT_FALSE(value) << "changed on failure";
    return verdict;
  }
  return value ? std::to_string(*value) : "unset";
}

TEST(GetULongOptionalAttribute, ReadsNumbersUpToTheLargestSigned64BitOne) {
  EXPECT_EQ(NumberOf("Count='0'"), "0");
  EXPECT_EQ(NumberOf("Count='10'"), "10");
  EXPECT_EQ(NumberOf("Count='+7'"), "7");
  EXPECT_EQ(NumberOf("Count='007'"), "7");
  EXPECT_EQ(NumberOf("Count='-0'"), "0");
  EXPECT_EQ(NumberOf("Count='9223372036854775807'"), "9223372036854775807");
}

TEST(GetULongOptionalAttribute, RefusesAllElse) {
  for (const char* const text :
       {"-1", "1.5", " 1", "1 ", "9223372036854775808", "-9223372036854775809", "", "+", "-", "+-1", "+-0",
        "-+1", "++1", "0x1", "1e3", "1,000", "one", "99999999999999999999999"}) {
    EXPECT_EQ(NumberOf(std::string("Count='") + text + "'"),
              Refused("e/@Count is not a non-negative integer."))
        << text;
  }
}

TEST(GetULongOptionalAttribute, LeavesTheValueAloneWhenTheAttributeIsMissing) {
  EXPECT_EQ(NumberOf("count='1'"), "unset");
  const Parsed parsed("<e/>");
  boost::optional<unsigned long long> value = 5ULL;
  GetULongOptionalAttribute(parsed.Root(), "Count", value);
  EXPECT_EQ(*value, 5U);
}

// --- Documents and texts ---

TEST(ParseXML, GivesTheDocument) {
  Ref<Document> fromText;
  ParseXML("<a/>", fromText);
  EXPECT_EQ(fromText->GetDocumentElement()->GetLocalName(), "a");
  Ref<Document> fromReader;
  ParseXML(Pelmar::CreateStringReader("<b/>").Get(), fromReader);
  EXPECT_EQ(fromReader->GetDocumentElement()->GetLocalName(), "b");
}

TEST(ParseXML, PassesTheParsersExceptionUnchanged) {
  Ref<Document> document;
  EXPECT_EQ(VerdictOf([&] { ParseXML("<a>", document); }),
            "Pelmar::Xml::XMLParseException: no element found at line 1, column 4");
  EXPECT_FALSE(document);
}

TEST(GetTextNode, GivesTheFirstChildIfItIsAText) {
  const Parsed parsed("<r><a>x<b/></a></r>");
  EXPECT_EQ(GetText(GetTextNode(parsed.Root()->GetFirstChild())), "x");
  EXPECT_EQ(GetTextNode(parsed.Root()), nullptr);
  EXPECT_EQ(GetTextNode(Parsed("<r/>").Root()), nullptr);
  EXPECT_EQ(GetTextNode(nullptr), nullptr);
}

TEST(GetTextNode, DoesNotFilter) {
  EXPECT_EQ(GetText(GetTextNode(Parsed("<r> <a/></r>").Root())), " ");
  EXPECT_EQ(GetTextNode(Parsed("<r><!--c-->x</r>").Root()), nullptr);
}

TEST(GetText, IsEmptyForNull) {
  EXPECT_EQ(GetText(nullptr), "");
}

}  // namespace
}  // namespace Quorlin
