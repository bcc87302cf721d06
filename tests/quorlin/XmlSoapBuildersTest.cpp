// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/xmlSoapBuilders.h"

#include <pelmar/StringUtil.h>
#include <pelmar/system/DateTime.h>
#include <pelmar/xml/QName.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>

#include <boost/make_shared.hpp>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <csignal>
#include <string>

#include "quorlin/Namespaces.h"
#include "quorlin/RequestBuilderImpl.h"
#include "quorlin/dates.h"
#include "support/GoldenText.h"
#include "support/Pki.h"

namespace Quorlin {
namespace {

namespace Security = Pelmar::Xml::Security;

using Pelmar::Ref;
using Pelmar::Xml::ElementNode;
using testing::Eq;
using testing::KilledBySignal;
using TestSupport::CutBetween;
using TestSupport::MaskVolatile;

const std::string kWsseUri =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd";
const std::string kWsuUri =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd";
const std::string kX509Uri =
    "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-x509-token-profile-1.0#X509v3";
const std::string kEnvelopeStart =
    "<soapenv:Envelope xmlns:soapenv=\"http://schemas.xmlsoap.org/soap/envelope/\">";
const std::string kBodyStart = "<soapenv:Body xmlns:wst=\"http://docs.oasis-open.org/ws-sx/ws-trust/200512\"";
const std::string kTimes = "<wsu:Created>{time}</wsu:Created><wsu:Expires>{time + 600 s}</wsu:Expires>";

std::string Text(const XMLBuilderPtr& builder) {
  return MaskVolatile(SerializeToXML(builder));
}

std::string Text(const Ref<ElementNode>& element) {
  return Text(boost::make_shared<PreBuiltElementImpl>(element));
}

Ref<ElementNode> Build(const XMLBuilderPtr& builder) {
  Ref<ElementNode> element;
  builder->build(element);
  return element;
}

// One identity for all tests: making keys takes time.
const TestSupport::Identity& Signer() {
  static const TestSupport::Identity identity = TestSupport::MakeSelfSigned(TestSupport::CertificateSpec());
  return identity;
}

const Ref<const Pelmar::Crypto::PrivateKey>& Key() {
  static const Ref<const Pelmar::Crypto::PrivateKey> key = Signer().GetKey();
  return key;
}

std::string CertificateText() {
  return Pelmar::StringUtil::Base64Encode(Signer().certificate->GetDer());
}

XMLBuilderPtr BareSecurity() {
  return ElementBuilder("wsse", "Security", {{"xmlns:wsse", kWsse}});
}

XMLBuilderPtr SomeBody() {
  return ElementBuilder("b", "body", {{"xmlns:b", "urn:b"}});
}

// A ds:Reference to `target` as it stands in a request.
std::string Reference(const std::string& target) {
  return "<ds:Reference URI=\"#" + target +
         "\"><ds:Transforms><ds:Transform Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/></ds:Transforms>"
         "<ds:DigestMethod Algorithm=\"http://www.w3.org/2001/04/xmlenc#sha256\"/>"
         "<ds:DigestValue>{digest}</ds:DigestValue></ds:Reference>";
}

std::string SignatureElement(const std::string& references, const std::string& keyInfo) {
  return "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\" Id=\"holderOfKeyProofSignature\">"
         "<ds:SignedInfo><ds:CanonicalizationMethod Algorithm=\"http://www.w3.org/2001/10/xml-exc-c14n#\"/>"
         "<ds:SignatureMethod Algorithm=\"http://www.w3.org/2001/04/xmldsig-more#rsa-sha256\"/>" +
         references + "</ds:SignedInfo><ds:SignatureValue>{signature}</ds:SignatureValue>" + keyInfo +
         "</ds:Signature>";
}

// --- Envelope and header ---

TEST(SoapEnvelope, HasTheHeaderBeforeTheBody) {
  EXPECT_EQ(SerializeToXML(SoapBuilder(ElementBuilder("h", "header"), ElementBuilder("b", "body"))),
            kEnvelopeStart + "<soapenv:Header><h:header/></soapenv:Header>" + kBodyStart +
                "><b:body/></soapenv:Body></soapenv:Envelope>");
}

TEST(SecurityHeader, HoldsATimestamp) {
  EXPECT_EQ(Text(WsSecurityHeaderBuilder(10)), "<wsse:Security xmlns:wsse=\"" + kWsseUri +
                                                   "\"><wsu:Timestamp xmlns:wsu=\"" + kWsuUri + "\">" +
                                                   kTimes + "</wsu:Timestamp></wsse:Security>");
}

TEST(Timestamp, CountsInMinutesThatWrap) {
  const struct {
    int minutes;
    const char* difference;
  } cases[] = {{10, "{time + 600 s}"}, {1, "{time + 60 s}"}, {0, "{time + 0 s}"}, {35, "{time + 2100 s}"}};
  for (const auto& c : cases) {
    EXPECT_EQ(Text(WssuTimestampBuilder(c.minutes)), "<wsu:Timestamp xmlns:wsu=\"" + kWsuUri +
                                                         "\"><wsu:Created>{time}</wsu:Created><wsu:Expires>" +
                                                         c.difference + "</wsu:Expires></wsu:Timestamp>");
  }
  const std::string wrapped = SerializeToXML(WssuTimestampBuilder(36));
  EXPECT_LT(CutBetween(wrapped, "<wsu:Expires>", "</wsu:Expires>"),
            CutBetween(wrapped, "<wsu:Created>", "</wsu:Created>"));
}

TEST(Timestamp, BeginsNow) {
  const std::string before = DateTimeFormatter(Pelmar::System::GetUtcDateTime());
  const std::string text = SerializeToXML(WssuTimestampBuilder(10));
  const std::string after = DateTimeFormatter(Pelmar::System::GetUtcDateTime());
  const std::string created = CutBetween(text, "<wsu:Created>", "</wsu:Created>");
  EXPECT_LE(before, created);
  EXPECT_LE(created, after);
}

TEST(BinarySecurityToken, CarriesTheCertificate) {
  EXPECT_EQ(SerializeToXML(WsseX509v3BinarySecTokenBuilder("id", Signer().certificate.Get())),
            "<wsse:BinarySecurityToken EncodingType=\"http://docs.oasis-open.org/wss/2004/01/"
            "oasis-200401-wss-soap-message-security-1.0#Base64Binary\" ValueType=\"" +
                kX509Uri + "\" wsu:Id=\"id\" xmlns:wsu=\"" + kWsuUri + "\">" + CertificateText() +
                "</wsse:BinarySecurityToken>");
}

TEST(SecurityTokenReference, PointsToTheCertificate) {
  EXPECT_EQ(SerializeToXML(WsseX509v3BSTReferenceBuilder("id")),
            "<wsse:SecurityTokenReference xmlns:wsse=\"" + kWsseUri +
                "\"><wsse:Reference URI=\"#id\" ValueType=\"" + kX509Uri +
                "\"/></wsse:SecurityTokenReference>");
}

const std::string kSamlReference =
    "<wsse:SecurityTokenReference wsse11:TokenType=\"http://docs.oasis-open.org/wss/"
    "oasis-wss-saml-tokenprofile-1.1#SAMLV2.0\" xmlns:wsse=\"" +
    kWsseUri +
    "\" xmlns:wsse11=\"http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.1.xsd\">"
    "<wsse:KeyIdentifier ValueType=\"http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID\"/>"
    "</wsse:SecurityTokenReference>";

TEST(SecurityTokenReference, ToASamlTokenHasAnEmptyKeyIdentifier) {
  EXPECT_EQ(SerializeToXML(WsseSamlKeyIdReferenceBuilder("_token-1")), kSamlReference);
  EXPECT_EQ(SerializeToXML(WsseSamlKeyIdReferenceBuilder("")), kSamlReference);
}

// --- Signed envelopes ---

TEST(SignedEnvelope, WithACertificateEndsItsHeaderWithCertificateAndSignature) {
  const XMLBuilderPtr builder = CertRefSignedSoapBuilder(WsSecurityHeaderBuilder(10), SomeBody(), Key().Get(),
                                                         Signer().certificate.Get());
  const std::string keyInfo = "<ds:KeyInfo><wsse:SecurityTokenReference xmlns:wsse=\"" + kWsseUri +
                              "\"><wsse:Reference URI=\"#holderOfKeyCertificate\" ValueType=\"" + kX509Uri +
                              "\"/></wsse:SecurityTokenReference></ds:KeyInfo>";
  EXPECT_EQ(Text(builder),
            kEnvelopeStart + "<soapenv:Header><wsse:Security xmlns:wsse=\"" + kWsseUri +
                "\"><wsu:Timestamp xmlns:wsu=\"" + kWsuUri + "\" wsu:Id=\"Timestamp{uuid 1}\">" + kTimes +
                "</wsu:Timestamp>" +
                SerializeToXML(
                    WsseX509v3BinarySecTokenBuilder("holderOfKeyCertificate", Signer().certificate.Get())) +
                SignatureElement(Reference("Body{uuid 2}") + Reference("Timestamp{uuid 1}"), keyInfo) +
                "</wsse:Security></soapenv:Header>" + kBodyStart + " xmlns:wsu=\"" + kWsuUri +
                "\" wsu:Id=\"Body{uuid 2}\"><b:body xmlns:b=\"urn:b\"/></soapenv:Body></soapenv:Envelope>");
}

TEST(SignedEnvelope, WithATokenEndsItsHeaderWithTheSignature) {
  const XMLBuilderPtr header = CompositeBuilder(WsSecurityHeaderBuilder(10), {ElementBuilder("t", "token")});
  const XMLBuilderPtr builder = SamlRefSignedSoapBuilder(header, SomeBody(), Key().Get(), "_token-1");
  EXPECT_EQ(Text(builder),
            kEnvelopeStart + "<soapenv:Header><wsse:Security xmlns:wsse=\"" + kWsseUri +
                "\"><wsu:Timestamp xmlns:wsu=\"" + kWsuUri + "\" wsu:Id=\"Timestamp{uuid 1}\">" + kTimes +
                "</wsu:Timestamp><t:token/>" +
                SignatureElement(Reference("Body{uuid 2}") + Reference("Timestamp{uuid 1}"),
                                 "<ds:KeyInfo>" + kSamlReference + "</ds:KeyInfo>") +
                "</wsse:Security></soapenv:Header>" + kBodyStart + " xmlns:wsu=\"" + kWsuUri +
                "\" wsu:Id=\"Body{uuid 2}\"><b:body xmlns:b=\"urn:b\"/></soapenv:Body></soapenv:Envelope>");
}

TEST(SignedEnvelope, WithoutKeyInfoBuilderHasNoKeyInfo) {
  const XMLBuilderPtr builder =
      boost::make_shared<XMLSignedSoapBuilder>(BareSecurity(), SomeBody(), Key().Get(), XMLBuilderPtr());
  EXPECT_EQ(CutBetween(Text(builder), "</ds:SignatureValue>", "</wsse:Security>"), "</ds:Signature>");
}

TEST(SignedEnvelope, WithoutTimestampSignsTheBodyAlone) {
  const XMLBuilderPtr builder =
      boost::make_shared<XMLSignedSoapBuilder>(BareSecurity(), SomeBody(), Key().Get(), XMLBuilderPtr());
  EXPECT_EQ(Text(builder), kEnvelopeStart + "<soapenv:Header><wsse:Security xmlns:wsse=\"" + kWsseUri +
                               "\">" + SignatureElement(Reference("Body{uuid 1}"), "") +
                               "</wsse:Security></soapenv:Header>" + kBodyStart + " xmlns:wsu=\"" + kWsuUri +
                               "\" wsu:Id=\"Body{uuid 1}\"><b:body xmlns:b=\"urn:b\"/></soapenv:Body>"
                               "</soapenv:Envelope>");
}

TEST(SignedEnvelope, KeepsAnIdThatATimestampHas) {
  const XMLBuilderPtr header = CompositeBuilder(
      BareSecurity(), {ElementBuilder("wsu", "Timestamp", {{"wsu:Id", "mine"}, {"xmlns:wsu", kWsu}})});
  const XMLBuilderPtr builder =
      boost::make_shared<XMLSignedSoapBuilder>(header, SomeBody(), Key().Get(), XMLBuilderPtr());
  const std::string text = Text(builder);
  EXPECT_EQ(CutBetween(text, "<ds:Reference", "</ds:SignedInfo>"),
            (Reference("Body{uuid 1}") + Reference("mine")).substr(std::string("<ds:Reference").size()));
  EXPECT_EQ(CutBetween(text, "<wsu:Timestamp", "/>"), " wsu:Id=\"mine\" xmlns:wsu=\"" + kWsuUri + "\"");
}

TEST(SignedEnvelope, DiffersInIdsFromBuildToBuild) {
  const XMLBuilderPtr builder = CertRefSignedSoapBuilder(WsSecurityHeaderBuilder(10), SomeBody(), Key().Get(),
                                                         Signer().certificate.Get());
  const std::string first = SerializeToXML(CertRefSignedSoapBuilder(WsSecurityHeaderBuilder(10), SomeBody(),
                                                                    Key().Get(), Signer().certificate.Get()));
  const std::string second = SerializeToXML(builder);
  const std::string third = SerializeToXML(builder);
  for (const char* const open : {"wsu:Id=\"Timestamp", "wsu:Id=\"Body", "<ds:SignatureValue>"}) {
    EXPECT_NE(CutBetween(first, open, "<"), CutBetween(second, open, "<")) << open;
    EXPECT_NE(CutBetween(second, open, "<"), CutBetween(third, open, "<")) << open;
  }
}

TEST(SignedEnvelope, PassesThePlatformsExceptionOn) {
  TestSupport::CertificateSpec spec;
  spec.keyKind = TestSupport::KeyKind::EC_P256;
  const TestSupport::Identity identity = TestSupport::MakeSelfSigned(spec);
  const Ref<const Pelmar::Crypto::PrivateKey> key = identity.GetKey();
  const XMLBuilderPtr builder = CertRefSignedSoapBuilder(WsSecurityHeaderBuilder(10), SomeBody(), key.Get(),
                                                         identity.certificate.Get());
  EXPECT_THROW(Build(builder), Security::XmlSecurityException);
}

// --- Steps of signing ---

TEST(CreateWssuId, ReturnsAnIdThatIsThere) {
  const Ref<ElementNode> element = Build(ElementBuilder("a", "b", {{"u:Id", "mine"}, {"xmlns:u", kWsu}}));
  EXPECT_EQ(CreateWssuId(element.Get()), "mine");
  EXPECT_EQ(Text(element), "<a:b u:Id=\"mine\" xmlns:u=\"" + kWsuUri + "\"/>");
}

TEST(CreateWssuId, TakesNoOtherId) {
  const Ref<ElementNode> element =
      Build(ElementBuilder("a", "b", {{"Id", "1"}, {"u:Id", "2"}, {"xmlns:u", "urn:u"}}));
  const std::string id = CreateWssuId(element.Get());
  EXPECT_EQ(MaskVolatile(id), "b{uuid 1}");
  EXPECT_EQ(
      TestSupport::ReplaceAll(SerializeToXML(boost::make_shared<PreBuiltElementImpl>(element)), id, "{id}"),
      "<a:b Id=\"1\" u:Id=\"2\" xmlns:u=\"urn:u\" xmlns:wsu=\"" + kWsuUri + "\" wsu:Id=\"{id}\"/>");
}

TEST(CreateWssuId, LeavesADeclarationThatStandsAlone) {
  const Ref<ElementNode> element = Build(ElementBuilder("wsu", "Timestamp", {{"xmlns:wsu", kWsu}}));
  const std::string id = CreateWssuId(element.Get());
  EXPECT_EQ(Text(element), "<wsu:Timestamp xmlns:wsu=\"" + kWsuUri + "\" wsu:Id=\"Timestamp{uuid 1}\"/>");
  EXPECT_EQ(CreateWssuId(element.Get()), id);
}

TEST(AddElementToSignature, SkipsNull) {
  const Ref<ElementNode> envelope = Build(SoapBuilder(BareSecurity(), SomeBody()));
  Ref<Security::Signature> signature;
  Security::CreateBlankSignature(envelope.Get(), Security::kExclusiveC14n, Security::kRsaSha256, "ds",
                                 signature);
  AddElementToSignature(signature.Get(), nullptr);
  EXPECT_TRUE(signature->GetReferences().empty());
}

TEST(AddElementToSignature, AddsOneReferenceWithOneTransform) {
  const Ref<ElementNode> envelope = Build(SoapBuilder(BareSecurity(), SomeBody()));
  ElementNode* const body = envelope->FindChildElement(kSoapEnv, "Body");
  Ref<Security::Signature> signature;
  Security::CreateBlankSignature(envelope.Get(), Security::kExclusiveC14n, Security::kRsaSha256, "ds",
                                 signature);
  AddElementToSignature(signature.Get(), body);
  ASSERT_EQ(signature->GetReferences().size(), 1u);
  const Security::SignatureReference& reference = *signature->GetReferences().front();
  EXPECT_EQ(reference.GetUri(), "#" + CreateWssuId(body));
  EXPECT_EQ(reference.GetDigestMethod(), "http://www.w3.org/2001/04/xmlenc#sha256");
  EXPECT_THAT(reference.GetTransforms(), testing::ElementsAre("http://www.w3.org/2001/10/xml-exc-c14n#"));
}

class SignSoapMessageDeathTest : public testing::Test {
 protected:
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(SignSoapMessageDeathTest, AbortsOnAnEnvelopeThatLacksAPart) {
  const AttributeMap soap = {{"xmlns:soapenv", kSoapEnv}};
  const XMLBuilderPtr body = ElementBuilder("soapenv", "Body");
  const XMLBuilderPtr header = ElementBuilder("soapenv", "Header");
  const XMLBuilderPtr foreignBody = ElementBuilder("o", "Body", {{"xmlns:o", "urn:o"}});
  const struct {
    XMLBuilderPtr envelope;
    const char* message;
  } cases[] = {
      {ElementBuilder("soapenv", "Envelope", soap),
       "Verify failed: soapBody != __null (lib/quorlin/xmlSoapBuilders)\n"},
      {CompositeBuilder(ElementBuilder("soapenv", "Envelope", soap), {header, foreignBody}),
       "Verify failed: soapBody != __null (lib/quorlin/xmlSoapBuilders)\n"},
      {CompositeBuilder(ElementBuilder("soapenv", "Envelope", soap), {body}),
       "Verify failed: soapHeader != __null (lib/quorlin/xmlSoapBuilders)\n"},
      {CompositeBuilder(ElementBuilder("soapenv", "Envelope", soap), {header, body}),
       "Verify failed: wsseSecurity != __null (lib/quorlin/xmlSoapBuilders)\n"},
  };
  for (const auto& c : cases) {
    const Ref<ElementNode> envelope = Build(c.envelope);
    EXPECT_EXIT(SignSoapMessage(nullptr, XMLBuilderPtr(), envelope.Get()), KilledBySignal(SIGABRT),
                Eq(c.message));
  }
}

TEST_F(SignSoapMessageDeathTest, SignedEnvelopesAbortOnANullHeader) {
  const std::string message = "Verify failed: headerBuilder != __null (lib/quorlin/xmlSoapBuilders)\n";
  EXPECT_EXIT(CertRefSignedSoapBuilder(XMLBuilderPtr(), SomeBody(), nullptr, nullptr),
              KilledBySignal(SIGABRT), Eq(message));
  EXPECT_EXIT(SamlRefSignedSoapBuilder(XMLBuilderPtr(), SomeBody(), nullptr, "_id"), KilledBySignal(SIGABRT),
              Eq(message));
  EXPECT_EXIT(XMLSignedSoapBuilder(XMLBuilderPtr(), SomeBody(), nullptr, XMLBuilderPtr()),
              KilledBySignal(SIGABRT), Eq(message));
}

}  // namespace
}  // namespace Quorlin
