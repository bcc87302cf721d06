// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Puts signatures into a tree: by whom, how and over what, right or wrong.

#ifndef QUORLIN_FUZZ_TOKENSIGNER_H
#define QUORLIN_FUZZ_TOKENSIGNER_H

#include "SignatureFuzzKey.h"
#include "SignedTokenFuzzKeys.h"
#include "TokenTree.h"

#include <pelmar/Exception.h>
#include <pelmar/Reader.h>
#include <pelmar/StringUtil.h>
#include <pelmar/Writer.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>

#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/hmac.h>
#include <openssl/pem.h>

#include <cstdlib>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace TokenFuzz {

/// Who signs, what he shows, and whether he is to be believed by one who trusts the signer of
/// SignatureFuzzKey.h and the authority.
struct SignerRow {
  const char* keyPem;
  std::vector<const char*> shownPem;
  bool isRight;
};

inline const std::vector<SignerRow>& Signers() {
  static const std::vector<SignerRow> rows = {
      {kFuzzKeyPem, {kFuzzCertificatePem}, true},
      {kLeafKeyPem, {kLeafCertificatePem, kAuthorityCertificatePem}, true},
      {kLeafKeyPem, {kAuthorityCertificatePem, kLeafCertificatePem}, true},
      {kLeafKeyPem, {kLeafCertificatePem}, true},
      {kFuzzKeyPem, {kFuzzCertificatePem, kFuzzCertificatePem}, true},
      {kStrangerKeyPem, {kStrangerCertificatePem}, false},
      {kStrangerKeyPem, {kFuzzCertificatePem}, false},
      {kStrangerKeyPem, {kFuzzCertificatePem, kStrangerCertificatePem}, false},
      {kStrangerKeyPem, {kStrangerCertificatePem, kFuzzCertificatePem}, false},
      {kStrangerKeyPem, {kStrangerCertificatePem, kAuthorityCertificatePem}, false},
      {kStrangerKeyPem, {kVouchedCertificatePem, kFuzzCertificatePem}, false},
      {kStrangerKeyPem, {kVouchedCertificatePem}, false},
      {kFuzzKeyPem, {kOtherCertificatePem}, false},
      {kFuzzKeyPem, {kLeafCertificatePem, kAuthorityCertificatePem}, false},
      {kFuzzKeyPem, {}, false},
      {kLeafKeyPem, {kOutdatedCertificatePem, kAuthorityCertificatePem}, false},
      {kLeafKeyPem, {kAuthorityCertificatePem}, false},
      {kAuthorityKeyPem, {kAuthorityCertificatePem}, false},
  };
  return rows;
}

/// An algorithm of the wire, OpenSSL's name of its digest, and whether the profile has it.
struct AlgorithmRow {
  const char* uri;
  const char* digest;
  bool isRight;
};

constexpr AlgorithmRow kSignatureMethods[] = {
    {Pelmar::Xml::Security::kEcdsaSha256, "SHA256", true},
    {Pelmar::Xml::Security::kEcdsaSha384, "SHA384", true},
    {Pelmar::Xml::Security::kEcdsaSha512, "SHA512", true},
    {"http://www.w3.org/2001/04/xmldsig-more#ecdsa-sha1", "SHA1", false},
    {"http://www.w3.org/2001/04/xmldsig-more#hmac-sha256", "SHA256", false},
    {Pelmar::Xml::Security::kRsaSha256, "SHA256", false}};
constexpr std::size_t kHmacMethod = 4;

constexpr AlgorithmRow kDigestMethods[] = {{Pelmar::Xml::Security::kSha256, "SHA256", true},
                                           {Pelmar::Xml::Security::kSha384, "SHA384", true},
                                           {Pelmar::Xml::Security::kSha512, "SHA512", true},
                                           {"http://www.w3.org/2000/09/xmldsig#sha1", "SHA1", false},
                                           {"http://www.w3.org/2001/04/xmldsig-more#md5", "MD5", false}};

/// As the wire has it, and the form that is computed. A reference never sees comments.
struct CanonicalRow {
  const char* uri;  ///< Empty: none is named.
  const char* forInfo;
  const char* forReference;
};

constexpr CanonicalRow kCanonicalMethods[] = {
    {Pelmar::Xml::Security::kExclusiveC14n, Pelmar::Xml::Security::kExclusiveC14n,
     Pelmar::Xml::Security::kExclusiveC14n},
    {"http://www.w3.org/TR/2001/REC-xml-c14n-20010315", Pelmar::Xml::Security::kC14n,
     Pelmar::Xml::Security::kC14n},
    {Pelmar::Xml::Security::kExclusiveC14nWithComments, Pelmar::Xml::Security::kExclusiveC14nWithComments,
     Pelmar::Xml::Security::kExclusiveC14n},
    {Pelmar::Xml::Security::kC14nWithComments, Pelmar::Xml::Security::kC14nWithComments,
     Pelmar::Xml::Security::kC14n},
    {"", Pelmar::Xml::Security::kC14n, Pelmar::Xml::Security::kC14n}};

enum class Cover { BY_ID, WHOLE_DOCUMENT, BY_ID_AND_ELSEWHERE, ELSEWHERE };

struct Signing {
  std::size_t signer = 0;
  std::size_t method = 0;
  std::size_t digest = 0;
  std::size_t infoForm = 0;  ///< Of kCanonicalMethods, as the next.
  std::size_t referenceForm = 0;
  Cover cover = Cover::BY_ID;
  std::string elsewhere;  ///< The ID of an element that is signed too, or instead.
  bool namesKey = false;  ///< KeyInfo also says a name.

  bool IsRight() const {
    return Signers()[signer].isRight && kSignatureMethods[method].isRight && kDigestMethods[digest].isRight &&
           cover != Cover::ELSEWHERE;
  }
};

namespace SignerDetail {

using Bytes = std::vector<unsigned char>;
using Pelmar::Ref;
using Pelmar::Xml::ElementNode;
using Pelmar::Xml::Node;

constexpr const char* kDigestPlace = "{digest}";
constexpr const char* kFurtherDigestPlace = "{further digest}";
constexpr const char* kValuePlace = "{value}";

inline void Check(bool succeeded) {
  if (!succeeded) {
    std::abort();
  }
}

// OpenSSL takes longer to read a key or certificate than to use it, so each is read once.
inline const std::string& CertificateText(const char* pem) {
  static std::map<const char*, std::string> known;
  std::string& text = known[pem];
  if (text.empty()) {
    text = Pelmar::StringUtil::Base64Encode(Pelmar::Crypto::CreateCertificateFromPem(pem)->GetDer());
  }
  return text;
}

inline TreeNode MakeReference(const std::string& uri, const Signing& signing, const char* digestPlace,
                              bool isEnveloped) {
  std::vector<TreeNode> transforms;
  if (isEnveloped) {
    transforms.push_back(
        MakeElement("ds:Transform", {{"Algorithm", Pelmar::Xml::Security::kEnvelopedSignature}}));
  }
  const std::string form = kCanonicalMethods[signing.referenceForm].uri;
  if (!form.empty()) {
    transforms.push_back(MakeElement("ds:Transform", {{"Algorithm", form}}));
  }
  TreeNode reference = MakeElement("ds:Reference", {{"URI", uri}});
  if (!transforms.empty()) {
    reference.children.push_back(MakeElement("ds:Transforms", {}, transforms));
  }
  reference.children.push_back(
      MakeElement("ds:DigestMethod", {{"Algorithm", kDigestMethods[signing.digest].uri}}));
  reference.children.push_back(MakeTextElement("ds:DigestValue", {}, digestPlace));
  return reference;
}

inline TreeNode MakeKeyInfo(const Signing& signing) {
  TreeNode data = MakeElement("ds:X509Data", {});
  for (const char* const pem : Signers()[signing.signer].shownPem) {
    data.children.push_back(MakeTextElement("ds:X509Certificate", {}, CertificateText(pem)));
  }
  TreeNode keyInfo = MakeElement("ds:KeyInfo", {});
  if (signing.namesKey) {
    keyInfo.children.push_back(MakeTextElement("ds:KeyName", {}, "Fuzzing signer"));
  }
  if (!data.children.empty()) {
    keyInfo.children.push_back(data);
  }
  return keyInfo;
}

inline TreeNode MakeSkeleton(const std::string& id, const Signing& signing) {
  const std::string form = kCanonicalMethods[signing.infoForm].uri;
  TreeNode info = MakeElement(
      "ds:SignedInfo", {},
      {MakeElement("ds:CanonicalizationMethod",
                   {{"Algorithm", form.empty() ? Pelmar::Xml::Security::kExclusiveC14n : form}}),
       MakeElement("ds:SignatureMethod", {{"Algorithm", kSignatureMethods[signing.method].uri}})});
  if (signing.cover != Cover::ELSEWHERE) {
    info.children.push_back(
        MakeReference(signing.cover == Cover::WHOLE_DOCUMENT ? "" : "#" + id, signing, kDigestPlace, true));
  }
  if (signing.cover == Cover::ELSEWHERE || signing.cover == Cover::BY_ID_AND_ELSEWHERE) {
    info.children.push_back(MakeReference("#" + signing.elsewhere, signing, kFurtherDigestPlace, false));
  }
  return MakeElement("ds:Signature", {{"xmlns:ds", Pelmar::Xml::Security::kSignatureNamespace}},
                     {info, MakeTextElement("ds:SignatureValue", {}, kValuePlace), MakeKeyInfo(signing)});
}

// --- Values ---

inline Ref<Pelmar::Xml::Document> Parse(const std::string& text) {
  Ref<Pelmar::Object> result;
  const Ref<Pelmar::Reader> reader = Pelmar::CreateStringReader(text);
  Pelmar::Xml::CreateXMLParser(Pelmar::Xml::CreateXMLDocumentHandler())->Parse(reader.Get(), result);
  return Pelmar::Xml::ViewAsDocument(result);
}

template <typename Predicate>
ElementNode* Find(Node* node, Predicate predicate) {
  for (; node != nullptr; node = node->GetNextSibling()) {
    ElementNode* const element = Pelmar::Xml::AsElement(node);
    if (element == nullptr) {
      continue;
    }
    ElementNode* const found = predicate(*element) ? element : Find(element->GetFirstChild(), predicate);
    if (found != nullptr) {
      return found;
    }
  }
  return nullptr;
}

inline ElementNode* FindSignature(const Ref<Pelmar::Xml::Document>& document) {
  ElementNode* const value = Find(document->GetFirstChild(), [](const ElementNode& element) {
    const Pelmar::Xml::TextNode* const text = Pelmar::Xml::AsText(element.GetFirstChild());
    return element.GetLocalName() == "SignatureValue" && text != nullptr && text->GetText() == kValuePlace;
  });
  Check(value != nullptr);
  return Pelmar::Xml::AsElement(static_cast<Node*>(value->GetParent()));
}

inline std::string Canonical(const Node* node, const char* form, const Node* omitted) {
  const Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
  Pelmar::Xml::Security::CreateCanonicalizer(form)->Canonicalize(node, writer.Get(), omitted);
  return writer->GetText();
}

inline std::string Digest(const char* name, const std::string& octets) {
  Bytes digest(EVP_MAX_MD_SIZE);
  unsigned size = 0;
  Check(EVP_Digest(octets.data(), octets.size(), digest.data(), &size, EVP_get_digestbyname(name), nullptr) ==
        1);
  digest.resize(size);
  return Pelmar::StringUtil::Base64Encode(digest);
}

inline EVP_PKEY* ReadKey(const char* pem) {
  static std::map<const char*, std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>> known;
  const auto found = known.find(pem);
  if (found != known.end()) {
    return found->second.get();
  }
  const std::unique_ptr<BIO, decltype(&BIO_free)> input(BIO_new_mem_buf(pem, -1), BIO_free);
  EVP_PKEY* const key = PEM_read_bio_PrivateKey(input.get(), nullptr, nullptr, nullptr);
  Check(key != nullptr);
  known.emplace(pem, std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>(key, EVP_PKEY_free));
  return key;
}

// The two numbers side by side (RFC 4050, section 3.3).
inline Bytes ToRaw(const Bytes& der) {
  constexpr int kOrderBytes = 32;
  const unsigned char* position = der.data();
  const std::unique_ptr<ECDSA_SIG, decltype(&ECDSA_SIG_free)> numbers(
      d2i_ECDSA_SIG(nullptr, &position, static_cast<long>(der.size())), ECDSA_SIG_free);
  Check(numbers != nullptr);
  Bytes raw(kOrderBytes * 2);
  BN_bn2binpad(ECDSA_SIG_get0_r(numbers.get()), raw.data(), kOrderBytes);
  BN_bn2binpad(ECDSA_SIG_get0_s(numbers.get()), raw.data() + kOrderBytes, kOrderBytes);
  return raw;
}

inline Bytes SignWith(const char* keyPem, const char* digest, const std::string& octets) {
  const std::unique_ptr<EVP_MD_CTX, decltype(&EVP_MD_CTX_free)> context(EVP_MD_CTX_new(), EVP_MD_CTX_free);
  Check(EVP_DigestSignInit(context.get(), nullptr, EVP_get_digestbyname(digest), nullptr, ReadKey(keyPem)) ==
        1);
  const auto* const data = reinterpret_cast<const unsigned char*>(octets.data());
  std::size_t size = 0;
  Check(EVP_DigestSign(context.get(), nullptr, &size, data, octets.size()) == 1);
  Bytes value(size);
  Check(EVP_DigestSign(context.get(), value.data(), &size, data, octets.size()) == 1);
  value.resize(size);
  return ToRaw(value);
}

// The secret is what everybody knows: the certificate.
inline Bytes AuthenticateWith(const char* secret, const char* digest, const std::string& octets) {
  Bytes value(EVP_MAX_MD_SIZE);
  unsigned size = 0;
  const std::string key = secret;
  Check(HMAC(EVP_get_digestbyname(digest), key.data(), static_cast<int>(key.size()),
             reinterpret_cast<const unsigned char*>(octets.data()), octets.size(), value.data(),
             &size) != nullptr);
  value.resize(size);
  return value;
}

inline void Replace(TreeNode& tree, const std::string& from, const std::string& to) {
  tree.text = tree.text == from ? to : tree.text;
  for (TreeNode& child : tree.children) {
    Replace(child, from, to);
  }
}

inline void FillDigests(const TreeNode& document, TreeNode& signature, const Signing& signing) {
  const Ref<Pelmar::Xml::Document> parsed = Parse(Write(document));
  const ElementNode* const element = FindSignature(parsed);
  const Node* target = static_cast<const Node*>(element->GetParent());
  if (signing.cover == Cover::WHOLE_DOCUMENT && target == parsed->GetDocumentElement()) {
    target = parsed.Get();
  }
  const char* const form = kCanonicalMethods[signing.referenceForm].forReference;
  const char* const digest = kDigestMethods[signing.digest].digest;
  Replace(signature, kDigestPlace, Digest(digest, Canonical(target, form, element)));
  const ElementNode* const further = Find(parsed->GetFirstChild(), [&signing](const ElementNode& one) {
    std::string value;
    return one.GetAttribute("ID", value) && value == signing.elsewhere;
  });
  Replace(signature, kFurtherDigestPlace,
          Digest(digest, further == nullptr ? "" : Canonical(further, form, nullptr)));
}

inline void FillValue(const TreeNode& document, TreeNode& signature, const Signing& signing) {
  const Ref<Pelmar::Xml::Document> parsed = Parse(Write(document));
  const std::string form = kCanonicalMethods[signing.infoForm].uri;
  const std::string octets = Canonical(
      FindSignature(parsed)->FindChildElement("SignedInfo"),
      form.empty() ? Pelmar::Xml::Security::kExclusiveC14n : kCanonicalMethods[signing.infoForm].forInfo,
      nullptr);
  const char* const digest = kSignatureMethods[signing.method].digest;
  const SignerRow& signer = Signers()[signing.signer];
  const Bytes value = signing.method == kHmacMethod ? AuthenticateWith(kFuzzCertificatePem, digest, octets)
                                                    : SignWith(signer.keyPem, digest, octets);
  Replace(signature, kValuePlace, Pelmar::StringUtil::Base64Encode(value));
}

}  // namespace SignerDetail

/// Makes the signature of `assertion`, an element of the well-formed `document`, as its child `index`. False,
/// and nothing done, when the document cannot be signed (the platform refuses to read or canonicalise it).
inline bool SignTree(TreeNode& document, TreeNode& assertion, std::size_t index, const Signing& signing) {
  using namespace SignerDetail;
  const std::string* const id = FindAttribute(assertion, "ID");
  if (id == nullptr || id->empty()) {
    return false;
  }
  const auto place = assertion.children.begin() + static_cast<std::ptrdiff_t>(index);
  TreeNode& signature = *assertion.children.insert(place, MakeSkeleton(*id, signing));
  try {
    FillDigests(document, signature, signing);
    FillValue(document, signature, signing);
    return true;
  } catch (const Pelmar::Exception&) {
    assertion.children.erase(assertion.children.begin() + static_cast<std::ptrdiff_t>(index));
    return false;
  }
}

}  // namespace TokenFuzz

#endif  // QUORLIN_FUZZ_TOKENSIGNER_H
