// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A validated SAML 2.0 token, the values it hands out, and the functions that make one from XML.

#ifndef QUORLIN_SAMLTOKEN_H
#define QUORLIN_SAMLTOKEN_H

#include <pelmar/Ref.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/system/DateTime.h>
#include <pelmar/xml/Node.h>
#include <quorlin/Exceptions.h>
#include <quorlin/Export.h>
#include <quorlin/PrincipalId.h>

#include <boost/shared_ptr.hpp>

#include <list>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace Quorlin {

/// One link of a delegation chain.
struct QUORLIN_API Delegate {
  Delegate(const PrincipalId& principal, const Pelmar::System::DateTime& delegationInstant);

  PrincipalId principal;
  Pelmar::System::DateTime delegationInstant;  ///< When the delegation was made.
};

/// A named list of values inside an advice, in document order.
struct AdviceAttribute {
  std::string name;
  std::vector<std::string> values;
};

/// What a source (an application, say) asked the service to write into the token about the subject. The
/// service vouches for having been told, not for the content.
struct Advice {
  std::string source;
  std::vector<AdviceAttribute> attributes;  ///< In document order.
};

/// A SAML 2.0 token that passed every check.
///
/// An object of this type exists only if its assertion was read by the strict parser, its conditions held at
/// that moment, and its signature covered it and verified against the trusted certificates. It never changes
/// and may be read from several threads.
///
/// Ownership: always by `boost::shared_ptr`, which deletes the concrete
/// class. References that are returned live as long as the token; the getters with an output argument replace
/// what it held.
class QUORLIN_API SamlToken {
 public:
  /// How the bearer proves to be the subject (SAML 2.0 Profiles, section 3).
  enum ConfirmationType : int {
    /// urn:oasis:names:tc:SAML:2.0:cm:bearer: whoever has the token.
    CONFIRM_BEARER = 0,
    /// urn:oasis:names:tc:SAML:2.0:cm:holder-of-key: who has the confirmation certificate's key.
    CONFIRM_HOLDER_OF_KEY = 1
  };

  /// The assertion's ID.
  virtual const std::string& GetId() const = 0;
  /// Conditions/@NotBefore: valid from this instant.
  virtual const Pelmar::System::DateTime& GetStartDate() const = 0;
  /// Conditions/@NotOnOrAfter: valid until just before this instant.
  virtual const Pelmar::System::DateTime& GetEndDate() const = 0;
  virtual const PrincipalId& GetSubject() const = 0;
  /// Whether the service will renew the token.
  virtual bool IsRenewable() const = 0;
  /// Whether the subject's identity may be delegated to others with this token.
  virtual bool IsDelegable() const = 0;
  /// Whether the subject is a service account ("solution user") rather than a person.
  virtual bool IsSolution() const = 0;
  virtual ConfirmationType GetConfirmationMethod() const = 0;
  /// Given name and surname; empty where the token carries none.
  virtual void GetFullName(std::pair<std::string, std::string>& fullName) const = 0;
  /// The groups that the subject belongs to, in the token's order.
  virtual void GetGroups(std::vector<PrincipalId>& groups) const = 0;
  /// Through whom the subject's identity was delegated, first delegate first; empty when it was not.
  virtual void GetDelegationChain(std::vector<Delegate>& delegationChain) const = 0;
  /// URIs of the services that may accept the token; empty: any. Checking it is the receiving service's
  /// business.
  virtual void GetAudience(std::set<std::string>& audience) const = 0;
  virtual void GetAdvice(std::vector<Advice>& advice) const = 0;
  /// The certificate whose key a holder-of-key token is bound to; null for a bearer token.
  virtual const Pelmar::Crypto::Certificate* GetConfirmationCertificate() const = 0;
  /// The token's XML: the text it was made from, byte for byte, or the canonical form of the element it was
  /// made from.
  virtual const std::string& ToXml() const = 0;

 protected:
  /// Not virtual: a token is only ever deleted as its concrete class, by the shared pointer that was made
  /// with it.
  ~SamlToken() {}
};

/// The token in `xml`, which must be one SAML 2.0 assertion document.
///
/// `trustedCertificates` are those of the token service: the signature is accepted only if its certificate is
/// one of them or chains to one of them. Null entries are skipped; an empty list accepts nothing.
/// `clockToleranceSec` widens the validity period on both sides, in seconds, for clocks that disagree.
/// Throws:
/// - ParseException for anything outside the accepted subset, or a condition that does not hold. For an
///   isSolution attribute without exactly one value a *pointer* to a new ParseException is thrown: catch it
///   too, and delete it;
/// - InvalidSignatureException when the signature does not verify;
/// - Pelmar::Xml::XMLParseException for text that is not well-formed XML or beyond the parser's limits;
/// - Pelmar::Base64FormatException or Pelmar::Crypto::CryptoException for a bad confirmation certificate.
QUORLIN_API boost::shared_ptr<SamlToken> CreateSamlToken(
    const std::string& xml,
    const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trustedCertificates,
    long long clockToleranceSec);

/// The same with no clock tolerance.
QUORLIN_API boost::shared_ptr<SamlToken> CreateSamlToken(
    const std::string& xml,
    const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trustedCertificates);

/// The same with one trusted certificate (null: nothing is trusted) and no clock tolerance.
QUORLIN_API boost::shared_ptr<SamlToken> CreateSamlToken(
    const std::string& xml, const Pelmar::Crypto::Certificate* trustedCertificate);

/// The token in an assertion element that is part of a tree, which must not change during the call. Its text
/// (`ToXml`) is the element's canonical form (Canonical XML 1.0 without comments): it takes along the
/// namespace declarations, and the xml: attributes if there are any, of the elements around it. Otherwise
/// like the functions above; an undeclared prefix below the element is a
/// Pelmar::Xml::Security::XmlSecurityException.
QUORLIN_API boost::shared_ptr<SamlToken> CreateSamlTokenFromDom(
    Pelmar::Xml::ElementNode* assertion,
    const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trustedCertificates,
    long long clockToleranceSec);

/// The same with no clock tolerance.
QUORLIN_API boost::shared_ptr<SamlToken> CreateSamlTokenFromDom(
    Pelmar::Xml::ElementNode* assertion,
    const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trustedCertificates);

}  // namespace Quorlin

#endif  // QUORLIN_SAMLTOKEN_H
