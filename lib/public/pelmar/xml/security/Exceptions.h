// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// What the XML security layer raises.

#ifndef PELMAR_XML_SECURITY_EXCEPTIONS_H
#define PELMAR_XML_SECURITY_EXCEPTIONS_H

#include <pelmar/Exception.h>
#include <pelmar/Export.h>

#include <string>

namespace Pelmar {
namespace Xml {
namespace Security {

/// A signature cannot be judged or made: unknown algorithm, no acceptable key, an untrusted chain, a
/// canonicalisation failure.
class PELMAR_API XmlSecurityException : public Exception {
 public:
  explicit XmlSecurityException(const std::string& message);
  XmlSecurityException(const XmlSecurityException& other);
  ~XmlSecurityException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

/// A ds:Signature element does not have the structure of XML Signature 1.1, section 4, as far as this
/// platform accepts it.
class PELMAR_API SignatureSyntaxException : public XmlSecurityException {
 public:
  explicit SignatureSyntaxException(const std::string& message);
  SignatureSyntaxException(const SignatureSyntaxException& other);
  ~SignatureSyntaxException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;
};

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SECURITY_EXCEPTIONS_H
