// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/RequestHandler.h"

#include "devsts/Fault.h"
#include "devsts/PresentedToken.h"
#include "devsts/SecurityHeader.h"
#include "devsts/SoapMessage.h"

#include <pelmar/StringUtil.h>

namespace DevSts {

namespace {

constexpr const char* kXmlContentType = "text/xml; charset=utf-8";

const char* GetName(Operation operation) {
  static const char* const kNames[] = {"issue", "renew", "validate", "challenge"};
  return kNames[static_cast<int>(operation)];
}

/// Whether the media type is text/xml, whatever its parameters (SOAP 1.1, section 6; RFC 7231,
/// section 3.1.1.1).
bool IsXml(const std::string& contentType) {
  std::string type = contentType.substr(0, contentType.find(';'));
  type.erase(type.find_last_not_of(" \t") + 1);
  return Pelmar::StringUtil::ToLower(type) == "text/xml";
}

Answer MakeFaultAnswer(FaultCode code, const std::string& text, const std::string& reason,
                       RequestRecord& record) {
  record.SetAnswer(500, "fault");
  record.SetReason(ToText(code), reason);
  return {500, kXmlContentType, MakeFault(code, text), ""};
}

Answer MakeContentTypeAnswer(RequestRecord& record) {
  record.SetAnswer(415, "refusal");
  record.SetReason("", "content type");
  return {415, "text/plain", "SOAP 1.1 requests have the content type text/xml.\n", ""};
}

Answer MakeNoAnswer(RequestRecord& record) {
  record.SetAnswer(0, "none");
  record.SetReason("", "dropped, as the service was told to");
  return {};
}

/// The token that the request is about.
AssertionContent ReadTarget(const TokenRequest& request, const AuthenticationContext& context) {
  try {
    const AssertionContent content = ReadPresentedToken(*request.target, context.tokenSigner, context.now);
    context.record.AddPassed("token");
    return content;
  } catch (const TokenException& e) {
    throw Fault(FaultCode::INVALID_TOKEN, e.what());
  }
}

const User& GetSubject(const AssertionContent& content, const AuthenticationContext& context) {
  const User* const user = context.directory.FindByName(content.upn);
  if (user == nullptr) {
    throw Fault(FaultCode::INVALID_TOKEN, "The token's subject is not known");
  }
  context.record.SetUser(user->GetUpn());
  return *user;
}

}  // namespace

struct RequestHandler::Incoming {
  const std::string& soapAction;
  const std::string& contentType;
  const std::string& body;
  const std::string& cookie;
};

RequestHandler::RequestHandler(const HandlerOptions& options, const Directory& directory,
                               const TokenIssuer& issuer, const Clock& clock, const LogSink& log)
    : _options(options),
      _directory(std::make_shared<const Directory>(directory)),
      _issuer(issuer),
      _clock(clock),
      _log(log),
      _negotiator(options.negotiation, options.cookie),
      _trouble(options.trouble) {}

Answer RequestHandler::HandleRequest(const std::string& soapAction, const std::string& contentType,
                                     const std::string& body, const std::string& cookie) {
  RequestRecord record;
  const Answer answer = Respond({soapAction, contentType, body, cookie}, record);
  if (_log) {
    _log(record.ToJson(_clock()));
  }
  return answer;
}

Answer RequestHandler::Respond(const Incoming& incoming, RequestRecord& record) {
  if (!IsXml(incoming.contentType)) {
    return MakeContentTypeAnswer(record);
  }
  try {
    return Process(incoming, record);
  } catch (const Fault& fault) {
    return MakeFaultAnswer(fault.GetCode(), fault.what(), fault.what(), record);
  } catch (const std::exception& e) {
    // The client learns nothing about the inside of the service; the log does.
    return MakeFaultAnswer(FaultCode::SERVER, "The service failed", e.what(), record);
  }
}

/// Trouble comes before anything is looked at or changed.
Answer RequestHandler::Process(const Incoming& incoming, RequestRecord& record) {
  const Operation operation = ReadAction(incoming.soapAction);
  record.SetOperation(GetName(operation));
  switch (_trouble.Draw()) {
    case Trouble::DROP:
      return MakeNoAnswer(record);
    case Trouble::FAIL:
      throw Fault(FaultCode::SERVER, "The service failed, as it was told to");
    case Trouble::NONE:
      break;
  }
  return Perform(operation, incoming, record);
}

Answer RequestHandler::Perform(Operation operation, const Incoming& incoming, RequestRecord& record) {
  const SoapMessage message = ReadSoapMessage(incoming.body);
  const SecurityHeader header = ReadSecurityHeader(*message.security);
  const long long now = _clock();
  RequireFresh(header, now, _options.maxClockSkewSec * kMicrosecondsPerSecond);
  record.AddPassed("timestamp");
  const TokenRequest request = ReadTokenRequest(*message.request, operation);
  record.SetAsked(request);
  const std::shared_ptr<const Directory> directory = GetDirectory();
  const AuthenticationContext context = {*directory, _issuer.GetCertificate(), _replays, now, record};
  if (request.binaryExchange) {
    return Negotiate(incoming, message, header, request, context);
  }
  return {200, kXmlContentType, Grant(message, header, request, context), ""};
}

std::string RequestHandler::Grant(const SoapMessage& message, const SecurityHeader& header,
                                  const TokenRequest& request, const AuthenticationContext& context) {
  switch (request.operation) {
    case Operation::RENEW:
      return Renew(message, header, request, context);
    case Operation::VALIDATE:
      return Validate(request, context);
    default:
      return Issue(message, header, request, context);
  }
}

IssuedToken RequestHandler::Sign(const AssertionContent& content, RequestRecord& record) const {
  const IssuedToken token = {_issuer.Issue(content), content.notBefore, content.notOnOrAfter};
  record.SetAnswer(200, "token");
  record.SetGranted(content);
  return token;
}

std::string RequestHandler::Issue(const SoapMessage& message, const SecurityHeader& header,
                                  const TokenRequest& request, const AuthenticationContext& context) {
  const Caller caller = Authenticate(message, header, context);
  return MakeIssueResponse(Sign(
      DevSts::Grant(caller, request, _options.lifetime, context.directory, context.now), context.record));
}

/// One round of a negotiation. What is granted is what its first message asked for.
Answer RequestHandler::Negotiate(const Incoming& incoming, const SoapMessage& message,
                                 const SecurityHeader& header, const TokenRequest& request,
                                 const AuthenticationContext& context) {
  const NegotiationRound round = request.operation == Operation::CHALLENGE
                                     ? _negotiator.Continue(header, request, incoming.cookie, context)
                                     : _negotiator.Start(message, header, request, context);
  const std::string leg = Pelmar::StringUtil::Base64Encode(round.leg);
  if (!round.caller) {
    context.record.SetAnswer(200, "challenge");
    return {200, kXmlContentType, MakeChallengeResponse(round.context, leg), round.cookie};
  }
  const AssertionContent content =
      DevSts::Grant(*round.caller, round.wishes, _options.lifetime, context.directory, context.now);
  return {200, kXmlContentType, MakeNegotiatedResponse(round.context, leg, Sign(content, context.record)),
          round.cookie};
}

/// Whoever holds the key that the token is bound to may renew it.
std::string RequestHandler::Renew(const SoapMessage& message, const SecurityHeader& header,
                                  const TokenRequest& request, const AuthenticationContext& context) {
  RequireProofOfKey(message, header, context);
  const AssertionContent content = ReadTarget(request, context);
  const User& user = GetSubject(content, context);
  if (!content.confirmationCertificate ||
      content.confirmationCertificate->GetDer() != header.certificate->GetDer()) {
    throw Fault(FaultCode::INVALID_TOKEN, "The token is not bound to the key that signed the message");
  }
  const AssertionContent renewed = GrantRenewal(content, user, request, _options.lifetime, context.now);
  return MakeRenewResponse(Sign(renewed, context.record));
}

/// Answers whether the subject is one that the service still knows, by a token of its own. Anybody may ask.
std::string RequestHandler::Validate(const TokenRequest& request, const AuthenticationContext& context) {
  try {
    GetSubject(ReadTarget(request, context), context);
    context.record.SetAnswer(200, "valid");
    return MakeValidateResponse(true);
  } catch (const Fault& fault) {
    context.record.AddFailed(fault.what());
    context.record.SetAnswer(200, "invalid");
    return MakeValidateResponse(false);
  }
}

void RequestHandler::SetDirectory(const Directory& directory) {
  const std::shared_ptr<const Directory> next = std::make_shared<const Directory>(directory);
  const std::lock_guard<std::mutex> lock(_mutex);
  _directory = next;
}

std::shared_ptr<const Directory> RequestHandler::GetDirectory() const {
  const std::lock_guard<std::mutex> lock(_mutex);
  return _directory;
}

}  // namespace DevSts
