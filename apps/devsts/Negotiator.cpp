// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Negotiator.h"

#include "devsts/Fault.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>

#include <stdexcept>
#include <utility>

namespace DevSts {

namespace {

NegotiationLeg Decode(const std::string& text) {
  try {
    return Pelmar::StringUtil::Base64Decode(text);
  } catch (const Pelmar::Base64FormatException&) {
    throw Fault(FaultCode::CLIENT, "The BinaryExchange is not base64");
  }
}

NegotiationLeg DecodeLeg(const std::string& text) {
  NegotiationLeg leg = Decode(text);
  if (leg.size() > kMaxLegBytes) {
    throw Fault(FaultCode::REQUEST_FAILED, "The BinaryExchange is too long");
  }
  return leg;
}

/// Two proofs of identity could contradict each other.
void RequireNoIdentity(const SecurityHeader& header) {
  if (header.usernameToken || header.assertion != nullptr) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, "A negotiation takes no other credentials");
  }
}

/// Only the first message may be signed: it is the one that says which token to bind to the key.
void RequireNoCredentials(const SecurityHeader& header) {
  RequireNoIdentity(header);
  if (header.certificate || header.signature != nullptr) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, "A negotiation that goes on takes no credentials");
  }
}

void RequireSupport(const std::shared_ptr<const NegotiationMechanism>& mechanism) {
  if (mechanism == nullptr) {
    throw Fault(FaultCode::REQUEST_FAILED, "Negotiation is not supported");
  }
}

/// Whether `cookie` is one of those in a Cookie header: pairs with "; " between them (RFC 6265,
/// section 4.2.1).
bool Holds(const std::string& cookies, const std::string& cookie) {
  return ("; " + cookies + ";").find("; " + cookie + ";") != std::string::npos;
}

void RequireCookie(const RunningNegotiation& running, const std::string& cookies,
                   const AuthenticationContext& context) {
  if (running.cookie.empty()) {
    return;
  }
  if (!Holds(cookies, running.cookie)) {
    throw Fault(FaultCode::REQUEST_FAILED, "The negotiation's cookie did not come back");
  }
  context.record.AddPassed("cookie");
}

Caller MakeNegotiatedCaller(const std::string& principal, const std::string& authnContext,
                            const RunningNegotiation& running, const AuthenticationContext& context) {
  const User* const user = context.directory.FindByName(principal);
  if (user == nullptr) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The principal is not known");
  }
  context.record.AddPassed("negotiation");
  Caller caller = MakeCaller(*user, authnContext, context);
  caller.proofCertificate = running.proofCertificate;
  caller.proofSignatureId = running.proofSignatureId;
  return caller;
}

}  // namespace

NegotiationRound Negotiator::Start(const SoapMessage& message, const SecurityHeader& header,
                                   const TokenRequest& request, const AuthenticationContext& context) {
  RequireSupport(_mechanism);
  RequireNoIdentity(header);
  RunningNegotiation running;
  if (header.certificate || header.signature != nullptr) {
    RequireProofOfKey(message, header, context);
    running.proofCertificate = header.certificate;
    header.signature->GetAttribute("Id", running.proofSignatureId);
  }
  running.wishes = request;
  running.started = context.now;
  running.negotiation = _mechanism->Begin();
  running.cookie = _withCookie ? "negotiation=" + Pelmar::StringUtil::GenerateUuid() : "";
  const std::string cookie = running.cookie;
  // 122 random bits: nobody guesses the name of somebody else's negotiation.
  const std::string id = "urn:uuid:" + Pelmar::StringUtil::GenerateUuid();
  NegotiationRound round = Advance(id, std::move(running), request, context);
  round.cookie = cookie;
  return round;
}

NegotiationRound Negotiator::Continue(const SecurityHeader& header, const TokenRequest& request,
                                      const std::string& cookies, const AuthenticationContext& context) {
  RequireSupport(_mechanism);
  RequireNoCredentials(header);
  RunningNegotiation running = _table.Take(request.context, context.now);
  RequireCookie(running, cookies, context);
  return Advance(request.context, std::move(running), request, context);
}

NegotiationRound Negotiator::Advance(const std::string& id, RunningNegotiation running,
                                     const TokenRequest& request, const AuthenticationContext& context) {
  NegotiationStep step = running.negotiation->Accept(DecodeLeg(*request.binaryExchange));
  NegotiationRound round;
  round.context = id;
  round.leg = std::move(step.leg);
  if (step.principal) {
    round.caller = MakeNegotiatedCaller(*step.principal, _mechanism->GetAuthnContext(), running, context);
    round.wishes = std::move(running.wishes);
    return round;
  }
  if (round.leg.empty()) {
    throw std::logic_error("the negotiation mechanism has nothing to say and names nobody");
  }
  _table.Put(id, std::move(running), context.now);
  return round;
}

}  // namespace DevSts
