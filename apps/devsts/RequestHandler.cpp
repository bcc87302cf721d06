// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/RequestHandler.h"

#include "devsts/Fault.h"
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

}  // namespace

RequestHandler::RequestHandler(const HandlerOptions& options, const Directory& directory,
                               const TokenIssuer& issuer, const Clock& clock, const LogSink& log)
    : _options(options), _directory(directory), _issuer(issuer), _clock(clock), _log(log) {}

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
  RequireFresh(header, _clock(), _options.maxClockSkewSec * kMicrosecondsPerSecond);
  record.AddPassed("timestamp");
  const TokenRequest request = ReadTokenRequest(*message.request, operation);
  if (operation != Operation::ISSUE || request.binaryExchange) {
    throw Fault(FaultCode::REQUEST_FAILED, "The operation is not supported");
  }
  return Issue(message, header, request, record);
}

std::string RequestHandler::Issue(const SoapMessage& message, const SecurityHeader& header,
                                  const TokenRequest& request, RequestRecord& record) {
  if (header.assertion != nullptr) {
    throw Fault(FaultCode::REQUEST_FAILED, "Tokens are not exchanged");
  }
  const long long now = _clock();
  const Caller caller = Authenticate(message, header, _directory, _replays, now, record);
  const AssertionContent content = Grant(caller, request, _options.lifetime, _directory, now);
  return MakeIssueResponse({_issuer.Issue(content), content.notBefore, content.notOnOrAfter});
}

}  // namespace DevSts
