// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Responses.h"

#include "devsts/Clock.h"
#include "devsts/Uris.h"
#include "devsts/XmlText.h"

namespace DevSts {

namespace {

std::string MakeEnvelope(const std::string& body) {
  return std::string("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<soapenv:Envelope xmlns:soapenv=\"") +
         kSoapNs + "\"><soapenv:Header/><soapenv:Body>" + body + "</soapenv:Body></soapenv:Envelope>";
}

/// `name` with the prefix declarations that everything inside it may rely on. `attributes` starts with a
/// blank unless empty.
std::string MakeTrustElement(const std::string& name, const std::string& attributes,
                             const std::string& content) {
  return "<wst:" + name + " xmlns:wst=\"" + kTrustNs + "\" xmlns:wsu=\"" + kUtilityNs + "\"" + attributes +
         ">" + content + "</wst:" + name + ">";
}

std::string MakeTokenFields(const IssuedToken& token) {
  return std::string("<wst:TokenType>") + kSamlNs + "</wst:TokenType><wst:Lifetime><wsu:Created>" +
         ToDateText(token.notBefore) + "</wsu:Created><wsu:Expires>" + ToDateText(token.notOnOrAfter) +
         "</wsu:Expires></wst:Lifetime><wst:RequestedSecurityToken>" + token.xml +
         "</wst:RequestedSecurityToken>";
}

std::string MakeBinaryExchange(const std::string& leg) {
  return std::string("<wst:BinaryExchange ValueType=\"") + kSpnegoValueType + "\" EncodingType=\"" +
         kBase64Binary + "\">" + Escape(leg) + "</wst:BinaryExchange>";
}

std::string MakeCollection(const std::string& attributes, const std::string& content) {
  return MakeEnvelope(MakeTrustElement("RequestSecurityTokenResponseCollection", "",
                                       "<wst:RequestSecurityTokenResponse" + attributes + ">" + content +
                                           "</wst:RequestSecurityTokenResponse>"));
}

std::string MakeContext(const std::string& context) {
  return " Context=\"" + Escape(context) + "\"";
}

}  // namespace

std::string MakeIssueResponse(const IssuedToken& token) {
  return MakeCollection("", MakeTokenFields(token));
}

std::string MakeRenewResponse(const IssuedToken& token) {
  return MakeEnvelope(MakeTrustElement("RequestSecurityTokenResponse", "", MakeTokenFields(token)));
}

std::string MakeValidateResponse(bool valid) {
  const std::string trust = kTrustNs;
  return MakeEnvelope(MakeTrustElement(
      "RequestSecurityTokenResponse", "",
      "<wst:TokenType>" + trust + "/RSTR/Status</wst:TokenType><wst:Status><wst:Code>" + trust +
          (valid ? "/status/valid" : "/status/invalid") + "</wst:Code></wst:Status>"));
}

std::string MakeChallengeResponse(const std::string& context, const std::string& leg) {
  return MakeEnvelope(
      MakeTrustElement("RequestSecurityTokenResponse", MakeContext(context), MakeBinaryExchange(leg)));
}

std::string MakeNegotiatedResponse(const std::string& context, const std::string& leg,
                                   const IssuedToken& token) {
  return MakeCollection(MakeContext(context),
                        (leg.empty() ? "" : MakeBinaryExchange(leg)) + MakeTokenFields(token));
}

std::string MakeFault(FaultCode code, const std::string& text) {
  return MakeEnvelope(std::string("<soapenv:Fault><faultcode xmlns:wst=\"") + kTrustNs + "\" xmlns:wsse=\"" +
                      kSecextNs + "\">" + ToText(code) + "</faultcode><faultstring>" + Escape(text) +
                      "</faultstring></soapenv:Fault>");
}

}  // namespace DevSts
