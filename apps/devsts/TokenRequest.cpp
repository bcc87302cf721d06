// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/TokenRequest.h"

#include "devsts/Clock.h"
#include "devsts/Fault.h"
#include "devsts/Uris.h"
#include "devsts/XmlReading.h"

#include <pelmar/xml/QName.h>

#include <set>

namespace DevSts {

using Pelmar::Xml::ElementNode;

namespace {

/// Nobody needs a token for longer, and it keeps sums of instants inside 64 bits.
constexpr long long kMaxRequestedLifetime = 100LL * 365 * 24 * 60 * 60 * kMicrosecondsPerSecond;

std::string TrustUri(const char* path) {
  return std::string(kTrustNs) + path;
}

void RequireText(const ElementNode& element, const std::string& expected) {
  if (GetTextOf(element) != expected) {
    throw Fault(FaultCode::REQUEST_FAILED, "Element " + element.GetLocalName() + " must be " + expected);
  }
}

void ReadKeyType(const ElementNode& element, TokenRequest& request) {
  const std::string type = GetTextOf(element);
  request.holderOfKey = type == TrustUri("/PublicKey");
  if (!request.holderOfKey && type != TrustUri("/Bearer")) {
    throw Fault(FaultCode::REQUEST_FAILED, "The KeyType is not supported");
  }
}

void ReadLifetime(const ElementNode& element, TokenRequest& request) {
  RequireChildren(element, kUtilityNs, {"Created", "Expires"});
  const long long created = ReadDate(GetOnlyChild(element, kUtilityNs, "Created")).GetUtcTime();
  const long long expires = ReadDate(GetOnlyChild(element, kUtilityNs, "Expires")).GetUtcTime();
  if (created >= expires || expires - created > kMaxRequestedLifetime) {
    throw Fault(FaultCode::REQUEST_FAILED, "The Lifetime spans no acceptable time");
  }
  request.lifetime = expires - created;
}

void ReadRenewing(const ElementNode& element, TokenRequest& request) {
  RequireNoOtherAttributes(element, {"Allow", "OK"});
  request.renewable = ReadBoolean(element, GetRequiredAttribute(element, "Allow"));
  if (ReadBoolean(element, GetRequiredAttribute(element, "OK"))) {
    throw Fault(FaultCode::REQUEST_FAILED, "Tokens are never renewed after they have expired");
  }
}

void ReadDelegateTo(const ElementNode& element, TokenRequest& request) {
  RequireChildren(element, kSecextNs, {"UsernameToken"});
  const ElementNode& token = GetOnlyChild(element, kSecextNs, "UsernameToken");
  RequireChildren(token, kSecextNs, {"Username"});
  request.delegateTo = GetTextOf(GetOnlyChild(token, kSecextNs, "Username"));
}

void ReadParticipants(const ElementNode& element, TokenRequest& request) {
  for (const ElementNode* const participant : GetChildElements(element)) {
    if (!Is(*participant, kTrustNs, "Participant")) {
      throw Fault(FaultCode::CLIENT, "Participants holds an unknown " + participant->GetLocalName());
    }
    RequireChildren(*participant, kAddressingNs, {"EndpointReference"});
    const ElementNode& reference = GetOnlyChild(*participant, kAddressingNs, "EndpointReference");
    RequireChildren(reference, kAddressingNs, {"Address"});
    request.audience.push_back(GetTextOf(GetOnlyChild(reference, kAddressingNs, "Address")));
  }
}

void RequireAdviceElement(const ElementNode& element, const char* name) {
  if (!Is(element, kAdviceNs, name)) {
    throw Fault(FaultCode::CLIENT, "AdviceSet holds an unknown " + element.GetLocalName());
  }
}

AdviceItem ReadAdviceItem(const ElementNode& element) {
  RequireAdviceElement(element, "Attribute");
  AdviceItem item;
  item.name = GetRequiredAttribute(element, "Name");
  for (const ElementNode* const value : GetChildElements(element)) {
    RequireAdviceElement(*value, "AttributeValue");
    item.values.push_back(GetTextOf(*value));
  }
  return item;
}

void ReadAdviceSet(const ElementNode& element, TokenRequest& request) {
  for (const ElementNode* const advice : GetChildElements(element)) {
    RequireAdviceElement(*advice, "Advice");
    AdviceBlock block;
    block.source = GetRequiredAttribute(*advice, "AdviceSource");
    for (const ElementNode* const item : GetChildElements(*advice)) {
      block.items.push_back(ReadAdviceItem(*item));
    }
    request.advice.push_back(block);
  }
}

void ReadTarget(const ElementNode& element, TokenRequest& request) {
  RequireChildren(element, kSamlNs, {"Assertion"});
  request.target = &GetOnlyChild(element, kSamlNs, "Assertion");
}

void ReadBinaryExchange(const ElementNode& element, TokenRequest& request) {
  if (GetRequiredAttribute(element, "ValueType") != kSpnegoValueType ||
      GetRequiredAttribute(element, "EncodingType") != kBase64Binary) {
    throw Fault(FaultCode::REQUEST_FAILED, "The BinaryExchange is not SPNEGO in base64");
  }
  request.binaryExchange = GetTextOf(element);
}

/// True for an element that may stand in an issue request beside those of every request.
bool ReadIssueField(const ElementNode& element, const std::string& name, TokenRequest& request) {
  if (name == "KeyType") {
    ReadKeyType(element, request);
  } else if (name == "Renewing") {
    ReadRenewing(element, request);
  } else if (name == "Delegatable") {
    request.delegable = ReadBoolean(element, GetTextOf(element));
  } else if (name == "DelegateTo") {
    ReadDelegateTo(element, request);
  } else if (name == "Participants") {
    ReadParticipants(element, request);
  } else if (name == "UseKey") {
    RequireChildren(element, kTrustNs, {});
    request.useKey = GetRequiredAttribute(element, "Sig");
  } else if (name == "BinaryExchange") {
    ReadBinaryExchange(element, request);
  } else {
    return false;
  }
  return true;
}

bool ReadTrustField(const ElementNode& element, const std::string& name, TokenRequest& request) {
  if (name == "TokenType" || name == "RequestType") {
    return true;  // Judged by RequireTypes, when the whole request is known to be there.
  }
  if (name == "Lifetime" && request.operation != Operation::VALIDATE) {
    ReadLifetime(element, request);
    return true;
  }
  if (name == "RenewTarget" && request.operation == Operation::RENEW) {
    ReadTarget(element, request);
    return true;
  }
  if (name == "ValidateTarget" && request.operation == Operation::VALIDATE) {
    ReadTarget(element, request);
    return true;
  }
  return request.operation == Operation::ISSUE && ReadIssueField(element, name, request);
}

bool ReadField(const ElementNode& element, TokenRequest& request) {
  if (request.operation == Operation::ISSUE && Is(element, kAdviceNs, "AdviceSet")) {
    ReadAdviceSet(element, request);
    return true;
  }
  return Is(element, kTrustNs, element.GetLocalName().c_str()) &&
         ReadTrustField(element, element.GetLocalName(), request);
}

void RequireTypes(const ElementNode& request, Operation operation) {
  static const char* const kRequestTypes[] = {"/Issue", "/Renew", "/Validate"};
  const bool validates = operation == Operation::VALIDATE;
  RequireText(GetOnlyChild(request, kTrustNs, "TokenType"),
              validates ? TrustUri("/RSTR/Status") : std::string(kSamlNs));
  RequireText(GetOnlyChild(request, kTrustNs, "RequestType"),
              TrustUri(kRequestTypes[static_cast<int>(operation)]));
}

void RequireNeededFields(const ElementNode& element, const TokenRequest& request) {
  if (request.operation == Operation::ISSUE) {
    GetOnlyChild(element, kTrustNs, "KeyType");
  } else if (request.target == nullptr) {
    throw Fault(FaultCode::CLIENT, "The request names no token to work on");
  }
}

/// The second and later messages of a negotiation travel as responses (WS-Trust 1.3, section 8).
TokenRequest ReadChallengeResponse(const ElementNode& element) {
  if (!Is(element, kTrustNs, "RequestSecurityTokenResponse")) {
    throw Fault(FaultCode::CLIENT, "The body must hold a RequestSecurityTokenResponse");
  }
  RequireChildren(element, kTrustNs, {"BinaryExchange"});
  TokenRequest request;
  request.operation = Operation::CHALLENGE;
  request.context = GetRequiredAttribute(element, "Context");
  ReadBinaryExchange(GetOnlyChild(element, kTrustNs, "BinaryExchange"), request);
  return request;
}

}  // namespace

Operation ReadAction(const std::string& soapAction) {
  const auto isAction = [&](const char* path) {
    return soapAction == "\"" + TrustUri(path) + "\"";
  };
  if (isAction("/RST/Issue")) {
    return Operation::ISSUE;
  }
  if (isAction("/RST/Renew")) {
    return Operation::RENEW;
  }
  if (isAction("/RST/Validate")) {
    return Operation::VALIDATE;
  }
  if (isAction("/RSTR/Issue")) {
    return Operation::CHALLENGE;
  }
  throw Fault(FaultCode::CLIENT, "The SOAPAction is missing or unknown");
}

TokenRequest ReadTokenRequest(const ElementNode& element, Operation operation) {
  if (operation == Operation::CHALLENGE) {
    return ReadChallengeResponse(element);
  }
  if (!Is(element, kTrustNs, "RequestSecurityToken")) {
    throw Fault(FaultCode::CLIENT, "The body must hold a RequestSecurityToken");
  }
  RequireTypes(element, operation);
  TokenRequest request;
  request.operation = operation;
  element.GetAttribute("Context", request.context);
  std::set<std::string> seen;
  for (const ElementNode* const field : GetChildElements(element)) {
    if (!seen.insert(field->GetLocalName()).second || !ReadField(*field, request)) {
      throw Fault(FaultCode::CLIENT, "The request holds an unknown or repeated " + field->GetLocalName());
    }
  }
  RequireNeededFields(element, request);
  return request;
}

}  // namespace DevSts
