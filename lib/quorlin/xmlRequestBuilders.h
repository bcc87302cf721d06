// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Descriptions of the WS-Trust 1.3 request bodies and of the fragments they are made of. Names follow the
// standard's prefix and the element. The prefix "wst" is also declared on the SOAP Body, so some bodies do
// not declare it themselves.

#ifndef QUORLIN_XMLREQUESTBUILDERS_H
#define QUORLIN_XMLREQUESTBUILDERS_H

#include <quorlin/SamlToken.h>
#include <quorlin/TokenSpec.h>

#include <set>
#include <string>
#include <vector>

#include "quorlin/xmlCommonBuilders.h"

namespace Quorlin {

/// The Id of the message signature, which the Issue body's wst:UseKey points to (WS-Trust 1.3, section 9.3).
constexpr const char* kProofSignatureId = "holderOfKeyProofSignature";

// --- Bodies ---

/// The Issue body without proof of a key. A confirmation type that does not exist is a programming error and
/// aborts the process.
XMLBuilderPtr CommonAcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation,
                                                const TokenSpec& spec);
/// The Issue body; for a holder-of-key token that is not for a delegate it names the signature that proves
/// the key.
XMLBuilderPtr AcquireSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec& spec);
/// The Issue body for an exchange: the presented token in the header stands for the key.
XMLBuilderPtr ExchangeSecurityTokenBuilder(SamlToken::ConfirmationType confirmation, const TokenSpec& spec);
/// The Renew body. A token that is not holder-of-key is a programming error and aborts the process.
XMLBuilderPtr RenewSecurityTokenBuilder(const SamlToken& token, long long lifetimeSec);
/// The Validate body.
XMLBuilderPtr ValidateSecurityTokenBuilder(const SamlToken& token);

/// The first SPNEGO leg: the Issue body with a wst:BinaryExchange. Each build makes a new context id.
class XMLBodyBuilderInitialSPNego final : public XMLBaseBuilder {
 public:
  XMLBodyBuilderInitialSPNego(SamlToken::ConfirmationType confirmation, const TokenSpec& spec,
                              const std::vector<unsigned char>& leg);
  /// Wipes its copy of the leg.
  ~XMLBodyBuilderInitialSPNego();
  void build(Pelmar::Ref<Pelmar::Xml::ElementNode>& result) const override;

 private:
  SamlToken::ConfirmationType _confirmation;
  TokenSpec _spec;
  std::vector<unsigned char> _leg;
};

/// A further SPNEGO leg within the context that the service named.
class XMLBodyBuilderContinuedSPNego final : public XMLBaseBuilder {
 public:
  XMLBodyBuilderContinuedSPNego(const std::string& contextId, const std::vector<unsigned char>& leg);
  /// Wipes its copy of the leg.
  ~XMLBodyBuilderContinuedSPNego();
  void build(Pelmar::Ref<Pelmar::Xml::ElementNode>& result) const override;

 private:
  std::string _contextId;
  std::vector<unsigned char> _leg;
};

// --- Fragments ---

/// wst:Lifetime from now on.
XMLBuilderPtr WssuLifetimeBuilder(long long lifetimeSec);
XMLBuilderPtr WstRenewingBuilder(bool allow);
XMLBuilderPtr WstDelegateToBuilder(const std::string& userName);
/// wst:Participants with one participant per address, in the set's order, none of them primary.
XMLBuilderPtr WstParticipantsBuilders(const std::set<std::string>& addresses);
XMLBuilderPtr WstParticipantBuilder(const std::string& address);
XMLBuilderPtr WsaEndpointAddressReferenceBuilder(const std::string& address);
XMLBuilderPtr RsaAdviceSetBuilder(const std::vector<Advice>& advices);
XMLBuilderPtr RsaAdviceBuilder(const Advice& advice);
XMLBuilderPtr RsaAttributeBuilder(const AdviceAttribute& attribute);
/// wsse:UsernameToken that only names somebody.
XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName);
/// wsse:UsernameToken with the password in clear text.
XMLBuilderPtr WsseUsernameTokenBuilder(const std::string& userName, const std::string& password);
XMLBuilderPtr WstSPNegoBinExchangeBuilder(const std::vector<unsigned char>& leg);

}  // namespace Quorlin

#endif  // QUORLIN_XMLREQUESTBUILDERS_H
