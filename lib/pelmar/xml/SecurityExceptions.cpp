// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/xml/security/Exceptions.h>

namespace Pelmar {
namespace Xml {
namespace Security {

XmlSecurityException::XmlSecurityException(const std::string& message) : Exception(message) {}

XmlSecurityException::XmlSecurityException(const XmlSecurityException& other) = default;

XmlSecurityException::~XmlSecurityException() noexcept = default;

Exception* XmlSecurityException::Clone() const {
  return new XmlSecurityException(*this);
}

void XmlSecurityException::Throw() const {
  throw XmlSecurityException(*this);
}

SignatureSyntaxException::SignatureSyntaxException(const std::string& message)
    : XmlSecurityException(message) {}

SignatureSyntaxException::SignatureSyntaxException(const SignatureSyntaxException& other) = default;

SignatureSyntaxException::~SignatureSyntaxException() noexcept = default;

Exception* SignatureSyntaxException::Clone() const {
  return new SignatureSyntaxException(*this);
}

void SignatureSyntaxException::Throw() const {
  throw SignatureSyntaxException(*this);
}

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar
