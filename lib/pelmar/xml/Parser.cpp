// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/xml/Parser.h>

#include "pelmar/xml/DocumentBuilder.h"
#include "pelmar/xml/ExpatSession.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace Pelmar {
namespace Xml {

XMLParseException::XMLParseException(const std::string& reason, unsigned long line, unsigned long column)
    : Exception(reason + " at line " + std::to_string(line) + ", column " + std::to_string(column)),
      _line(line),
      _column(column) {}

XMLParseException::XMLParseException(const XMLParseException& other) = default;

XMLParseException::~XMLParseException() noexcept = default;

Exception* XMLParseException::Clone() const {
  return new XMLParseException(*this);
}

void XMLParseException::Throw() const {
  throw XMLParseException(*this);
}

XMLHandler::~XMLHandler() = default;

XMLParser::~XMLParser() = default;

namespace {

constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

// Grows with what comes, so that a reader of little takes little; reads one byte beyond the limit to know
// that there is more.
[[noreturn]] void ThrowTooLong() {
  throw XMLParseException("more than " + std::to_string(kMaxDocumentBytes) + " bytes", 1, 1);
}

std::string Drain(Reader* reader) {
  constexpr std::size_t kFirstBufferBytes = 16384;
  std::string text;
  std::size_t used = 0;
  for (;;) {
    if (used == text.size()) {
      text.resize(std::min<std::size_t>(std::max(kFirstBufferBytes, 2 * used), kMaxDocumentBytes + 1));
    }
    const std::size_t count = reader->Read(&text[used], text.size() - used);
    used += count;
    if (used > kMaxDocumentBytes) {
      ThrowTooLong();
    }
    if (count == 0) {
      text.resize(used);
      return text;
    }
  }
}

bool StartsWith(std::string_view text, std::string_view start) noexcept {
  return text.substr(0, start.size()) == start;
}

// expat itself recognises UTF-16 by its first two bytes, whatever encoding it was told.
bool LooksLikeUtf16(std::string_view text) noexcept {
  return StartsWith(text, "\xFE\xFF") || StartsWith(text, "\xFF\xFE") ||
         text.substr(0, 2).find('\0') != std::string_view::npos;
}

// The mark is taken off here because expat would count it as a column, and would take a second one too.
std::string_view RequireUtf8Start(std::string_view text) {
  if (LooksLikeUtf16(text)) {
    throw XMLParseException("only UTF-8 is accepted", 1, 1);
  }
  if (!StartsWith(text, kByteOrderMark)) {
    return text;
  }
  text.remove_prefix(kByteOrderMark.size());
  if (StartsWith(text, kByteOrderMark) || LooksLikeUtf16(text)) {
    throw XMLParseException("only UTF-8 is accepted", 1, 1);
  }
  return text;
}

class XMLParserImpl final : public XMLParser {
 public:
  explicit XMLParserImpl(const Ref<XMLHandler>& handler) : _handler(handler) {}

  void Parse(Reader* reader, Ref<Object>& result) override {
    if (reader == nullptr) {
      throw InvalidArgumentException("the reader is null");
    }
    BeUsed();
    ParseText(Drain(reader), result);
  }

  void Parse(const std::string& text, Ref<Object>& result) override {
    BeUsed();
    if (text.size() > kMaxDocumentBytes) {
      ThrowTooLong();
    }
    ParseText(text, result);
  }

 private:
  void BeUsed() {
    if (std::exchange(_used, true)) {
      throw InvalidStateException("The XML parser was already used");
    }
  }

  void ParseText(const std::string& text, Ref<Object>& result) {
    ExpatSession(_handler.Get(), RequireUtf8Start(text)).Run();
    result = _handler->GetResult();
  }

  const Ref<XMLHandler> _handler;
  bool _used = false;
};

}  // namespace

Ref<XMLHandler> CreateXMLDocumentHandler() {
  return MakeRef<DocumentBuilder>();
}

Ref<XMLParser> CreateXMLParser(const Ref<XMLHandler>& handler) {
  if (!handler) {
    throw InvalidArgumentException("the XML handler is null");
  }
  return MakeRef<XMLParserImpl>(handler);
}

}  // namespace Xml
}  // namespace Pelmar
