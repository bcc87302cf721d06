// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/inspect/SignatureClaims.h"

#include "quorlin/CertificateText.h"
#include "quorlin/XmlFile.h"

#include <pelmar/StringUtil.h>

namespace Cli {
namespace Inspect {

namespace {

using Pelmar::Xml::ElementNode;

constexpr const char* kSignatureNs = "http://www.w3.org/2000/09/xmldsig#";

/// The Algorithm of the first child of this name, as `key`.
void AddAlgorithm(const ElementNode& parent, const std::string& localName, const std::string& key,
                  Json& json) {
  if (const ElementNode* const child = parent.FindChildElement(kSignatureNs, localName)) {
    AddAttribute(*child, "Algorithm", key, json);
  }
}

Json ReadTransform(const ElementNode& transform) {
  Json json = Json::object();
  AddAttribute(transform, "Algorithm", "algorithm", json);
  return json.value("algorithm", Json(""));
}

Json ReadReference(const ElementNode& reference, ListReader& lists) {
  Json json = Json::object();
  AddAttribute(reference, "URI", "uri", json);
  if (const ElementNode* const transforms = reference.FindChildElement(kSignatureNs, "Transforms")) {
    lists.AddList(json, "transforms", GetChildren(*transforms, kSignatureNs, "Transform"), ReadTransform);
  }
  AddAlgorithm(reference, "DigestMethod", "digestMethod", json);
  if (const ElementNode* const digest = reference.FindChildElement(kSignatureNs, "DigestValue")) {
    json["digestValue"] = ReadText(*digest);
  }
  return json;
}

Json ReadCertificate(const ElementNode& element) {
  try {
    return DescribeCertificate(
        *Pelmar::Crypto::CreateCertificateFromDer(Pelmar::StringUtil::Base64Decode(GetAllText(element))));
  } catch (const Pelmar::Exception& e) {
    return {{"unreadable", e.what()}};
  }
}

}  // namespace

Json ReadSignature(const ElementNode& signature, ListReader& lists) {
  Json json = Json::object();
  if (const ElementNode* const info = signature.FindChildElement(kSignatureNs, "SignedInfo")) {
    AddAlgorithm(*info, "CanonicalizationMethod", "canonicalizationMethod", json);
    AddAlgorithm(*info, "SignatureMethod", "signatureMethod", json);
    lists.AddList(json, "references", GetChildren(*info, kSignatureNs, "Reference"),
                  [&lists](const ElementNode& e) { return ReadReference(e, lists); });
  }
  AddCertificates(signature, json, lists);
  return json;
}

void AddCertificates(const ElementNode& parent, Json& json, ListReader& lists) {
  std::vector<const ElementNode*> certificates;
  for (const ElementNode* const keyInfo : GetChildren(parent, kSignatureNs, "KeyInfo")) {
    for (const ElementNode* const data : GetChildren(*keyInfo, kSignatureNs, "X509Data")) {
      const auto found = GetChildren(*data, kSignatureNs, "X509Certificate");
      certificates.insert(certificates.end(), found.begin(), found.end());
    }
  }
  lists.AddList(json, "certificates", certificates, ReadCertificate);
}

}  // namespace Inspect
}  // namespace Cli
