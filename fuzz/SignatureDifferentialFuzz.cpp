// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Two readings of one signature, ours and (QUORLIN_FUZZ_XMLSEC) that of xmlsec1's library over libxml2's
// tree:
// - what we accept, xmlsec1 accepts;
// - what we find false, xmlsec1 does not find true.
// We refuse more than xmlsec1, always with an exception; docs/security.md says what and why.
//
// An input is a document; or, when it begins with a byte below 0x20, four bytes of instructions and a
// document that is signed first by the trusted key and then perhaps changed in one byte.

#include "SignatureFuzzKey.h"

#include <pelmar/Reader.h>
#include <pelmar/StringUtil.h>
#include <pelmar/Writer.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/PrivateKey.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>
#include <pelmar/xml/security/KeyInfoResolver.h>
#include <pelmar/xml/security/Signature.h>

#ifdef QUORLIN_FUZZ_XMLSEC
#include <libxml/parser.h>
#include <libxml/uri.h>
#include <libxml/xmlerror.h>
#include <xmlsec/crypto.h>
#include <xmlsec/errors.h>
#include <xmlsec/keysmngr.h>
#include <xmlsec/xmldsig.h>
#include <xmlsec/xmlsec.h>
#include <xmlsec/xmltree.h>
#endif

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <memory>
#include <string>

namespace {

using namespace Pelmar::Xml;
using namespace Pelmar::Xml::Security;
using Pelmar::Ref;

enum class Verdict { ACCEPTED, FALSE, REFUSED };

// --- Ours ---

Ref<Document> Parse(const std::string& text) {
  Ref<Pelmar::Object> result;
  const Ref<Pelmar::Reader> reader = Pelmar::CreateStringReader(text);
  CreateXMLParser(CreateXMLDocumentHandler())->Parse(reader.Get(), result);
  return ViewAsDocument(result);
}

const Ref<const Pelmar::Crypto::Certificate>& GetSigner() {
  static const Ref<const Pelmar::Crypto::Certificate> signer =
      Pelmar::Crypto::CreateCertificateFromPem(kFuzzCertificatePem);
  return signer;
}

/// The signature is the first ds:Signature among the root's children, for both readers.
Verdict JudgeByOurs(const std::string& text) {
  static const Ref<KeyInfoResolver> resolver = CreateTrustChainKeyResolver({GetSigner()});
  try {
    const Ref<Document> document = Parse(text);
    ElementNode* const root = document->GetDocumentElement();
    ElementNode* const element = root->FindChildElement(kSignatureNamespace, "Signature");
    if (element == nullptr) {
      return Verdict::REFUSED;
    }
    Ref<Signature> signature;
    CreateSignatureFromDom(root, element, signature);
    return signature->Verify(resolver.Get()) ? Verdict::ACCEPTED : Verdict::FALSE;
  } catch (const XMLParseException&) {
  } catch (const XmlSecurityException&) {
  }
  return Verdict::REFUSED;
}

// --- Signing ---

template <typename T, std::size_t size>
const T& Pick(const T (&table)[size], unsigned number) {
  return table[number % size];
}

constexpr const char* kMethods[] = {kEcdsaSha256, kEcdsaSha384, kEcdsaSha512};
constexpr const char* kDigests[] = {kSha256, kSha384, kSha512};
constexpr const char* kInfoForms[] = {kExclusiveC14n, kExclusiveC14nWithComments};
/// Not kC14n: what a maker writes for it, and xmlsec1 reads, is the URI without its "#".
constexpr const char* kReferenceForms[] = {kExclusiveC14n, kC14n, kExclusiveC14nWithComments,
                                           kC14nWithComments};

Ref<ElementNode> MakeKeyInfo() {
  const Ref<Document> document =
      Parse(std::string("<ds:X509Data xmlns:ds=\"") + kSignatureNamespace + "\"><ds:X509Certificate>" +
            Pelmar::StringUtil::Base64Encode(GetSigner()->GetDer()) + "</ds:X509Certificate></ds:X509Data>");
  return Ref<ElementNode>(document->GetDocumentElement());
}

/// The document with a signature in it, as the instructions have it; empty when it cannot be signed.
std::string Sign(const std::uint8_t* instructions, const std::string& text) {
  static const Ref<const Pelmar::Crypto::PrivateKey> key =
      Pelmar::Crypto::CreatePrivateKeyFromPem(kFuzzKeyPem);
  const unsigned how = instructions[1];
  try {
    const Ref<Document> document = Parse(text);
    ElementNode* const root = document->GetDocumentElement();
    std::string id;
    root->GetAttribute("ID", id);
    Ref<Signature> signature;
    CreateBlankSignature(root, Pick(kInfoForms, how / 128), Pick(kMethods, how), "ds", signature);
    const Ref<SignatureReference> reference =
        signature->AddReference((how & 64) == 0 || id.empty() ? "" : "#" + id, Pick(kDigests, how / 4));
    reference->AddTransform(kEnvelopedSignature);
    if ((instructions[0] & 8) == 0) {
      reference->AddTransform(Pick(kReferenceForms, how / 16));
    }
    signature->SetKeyInfo(MakeKeyInfo());
    signature->Sign(key.Get());
    root->AppendChild(signature->GetElement());
    const Ref<Pelmar::StringWriter> writer = Pelmar::CreateStringWriter();
    root->WriteXml(writer.Get());
    return writer->GetText();
  } catch (const XMLParseException&) {
  } catch (const XmlSecurityException&) {
  }
  return std::string();
}

std::string ReadInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::size_t kInstructionBytes = 4;
  if (size < kInstructionBytes || data[0] >= 0x20) {
    return std::string(data, data + size);
  }
  std::string text = Sign(data, std::string(data + kInstructionBytes, data + size));
  if (!text.empty() && (data[0] & 1) != 0) {
    text[(data[2] * 16u) % text.size()] = static_cast<char>(data[3]);
  }
  return text;
}

// --- xmlsec1's ---

#ifdef QUORLIN_FUZZ_XMLSEC

constexpr const char* kUriCharacters =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-._~:/?#@!$'()*+,;=";

constexpr const char* kIdCharacters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789-._";

void IgnoreXmlError(void*, const char*, ...) {}

void IgnoreSecurityError(const char*, int, const char*, const char*, const char*, int, const char*) {}

void Require(bool holds) {
  if (!holds) {
    std::cerr << "xmlsec1 cannot be set up" << std::endl;
    std::abort();
  }
}

/// The library, with the signer trusted.
xmlSecKeysMngrPtr GetManager() {
  static const xmlSecKeysMngrPtr manager = [] {
    xmlSetGenericErrorFunc(nullptr, IgnoreXmlError);
    Require(xmlSecInit() == 0 && xmlSecCryptoAppInit(nullptr) == 0 && xmlSecCryptoInit() == 0);
    xmlSecErrorsSetCallback(IgnoreSecurityError);
    const xmlSecKeysMngrPtr made = xmlSecKeysMngrCreate();
    Require(made != nullptr && xmlSecCryptoAppDefaultKeysMngrInit(made) == 0);
    Require(xmlSecCryptoAppKeysMngrCertLoadMemory(made,
                                                  reinterpret_cast<const xmlSecByte*>(kFuzzCertificatePem),
                                                  static_cast<xmlSecSize>(std::strlen(kFuzzCertificatePem)),
                                                  xmlSecKeyDataFormatPem, xmlSecKeyDataTypeTrusted) == 0);
    return made;
  }();
  return manager;
}

// Style sheets and paths would only fuzz other libraries, and keys that nobody certified are not to be taken.
void Narrow(xmlSecDSigCtxPtr context) {
  context->enabledReferenceUris = xmlSecTransformUriTypeEmpty | xmlSecTransformUriTypeSameDocument;
  context->keyInfoReadCtx.flags |= XMLSEC_KEYINFO_FLAGS_DONT_STOP_ON_KEY_FOUND;
  Require(xmlSecPtrListAdd(&context->keyInfoReadCtx.enabledKeyData,
                           const_cast<_xmlSecKeyDataKlass*>(xmlSecKeyDataX509Id)) == 0);
  for (const xmlSecTransformId transform :
       {xmlSecTransformEnvelopedId, xmlSecTransformInclC14NId, xmlSecTransformInclC14NWithCommentsId,
        xmlSecTransformExclC14NId, xmlSecTransformExclC14NWithCommentsId, xmlSecTransformSha256Id,
        xmlSecTransformSha384Id, xmlSecTransformSha512Id, xmlSecTransformSha1Id}) {
    Require(xmlSecDSigCtxEnableReferenceTransform(context, transform) == 0);
  }
}

/// REFUSED is all that is neither true nor false, also where libxml2 sees no document.
Verdict JudgeByTheirs(const std::string& text) {
  const xmlSecKeysMngrPtr manager = GetManager();
  const int options = XML_PARSE_NOERROR | XML_PARSE_NOWARNING | XML_PARSE_NONET | XML_PARSE_HUGE;
  const std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)> document(
      xmlReadMemory(text.data(), static_cast<int>(text.size()), nullptr, nullptr, options), xmlFreeDoc);
  if (!document) {
    return Verdict::REFUSED;
  }
  const xmlNodePtr root = xmlDocGetRootElement(document.get());
  const xmlNodePtr element = xmlSecFindChild(root, xmlSecNodeSignature, xmlSecDSigNs);
  if (element == nullptr) {
    return Verdict::REFUSED;
  }
  const xmlChar* ids[] = {BAD_CAST "ID", BAD_CAST "Id", nullptr};
  xmlSecAddIDs(document.get(), root, ids);
  const std::unique_ptr<xmlSecDSigCtx, decltype(&xmlSecDSigCtxDestroy)> context(xmlSecDSigCtxCreate(manager),
                                                                                xmlSecDSigCtxDestroy);
  Require(context != nullptr);
  Narrow(context.get());
  if (xmlSecDSigCtxVerify(context.get(), element) != 0) {
    return Verdict::REFUSED;
  }
  return context->status == xmlSecDSigStatusSucceeded ? Verdict::ACCEPTED : Verdict::FALSE;
}

/// In an ID xmlsec1 takes what XML Schema has as xs:ID, an NCName (in ASCII here); we compare any two texts.
bool IsPlainId(const std::string& value) {
  return value.find_first_not_of(kIdCharacters) == std::string::npos &&
         (value.empty() || std::strchr("-.0123456789", value.front()) == nullptr);
}

/// libxml2 2.9 writes some namespace URIs otherwise than Canonical XML 1.0 has it: it leaves white space and
/// "<" in them as they are, takes "&amp;" for "&#38;", and canonicalises no document with a URI that is
/// relative, or that its own parser does not read.
bool IsPlainUri(const std::string& text) {
  if (text.empty() || text.find_first_not_of(kUriCharacters) != std::string::npos) {
    return text.empty();
  }
  const std::unique_ptr<xmlURI, decltype(&xmlFreeURI)> uri(xmlParseURI(text.c_str()), xmlFreeURI);
  return uri != nullptr && uri->scheme != nullptr;
}

bool HasPlainTexts(const Node* node) {
  if (const ElementNode* const element = AsElement(node)) {
    for (const Attribute& attribute : element->GetAttributes()) {
      const bool isDeclaration = attribute.name.compare(0, 5, "xmlns") == 0;
      const bool isId = attribute.name == "ID" || attribute.name == "Id";
      if ((isDeclaration && !IsPlainUri(attribute.value)) || (isId && !IsPlainId(attribute.value))) {
        return false;
      }
    }
  }
  for (const Node* child = node->GetFirstChild(); child != nullptr; child = child->GetNextSibling()) {
    if (!HasPlainTexts(child)) {
      return false;
    }
  }
  return true;
}

/// Whether libxml2 can be asked at all. It also reads fewer names than expat.
bool CanBeReadByTheirs(const std::string& text) {
  const int options = XML_PARSE_NOERROR | XML_PARSE_NOWARNING | XML_PARSE_NONET | XML_PARSE_HUGE;
  const std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)> document(
      xmlReadMemory(text.data(), static_cast<int>(text.size()), nullptr, nullptr, options), xmlFreeDoc);
  return document != nullptr && HasPlainTexts(Parse(text).Get());
}

void Compare(const std::string& text, Verdict ours) {
  const Verdict theirs = JudgeByTheirs(text);
  const bool areAtOdds = ours == Verdict::ACCEPTED ? theirs != Verdict::ACCEPTED && CanBeReadByTheirs(text)
                                                   : ours == Verdict::FALSE && theirs == Verdict::ACCEPTED &&
                                                         CanBeReadByTheirs(text);
  if (areAtOdds) {
    std::cerr << (ours == Verdict::ACCEPTED ? "broken: we accept what xmlsec1 does not\n"
                                            : "broken: xmlsec1 accepts what we find false\n")
              << text << std::endl;
    std::abort();
  }
}

#else

void Compare(const std::string& /*text*/, Verdict /*ours*/) {}

#endif

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string text = ReadInput(data, size);
  const Verdict ours = JudgeByOurs(text);
  if (ours != Verdict::REFUSED) {
    Compare(text, ours);
  }
  return 0;
}
