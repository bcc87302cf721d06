// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/inspect/Claims.h"

#include "quorlin/Terminal.h"
#include "quorlin/inspect/ClaimsReader.h"
#include "quorlin/inspect/SignatureClaims.h"

#include <initializer_list>

namespace Cli {
namespace Inspect {

namespace {

using Pelmar::Xml::ElementNode;
using Elements = std::vector<const ElementNode*>;

constexpr const char* kSignatureNs = "http://www.w3.org/2000/09/xmldsig#";
constexpr const char* kSchemaInstanceNs = "http://www.w3.org/2001/XMLSchema-instance";
/// SAML 2.0 Condition for Delegation Restriction, section 2.2.
constexpr const char* kDelegationNs = "urn:oasis:names:tc:SAML:2.0:conditions:delegation";

Elements GetAllChildren(const ElementNode& element) {
  Elements children;
  for (const Pelmar::Xml::Node* child = element.GetFirstChildNode(); child != nullptr;
       child = child->GetNextSibling()) {
    if (const ElementNode* const childElement = Pelmar::Xml::AsElement(child)) {
      children.push_back(childElement);
    }
  }
  return children;
}

/// Children whose expanded name is none of the SAML names nor the signature's.
Elements GetOthers(const ElementNode& element, std::initializer_list<const char*> knownNames) {
  const std::string samlPrefix = std::string("{") + kSamlNs + "}";
  Elements others;
  for (const ElementNode* const child : GetAllChildren(element)) {
    const std::string name = GetExpandedName(*child);
    bool isKnown = name == std::string("{") + kSignatureNs + "}Signature";
    for (const char* const known : knownNames) {
      isKnown = isKnown || name == samlPrefix + known;
    }
    if (!isKnown) {
      others.push_back(child);
    }
  }
  return others;
}

Json ReadNameId(const ElementNode& nameId) {
  Json json;
  json["value"] = ReadText(nameId);
  AddAttribute(nameId, "Format", "format", json);
  AddAttribute(nameId, "NameQualifier", "nameQualifier", json);
  AddAttribute(nameId, "SPNameQualifier", "spNameQualifier", json);
  return json;
}

/// Reads one assertion; made for it alone.
class Reader final {
 public:
  Json Read(const ElementNode& assertion) {
    Json json;
    AddAttribute(assertion, "ID", "id", json);
    AddAttribute(assertion, "Version", "version", json);
    AddAttribute(assertion, "IssueInstant", "issueInstant", json);
    AddAll(json, "issuers", assertion, "Issuer", ReadNameId);
    _lists.AddList(json, "signatures", GetChildren(assertion, kSignatureNs, "Signature"),
                   [this](const ElementNode& signature) { return ReadSignature(signature, _lists); });
    AddAll(json, "subjects", assertion, "Subject", [this](const ElementNode& e) { return ReadSubject(e); });
    AddAll(json, "conditions", assertion, "Conditions",
           [this](const ElementNode& e) { return ReadConditions(e); });
    AddAll(json, "advice", assertion, "Advice", [this](const ElementNode& e) { return ReadAdvice(e); });
    AddAll(json, "authentication", assertion, "AuthnStatement", ReadAuthentication);
    AddAll(json, "attributeStatements", assertion, "AttributeStatement", [this](const ElementNode& e) {
      Json statement = Json::object();
      AddAll(statement, "attributes", e, "Attribute",
             [this](const ElementNode& a) { return ReadAttribute(a); });
      AddOthers(statement, e, {"Attribute"});
      return statement;
    });
    AddOthers(json, assertion,
              {"Issuer", "Subject", "Conditions", "Advice", "AuthnStatement", "AttributeStatement"});
    return json;
  }

 private:
  void AddAll(Json& json, const std::string& key, const ElementNode& parent, const std::string& localName,
              const std::function<Json(const ElementNode&)>& read) {
    _lists.AddList(json, key, GetChildren(parent, kSamlNs, localName), read);
  }

  void AddOthers(Json& json, const ElementNode& element, std::initializer_list<const char*> knownNames) {
    _lists.AddList(json, "otherElements", GetOthers(element, knownNames), GetExpandedName);
  }

  Json ReadSubject(const ElementNode& subject) {
    Json json = Json::object();
    AddAll(json, "nameIds", subject, "NameID", ReadNameId);
    AddAll(json, "confirmations", subject, "SubjectConfirmation",
           [this](const ElementNode& e) { return ReadConfirmation(e); });
    AddOthers(json, subject, {"NameID", "SubjectConfirmation"});
    return json;
  }

  Json ReadConfirmation(const ElementNode& confirmation) {
    Json json = Json::object();
    AddAttribute(confirmation, "Method", "method", json);
    AddAll(json, "delegateNameIds", confirmation, "NameID", ReadNameId);
    AddAll(json, "data", confirmation, "SubjectConfirmationData",
           [this](const ElementNode& e) { return ReadConfirmationData(e); });
    AddOthers(json, confirmation, {"NameID", "SubjectConfirmationData"});
    return json;
  }

  Json ReadConfirmationData(const ElementNode& data) {
    Json json = Json::object();
    AddAttribute(data, "NotBefore", "notBefore", json);
    AddAttribute(data, "NotOnOrAfter", "notOnOrAfter", json);
    AddAttribute(data, "Recipient", "recipient", json);
    AddAttribute(data, "InResponseTo", "inResponseTo", json);
    AddAttribute(data, "Address", "address", json);
    AddCertificates(data, json, _lists);
    return json;
  }

  Json ReadConditions(const ElementNode& conditions) {
    Json json = Json::object();
    AddAttribute(conditions, "NotBefore", "notBefore", json);
    AddAttribute(conditions, "NotOnOrAfter", "notOnOrAfter", json);
    AddAll(json, "audienceRestrictions", conditions, "AudienceRestriction", [this](const ElementNode& e) {
      Json restriction = Json::object();
      AddAll(restriction, "audiences", e, "Audience", ReadText);
      return restriction;
    });
    AddAll(json, "oneTimeUse", conditions, "OneTimeUse", [](const ElementNode&) { return Json(true); });
    AddAll(json, "proxyRestrictions", conditions, "ProxyRestriction", [this](const ElementNode& e) {
      Json restriction = Json::object();
      AddAttribute(e, "Count", "count", restriction);
      AddAll(restriction, "audiences", e, "Audience", ReadText);
      return restriction;
    });
    AddAll(json, "typedConditions", conditions, "Condition",
           [this](const ElementNode& e) { return ReadTypedCondition(e); });
    AddOthers(json, conditions, {"AudienceRestriction", "OneTimeUse", "ProxyRestriction", "Condition"});
    return json;
  }

  /// The delegation restriction, the vendor's renew restriction, and whatever else has an xsi:type.
  Json ReadTypedCondition(const ElementNode& condition) {
    Json json = Json::object();
    std::string type;
    if (condition.GetAttribute(Pelmar::Xml::QName(kSchemaInstanceNs, "type"), type)) {
      json["type"] = CutText(type, kMaxTextBytesShown);
    }
    AddAttribute(condition, "Count", "count", json);
    _lists.AddList(json, "delegates", GetChildren(condition, kDelegationNs, "Delegate"),
                   [this](const ElementNode& delegate) {
                     Json link = Json::object();
                     AddAttribute(delegate, "DelegationInstant", "instant", link);
                     AddAll(link, "nameIds", delegate, "NameID", ReadNameId);
                     return link;
                   });
    return json;
  }

  /// What the advice holds is for its reader to know; attributes of it are read wherever they are.
  Json ReadAdvice(const ElementNode& advice) {
    Json json = Json::object();
    _lists.AddList(json, "elements", GetAllChildren(advice), [this](const ElementNode& element) {
      Json entry;
      entry["name"] = GetExpandedName(element);
      AddAttribute(element, "AdviceSource", "source", entry);
      _lists.AddList(entry, "attributes", GetAllChildren(element),
                     [this](const ElementNode& e) { return ReadAttribute(e); });
      return entry;
    });
    return json;
  }

  static Json ReadAuthentication(const ElementNode& statement) {
    Json json = Json::object();
    AddAttribute(statement, "AuthnInstant", "instant", json);
    AddAttribute(statement, "SessionNotOnOrAfter", "sessionNotOnOrAfter", json);
    AddAttribute(statement, "SessionIndex", "sessionIndex", json);
    const ElementNode* const context = statement.FindChildElement(kSamlNs, "AuthnContext");
    const ElementNode* const reference =
        context == nullptr ? nullptr : context->FindChildElement(kSamlNs, "AuthnContextClassRef");
    if (reference != nullptr) {
      json["contextClass"] = ReadText(*reference);
    }
    return json;
  }

  Json ReadAttribute(const ElementNode& attribute) {
    Json json = Json::object();
    AddAttribute(attribute, "Name", "name", json);
    AddAttribute(attribute, "FriendlyName", "friendlyName", json);
    AddAttribute(attribute, "NameFormat", "nameFormat", json);
    _lists.AddList(json, "values", GetAllChildren(attribute), ReadText);
    return json;
  }

  ListReader _lists{kMaxEntriesShown};
};

}  // namespace

Json ReadClaims(const ElementNode& assertion) {
  return Reader().Read(assertion);
}

}  // namespace Inspect
}  // namespace Cli
