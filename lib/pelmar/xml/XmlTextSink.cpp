// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/XmlTextSink.h"

#include <cstring>

namespace Pelmar {
namespace Xml {

namespace {

// What stands for a byte in text and in attribute values; empty for a byte that stands for itself. Beyond the
// characters that would be read as markup these are the white space that a parser would otherwise normalise
// away.
std::string_view EscapeInText(char byte) noexcept {
  switch (byte) {
    case '&':
      return "&amp;";
    case '<':
      return "&lt;";
    case '>':
      return "&gt;";
    case '\r':
      return "&#xD;";
    default:
      return std::string_view();
  }
}

std::string_view EscapeInAttribute(char byte) noexcept {
  switch (byte) {
    case '&':
      return "&amp;";
    case '<':
      return "&lt;";
    case '"':
      return "&quot;";
    case '\t':
      return "&#x9;";
    case '\n':
      return "&#xA;";
    case '\r':
      return "&#xD;";
    default:
      return std::string_view();
  }
}

}  // namespace

void XmlTextSink::Put(std::string_view bytes) {
  if (bytes.empty()) {
    return;  // An empty view may have no address, which memcpy does not allow.
  }
  if (bytes.size() > _buffer.size() - _used) {
    Flush();
    if (bytes.size() > _buffer.size()) {
      _writer->Write(bytes.data(), bytes.size());
      return;
    }
  }
  std::memcpy(_buffer.data() + _used, bytes.data(), bytes.size());
  _used += bytes.size();
}

void XmlTextSink::Put(char byte) {
  Put(std::string_view(&byte, 1));
}

template <typename Escape>
void XmlTextSink::PutEscaped(std::string_view text, Escape escape) {
  std::size_t start = 0;
  for (std::size_t i = 0; i < text.size(); ++i) {
    // All that is ever escaped lies at or below '>'.
    if (static_cast<unsigned char>(text[i]) > '>') {
      continue;
    }
    const std::string_view replacement = escape(text[i]);
    if (!replacement.empty()) {
      Put(text.substr(start, i - start));
      Put(replacement);
      start = i + 1;
    }
  }
  Put(text.substr(start));
}

void XmlTextSink::PutText(std::string_view text) {
  PutEscaped(text, EscapeInText);
}

void XmlTextSink::PutAttributeValue(std::string_view value) {
  PutEscaped(value, EscapeInAttribute);
}

void XmlTextSink::PutAttribute(std::string_view name, std::string_view value) {
  Put(' ');
  Put(name);
  Put("=\"");
  PutAttributeValue(value);
  Put('"');
}

void XmlTextSink::PutQualifiedName(const ElementNode* element) {
  if (!element->GetPrefix().empty()) {
    Put(element->GetPrefix());
    Put(':');
  }
  Put(element->GetLocalName());
}

void XmlTextSink::PutComment(const CommentNode* comment) {
  Put("<!--");
  Put(comment->GetText());
  Put("-->");
}

void XmlTextSink::PutProcessingInstruction(const ProcessingInstructionNode* instruction) {
  Put("<?");
  Put(instruction->GetTarget());
  if (!instruction->GetData().empty()) {
    Put(' ');
    Put(instruction->GetData());
  }
  Put("?>");
}

void XmlTextSink::Flush() {
  if (_used > 0) {
    _writer->Write(_buffer.data(), _used);
    _used = 0;
  }
}

}  // namespace Xml
}  // namespace Pelmar
