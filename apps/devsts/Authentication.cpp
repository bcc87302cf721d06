// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Authentication.h"

#include "devsts/Clock.h"
#include "devsts/Fault.h"

#include <pelmar/crypto/Digest.h>

namespace DevSts {

namespace {

/// How often an identity may be handed on that did not come here by delegation.
constexpr unsigned kMaxProxyCount = 10;

/// Longer than any message is taken as fresh.
constexpr long long kReplayMemory = 2 * 60 * 60 * kMicrosecondsPerSecond;

Caller MakeCaller(const User& user, const char* authnContext, long long now, RequestRecord& record) {
  record.SetUser(user.GetUpn());
  Caller caller;
  caller.user = &user;
  caller.authnContext = authnContext;
  caller.authenticated = now;
  caller.proxyCount = kMaxProxyCount;
  return caller;
}

Caller AuthenticateByPassword(const Directory& directory, const UsernameToken& token, long long now,
                              RequestRecord& record) {
  const User* const known = directory.FindByName(token.userName);
  if (known != nullptr) {
    record.SetUser(known->GetUpn());
  }
  const User* const user = directory.Authenticate(token.userName, token.password.Reveal());
  if (user == nullptr) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "Invalid user name or password");
  }
  record.AddPassed("password");
  return MakeCaller(*user, kPasswordContext, now, record);
}

Caller AuthenticateByCertificate(const Directory& directory,
                                 const Pelmar::Ref<const Pelmar::Crypto::Certificate>& certificate,
                                 long long now, RequestRecord& record) {
  const long long notBefore = certificate->GetNotBefore().GetUtcTime();
  const long long notAfter = certificate->GetNotAfter().GetUtcTime();
  if (now < notBefore || now > notAfter) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The certificate is not valid now");
  }
  const User* const user = directory.FindByCertificate(Pelmar::Crypto::ToHex(certificate->GetSha256()));
  if (user == nullptr) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The certificate belongs to no known user");
  }
  record.AddPassed("certificate");
  return MakeCaller(*user, kCertificateContext, now, record);
}

/// Proves that the sender holds the key of the certificate in the message; not who the sender is.
void RequireProofOfKey(const SoapMessage& message, const SecurityHeader& header, ReplayGuard& replays,
                       long long now, RequestRecord& record) {
  if (header.signature == nullptr || !header.certificate) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN,
                "The message must carry a certificate and be signed with its key");
  }
  RequireCertificateReference(header);
  VerifyMessageSignature(message, header, header.certificate);
  if (!replays.IsFirst(GetSignatureValue(header), now + kReplayMemory, now)) {
    throw Fault(FaultCode::FAILED_AUTHENTICATION, "The message was sent before");
  }
  record.AddPassed("signature");
}

}  // namespace

Caller Authenticate(const SoapMessage& message, const SecurityHeader& header, const Directory& directory,
                    ReplayGuard& replays, long long now, RequestRecord& record) {
  const bool isSigned = header.signature != nullptr || header.certificate;
  if (!isSigned && !header.usernameToken) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, "The security header holds no credentials");
  }
  if (isSigned) {
    RequireProofOfKey(message, header, replays, now, record);
  }
  Caller caller = header.usernameToken
                      ? AuthenticateByPassword(directory, *header.usernameToken, now, record)
                      : AuthenticateByCertificate(directory, header.certificate, now, record);
  if (isSigned) {
    caller.proofCertificate = header.certificate;
    header.signature->GetAttribute("Id", caller.proofSignatureId);
  }
  return caller;
}

}  // namespace DevSts
