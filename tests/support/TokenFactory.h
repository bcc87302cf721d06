// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Tokens for tests: composed as text from pieces that can each be replaced, and signed in every way, right or
// wrong.

#ifndef QUORLIN_TESTS_SUPPORT_TOKENFACTORY_H
#define QUORLIN_TESTS_SUPPORT_TOKENFACTORY_H

#include "support/Pki.h"
#include "support/TokenMeaning.h"

#include <pelmar/xml/security/Algorithms.h>
#include <quorlin/SamlToken.h>

#include <boost/shared_ptr.hpp>

#include <list>
#include <optional>
#include <string>
#include <vector>

namespace TestSupport {

using TrustList = std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>;

/// Where `SignToken` puts the signature.
constexpr const char* kSignatureMarker = "<!--signature-->";
/// The ID of a token as it is composed below.
constexpr const char* kTokenId = "_4f0a9c1e";
/// The subject's user principal name in such a token.
constexpr const char* kTokenSubject = "alice@example.com";

/// The pieces of an assertion as XML text. As they stand they make a bearer token without conditions beyond
/// its period, valid from a minute ago for an hour. The prefixes saml, xs, xsi, del (delegation) and ext (the
/// vendor's SAML extensions) are declared on the assertion.
struct TokenText {
  TokenText();

  std::string prolog;  ///< Before the assertion.
  std::string declarations;
  std::string version = "2.0";
  std::string id = kTokenId;
  std::string issueInstant;
  std::string furtherAttributes;  ///< Of the assertion; with a leading blank.
  std::string issuer;
  std::string signature = kSignatureMarker;
  std::string nameId;
  std::string delegateId;  ///< A whole NameID element; empty: none.
  std::string method;
  std::string confirmationEnd;   ///< Of a bearer's confirmation data; empty: `notOnOrAfter`.
  std::string confirmationData;  ///< A whole element; empty: that of a bearer.
  std::string notBefore;
  std::string notOnOrAfter;
  std::string restrictions;  ///< The content of Conditions.
  std::string advice;        ///< A whole element; empty: none.
  std::string authnStatement;
  std::string attributes;  ///< The content of the AttributeStatement; empty: none.
  std::string tail;        ///< The last content of the assertion.

  /// Makes it a holder-of-key token for this certificate.
  void HoldKey(const Identity& holder);

  std::string Compose() const;
};

/// An xs:dateTime that lies so many seconds after now.
std::string SecondsFromNow(long long seconds);

/// Elements as text. `content` is markup, the other values are texts that need no escaping.
std::string NameIdElement(const std::string& content);
std::string NameIdElement(const std::string& format, const std::string& content);
std::string AttributeElement(const std::string& name, const std::vector<std::string>& values);
std::string ProxyRestriction(const std::string& attributes);
std::string RenewRestriction(const std::string& attributes);
/// A delegation restriction with these Delegate elements.
std::string DelegationRestriction(const std::string& delegates);
std::string DelegateElement(const std::string& instant, const std::string& nameId);
/// SubjectConfirmationData that names the holder's certificate.
std::string HolderOfKeyData(const Identity& holder);
/// The certificate's DER encoding as base64.
std::string Base64Of(const Identity& identity);

/// `text` with `from`, which must stand in it exactly once, replaced by `to`. Throws std::runtime_error
/// otherwise: a test that changed nothing would prove nothing.
std::string ReplaceOnce(const std::string& text, const std::string& from, const std::string& to);

/// " at line L, column C" of the first place where `part` stands in the (ASCII) `text`. Throws
/// std::runtime_error when it does not.
std::string PlaceOf(const std::string& text, const std::string& part);

/// One ds:Reference. The digest is computed from what the first members say, also when the texts that follow
/// say something else.
struct ReferencePlan {
  std::string uri = std::string("#") + kTokenId;
  /// The ID of the element that is digested, if it is not what `uri` refers to.
  std::string targetId;
  bool enveloped = true;
  /// Empty: no canonicalisation is named, and Canonical XML 1.0 used.
  std::string canonicalization = Pelmar::Xml::Security::kExclusiveC14n;
  /// The PrefixList of its InclusiveNamespaces, which is left out when empty.
  std::vector<std::string> inclusivePrefixes = {};
  /// Also the outdated sha1 and md5.
  std::string digestMethod = Pelmar::Xml::Security::kSha256;
  /// How many of the digest's bytes are written into DigestValue; those beyond its end are zeros.
  std::optional<std::size_t> digestBytes = {};
  /// Stands in place of the Transforms element that follows from the above.
  std::optional<std::string> transforms = {};
};

/// How a token is signed: by default as the service does it.
struct TokenSigning {
  std::string prefix = "ds";
  std::string canonicalization = Pelmar::Xml::Security::kExclusiveC14n;
  std::vector<std::string> inclusivePrefixes = {};
  /// Also the outdated rsa-sha1 and rsa-md5, and hmac-sha256, whose secret is then the signer's public key as
  /// PEM text.
  std::string signatureMethod = Pelmar::Xml::Security::kRsaSha256;
  std::vector<ReferencePlan> references = {ReferencePlan()};
  /// What KeyInfo shows after the signer's certificate.
  std::vector<Identity> alsoShown = {};
  /// Stands in place of the KeyInfo element; empty: no KeyInfo.
  std::optional<std::string> keyInfo = {};
};

/// `text` with the signature of `signer` where the marker stands. Nothing else of the text is changed.
std::string SignToken(const std::string& text, const Identity& signer,
                      const TokenSigning& signing = TokenSigning());

/// The token service of the tests: a self-signed certificate with an RSA key of 2048 bits, valid now. The
/// same in the whole process.
const Identity& TokenSigner();

/// `text` signed by the token service.
std::string SignToken(const std::string& text);
std::string SignToken(const TokenText& text);

/// The tokens in these texts, with the token service trusted.
boost::shared_ptr<Quorlin::SamlToken> ReadToken(const std::string& text);
boost::shared_ptr<Quorlin::SamlToken> ReadToken(const TokenText& text);

/// "accepted" or why not (see support/Verdict.h), with the token service trusted, without clock tolerance.
std::string VerdictOnToken(const std::string& text);
std::string VerdictOnToken(const TokenText& text);
std::string VerdictOnToken(const std::string& text, const TrustList& trusted);

/// The same for the first element of the document that is a SAML assertion with this ID, or, when none has
/// it, the first assertion.
std::string VerdictOnEmbedded(const std::string& document, const std::string& id);

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_TOKENFACTORY_H
