// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/explain/SignatureChecks.h"

#include "quorlin/CertificateText.h"
#include "quorlin/explain/ElementTrail.h"

#include <pelmar/Exception.h>
#include <pelmar/StringUtil.h>
#include <pelmar/Writer.h>
#include <pelmar/crypto/Digest.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>
#include <pelmar/xml/security/Exceptions.h>
#include <pelmar/xml/security/KeyInfoResolver.h>

#include <algorithm>
#include <cctype>
#include <sstream>

namespace Cli {

using Pelmar::Ref;
using Pelmar::Crypto::Certificate;
using Pelmar::Xml::AsElement;
using Pelmar::Xml::AsText;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;

namespace Security = Pelmar::Xml::Security;

namespace {

std::string GetAttribute(const ElementNode* element, const char* name) {
  std::string value;
  if (element != nullptr) {
    element->GetAttribute(name, value);
  }
  return value;
}

const ElementNode* FindChild(const ElementNode* element, const char* name) {
  return element == nullptr ? nullptr : element->FindChildElement(Security::kSignatureNamespace, name);
}

std::vector<const ElementNode*> FindChildren(const ElementNode* element, const char* name) {
  std::vector<const ElementNode*> found;
  for (const Node* node = element == nullptr ? nullptr : element->GetFirstChildNode(); node != nullptr;
       node = node->GetNextSibling()) {
    const ElementNode* const child = AsElement(node);
    if (child != nullptr && child->GetLocalName() == name) {
      found.push_back(child);
    }
  }
  return found;
}

std::string GetTextOf(const ElementNode* element) {
  std::string text;
  for (const Node* node = element == nullptr ? nullptr : element->GetFirstChildNode(); node != nullptr;
       node = node->GetNextSibling()) {
    text += AsText(node) == nullptr ? "" : AsText(node)->GetText();
  }
  return text;
}

/// The platform's judge of signers, who tells whether he was asked and what he said.
class Witness final : public Security::KeyInfoResolver {
 public:
  explicit Witness(const Trust& trust) : _judge(Security::CreateTrustChainKeyResolver(trust)) {}
  ~Witness() override = default;

  Ref<const Certificate> ResolveSigner(const ElementNode* keyInfo) const override {
    _asked = true;
    _signer = _judge->ResolveSigner(keyInfo);
    return _signer;
  }

  bool WasAsked() const { return _asked; }
  const Ref<const Certificate>& GetSigner() const { return _signer; }

 private:
  const Ref<Security::KeyInfoResolver> _judge;
  mutable bool _asked = false;
  mutable Ref<const Certificate> _signer;
};

void AddCertificate(const char* role, const Certificate& certificate, const char* list, Check& check) {
  check.details.push_back(std::string(role) + ": " + PrintCertificate(certificate));
  check.data[list].push_back(DescribeCertificate(certificate));
}

/// What the signature shows and what we trust, whatever comes of it.
void DescribeChain(const ElementNode* keyInfo, const Trust& trust, Check& check) {
  check.data["shown"] = Json::array();
  check.data["trusted"] = Json::array();
  for (const ElementNode* const data : FindChildren(keyInfo, "X509Data")) {
    for (const ElementNode* const element : FindChildren(data, "X509Certificate")) {
      try {
        const Ref<const Certificate> certificate =
            Pelmar::Crypto::CreateCertificateFromDer(Pelmar::StringUtil::Base64Decode(GetTextOf(element)));
        AddCertificate("in the token", *certificate, "shown", check);
      } catch (const Pelmar::Exception& e) {
        check.details.push_back(std::string("in the token: a certificate that cannot be read: ") + e.what());
      }
    }
  }
  for (const Ref<const Certificate>& certificate : trust) {
    AddCertificate("trusted", *certificate, "trusted", check);
  }
}

struct Transforms {
  bool enveloped = false;
  std::string canonicalization = Security::kC14n;
  std::vector<std::string> prefixes;
};

Transforms ReadTransforms(const ElementNode* reference) {
  Transforms transforms;
  for (const ElementNode* const transform : FindChildren(FindChild(reference, "Transforms"), "Transform")) {
    const std::string algorithm = GetAttribute(transform, "Algorithm");
    if (algorithm == Security::kEnvelopedSignature) {
      transforms.enveloped = true;
      continue;
    }
    // What a reference digests never has comments (XML Signature 1.1, section 4.4.3.3).
    transforms.canonicalization = algorithm.substr(0, algorithm.find("WithComments"));
    const std::vector<const ElementNode*> lists = FindChildren(transform, "InclusiveNamespaces");
    if (!lists.empty()) {
      std::istringstream list(GetAttribute(lists.front(), "PrefixList"));
      for (std::string prefix; list >> prefix;) {
        transforms.prefixes.push_back(prefix);
      }
    }
  }
  return transforms;
}

Pelmar::Crypto::DigestAlgorithm GetDigestAlgorithm(const std::string& method) {
  return method == Security::kSha512   ? Pelmar::Crypto::DIGEST_SHA512
         : method == Security::kSha384 ? Pelmar::Crypto::DIGEST_SHA384
                                       : Pelmar::Crypto::DIGEST_SHA256;
}

/// The whole document, comments and all, where the assertion is the document (XML Signature 1.1,
/// section 4.4.3.3).
const Node* FindTarget(const ElementNode* assertion, const std::string& uri) {
  const Pelmar::Xml::ParentNode* const parent = assertion->GetParent();
  const bool isDocument = parent != nullptr && parent->GetKind() == Pelmar::Xml::DOCUMENT_NODE;
  if (uri.empty() && isDocument) {
    return parent;
  }
  return uri.empty() || uri == "#" + GetAttribute(assertion, "ID") ? assertion : nullptr;
}

std::string ComputeDigest(const Node* target, const Transforms& transforms, const std::string& method,
                          const ElementNode* signature) {
  const Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  const Ref<Security::Canonicalizer> canonicalizer =
      transforms.prefixes.empty()
          ? Security::CreateCanonicalizer(transforms.canonicalization)
          : Security::CreateCanonicalizer(transforms.canonicalization, transforms.prefixes);
  canonicalizer->Canonicalize(target, writer.Get(), transforms.enveloped ? signature : nullptr);
  const std::string& text = writer->GetText();
  return Pelmar::StringUtil::Base64Encode(
      Pelmar::Crypto::ComputeDigest(GetDigestAlgorithm(method), text.data(), text.size()));
}

std::string RemoveWhiteSpace(std::string text) {
  text.erase(std::remove_if(text.begin(), text.end(), [](unsigned char c) { return std::isspace(c) != 0; }),
             text.end());
  return text;
}

/// Whether the digest in the token is the one of what stands there.
bool CompareDigest(const ElementNode* assertion, const ElementNode* signature, const ElementNode* reference,
                   Check& check) {
  const std::string uri = GetAttribute(reference, "URI");
  const std::string method = GetAttribute(FindChild(reference, "DigestMethod"), "Algorithm");
  const std::string expected = RemoveWhiteSpace(GetTextOf(FindChild(reference, "DigestValue")));
  const Node* const target = FindTarget(assertion, uri);
  const std::string found =
      target == nullptr ? "" : ComputeDigest(target, ReadTransforms(reference), method, signature);
  check.details.push_back("reference \"" + uri + "\": expected " + expected + ", found " +
                          (target == nullptr ? "an element inside the token" : found));
  check.data["references"].push_back(
      {{"uri", uri}, {"digestMethod", method}, {"expected", expected}, {"found", found}});
  return target == nullptr || expected == found;
}

void ExplainReferences(const ElementNode* assertion, const ElementNode* signature, Check& check) {
  const ElementNode* firstWrong = nullptr;
  check.data["references"] = Json::array();
  for (const ElementNode* const reference : FindChildren(FindChild(signature, "SignedInfo"), "Reference")) {
    if (!CompareDigest(assertion, signature, reference, check) && firstWrong == nullptr) {
      firstWrong = reference;
    }
  }
  check.state = firstWrong == nullptr ? CheckState::PASSED : CheckState::FAILED;
  if (firstWrong != nullptr) {
    check.finding = "the signed content was changed after it was signed";
    check.place = FindPlace(firstWrong, assertion);
  }
}

void Fail(Check& check, const std::string& finding, const ElementNode* element, const ElementNode* root) {
  check.state = CheckState::FAILED;
  check.finding = finding;
  check.place = FindPlace(element, root);
}

/// Says which check stopped a signature that could not be judged.
void ExplainRefusal(const std::string& message, const Witness& witness, const ElementNode* assertion,
                    const ElementNode* signature, SignatureChecks& checks) {
  if (!witness.WasAsked()) {
    Fail(checks.algorithms, message, FindChild(signature, "SignedInfo"), assertion);
    return;
  }
  checks.algorithms.state = CheckState::PASSED;
  if (!witness.GetSigner()) {
    const ElementNode* const keyInfo = FindChild(signature, "KeyInfo");
    Fail(checks.signer, message, keyInfo == nullptr ? signature : keyInfo, assertion);
    return;
  }
  checks.signer.state = CheckState::PASSED;
  Fail(checks.references, message, FindChild(signature, "SignedInfo"), assertion);
}

void ExplainVerdict(bool holds, const ElementNode* assertion, const ElementNode* signature,
                    SignatureChecks& checks) {
  checks.algorithms.state = CheckState::PASSED;
  checks.signer.state = CheckState::PASSED;
  ExplainReferences(assertion, signature, checks.references);
  if (holds) {
    checks.value.state = CheckState::PASSED;
  } else if (checks.references.state == CheckState::PASSED) {
    Fail(checks.value, "the value was not made by the signer's key over this SignedInfo",
         FindChild(signature, "SignatureValue"), assertion);
  }
}

void NameChecks(const ElementNode* signature, const Security::Signature& parsed, SignatureChecks& checks) {
  const ElementNode* const signedInfo = FindChild(signature, "SignedInfo");
  checks.algorithms.name = "signature algorithms";
  checks.algorithms.data = {
      {"canonicalization", GetAttribute(FindChild(signedInfo, "CanonicalizationMethod"), "Algorithm")},
      {"signature", GetAttribute(FindChild(signedInfo, "SignatureMethod"), "Algorithm")},
      {"references", parsed.GetReferences().size()}};
  checks.algorithms.advice =
      "Have the token service sign with RSA or ECDSA and SHA-256 or better, and with no transforms but "
      "enveloped-signature and canonicalisation.";
  checks.signer.name = "signer's certificate chain";
  checks.signer.advice =
      "Compare the certificates above: give --trust the service's present signing certificate or its root.";
  checks.references.name = "signed content";
  checks.references.advice =
      "Get the token again from where it was issued and hand it on byte for byte: editors, XML formatters and "
      "character set conversions break it.";
  checks.value.name = "signature value";
  checks.value.advice = "The token is forged, or its ds:SignedInfo was changed: do not use it.";
}

}  // namespace

bool ExplainSignature(const ElementNode* assertion, const Security::Signature& signature, const Trust& trust,
                      SignatureChecks& checks) {
  const ElementNode* const element = signature.GetElement().Get();
  const Ref<Witness> witness = Pelmar::MakeRef<Witness>(trust);
  NameChecks(element, signature, checks);
  DescribeChain(FindChild(element, "KeyInfo"), trust, checks.signer);
  try {
    const bool holds = signature.Verify(witness.Get());
    ExplainVerdict(holds, assertion, element, checks);
    return holds;
  } catch (const Security::XmlSecurityException& e) {
    ExplainRefusal(e.what(), *witness, assertion, element, checks);
    return false;
  }
}

}  // namespace Cli
