// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The signed document that the tests of signatures share, and how they alter and judge it.

#ifndef QUORLIN_TESTS_PELMAR_SIGNATURESAMPLES_H
#define QUORLIN_TESTS_PELMAR_SIGNATURESAMPLES_H

#include "support/Pki.h"
#include "support/SignatureDocuments.h"

#include <pelmar/Exception.h>
#include <pelmar/xml/security/Algorithms.h>
#include <pelmar/xml/security/Exceptions.h>
#include <pelmar/xml/security/Signature.h>

#include <functional>
#include <stdexcept>
#include <string>

namespace SignatureSamples {

using namespace Pelmar::Xml;
using namespace Pelmar::Xml::Security;
using namespace TestSupport;
using Pelmar::Ref;

inline const std::string kPlain =
    "<a:Assertion xmlns:a=\"urn:a\" ID=\"_1\" a:x=\"&lt;&#10;\"><a:Text>some &amp; text</a:Text><a:Empty>"
    "</a:Empty></a:Assertion>";

inline const Identity& Signer() {
  static const Identity signer = MakeSelfSigned(CertificateSpec());
  return signer;
}

inline const std::string& SignedDocument() {
  static const std::string text = SignDocument(kPlain, Signer());
  return text;
}

inline std::string VerdictOf(const std::string& text) {
  return VerifyDocument(text, Trust({Signer()}));
}

/// `text` with the first occurrence of `from`, which must be there, replaced.
inline std::string Replace(const std::string& text, const std::string& from, const std::string& to) {
  const std::size_t position = text.find(from);
  if (position == std::string::npos) {
    throw std::logic_error("the text to replace is not there: " + from);
  }
  return text.substr(0, position) + to + text.substr(position + from.size());
}

inline std::string Repeat(const std::string& text, std::size_t count) {
  std::string all;
  for (; count > 0; --count) {
    all += text;
  }
  return all;
}

inline std::string RefusalOf(const std::function<void()>& action) {
  try {
    action();
  } catch (const XmlSecurityException& error) {
    return std::string("XmlSecurityException: ") + error.what();
  } catch (const Pelmar::InvalidArgumentException& error) {
    return std::string("InvalidArgumentException: ") + error.what();
  } catch (const Pelmar::InvalidStateException& error) {
    return std::string("InvalidStateException: ") + error.what();
  }
  return "accepted";
}

inline Ref<Signature> MakeBlank(ElementNode* context, const std::string& method = kRsaSha256) {
  Ref<Signature> signature;
  CreateBlankSignature(context, kExclusiveC14n, method, "ds", signature);
  return signature;
}

}  // namespace SignatureSamples

#endif  // QUORLIN_TESTS_PELMAR_SIGNATURESAMPLES_H
