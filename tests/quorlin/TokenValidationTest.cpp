// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/TokenValidation.h"

#include "quorlin/Namespaces.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"
#include "support/XmlText.h"

#include <gtest/gtest.h>
#include <boost/make_shared.hpp>

#include <limits>
#include <string>
#include <vector>

namespace Quorlin {
namespace {

using Pelmar::System::DateTime;
using Pelmar::System::DateTimeFromUtc;
using TestSupport::VerdictOf;

constexpr long long kSecond = 1000000;
constexpr long long kForever = std::numeric_limits<long long>::max();

long long Now() {
  return Pelmar::System::GetUtcDateTime().GetUtcTime();
}

DateTime At(long long microseconds) {
  return DateTimeFromUtc(microseconds, false);
}

std::string Refused(const std::string& message) {
  return "Quorlin::ParseException: " + message;
}

/// A bearer assertion that holds for an hour, as the parser would deliver it.
SamlAssertionType GoodAssertion(long long now = Now()) {
  SamlAssertionType assertion;
  assertion.Version = "2.0";
  assertion.ID = "_abc";
  assertion.Conditions.NotBefore = At(now - 60 * kSecond);
  assertion.Conditions.NotOnOrAfter = At(now + 3600 * kSecond);
  assertion.Subject.SubjectConfirmation.Method = SamlToken::CONFIRM_BEARER;
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter =
      assertion.Conditions.NotOnOrAfter;
  return assertion;
}

std::string Check(const SamlAssertionType& assertion, long long toleranceSec = 0) {
  return VerdictOf([&] { CheckTokenProperties(assertion, toleranceSec); });
}

// --- Version and ID ---

TEST(CheckTokenProperties, AcceptsAGoodAssertion) {
  EXPECT_EQ(Check(GoodAssertion()), "accepted");
}

TEST(CheckTokenProperties, RequiresVersionTwo) {
  for (const char* const version : {"", "1.1", "2", "2.00", "2.1", " 2.0", "2.0 "}) {
    SamlAssertionType assertion = GoodAssertion();
    assertion.Version = version;
    EXPECT_EQ(Check(assertion), Refused("Invalid token version")) << version;
  }
}

TEST(CheckTokenProperties, RequiresAnIdThatBeginsWithAnUnderscore) {
  SamlAssertionType assertion = GoodAssertion();
  for (const char* const id : {"", "abc", "a_bc", " _abc", "#_abc"}) {
    assertion.ID = id;
    EXPECT_EQ(Check(assertion), Refused("Invalid token ID")) << id;
  }
  for (const char* const id : {"_abc", "_"}) {
    assertion.ID = id;
    EXPECT_EQ(Check(assertion), "accepted") << id;
  }
}

// --- Period ---

/// The verdict on a period given in microseconds from now. When the machine was held up for so long that the
/// answer may have changed under way, it is asked again: what is tested is the rule, not the machine.
std::string CheckPeriod(long long start, long long end, long long toleranceSec) {
  for (;;) {
    const long long now = Now();
    SamlAssertionType assertion = GoodAssertion(now);
    assertion.Conditions.NotBefore = At(now + start);
    assertion.Conditions.NotOnOrAfter = At(now + end);
    assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter =
        assertion.Conditions.NotOnOrAfter;
    std::string verdict = Check(assertion, toleranceSec);
    if (Now() - now < kSecond) {
      const std::string startText = assertion.Conditions.NotBefore.ToString();
      const std::string endText = assertion.Conditions.NotOnOrAfter.ToString();
      if (verdict == Refused("Token start date is in the future: " + startText)) {
        return "starts in the future";
      }
      return verdict == Refused("The token has expired at: " + endText) ? "has expired" : verdict;
    }
  }
}

TEST(CheckTokenProperties, RequiresAStartBeforeTheEnd) {
  const std::string refused =
      Refused("Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.");
  EXPECT_EQ(CheckPeriod(0, 0, 0), refused);
  EXPECT_EQ(CheckPeriod(0, 0, 300), refused);
  EXPECT_EQ(CheckPeriod(5 * kSecond, -5 * kSecond, 300), refused);
  EXPECT_EQ(CheckPeriod(-1, 2 * kSecond, 0), "accepted");
}

TEST(CheckTokenProperties, KeepsThePeriodExactlyWithoutTolerance) {
  EXPECT_EQ(CheckPeriod(0, 2 * kSecond, 0), "accepted");
  EXPECT_EQ(CheckPeriod(2 * kSecond, 60 * kSecond, 0), "starts in the future");
  EXPECT_EQ(CheckPeriod(-60 * kSecond, 0, 0), "has expired");
  EXPECT_EQ(CheckPeriod(-60 * kSecond, -1, 0), "has expired");
}

TEST(CheckTokenProperties, WidensThePeriodByTheToleranceOnBothSides) {
  EXPECT_EQ(CheckPeriod(299 * kSecond, 3600 * kSecond, 300), "accepted");
  EXPECT_EQ(CheckPeriod(300 * kSecond, 3600 * kSecond, 300), "accepted");
  EXPECT_EQ(CheckPeriod(301 * kSecond, 3600 * kSecond, 300), "starts in the future");
  EXPECT_EQ(CheckPeriod(-3600 * kSecond, -299 * kSecond, 300), "accepted");
  EXPECT_EQ(CheckPeriod(-3600 * kSecond, -300 * kSecond, 300), "has expired");
  EXPECT_EQ(CheckPeriod(-3600 * kSecond, -301 * kSecond, 300), "has expired");
}

TEST(CheckTokenProperties, NarrowsThePeriodByANegativeTolerance) {
  EXPECT_EQ(CheckPeriod(-5 * kSecond, 60 * kSecond, -10), "starts in the future");
  EXPECT_EQ(CheckPeriod(-60 * kSecond, 5 * kSecond, -10), "has expired");
  EXPECT_EQ(CheckPeriod(-60 * kSecond, 60 * kSecond, -10), "accepted");
}

TEST(CheckTokenProperties, DoesNotOverflowWithAnyTolerance) {
  SamlAssertionType assertion = GoodAssertion();
  assertion.Conditions.NotBefore = DateTime("0001-01-01T00:00:00Z");
  assertion.Conditions.NotOnOrAfter = DateTime("0001-01-02T00:00:00Z");
  EXPECT_EQ(Check(assertion, kForever), "accepted");
  EXPECT_EQ(Check(assertion, -kForever - 1),
            Refused("Token start date is in the future: 0001-01-01T00:00:00Z"));
  assertion.Conditions.NotBefore = DateTime("9999-01-01T00:00:00Z");
  assertion.Conditions.NotOnOrAfter = DateTime("9999-12-31T23:59:59Z");
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter =
      assertion.Conditions.NotOnOrAfter;
  EXPECT_EQ(Check(assertion, kForever), "accepted");
  EXPECT_EQ(Check(assertion, -kForever - 1),
            Refused("Token start date is in the future: 9999-01-01T00:00:00Z"));
}

TEST(CheckTokenProperties, PrintsTheDatesAsThePlatformDoes) {
  SamlAssertionType assertion = GoodAssertion();
  assertion.Conditions.NotBefore = DateTime("2012-03-05T07:04:09.045Z");
  assertion.Conditions.NotOnOrAfter = DateTime("2012-03-05T08:04:09+01:00");
  EXPECT_EQ(Check(assertion),
            Refused("Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter."));
  assertion.Conditions.NotOnOrAfter = DateTime("2012-03-05T09:04:09+01:00");
  EXPECT_EQ(Check(assertion), Refused("The token has expired at: 2012-03-05T08:04:09Z"));
  assertion.Conditions.NotBefore = DateTime("9012-03-05T07:04:09.045Z");
  assertion.Conditions.NotOnOrAfter = DateTime("9012-03-06T07:04:09Z");
  EXPECT_EQ(Check(assertion), Refused("Token start date is in the future: 9012-03-05T07:04:09.045Z"));
}

TEST(CheckTokenProperties, RequiresABearerToBeConfirmedToTheEnd) {
  SamlAssertionType assertion = GoodAssertion();
  const long long end = assertion.Conditions.NotOnOrAfter.GetUtcTime();
  DateTime& confirmed = assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter;
  confirmed = At(end - kSecond);
  EXPECT_EQ(Check(assertion), Refused("Invalid token subject validity"));
  confirmed = At(end - 1);
  EXPECT_EQ(Check(assertion), Refused("Invalid token subject validity"));
  EXPECT_EQ(Check(assertion, 300), Refused("Invalid token subject validity"))
      << "the tolerance does not matter here";
  confirmed = At(end + kSecond);
  EXPECT_EQ(Check(assertion), "accepted");
}

TEST(CheckTokenProperties, DoesNotAskForTheConfirmationPeriodOfAHolderOfKey) {
  SamlAssertionType assertion = GoodAssertion();
  assertion.Subject.SubjectConfirmation.Method = SamlToken::CONFIRM_HOLDER_OF_KEY;
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter =
      At(assertion.Conditions.NotOnOrAfter.GetUtcTime() - kSecond);
  EXPECT_EQ(Check(assertion), "accepted");
}

// --- Delegation ---

DelegateType DelegateNamed(const std::string& format, const std::string& text) {
  DelegateType delegate;
  delegate.NameID = NameIDType(format, text);
  return delegate;
}

SamlAssertionType DelegatedAssertion() {
  SamlAssertionType assertion = GoodAssertion();
  assertion.Subject.SubjectConfirmation.DelegateId = NameIDType("urn:f", "last@e");
  assertion.Conditions.DelegationRestriction = DelegationRestrictionType();
  assertion.Conditions.DelegationRestriction->Delegate = {DelegateNamed("urn:f", "first@e"),
                                                          DelegateNamed("urn:f", "last@e")};
  return assertion;
}

TEST(CheckTokenProperties, AcceptsTheLastDelegateAsTheOneConfirmed) {
  EXPECT_EQ(Check(DelegatedAssertion()), "accepted");
}

TEST(CheckTokenProperties, RefusesADelegateIdWithoutRestriction) {
  SamlAssertionType assertion = DelegatedAssertion();
  assertion.Conditions.DelegationRestriction = boost::none;
  EXPECT_EQ(
      Check(assertion),
      Refused("Token SubjectConfirmation contains delegate id, but no delegation restriction is present"));
}

TEST(CheckTokenProperties, RefusesARestrictionWithoutDelegateId) {
  SamlAssertionType assertion = DelegatedAssertion();
  assertion.Subject.SubjectConfirmation.DelegateId = boost::none;
  const std::string refused =
      Refused("Token has delegation restriction, but no delegate id is present in the SubjectConfirmation");
  EXPECT_EQ(Check(assertion), refused);
  assertion.Conditions.DelegationRestriction->Delegate.clear();
  EXPECT_EQ(Check(assertion), refused);
}

TEST(CheckTokenProperties, RefusesAnyOtherDelegateId) {
  const std::vector<NameIDType> others = {NameIDType("urn:f", "first@e"), NameIDType("urn:f", "Last@e"),
                                          NameIDType("urn:F", "last@e"),  NameIDType("last@e", "urn:f"),
                                          NameIDType("urn:f", "last@e "), NameIDType("", "")};
  for (const NameIDType& other : others) {
    SamlAssertionType assertion = DelegatedAssertion();
    assertion.Subject.SubjectConfirmation.DelegateId = other;
    EXPECT_EQ(Check(assertion),
              Refused("The SubjectConfirmation delegate id does not match the id of the last delegate"))
        << other.first << " " << other.second;
  }
}

// --- Order ---

TEST(CheckTokenProperties, ReportsTheFirstOfSeveralFaults) {
  SamlAssertionType assertion = DelegatedAssertion();
  assertion.Version = "1.1";
  assertion.ID = "abc";
  assertion.Conditions.NotBefore = DateTime("9012-01-02T00:00:00Z");
  assertion.Conditions.NotOnOrAfter = DateTime("9012-01-01T00:00:00Z");
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter =
      DateTime("2012-01-01T00:00:00Z");
  assertion.Subject.SubjectConfirmation.DelegateId = boost::none;
  EXPECT_EQ(Check(assertion), Refused("Invalid token version"));
  assertion.Version = "2.0";
  EXPECT_EQ(Check(assertion), Refused("Invalid token ID"));
  assertion.ID = "_abc";
  EXPECT_EQ(Check(assertion),
            Refused("Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter."));
  assertion.Conditions.NotOnOrAfter = DateTime("9012-01-03T00:00:00Z");
  EXPECT_EQ(Check(assertion), Refused("Token start date is in the future: 9012-01-02T00:00:00Z"));
  assertion.Conditions.NotBefore = DateTime("2012-01-02T00:00:00Z");
  assertion.Conditions.NotOnOrAfter = DateTime("2012-01-03T00:00:00Z");
  EXPECT_EQ(Check(assertion), Refused("The token has expired at: 2012-01-03T00:00:00Z"));
  assertion.Conditions.NotOnOrAfter = DateTime("9012-01-03T00:00:00Z");
  EXPECT_EQ(Check(assertion), Refused("Invalid token subject validity"));
  assertion.Subject.SubjectConfirmation.SubjectConfirmationData.NotOnOrAfter =
      DateTime("9012-01-03T00:00:00Z");
  EXPECT_EQ(
      Check(assertion),
      Refused("Token has delegation restriction, but no delegate id is present in the SubjectConfirmation"));
}

// --- The signature's place ---

/// What ParseTokenSignature says of the node after the issuer in a document whose element is an assertion.
struct SignatureReading {
  std::string verdict;
  std::string next;  // The element where the iterator stands afterwards.
  bool isSet;
};

SignatureReading ReadSignature(const std::string& text) {
  const auto document = TestSupport::ParseXmlText(text);
  Pelmar::Xml::ElementNode* const assertion = document->GetDocumentElement();
  NodeFilterIterator it(assertion, boost::make_shared<SkipWsAndCommentsFilter>());
  it.MoveToChild().MoveToSibling();
  Pelmar::Ref<Pelmar::Xml::Security::Signature> signature;
  const std::string verdict = VerdictOf([&] { ParseTokenSignature(it, assertion, signature); });
  const Pelmar::Xml::ElementNode* const element = IteratorToElement(it);
  return {verdict, element == nullptr ? "" : element->GetLocalName(), static_cast<bool>(signature)};
}

std::string SignedFor(const std::string& uri) {
  TestSupport::TokenSigning signing;
  signing.references[0].uri = uri;
  signing.references[0].targetId = TestSupport::kTokenId;
  return TestSupport::SignToken(TestSupport::TokenText().Compose(), TestSupport::TokenSigner(), signing);
}

TEST(ParseTokenSignature, TakesTheSignatureAndMovesOn) {
  for (const std::string& uri : {std::string(), std::string("#") + TestSupport::kTokenId}) {
    const SignatureReading reading = ReadSignature(SignedFor(uri));
    EXPECT_EQ(reading.verdict, "accepted") << uri;
    EXPECT_EQ(reading.next, "Subject") << uri;
    EXPECT_TRUE(reading.isSet) << uri;
  }
}

TEST(ParseTokenSignature, RefusesAReferenceToAnythingElse) {
  const std::string refused = Refused("Token's signature must cover the entire token");
  for (const char* const uri :
       {"#_4F0A9C1E", "#4f0a9c1e", "_4f0a9c1e", "#_4f0a9c1e ", "#", "##_4f0a9c1e", "#_4f0a9c1",
        "http://sts.example/#_4f0a9c1e", "#xpointer(/)", "#xpointer(id('_4f0a9c1e'))"}) {
    const SignatureReading reading = ReadSignature(SignedFor(uri));
    EXPECT_EQ(reading.verdict, refused) << uri;
    EXPECT_EQ(reading.next, "Signature") << uri;
    EXPECT_FALSE(reading.isSet) << uri;
  }
}

TEST(ParseTokenSignature, IsContentWhenOneOfSeveralReferencesCovers) {
  TestSupport::TokenSigning signing;
  TestSupport::ReferencePlan other;
  other.uri = "#other";
  other.targetId = TestSupport::kTokenId;
  signing.references = {other, TestSupport::ReferencePlan(), other};
  const std::string text =
      TestSupport::SignToken(TestSupport::TokenText().Compose(), TestSupport::TokenSigner(), signing);
  EXPECT_EQ(ReadSignature(text).verdict, "accepted");
}

TEST(ParseTokenSignature, RefusesNodesThatAreNoElements) {
  const std::string refused = Refused("Expected element ds:Signature not found");
  EXPECT_EQ(ReadSignature("<a><i/></a>").verdict, refused);
  EXPECT_EQ(ReadSignature("<a><i/> <!--c--> </a>").verdict, refused);
  EXPECT_EQ(ReadSignature("<a><i/>x</a>").verdict, refused);
  EXPECT_EQ(ReadSignature("<a><i/><?p?></a>").verdict, refused);
}

TEST(ParseTokenSignature, NamesTheSyntaxError) {
  EXPECT_EQ(ReadSignature("<a><i/><b:Signature xmlns:b='urn:b'/></a>").verdict,
            Refused("Signature syntax error: Element 'b:Signature' is not a signature at line 1, column 8"));
  EXPECT_EQ(
      ReadSignature("<a><i/>\n <d:Signature xmlns:d='http://www.w3.org/2000/09/xmldsig#'/></a>").verdict,
      Refused(
          "Signature syntax error: Element 'SignedInfo' is missing in 'd:Signature' at line 2, column 2"));
}

// --- Names ---

std::string NameOf(const std::string& format, const std::string& text) {
  std::string name;
  const std::string verdict = VerdictOf([&] {
    const PrincipalId principal = ParseSamlNameId(NameIDType(format, text));
    name = "{" + principal.name + "}{" + principal.domain + "}";
  });
  return verdict == "accepted" ? name : verdict;
}

TEST(ParseSamlNameId, SplitsAUserPrincipalName) {
  EXPECT_EQ(NameOf("http://schemas.xmlsoap.org/claims/UPN", "user@example"), "{user}{example}");
  EXPECT_EQ(NameOf(kClaimUpn, "User@EXAMPLE.com"), "{User}{EXAMPLE.com}");
  EXPECT_EQ(NameOf(kClaimUpn, "a\\b/c@d"), "{a\\b/c}{d}");
  EXPECT_EQ(NameOf(kClaimUpn, " a @ b "), "{ a }{ b }");
}

TEST(ParseSamlNameId, RefusesOtherNumbersOfParts) {
  for (const char* const text :
       {"", "user", "@", "@example", "user@", "user@@example", "@@", "a@b@c", "@a@b", "a@b@"}) {
    EXPECT_EQ(NameOf(kClaimUpn, text), Refused(std::string("Failed to parse the UPN NameID: ") + text))
        << text;
  }
}

TEST(ParseSamlNameId, RefusesEveryOtherFormat) {
  for (const char* const format :
       {"", "urn:oasis:names:tc:SAML:1.1:nameid-format:unspecified",
        "urn:oasis:names:tc:SAML:1.1:nameid-format:emailAddress",
        "urn:oasis:names:tc:SAML:2.0:nameid-format:persistent", "http://schemas.xmlsoap.org/claims/upn",
        "http://schemas.xmlsoap.org/claims/UPN ", "http://schemas.xmlsoap.org/claims/UPN/"}) {
    EXPECT_EQ(NameOf(format, "user@example"),
              Refused(std::string("Invalid or unsupported NameId format '") + format + "'"));
  }
}

TEST(ParseSamlNameId, ChecksTheFormatFirst) {
  EXPECT_EQ(NameOf("f", "nobody"), Refused("Invalid or unsupported NameId format 'f'"));
}

TEST(ParseToDelegate, TakesNameAndInstant) {
  DelegateType parsed = DelegateNamed(kClaimUpn, "proxy@example.com");
  parsed.DelegationInstant = DateTime("2012-03-05T07:04:09Z");
  const Delegate delegate = ParseToDelegate(parsed);
  EXPECT_EQ(delegate.principal.name, "proxy");
  EXPECT_EQ(delegate.principal.domain, "example.com");
  EXPECT_EQ(delegate.delegationInstant, parsed.DelegationInstant);
}

TEST(ParseToDelegate, RefusesEveryOtherFormat) {
  EXPECT_EQ(VerdictOf([] { ParseToDelegate(DelegateNamed("urn:f", "proxy@example.com")); }),
            Refused("Invalid or unsupported NameId format 'urn:f'"));
}

std::string GroupOf(const std::string& value) {
  std::string group;
  const std::string verdict = VerdictOf([&] {
    const PrincipalId principal = ParseGroupIdentity(value);
    group = "name " + principal.name + ", domain " + principal.domain;
  });
  return verdict == "accepted" ? group : verdict;
}

TEST(ParseGroupIdentity, TakesTheDomainFirstBeforeABackslash) {
  EXPECT_EQ(GroupOf("DOMAIN\\group"), "name group, domain DOMAIN");
  EXPECT_EQ(GroupOf("a/b\\c/d"), "name c/d, domain a/b");
}

TEST(ParseGroupIdentity, TakesTheNameFirstBeforeASlash) {
  EXPECT_EQ(GroupOf("group/DOMAIN"), "name group, domain DOMAIN");
  EXPECT_EQ(GroupOf(" g @ /D"), "name  g @ , domain D");
}

TEST(ParseGroupIdentity, RefusesOtherNumbersOfParts) {
  for (const char* const value : {"", "group", "/", "\\", "/b", "a/", "a//b", "a/b/c", "\\b", "a\\", "a\\\\b",
                                  "a\\b\\c", "a\\b\\", "a/b\\", "\\a/b"}) {
    EXPECT_EQ(GroupOf(value), Refused(std::string("Failed to parse Group Identity value: `") + value +
                                      "'; too many/not enough separators"));
  }
}

// --- Attributes ---

AttributeType AttributeNamed(const std::string& name, const std::vector<std::string_view>& values = {}) {
  AttributeType attribute;
  attribute.Name = name;
  attribute.Values = values;
  return attribute;
}

std::string SolutionOf(const std::vector<std::string_view>& values) {
  bool isSolution = false;
  const std::string verdict =
      VerdictOf([&] { isSolution = ParseIsSolutionAttribute(AttributeNamed(kAttrIsSolution, values)); });
  return verdict != "accepted" ? verdict : isSolution ? "true" : "false";
}

TEST(ParseIsSolutionAttribute, SaysTrueForTheWordTrueOnly) {
  for (const char* const value : {"true", "True", "TRUE", "tRuE"}) {
    EXPECT_EQ(SolutionOf({value}), "true") << value;
  }
  for (const char* const value : {"false", "1", "yes", "", " true", "true ", "truex"}) {
    EXPECT_EQ(SolutionOf({value}), "false") << value;
  }
}

TEST(ParseIsSolutionAttribute, ThrowsAPointerUnlessThereIsOneValue) {
  EXPECT_EQ(SolutionOf({}), "pointer to Quorlin::ParseException: No value found for attribute isSolution.");
  EXPECT_EQ(SolutionOf({"true", "true"}),
            "pointer to Quorlin::ParseException: More than one value found for attribute isSolution.");
}

TEST(ParseIsSolutionAttribute, IsNotCaughtByHandlersForObjects) {
  bool caughtAsPointer = false;
  try {
    ParseIsSolutionAttribute(AttributeNamed(kAttrIsSolution));
  } catch (const std::exception&) {
    FAIL() << "thrown by value";
  } catch (ParseException* error) {
    caughtAsPointer = true;
    delete error;
  }
  EXPECT_TRUE(caughtAsPointer);
}

TEST(ParsePrincipalNameAttribute, GivesTheFirstValueOrNothing) {
  EXPECT_EQ(ParsePrincipalNameAttribute(AttributeNamed("n", {"Alice", "Bob"})), "Alice");
  EXPECT_EQ(ParsePrincipalNameAttribute(AttributeNamed("n")), "");
}

TEST(SamlAttributeIs, KnowsEachAttributeByItsWholeName) {
  struct Case {
    bool (*is)(const AttributeType&);
    std::string name;
  };
  const std::vector<Case> cases = {
      {SamlAttributeIsGroupIdentity, QUORLIN_VENDOR_URI_BASE "/schemas/attr-names/2009/01/GroupIdentity"},
      {SamlAttributeIsSolution, QUORLIN_VENDOR_URI_BASE "/schemas/attr-names/2011/07/isSolution"},
      {SamlAttributeIsGivenName, "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname"},
      {SamlAttributeIsSurName, "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname"}};
  for (const Case& asked : cases) {
    for (const Case& other : cases) {
      EXPECT_EQ(asked.is(AttributeNamed(other.name)), asked.name == other.name) << asked.name << other.name;
    }
    EXPECT_FALSE(asked.is(AttributeNamed(asked.name + "s")));
    EXPECT_FALSE(asked.is(AttributeNamed(asked.name + " ")));
    EXPECT_FALSE(asked.is(AttributeNamed(asked.name.substr(1))));
    EXPECT_FALSE(asked.is(AttributeNamed("")));
    AttributeType friendly = AttributeNamed("n");
    friendly.FriendlyName = asked.name;
    EXPECT_FALSE(asked.is(friendly));
  }
}

}  // namespace
}  // namespace Quorlin
