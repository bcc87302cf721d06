// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Descriptions of the SOAP 1.1 envelope with its WS-Security header, and the signing of a message.
//
// A signature covers the Body and the Timestamp, nothing else, and is the last child of wsse:Security. Its
// key is told by a reference: to the certificate in the header, or to a SAML token there.

#ifndef QUORLIN_XMLSOAPBUILDERS_H
#define QUORLIN_XMLSOAPBUILDERS_H

#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>
#include <pelmar/xml/security/Signature.h>

#include <string>

#include "quorlin/xmlCommonBuilders.h"

namespace Quorlin {

/// The wsu:Id of the certificate in the header, which the signature refers to.
constexpr const char* kCertificateId = "holderOfKeyCertificate";

/// An envelope that is signed when it is built. Building throws what the platform's signature throws.
class XMLSignedSoapBuilder final : public XMLBaseBuilder {
 public:
  /// The key is borrowed and must outlive the builder. Without `keyInfoBuilder` (null) the signature has no
  /// ds:KeyInfo. A null header is a programming error and aborts the process.
  XMLSignedSoapBuilder(XMLBuilderPtr headerBuilder, XMLBuilderPtr bodyBuilder,
                       const Pelmar::Crypto::PrivateKey* privateKey, XMLBuilderPtr keyInfoBuilder);
  void build(Pelmar::Ref<Pelmar::Xml::ElementNode>& result) const override;

 private:
  XMLBuilderPtr _headerBuilder;
  XMLBuilderPtr _bodyBuilder;
  const Pelmar::Crypto::PrivateKey* _privateKey;
  XMLBuilderPtr _keyInfoBuilder;
};

// --- Envelopes ---

/// The unsigned envelope.
XMLBuilderPtr SoapBuilder(const XMLBuilderPtr& headerBuilder, const XMLBuilderPtr& bodyBuilder);
/// An envelope that carries the certificate as the last element of the given header, and a signature that
/// refers to it.
XMLBuilderPtr CertRefSignedSoapBuilder(const XMLBuilderPtr& headerBuilder, const XMLBuilderPtr& bodyBuilder,
                                       const Pelmar::Crypto::PrivateKey* privateKey,
                                       const Pelmar::Crypto::Certificate* certificate);
/// An envelope whose signature refers to the SAML token that the given header holds already.
XMLBuilderPtr SamlRefSignedSoapBuilder(const XMLBuilderPtr& headerBuilder, const XMLBuilderPtr& bodyBuilder,
                                       const Pelmar::Crypto::PrivateKey* privateKey,
                                       const std::string& assertionId);

// --- Header ---

/// wsse:Security with a timestamp that is valid for so many minutes (exact up to 35, see AddMinutesToDate).
XMLBuilderPtr WsSecurityHeaderBuilder(int validityMinutes);
XMLBuilderPtr WssuTimestampBuilder(int validityMinutes);
XMLBuilderPtr WsseX509v3BinarySecTokenBuilder(const std::string& id,
                                              const Pelmar::Crypto::Certificate* certificate);
/// wsse:SecurityTokenReference to the certificate with that wsu:Id.
XMLBuilderPtr WsseX509v3BSTReferenceBuilder(const std::string& id);
/// wsse:SecurityTokenReference to the header's SAML token. The key identifier is empty on the wire: token
/// services in the field take the one token that the header holds, so the ID is not written.
XMLBuilderPtr WsseSamlKeyIdReferenceBuilder(const std::string& assertionId);

// --- Signing ---

/// Signs a built envelope in place. One without Body, Header or wsse:Security is a programming error and
/// aborts the process; one without Timestamp is signed over its Body alone.
void SignSoapMessage(const Pelmar::Crypto::PrivateKey* privateKey, const XMLBuilderPtr& keyInfoBuilder,
                     Pelmar::Xml::ElementNode* envelope);
/// Adds one reference, to the element by its wsu:Id. Null adds nothing.
void AddElementToSignature(Pelmar::Xml::Security::Signature* signature, Pelmar::Xml::ElementNode* element);
/// The element's wsu:Id; one that has none gets a fresh one, formed of its name and a UUID.
std::string CreateWssuId(Pelmar::Xml::ElementNode* element);

}  // namespace Quorlin

#endif  // QUORLIN_XMLSOAPBUILDERS_H
