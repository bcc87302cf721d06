// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// OpenSAML (with XMLTooling, XML-Security-C and Xerces): the assertion as its own objects, its profile of
// signatures, and its PKIX trust engine over the trusted certificate.

#include "PeerLoop.h"

#include <saml/SAMLConfig.h>
#include <saml/saml2/core/Assertions.h>
#include <saml/signature/SignatureProfileValidator.h>
#include <xmltooling/XMLObjectBuilder.h>
#include <xmltooling/XMLToolingConfig.h>
#include <xmltooling/security/Credential.h>
#include <xmltooling/security/CredentialCriteria.h>
#include <xmltooling/security/CredentialResolver.h>
#include <xmltooling/security/SignatureTrustEngine.h>
#include <xmltooling/signature/Signature.h>
#include <xmltooling/util/ParserPool.h>
#include <xmltooling/util/XMLHelper.h>
#include <xercesc/util/XMLString.hpp>

#include <memory>
#include <sstream>

namespace Peers {

namespace {

using namespace xmltooling;
namespace saml2 = opensaml::saml2;

std::string ToUtf8(const XMLCh* text) {
  const std::unique_ptr<char[]> bytes(toUTF8(text));
  return bytes ? bytes.get() : "";
}

std::unique_ptr<TrustEngine> MakeTrustEngine(const std::string& certificatePath) {
  std::istringstream config("<TrustEngine type=\"StaticPKIX\" checkNames=\"false\" certificate=\"" +
                            certificatePath + "\"/>");
  xercesc::DOMDocument* const document = XMLToolingConfig::getConfig().getParser().parse(config);
  const XercesJanitor<xercesc::DOMDocument> janitor(document);
  return std::unique_ptr<TrustEngine>(XMLToolingConfig::getConfig().TrustEngineManager.newPlugin(
      STATIC_PKIX_TRUSTENGINE, document->getDocumentElement(), false));
}

std::unique_ptr<XMLObject> Parse(const std::string& text) {
  std::istringstream stream(text);
  xercesc::DOMDocument* const document = XMLToolingConfig::getConfig().getParser().parse(stream);
  XercesJanitor<xercesc::DOMDocument> janitor(document);
  std::unique_ptr<XMLObject> object(
      XMLObjectBuilder::buildOneFromElement(document->getDocumentElement(), true));
  janitor.release();
  return object;
}

Findings ReadFindings(const saml2::Assertion& assertion, const std::string& groupAttribute) {
  Require(assertion.getSubject() != nullptr && assertion.getSubject()->getNameID() != nullptr, "no subject");
  Findings findings;
  findings.subject = ToUtf8(assertion.getSubject()->getNameID()->getName());
  for (const saml2::AttributeStatement* const statement : assertion.getAttributeStatements()) {
    for (const saml2::Attribute* const attribute : statement->getAttributes()) {
      if (ToUtf8(attribute->getName()) != groupAttribute) {
        continue;
      }
      for (const XMLObject* const value : attribute->getAttributeValues()) {
        findings.groups.push_back(ToUtf8(value->getTextContent()));
      }
    }
  }
  return findings;
}

class Validator final {
 public:
  Validator(const std::string& groupAttribute, const std::vector<std::string>& trusted)
      : _groupAttribute(groupAttribute) {
    XMLToolingConfig::getConfig().log_config("FATAL");
    Require(opensaml::SAMLConfig::getConfig().init(), "OpenSAML cannot be set up");
    _noCredentials.reset(XMLToolingConfig::getConfig().CredentialResolverManager.newPlugin(
        DUMMY_CREDENTIAL_RESOLVER, nullptr, false));
    for (const std::string& path : trusted) {
      _engines.push_back(MakeTrustEngine(path));
    }
  }

  Findings Validate(const std::string& text, std::size_t which) const {
    const std::unique_ptr<XMLObject> object = Parse(text);
    const auto* const assertion = dynamic_cast<const saml2::Assertion*>(object.get());
    Require(assertion != nullptr && assertion->getSignature() != nullptr, "not a signed assertion");
    opensaml::SignatureProfileValidator().validateSignature(*assertion->getSignature());
    const auto* const engine = dynamic_cast<const SignatureTrustEngine*>(_engines.at(which).get());
    CredentialCriteria criteria;
    criteria.setUsage(Credential::SIGNING_CREDENTIAL);
    Require(engine != nullptr && engine->validate(*assertion->getSignature(), *_noCredentials, &criteria),
            "the signature does not verify");
    return ReadFindings(*assertion, _groupAttribute);
  }

 private:
  const std::string _groupAttribute;
  std::unique_ptr<CredentialResolver> _noCredentials;
  std::vector<std::unique_ptr<TrustEngine>> _engines;
};

}  // namespace

}  // namespace Peers

int main(int count, char** arguments) {
  return Peers::RunPeer<Peers::Validator>("OpenSAML " QUORLIN_PEER_VERSION, count, arguments);
}
