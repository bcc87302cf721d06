// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Walks over the children of elements of XML Signature, strictly.

#ifndef PELMAR_XML_SIGNATURECHILDREN_H
#define PELMAR_XML_SIGNATURECHILDREN_H

#include <pelmar/xml/Node.h>

#include <initializer_list>
#include <string>
#include <vector>

namespace Pelmar {
namespace Xml {
namespace Security {

/// Throws SignatureSyntaxException: `message` and where `element` stands, if it was parsed.
[[noreturn]] void ThrowSignatureSyntax(const std::string& message, const ElementNode& element);

/// Whether `element` has this namespace and local name.
bool IsElementOf(const ElementNode& element, const char* namespaceUri, const char* localName);

/// The child elements of `parent`, one after the other. White space and comments between them are passed
/// over; other text and processing instructions are refused. Every method throws SignatureSyntaxException.
class SignatureChildren final {
 public:
  explicit SignatureChildren(const ElementNode& parent);

  /// Whether the next element has this name (in the namespace of XML Signature, unless another is given).
  bool IsNext(const char* localName) const;
  bool IsNext(const char* namespaceUri, const char* localName) const;
  /// Takes the next element, which must have this name.
  const ElementNode& Require(const char* localName);
  /// Takes the next element if it has this name; else null.
  const ElementNode* TakeIf(const char* localName);
  const ElementNode* TakeIf(const char* namespaceUri, const char* localName);
  void RequireEnd() const;

 private:
  void MoveToElement(const Node* node);

  const ElementNode& _parent;
  const ElementNode* _next;
};

/// Refuses all attributes but namespace declarations and the `allowed` ones.
void RequireAttributes(const ElementNode& element, std::initializer_list<const char*> allowed);

/// The value of an attribute that must be there.
std::string RequireAttribute(const ElementNode& element, const char* name);

/// The bytes of an element whose only child is a base64 text. A comment or processing instruction in it is
/// refused: readers do not agree on what the text is then.
std::vector<unsigned char> RequireBase64Content(const ElementNode& element);

}  // namespace Security
}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_SIGNATURECHILDREN_H
