// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Grant.h"

#include "devsts/Clock.h"
#include "devsts/Fault.h"

#include <algorithm>

namespace DevSts {

namespace {

/// Readers of tokens take blank text for no text.
void RequireNotBlank(const std::string& text, const char* what) {
  if (text.find_first_not_of("\t\n\r ") == std::string::npos) {
    throw Fault(FaultCode::REQUEST_FAILED, std::string(what) + " must not be blank");
  }
}

void RequireUsableAdvice(const AdviceBlock& block) {
  if (block.items.empty()) {
    throw Fault(FaultCode::REQUEST_FAILED, "An advice must hold an attribute");
  }
  for (const AdviceItem& item : block.items) {
    for (const std::string& value : item.values) {
      RequireNotBlank(value, "The value of an advice");
    }
  }
}

void RequireUsableTexts(const TokenRequest& request) {
  for (const std::string& address : request.audience) {
    RequireNotBlank(address, "The address of a participant");
  }
  for (const AdviceBlock& block : request.advice) {
    RequireUsableAdvice(block);
  }
}

void GrantUser(const User& user, AssertionContent& content) {
  content.upn = user.GetUpn();
  content.givenName = user.givenName;
  content.surname = user.surname;
  content.groups = user.groups;
  content.solution = user.solution;
}

void GrantLifetime(const TokenRequest& request, const LifetimeLimits& limits, long long now,
                   AssertionContent& content) {
  const long long wanted =
      request.lifetime != 0 ? request.lifetime : limits.defaultSec * kMicrosecondsPerSecond;
  content.issued = now;
  content.notBefore = now;
  content.notOnOrAfter = now + std::min(wanted, limits.maxSec * kMicrosecondsPerSecond);
}

/// A token that was for some services only is not exchanged for one that others accept.
void GrantAudience(const Caller& caller, const TokenRequest& request, AssertionContent& content) {
  content.audience = request.audience.empty() ? caller.audience : request.audience;
  for (const std::string& address : content.audience) {
    const auto end = caller.audience.end();
    if (!caller.audience.empty() && std::find(caller.audience.begin(), end, address) == end) {
      throw Fault(FaultCode::REQUEST_FAILED, "The audience is wider than that of the presented token");
    }
  }
}

/// Identities may be handed on a limited number of times; the new token has one less to give.
void GrantDelegation(const Caller& caller, const TokenRequest& request, const Directory& directory,
                     long long now, AssertionContent& content) {
  content.delegates = caller.delegates;
  content.proxyCount = request.delegable ? caller.proxyCount : 0;
  if (!request.delegateTo) {
    return;
  }
  const User* const delegate = directory.FindByName(*request.delegateTo);
  if (delegate == nullptr) {
    throw Fault(FaultCode::REQUEST_FAILED, "The principal to delegate to is not known");
  }
  if (caller.proxyCount == 0) {
    throw Fault(FaultCode::REQUEST_FAILED, "The identity may not be delegated any further");
  }
  content.delegates.push_back({delegate->GetUpn(), now});
  content.proxyCount = request.delegable ? caller.proxyCount - 1 : 0;
}

/// A token for a delegate is a bearer token: the key at hand is not the delegate's (and a client that
/// delegates sends no proof of it).
void GrantConfirmation(const Caller& caller, const TokenRequest& request, AssertionContent& content) {
  if (!request.holderOfKey || request.delegateTo) {
    return;
  }
  if (!caller.proofCertificate) {
    throw Fault(FaultCode::REQUEST_FAILED, "A token can only be bound to a key that signed the request");
  }
  if (request.useKey != caller.proofSignatureId) {
    throw Fault(FaultCode::REQUEST_FAILED, "UseKey does not name the message's signature");
  }
  content.confirmationCertificate = caller.proofCertificate;
}

}  // namespace

AssertionContent Grant(const Caller& caller, const TokenRequest& request, const LifetimeLimits& limits,
                       const Directory& directory, long long now) {
  RequireUsableTexts(request);
  AssertionContent content;
  GrantUser(*caller.user, content);
  GrantLifetime(request, limits, now, content);
  if (caller.notOnOrAfter != 0) {
    content.notOnOrAfter = std::min(content.notOnOrAfter, caller.notOnOrAfter);
  }
  GrantAudience(caller, request, content);
  GrantDelegation(caller, request, directory, now, content);
  GrantConfirmation(caller, request, content);
  content.authenticated = caller.authenticated;
  content.authnContext = caller.authnContext;
  content.renewCount = request.renewable ? caller.renewCount : 0;
  content.advice = request.advice;
  return content;
}

AssertionContent GrantRenewal(AssertionContent content, const User& user, const TokenRequest& request,
                              const LifetimeLimits& limits, long long now) {
  if (content.renewCount == 0) {
    throw Fault(FaultCode::REQUEST_FAILED, "The token may not be renewed");
  }
  content.renewCount -= 1;
  content.groups.clear();
  GrantUser(user, content);
  GrantLifetime(request, limits, now, content);
  return content;
}

}  // namespace DevSts
