// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/MessageSignature.h"

#include "devsts/Fault.h"
#include "devsts/Uris.h"
#include "devsts/XmlReading.h"

#include <pelmar/StringUtil.h>
#include <pelmar/xml/QName.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>
#include <pelmar/xml/security/KeyInfoResolver.h>
#include <pelmar/xml/security/Signature.h>

#include <set>
#include <vector>

namespace DevSts {

using Pelmar::Ref;
using Pelmar::Xml::ElementNode;
namespace Security = Pelmar::Xml::Security;

namespace {

/// The certificate is known before the signature is looked at; what the signature says about its key is
/// checked elsewhere.
class KnownKeyResolver final : public Security::KeyInfoResolver {
 public:
  explicit KnownKeyResolver(const Ref<const Pelmar::Crypto::Certificate>& certificate)
      : _certificate(certificate) {}

  Ref<const Pelmar::Crypto::Certificate> ResolveSigner(const ElementNode*) const override {
    return _certificate;
  }

 private:
  Ref<const Pelmar::Crypto::Certificate> _certificate;
};

[[noreturn]] void Refuse(const std::string& what) {
  throw Fault(FaultCode::FAILED_AUTHENTICATION, "The message's signature " + what);
}

std::string GetReferenceTo(const ElementNode& element) {
  std::string id;
  if (!element.GetAttribute(Pelmar::Xml::QName(kUtilityNs, "Id"), id) || id.empty()) {
    Refuse("does not cover " + element.GetLocalName());
  }
  return "#" + id;
}

void RequireReference(const Security::SignatureReference& reference) {
  const bool isPlain = reference.GetDigestMethod() == Security::kSha256 &&
                       reference.GetTransforms().size() == 1 &&
                       reference.GetTransforms().front() == Security::kExclusiveC14n;
  if (!isPlain) {
    Refuse("has a reference with unexpected algorithms");
  }
}

void RequireCoverage(const Security::Signature& signature, const SoapMessage& message,
                     const SecurityHeader& header) {
  std::set<std::string> missing = {GetReferenceTo(*message.body), GetReferenceTo(*header.timestamp)};
  for (const Ref<Security::SignatureReference>& reference : signature.GetReferences()) {
    RequireReference(*reference);
    if (missing.erase(reference->GetUri()) != 1) {
      Refuse("covers something else than Body and Timestamp");
    }
  }
  if (!missing.empty()) {
    Refuse("does not cover Body and Timestamp");
  }
}

void RequireSignatureMethod(const ElementNode& signature) {
  const ElementNode& signedInfo = GetOnlyChild(signature, kDigitalSignatureNs, "SignedInfo");
  const auto getAlgorithm = [&](const char* name) {
    return GetRequiredAttribute(GetOnlyChild(signedInfo, kDigitalSignatureNs, name), "Algorithm");
  };
  if (getAlgorithm("CanonicalizationMethod") != Security::kExclusiveC14n ||
      getAlgorithm("SignatureMethod") != Security::kRsaSha256) {
    Refuse("uses unexpected algorithms");
  }
}

const ElementNode& GetTokenReference(const SecurityHeader& header) {
  const ElementNode& keyInfo = GetOnlyChild(*header.signature, kDigitalSignatureNs, "KeyInfo");
  RequireChildren(keyInfo, kSecextNs, {"SecurityTokenReference"});
  return GetOnlyChild(keyInfo, kSecextNs, "SecurityTokenReference");
}

}  // namespace

bool ReplayGuard::IsFirst(const std::string& signatureValue, long long expires, long long now) {
  const std::lock_guard<std::mutex> lock(_mutex);
  while (!_byExpiry.empty() && _byExpiry.begin()->first <= now) {
    _seen.erase(_byExpiry.begin()->second);
    _byExpiry.erase(_byExpiry.begin());
  }
  if (!_seen.insert(signatureValue).second) {
    return false;
  }
  _byExpiry.emplace(expires, signatureValue);
  return true;
}

void VerifyMessageSignature(const SoapMessage& message, const SecurityHeader& header,
                            const Ref<const Pelmar::Crypto::Certificate>& certificate) {
  try {
    RequireSignatureMethod(*header.signature);
    Ref<Security::Signature> signature;
    Security::CreateSignatureFromDom(message.envelope, header.signature, signature);
    RequireCoverage(*signature, message, header);
    const Ref<KnownKeyResolver> resolver = Pelmar::MakeRef<KnownKeyResolver>(certificate);
    if (!signature->Verify(resolver.Get())) {
      Refuse("does not match the message");
    }
  } catch (const Security::XmlSecurityException& e) {
    Refuse(std::string("cannot be verified: ") + e.what());
  }
}

std::string GetSignatureValue(const SecurityHeader& header) {
  const std::vector<unsigned char> bytes = Pelmar::StringUtil::Base64Decode(
      GetTextOf(GetOnlyChild(*header.signature, kDigitalSignatureNs, "SignatureValue")));
  return std::string(bytes.begin(), bytes.end());
}

void RequireCertificateReference(const SecurityHeader& header) {
  const ElementNode& tokenReference = GetTokenReference(header);
  RequireChildren(tokenReference, kSecextNs, {"Reference"});
  const ElementNode& reference = GetOnlyChild(tokenReference, kSecextNs, "Reference");
  if (header.certificateId.empty() || GetRequiredAttribute(reference, "URI") != "#" + header.certificateId ||
      GetRequiredAttribute(reference, "ValueType") != kX509v3) {
    Refuse("does not refer to the message's certificate");
  }
}

void RequireAssertionReference(const SecurityHeader& header) {
  const ElementNode& tokenReference = GetTokenReference(header);
  RequireChildren(tokenReference, kSecextNs, {"KeyIdentifier"});
  std::string tokenType;
  tokenReference.GetAttribute(Pelmar::Xml::QName(kSecext11Ns, "TokenType"), tokenType);
  const ElementNode& identifier = GetOnlyChild(tokenReference, kSecextNs, "KeyIdentifier");
  if (tokenType != kSamlTokenProfileType || GetRequiredAttribute(identifier, "ValueType") != kSamlIdType) {
    Refuse("does not refer to the message's assertion");
  }
}

}  // namespace DevSts
