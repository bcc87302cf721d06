// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/ExpatSession.h"

#include "pelmar/xml/SpareExpat.h"

#include <pelmar/StringUtil.h>

#include <cstring>
#include <limits>
#include <utility>

namespace Pelmar {
namespace Xml {

static_assert(kMaxDocumentBytes <= static_cast<std::size_t>(std::numeric_limits<int>::max()),
              "expat takes the size of the text as an int");

namespace {

std::string MoreThan(std::size_t limit, const char* what) {
  return "more than " + std::to_string(limit) + " " + what;
}

TextRange MakeRange(const char* text) noexcept {
  return TextRange{text, std::strlen(text)};
}

NameRange MakeName(const char* text) noexcept {
  const TextRange range = MakeRange(text);
  const void* const colon = std::memchr(text, ':', range.size);
  return NameRange{
      range, colon == nullptr ? 0 : static_cast<std::size_t>(static_cast<const char*>(colon) - text) + 1};
}

}  // namespace

ExpatSession::ExpatSession(XMLHandler* handler, std::string_view text)
    : _parser(TakeExpat()), _handler(handler), _text(text), _place(text) {
  constexpr std::size_t kUsualAttributes = 8;
  constexpr std::size_t kUsualDepth = 16;
  _attributes.reserve(kUsualAttributes);
  _outerAttributes.reserve(kUsualDepth);
  XML_ParserStruct* const parser = _parser.get();
  XML_SetUserData(parser, this);
  XML_SetElementHandler(parser, OnStartElement, OnEndElement);
  XML_SetCharacterDataHandler(parser, OnCharacters);
  XML_SetCommentHandler(parser, OnComment);
  XML_SetProcessingInstructionHandler(parser, OnProcessingInstruction);
  XML_SetXmlDeclHandler(parser, OnXmlDeclaration);
  XML_SetDefaultHandler(parser, OnOtherMarkup);
  // With "<!DOCTYPE" refused none of these can be called; they stand here so that nothing is ever skipped or
  // fetched in silence.
  XML_SetEndDoctypeDeclHandler(parser, OnDoctypeEnd);
  XML_SetSkippedEntityHandler(parser, OnSkippedEntity);
  XML_SetExternalEntityRefHandler(parser, OnExternalEntity);
}

void ExpatSession::Run() {
  const XML_Status status = XML_Parse(_parser.get(), _text.data(), static_cast<int>(_text.size()), XML_TRUE);
  if (_failure) {
    std::rethrow_exception(_failure);
  }
  if (status != XML_STATUS_OK) {
    ThrowParserError();
  }
  KeepExpat(std::move(_parser), _text.size());
}

void ExpatSession::ThrowParserError() const {
  const XML_Error error = XML_GetErrorCode(_parser.get());
  if (error == XML_ERROR_NO_MEMORY) {
    throw std::bad_alloc();
  }
  Refuse(XML_ErrorString(error));
}

void ExpatSession::Refuse(const std::string& reason) const {
  throw XMLParseException(reason, XML_GetCurrentLineNumber(_parser.get()),
                          XML_GetCurrentColumnNumber(_parser.get()) + 1);
}

// A stopped parser may still report the end of an empty tag, hence the first line.
template <typename Action>
void ExpatSession::Guard(Action action) noexcept {
  if (_failure) {
    return;
  }
  try {
    action();
  } catch (...) {
    _failure = std::current_exception();
    XML_StopParser(_parser.get(), XML_FALSE);
  }
}

void ExpatSession::CountNodes(std::size_t count) {
  _nodes += count;
  if (_nodes > kMaxNodes) {
    Refuse(MoreThan(kMaxNodes, "nodes"));
  }
}

void ExpatSession::StartElement(const char* name, const char* const* attributes) {
  _outerAttributes.push_back(_attributesInScope);
  if (_outerAttributes.size() > kMaxElementDepth) {
    Refuse(MoreThan(kMaxElementDepth, "elements inside each other"));
  }
  TakeAttributes(attributes);
  CountNodes(1 + _attributes.size());
  _attributesInScope += _attributes.size();
  if (_attributesInScope > kMaxAttributesInScope) {
    Refuse(MoreThan(kMaxAttributesInScope, "attributes in scope"));
  }
  const NameRange elementName = MakeName(name);
  const char* const fault = _namespaces.EnterElement(elementName, _attributes);
  if (fault != nullptr) {
    Refuse(fault);
  }
  if (_namespaces.GetDeclarationsInScope() > kMaxNamespaceDeclarationsInScope) {
    Refuse(MoreThan(kMaxNamespaceDeclarationsInScope, "namespace declarations in scope"));
  }
  _place.AdvanceTo(_text.data() + XML_GetCurrentByteIndex(_parser.get()));
  _handler->StartElement(elementName, _attributes.data(), _attributes.size(), _place.GetLine(),
                         _place.GetColumn());
}

// Measures each text once for all who look at it.
void ExpatSession::TakeAttributes(const char* const* attributes) {
  _attributes.clear();
  for (; *attributes != nullptr; attributes += 2) {
    if (_attributes.size() == kMaxAttributesPerElement) {
      Refuse(MoreThan(kMaxAttributesPerElement, "attributes on one element"));
    }
    _attributes.push_back({MakeName(attributes[0]), MakeRange(attributes[1])});
  }
}

void ExpatSession::EndElement() {
  _attributesInScope = _outerAttributes.back();
  _outerAttributes.pop_back();
  _namespaces.LeaveElement();
  // The end event of an empty tag has no bytes of its own.
  _handler->EndElement(XML_GetCurrentByteCount(_parser.get()) == 0);
}

// Namespaces in XML 1.0, section 7: no colon in a target.
void ExpatSession::ProcessingInstruction(const char* target, const char* data) {
  if (std::strchr(target, ':') != nullptr) {
    Refuse("malformed processing instruction target");
  }
  CountNodes(1);
  _handler->ProcessingInstruction(target, data);
}

void ExpatSession::XmlDeclaration(const char* version, const char* encoding) const {
  if (version == nullptr || std::strcmp(version, "1.0") != 0) {
    Refuse("only XML 1.0 is accepted");
  }
  if (encoding != nullptr && StringUtil::ToLower(encoding) != "utf-8") {
    Refuse("only UTF-8 is accepted");
  }
}

// ---- Callbacks

ExpatSession* ExpatSession::Self(void* userData) noexcept {
  return static_cast<ExpatSession*>(userData);
}

void XMLCALL ExpatSession::OnStartElement(void* userData, const XML_Char* name, const XML_Char** attributes) {
  ExpatSession* const self = Self(userData);
  self->Guard([&] { self->StartElement(name, attributes); });
}

void XMLCALL ExpatSession::OnEndElement(void* userData, const XML_Char* /*name*/) {
  ExpatSession* const self = Self(userData);
  self->Guard([&] { self->EndElement(); });
}

void XMLCALL ExpatSession::OnCharacters(void* userData, const XML_Char* text, int size) {
  ExpatSession* const self = Self(userData);
  self->Guard([&] { self->_handler->Characters(text, static_cast<std::size_t>(size)); });
}

void XMLCALL ExpatSession::OnComment(void* userData, const XML_Char* text) {
  ExpatSession* const self = Self(userData);
  self->Guard([&] {
    self->CountNodes(1);
    self->_handler->Comment(text);
  });
}

void XMLCALL ExpatSession::OnProcessingInstruction(void* userData, const XML_Char* target,
                                                   const XML_Char* data) {
  ExpatSession* const self = Self(userData);
  self->Guard([&] { self->ProcessingInstruction(target, data); });
}

void XMLCALL ExpatSession::OnXmlDeclaration(void* userData, const XML_Char* version, const XML_Char* encoding,
                                            int /*standalone*/) {
  ExpatSession* const self = Self(userData);
  self->Guard([&] { self->XmlDeclaration(version, encoding); });
}

// Gets the markup that no other callback takes. The handler that expat has for the start of a DOCTYPE would
// be called only after its name and identifiers were read.
void XMLCALL ExpatSession::OnOtherMarkup(void* userData, const XML_Char* text, int size) {
  if (std::string_view(text, static_cast<std::size_t>(size)) == "<!DOCTYPE") {
    OnDoctypeEnd(userData);
  }
}

void XMLCALL ExpatSession::OnDoctypeEnd(void* userData) {
  ExpatSession* const self = Self(userData);
  self->Guard([&] { self->Refuse("DOCTYPE is not allowed"); });
}

void XMLCALL ExpatSession::OnSkippedEntity(void* userData, const XML_Char* /*name*/,
                                           int /*isParameterEntity*/) {
  ExpatSession* const self = Self(userData);
  self->Guard([&] { self->Refuse("undefined entity"); });
}

int XMLCALL ExpatSession::OnExternalEntity(XML_Parser /*parser*/, const XML_Char* /*context*/,
                                           const XML_Char* /*base*/, const XML_Char* /*systemId*/,
                                           const XML_Char* /*publicId*/) {
  return XML_STATUS_ERROR;
}

}  // namespace Xml
}  // namespace Pelmar
