// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The frame of a request: SOAP 1.1, section 4.

#ifndef QUORLIN_DEVSTS_SOAPMESSAGE_H
#define QUORLIN_DEVSTS_SOAPMESSAGE_H

#include <pelmar/Ref.h>
#include <pelmar/xml/Node.h>

#include <string>

namespace DevSts {

/// A request's tree and the places in it that matter. The pointers live as long as the document.
struct SoapMessage {
  Pelmar::Ref<Pelmar::Xml::Document> document;
  Pelmar::Xml::ElementNode* envelope = nullptr;
  Pelmar::Xml::ElementNode* security = nullptr;  ///< The wsse:Security header.
  Pelmar::Xml::ElementNode* body = nullptr;
  Pelmar::Xml::ElementNode* request = nullptr;  ///< The one element in the body.
};

/// Reads an envelope of exactly one header, in which exactly one wsse:Security stands, and one body with one
/// element. Other header blocks are passed over unless they must be understood (SOAP 1.1, section 4.2.3).
/// Throws Fault.
SoapMessage ReadSoapMessage(const std::string& text);

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_SOAPMESSAGE_H
