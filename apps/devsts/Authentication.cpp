// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Authentication.h"

#include "devsts/Clock.h"
#include "devsts/Fault.h"
#include "devsts/PresentedToken.h"

#include <pelmar/crypto/Digest.h>

namespace DevSts {

namespace {

/// How often an identity may be handed on that did not come here by delegation.
constexpr unsigned kMaxProxyCount = 10;

/// How often a renewable token may be renewed.
constexpr unsigned kMaxRenewCount = 10;

/// Longer than any message is taken as fresh.
constexpr long long kReplayMemory = 2 * 60 * 60 * kMicrosecondsPerSecond;

void RequireFirst(const SecurityHeader& header, const AuthenticationContext& context) {
  if (!context.replays.IsFirst(GetSignatureValue(header), context.now + kReplayMemory, context.now)) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The message was sent before");
  }
  context.record.AddPassed("signature");
}

Caller AuthenticateByPassword(const UsernameToken& token, const AuthenticationContext& context) {
  const User* const known = context.directory.FindByName(token.userName);
  if (known != nullptr) {
    context.record.SetUser(known->GetUpn());
  }
  const User* const user = context.directory.Authenticate(token.userName, token.password.Reveal());
  if (user == nullptr) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "Invalid user name or password");
  }
  context.record.AddPassed("password");
  return MakeCaller(*user, kPasswordContext, context);
}

Caller AuthenticateByCertificate(const Pelmar::Crypto::Certificate& certificate,
                                 const AuthenticationContext& context) {
  const long long notBefore = certificate.GetNotBefore().GetUtcTime();
  const long long notAfter = certificate.GetNotAfter().GetUtcTime();
  if (context.now < notBefore || context.now > notAfter) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The certificate is not valid now");
  }
  const User* const user =
      context.directory.FindByCertificate(Pelmar::Crypto::ToHex(certificate.GetSha256()));
  if (user == nullptr) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The certificate belongs to no known user");
  }
  context.record.AddPassed("certificate");
  return MakeCaller(*user, kCertificateContext, context);
}

AssertionContent ReadHeaderToken(const SecurityHeader& header, const AuthenticationContext& context) {
  try {
    return ReadPresentedToken(*header.assertion, context.tokenSigner, context.now);
  } catch (const TokenException& e) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, e.what());
  }
}

/// The token alone says nothing about who sends it if it is bound to a key.
void RequireProofOfTokenKey(const SoapMessage& message, const SecurityHeader& header,
                            const AssertionContent& content, const AuthenticationContext& context) {
  if (header.signature == nullptr) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION,
                "The message must be signed with the key that the token is bound to");
  }
  RequireAssertionReference(header);
  VerifyMessageSignature(message, header, content.confirmationCertificate);
  RequireFirst(header, context);
}

/// The new token can do no more than the one that it is exchanged for.
Caller AuthenticateByToken(const SoapMessage& message, const SecurityHeader& header,
                           const AuthenticationContext& context) {
  if (header.usernameToken || header.certificate) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, "The security header holds several credentials");
  }
  const AssertionContent content = ReadHeaderToken(header, context);
  const User* const user = context.directory.FindByName(content.upn);
  if (user == nullptr) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The token's subject is not known");
  }
  if (content.confirmationCertificate) {
    RequireProofOfTokenKey(message, header, content, context);
  }
  context.record.AddPassed("token");
  Caller caller = MakeCaller(*user, "", context);
  caller.authnContext = content.authnContext;
  caller.authenticated = content.authenticated;
  caller.proofCertificate = content.confirmationCertificate;
  caller.delegates = content.delegates;
  caller.proxyCount = content.proxyCount;
  caller.renewCount = content.renewCount;
  caller.audience = content.audience;
  caller.notOnOrAfter = content.notOnOrAfter;
  return caller;
}

}  // namespace

Caller MakeCaller(const User& user, const std::string& authnContext, const AuthenticationContext& context) {
  context.record.SetUser(user.GetUpn());
  Caller caller;
  caller.user = &user;
  caller.authnContext = authnContext;
  caller.authenticated = context.now;
  caller.proxyCount = kMaxProxyCount;
  caller.renewCount = kMaxRenewCount;
  return caller;
}

void RequireProofOfKey(const SoapMessage& message, const SecurityHeader& header,
                       const AuthenticationContext& context) {
  if (header.signature == nullptr || !header.certificate) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN,
                "The message must carry a certificate and be signed with its key");
  }
  RequireCertificateReference(header);
  VerifyMessageSignature(message, header, header.certificate);
  RequireFirst(header, context);
}

Caller Authenticate(const SoapMessage& message, const SecurityHeader& header,
                    const AuthenticationContext& context) {
  if (header.assertion != nullptr) {
    return AuthenticateByToken(message, header, context);
  }
  const bool isSigned = header.signature != nullptr || header.certificate;
  if (!isSigned && !header.usernameToken) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, "The security header holds no credentials");
  }
  if (isSigned) {
    RequireProofOfKey(message, header, context);
  }
  Caller caller = header.usernameToken ? AuthenticateByPassword(*header.usernameToken, context)
                                       : AuthenticateByCertificate(*header.certificate, context);
  if (isSigned) {
    caller.proofCertificate = header.certificate;
    header.signature->GetAttribute("Id", caller.proofSignatureId);
  }
  return caller;
}

}  // namespace DevSts
