// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The XML parser: strict, bounded, and without any access to the outside.

#ifndef PELMAR_XML_PARSER_H
#define PELMAR_XML_PARSER_H

#include <pelmar/Exception.h>
#include <pelmar/Export.h>
#include <pelmar/Object.h>
#include <pelmar/Reader.h>
#include <pelmar/Ref.h>

#include <cstddef>
#include <string>

namespace Pelmar {
namespace Xml {

/// The text is not XML as this parser accepts it. The message ends in " at line L, column C" (both counted
/// from 1).
class PELMAR_API XMLParseException : public Exception {
 public:
  XMLParseException(const std::string& reason, unsigned long line, unsigned long column);
  XMLParseException(const XMLParseException& other);
  ~XMLParseException() noexcept override;
  Exception* Clone() const override;
  [[noreturn]] void Throw() const override;

  unsigned long GetLine() const noexcept { return _line; }
  unsigned long GetColumn() const noexcept { return _column; }

 private:
  unsigned long _line;
  unsigned long _column;
};

/// What the parser refuses beyond malformed text. Real messages stay far below; hostile ones are refused
/// before they cost anything.
enum ParserLimit : std::size_t {
  kMaxDocumentBytes = 16 * 1024 * 1024,
  /// Elements, attributes, comments and processing instructions together: a tree of nothing but "<a/>" would
  /// take fifty times the memory of its text.
  kMaxNodes = 256 * 1024,
  kMaxElementDepth = 256,
  kMaxAttributesPerElement = 256,
  kMaxNamespaceDeclarationsInScope = 256,
  /// On an element and all around it. Looking a prefix up passes over all of them, and an element with
  /// thousands around it may have a hundred thousand others beside it.
  kMaxAttributesInScope = 512,
  /// Canonical XML sorts attributes by the URIs of their namespaces: with long ones, each of them used by
  /// many attributes, that would take minutes.
  kMaxNamespaceUriBytes = 2048
};

/// Some characters of the text that is parsed, in UTF-8, followed by a zero byte.
struct TextRange {
  const char* data;
  std::size_t size;
};

/// A name as written: "prefix:local", or the local part alone.
struct NameRange {
  TextRange text;
  std::size_t localStart;  ///< Where the local part begins: after the colon, or at 0.
};

/// An attribute of a start tag: its name as written, and its normalised value.
struct AttributeRange {
  NameRange name;
  TextRange value;
};

/// Takes the parser's events in document order. Names and values are UTF-8, normalised as XML 1.0 demands,
/// and valid during the call. An exception thrown by a handler ends the parse and reaches the caller of
/// `Parse`.
class PELMAR_API XMLHandler : public Object {
 public:
  /// `attributes` are `attributeCount` many, in document order. `line` and `column` are those of the "<",
  /// counted from 1. All texts are valid during the call.
  virtual void StartElement(const NameRange& name, const AttributeRange* attributes,
                            std::size_t attributeCount, unsigned long line, unsigned long column) = 0;
  /// `emptyTag` tells that the element was written "<a/>".
  virtual void EndElement(bool emptyTag) = 0;
  virtual void Characters(const char* text, std::size_t size) = 0;
  virtual void Comment(const char* text) = 0;
  virtual void ProcessingInstruction(const char* target, const char* data) = 0;
  /// What the events added up to; called once, after the end of a well-formed document.
  virtual Ref<Object> GetResult() = 0;

 protected:
  ~XMLHandler() override;
};

/// Reads one document: XML 1.0 in UTF-8 (a byte order mark may lead it), well-formed also in its namespaces,
/// within the limits above. Every DOCTYPE is refused, so there are no entities but the five of XML itself,
/// and nothing is ever fetched. A prefix that is nowhere declared is left for the reader of the tree to
/// refuse, who can name the element.
class PELMAR_API XMLParser : public Object {
 public:
  /// Parses everything `reader` yields and stores the handler's result. Throws XMLParseException; `result` is
  /// then unchanged.
  virtual void Parse(Reader* reader, Ref<Object>& result) = 0;
  /// The same for a text that is in memory: it is read where it is, without a copy.
  virtual void Parse(const std::string& text, Ref<Object>& result) = 0;

 protected:
  ~XMLParser() override;
};

/// A handler whose result is a `Document`.
PELMAR_API Ref<XMLHandler> CreateXMLDocumentHandler();

/// A parser that reports to `handler`, which it keeps. It is used for one document.
PELMAR_API Ref<XMLParser> CreateXMLParser(const Ref<XMLHandler>& handler);

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_PARSER_H
