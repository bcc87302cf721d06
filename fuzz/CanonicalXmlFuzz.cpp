// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A document has a canonical form or is refused with XmlSecurityException. The canonical form is its own
// canonical form, and, where libxml2 is linked (QUORLIN_FUZZ_LIBXML2), equals libxml2's byte for byte.

#include <pelmar/Reader.h>
#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Canonicalizer.h>
#include <pelmar/xml/security/Exceptions.h>

#ifdef QUORLIN_FUZZ_LIBXML2
#include <libxml/c14n.h>
#include <libxml/parser.h>
#include <libxml/xmlerror.h>
#endif

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>

namespace {

using namespace Pelmar;
using namespace Pelmar::Xml;

void Require(bool holds) {
  if (!holds) {
    std::abort();
  }
}

Ref<Document> Parse(const std::string& text) {
  Ref<Object> result;
  CreateXMLParser(CreateXMLDocumentHandler())->Parse(CreateStringReader(text).Get(), result);
  return ViewAsDocument(result);
}

std::string Canonical(const Document* document, const char* algorithm) {
  const Ref<StringWriter> writer = CreateStringWriter();
  Security::CreateCanonicalizer(algorithm)->Canonicalize(document, writer.Get());
  return writer->GetText();
}

#ifdef QUORLIN_FUZZ_LIBXML2

using OracleDocument = std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)>;

void IgnoreError(void*, const char*, ...) {}

// Null where libxml2 sees no document: it knows fewer names, and complains of more, than expat does. That is
// no matter of canonical form.
OracleDocument ParseWithOracle(const std::string& text) {
  xmlSetGenericErrorFunc(nullptr, IgnoreError);
  const int options = XML_PARSE_NOERROR | XML_PARSE_NOWARNING | XML_PARSE_NONET | XML_PARSE_HUGE;
  return OracleDocument(xmlReadMemory(text.data(), static_cast<int>(text.size()), nullptr, nullptr, options),
                        xmlFreeDoc);
}

// libxml2 2.9 takes "&amp;" in a namespace URI for "&#38;", which is wrong.
bool HasNamespaceWithAmpersand(const Node* node) {
  const ElementNode* const element = AsElement(node);
  if (element != nullptr) {
    for (const Attribute& attribute : element->GetAttributes()) {
      if (attribute.name.compare(0, 5, "xmlns") == 0 && attribute.value.find('&') != std::string::npos) {
        return true;
      }
    }
  }
  for (const Node* child = node->GetFirstChild(); child != nullptr; child = child->GetNextSibling()) {
    if (HasNamespaceWithAmpersand(child)) {
      return true;
    }
  }
  return false;
}

void CompareWithOracle(const std::string& text, const Document* document, bool exclusive, bool withComments,
                       const std::string& expected) {
  const OracleDocument oracle = ParseWithOracle(text);
  if (!oracle || HasNamespaceWithAmpersand(document)) {
    return;
  }
  xmlChar* result = nullptr;
  const int size =
      xmlC14NDocDumpMemory(oracle.get(), nullptr, exclusive ? XML_C14N_EXCLUSIVE_1_0 : XML_C14N_1_0, nullptr,
                           withComments ? 1 : 0, &result);
  if (size < 0) {
    return;  // It also refuses namespace names that are no URI references, such as "a:<".
  }
  const std::string theirs(reinterpret_cast<const char*>(result), static_cast<std::size_t>(size));
  xmlFree(result);
  Require(theirs == expected);
}

#else

void CompareWithOracle(const std::string&, const Document*, bool, bool, const std::string&) {}

#endif

void CheckForm(const std::string& text, const Document* document, const char* algorithm, bool exclusive,
               bool withComments) {
  const std::string canonical = Canonical(document, algorithm);
  if (canonical.size() <= kMaxDocumentBytes) {
    Require(Canonical(Parse(canonical).Get(), algorithm) == canonical);
  }
  CompareWithOracle(text, document, exclusive, withComments, canonical);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string text(data, data + size);
  Ref<Document> document;
  try {
    document = Parse(text);
  } catch (const XMLParseException&) {
    return 0;
  }
  try {
    CheckForm(text, document.Get(), Security::kC14n, false, false);
    CheckForm(text, document.Get(), Security::kC14nWithComments, false, true);
    CheckForm(text, document.Get(), Security::kExclusiveC14n, true, false);
    CheckForm(text, document.Get(), Security::kExclusiveC14nWithComments, true, true);
  } catch (const Security::XmlSecurityException&) {
    return 0;
  }
  return 0;
}
