// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tokens from text and from a tree: what they say, and in which order they are judged.

#include "quorlin/Namespaces.h"
#include "support/TokenFactory.h"
#include "support/Verdict.h"
#include "support/VirtualSlot.h"
#include "support/XmlText.h"

#include <quorlin/SamlToken.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>
#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

namespace Quorlin {
namespace {

using namespace TestSupport;
using Pelmar::Ref;
using Pelmar::Crypto::Certificate;
using Token = boost::shared_ptr<SamlToken>;

std::string Refused(const std::string& message) {
  return "Quorlin::ParseException: " + message;
}

std::string Print(const PrincipalId& principal) {
  return principal.name + " of " + principal.domain;
}

std::string PrintGroups(const Token& token) {
  std::vector<PrincipalId> groups = {PrincipalId("left", "over")};
  token->GetGroups(groups);
  std::string text;
  for (const PrincipalId& group : groups) {
    text += (text.empty() ? "" : ", ") + Print(group);
  }
  return text;
}

std::pair<std::string, std::string> FullName(const Token& token) {
  std::pair<std::string, std::string> name("left", "over");
  token->GetFullName(name);
  return name;
}

// --- Value types ---

TEST(PrincipalId, IgnoresCaseInBothParts) {
  EXPECT_TRUE(PrincipalId("user", "EXAMPLE.COM") == PrincipalId("USER", "example.com"));
  EXPECT_FALSE(PrincipalId("user", "EXAMPLE.COM") != PrincipalId("USER", "example.com"));
  const PrincipalId same("user", "d");
  EXPECT_TRUE(same == same);
}

TEST(PrincipalId, DiffersInAnythingButCase) {
  const PrincipalId principal("user", "example.com");
  for (const PrincipalId& other : {PrincipalId("users", "example.com"), PrincipalId("user", "example.org"),
                                   PrincipalId("example.com", "user"), PrincipalId("user ", "example.com"),
                                   PrincipalId("user@example.com", "example.com")}) {
    EXPECT_FALSE(principal == other) << Print(other);
    EXPECT_TRUE(principal != other) << Print(other);
  }
}

TEST(PrincipalIdDeathTest, MustNotHaveAnEmptyPart) {
  EXPECT_DEATH(PrincipalId("", "domain"), "!name\\.empty\\(\\)");
  EXPECT_DEATH(PrincipalId("name", ""), "!domain\\.empty\\(\\)");
  const std::string part = "part";
  const std::string none;
  EXPECT_DEATH(PrincipalId(none, part), "!name\\.empty\\(\\)");
  EXPECT_DEATH(PrincipalId(part, none), "!domain\\.empty\\(\\)");
}

TEST(SamlToken, NumbersItsConfirmationTypes) {
  EXPECT_EQ(static_cast<int>(SamlToken::CONFIRM_BEARER), 0);
  EXPECT_EQ(static_cast<int>(SamlToken::CONFIRM_HOLDER_OF_KEY), 1);
  EXPECT_FALSE(std::has_virtual_destructor<SamlToken>::value);
}

TEST(SamlToken, KeepsItsOperationsInTheirOrder) {
  EXPECT_EQ(SlotOf(&SamlToken::GetId), 0);
  EXPECT_EQ(SlotOf(&SamlToken::GetStartDate), 1);
  EXPECT_EQ(SlotOf(&SamlToken::GetEndDate), 2);
  EXPECT_EQ(SlotOf(&SamlToken::GetSubject), 3);
  EXPECT_EQ(SlotOf(&SamlToken::IsRenewable), 4);
  EXPECT_EQ(SlotOf(&SamlToken::IsDelegable), 5);
  EXPECT_EQ(SlotOf(&SamlToken::IsSolution), 6);
  EXPECT_EQ(SlotOf(&SamlToken::GetConfirmationMethod), 7);
  EXPECT_EQ(SlotOf(&SamlToken::GetFullName), 8);
  EXPECT_EQ(SlotOf(&SamlToken::GetGroups), 9);
  EXPECT_EQ(SlotOf(&SamlToken::GetDelegationChain), 10);
  EXPECT_EQ(SlotOf(&SamlToken::GetAudience), 11);
  EXPECT_EQ(SlotOf(&SamlToken::GetAdvice), 12);
  EXPECT_EQ(SlotOf(&SamlToken::GetConfirmationCertificate), 13);
  EXPECT_EQ(SlotOf(&SamlToken::ToXml), 14);
}

// --- What a token says ---

TEST(SamlToken, SaysWhatAPlainBearerAssertionSays) {
  TokenText text;
  const Token token = ReadToken(text);
  EXPECT_EQ(MeaningOf(*token),
            "id {_4f0a9c1e}\nfrom " + text.notBefore + " until " + text.notOnOrAfter +
                "\nsubject {alice}{example.com}\nname {}{}\nrenewable 0, delegable 0, solution 0, "
                "confirmation 0\ncertificate none\n");
}

TEST(SamlToken, SaysAllThatAFullAssertionSays) {
  const Identity holder = MakeSelfSigned(CertificateSpec());
  TokenText text;
  text.HoldKey(holder);
  text.delegateId = NameIdElement("proxy2@example.com");
  text.restrictions =
      ProxyRestriction("Count=\"2\"") +
      DelegationRestriction(DelegateElement("2020-01-01T00:00:00Z", NameIdElement("proxy1@example.com")) +
                            DelegateElement("2020-01-02T00:00:00.5Z", NameIdElement("proxy2@example.com"))) +
      "<saml:AudienceRestriction><saml:Audience>urn:b</saml:Audience><saml:Audience>urn:a</saml:Audience>"
      "</saml:AudienceRestriction>" +
      RenewRestriction("Count=\"1\"");
  text.advice = "<saml:Advice><ext:RSAAdvice AdviceSource=\"s1\">" + AttributeElement("n1", {"v1", "v2"}) +
                AttributeElement("n2", {}) + "</ext:RSAAdvice><ext:RSAAdvice AdviceSource=\"s2\">" +
                AttributeElement("n3", {"v3"}) + "</ext:RSAAdvice></saml:Advice>";
  text.attributes = AttributeElement(kAttrGroupIdentity, {"D\\g1", "g2/D"}) +
                    AttributeElement(kClaimSurname, {"Liddell"}) +
                    AttributeElement(kClaimGivenName, {"Alice"}) +
                    AttributeElement(kAttrIsSolution, {"true"}) + AttributeElement("urn:other", {"ignored"});
  const Token token = ReadToken(text);
  EXPECT_EQ(
      MeaningOf(*token),
      "id {_4f0a9c1e}\nfrom " + text.notBefore + " until " + text.notOnOrAfter +
          "\nsubject {alice}{example.com}\nname {Alice}{Liddell}\ngroup {g1}{D}\ngroup {g2}{D}\n"
          "delegate {proxy1}{example.com} 2020-01-01T00:00:00Z\ndelegate {proxy2}{example.com} 2020-01-02T00:00:00.5Z\n"
          "renewable 1, delegable 1, solution 1, confirmation 1\naudience {urn:a}\naudience {urn:b}\n"
          "advice {s1} {n1}:{v1}{v2} {n2}:\nadvice {s2} {n3}:{v3}\ncertificate " +
          Pelmar::Crypto::ToHex(holder.certificate->GetSha256()) + "\n");
}

TEST(SamlToken, ReplacesWhatContainersHeld) {
  const Token token = ReadToken(TokenText());
  EXPECT_EQ(PrintGroups(token), "");
  EXPECT_EQ(FullName(token), std::make_pair(std::string(), std::string()));
  std::vector<Delegate> chain = {Delegate(PrincipalId("left", "over"), Pelmar::System::DateTime())};
  token->GetDelegationChain(chain);
  EXPECT_TRUE(chain.empty());
  std::set<std::string> audience = {"left over"};
  token->GetAudience(audience);
  EXPECT_TRUE(audience.empty());
  std::vector<Advice> advice(1);
  token->GetAdvice(advice);
  EXPECT_TRUE(advice.empty());
}

TEST(SamlToken, GivesReferencesToWhatItHolds) {
  const Token token = ReadToken(TokenText());
  EXPECT_EQ(&token->GetId(), &token->GetId());
  EXPECT_EQ(&token->GetSubject(), &token->GetSubject());
  EXPECT_EQ(&token->GetStartDate(), &token->GetStartDate());
  EXPECT_EQ(&token->GetEndDate(), &token->GetEndDate());
  EXPECT_EQ(&token->ToXml(), &token->ToXml());
}

TEST(SamlToken, CanBeReadFromSeveralThreads) {
  TokenText text;
  text.attributes = AttributeElement(kAttrGroupIdentity, {"D\\g"});
  const Token token = ReadToken(text);
  const std::string meaning = MeaningOf(*token);
  std::vector<std::string> meanings(4);
  std::vector<std::thread> readers;
  for (std::string& own : meanings) {
    readers.emplace_back([&own, &token] { own = MeaningOf(*token); });
  }
  for (std::thread& reader : readers) {
    reader.join();
  }
  EXPECT_EQ(meanings, std::vector<std::string>(4, meaning));
}

bool IsDelegableWith(const std::string& restrictions) {
  TokenText text;
  text.restrictions = restrictions;
  return ReadToken(text)->IsDelegable();
}

TEST(SamlToken, IsDelegableWithAPositiveProxyCountOnly) {
  EXPECT_FALSE(IsDelegableWith(""));
  EXPECT_FALSE(IsDelegableWith(ProxyRestriction("")));
  EXPECT_FALSE(IsDelegableWith(ProxyRestriction("Count=\"0\"")));
  EXPECT_TRUE(IsDelegableWith(ProxyRestriction("Count=\"1\"")));
  EXPECT_TRUE(IsDelegableWith(ProxyRestriction("Count=\"10\"")));
  EXPECT_FALSE(IsDelegableWith(RenewRestriction("Count=\"10\"")));
}

bool IsRenewableWith(const std::string& restrictions) {
  TokenText text;
  text.restrictions = restrictions;
  return ReadToken(text)->IsRenewable();
}

TEST(SamlToken, IsRenewableWithAPositiveRenewCountOnly) {
  EXPECT_FALSE(IsRenewableWith(""));
  EXPECT_FALSE(IsRenewableWith(RenewRestriction("")));
  EXPECT_FALSE(IsRenewableWith(RenewRestriction("Count=\"0\"")));
  EXPECT_TRUE(IsRenewableWith(RenewRestriction("Count=\"1\"")));
  EXPECT_TRUE(IsRenewableWith(RenewRestriction("Count=\"10\" Postdatable=\"true\" RenewExpired=\"false\"")));
  EXPECT_FALSE(IsRenewableWith(ProxyRestriction("Count=\"10\"")));
}

// --- Attributes ---

Token TokenWith(const std::string& attributes) {
  TokenText text;
  text.attributes = attributes;
  return ReadToken(text);
}

TEST(SamlToken, AppendsTheGroupsOfEveryGroupAttribute) {
  EXPECT_EQ(PrintGroups(TokenWith(
                AttributeElement(kAttrGroupIdentity, {"D\\b", "a/D"}) + AttributeElement("urn:x", {"D\\x"}) +
                AttributeElement(kAttrGroupIdentity, {}) + AttributeElement(kAttrGroupIdentity, {"D\\b"}))),
            "b of D, a of D, b of D");
}

TEST(SamlToken, TakesTheLastOfSeveralFlagsAndNames) {
  EXPECT_TRUE(
      TokenWith(AttributeElement(kAttrIsSolution, {"false"}) + AttributeElement(kAttrIsSolution, {"TRUE"}))
          ->IsSolution());
  EXPECT_FALSE(
      TokenWith(AttributeElement(kAttrIsSolution, {"true"}) + AttributeElement(kAttrIsSolution, {"1"}))
          ->IsSolution());
  EXPECT_EQ(
      FullName(TokenWith(AttributeElement(kClaimGivenName, {"A", "ignored"}) +
                         AttributeElement(kClaimSurname, {"B"}) + AttributeElement(kClaimGivenName, {"C"}))),
      std::make_pair(std::string("C"), std::string("B")));
  EXPECT_EQ(FullName(TokenWith(AttributeElement(kClaimSurname, {"B"}) + AttributeElement(kClaimSurname, {}))),
            std::make_pair(std::string(), std::string()));
}

TEST(SamlToken, RefusesAMalformedGroup) {
  TokenText text;
  text.attributes = AttributeElement(kAttrGroupIdentity, {"D\\good", "bad"});
  EXPECT_EQ(VerdictOnToken(text),
            Refused("Failed to parse Group Identity value: `bad'; too many/not enough separators"));
}

TEST(SamlToken, ThrowsTheErrorsOfTheSolutionFlagByPointer) {
  TokenText text;
  text.attributes = AttributeElement(kAttrIsSolution, {});
  EXPECT_EQ(VerdictOnToken(text),
            "pointer to Quorlin::ParseException: No value found for attribute isSolution.");
  text.attributes = AttributeElement(kAttrIsSolution, {"true", "true"});
  EXPECT_EQ(VerdictOnToken(text),
            "pointer to Quorlin::ParseException: More than one value found for attribute isSolution.");
}

TEST(SamlToken, RefusesMalformedNames) {
  TokenText text;
  text.nameId = NameIdElement("alice");
  EXPECT_EQ(VerdictOnToken(text), Refused("Failed to parse the UPN NameID: alice"));
  text.nameId = NameIdElement("urn:oasis:names:tc:SAML:1.1:nameid-format:emailAddress", "alice@example.com");
  EXPECT_EQ(
      VerdictOnToken(text),
      Refused(
          "Invalid or unsupported NameId format 'urn:oasis:names:tc:SAML:1.1:nameid-format:emailAddress'"));
}

TEST(SamlToken, RefusesMalformedNamesInTheDelegationChain) {
  TokenText text;
  text.delegateId = NameIdElement("proxy2@example.com");
  const std::string last = DelegateElement("2020-01-02T00:00:00Z", NameIdElement("proxy2@example.com"));
  text.restrictions =
      DelegationRestriction(DelegateElement("2020-01-01T00:00:00Z", NameIdElement("proxy1")) + last);
  EXPECT_EQ(VerdictOnToken(text), Refused("Failed to parse the UPN NameID: proxy1"));
  text.restrictions = DelegationRestriction(
      DelegateElement("2020-01-01T00:00:00Z", NameIdElement("urn:f", "proxy1@example.com")) + last);
  EXPECT_EQ(VerdictOnToken(text), Refused("Invalid or unsupported NameId format 'urn:f'"));
}

// --- Order ---

TEST(SamlToken, IsJudgedInTheOrderStructurePropertiesSignatureMeaning) {
  TokenText text;
  text.version = "1.1";
  text.nameId = NameIdElement("nobody");
  text.attributes = AttributeElement(kAttrGroupIdentity, {"bad"});
  text.restrictions = "<saml:OneTimeUse/>";
  const auto tampered = [&text] {
    return ReplaceOnce(SignToken(text), "https://sts.example/", "https://sts.example");
  };
  EXPECT_EQ(VerdictOnToken(tampered()),
            Refused("Unknown or duplicate restriction node under Conditions: OneTimeUse"));
  text.restrictions.clear();
  EXPECT_EQ(VerdictOnToken(tampered()), Refused("Invalid token version"));
  text.version = "2.0";
  EXPECT_EQ(
      VerdictOnToken(tampered()),
      "Quorlin::InvalidSignatureException: Failed to verify signature: token might have been tampered with.");
  EXPECT_EQ(VerdictOnToken(text), Refused("Failed to parse the UPN NameID: nobody"));
  text.nameId = NameIdElement(kTokenSubject);
  EXPECT_EQ(VerdictOnToken(text),
            Refused("Failed to parse Group Identity value: `bad'; too many/not enough separators"));
}

TEST(SamlToken, MeansItsAttributesInDocumentOrder) {
  TokenText text;
  text.delegateId = NameIdElement("proxy");
  text.restrictions = DelegationRestriction(DelegateElement("2020-01-01T00:00:00Z", NameIdElement("proxy")));
  text.attributes = AttributeElement(kAttrIsSolution, {}) + AttributeElement(kAttrGroupIdentity, {"bad"});
  EXPECT_EQ(VerdictOnToken(text),
            "pointer to Quorlin::ParseException: No value found for attribute isSolution.");
  text.attributes = AttributeElement(kAttrGroupIdentity, {"bad"}) + AttributeElement(kAttrIsSolution, {});
  EXPECT_EQ(VerdictOnToken(text),
            Refused("Failed to parse Group Identity value: `bad'; too many/not enough separators"));
  text.attributes.clear();
  EXPECT_EQ(VerdictOnToken(text), Refused("Failed to parse the UPN NameID: proxy"));
}

TEST(SamlToken, IsRefusedForItsSignaturesPlaceBeforeItsProperties) {
  TokenText text;
  text.version = "1.1";
  TokenSigning signing;
  signing.references[0].uri = "#other";
  signing.references[0].targetId = kTokenId;
  EXPECT_EQ(VerdictOnToken(SignToken(text.Compose(), TokenSigner(), signing)),
            Refused("Token's signature must cover the entire token"));
}

TEST(SamlToken, IsRefusedForItsTimesBeforeItsSignatureIsVerified) {
  TokenText text;
  text.notBefore = "2012-01-01T00:00:00Z";
  text.notOnOrAfter = "2012-01-02T00:00:00Z";
  EXPECT_EQ(VerdictOnToken(SignToken(text), TrustList()),
            Refused("The token has expired at: 2012-01-02T00:00:00Z"));
}

// --- From text ---

TEST(CreateSamlToken, KeepsTheTextByteForByte) {
  TokenText text;
  text.prolog = "\xEF\xBB\xBF<?xml version='1.0' encoding=\"UTF-8\"?>\r\n<!-- kept -->\n<?kept too?>\n";
  text.issuer += "\r\n\t<!-- kept -->  ";
  text.tail = "\n";
  const std::string xml = SignToken(text) + "\n<!-- and this -->\r\n";
  EXPECT_EQ(ReadToken(xml)->ToXml(), xml);
}

TEST(CreateSamlToken, TakesTheClockToleranceInSeconds) {
  TokenText text;
  text.notBefore = SecondsFromNow(-7200);
  text.notOnOrAfter = SecondsFromNow(-3600);
  const std::string xml = SignToken(text);
  const TrustList trusted = Trust({TokenSigner()});
  const std::string expired = Refused("The token has expired at: " + text.notOnOrAfter);
  EXPECT_EQ(VerdictOf([&] { CreateSamlToken(xml, trusted, 7200); }), "accepted");
  EXPECT_EQ(VerdictOf([&] { CreateSamlToken(xml, trusted, 3000); }), expired);
  EXPECT_EQ(VerdictOf([&] { CreateSamlToken(xml, trusted); }), expired);
  EXPECT_EQ(VerdictOf([&] { CreateSamlToken(xml, TokenSigner().certificate.Get()); }), expired);
}

TEST(CreateSamlToken, IsNotYetAcceptedBeforeItsStart) {
  TokenText text;
  text.notBefore = SecondsFromNow(1800);
  const std::string xml = SignToken(text);
  EXPECT_EQ(VerdictOnToken(xml), Refused("Token start date is in the future: " + text.notBefore));
  EXPECT_EQ(VerdictOf([&] { CreateSamlToken(xml, Trust({TokenSigner()}), 3600); }), "accepted");
}

TEST(CreateSamlToken, TakesOneTrustedCertificate) {
  const std::string xml = SignToken(TokenText());
  EXPECT_EQ(VerdictOf([&] { CreateSamlToken(xml, TokenSigner().certificate.Get()); }), "accepted");
}

const char* const kUntrustedSigner =
    "Quorlin::InvalidSignatureException: Signature verification error. Certificate chain is not trusted: "
    "self-signed certificate (CN=Test signer)";

TEST(CreateSamlToken, TrustsNothingWithoutACertificate) {
  const std::string xml = SignToken(TokenText());
  EXPECT_EQ(VerdictOf([&] { CreateSamlToken(xml, static_cast<const Certificate*>(nullptr)); }),
            kUntrustedSigner);
  EXPECT_EQ(VerdictOnToken(xml, TrustList()), kUntrustedSigner);
  EXPECT_EQ(VerdictOnToken(xml, TrustList(3)), kUntrustedSigner);
}

TEST(CreateSamlToken, PassesOverNullEntries) {
  TrustList trusted(1);
  trusted.push_back(TokenSigner().certificate);
  trusted.emplace_back();
  EXPECT_EQ(VerdictOnToken(SignToken(TokenText()), trusted), "accepted");
}

TEST(CreateSamlToken, PassesOnTheParsersErrors) {
  EXPECT_EQ(VerdictOnToken(""), "Pelmar::Xml::XMLParseException: no element found at line 1, column 1");
  EXPECT_EQ(VerdictOnToken("token"), "Pelmar::Xml::XMLParseException: syntax error at line 1, column 1");
  EXPECT_EQ(VerdictOnToken("<a>\n<b></a>"),
            "Pelmar::Xml::XMLParseException: mismatched tag at line 2, column 6");
}

TEST(CreateSamlToken, KeepsNoReferenceToTheTrustedCertificates) {
  const Ref<const Certificate> copy =
      Pelmar::Crypto::CreateCertificateFromDer(TokenSigner().certificate->GetDer());
  Token token;
  {
    TrustList trusted = {copy};
    token = CreateSamlToken(SignToken(TokenText()), trusted);
  }
  EXPECT_EQ(token->GetConfirmationCertificate(), nullptr);
  EXPECT_EQ(token->GetId(), kTokenId);
}

// --- From a tree ---

Token FromDom(Pelmar::Xml::ElementNode* element) {
  return CreateSamlTokenFromDom(element, Trust({TokenSigner()}));
}

TEST(CreateSamlTokenFromDom, GivesTheCanonicalForm) {
  TokenText text;
  text.prolog = "<?xml version=\"1.0\"?>\n<!-- gone -->";
  text.issuer += "<!-- gone -->";
  text.restrictions = "<saml:ProxyRestriction\n Count = '1' />";
  const std::string xml = SignToken(text);
  const auto document = ParseXmlText(xml);
  const Token token = FromDom(document->GetDocumentElement());
  EXPECT_EQ(token->ToXml(), CanonicalText(document->GetDocumentElement(), Pelmar::Xml::Security::kC14n));
  EXPECT_EQ(token->ToXml().find("gone"), std::string::npos);
  EXPECT_NE(token->ToXml().find("<saml:ProxyRestriction Count=\"1\"></saml:ProxyRestriction>"),
            std::string::npos);
  EXPECT_EQ(MeaningOf(*token), MeaningOf(*ReadToken(xml)));
}

std::string Envelope(const std::string& content) {
  return "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\" xmlns=\"urn:default\" "
         "xml:lang=\"en\"><soapenv:Body>" +
         content + "</soapenv:Body></soapenv:Envelope>";
}

TEST(CreateSamlTokenFromDom, ReadsAnAssertionInsideAMessage) {
  const std::string xml = SignToken(TokenText());
  EXPECT_EQ(VerdictOnEmbedded(Envelope(xml), kTokenId), "accepted");
}

TEST(CreateSamlTokenFromDom, GivesATextThatIsAgainAToken) {
  const auto document = ParseXmlText(Envelope(SignToken(TokenText())));
  const Token token =
      FromDom(Pelmar::Xml::AsElement(document->GetDocumentElement()->GetFirstChild()->GetFirstChild()));
  // The canonical form of a part takes in the xml: attributes around it, which the strict reader then
  // refuses. Nothing else is in the way.
  const std::string standing = ReplaceOnce(token->ToXml(), " xml:lang=\"en\"", "");
  EXPECT_EQ(MeaningOf(*ReadToken(standing)), MeaningOf(*token));
}

TEST(CreateSamlTokenFromDom, TakesTheClockToleranceInSeconds) {
  TokenText text;
  text.notBefore = SecondsFromNow(-7200);
  text.notOnOrAfter = SecondsFromNow(-3600);
  const auto document = ParseXmlText(SignToken(text));
  const TrustList trusted = Trust({TokenSigner()});
  const auto verdict = [&](long long tolerance) {
    return VerdictOf([&] { CreateSamlTokenFromDom(document->GetDocumentElement(), trusted, tolerance); });
  };
  EXPECT_EQ(verdict(7200), "accepted");
  EXPECT_EQ(verdict(0), Refused("The token has expired at: " + text.notOnOrAfter));
  EXPECT_EQ(VerdictOf([&] { FromDom(document->GetDocumentElement()); }),
            Refused("The token has expired at: " + text.notOnOrAfter));
}

TEST(CreateSamlTokenFromDom, RefusesNullAndOtherElements) {
  EXPECT_EQ(VerdictOf([] { FromDom(nullptr); }), Refused("Expected element 'Assertion' not found."));
  const auto document = ParseXmlText("<a/>");
  EXPECT_EQ(VerdictOf([&] { FromDom(document->GetDocumentElement()); }),
            Refused("Expected element 'Assertion' not found."));
}

TEST(CreateSamlTokenFromDom, LeavesTheTreeAsItWas) {
  const auto document = ParseXmlText(Envelope(SignToken(TokenText())));
  const std::string before = WriteXmlText(document->GetDocumentElement());
  FromDom(Pelmar::Xml::AsElement(document->GetDocumentElement()->GetFirstChild()->GetFirstChild()));
  EXPECT_EQ(WriteXmlText(document->GetDocumentElement()), before);
}

TEST(CreateSamlTokenFromDom, OutlivesTheTree) {
  auto document = ParseXmlText(SignToken(TokenText()));
  const Token token = FromDom(document->GetDocumentElement());
  document = Ref<Pelmar::Xml::Document>();
  EXPECT_EQ(token->GetSubject(), PrincipalId("alice", "example.com"));
}

}  // namespace
}  // namespace Quorlin
