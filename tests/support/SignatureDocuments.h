// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Signed XML documents for tests.

#ifndef QUORLIN_TESTS_SUPPORT_SIGNATUREDOCUMENTS_H
#define QUORLIN_TESTS_SUPPORT_SIGNATUREDOCUMENTS_H

#include "support/Pki.h"

#include <pelmar/Ref.h>
#include <pelmar/xml/Node.h>

#include <list>
#include <string>
#include <vector>

namespace TestSupport {

/// Throws XMLParseException.
Pelmar::Ref<Pelmar::Xml::Document> ParseDocument(const std::string& text);

/// The serialised document element.
std::string WriteDocument(const Pelmar::Xml::Document& document);

/// The first ds:Signature among the children of `element`; null when there is none.
Pelmar::Xml::ElementNode* FindSignature(const Pelmar::Xml::ElementNode& element);

/// How `SignDocument` signs.
struct SigningPlan {
  std::string uri = "#_1";
  std::vector<std::string> transforms = {"http://www.w3.org/2000/09/xmldsig#enveloped-signature",
                                         "http://www.w3.org/2001/10/xml-exc-c14n#"};
  std::string digestMethod = "http://www.w3.org/2001/04/xmlenc#sha256";
  std::string signatureMethod = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
  std::string prefix = "ds";
  /// What KeyInfo shows beside the signer's certificate, which comes first.
  std::vector<Identity> alsoShown = {};
};

/// A ds:X509Data element with these certificates.
Pelmar::Ref<Pelmar::Xml::ElementNode> MakeX509Data(const std::vector<Identity>& identities);

/// `text` with a signature by `signer` as the last child of the document element.
std::string SignDocument(const std::string& text, const Identity& signer,
                         const SigningPlan& plan = SigningPlan());

/// "verified" or "refused" for a verdict, "unsigned" when no child of `context` is a signature, else the
/// class of the platform's exception,
/// ": " and its message. The signature is the first one among the children of `context`.
std::string VerifyElement(Pelmar::Xml::ElementNode* context,
                          const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trusted);

/// The same for the document element of `text`, which may also be refused by the parser.
std::string VerifyDocument(const std::string& text,
                           const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trusted);

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_SIGNATUREDOCUMENTS_H
