// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/RequestHandler.h"

#include "devsts/Fault.h"
#include "devsts/PresentedToken.h"
#include "devsts/Responses.h"
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
  record.SetAnswer(500, ToText(code), reason);
  return {500, kXmlContentType, MakeFault(code, text)};
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

RequestHandler::RequestHandler(const HandlerOptions& options, const Directory& directory,
                               const TokenIssuer& issuer, const Clock& clock, const LogSink& log)
    : _options(options),
      _directory(std::make_shared<const Directory>(directory)),
      _issuer(issuer),
      _clock(clock),
      _log(log),
      _negotiator(options.negotiation) {}

Answer RequestHandler::HandleRequest(const std::string& soapAction, const std::string& contentType,
                                     const std::string& body) {
  RequestRecord record;
  const Answer answer = Respond(soapAction, contentType, body, record);
  if (_log) {
    _log(record.ToJson(_clock()));
  }
  return answer;
}

Answer RequestHandler::Respond(const std::string& soapAction, const std::string& contentType,
                               const std::string& body, RequestRecord& record) {
  if (!IsXml(contentType)) {
    record.SetAnswer(415, "", "content type");
    return {415, "text/plain", "SOAP 1.1 requests have the content type text/xml.\n"};
  }
  try {
    const std::string text = Process(soapAction, body, record);
    record.SetAnswer(200, "", "");
    return {200, kXmlContentType, text};
  } catch (const Fault& fault) {
    return MakeFaultAnswer(fault.GetCode(), fault.what(), fault.what(), record);
  } catch (const std::exception& e) {
    // The client learns nothing about the inside of the service; the log does.
    return MakeFaultAnswer(FaultCode::SERVER, "The service failed", e.what(), record);
  }
}

std::string RequestHandler::Process(const std::string& soapAction, const std::string& body,
                                    RequestRecord& record) {
  const Operation operation = ReadAction(soapAction);
  record.SetOperation(GetName(operation));
  const SoapMessage message = ReadSoapMessage(body);
  const SecurityHeader header = ReadSecurityHeader(*message.security);
  const long long now = _clock();
  RequireFresh(header, now, _options.maxClockSkewSec * kMicrosecondsPerSecond);
  record.AddPassed("timestamp");
  const TokenRequest request = ReadTokenRequest(*message.request, operation);
  const std::shared_ptr<const Directory> directory = GetDirectory();
  const AuthenticationContext context = {*directory, _issuer.GetCertificate(), _replays, now, record};
  return Dispatch(message, header, request, context);
}

std::string RequestHandler::Dispatch(const SoapMessage& message, const SecurityHeader& header,
                                     const TokenRequest& request, const AuthenticationContext& context) {
  if (request.binaryExchange) {
    return Negotiate(message, header, request, context);
  }
  switch (request.operation) {
    case Operation::RENEW:
      return Renew(message, header, request, context);
    case Operation::VALIDATE:
      return Validate(request, context);
    default:
      return Issue(message, header, request, context);
  }
}

std::string RequestHandler::Issue(const SoapMessage& message, const SecurityHeader& header,
                                  const TokenRequest& request, const AuthenticationContext& context) {
  const Caller caller = Authenticate(message, header, context);
  const AssertionContent content = Grant(caller, request, _options.lifetime, context.directory, context.now);
  return MakeIssueResponse({_issuer.Issue(content), content.notBefore, content.notOnOrAfter});
}

/// One round of a negotiation. What is granted is what its first message asked for.
std::string RequestHandler::Negotiate(const SoapMessage& message, const SecurityHeader& header,
                                      const TokenRequest& request, const AuthenticationContext& context) {
  const NegotiationRound round = request.operation == Operation::CHALLENGE
                                     ? _negotiator.Continue(header, request, context)
                                     : _negotiator.Start(message, header, request, context);
  const std::string leg = Pelmar::StringUtil::Base64Encode(round.leg);
  if (!round.caller) {
    return MakeChallengeResponse(round.context, leg);
  }
  const AssertionContent content =
      Grant(*round.caller, round.wishes, _options.lifetime, context.directory, context.now);
  return MakeNegotiatedResponse(round.context, leg,
                                {_issuer.Issue(content), content.notBefore, content.notOnOrAfter});
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
  return MakeRenewResponse({_issuer.Issue(renewed), renewed.notBefore, renewed.notOnOrAfter});
}

/// Answers whether the subject is one that the service still knows, by a token of its own. Anybody may ask.
std::string RequestHandler::Validate(const TokenRequest& request, const AuthenticationContext& context) {
  try {
    GetSubject(ReadTarget(request, context), context);
    return MakeValidateResponse(true);
  } catch (const Fault& fault) {
    context.record.AddFailed(fault.what());
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
