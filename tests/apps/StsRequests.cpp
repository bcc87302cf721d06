// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "apps/StsRequests.h"

namespace StsTests {

std::string Envelope(const std::string& security, const std::string& body) {
  return R"(<soapenv:Envelope xmlns:soapenv="http://schemas.xmlsoap.org/soap/envelope/"
 xmlns:wsse="http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"
 xmlns:wsu="http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd"
 xmlns:wst="http://docs.oasis-open.org/ws-sx/ws-trust/200512"
 xmlns:wsa="http://www.w3.org/2005/08/addressing">
<soapenv:Header>
<wsse:Security>
)" + security +
         R"(</wsse:Security>
</soapenv:Header>
<soapenv:Body>
)" + body +
         R"(</soapenv:Body>
</soapenv:Envelope>
)";
}

std::string Timestamp() {
  return R"(<wsu:Timestamp>
<wsu:Created>2030-01-01T00:00:00.000Z</wsu:Created>
<wsu:Expires>2030-01-01T00:10:00.000Z</wsu:Expires>
</wsu:Timestamp>
)";
}

std::string PasswordRequest() {
  const std::string userNameToken = R"(<wsse:UsernameToken>
<wsse:Username>alice@example.com</wsse:Username>
<wsse:Password Type="http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-username-token-profile-1.0#PasswordText">secret</wsse:Password>
</wsse:UsernameToken>
)";
  const std::string body = R"(<wst:RequestSecurityToken>
<wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>
<wst:RequestType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/Issue</wst:RequestType>
<wst:KeyType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/Bearer</wst:KeyType>
<wst:Lifetime>
<wsu:Created>2030-01-01T00:00:00.000Z</wsu:Created>
<wsu:Expires>2030-01-01T00:10:00.000Z</wsu:Expires>
</wst:Lifetime>
<wst:Renewing Allow="false" OK="false"/>
<wst:Delegatable>false</wst:Delegatable>
</wst:RequestSecurityToken>
)";
  return Envelope(Timestamp() + userNameToken, body);
}

}  // namespace StsTests
