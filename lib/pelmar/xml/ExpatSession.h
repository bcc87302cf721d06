// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// One run of expat over one document.

#ifndef PELMAR_XML_EXPATSESSION_H
#define PELMAR_XML_EXPATSESSION_H

#include "pelmar/xml/ExpatHandle.h"
#include "pelmar/xml/NamespaceChecker.h"
#include "pelmar/xml/TextPlace.h"

#include <pelmar/xml/Parser.h>

#include <cstddef>
#include <exception>
#include <string>
#include <string_view>
#include <vector>

namespace Pelmar {
namespace Xml {

/// Feeds a text to expat and hands the events on to an `XMLHandler`, after it has checked limits and
/// namespaces.
///
/// No exception may pass through expat's C frames: each callback keeps what was thrown and stops the parser,
/// and `Run` throws it again.
class ExpatSession final {
 public:
  /// `handler` and `text`, the whole document, must outlive the session.
  ExpatSession(XMLHandler* handler, std::string_view text);
  ExpatSession(const ExpatSession&) = delete;
  ExpatSession& operator=(const ExpatSession&) = delete;

  /// Parses the document. Called once. Throws XMLParseException and what the handler throws.
  void Run();

 private:
  template <typename Action>
  void Guard(Action action) noexcept;
  [[noreturn]] void Refuse(const std::string& reason) const;
  [[noreturn]] void ThrowParserError() const;
  void CountNodes(std::size_t count);

  void StartElement(const char* name, const char* const* attributes);
  void TakeAttributes(const char* const* attributes);
  void EndElement();
  void ProcessingInstruction(const char* target, const char* data);
  void XmlDeclaration(const char* version, const char* encoding) const;

  static ExpatSession* Self(void* userData) noexcept;
  static void XMLCALL OnStartElement(void* userData, const XML_Char* name, const XML_Char** attributes);
  static void XMLCALL OnEndElement(void* userData, const XML_Char* name);
  static void XMLCALL OnCharacters(void* userData, const XML_Char* text, int size);
  static void XMLCALL OnComment(void* userData, const XML_Char* text);
  static void XMLCALL OnProcessingInstruction(void* userData, const XML_Char* target, const XML_Char* data);
  static void XMLCALL OnXmlDeclaration(void* userData, const XML_Char* version, const XML_Char* encoding,
                                       int standalone);
  static void XMLCALL OnOtherMarkup(void* userData, const XML_Char* text, int size);
  static void XMLCALL OnDoctypeEnd(void* userData);
  static void XMLCALL OnSkippedEntity(void* userData, const XML_Char* name, int isParameterEntity);
  static int XMLCALL OnExternalEntity(XML_Parser parser, const XML_Char* context, const XML_Char* base,
                                      const XML_Char* systemId, const XML_Char* publicId);

  ExpatHandle _parser;
  XMLHandler* _handler;
  std::string_view _text;
  TextPlace _place;
  NamespaceChecker _namespaces;
  std::vector<AttributeRange> _attributes;  // Of the start tag at hand.
  // For each open element, how many attributes were in scope outside it.
  std::vector<std::size_t> _outerAttributes;
  std::size_t _attributesInScope = 0;
  std::size_t _nodes = 0;
  std::exception_ptr _failure;
};

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_EXPATSESSION_H
