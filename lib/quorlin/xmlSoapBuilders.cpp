// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/xmlSoapBuilders.h"

#include <pelmar/StringUtil.h>
#include <pelmar/Verify.h>
#include <pelmar/xml/security/Algorithms.h>
#include <quorlin/Base64.h>

#include <boost/make_shared.hpp>

#include "quorlin/Namespaces.h"
#include "quorlin/dates.h"
#include "quorlin/xmlRequestBuilders.h"

namespace Quorlin {

namespace Security = Pelmar::Xml::Security;

using Pelmar::Ref;
using Pelmar::Crypto::Certificate;
using Pelmar::Crypto::PrivateKey;
using Pelmar::Xml::ElementNode;
using Security::Signature;

namespace {

constexpr const char* kSource = "lib/quorlin/xmlSoapBuilders";
constexpr const char* kSignaturePrefix = "ds";

std::string EncodeDer(const std::vector<unsigned char>& der) {
  std::string text(Base64_EncodedLength(der.data(), der.size()), '\0');
  std::size_t written = 0;
  const bool encoded = Base64_Encode(der.data(), der.size(), &text[0], text.size(), &written);
  Pelmar::Verify(encoded, "encoded", kSource);
  text.resize(written);
  return text;
}

void VerifyHeader(const XMLBuilderPtr& headerBuilder) {
  Pelmar::Verify(headerBuilder.get() != nullptr, "headerBuilder != __null", kSource);
}

}  // namespace

XMLSignedSoapBuilder::XMLSignedSoapBuilder(XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder,
                                           const PrivateKey* privateKey, XMLBuilderPtr keyInfoBuilder)
    : _headerBuilder(std::move(headerBuilder)),
      _bodyBuilder(std::move(bodyBuilder)),
      _privateKey(privateKey),
      _keyInfoBuilder(std::move(keyInfoBuilder)) {
  VerifyHeader(_headerBuilder);
}

void XMLSignedSoapBuilder::build(Ref<ElementNode>& result) const {
  SoapBuilder(_headerBuilder, _bodyBuilder)->build(result);
  SignSoapMessage(_privateKey, _keyInfoBuilder, result.Get());
}

// --- Envelopes ---

XMLBuilderPtr SoapBuilder(const XMLBuilderPtr& headerBuilder, const XMLBuilderPtr& bodyBuilder) {
  return CompositeBuilder(
      ElementBuilder("soapenv", "Envelope", {{"xmlns:soapenv", kSoapEnv}}),
      {CompositeBuilder(ElementBuilder("soapenv", "Header"), {headerBuilder}),
       CompositeBuilder(ElementBuilder("soapenv", "Body", {{"xmlns:wst", kWst}}), {bodyBuilder})});
}

XMLBuilderPtr CertRefSignedSoapBuilder(const XMLBuilderPtr& headerBuilder, const XMLBuilderPtr& bodyBuilder,
                                       const PrivateKey* privateKey, const Certificate* certificate) {
  VerifyHeader(headerBuilder);
  const XMLBuilderPtr header =
      CompositeBuilder(headerBuilder, {WsseX509v3BinarySecTokenBuilder(kCertificateId, certificate)});
  return boost::make_shared<XMLSignedSoapBuilder>(header, bodyBuilder, privateKey,
                                                  WsseX509v3BSTReferenceBuilder(kCertificateId));
}

XMLBuilderPtr SamlRefSignedSoapBuilder(const XMLBuilderPtr& headerBuilder, const XMLBuilderPtr& bodyBuilder,
                                       const PrivateKey* privateKey, const std::string& assertionId) {
  return boost::make_shared<XMLSignedSoapBuilder>(headerBuilder, bodyBuilder, privateKey,
                                                  WsseSamlKeyIdReferenceBuilder(assertionId));
}

// --- Header ---

XMLBuilderPtr WsSecurityHeaderBuilder(int validityMinutes) {
  return CompositeBuilder(ElementBuilder("wsse", "Security", {{"xmlns:wsse", kWsse}}),
                          {WssuTimestampBuilder(validityMinutes)});
}

XMLBuilderPtr WssuTimestampBuilder(int validityMinutes) {
  const Pelmar::System::DateTime now = Pelmar::System::GetUtcDateTime();
  const Pelmar::System::DateTime expires = AddMinutesToDate(now, validityMinutes);
  return CompositeBuilder(ElementBuilder("wsu", "Timestamp", {{"xmlns:wsu", kWsu}}),
                          {TextElementBuilder("wsu", "Created", DateTimeFormatter(now)),
                           TextElementBuilder("wsu", "Expires", DateTimeFormatter(expires))});
}

XMLBuilderPtr WsseX509v3BinarySecTokenBuilder(const std::string& id, const Certificate* certificate) {
  const AttributeMap attributes = {
      {"EncodingType", kWssBase64}, {"ValueType", kWssX509v3}, {"wsu:Id", id}, {"xmlns:wsu", kWsu}};
  return TextElementBuilder("wsse", "BinarySecurityToken", attributes, EncodeDer(certificate->GetDer()));
}

XMLBuilderPtr WsseX509v3BSTReferenceBuilder(const std::string& id) {
  return CompositeBuilder(
      ElementBuilder("wsse", "SecurityTokenReference", {{"xmlns:wsse", kWsse}}),
      {ElementBuilder("wsse", "Reference", {{"URI", "#" + id}, {"ValueType", kWssX509v3}})});
}

XMLBuilderPtr WsseSamlKeyIdReferenceBuilder(const std::string& /*assertionId*/) {
  const AttributeMap attributes = {
      {"wsse11:TokenType", kWssSamlV2}, {"xmlns:wsse", kWsse}, {"xmlns:wsse11", kWsse11}};
  return CompositeBuilder(ElementBuilder("wsse", "SecurityTokenReference", attributes),
                          {ElementBuilder("wsse", "KeyIdentifier", {{"ValueType", kWssSamlId}})});
}

// --- Signing ---

void SignSoapMessage(const PrivateKey* privateKey, const XMLBuilderPtr& keyInfoBuilder,
                     ElementNode* envelope) {
  ElementNode* const soapBody = envelope->FindChildElement(kSoapEnv, "Body");
  Pelmar::Verify(soapBody != nullptr, "soapBody != __null", kSource);
  ElementNode* const soapHeader = envelope->FindChildElement(kSoapEnv, "Header");
  Pelmar::Verify(soapHeader != nullptr, "soapHeader != __null", kSource);
  ElementNode* const wsseSecurity = soapHeader->FindChildElement(kWsse, "Security");
  Pelmar::Verify(wsseSecurity != nullptr, "wsseSecurity != __null", kSource);
  ElementNode* const timestamp = wsseSecurity->FindChildElement(kWsu, "Timestamp");

  Ref<Signature> signature;
  Security::CreateBlankSignature(envelope, Security::kExclusiveC14n, Security::kRsaSha256, kSignaturePrefix,
                                 signature);
  AddElementToSignature(signature.Get(), soapBody);
  AddElementToSignature(signature.Get(), timestamp);
  if (keyInfoBuilder) {
    Ref<ElementNode> keyInfo;
    keyInfoBuilder->build(keyInfo);
    signature->SetKeyInfo(keyInfo);
  }
  signature->Sign(privateKey);
  signature->GetElement()->DefineAttribute("Id", kProofSignatureId);
  wsseSecurity->AppendChild(signature->GetElement());
}

void AddElementToSignature(Signature* signature, ElementNode* element) {
  if (element == nullptr) {
    return;
  }
  signature->AddReference("#" + CreateWssuId(element), Security::kSha256)
      ->AddTransform(Security::kExclusiveC14n);
}

std::string CreateWssuId(ElementNode* element) {
  std::string id;
  if (element->GetAttribute(Pelmar::Xml::QName(kWsu, "Id"), id)) {
    return id;
  }
  id = element->GetLocalName() + Pelmar::StringUtil::GenerateUuid();
  element->DefineAttribute("xmlns:wsu", kWsu);
  element->DefineAttribute("wsu:Id", id);
  return id;
}

}  // namespace Quorlin
