// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Decides which certificate's key a signature may be checked with.

#ifndef PELMAR_XML_SECURITY_KEYINFORESOLVER_H
#define PELMAR_XML_SECURITY_KEYINFORESOLVER_H

#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/xml/Node.h>

#include <list>

namespace Pelmar {
namespace Xml {
namespace Security {

/// Finds the signer's certificate and judges whether it is trusted. Immutable; may be shared between threads.
class PELMAR_API KeyInfoResolver : public Object {
 public:
  /// The certificate whose key made the signature that carries `keyInfo` (a ds:KeyInfo element; null when the
  /// signature has none). Never null. Throws XmlSecurityException, saying why, when there is no certificate
  /// or it is not trusted.
  virtual Ref<const Crypto::Certificate> ResolveSigner(const ElementNode* keyInfo) const = 0;

 protected:
  ~KeyInfoResolver() override;
};

/// A resolver that takes its certificates from ds:X509Data alone and accepts the signer's only if it chains,
/// now, to one of `trustedCertificates` (RFC 5280, section 6): issuer signatures, validity periods, CA flags
/// and key usage are checked; a trusted certificate ends a chain whether or not it is self-signed, so a
/// trusted signer's certificate is its own anchor. Keys, key names and retrieval methods in KeyInfo are never
/// used. Null entries of the list are skipped; an empty list trusts nothing.
PELMAR_API Ref<KeyInfoResolver> CreateTrustChainKeyResolver(
    const std::list<Ref<const Crypto::Certificate>>& trustedCertificates);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SECURITY_KEYINFORESOLVER_H
