// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Lasso: the assertion as its own object, and the signature against the key of a provider that is known by
// its metadata. It reads the certificate once, then, and looks at no chain.

#include "PeerLoop.h"

// Before Lasso's headers, which include it inside of extern "C".
#include <libxml/tree.h>

#include <lasso/lasso.h>
#include <lasso/xml/misc_text_node.h>
#include <lasso/xml/saml-2.0/saml2_assertion.h>
#include <lasso/xml/saml-2.0/saml2_attribute.h>
#include <lasso/xml/saml-2.0/saml2_attribute_statement.h>
#include <lasso/xml/saml-2.0/saml2_attribute_value.h>

#include <memory>

namespace Peers {

namespace {

struct ObjectDeleter {
  void operator()(void* object) const noexcept { g_object_unref(object); }
};

using ProviderPointer = std::unique_ptr<LassoProvider, ObjectDeleter>;
using NodePointer = std::unique_ptr<LassoNode, ObjectDeleter>;

/// The text between the armour lines of a PEM file.
std::string GetBase64(const std::string& pem) {
  const std::size_t begin = pem.find('\n') + 1;
  return pem.substr(begin, pem.find("-----END") - begin);
}

ProviderPointer MakeProvider(const std::string& certificatePath) {
  const std::string metadata =
      "<EntityDescriptor xmlns=\"urn:oasis:names:tc:SAML:2.0:metadata\" entityID=\"https://sts.example/\">"
      "<IDPSSODescriptor protocolSupportEnumeration=\"urn:oasis:names:tc:SAML:2.0:protocol\">"
      "<KeyDescriptor use=\"signing\"><KeyInfo xmlns=\"http://www.w3.org/2000/09/xmldsig#\"><X509Data>"
      "<X509Certificate>" +
      GetBase64(ReadFile(certificatePath)) +
      "</X509Certificate></X509Data></KeyInfo></KeyDescriptor>"
      "<SingleSignOnService Binding=\"urn:oasis:names:tc:SAML:2.0:bindings:SOAP\" "
      "Location=\"https://sts.example/\"/></IDPSSODescriptor></EntityDescriptor>";
  ProviderPointer provider(
      lasso_provider_new_from_buffer(LASSO_PROVIDER_ROLE_IDP, metadata.c_str(), nullptr, nullptr));
  Require(provider != nullptr, "the trusted certificate cannot be loaded");
  return provider;
}

std::string GetText(const LassoSaml2AttributeValue* value) {
  std::string text;
  for (const GList* item = value->any; item != nullptr; item = item->next) {
    if (LASSO_IS_MISC_TEXT_NODE(item->data)) {
      text += LASSO_MISC_TEXT_NODE(item->data)->content;
    }
  }
  return text;
}

Findings ReadFindings(const LassoSaml2Assertion* assertion, const std::string& groupAttribute) {
  Require(assertion->Subject != nullptr && assertion->Subject->NameID != nullptr, "no subject");
  Findings findings;
  findings.subject = assertion->Subject->NameID->content;
  for (const GList* statement = assertion->AttributeStatement; statement != nullptr;
       statement = statement->next) {
    for (const GList* item = LASSO_SAML2_ATTRIBUTE_STATEMENT(statement->data)->Attribute; item != nullptr;
         item = item->next) {
      const LassoSaml2Attribute* const attribute = LASSO_SAML2_ATTRIBUTE(item->data);
      if (attribute->Name != groupAttribute) {
        continue;
      }
      for (const GList* value = attribute->AttributeValue; value != nullptr; value = value->next) {
        findings.groups.push_back(GetText(LASSO_SAML2_ATTRIBUTE_VALUE(value->data)));
      }
    }
  }
  return findings;
}

class Validator final {
 public:
  Validator(const std::string& groupAttribute, const std::vector<std::string>& trusted)
      : _groupAttribute(groupAttribute) {
    Require(lasso_init() == 0, "lasso cannot be set up");
    // What it refuses it would tell on the standard error.
    g_log_set_default_handler([](const gchar*, GLogLevelFlags, const gchar*, gpointer) {}, nullptr);
    for (const std::string& path : trusted) {
      _providers.push_back(MakeProvider(path));
    }
  }

  Findings Validate(const std::string& text, std::size_t which) const {
    const NodePointer node(lasso_node_new_from_dump(text.c_str()));
    Require(node && LASSO_IS_SAML2_ASSERTION(node.get()), "not an assertion");
    Require(lasso_provider_verify_single_node_signature(_providers.at(which).get(), node.get(), "ID") == 0,
            "the signature does not verify");
    return ReadFindings(LASSO_SAML2_ASSERTION(node.get()), _groupAttribute);
  }

 private:
  const std::string _groupAttribute;
  std::vector<ProviderPointer> _providers;
};

}  // namespace

}  // namespace Peers

int main(int count, char** arguments) {
  return Peers::RunPeer<Peers::Validator>("Lasso " QUORLIN_PEER_VERSION, count, arguments);
}
