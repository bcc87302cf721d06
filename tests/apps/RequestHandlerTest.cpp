// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The development token service's answers to single messages.

#include "apps/StsRequests.h"
#include "support/TokenFactory.h"

#include "devsts/RequestHandler.h"

#include <gtest/gtest.h>

#include <regex>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace StsTests;
using TestSupport::ReplaceOnce;

/// One service for all tests of this file: its keys take a while to make.
DevSts::TokenIssuer& Issuer() {
  static DevSts::TokenIssuer issuer(DevSts::CertificateAuthority().IssueSigner(), "urn:test:sts");
  return issuer;
}

class Handler final {
 public:
  explicit Handler(long long now = kNow, const DevSts::HandlerOptions& options = DevSts::HandlerOptions())
      : _handler(
            options, DevSts::Directory::MakeSample(), Issuer(), [now] { return now; },
            [this](const std::string& line) { lines.push_back(line); }) {}

  DevSts::Answer Handle(const std::string& body, const std::string& action = kIssueAction,
                        const std::string& contentType = kXml) {
    return _handler.HandleRequest(action, contentType, body);
  }

  std::vector<std::string> lines;

 private:
  DevSts::RequestHandler _handler;
};

std::string FaultEnvelope(const std::string& code, const std::string& text) {
  return R"(<?xml version="1.0" encoding="UTF-8"?>
<soapenv:Envelope xmlns:soapenv="http://schemas.xmlsoap.org/soap/envelope/"><soapenv:Header/><soapenv:Body><soapenv:Fault>)"
         R"(<faultcode xmlns:wst="http://docs.oasis-open.org/ws-sx/ws-trust/200512" )"
         R"(xmlns:wsse="http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd">)" +
         code + "</faultcode><faultstring>" + text +
         "</faultstring></soapenv:Fault></soapenv:Body></soapenv:Envelope>";
}

/// What the answer says, without what differs from one token to the next.
std::string Mask(std::string text) {
  text = std::regex_replace(text, std::regex("_[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}"), "{id}");
  return std::regex_replace(text, std::regex("<ds:Signature .*</ds:Signature>"), "{signature}");
}

const std::string kVendor = QUORLIN_VENDOR_URI_BASE;

/// The sample user's attributes.
std::string AliceAttributes() {
  const auto attribute = [](const std::string& name, const std::string& friendlyName,
                            const std::string& values) {
    return "<saml:Attribute Name=\"" + name +
           "\" NameFormat=\"urn:oasis:names:tc:SAML:2.0:attrname-format:uri\" FriendlyName=\"" +
           friendlyName + "\">" + values + "</saml:Attribute>";
  };
  const auto value = [](const std::string& text) {
    return "<saml:AttributeValue>" + text + "</saml:AttributeValue>";
  };
  return "<saml:AttributeStatement>" +
         attribute(kVendor + "/schemas/attr-names/2009/01/GroupIdentity", "Groups",
                   value("example.com\\Administrators") + value("Staff/example.com")) +
         attribute(kVendor + "/schemas/attr-names/2011/07/isSolution", "Solution", value("false")) +
         attribute("http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname", "GivenName",
                   value("Alice")) +
         attribute("http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname", "Surname",
                   value("Example")) +
         "</saml:AttributeStatement>";
}

const std::string kNameId =
    "<saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\">alice@example.com</saml:NameID>";

/// Alice's assertion with these parts in place; everything else is as the plain request asks for it.
std::string AliceAssertion(const std::string& delegateId, const std::string& conditions,
                           const std::string& advice) {
  return "<saml:Assertion xmlns:saml=\"urn:oasis:names:tc:SAML:2.0:assertion\" ID=\"{id}\" "
         "IssueInstant=\"2030-01-01T00:00:01Z\" Version=\"2.0\">"
         "<saml:Issuer Format=\"urn:oasis:names:tc:SAML:2.0:nameid-format:entity\">urn:test:sts</saml:Issuer>{signature}"
         "<saml:Subject>" +
         kNameId + "<saml:SubjectConfirmation Method=\"urn:oasis:names:tc:SAML:2.0:cm:bearer\">" +
         delegateId +
         "<saml:SubjectConfirmationData NotOnOrAfter=\"2030-01-01T00:10:01Z\"/></saml:SubjectConfirmation></saml:Subject>"
         "<saml:Conditions NotBefore=\"2030-01-01T00:00:01Z\" NotOnOrAfter=\"2030-01-01T00:10:01Z\">" +
         conditions + "</saml:Conditions>" + advice +
         "<saml:AuthnStatement AuthnInstant=\"2030-01-01T00:00:01Z\"><saml:AuthnContext><saml:AuthnContextClassRef>"
         "urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport"
         "</saml:AuthnContextClassRef></saml:AuthnContext></saml:AuthnStatement>" +
         AliceAttributes() + "</saml:Assertion>";
}

std::string IssueEnvelope(const std::string& assertion) {
  return R"(<?xml version="1.0" encoding="UTF-8"?>
<soapenv:Envelope xmlns:soapenv="http://schemas.xmlsoap.org/soap/envelope/"><soapenv:Header/><soapenv:Body>)"
         R"(<wst:RequestSecurityTokenResponseCollection xmlns:wst="http://docs.oasis-open.org/ws-sx/ws-trust/200512" )"
         R"(xmlns:wsu="http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-utility-1.0.xsd">)"
         R"(<wst:RequestSecurityTokenResponse><wst:TokenType>urn:oasis:names:tc:SAML:2.0:assertion</wst:TokenType>)"
         R"(<wst:Lifetime><wsu:Created>2030-01-01T00:00:01Z</wsu:Created><wsu:Expires>2030-01-01T00:10:01Z</wsu:Expires>)"
         R"(</wst:Lifetime><wst:RequestedSecurityToken>)" +
         assertion +
         "</wst:RequestedSecurityToken></wst:RequestSecurityTokenResponse></wst:RequestSecurityTokenResponseCollection>"
         "</soapenv:Body></soapenv:Envelope>";
}

TEST(RequestHandler, IssuesABearerTokenForTheRightPassword) {
  Handler handler;
  const DevSts::Answer answer = handler.Handle(PasswordRequest());
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(answer.contentType, "text/xml; charset=utf-8");
  EXPECT_EQ(Mask(answer.body), IssueEnvelope(AliceAssertion("", "", "")));
}

TEST(RequestHandler, LogsAGrantedRequestInOneLine) {
  Handler handler;
  handler.Handle(PasswordRequest());
  const std::vector<std::string> expected = {
      R"({"time":"2030-01-01T00:00:01Z","operation":"issue","user":"alice@example.com",)"
      R"("asked":{"confirmation":"bearer","lifetimeSec":600,"renewable":false,"delegable":false,"delegates":false,)"
      R"("audiences":0,"advices":0},"passed":["timestamp","password"],"status":200,"answer":"token",)"
      R"("granted":{"confirmation":"bearer","lifetimeSec":600}})"};
  EXPECT_EQ(handler.lines, expected);
}

TEST(RequestHandler, LogsARefusedRequestInOneLine) {
  Handler handler;
  handler.Handle(ReplaceOnce(PasswordRequest(), ">secret<", ">guess<"));
  const std::vector<std::string> expected = {
      R"({"time":"2030-01-01T00:00:01Z","operation":"issue","user":"alice@example.com",)"
      R"("asked":{"confirmation":"bearer","lifetimeSec":600,"renewable":false,"delegable":false,"delegates":false,)"
      R"("audiences":0,"advices":0},"passed":["timestamp"],"status":500,"answer":"fault",)"
      R"("fault":"wst:FailedAuthentication","reason":"Invalid user name or password"})"};
  EXPECT_EQ(handler.lines, expected);
}

TEST(RequestHandler, KeepsUnknownUserNamesOutOfTheLog) {
  Handler handler;
  handler.Handle(ReplaceOnce(PasswordRequest(), ">alice@example.com<", ">my-password<"));
  const std::vector<std::string> expected = {
      R"({"time":"2030-01-01T00:00:01Z","operation":"issue","user":null,)"
      R"("asked":{"confirmation":"bearer","lifetimeSec":600,"renewable":false,"delegable":false,"delegates":false,)"
      R"("audiences":0,"advices":0},"passed":["timestamp"],"status":500,"answer":"fault",)"
      R"("fault":"wst:FailedAuthentication","reason":"Invalid user name or password"})"};
  EXPECT_EQ(handler.lines, expected);
}

TEST(RequestHandler, RefusesOtherContentTypes) {
  Handler handler;
  for (const char* const type : {"", "application/soap+xml", "text/plain", "text/xmlish", "xtext/xml"}) {
    const DevSts::Answer answer = handler.Handle(PasswordRequest(), kIssueAction, type);
    EXPECT_EQ(answer.status, 415) << type;
    EXPECT_EQ(answer.body, "SOAP 1.1 requests have the content type text/xml.\n");
  }
}

TEST(RequestHandler, AcceptsTheContentTypeWhateverItsCaseAndParameters) {
  Handler handler;
  for (const char* const type :
       {"text/xml", "Text/XML", "text/xml;charset=utf-8", "text/xml ; charset=\"utf-8\""}) {
    EXPECT_EQ(handler.Handle(PasswordRequest(), kIssueAction, type).status, 200) << type;
  }
}

TEST(RequestHandler, RefusesActionsThatAreNotQuotedOrNotKnown) {
  Handler handler;
  for (const char* const action : {"", "\"\"", "http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Issue",
                                   "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/RST/Cancel\"",
                                   "\"http://docs.oasis-open.org/ws-sx/ws-trust/200512/rst/issue\""}) {
    const DevSts::Answer answer = handler.Handle(PasswordRequest(), action);
    EXPECT_EQ(answer.status, 500) << action;
    EXPECT_EQ(answer.body, FaultEnvelope("soapenv:Client", "The SOAPAction is missing or unknown")) << action;
  }
}

/// A change to the good request, and the fault that it brings.
struct Defect {
  const char* name;
  const char* from;
  const char* to;
  const char* code;
  const char* text;
};

class RequestHandlerRefuses : public testing::TestWithParam<Defect> {};

TEST_P(RequestHandlerRefuses, WithTheRightFault) {
  const Defect& defect = GetParam();
  Handler handler;
  const DevSts::Answer answer = handler.Handle(ReplaceOnce(PasswordRequest(), defect.from, defect.to));
  EXPECT_EQ(answer.status, 500);
  EXPECT_EQ(answer.contentType, "text/xml; charset=utf-8");
  EXPECT_EQ(answer.body, FaultEnvelope(defect.code, defect.text));
}

constexpr const char* kClient = "soapenv:Client";
constexpr const char* kFailed = "wst:RequestFailed";

const Defect kDefects[] = {
    {"NotXml", "</soapenv:Envelope>", "", kClient,
     "The request is not acceptable XML: no element found at line 32, column 1"},
    {"OtherSoapVersion", "http://schemas.xmlsoap.org/soap/envelope/",
     "http://www.w3.org/2003/05/soap-envelope", kClient, "The request is not a SOAP 1.1 envelope"},
    {"ElementAfterBody", "</soapenv:Body>", "</soapenv:Body><more/>", kClient,
     "Element Envelope must hold exactly Header, Body"},
    {"TextInEnvelope", "</soapenv:Body>", "</soapenv:Body>more", kClient,
     "Element Envelope may hold elements only"},
    {"ProcessingInstruction", "</soapenv:Body>", "</soapenv:Body><?more?>", kClient,
     "Element Envelope may hold elements only"},
    {"SecondSecurityHeader", "</soapenv:Header>", "<wsse:Security/></soapenv:Header>", kClient,
     "Element Header holds more than one Security"},
    {"HeaderToBeUnderstood", "</soapenv:Header>", "<x soapenv:mustUnderstand=\"1\"/></soapenv:Header>",
     kClient, "Header x is not understood"},
    {"SecondRequest", "</soapenv:Body>", "<x/></soapenv:Body>", kClient,
     "The body must hold exactly one request"},
    {"TimestampCreatedIsNoDate", "<wsu:Timestamp>\n<wsu:Created>2030-01-01T00:00:00.000Z",
     "<wsu:Timestamp>\n<wsu:Created>now", kClient, "Element Created is not a date"},
    {"TimestampWithoutExpires", "<wsu:Expires>2030-01-01T00:10:00.000Z</wsu:Expires>\n</wsu:Timestamp>",
     "</wsu:Timestamp>", kClient, "Element Timestamp must hold exactly Created, Expires"},
    {"TimestampInTheFuture", "<wsu:Timestamp>\n<wsu:Created>2030-01-01T00:00:00.000Z",
     "<wsu:Timestamp>\n<wsu:Created>2030-01-01T00:05:02.000Z", kFailed,
     "The message's Timestamp is in the future: check the clocks"},
    {"TimestampExpired",
     "00:00:00.000Z</wsu:Created>\n<wsu:Expires>2030-01-01T00:10:00.000Z</wsu:Expires>\n</wsu:Timestamp>",
     "00:00:00.000Z</wsu:Created>\n<wsu:Expires>2029-12-31T23:55:01.000Z</wsu:Expires>\n</wsu:Timestamp>",
     kFailed, "The message's Timestamp spans no acceptable time"},
    {"TimestampTooLong", "<wsu:Expires>2030-01-01T00:10:00.000Z</wsu:Expires>\n</wsu:Timestamp>",
     "<wsu:Expires>2030-01-01T01:00:00.001Z</wsu:Expires>\n</wsu:Timestamp>", kFailed,
     "The message's Timestamp spans no acceptable time"},
    {"UnknownSecurityToken", "<wsse:UsernameToken>", "<wsse:X/><wsse:UsernameToken>", kClient,
     "The security header holds an unknown or repeated X"},
    {"SecondTimestamp", "<wsse:UsernameToken>",
     "<wsu:Timestamp><wsu:Created>2030-01-01T00:00:00Z</wsu:Created><wsu:Expires>2030-01-01T00:01:00Z</wsu:Expires>"
     "</wsu:Timestamp><wsse:UsernameToken>",
     kClient, "The security header holds an unknown or repeated Timestamp"},
    {"OtherPasswordType", "#PasswordText", "#PasswordDigest", "wsse:InvalidSecurityToken",
     "Only passwords of type PasswordText are accepted"},
    {"CommentInThePassword", ">secret<", ">sec<!-- -->ret<", kClient, "Element Password must hold text only"},
    {"CommentInTheUserName", ">alice@example.com<", ">alice<!-- -->@example.com<", kClient,
     "Element Username must hold text only"},
    {"WrongPassword", ">secret<", ">Secret<", "wst:FailedAuthentication", "Invalid user name or password"},
    {"EmptyPassword", ">secret<", "><", "wst:FailedAuthentication", "Invalid user name or password"},
    {"UnknownUser", ">alice@example.com<", ">mallory@example.com<", "wst:FailedAuthentication",
     "Invalid user name or password"},
    {"OtherTokenType", ">urn:oasis:names:tc:SAML:2.0:assertion<", ">urn:oasis:names:tc:SAML:1.0:assertion<",
     kFailed, "Element TokenType must be urn:oasis:names:tc:SAML:2.0:assertion"},
    {"RequestTypeAgainstAction", "/Issue<", "/Renew<", kFailed,
     "Element RequestType must be http://docs.oasis-open.org/ws-sx/ws-trust/200512/Issue"},
    {"OtherKeyType", "/Bearer<", "/SymmetricKey<", kFailed, "The KeyType is not supported"},
    {"HolderOfKeyWithoutProof", "/Bearer<", "/PublicKey<", kFailed,
     "A token can only be bound to a key that signed the request"},
    {"LifetimeBackwards", "<wst:Lifetime>\n<wsu:Created>2030-01-01T00:00:00.000Z",
     "<wst:Lifetime>\n<wsu:Created>2030-01-01T00:10:00.000Z", kFailed,
     "The Lifetime spans no acceptable time"},
    {"LifetimeOfCenturies", "<wsu:Expires>2030-01-01T00:10:00.000Z</wsu:Expires>\n</wst:Lifetime>",
     "<wsu:Expires>9999-01-01T00:10:00.000Z</wsu:Expires>\n</wst:Lifetime>", kFailed,
     "The Lifetime spans no acceptable time"},
    {"RenewalAfterExpiry", "OK=\"false\"", "OK=\"true\"", kFailed,
     "Tokens are never renewed after they have expired"},
    {"RenewingWithoutAllow", "Allow=\"false\" ", "", kClient, "Element Renewing has no attribute Allow"},
    {"RenewingWithUnknownAttribute", "Allow=\"false\"", "Allow=\"false\" For=\"ever\"", kClient,
     "Element Renewing has an unknown attribute For"},
    {"DelegatableIsNoBoolean", ">false</wst:Delegatable>", ">no</wst:Delegatable>", kClient,
     "Element Delegatable has no boolean value"},
    {"SecondKeyType", "<wst:Lifetime>",
     "<wst:KeyType>http://docs.oasis-open.org/ws-sx/ws-trust/200512/Bearer</wst:KeyType><wst:Lifetime>",
     kClient, "The request holds an unknown or repeated KeyType"},
    {"UnknownField", "<wst:Lifetime>", "<wst:Claims/><wst:Lifetime>", kClient,
     "The request holds an unknown or repeated Claims"},
    {"FieldOfOtherNamespace", "<wst:Delegatable>false</wst:Delegatable>",
     "<wsu:Delegatable>false</wsu:Delegatable>", kClient,
     "The request holds an unknown or repeated Delegatable"},
    {"BlankAudience", "</wst:RequestSecurityToken>",
     "<wst:Participants><wst:Participant><wsa:EndpointReference><wsa:Address> </wsa:Address></wsa:EndpointReference>"
     "</wst:Participant></wst:Participants></wst:RequestSecurityToken>",
     kFailed, "The address of a participant must not be blank"},
    {"UnknownParticipant", "</wst:RequestSecurityToken>",
     "<wst:Participants><wst:Primary/></wst:Participants></wst:RequestSecurityToken>", kClient,
     "Participants holds an unknown Primary"},
    {"UnknownAdvice", "</wst:RequestSecurityToken>",
     "<a:AdviceSet xmlns:a=\"" QUORLIN_VENDOR_URI_BASE
     "/names/2009/12/std-ext/WS-Trust1.4/advice\"><a:Hint/></a:AdviceSet></wst:RequestSecurityToken>",
     kClient, "AdviceSet holds an unknown Hint"},
    {"EmptyAdvice", "</wst:RequestSecurityToken>",
     "<a:AdviceSet xmlns:a=\"" QUORLIN_VENDOR_URI_BASE
     "/names/2009/12/std-ext/WS-Trust1.4/advice\"><a:Advice AdviceSource=\"x\"/></a:AdviceSet></wst:RequestSecurityToken>",
     kFailed, "An advice must hold an attribute"},
    {"UnknownDelegate", "</wst:RequestSecurityToken>",
     "<wst:DelegateTo><wsse:UsernameToken><wsse:Username>carol@example.com</wsse:Username></wsse:UsernameToken>"
     "</wst:DelegateTo></wst:RequestSecurityToken>",
     kFailed, "The principal to delegate to is not known"},
    {"PasswordInDelegateTo", "</wst:RequestSecurityToken>",
     "<wst:DelegateTo><wsse:UsernameToken><wsse:Username>bob@example.com</wsse:Username><wsse:Password>x</wsse:Password>"
     "</wsse:UsernameToken></wst:DelegateTo></wst:RequestSecurityToken>",
     kClient, "Element UsernameToken must hold exactly Username"},
};

INSTANTIATE_TEST_SUITE_P(Table, RequestHandlerRefuses, testing::ValuesIn(kDefects),
                         [](const auto& test) { return std::string(test.param.name); });

TEST(RequestHandler, RefusesAMessageWithoutCredentials) {
  Handler handler;
  const std::string request = PasswordRequest();
  const std::size_t start = request.find("<wsse:UsernameToken>");
  const std::string end = "</wsse:UsernameToken>";
  const std::string without = request.substr(0, start) + request.substr(request.find(end) + end.size());
  EXPECT_EQ(handler.Handle(without).body,
            FaultEnvelope("wsse:InvalidSecurityToken", "The security header holds no credentials"));
}

TEST(RequestHandler, RefusesABodyThatIsNoRequest) {
  Handler handler;
  EXPECT_EQ(handler.Handle(Envelope(Timestamp(), "<wst:RequestSecurityTokenResponse/>")).body,
            FaultEnvelope("soapenv:Client", "The body must hold a RequestSecurityToken"));
}

TEST(RequestHandler, RefusesAMessageWithoutTimestamp) {
  Handler handler;
  EXPECT_EQ(handler.Handle(Envelope("", "<wst:RequestSecurityToken/>")).body,
            FaultEnvelope("soapenv:Client", "The security header holds no Timestamp"));
}

/// The clock decides which messages are fresh: five minutes are allowed for clocks that differ.
TEST(RequestHandler, TakesMessagesFromFiveMinutesAheadToFiveMinutesLate) {
  constexpr long long kSecond = 1000000;
  const long long created = kNow - kSecond;
  const long long expires = created + 600 * kSecond;
  const std::string late = FaultEnvelope("wst:RequestFailed", "The message has expired: check the clocks");
  const std::string early =
      FaultEnvelope("wst:RequestFailed", "The message's Timestamp is in the future: check the clocks");
  EXPECT_EQ(Handler(created - 300 * kSecond).Handle(PasswordRequest()).status, 200);
  EXPECT_EQ(Handler(created - 300 * kSecond - 1).Handle(PasswordRequest()).body, early);
  EXPECT_EQ(Handler(expires + 300 * kSecond - 1).Handle(PasswordRequest()).status, 200);
  EXPECT_EQ(Handler(expires + 300 * kSecond).Handle(PasswordRequest()).body, late);
}

/// An addition to the request's end, and what it brings into the token.
struct Wish {
  const char* name;
  const char* from;
  std::string to;
  std::string delegateId;
  std::string conditions;
  std::string advice;
};

class RequestHandlerGrants : public testing::TestWithParam<Wish> {};

TEST_P(RequestHandlerGrants, WhatIsAskedFor) {
  const Wish& wish = GetParam();
  Handler handler;
  const DevSts::Answer answer = handler.Handle(ReplaceOnce(PasswordRequest(), wish.from, wish.to));
  EXPECT_EQ(answer.status, 200);
  EXPECT_EQ(Mask(answer.body), IssueEnvelope(AliceAssertion(wish.delegateId, wish.conditions, wish.advice)));
}

constexpr const char* kRequestEnd = "</wst:RequestSecurityToken>";
const std::string kBobNameId =
    "<saml:NameID Format=\"http://schemas.xmlsoap.org/claims/UPN\">bob@example.com</saml:NameID>";

const Wish kWishes[] = {
    {"Renewable", "Allow=\"false\"", "Allow=\"true\"", "",
     "<saml:Condition xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\" xmlns:ext=\"" + kVendor +
         "/names/2009/12/std-ext/SAML2.0\" Count=\"10\" xsi:type=\"ext:RenewRestrictionType\"></saml:Condition>",
     ""},
    {"Delegable", ">false</wst:Delegatable>", ">true</wst:Delegatable>", "",
     "<saml:ProxyRestriction Count=\"10\"/>", ""},
    {"Audience", kRequestEnd,
     "<wst:Participants><wst:Participant><wsa:EndpointReference><wsa:Address>urn:a&amp;b</wsa:Address>"
     "</wsa:EndpointReference></wst:Participant><wst:Participant><wsa:EndpointReference><wsa:Address>urn:c</wsa:Address>"
     "</wsa:EndpointReference></wst:Participant></wst:Participants></wst:RequestSecurityToken>",
     "",
     "<saml:AudienceRestriction><saml:Audience>urn:a&amp;b</saml:Audience><saml:Audience>urn:c</saml:Audience>"
     "</saml:AudienceRestriction>",
     ""},
    {"DelegateTo", kRequestEnd,
     "<wst:DelegateTo><wsse:UsernameToken><wsse:Username>EXAMPLE.COM\\Bob</wsse:Username></wsse:UsernameToken>"
     "</wst:DelegateTo></wst:RequestSecurityToken>",
     kBobNameId,
     "<saml:Condition xmlns:xsi=\"http://www.w3.org/2001/XMLSchema-instance\" "
     "xmlns:del=\"urn:oasis:names:tc:SAML:2.0:conditions:delegation\" xsi:type=\"del:DelegationRestrictionType\">"
     "<del:Delegate DelegationInstant=\"2030-01-01T00:00:01Z\">" +
         kBobNameId + "</del:Delegate></saml:Condition>",
     ""},
    {"Advice", kRequestEnd,
     "<a:AdviceSet xmlns:a=\"" + kVendor +
         "/names/2009/12/std-ext/WS-Trust1.4/advice\"><a:Advice AdviceSource=\"urn:&quot;app&quot;\">"
         "<a:Attribute Name=\"color\"><a:AttributeValue>red</a:AttributeValue><a:AttributeValue>blue</a:AttributeValue>"
         "</a:Attribute><a:Attribute Name=\"none\"/></a:Advice></a:AdviceSet></wst:RequestSecurityToken>",
     "", "",
     "<saml:Advice><ext:RSAAdvice xmlns:ext=\"" + kVendor +
         "/names/2009/12/std-ext/SAML2.0\" AdviceSource=\"urn:&quot;app&quot;\"><saml:Attribute Name=\"color\">"
         "<saml:AttributeValue>red</saml:AttributeValue><saml:AttributeValue>blue</saml:AttributeValue></saml:Attribute>"
         "<saml:Attribute Name=\"none\"></saml:Attribute></ext:RSAAdvice></saml:Advice>"},
};

INSTANTIATE_TEST_SUITE_P(Table, RequestHandlerGrants, testing::ValuesIn(kWishes),
                         [](const auto& test) { return std::string(test.param.name); });

TEST(RequestHandler, CutsLifetimesDownToItsLimit) {
  DevSts::HandlerOptions options;
  options.lifetime.maxSec = 60;
  Handler handler(kNow, options);
  const std::string body = handler.Handle(PasswordRequest()).body;
  EXPECT_NE(
      body.find("<saml:Conditions NotBefore=\"2030-01-01T00:00:01Z\" NotOnOrAfter=\"2030-01-01T00:01:01Z\">"),
      std::string::npos);
}

TEST(RequestHandler, ShowsNothingOfItsInsideWhenItFails) {
  std::vector<std::string> lines;
  bool isBroken = true;
  const DevSts::Clock clock = [&isBroken]() -> long long {
    if (std::exchange(isBroken, false)) {
      throw std::runtime_error("the clock on the left wall stands still");
    }
    return kNow;
  };
  DevSts::RequestHandler handler(DevSts::HandlerOptions(), DevSts::Directory::MakeSample(), Issuer(), clock,
                                 [&](const std::string& line) { lines.push_back(line); });
  const DevSts::Answer answer = handler.HandleRequest(kIssueAction, kXml, PasswordRequest());
  EXPECT_EQ(answer.status, 500);
  EXPECT_EQ(answer.body, FaultEnvelope("soapenv:Server", "The service failed"));
  const std::vector<std::string> expected = {
      R"({"time":"2030-01-01T00:00:01Z","operation":"issue","user":null,"asked":null,"passed":[],"status":500,"answer":"fault",)"
      R"("fault":"soapenv:Server","reason":"the clock on the left wall stands still"})"};
  EXPECT_EQ(lines, expected);
}

}  // namespace
