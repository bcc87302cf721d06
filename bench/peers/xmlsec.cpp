// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// libxml2 with libxmlsec1 over OpenSSL, used as its documentation says: the certificate that the signature
// shows must chain to the trusted one, and the signature must be of the whole assertion.

#include "LibxmlTree.h"
#include "PeerLoop.h"

#include <libxml/parser.h>
#include <xmlsec/crypto.h>
#include <xmlsec/errors.h>
#include <xmlsec/xmldsig.h>
#include <xmlsec/xmlsec.h>
#include <xmlsec/xmltree.h>

#include <memory>

namespace Peers {

namespace {

struct XmlsecDeleter {
  void operator()(xmlSecKeysMngr* manager) const noexcept { xmlSecKeysMngrDestroy(manager); }
  void operator()(xmlSecDSigCtx* context) const noexcept { xmlSecDSigCtxDestroy(context); }
};

using ManagerPointer = std::unique_ptr<xmlSecKeysMngr, XmlsecDeleter>;
using ContextPointer = std::unique_ptr<xmlSecDSigCtx, XmlsecDeleter>;

ManagerPointer LoadTrusted(const std::string& path) {
  ManagerPointer manager(xmlSecKeysMngrCreate());
  Require(manager && xmlSecCryptoAppDefaultKeysMngrInit(manager.get()) == 0 &&
              xmlSecCryptoAppKeysMngrCertLoad(manager.get(), path.c_str(), xmlSecKeyDataFormatPem,
                                              xmlSecKeyDataTypeTrusted) == 0,
          "the trusted certificate cannot be loaded");
  return manager;
}

// One reference, to the assertion itself: anything else would be a signature of something else.
void RequireWholeAssertion(xmlSecDSigCtx* context, const xmlNode* assertion) {
  Require(xmlSecPtrListGetSize(&context->signedInfoReferences) == 1, "not one reference");
  const auto* const reference =
      static_cast<xmlSecDSigReferenceCtx*>(xmlSecPtrListGetItem(&context->signedInfoReferences, 0));
  const std::string uri = "#" + GetAttribute(assertion, "ID");
  Require(xmlStrEqual(reference->uri, BAD_CAST uri.c_str()) != 0, "a reference to something else");
}

class Validator final {
 public:
  Validator(const std::string& groupAttribute, const std::vector<std::string>& trusted)
      : _groupAttribute(groupAttribute) {
    xmlInitParser();
    Require(xmlSecInit() == 0 && xmlSecCryptoAppInit(nullptr) == 0 && xmlSecCryptoInit() == 0,
            "xmlsec cannot be set up");
    xmlSecErrorsDefaultCallbackEnableOutput(0);
    for (const std::string& path : trusted) {
      _managers.push_back(LoadTrusted(path));
    }
  }

  Findings Validate(const std::string& text, std::size_t which) const {
    const DocumentPointer document(xmlReadMemory(text.data(), static_cast<int>(text.size()), nullptr, nullptr,
                                                 XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
    Require(document != nullptr, "not well-formed");
    xmlNode* const assertion = xmlDocGetRootElement(document.get());
    Require(IsNamed(assertion, "Assertion"), "not an assertion");
    const xmlChar* const idNames[] = {BAD_CAST "ID", nullptr};
    xmlSecAddIDs(document.get(), assertion, const_cast<const xmlChar**>(idNames));
    xmlNode* const signature = xmlSecFindChild(assertion, xmlSecNodeSignature, xmlSecDSigNs);
    Require(signature != nullptr, "no signature");

    const ContextPointer context(xmlSecDSigCtxCreate(_managers.at(which).get()));
    // Without this a bare key in the token would do.
    Require(
        context && xmlSecPtrListAdd(&context->keyInfoReadCtx.enabledKeyData,
                                    const_cast<void*>(static_cast<const void*>(xmlSecKeyDataX509Id))) == 0,
        "no context");
    Require(
        xmlSecDSigCtxVerify(context.get(), signature) == 0 && context->status == xmlSecDSigStatusSucceeded,
        "the signature does not verify");
    RequireWholeAssertion(context.get(), assertion);
    return ReadFindings(assertion, _groupAttribute);
  }

 private:
  const std::string _groupAttribute;
  std::vector<ManagerPointer> _managers;
};

}  // namespace

}  // namespace Peers

int main(int count, char** arguments) {
  return Peers::RunPeer<Peers::Validator>("libxmlsec1 " XMLSEC_VERSION, count, arguments);
}
