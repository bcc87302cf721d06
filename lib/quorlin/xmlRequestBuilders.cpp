// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/xmlRequestBuilders.h"

#include <pelmar/StringUtil.h>
#include <pelmar/Verify.h>

#include <boost/make_shared.hpp>

#include "quorlin/Namespaces.h"
#include "quorlin/dates.h"

namespace Quorlin {

using Pelmar::Ref;
using Pelmar::Xml::ElementNode;

namespace {

constexpr const char* kSource = "lib/quorlin/xmlRequestBuilders";
constexpr const char* kContext = "Context";

const char* BooleanText(bool value) {
  return value ? "true" : "false";
}

const char* KeyTypeUri(SamlToken::ConfirmationType confirmation) {
  switch (confirmation) {
    case SamlToken::CONFIRM_BEARER:
      return kWstBearer;
    case SamlToken::CONFIRM_HOLDER_OF_KEY:
      return kWstPublicKey;
  }
  Pelmar::VerifyFailed("false", kSource);
}

XMLBuilderPtr RequestSecurityTokenBuilder() {
  return ElementBuilder("wst", "RequestSecurityToken", {{"xmlns:wst", kWst}});
}

}  // namespace

// --- Bodies ---

XMLBuilderPtr CommonAcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation,
                                                const TokenSpec& spec) {
  const boost::shared_ptr<XMLCompositeBuilder> body =
      boost::make_shared<XMLCompositeBuilder>(RequestSecurityTokenBuilder());
  body->Add(TextElementBuilder("wst", "TokenType", kSamlTokenType))
      .Add(TextElementBuilder("wst", "RequestType", kWstIssue))
      .Add(TextElementBuilder("wst", "KeyType", KeyTypeUri(confirmation)))
      .Add(WssuLifetimeBuilder(spec.tokenLifetimeSec))
      .Add(WstRenewingBuilder(spec.renewable))
      .Add(TextElementBuilder("wst", "Delegatable", BooleanText(spec.delegable)));
  if (spec.delegateTo) {
    body->Add(WstDelegateToBuilder(*spec.delegateTo));
  }
  if (!spec.audienceRestriction.empty()) {
    body->Add(WstParticipantsBuilders(spec.audienceRestriction));
  }
  if (!spec.advice.empty()) {
    body->Add(RsaAdviceSetBuilder(spec.advice));
  }
  return body;
}

XMLBuilderPtr AcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec& spec) {
  const XMLBuilderPtr body = CommonAcquireSecurityTokenBuilder(confirmation, spec);
  // A token for a delegate is not bound to the requester's key.
  if (confirmation != SamlToken::CONFIRM_HOLDER_OF_KEY || spec.delegateTo) {
    return body;
  }
  return CompositeBuilder(body, {ElementBuilder("wst", "UseKey", {{"Sig", kProofSignatureId}})});
}

XMLBuilderPtr ExchangeSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec& spec) {
  return CommonAcquireSecurityTokenBuilder(confirmation, spec);
}

XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken& token, long long lifetimeSec) {
  Pelmar::Verify(token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY,
                 "token.GetConfirmationMethod() == SamlToken::CONFIRM_HOLDER_OF_KEY", kSource);
  return CompositeBuilder(
      RequestSecurityTokenBuilder(),
      {TextElementBuilder("wst", "TokenType", kSamlTokenType),
       TextElementBuilder("wst", "RequestType", kWstRenew), WssuLifetimeBuilder(lifetimeSec),
       CompositeBuilder(ElementBuilder("wst", "RenewTarget"), {InsertSamlTokenBuilder(token)})});
}

XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken& token) {
  return CompositeBuilder(
      RequestSecurityTokenBuilder(),
      {TextElementBuilder("wst", "TokenType", kWstStatusTokenType),
       TextElementBuilder("wst", "RequestType", kWstValidate),
       CompositeBuilder(ElementBuilder("wst", "ValidateTarget"), {InsertSamlTokenBuilder(token)})});
}

XMLBodyBuilderInitialSPNego::XMLBodyBuilderInitialSPNego(SamlToken::ConfirmationType confirmation,
                                                         const TokenSpec& spec,
                                                         const std::vector<unsigned char>& leg)
    : _confirmation(confirmation), _spec(spec), _leg(leg) {}

XMLBodyBuilderInitialSPNego::~XMLBodyBuilderInitialSPNego() {
  Pelmar::Wipe(_leg);
}

void XMLBodyBuilderInitialSPNego::build(Ref<ElementNode>& result) const {
  CompositeBuilder(AcquireSecurityTokenBuilder(_confirmation, _spec), {WstSPNegoBinExchangeBuilder(_leg)})
      ->build(result);
  result->DefineAttribute(kContext, "urn:uuid:" + Pelmar::StringUtil::GenerateUuid());
}

XMLBodyBuilderContinuedSPNego::XMLBodyBuilderContinuedSPNego(const std::string& contextId,
                                                             const std::vector<unsigned char>& leg)
    : _contextId(contextId), _leg(leg) {}

XMLBodyBuilderContinuedSPNego::~XMLBodyBuilderContinuedSPNego() {
  Pelmar::Wipe(_leg);
}

void XMLBodyBuilderContinuedSPNego::build(Ref<ElementNode>& result) const {
  CompositeBuilder(ElementBuilder("wst", "RequestSecurityTokenResponse"), {WstSPNegoBinExchangeBuilder(_leg)})
      ->build(result);
  result->DefineAttribute(kContext, _contextId);
}

// --- Fragments ---

XMLBuilderPtr WssuLifetimeBuilder(long long lifetimeSec) {
  const Pelmar::System::DateTime now = Pelmar::System::GetUtcDateTime();
  const Pelmar::System::DateTime expires = AddSecondsToDate(now, lifetimeSec);
  return CompositeBuilder(ElementBuilder("wst", "Lifetime", {{"xmlns:wsu", kWsu}}),
                          {TextElementBuilder("wsu", "Created", DateTimeFormatter(now)),
                           TextElementBuilder("wsu", "Expires", DateTimeFormatter(expires))});
}

XMLBuilderPtr WstRenewingBuilder(bool allow) {
  // OK would ask for a token that can be renewed after it has expired (WS-Trust 1.3, section 5): never.
  return ElementBuilder("wst", "Renewing", {{"Allow", BooleanText(allow)}, {"OK", BooleanText(false)}});
}

XMLBuilderPtr WstDelegateToBuilder(const std::string& userName) {
  return CompositeBuilder(ElementBuilder("wst", "DelegateTo"), {WsseUsernameTokenBuilder(userName)});
}

XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string>& addresses) {
  const boost::shared_ptr<XMLCompositeBuilder> participants =
      boost::make_shared<XMLCompositeBuilder>(ElementBuilder("wst", "Participants", {{"xmlns:wsa", kWsa}}));
  for (const std::string& address : addresses) {
    participants->Add(WstParticipantBuilder(address));
  }
  return participants;
}

XMLBuilderPtr WstParticipantBuilder(const std::string& address) {
  return CompositeBuilder(ElementBuilder("wst", "Participant"),
                          {WsaEndpointAddressReferenceBuilder(address)});
}

XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string& address) {
  return CompositeBuilder(ElementBuilder("wsa", "EndpointReference"),
                          {TextElementBuilder("wsa", "Address", address)});
}

XMLBuilderPtr RsaAdviceSetBuilder(const std::vector<Advice>& advices) {
  // No element below uses the prefix "saml"; token services in the field expect the declaration nevertheless.
  const AttributeMap declarations = {
      {"xmlns:rsa-advice", kAdviceNs}, {"xmlns:saml", kSaml}, {"xmlns:xs", kXs}, {"xmlns:xsi", kXsi}};
  const boost::shared_ptr<XMLCompositeBuilder> adviceSet =
      boost::make_shared<XMLCompositeBuilder>(ElementBuilder("rsa-advice", "AdviceSet", declarations));
  for (const Advice& advice : advices) {
    adviceSet->Add(RsaAdviceBuilder(advice));
  }
  return adviceSet;
}

XMLBuilderPtr RsaAdviceBuilder(const Advice& advice) {
  const boost::shared_ptr<XMLCompositeBuilder> builder = boost::make_shared<XMLCompositeBuilder>(
      ElementBuilder("rsa-advice", "Advice", {{"AdviceSource", advice.source}}));
  for (const AdviceAttribute& attribute : advice.attributes) {
    builder->Add(RsaAttributeBuilder(attribute));
  }
  return builder;
}

XMLBuilderPtr RsaAttributeBuilder(const AdviceAttribute& attribute) {
  const boost::shared_ptr<XMLCompositeBuilder> builder = boost::make_shared<XMLCompositeBuilder>(
      ElementBuilder("rsa-advice", "Attribute", {{"Name", attribute.name}}));
  for (const std::string& value : attribute.values) {
    builder->Add(TextElementBuilder("rsa-advice", "AttributeValue", {{"xsi:type", "xs:string"}}, value));
  }
  return builder;
}

XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName) {
  return CompositeBuilder(ElementBuilder("wsse", "UsernameToken", {{"xmlns:wsse", kWsse}}),
                          {TextElementBuilder("wsse", "Username", userName)});
}

XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName, const std::string& password) {
  return CompositeBuilder(WsseUsernameTokenBuilder(userName),
                          {TextElementBuilder("wsse", "Password", {{"Type", kWssPasswordText}}, password)});
}

XMLBuilderPtr WstSPNegoBinExchangeBuilder(const std::vector<unsigned char>& leg) {
  const Pelmar::SecretText text(Pelmar::StringUtil::Base64Encode(leg));
  return TextElementBuilder("wst", "BinaryExchange",
                            {{"EncodingType", kWssBase64}, {"ValueType", kSpnegoType}}, text);
}

}  // namespace Quorlin
