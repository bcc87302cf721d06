// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/SoapMessage.h"

#include "devsts/Fault.h"
#include "devsts/Uris.h"
#include "devsts/XmlReading.h"

#include <pelmar/xml/QName.h>

#include <vector>

namespace DevSts {

using Pelmar::Xml::ElementNode;

namespace {

void RequireNothingElseUnderstood(const ElementNode& header, const ElementNode& security) {
  for (const ElementNode* const block : GetChildElements(header)) {
    std::string mustUnderstand;
    block->GetAttribute(Pelmar::Xml::QName(kSoapNs, "mustUnderstand"), mustUnderstand);
    if (block != &security && mustUnderstand == "1") {
      throw Fault(FaultCode::CLIENT, "Header " + block->GetLocalName() + " is not understood");
    }
  }
}

}  // namespace

SoapMessage ReadSoapMessage(const std::string& text) {
  SoapMessage message;
  message.document = ParseMessage(text);
  message.envelope = message.document->GetDocumentElement();
  if (!Is(*message.envelope, kSoapNs, "Envelope")) {
    throw Fault(FaultCode::CLIENT, "The request is not a SOAP 1.1 envelope");
  }
  RequireChildren(*message.envelope, kSoapNs, {"Header", "Body"});
  const ElementNode& header = GetOnlyChild(*message.envelope, kSoapNs, "Header");
  message.security = &GetOnlyChild(header, kSecextNs, "Security");
  RequireNothingElseUnderstood(header, *message.security);
  message.body = &GetOnlyChild(*message.envelope, kSoapNs, "Body");
  const std::vector<ElementNode*> requests = GetChildElements(*message.body);
  if (requests.size() != 1) {
    throw Fault(FaultCode::CLIENT, "The body must hold exactly one request");
  }
  message.request = requests.front();
  return message;
}

}  // namespace DevSts
