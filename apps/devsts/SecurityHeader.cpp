// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/SecurityHeader.h"

#include "devsts/Clock.h"
#include "devsts/Fault.h"
#include "devsts/Uris.h"
#include "devsts/XmlReading.h"

#include <pelmar/StringUtil.h>
#include <pelmar/crypto/CryptoException.h>
#include <pelmar/xml/QName.h>

namespace DevSts {

using Pelmar::Xml::ElementNode;

namespace {

/// A message that asks to be taken as fresh for longer is one that somebody wants to replay.
constexpr long long kMaxMessageLifetime = 60 * 60 * kMicrosecondsPerSecond;

void ReadTimestamp(const ElementNode& timestamp, SecurityHeader& header) {
  RequireChildren(timestamp, kUtilityNs, {"Created", "Expires"});
  header.timestamp = &timestamp;
  header.created = ReadDate(GetOnlyChild(timestamp, kUtilityNs, "Created")).GetUtcTime();
  header.expires = ReadDate(GetOnlyChild(timestamp, kUtilityNs, "Expires")).GetUtcTime();
}

UsernameToken ReadUsernameToken(const ElementNode& token) {
  RequireChildren(token, kSecextNs, {"Username", "Password"});
  const ElementNode& password = GetOnlyChild(token, kSecextNs, "Password");
  if (GetRequiredAttribute(password, "Type") != kPasswordText) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, "Only passwords of type PasswordText are accepted");
  }
  return {GetTextOf(GetOnlyChild(token, kSecextNs, "Username")), Secret(GetTextOf(password))};
}

void ReadBinarySecurityToken(const ElementNode& token, SecurityHeader& header) {
  if (GetRequiredAttribute(token, "ValueType") != kX509v3 ||
      GetRequiredAttribute(token, "EncodingType") != kBase64Binary) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, "Only X.509 v3 certificates in base64 are accepted");
  }
  token.GetAttribute(Pelmar::Xml::QName(kUtilityNs, "Id"), header.certificateId);
  try {
    header.certificate =
        Pelmar::Crypto::CreateCertificateFromDer(Pelmar::StringUtil::Base64Decode(GetTextOf(token)));
  } catch (const Pelmar::Exception&) {
    throw Fault(FaultCode::INVALID_HEADER_TOKEN, "The BinarySecurityToken holds no certificate");
  }
}

void ReadToken(ElementNode& element, SecurityHeader& header) {
  if (Is(element, kUtilityNs, "Timestamp") && header.timestamp == nullptr) {
    ReadTimestamp(element, header);
  } else if (Is(element, kSecextNs, "UsernameToken") && !header.usernameToken) {
    header.usernameToken = ReadUsernameToken(element);
  } else if (Is(element, kSecextNs, "BinarySecurityToken") && !header.certificate) {
    ReadBinarySecurityToken(element, header);
  } else if (Is(element, kSamlNs, "Assertion") && header.assertion == nullptr) {
    header.assertion = &element;
  } else if (Is(element, kDigitalSignatureNs, "Signature") && header.signature == nullptr) {
    header.signature = &element;
  } else {
    throw Fault(FaultCode::CLIENT,
                "The security header holds an unknown or repeated " + element.GetLocalName());
  }
}

}  // namespace

SecurityHeader ReadSecurityHeader(const ElementNode& security) {
  SecurityHeader header;
  for (ElementNode* const element : GetChildElements(security)) {
    ReadToken(*element, header);
  }
  if (header.timestamp == nullptr) {
    throw Fault(FaultCode::CLIENT, "The security header holds no Timestamp");
  }
  return header;
}

void RequireFresh(const SecurityHeader& header, long long now, long long skew) {
  if (header.created >= header.expires || header.expires - header.created > kMaxMessageLifetime) {
    throw Fault(FaultCode::REQUEST_FAILED, "The message's Timestamp spans no acceptable time");
  }
  if (header.created > now + skew) {
    throw Fault(FaultCode::REQUEST_FAILED, "The message's Timestamp is in the future: check the clocks");
  }
  if (header.expires + skew <= now) {
    throw Fault(FaultCode::REQUEST_FAILED, "The message has expired: check the clocks");
  }
}

}  // namespace DevSts
