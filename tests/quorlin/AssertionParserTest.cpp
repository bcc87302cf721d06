// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Subject and issuer of an assertion, element by element, and the assertion as a whole: what each may carry
// and hold, and the whole text of every refusal.

#include "quorlin/AssertionParser.h"

#include "quorlin/Namespaces.h"
#include "support/AssertionFragments.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace Quorlin {
namespace {

using TestSupport::ExpectAccepted;
using TestSupport::ExpectRefusals;
using TestSupport::HolderOfKeyData;
using TestSupport::NameIdElement;
using TestSupport::OnFragment;
using TestSupport::ReplaceOnce;
using TestSupport::VerdictOf;

typedef TestSupport::FragmentReader Reader;

// --- NameID and Issuer ---

void ReadNameId(const NodeFilterIterator& it) {
  NameIDType nameId;
  ParseNameIDType(it, nameId);
}

TEST(AssertionParser, ReadsFormatAndTextOfANameId) {
  OnFragment("<saml:NameID Format=\"urn:f\"> alice@example.com <!--c--></saml:NameID>",
             [](const NodeFilterIterator& it) {
               NameIDType nameId;
               ParseNameIDType(it, nameId);
               EXPECT_EQ(nameId, NameIDType("urn:f", " alice@example.com "));
             });
}

TEST(AssertionParser, RefusesFaultyNameIds) {
  ExpectRefusals(
      ReadNameId,
      {
          {"no Format", "<saml:NameID>a</saml:NameID>",
           "Node 'NameID is missing required attribute 'Format'"},
          {"prefixed Format", "<saml:NameID saml:Format=\"f\">a</saml:NameID>",
           "Node 'NameID is missing required attribute 'Format'"},
          {"NameQualifier", "<saml:NameID Format=\"f\" NameQualifier=\"q\">a</saml:NameID>",
           "Unexpected attributes on element 'NameID'"},
          {"prefixed attribute", "<saml:NameID Format=\"f\" other:a=\"q\">a</saml:NameID>",
           "Unexpected attributes on element 'NameID'"},
          {"no content", "<saml:NameID Format=\"f\"/>", "Element 'NameID' must only have textual content"},
          {"white space", "<saml:NameID Format=\"f\"> </saml:NameID>",
           "Element 'NameID' must only have textual content"},
          {"comment inside", "<saml:NameID Format=\"f\">a<!---->b</saml:NameID>",
           "Element 'NameID' must only have textual content"},
          {"instruction inside", "<saml:NameID Format=\"f\">a<?p?>b</saml:NameID>",
           "Element 'NameID' must only have textual content"},
          {"element inside", "<saml:NameID Format=\"f\">a<x/></saml:NameID>",
           "Element 'NameID' must only have textual content"},
      });
}

TEST(AssertionParser, ReadsIssuersLikeNameIds) {
  const Reader read = [](const NodeFilterIterator& it) {
    NameIDType issuer;
    ParseSamlIssuerElement(it, issuer);
  };
  OnFragment("<saml:Issuer Format=\"urn:f\">sts</saml:Issuer>", [](const NodeFilterIterator& it) {
    NameIDType issuer;
    ParseSamlIssuerElement(it, issuer);
    EXPECT_EQ(issuer, NameIDType("urn:f", "sts"));
  });
  ExpectRefusals(
      read,
      {
          {"other element", "<saml:NameID Format=\"f\">a</saml:NameID>",
           "Expected element 'Issuer' not found."},
          {"text", "Issuer", "Expected element 'Issuer' not found."},
          {"other namespace", "<other:Issuer Format=\"f\">a</other:Issuer>",
           "Element 'Issuer' has unexpected namespace"},
          {"no namespace", "<Issuer Format=\"f\">a</Issuer>", "Element 'Issuer' has unexpected namespace"},
          {"undeclared prefix", "<what:Issuer Format=\"f\">a</what:Issuer>",
           "Element 'Issuer' has unexpected namespace"},
          {"no Format", "<saml:Issuer>a</saml:Issuer>",
           "Node 'Issuer is missing required attribute 'Format'"},
          {"further attribute", "<saml:Issuer Format=\"f\" x=\"\">a</saml:Issuer>",
           "Unexpected attributes on element 'Issuer'"},
          {"no content", "<saml:Issuer Format=\"f\"/>", "Element 'Issuer' must only have textual content"},
      });
}

// --- Subject ---

const char* const kBearer = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
const char* const kBearerData = "<saml:SubjectConfirmationData NotOnOrAfter=\"2030-01-01T00:00:00Z\"/>";

std::string Confirmation(const std::string& method, const std::string& content) {
  return "<saml:SubjectConfirmation Method=\"" + method + "\">" + content + "</saml:SubjectConfirmation>";
}

std::string Subject(const std::string& content) {
  return "<saml:Subject>" + content + "</saml:Subject>";
}

void ReadSubject(const NodeFilterIterator& it) {
  SubjectType subject;
  ParseSubjectElement(it, subject);
}

void ReadConfirmation(const NodeFilterIterator& it) {
  SubjectConfirmationType confirmation;
  ParseSubjectConfirmationElement(it, confirmation);
}

TEST(AssertionParser, ReadsABearerSubject) {
  OnFragment(Subject(NameIdElement("alice@example.com") + Confirmation(kBearer, kBearerData)),
             [](const NodeFilterIterator& it) {
               SubjectType subject;
               ParseSubjectElement(it, subject);
               EXPECT_EQ(subject.NameID, NameIDType(kClaimUpn, "alice@example.com"));
               EXPECT_EQ(subject.SubjectConfirmation.Method, SamlToken::CONFIRM_BEARER);
               EXPECT_FALSE(subject.SubjectConfirmation.DelegateId);
               const SubjectConfirmationDataType& data = subject.SubjectConfirmation.SubjectConfirmationData;
               EXPECT_EQ(data.NotOnOrAfter.ToString(), "2030-01-01T00:00:00Z");
               EXPECT_FALSE(data.KeyInfoCertificate);
             });
}

TEST(AssertionParser, RefusesFaultySubjects) {
  const std::string name = NameIdElement("a@b");
  const std::string confirmation = Confirmation(kBearer, kBearerData);
  ExpectRefusals(
      ReadSubject,
      {
          {"other element", "<saml:Issuer/>", "Expected element 'Subject' not found."},
          {"other namespace", "<other:Subject/>", "Element 'Subject' has unexpected namespace"},
          {"attribute", "<saml:Subject ID=\"_1\"/>", "Unexpected attributes on element 'Subject'"},
          {"empty", "<saml:Subject/>", "Expected element 'NameID' not found."},
          {"no NameID", Subject(confirmation), "Expected element 'NameID' not found."},
          {"text before", Subject("x" + name + confirmation), "Expected element 'NameID' not found."},
          {"NameID of another namespace",
           Subject("<other:NameID Format=\"f\">a</other:NameID>" + confirmation),
           "Element 'NameID' has unexpected namespace"},
          {"no confirmation", Subject(name), "Expected element 'SubjectConfirmation' not found."},
          {"two names", Subject(name + name + confirmation),
           "Expected element 'SubjectConfirmation' not found."},
          {"two confirmations", Subject(name + confirmation + confirmation),
           "Unexpected elements after SubjectConfirmation"},
          {"text after", Subject(name + confirmation + "x"), "Unexpected elements after SubjectConfirmation"},
          {"instruction after", Subject(name + confirmation + "<?p?>"),
           "Unexpected elements after SubjectConfirmation"},
      });
}

TEST(AssertionParser, RefusesFaultySubjectConfirmations) {
  ExpectRefusals(
      ReadConfirmation,
      {
          {"other element", "<saml:Subject/>", "Expected element 'SubjectConfirmation' not found."},
          {"other namespace", "<other:SubjectConfirmation/>",
           "Element 'SubjectConfirmation' has unexpected namespace"},
          {"no Method", "<saml:SubjectConfirmation/>",
           "Node 'SubjectConfirmation is missing required attribute 'Method'"},
          {"further attribute", "<saml:SubjectConfirmation Method=\"m\" x=\"\"/>",
           "Unexpected attributes on element 'SubjectConfirmation'"},
          {"sender-vouches", Confirmation("urn:oasis:names:tc:SAML:2.0:cm:sender-vouches", kBearerData),
           "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'"},
          {"other case", Confirmation("urn:oasis:names:tc:SAML:2.0:cm:Bearer", kBearerData),
           "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:Bearer'"},
          {"blank after", Confirmation("urn:oasis:names:tc:SAML:2.0:cm:bearer ", kBearerData),
           "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:bearer '"},
          {"empty method", Confirmation("", kBearerData), "Unknown subject confirmation method: ''"},
          {"no data", Confirmation(kBearer, ""), "Expected element 'SubjectConfirmationData' not found."},
          {"only a delegate", Confirmation(kBearer, NameIdElement("d@e")),
           "Expected element 'SubjectConfirmationData' not found."},
          {"two delegates", Confirmation(kBearer, NameIdElement("d@e") + NameIdElement("d@e") + kBearerData),
           "Expected element 'SubjectConfirmationData' not found."},
          {"delegate of another namespace",
           Confirmation(kBearer, "<other:NameID Format=\"f\">a</other:NameID>" + std::string(kBearerData)),
           "Expected element 'SubjectConfirmationData' not found."},
          {"faulty delegate",
           Confirmation(kBearer, "<saml:NameID>a</saml:NameID>" + std::string(kBearerData)),
           "Node 'NameID is missing required attribute 'Format'"},
          {"data of another namespace", Confirmation(kBearer, "<other:SubjectConfirmationData/>"),
           "Element 'SubjectConfirmationData' has unexpected namespace"},
          {"two data", Confirmation(kBearer, std::string(kBearerData) + kBearerData),
           "Unexpected elements after SubjectConfirmationData"},
          {"delegate after data", Confirmation(kBearer, kBearerData + NameIdElement("d@e")),
           "Unexpected elements after SubjectConfirmationData"},
      });
}

TEST(AssertionParser, ReadsTheDelegateId) {
  OnFragment(Confirmation(kBearer, NameIdElement("urn:f", "d@e") + kBearerData),
             [](const NodeFilterIterator& it) {
               SubjectConfirmationType confirmation;
               ParseSubjectConfirmationElement(it, confirmation);
               EXPECT_EQ(*confirmation.DelegateId, NameIDType("urn:f", "d@e"));
             });
}

TEST(AssertionParser, RefusesFaultyBearerConfirmationData) {
  const Reader read = [](const NodeFilterIterator& it) {
    SubjectConfirmationDataType data;
    ParseSubjectConfirmationDataElement(it, SamlToken::CONFIRM_BEARER, data);
  };
  const std::string start = "<saml:SubjectConfirmationData NotOnOrAfter=\"2030-01-01T00:00:00Z\"";
  ExpectAccepted(read, {start + "/>", start + "> <!--c--> </saml:SubjectConfirmationData>"});
  ExpectRefusals(read,
                 {
                     {"no NotOnOrAfter", "<saml:SubjectConfirmationData/>",
                      "Node 'SubjectConfirmationData is missing required attribute 'NotOnOrAfter'"},
                     {"Recipient", start + " Recipient=\"r\"/>",
                      "Unexpected attributes on element 'SubjectConfirmationData'"},
                     {"xsi:type", start + " xsi:type=\"saml:KeyInfoConfirmationDataType\"/>",
                      "Unexpected attributes on element 'SubjectConfirmationData'"},
                     {"content", start + ">x</saml:SubjectConfirmationData>",
                      "Element 'SubjectConfirmationData' must be empty"},
                     {"KeyInfo", start + "><ds:KeyInfo/></saml:SubjectConfirmationData>",
                      "Element 'SubjectConfirmationData' must be empty"},
                     {"no date", "<saml:SubjectConfirmationData NotOnOrAfter=\"soon\"/>",
                      "SubjectConfirmationData/@NotOnOrAfter is not a date"},
                     {"content and no date",
                      "<saml:SubjectConfirmationData NotOnOrAfter=\"soon\">x</saml:SubjectConfirmationData>",
                      "Element 'SubjectConfirmationData' must be empty"},
                 });
}

// --- Holder of key ---

void ReadKeyData(const NodeFilterIterator& it) {
  SubjectConfirmationDataType data;
  ParseSubjectConfirmationDataElement(it, SamlToken::CONFIRM_HOLDER_OF_KEY, data);
}

std::string KeyData(const std::string& attributes, const std::string& content) {
  return "<saml:SubjectConfirmationData " + attributes + ">" + content + "</saml:SubjectConfirmationData>";
}

const char* const kKeyType = "xsi:type=\"saml:KeyInfoConfirmationDataType\"";

std::string KeyInfo(const std::string& content) {
  return "<ds:KeyInfo>" + content + "</ds:KeyInfo>";
}

std::string X509Data(const std::string& content) {
  return "<ds:X509Data>" + content + "</ds:X509Data>";
}

TEST(AssertionParser, ReadsTheConfirmationCertificate) {
  const TestSupport::Identity& holder = TestSupport::TokenSigner();
  OnFragment(HolderOfKeyData(holder), [&](const NodeFilterIterator& it) {
    SubjectConfirmationDataType data;
    ParseSubjectConfirmationDataElement(it, SamlToken::CONFIRM_HOLDER_OF_KEY, data);
    EXPECT_EQ(data.KeyInfoCertificate->GetDer(), holder.certificate->GetDer());
  });
}

TEST(AssertionParser, ReadsACertificateInLines) {
  const TestSupport::Identity& holder = TestSupport::TokenSigner();
  std::string lines = TestSupport::Base64Of(holder);
  for (std::size_t at = 64; at < lines.size(); at += 65) {
    lines.insert(at, "\n");
  }
  OnFragment(ReplaceOnce(HolderOfKeyData(holder), TestSupport::Base64Of(holder), "\n  " + lines + "\n"),
             [&](const NodeFilterIterator& it) {
               SubjectConfirmationDataType data;
               ParseSubjectConfirmationDataElement(it, SamlToken::CONFIRM_HOLDER_OF_KEY, data);
               EXPECT_EQ(data.KeyInfoCertificate->GetDer(), holder.certificate->GetDer());
             });
}

TEST(AssertionParser, AllowsButDoesNotReadTheEndOfAHolderOfKeysConfirmation) {
  const std::string data = HolderOfKeyData(TestSupport::TokenSigner());
  OnFragment(ReplaceOnce(data, kKeyType, std::string(kKeyType) + " NotOnOrAfter=\"whenever\""),
             [](const NodeFilterIterator& it) {
               SubjectConfirmationDataType read;
               ParseSubjectConfirmationDataElement(it, SamlToken::CONFIRM_HOLDER_OF_KEY, read);
               EXPECT_EQ(read.NotOnOrAfter, Pelmar::System::DateTime());
             });
}

TEST(AssertionParser, ResolvesTheTypeOfConfirmationDataByAnyPrefix) {
  const std::string data = HolderOfKeyData(TestSupport::TokenSigner());
  const std::string type = "saml:KeyInfoConfirmationDataType";
  ExpectAccepted(
      ReadKeyData,
      {
          ReplaceOnce(data, kKeyType,
                      std::string("xmlns:s=\"") + kSaml + "\" xsi:type=\"s:KeyInfoConfirmationDataType\""),
          ReplaceOnce(data, kKeyType,
                      std::string("xmlns=\"") + kSaml + "\" xsi:type=\"KeyInfoConfirmationDataType\""),
          ReplaceOnce(data, kKeyType, std::string("xmlns:i=\"") + kXsi + "\" i:type=\"" + type + "\""),
      });
}

TEST(AssertionParser, RefusesFaultyHolderOfKeyConfirmationData) {
  const std::string good = HolderOfKeyData(TestSupport::TokenSigner());
  ExpectRefusals(
      ReadKeyData,
      {
          {"no type", KeyData("", ""),
           "Node 'SubjectConfirmationData is missing required attribute 'http://www.w3.org/2001/XMLSchema-instance:type'"},
          {"type without namespace", KeyData("type=\"saml:KeyInfoConfirmationDataType\"", ""),
           "Unexpected attribute 'type' on element 'SubjectConfirmationData'"},
          {"no type but an end", KeyData("NotOnOrAfter=\"2030-01-01T00:00:00Z\"", ""),
           "Node 'SubjectConfirmationData is missing required attribute 'http://www.w3.org/2001/XMLSchema-instance:type'"},
          {"further attribute", KeyData(std::string(kKeyType) + " Recipient=\"r\"", ""),
           "Unexpected attribute 'Recipient' on element 'SubjectConfirmationData'"},
          {"prefixed end", KeyData(std::string(kKeyType) + " saml:NotOnOrAfter=\"r\"", ""),
           "Unexpected attribute 'urn:oasis:names:tc:SAML:2.0:assertion:NotOnOrAfter' on element 'SubjectConfirmationData'"},
          {"other type", KeyData("xsi:type=\"saml:SubjectConfirmationDataType\"", ""),
           "Invalid SubjectConfirmationData type: 'saml:SubjectConfirmationDataType'"},
          {"unprefixed type", KeyData("xsi:type=\"KeyInfoConfirmationDataType\"", ""),
           "Invalid SubjectConfirmationData type: 'KeyInfoConfirmationDataType'"},
          {"type of another namespace", KeyData("xsi:type=\"other:KeyInfoConfirmationDataType\"", ""),
           "Invalid SubjectConfirmationData type: 'other:KeyInfoConfirmationDataType'"},
          {"rebound prefix",
           KeyData("xmlns:saml=\"urn:other\" xsi:type=\"saml:KeyInfoConfirmationDataType\"", ""),
           "Element 'SubjectConfirmationData' has unexpected namespace"},
          {"no KeyInfo", KeyData(kKeyType, ""), "Expected element 'KeyInfo' not found."},
          {"KeyInfo of another namespace", KeyData(kKeyType, "<saml:KeyInfo/>"),
           "Element 'KeyInfo' has unexpected namespace"},
          {"KeyInfo with an attribute", KeyData(kKeyType, "<ds:KeyInfo Id=\"k\"/>"),
           "Unexpected attributes on element 'KeyInfo'"},
          {"empty KeyInfo", KeyData(kKeyType, KeyInfo("")), "Expected element 'X509Data' not found."},
          {"KeyValue", KeyData(kKeyType, KeyInfo("<ds:KeyValue/>")),
           "Expected element 'X509Data' not found."},
          {"X509Data of another namespace", KeyData(kKeyType, KeyInfo("<saml:X509Data/>")),
           "Element 'X509Data' has unexpected namespace"},
          {"X509Data with an attribute", KeyData(kKeyType, KeyInfo("<ds:X509Data x=\"\"/>")),
           "Unexpected attributes on element 'X509Data'"},
          {"empty X509Data", KeyData(kKeyType, KeyInfo(X509Data(""))),
           "Expected element 'X509Certificate' not found."},
          {"certificate of another namespace",
           KeyData(kKeyType, KeyInfo(X509Data("<saml:X509Certificate/>"))),
           "Element 'X509Certificate' has unexpected namespace"},
          {"certificate with an attribute",
           KeyData(kKeyType, KeyInfo(X509Data("<ds:X509Certificate x=\"\">MA==</ds:X509Certificate>"))),
           "Unexpected attributes on element 'X509Certificate'"},
          {"empty certificate", KeyData(kKeyType, KeyInfo(X509Data("<ds:X509Certificate/>"))),
           "Element 'X509Certificate' must only have textual content"},
          {"second certificate",
           ReplaceOnce(good, "</ds:X509Data>", "<ds:X509Certificate>MA==</ds:X509Certificate></ds:X509Data>"),
           "Unexpected elements after X509Certificate"},
          {"something after the data",
           ReplaceOnce(good, "</ds:KeyInfo>", "<ds:KeyName>k</ds:KeyName></ds:KeyInfo>"),
           "Unexpected elements after X509Data"},
          {"something after KeyInfo", ReplaceOnce(good, "</ds:KeyInfo>", "</ds:KeyInfo><ds:KeyInfo/>"),
           "Unexpected elements after SubjectConfirmationData/KeyInfo"},
      });
}

TEST(AssertionParser, RefusesAnUndeclaredPrefixInTheTypeOfConfirmationData) {
  const std::string fragment = KeyData("xsi:type=\"what:KeyInfoConfirmationDataType\"", "");
  OnFragment(fragment, [](const NodeFilterIterator& it) {
    const std::string column = std::to_string(IteratorToElement(it)->GetColumn());
    EXPECT_EQ(VerdictOf([&] { ReadKeyData(it); }),
              "Quorlin::ParseException: Element SubjectConfirmationDataat 1," + column +
                  " uses undefined prefix: `what'");
  });
}

TEST(AssertionParser, PassesOnWhatIsWrongWithACertificate) {
  const auto verdictOnCertificate = [](const std::string& text) {
    std::string verdict;
    OnFragment(KeyData(kKeyType, KeyInfo(X509Data("<ds:X509Certificate>" + text + "</ds:X509Certificate>"))),
               [&](const NodeFilterIterator& it) { verdict = VerdictOf([&] { ReadKeyData(it); }); });
    return verdict;
  };
  EXPECT_EQ(verdictOnCertificate("****"),
            "Pelmar::Base64FormatException: Invalid base64 text: unexpected character");
  EXPECT_EQ(verdictOnCertificate("MAA"),
            "Pelmar::Base64FormatException: Invalid base64 text: the length is not a multiple of four");
  EXPECT_EQ(verdictOnCertificate("MAA="),
            "Pelmar::Crypto::CryptoException: The certificate cannot be read: field missing");
}

// --- The assertion as a whole ---

const char* const kAdvice =
    "<saml:Advice><ext:RSAAdvice AdviceSource=\"s\"><saml:Attribute Name=\"n\"/></ext:RSAAdvice></saml:Advice>";

void ReadAssertion(const NodeFilterIterator& it) {
  SamlAssertionType assertion;
  ParseSamlAssertionElement(it, assertion);
}

std::string SignedAssertion() {
  return TestSupport::SignToken(TestSupport::TokenText());
}

TEST(AssertionParser, ReadsAnAssertion) {
  TestSupport::TokenText text;
  text.id = "_a1";
  text.issueInstant = "2020-01-01T00:00:00.5Z";
  text.advice = kAdvice;
  text.attributes = "<saml:Attribute Name=\"n\"/>";
  TestSupport::TokenSigning signing;
  signing.references[0].uri = "#_a1";
  OnFragment(TestSupport::SignToken(text.Compose(), TestSupport::TokenSigner(), signing),
             [](const NodeFilterIterator& it) {
               SamlAssertionType assertion;
               ParseSamlAssertionElement(it, assertion);
               EXPECT_EQ(assertion.Version, "2.0");
               EXPECT_EQ(assertion.ID, "_a1");
               EXPECT_EQ(assertion.IssueInstant.ToString(), "2020-01-01T00:00:00.5Z");
               EXPECT_EQ(assertion.Issuer, NameIDType("urn:oasis:names:tc:SAML:2.0:nameid-format:entity",
                                                      "https://sts.example/"));
               EXPECT_EQ(assertion.Signature->GetReferences().size(), 1U);
               EXPECT_EQ(assertion.Subject.NameID.second, TestSupport::kTokenSubject);
               EXPECT_EQ(assertion.Advice->RSAAdvice.size(), 1U);
               EXPECT_EQ(assertion.AttributeStatement->Attribute.size(), 1U);
             });
}

TEST(AssertionParser, NeedsNeitherAdviceNorAttributes) {
  OnFragment(SignedAssertion(), [](const NodeFilterIterator& it) {
    SamlAssertionType assertion;
    ParseSamlAssertionElement(it, assertion);
    EXPECT_FALSE(assertion.Advice);
    EXPECT_FALSE(assertion.AttributeStatement);
  });
}

TEST(AssertionParser, AcceptsCommentsAndWhiteSpaceBetweenAnyTwoElements) {
  TestSupport::TokenText text;
  text.advice = kAdvice;
  text.attributes =
      "<saml:Attribute Name=\"n\"><saml:AttributeValue>v</saml:AttributeValue></saml:Attribute>";
  text.restrictions =
      "<saml:AudienceRestriction><saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>" +
      TestSupport::DelegationRestriction(
          TestSupport::DelegateElement("2020-02-02T00:00:00Z", NameIdElement("d@e")));
  std::string spaced = TestSupport::SignToken(text.Compose());
  for (std::size_t at = 0; (at = spaced.find("><", at)) != std::string::npos;) {
    const std::string filling = " <!-- c -->\n\t<!----> ";
    spaced.insert(at + 1, filling);
    at += filling.size();
  }
  ExpectAccepted(ReadAssertion, {spaced});
}

TEST(AssertionParser, RefusesFaultyAssertions) {
  const std::string good = SignedAssertion();
  const std::string version = " Version=\"2.0\"";
  const std::string id = std::string(" ID=\"") + TestSupport::kTokenId + "\"";
  const std::string end = "</saml:Assertion>";
  const auto withAttribute = [&](const std::string& attribute) {
    return ReplaceOnce(good, version, version + attribute);
  };
  const std::string unexpected = "Unexpected attributes on element 'Assertion'";
  const std::string atEnd = "Unexpected elements under Assertion";
  ExpectRefusals(
      ReadAssertion,
      {
          {"other element", "<saml:Response/>", "Expected element 'Assertion' not found."},
          {"SAML 1.1", "<Assertion xmlns=\"urn:oasis:names:tc:SAML:1.0:assertion\"/>",
           "Element 'Assertion' has unexpected namespace"},
          {"no Version", ReplaceOnce(good, version, ""),
           "Node 'Assertion is missing required attribute 'Version'"},
          {"no ID", ReplaceOnce(good, id, ""), "Node 'Assertion is missing required attribute 'ID'"},
          {"Id", ReplaceOnce(good, " ID=", " Id="), "Node 'Assertion is missing required attribute 'ID'"},
          {"no IssueInstant", ReplaceOnce(good, " IssueInstant=", " issueInstant="),
           "Node 'Assertion is missing required attribute 'IssueInstant'"},
          {"nothing at all", "<saml:Assertion/>", "Node 'Assertion is missing required attribute 'Version'"},
          {"further attribute", withAttribute(" x=\"\""), unexpected},
          {"prefixed attribute", withAttribute(" other:x=\"\""), unexpected},
          {"xsi:type", withAttribute(" xsi:type=\"saml:AssertionType\""), unexpected},
          {"xml:id", withAttribute(" xml:id=\"a\""), unexpected},
          {"IssueInstant no date", "<saml:Assertion Version=\"2.0\" ID=\"_1\" IssueInstant=\"now\"/>",
           "Assertion/@IssueInstant is not a date"},
          {"no Issuer", "<saml:Assertion Version=\"2.0\" ID=\"_1\" IssueInstant=\"2020-01-01T00:00:00Z\"/>",
           "Expected element 'Issuer' not found."},
          {"something after the last statement", ReplaceOnce(good, end, "<saml:Other/>" + end), atEnd},
          {"AttributeStatement of another namespace",
           ReplaceOnce(good, end, "<other:AttributeStatement/>" + end), atEnd},
          {"text at the end", ReplaceOnce(good, end, "x" + end), atEnd},
          {"instruction at the end", ReplaceOnce(good, end, "<?p?>" + end), atEnd},
          {"advice at the end", ReplaceOnce(good, end, kAdvice + end), atEnd},
          {"second AuthnStatement", ReplaceOnce(good, end, "<saml:AuthnStatement/>" + end), atEnd},
          {"two attribute statements",
           ReplaceOnce(good, end,
                       "<saml:AttributeStatement><saml:Attribute Name=\"n\"/></saml:AttributeStatement>"
                       "<saml:AttributeStatement><saml:Attribute Name=\"n\"/></saml:AttributeStatement>" +
                           end),
           atEnd},
          {"AuthzDecisionStatement",
           ReplaceOnce(good, "<saml:AuthnStatement", "<saml:AuthzDecisionStatement/><saml:AuthnStatement"),
           "Expected element 'AuthnStatement' not found."},
          {"advice of another namespace",
           ReplaceOnce(good, "<saml:AuthnStatement", "<other:Advice/><saml:AuthnStatement"),
           "Expected element 'AuthnStatement' not found."},
          {"two Advice",
           ReplaceOnce(good, "<saml:AuthnStatement", std::string(kAdvice) + kAdvice + "<saml:AuthnStatement"),
           "Expected element 'AuthnStatement' not found."},
          {"no Conditions", ReplaceOnce(good, "<saml:Conditions", "<saml:Other/><saml:Conditions"),
           "Expected element 'Conditions' not found."},
          {"two subjects",
           ReplaceOnce(
               good, "<saml:Conditions",
               Subject(NameIdElement("m@e") + Confirmation(kBearer, kBearerData)) + "<saml:Conditions"),
           "Expected element 'Conditions' not found."},
          {"something between signature and subject",
           ReplaceOnce(good, "<saml:Subject>", "<saml:Other/><saml:Subject>"),
           "Expected element 'Subject' not found."},
          {"text before the issuer", ReplaceOnce(good, "<saml:Issuer", "x<saml:Issuer"),
           "Expected element 'Issuer' not found."},
          {"nothing after the issuer",
           "<saml:Assertion Version=\"2.0\" ID=\"_1\" IssueInstant=\"2020-01-01T00:00:00Z\"><saml:Issuer Format=\"f\">i"
           "</saml:Issuer></saml:Assertion>",
           "Expected element ds:Signature not found"},
      });
}

TEST(AssertionParser, RefusesNull) {
  EXPECT_EQ(VerdictOf([] {
              ReadAssertion(NodeFilterIterator(nullptr, boost::make_shared<SkipWsAndCommentsFilter>()));
            }),
            "Quorlin::ParseException: Expected element 'Assertion' not found.");
}

}  // namespace
}  // namespace Quorlin
