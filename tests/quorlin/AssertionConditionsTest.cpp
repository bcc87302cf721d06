// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Conditions, advice and statements of an assertion, element by element: what each may carry and hold, and
// the whole text of every refusal.

#include "quorlin/AssertionParser.h"

#include "quorlin/Namespaces.h"
#include "support/AssertionFragments.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>
#include <vector>

namespace Quorlin {
namespace {

using TestSupport::DelegateElement;
using TestSupport::ExpectRefusals;
using TestSupport::NameIdElement;
using TestSupport::OnFragment;
using TestSupport::ReplaceOnce;
using TestSupport::VerdictOf;

typedef TestSupport::FragmentReader Reader;

// --- Conditions ---

const char* const kPeriod = "NotBefore=\"2020-01-01T00:00:00Z\" NotOnOrAfter=\"2030-01-01T00:00:00Z\"";

std::string Conditions(const std::string& content) {
  return std::string("<saml:Conditions ") + kPeriod + ">" + content + "</saml:Conditions>";
}

void ReadConditions(const NodeFilterIterator& it) {
  ConditionsType conditions;
  ParseConditionsElement(it, conditions);
}

const char* const kAudience =
    "<saml:AudienceRestriction><saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>";
const char* const kProxy = "<saml:ProxyRestriction Count=\"2\"/>";
const char* const kRenew = "<saml:Condition xsi:type=\"ext:RenewRestrictionType\" Count=\"3\"/>";

std::string Delegation() {
  return "<saml:Condition xsi:type=\"del:DelegationRestrictionType\">" +
         DelegateElement("2020-02-02T00:00:00Z", NameIdElement("d1@e")) +
         DelegateElement("2020-02-03T00:00:00Z", NameIdElement("d2@e")) + "</saml:Condition>";
}

void ExpectAllRestrictions(const ConditionsType& conditions) {
  EXPECT_EQ(conditions.NotBefore.ToString(), "2020-01-01T00:00:00Z");
  EXPECT_EQ(conditions.NotOnOrAfter.ToString(), "2030-01-01T00:00:00Z");
  EXPECT_EQ(conditions.AudienceRestriction->Audience, std::set<std::string>{"urn:a"});
  EXPECT_EQ(*conditions.ProxyRestriction->Count, 2U);
  EXPECT_EQ(*conditions.RenewRestriction->Count, 3U);
  ASSERT_EQ(conditions.DelegationRestriction->Delegate.size(), 2U);
  EXPECT_EQ(conditions.DelegationRestriction->Delegate[0].NameID, NameIDType(kClaimUpn, "d1@e"));
  EXPECT_EQ(conditions.DelegationRestriction->Delegate[1].DelegationInstant.ToString(),
            "2020-02-03T00:00:00Z");
}

TEST(AssertionParser, ReadsTheFourRestrictionsInAnyOrder) {
  std::vector<std::string> restrictions = {kAudience, kProxy, kRenew, Delegation()};
  std::sort(restrictions.begin(), restrictions.end());
  do {
    std::string content = " ";
    for (const std::string& restriction : restrictions) {
      content += restriction + "<!--c-->\n";
    }
    OnFragment(Conditions(content), [](const NodeFilterIterator& it) {
      ConditionsType conditions;
      ParseConditionsElement(it, conditions);
      ExpectAllRestrictions(conditions);
    });
  } while (std::next_permutation(restrictions.begin(), restrictions.end()));
}

TEST(AssertionParser, NeedsNoRestriction) {
  OnFragment(Conditions(""), [](const NodeFilterIterator& it) {
    ConditionsType conditions;
    ParseConditionsElement(it, conditions);
    EXPECT_FALSE(conditions.AudienceRestriction);
    EXPECT_FALSE(conditions.ProxyRestriction);
    EXPECT_FALSE(conditions.RenewRestriction);
    EXPECT_FALSE(conditions.DelegationRestriction);
  });
}

TEST(AssertionParser, RefusesFaultyConditions) {
  const std::string unknown = "Unknown or duplicate restriction node under Conditions";
  const std::string date = "2020-01-01T00:00:00Z";
  ExpectRefusals(
      ReadConditions,
      {
          {"other element", "<saml:Condition/>", "Expected element 'Conditions' not found."},
          {"other namespace", "<other:Conditions/>", "Element 'Conditions' has unexpected namespace"},
          {"no NotBefore", "<saml:Conditions NotOnOrAfter=\"" + date + "\"/>",
           "Node 'Conditions is missing required attribute 'NotBefore'"},
          {"no NotOnOrAfter", "<saml:Conditions NotBefore=\"" + date + "\"/>",
           "Node 'Conditions is missing required attribute 'NotOnOrAfter'"},
          {"neither", "<saml:Conditions/>", "Node 'Conditions is missing required attribute 'NotBefore'"},
          {"further attribute", std::string("<saml:Conditions x=\"\" ") + kPeriod + "/>",
           "Unexpected attributes on element 'Conditions'"},
          {"NotBefore no date", "<saml:Conditions NotBefore=\"then\" NotOnOrAfter=\"" + date + "\"/>",
           "Conditions/@NotBefore is not a date"},
          {"NotOnOrAfter no date", "<saml:Conditions NotBefore=\"" + date + "\" NotOnOrAfter=\"then\"/>",
           "Conditions/@NotOnOrAfter is not a date"},
          {"two audience restrictions", Conditions(std::string(kAudience) + kAudience),
           unknown + ": AudienceRestriction"},
          {"two proxy restrictions", Conditions(std::string(kProxy) + kAudience + kProxy),
           unknown + ": ProxyRestriction"},
          {"two renew restrictions", Conditions(std::string(kRenew) + kRenew), unknown + ": Condition"},
          {"two delegation restrictions", Conditions(Delegation() + Delegation()), unknown + ": Condition"},
          {"OneTimeUse", Conditions("<saml:OneTimeUse/>"), unknown + ": OneTimeUse"},
          {"restriction of another namespace", Conditions("<other:ProxyRestriction/>"),
           unknown + ": ProxyRestriction"},
          {"condition without type", Conditions("<saml:Condition Count=\"1\"/>"), unknown + ": Condition"},
          {"condition of another type", Conditions("<saml:Condition xsi:type=\"xs:string\"/>"),
           unknown + ": Condition"},
          {"type in another namespace",
           Conditions("<saml:Condition xsi:type=\"saml:RenewRestrictionType\"/>"), unknown + ": Condition"},
          {"type without namespace", Conditions("<saml:Condition xsi:type=\"RenewRestrictionType\"/>"),
           unknown + ": Condition"},
          {"rebound prefix",
           Conditions("<saml:Condition xmlns:ext=\"urn:other\" xsi:type=\"ext:RenewRestrictionType\"/>"),
           unknown + ": Condition"},
          {"text", Conditions("x"), unknown},
          {"text after", Conditions(std::string(kProxy) + "x"), unknown},
          {"instruction", Conditions("<?p?>"), unknown},
      });
}

TEST(AssertionParser, RefusesAnUndeclaredPrefixInTheTypeOfACondition) {
  OnFragment(Conditions("<saml:Condition xsi:type=\"foo:t\"/>"), [](const NodeFilterIterator& it) {
    const std::string column = std::to_string(IteratorToElement(it.GetChild())->GetColumn());
    EXPECT_EQ(VerdictOf([&] { ReadConditions(it); }),
              "Quorlin::ParseException: Element Conditionat 1," + column + " uses undefined prefix: `foo'");
  });
}

TEST(AssertionParser, ReadsUnprefixedConditionTypesInTheDefaultNamespace) {
  const std::string condition =
      std::string("<saml:Condition xmlns=\"") + kSamlExt + "\" xsi:type=\"RenewRestrictionType\"/>";
  OnFragment(Conditions(condition), [](const NodeFilterIterator& it) {
    ConditionsType conditions;
    ParseConditionsElement(it, conditions);
    ASSERT_TRUE(conditions.RenewRestriction);
    EXPECT_FALSE(conditions.RenewRestriction->Count);
  });
}

TEST(AssertionParser, CollectsAudiences) {
  OnFragment(
      Conditions(
          "<saml:AudienceRestriction x=\"\" other:y=\"\"><saml:Audience>urn:b</saml:Audience>"
          "<saml:Audience z=\"\">urn:a</saml:Audience><saml:Audience>urn:b</saml:Audience></saml:AudienceRestriction>"),
      [](const NodeFilterIterator& it) {
        ConditionsType conditions;
        ParseConditionsElement(it, conditions);
        EXPECT_EQ(conditions.AudienceRestriction->Audience, (std::set<std::string>{"urn:a", "urn:b"}));
      });
}

TEST(AssertionParser, RefusesFaultyRestrictions) {
  const auto audiences = [](const std::string& content) {
    return Conditions("<saml:AudienceRestriction>" + content + "</saml:AudienceRestriction>");
  };
  ExpectRefusals(
      ReadConditions,
      {
          {"no audience", audiences(""), "Expected element 'Audience' not found."},
          {"other element for an audience", audiences("<saml:NameID/>"),
           "Expected element 'Audience' not found."},
          {"audience of another namespace", audiences("<other:Audience>a</other:Audience>"),
           "Element 'Audience' has unexpected namespace"},
          {"empty audience", audiences("<saml:Audience/>"),
           "Element 'Audience' must only have textual content"},
          {"split audience", audiences("<saml:Audience>a<!---->b</saml:Audience>"),
           "Element 'Audience' must only have textual content"},
          {"text after an audience", audiences("<saml:Audience>a</saml:Audience>x"),
           "Expected element 'Audience' not found."},
          {"proxy: further attribute", Conditions("<saml:ProxyRestriction Max=\"1\"/>"),
           "Unexpected attributes on element 'ProxyRestriction'"},
          {"proxy: audience",
           Conditions("<saml:ProxyRestriction><saml:Audience>a</saml:Audience></saml:ProxyRestriction>"),
           "Element 'ProxyRestriction' must be empty"},
          {"proxy: bad count", Conditions("<saml:ProxyRestriction Count=\"-1\"/>"),
           "ProxyRestriction/@Count is not a non-negative integer."},
          {"proxy: content before count",
           Conditions("<saml:ProxyRestriction Count=\"-1\">x</saml:ProxyRestriction>"),
           "Element 'ProxyRestriction' must be empty"},
          {"renew: further attribute",
           Conditions("<saml:Condition xsi:type=\"ext:RenewRestrictionType\" Max=\"1\"/>"),
           "Unexpected attribute 'Max' on element 'Condition'"},
          {"renew: prefixed count",
           Conditions("<saml:Condition xsi:type=\"ext:RenewRestrictionType\" other:Count=\"1\"/>"),
           "Unexpected attribute 'urn:other:Count' on element 'Condition'"},
          {"renew: bad count",
           Conditions("<saml:Condition xsi:type=\"ext:RenewRestrictionType\" Count=\"many\"/>"),
           "Condition/@Count is not a non-negative integer."},
          {"renew: content",
           Conditions(
               "<saml:Condition xsi:type=\"ext:RenewRestrictionType\"><saml:Audience/></saml:Condition>"),
           "Element 'Condition' must be empty"},
          {"delegation: count",
           Conditions("<saml:Condition xsi:type=\"del:DelegationRestrictionType\" Count=\"1\"/>"),
           "Unexpected attribute 'Count' on element 'Condition'"},
          {"delegation: empty", Conditions("<saml:Condition xsi:type=\"del:DelegationRestrictionType\"/>"),
           "Expected element 'Delegate' not found."},
      });
}

TEST(AssertionParser, ReadsTheOptionalCounts) {
  const auto countOf = [](const std::string& restriction) {
    std::string count;
    OnFragment(Conditions(restriction), [&](const NodeFilterIterator& it) {
      ConditionsType conditions;
      ParseConditionsElement(it, conditions);
      const boost::optional<unsigned long long> read = conditions.ProxyRestriction
                                                           ? conditions.ProxyRestriction->Count
                                                           : conditions.RenewRestriction->Count;
      count = read ? std::to_string(*read) : "none";
    });
    return count;
  };
  EXPECT_EQ(countOf("<saml:ProxyRestriction/>"), "none");
  EXPECT_EQ(countOf("<saml:ProxyRestriction Count=\"0\"> </saml:ProxyRestriction>"), "0");
  EXPECT_EQ(countOf("<saml:ProxyRestriction Count=\"10\"/>"), "10");
  EXPECT_EQ(countOf("<saml:Condition xsi:type=\"ext:RenewRestrictionType\"/>"), "none");
  EXPECT_EQ(
      countOf(
          "<saml:Condition xsi:type=\"ext:RenewRestrictionType\" Count=\"0\" Postdatable=\"what\" RenewExpired=\"ever\"/>"),
      "0");
  EXPECT_EQ(countOf("<saml:Condition xsi:type=\"ext:RenewRestrictionType\" Count=\"9223372036854775807\"/>"),
            "9223372036854775807");
}

TEST(AssertionParser, RefusesFaultyDelegates) {
  const Reader read = [](const NodeFilterIterator& it) {
    DelegateType delegate;
    ParseDelegate(it, delegate);
  };
  const std::string start = "<del:Delegate DelegationInstant=\"2020-01-01T00:00:00Z\"";
  ExpectRefusals(
      read,
      {
          {"other element", "<del:NameID/>", "Expected element 'Delegate' not found."},
          {"namespace of the assertion", "<saml:Delegate/>", "Element 'Delegate' has unexpected namespace"},
          {"no instant", "<del:Delegate/>",
           "Node 'Delegate is missing required attribute 'DelegationInstant'"},
          {"ConfirmationMethod", start + " ConfirmationMethod=\"m\"/>",
           "Unexpected attributes on element 'Delegate'"},
          {"no date", "<del:Delegate DelegationInstant=\"then\"/>",
           "Delegate/@DelegationInstant is not a date"},
          {"no name", start + "/>", "Expected element 'NameID' not found."},
          {"name of another namespace", start + "><del:NameID/></del:Delegate>",
           "Element 'NameID' has unexpected namespace"},
          {"faulty name", start + "><saml:NameID/></del:Delegate>",
           "Node 'NameID is missing required attribute 'Format'"},
          {"second name", start + ">" + NameIdElement("d1@e") + NameIdElement("d2@e") + "</del:Delegate>",
           "Unexpected elements after NameID"},
          {"text after the name", start + ">" + NameIdElement("d1@e") + "x</del:Delegate>",
           "Unexpected elements after NameID"},
      });
}

TEST(AssertionParser, RefusesOtherElementsAmongTheDelegates) {
  const std::string restriction =
      ReplaceOnce(Delegation(), "</saml:Condition>", "<del:Other/></saml:Condition>");
  ExpectRefusals(ReadConditions,
                 {{"after", Conditions(restriction), "Expected element 'Delegate' not found."}});
}

// --- TryParse ---

template <typename Record>
void ExpectLeftAlone(void (*tryParse)(NodeFilterIterator&, boost::optional<Record>&),
                     const std::string& fragment) {
  OnFragment(fragment, [&](NodeFilterIterator it) {
    const Pelmar::Xml::Node* const before = it.node;
    boost::optional<Record> record;
    tryParse(it, record);
    EXPECT_FALSE(record) << fragment;
    EXPECT_EQ(it.node, before) << fragment;
  });
}

template <typename Record>
void ExpectTaken(void (*tryParse)(NodeFilterIterator&, boost::optional<Record>&),
                 const std::string& fragment) {
  OnFragment(fragment + " <!--c--><next/>", [&](NodeFilterIterator it) {
    boost::optional<Record> record;
    tryParse(it, record);
    EXPECT_TRUE(record) << fragment;
    EXPECT_EQ(IteratorToElement(it)->GetLocalName(), "next") << fragment;
  });
  OnFragment(fragment + " ", [&](NodeFilterIterator it) {
    boost::optional<Record> record;
    tryParse(it, record);
    EXPECT_TRUE(record) << fragment;
    EXPECT_EQ(it.node, nullptr) << fragment;
  });
}

const char* const kAdvice =
    "<saml:Advice><ext:RSAAdvice AdviceSource=\"s\"><saml:Attribute Name=\"n\"/></ext:RSAAdvice></saml:Advice>";

TEST(AssertionParser, MovesOnFromOptionalElementsOnlyWhenTheyAreTheirs) {
  ExpectTaken(TryParseAudienceRestriction, kAudience);
  ExpectTaken(TryParseProxyRestriction, kProxy);
  ExpectTaken(TryParseRenewRestriction, kRenew);
  ExpectTaken(TryParseDelegationRestriction, Delegation());
  ExpectTaken(TryParseAdviceElement, kAdvice);
  for (const std::string& other :
       {std::string("<saml:Other/>"), std::string("text"), std::string("<saml:Condition/>")}) {
    ExpectLeftAlone(TryParseAudienceRestriction, other);
    ExpectLeftAlone(TryParseProxyRestriction, other);
    ExpectLeftAlone(TryParseRenewRestriction, other);
    ExpectLeftAlone(TryParseDelegationRestriction, other);
    ExpectLeftAlone(TryParseAdviceElement, other);
  }
  ExpectLeftAlone(TryParseAudienceRestriction, "<other:AudienceRestriction/>");
  ExpectLeftAlone(TryParseProxyRestriction, "<other:ProxyRestriction/>");
  ExpectLeftAlone(TryParseRenewRestriction, Delegation());
  ExpectLeftAlone(TryParseDelegationRestriction, kRenew);
  ExpectLeftAlone(TryParseRenewRestriction, "<other:Condition xsi:type=\"ext:RenewRestrictionType\"/>");
  ExpectLeftAlone(TryParseAdviceElement, "<other:Advice/>");
}

// --- Advice ---

void ReadAdvice(NodeFilterIterator it) {
  boost::optional<AdviceType> advice;
  TryParseAdviceElement(it, advice);
}

TEST(AssertionParser, ReadsAdvice) {
  OnFragment(
      "<saml:Advice><ext:RSAAdvice AdviceSource=\"s1\"><saml:Attribute Name=\"n1\"><saml:AttributeValue>v1</saml:AttributeValue>"
      "<saml:AttributeValue>v2</saml:AttributeValue></saml:Attribute><saml:Attribute Name=\"n2\" NameFormat=\"f\" FriendlyName=\"x\"/>"
      "</ext:RSAAdvice><ext:RSAAdvice AdviceSource=\"s2\"><saml:Attribute Name=\"n3\"/></ext:RSAAdvice></saml:Advice>",
      [](NodeFilterIterator it) {
        boost::optional<AdviceType> advice;
        TryParseAdviceElement(it, advice);
        ASSERT_EQ(advice->RSAAdvice.size(), 2U);
        EXPECT_EQ(advice->RSAAdvice[0].source, "s1");
        ASSERT_EQ(advice->RSAAdvice[0].attributes.size(), 2U);
        EXPECT_EQ(advice->RSAAdvice[0].attributes[0].name, "n1");
        EXPECT_EQ(advice->RSAAdvice[0].attributes[0].values, (std::vector<std::string>{"v1", "v2"}));
        EXPECT_EQ(advice->RSAAdvice[0].attributes[1].name, "n2");
        EXPECT_TRUE(advice->RSAAdvice[0].attributes[1].values.empty());
        EXPECT_EQ(advice->RSAAdvice[1].source, "s2");
      });
}

TEST(AssertionParser, RefusesFaultyAdvice) {
  const auto rsaAdvice = [](const std::string& content) {
    return "<saml:Advice><ext:RSAAdvice AdviceSource=\"s\">" + content + "</ext:RSAAdvice></saml:Advice>";
  };
  ExpectRefusals(
      ReadAdvice,
      {
          {"attribute", "<saml:Advice x=\"\"/>", "Unexpected attributes on element 'Advice'"},
          {"empty", "<saml:Advice/>", "Expected element 'RSAAdvice' not found."},
          {"other element", "<saml:Advice><saml:AssertionIDRef/></saml:Advice>",
           "Expected element 'RSAAdvice' not found."},
          {"advice of another namespace", "<saml:Advice><saml:RSAAdvice/></saml:Advice>",
           "Element 'RSAAdvice' has unexpected namespace"},
          {"no source", "<saml:Advice><ext:RSAAdvice/></saml:Advice>",
           "Node 'RSAAdvice is missing required attribute 'AdviceSource'"},
          {"further attribute", "<saml:Advice><ext:RSAAdvice AdviceSource=\"\" x=\"\"/></saml:Advice>",
           "Unexpected attributes on element 'RSAAdvice'"},
          {"empty advice", rsaAdvice(""), "Expected element 'Attribute' not found."},
          {"other element in advice", rsaAdvice("<saml:Attribute Name=\"n\"/><saml:Other/>"),
           "Expected element 'Attribute' not found."},
          {"text after",
           ReplaceOnce(rsaAdvice("<saml:Attribute Name=\"n\"/>"), "</saml:Advice>", "x</saml:Advice>"),
           "Expected element 'RSAAdvice' not found."},
      });
}

// --- Statements ---

TEST(AssertionParser, ReadsTheAuthnStatement) {
  OnFragment(
      "<saml:AuthnStatement AuthnInstant=\"2020-01-01T00:00:00Z\"> <saml:AuthnContext> <saml:AuthnContextClassRef>urn:c"
      "</saml:AuthnContextClassRef> </saml:AuthnContext> </saml:AuthnStatement>",
      [](const NodeFilterIterator& it) {
        AuthnStatementType statement;
        ParseAuthnStatementElement(it, statement);
        EXPECT_EQ(statement.AuthnInstant.ToString(), "2020-01-01T00:00:00Z");
        EXPECT_EQ(statement.AuthnContext.AuthnContextClassRef, "urn:c");
      });
}

TEST(AssertionParser, RefusesFaultyAuthnStatements) {
  const Reader read = [](const NodeFilterIterator& it) {
    AuthnStatementType statement;
    ParseAuthnStatementElement(it, statement);
  };
  const auto statement = [](const std::string& content) {
    return "<saml:AuthnStatement AuthnInstant=\"2020-01-01T00:00:00Z\">" + content + "</saml:AuthnStatement>";
  };
  const std::string reference = "<saml:AuthnContextClassRef>urn:c</saml:AuthnContextClassRef>";
  const std::string context = "<saml:AuthnContext>" + reference + "</saml:AuthnContext>";
  ExpectRefusals(
      read,
      {
          {"other element", "<saml:Other/>", "Expected element 'AuthnStatement' not found."},
          {"other namespace", "<other:AuthnStatement/>", "Element 'AuthnStatement' has unexpected namespace"},
          {"no instant", "<saml:AuthnStatement/>",
           "Node 'AuthnStatement is missing required attribute 'AuthnInstant'"},
          {"SessionIndex", "<saml:AuthnStatement AuthnInstant=\"2020-01-01T00:00:00Z\" SessionIndex=\"1\"/>",
           "Unexpected attributes on element 'AuthnStatement'"},
          {"no date", "<saml:AuthnStatement AuthnInstant=\"\"/>",
           "AuthnStatement/@AuthnInstant is not a date"},
          {"no context", statement(""), "Expected element 'AuthnContext' not found."},
          {"context of another namespace", statement("<other:AuthnContext/>"),
           "Element 'AuthnContext' has unexpected namespace"},
          {"context with an attribute", statement("<saml:AuthnContext x=\"\"/>"),
           "Unexpected attributes on element 'AuthnContext'"},
          {"empty context", statement("<saml:AuthnContext/>"),
           "Expected element 'AuthnContextClassRef' not found."},
          {"reference of another namespace",
           statement("<saml:AuthnContext><other:AuthnContextClassRef/></saml:AuthnContext>"),
           "Element 'AuthnContextClassRef' has unexpected namespace"},
          {"empty reference",
           statement("<saml:AuthnContext><saml:AuthnContextClassRef/></saml:AuthnContext>"),
           "Element 'AuthnContextClassRef' must only have textual content"},
          {"second reference",
           statement("<saml:AuthnContext>" + reference + reference + "</saml:AuthnContext>"),
           "Unexpected elements after AuthnContextClassRef"},
          {"second context", statement(context + context), "Unexpected elements after AuthnContext"},
          {"text after", statement(context + "x"), "Unexpected elements after AuthnContext"},
      });
}

void ReadStatement(const NodeFilterIterator& it) {
  AttributeStatementType statement;
  ParseAttributeStatementElement(it, statement);
}

TEST(AssertionParser, ReadsAttributes) {
  OnFragment(
      "<saml:AttributeStatement><saml:Attribute Name=\"n1\" NameFormat=\"f\" FriendlyName=\"x\"><saml:AttributeValue any=\"\">v2"
      "</saml:AttributeValue><saml:AttributeValue>v1</saml:AttributeValue></saml:Attribute><saml:Attribute Name=\"n1\"/>"
      "</saml:AttributeStatement>",
      [](const NodeFilterIterator& it) {
        AttributeStatementType statement;
        ParseAttributeStatementElement(it, statement);
        ASSERT_EQ(statement.Attribute.size(), 2U);
        EXPECT_EQ(statement.Attribute[0].Name, "n1");
        EXPECT_EQ(statement.Attribute[0].NameFormat, "f");
        EXPECT_EQ(statement.Attribute[0].FriendlyName, "x");
        EXPECT_EQ(statement.Attribute[0].Values, (std::vector<std::string_view>{"v2", "v1"}));
        EXPECT_EQ(statement.Attribute[1].NameFormat, "");
        EXPECT_EQ(statement.Attribute[1].FriendlyName, "");
        EXPECT_TRUE(statement.Attribute[1].Values.empty());
      });
}

TEST(AssertionParser, RefusesFaultyAttributeStatements) {
  const auto attribute = [](const std::string& content) {
    return "<saml:AttributeStatement><saml:Attribute Name=\"n\">" + content +
           "</saml:Attribute></saml:AttributeStatement>";
  };
  const std::string value = "<saml:AttributeValue>v</saml:AttributeValue>";
  ExpectRefusals(
      ReadStatement,
      {
          {"other element", "<saml:Other/>", "Expected element 'AttributeStatement' not found."},
          {"other namespace", "<other:AttributeStatement/>",
           "Element 'AttributeStatement' has unexpected namespace"},
          {"attribute", "<saml:AttributeStatement x=\"\"/>",
           "Unexpected attributes on element 'AttributeStatement'"},
          {"empty", "<saml:AttributeStatement/>", "Expected element 'Attribute' not found."},
          {"EncryptedAttribute",
           "<saml:AttributeStatement><saml:EncryptedAttribute/></saml:AttributeStatement>",
           "Expected element 'Attribute' not found."},
          {"attribute of another namespace",
           "<saml:AttributeStatement><other:Attribute/></saml:AttributeStatement>",
           "Element 'Attribute' has unexpected namespace"},
          {"no Name", "<saml:AttributeStatement><saml:Attribute/></saml:AttributeStatement>",
           "Node 'Attribute is missing required attribute 'Name'"},
          {"further attribute",
           "<saml:AttributeStatement><saml:Attribute Name=\"n\" x=\"\"/></saml:AttributeStatement>",
           "Unexpected attributes on element 'Attribute'"},
          {"other element for a value", attribute("<saml:Other/>"),
           "Expected element 'AttributeValue' not found."},
          {"text for a value", attribute(value + "x"), "Expected element 'AttributeValue' not found."},
          {"value of another namespace", attribute("<other:AttributeValue/>"),
           "Element 'AttributeValue' has unexpected namespace"},
          {"empty value", attribute("<saml:AttributeValue/>"),
           "Element 'AttributeValue' must only have textual content"},
          {"split value", attribute("<saml:AttributeValue>a<!---->b</saml:AttributeValue>"),
           "Element 'AttributeValue' must only have textual content"},
          {"element in a value", attribute("<saml:AttributeValue><a/></saml:AttributeValue>"),
           "Element 'AttributeValue' must only have textual content"},
          {"something after",
           "<saml:AttributeStatement><saml:Attribute Name=\"n\"/>x</saml:AttributeStatement>",
           "Expected element 'Attribute' not found."},
      });
}

}  // namespace
}  // namespace Quorlin
