// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Signs a text where its marker stands. Unlike the platform's own signer it can do what a forger would try,
// too, and with any key.

#include "support/TokenFactory.h"

#include "support/XmlText.h"

#include <pelmar/StringUtil.h>

#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/hmac.h>

#include <memory>
#include <stdexcept>

namespace TestSupport {

using namespace Pelmar::Xml::Security;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;

namespace {

using Bytes = std::vector<unsigned char>;

struct DigestRow {
  const char* uri;
  const char* name;  // OpenSSL's.
};

constexpr DigestRow kDigests[] = {{kSha256, "SHA256"},
                                  {kSha384, "SHA384"},
                                  {kSha512, "SHA512"},
                                  {"http://www.w3.org/2000/09/xmldsig#sha1", "SHA1"},
                                  {"http://www.w3.org/2001/04/xmldsig-more#md5", "MD5"}};

enum class Scheme { RSA, EC, HMAC };

struct MethodRow {
  const char* uri;
  Scheme scheme;
  const char* digest;
};

constexpr MethodRow kMethods[] = {
    {kRsaSha256, Scheme::RSA, "SHA256"},
    {kRsaSha384, Scheme::RSA, "SHA384"},
    {kRsaSha512, Scheme::RSA, "SHA512"},
    {kEcdsaSha256, Scheme::EC, "SHA256"},
    {kEcdsaSha384, Scheme::EC, "SHA384"},
    {kEcdsaSha512, Scheme::EC, "SHA512"},
    {"http://www.w3.org/2000/09/xmldsig#rsa-sha1", Scheme::RSA, "SHA1"},
    {"http://www.w3.org/2001/04/xmldsig-more#rsa-md5", Scheme::RSA, "MD5"},
    {"http://www.w3.org/2001/04/xmldsig-more#hmac-sha256", Scheme::HMAC, "SHA256"}};

template <typename Row, std::size_t size>
const Row& RequireRow(const Row (&table)[size], const std::string& uri) {
  for (const Row& row : table) {
    if (uri == row.uri) {
      return row;
    }
  }
  throw std::runtime_error("tests cannot sign with " + uri);
}

void Check(bool succeeded) {
  if (!succeeded) {
    throw std::runtime_error("signing a test token failed");
  }
}

Bytes DigestWith(const char* name, const std::string& octets) {
  Bytes digest(EVP_MAX_MD_SIZE);
  unsigned size = 0;
  Check(EVP_Digest(octets.data(), octets.size(), digest.data(), &size, EVP_get_digestbyname(name), nullptr) ==
        1);
  digest.resize(size);
  return digest;
}

Bytes SignWithOpenSsl(const KeyPair& key, const char* digest, const std::string& octets) {
  const std::unique_ptr<EVP_MD_CTX, void (*)(EVP_MD_CTX*)> context(EVP_MD_CTX_new(), EVP_MD_CTX_free);
  Check(EVP_DigestSignInit(context.get(), nullptr, EVP_get_digestbyname(digest), nullptr, key.GetHandle()) ==
        1);
  const auto* const data = reinterpret_cast<const unsigned char*>(octets.data());
  std::size_t size = 0;
  Check(EVP_DigestSign(context.get(), nullptr, &size, data, octets.size()) == 1);
  Bytes value(size);
  Check(EVP_DigestSign(context.get(), value.data(), &size, data, octets.size()) == 1);
  value.resize(size);
  return value;
}

Bytes AuthenticateWithPublicKey(const KeyPair& key, const char* digest, const std::string& octets) {
  const std::string secret = key.ToPublicPem();
  Bytes value(EVP_MAX_MD_SIZE);
  unsigned size = 0;
  Check(HMAC(EVP_get_digestbyname(digest), secret.data(), static_cast<int>(secret.size()),
             reinterpret_cast<const unsigned char*>(octets.data()), octets.size(), value.data(),
             &size) != nullptr);
  value.resize(size);
  return value;
}

// The two numbers side by side, each as long as the order of the curve (RFC 4050, section 3.3).
Bytes ToRawEcdsaValue(const Bytes& der, const EVP_PKEY* key) {
  const auto* position = der.data();
  const std::unique_ptr<ECDSA_SIG, void (*)(ECDSA_SIG*)> numbers(
      d2i_ECDSA_SIG(nullptr, &position, static_cast<long>(der.size())), ECDSA_SIG_free);
  Check(numbers != nullptr);
  const int size = (EVP_PKEY_get_bits(key) + 7) / 8;
  Bytes raw(static_cast<std::size_t>(size) * 2);
  Check(BN_bn2binpad(ECDSA_SIG_get0_r(numbers.get()), raw.data(), size) == size &&
        BN_bn2binpad(ECDSA_SIG_get0_s(numbers.get()), raw.data() + size, size) == size);
  return raw;
}

Bytes MakeValue(const Identity& signer, const std::string& method, const std::string& octets) {
  const MethodRow& row = RequireRow(kMethods, method);
  if (row.scheme == Scheme::HMAC) {
    return AuthenticateWithPublicKey(signer.keyPair, row.digest, octets);
  }
  const Bytes value = SignWithOpenSsl(signer.keyPair, row.digest, octets);
  return row.scheme == Scheme::EC ? ToRawEcdsaValue(value, signer.keyPair.GetHandle()) : value;
}

// --- The signature's text, with the values still to come ---

const char* const kValuePlace = "{signature value}";

std::string DigestPlace(std::size_t number) {
  return "{digest value " + std::to_string(number) + "}";
}

// Written as signers write it.
std::string OnTheWire(const std::string& algorithm) {
  return algorithm == kC14n ? algorithm.substr(0, algorithm.size() - 1) : algorithm;
}

class SkeletonWriter final {
 public:
  explicit SkeletonWriter(const TokenSigning& signing)
      : _signing(signing), _p(signing.prefix.empty() ? "" : signing.prefix + ":") {}

  std::string Write(const Identity& signer) const {
    const std::string declaration =
        (_signing.prefix.empty() ? "xmlns" : "xmlns:" + _signing.prefix) + "=\"" + kSignatureNamespace + "\"";
    std::string info =
        Method("CanonicalizationMethod", OnTheWire(_signing.canonicalization), _signing.inclusivePrefixes) +
        Method("SignatureMethod", _signing.signatureMethod, {});
    for (std::size_t i = 0; i < _signing.references.size(); ++i) {
      info += Reference(_signing.references[i], i);
    }
    return "<" + _p + "Signature " + declaration + ">" + Element("SignedInfo", info) +
           Element("SignatureValue", kValuePlace) + _signing.keyInfo.value_or(KeyInfo(signer)) + "</" + _p +
           "Signature>";
  }

 private:
  std::string Element(const std::string& name, const std::string& content) const {
    return "<" + _p + name + ">" + content + "</" + _p + name + ">";
  }

  std::string Method(const std::string& name, const std::string& algorithm,
                     const std::vector<std::string>& prefixes) const {
    const std::string start = "<" + _p + name + " Algorithm=\"" + algorithm + "\"";
    if (prefixes.empty()) {
      return start + "/>";
    }
    std::string list;
    for (const std::string& prefix : prefixes) {
      list += (list.empty() ? "" : " ") + prefix;
    }
    return start + "><ec:InclusiveNamespaces xmlns:ec=\"" + kExclusiveC14n + "\" PrefixList=\"" + list +
           "\"/></" + _p + name + ">";
  }

  std::string Transforms(const ReferencePlan& plan) const {
    std::string transforms;
    if (plan.enveloped) {
      transforms += Method("Transform", kEnvelopedSignature, {});
    }
    if (!plan.canonicalization.empty()) {
      transforms += Method("Transform", OnTheWire(plan.canonicalization), plan.inclusivePrefixes);
    }
    return transforms.empty() ? "" : Element("Transforms", transforms);
  }

  std::string Reference(const ReferencePlan& plan, std::size_t number) const {
    return "<" + _p + "Reference URI=\"" + plan.uri + "\">" + plan.transforms.value_or(Transforms(plan)) +
           Method("DigestMethod", plan.digestMethod, {}) + Element("DigestValue", DigestPlace(number)) +
           "</" + _p + "Reference>";
  }

  std::string KeyInfo(const Identity& signer) const {
    std::string certificates = Element("X509Certificate", Base64Of(signer));
    for (const Identity& identity : _signing.alsoShown) {
      certificates += Element("X509Certificate", Base64Of(identity));
    }
    return Element("KeyInfo", Element("X509Data", certificates));
  }

  const TokenSigning& _signing;
  const std::string _p;
};

// --- Filling in the values ---

/// The first element in document order for which `predicate` holds.
template <typename Predicate>
ElementNode* FindElement(Node* node, Predicate predicate) {
  for (; node != nullptr; node = node->GetNextSibling()) {
    ElementNode* const element = Pelmar::Xml::AsElement(node);
    if (element == nullptr) {
      continue;
    }
    ElementNode* const found =
        predicate(*element) ? element : FindElement(element->GetFirstChild(), predicate);
    if (found != nullptr) {
      return found;
    }
  }
  return nullptr;
}

ElementNode* FindUnfinishedSignature(const Pelmar::Ref<Pelmar::Xml::Document>& document) {
  ElementNode* const value = FindElement(document->GetFirstChild(), [](const ElementNode& element) {
    const Pelmar::Xml::TextNode* const text = Pelmar::Xml::AsText(element.GetFirstChild());
    return element.GetLocalName() == "SignatureValue" && text != nullptr && text->GetText() == kValuePlace;
  });
  Check(value != nullptr);
  return Pelmar::Xml::AsElement(static_cast<Node*>(value->GetParent()));
}

const Node* FindTarget(const Pelmar::Ref<Pelmar::Xml::Document>& document, const ElementNode* signature,
                       const ReferencePlan& plan) {
  if (plan.uri.empty() && plan.targetId.empty()) {
    const ElementNode* const parent =
        Pelmar::Xml::AsElement(static_cast<const Node*>(signature->GetParent()));
    return parent == document->GetDocumentElement() ? static_cast<const Node*>(document.Get()) : parent;
  }
  const std::string id = plan.targetId.empty() ? plan.uri.substr(1) : plan.targetId;
  const ElementNode* const target = FindElement(document->GetFirstChild(), [&](const ElementNode& element) {
    std::string value;
    return (element.GetAttribute("ID", value) || element.GetAttribute("Id", value)) && value == id;
  });
  Check(target != nullptr);
  return target;
}

std::string FillDigests(const std::string& text, const TokenSigning& signing) {
  const Pelmar::Ref<Pelmar::Xml::Document> document = ParseXmlText(text);
  const ElementNode* const signature = FindUnfinishedSignature(document);
  std::string filled = text;
  for (std::size_t i = 0; i < signing.references.size(); ++i) {
    const ReferencePlan& plan = signing.references[i];
    const std::string octets = CanonicalText(FindTarget(document, signature, plan),
                                             plan.canonicalization.empty() ? kC14n : plan.canonicalization,
                                             plan.inclusivePrefixes, plan.enveloped ? signature : nullptr);
    Bytes digest = DigestWith(RequireRow(kDigests, plan.digestMethod).name, octets);
    digest.resize(plan.digestBytes.value_or(digest.size()));
    filled = ReplaceOnce(filled, DigestPlace(i), Pelmar::StringUtil::Base64Encode(digest));
  }
  return filled;
}

std::string FillValue(const std::string& text, const Identity& signer, const TokenSigning& signing) {
  const Pelmar::Ref<Pelmar::Xml::Document> document = ParseXmlText(text);
  const ElementNode* const info = FindUnfinishedSignature(document)->FindChildElement("SignedInfo");
  const std::string octets = CanonicalText(info, signing.canonicalization, signing.inclusivePrefixes);
  const Bytes value = MakeValue(signer, signing.signatureMethod, octets);
  return ReplaceOnce(text, kValuePlace, Pelmar::StringUtil::Base64Encode(value));
}

}  // namespace

std::string SignToken(const std::string& text, const Identity& signer, const TokenSigning& signing) {
  const std::string skeleton = ReplaceOnce(text, kSignatureMarker, SkeletonWriter(signing).Write(signer));
  return FillValue(FillDigests(skeleton, signing), signer, signing);
}

}  // namespace TestSupport
