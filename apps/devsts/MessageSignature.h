// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Proof of possession: a request signed by its sender (WS-Security 1.0, section 8).

#ifndef QUORLIN_DEVSTS_MESSAGESIGNATURE_H
#define QUORLIN_DEVSTS_MESSAGESIGNATURE_H

#include "devsts/SecurityHeader.h"
#include "devsts/SoapMessage.h"

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>

#include <map>
#include <mutex>
#include <set>
#include <string>

namespace DevSts {

/// Remembers the signatures it has seen until their messages have expired. Safe to use from any thread.
class ReplayGuard final {
 public:
  /// False when `signatureValue` was seen before. `expires` is when the message may be forgotten, because its
  /// age alone then gives it away; both in microseconds.
  bool IsFirst(const std::string& signatureValue, long long expires, long long now);

 private:
  std::mutex _mutex;
  std::set<std::string> _seen;
  std::multimap<long long, std::string> _byExpiry;
};

/// Checks that the header's signature was made by the key of `certificate`, that it covers exactly the
/// message's Body and Timestamp, with exclusive canonicalisation, rsa-sha256 and sha256. Throws Fault.
void VerifyMessageSignature(const SoapMessage& message, const SecurityHeader& header,
                            const Pelmar::Ref<const Pelmar::Crypto::Certificate>& certificate);

/// The bytes of the signature's ds:SignatureValue, which no two messages share. Bytes, not text: white space
/// in it is not signed.
std::string GetSignatureValue(const SecurityHeader& header);

/// Checks that the signature's key info names the header's BinarySecurityToken (X.509 Token Profile 1.0,
/// section 3.2.1). Throws Fault.
void RequireCertificateReference(const SecurityHeader& header);

/// Checks that the signature's key info names the header's assertion (SAML Token Profile 1.1, section 3.4;
/// clients leave the identifier itself empty, as only one assertion can be meant). Throws Fault.
void RequireAssertionReference(const SecurityHeader& header);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_MESSAGESIGNATURE_H
