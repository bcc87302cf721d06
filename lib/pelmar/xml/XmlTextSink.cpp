// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/XmlTextSink.h"

#include <array>

namespace Pelmar {
namespace Xml {

namespace {

// What stands for each byte; null for a byte that stands for itself. One look-up for every byte of every
// text: a comparison first would be a branch that no processor can predict.
using Escapes = std::array<const char*, 256>;

// Beyond the characters that would be read as markup these are the white space that a parser would otherwise
// normalise away.
constexpr Escapes MakeTextEscapes() noexcept {
  Escapes escapes = {};
  escapes['&'] = "&amp;";
  escapes['<'] = "&lt;";
  escapes['>'] = "&gt;";
  escapes['\r'] = "&#xD;";
  return escapes;
}

constexpr Escapes MakeAttributeEscapes() noexcept {
  Escapes escapes = {};
  escapes['&'] = "&amp;";
  escapes['<'] = "&lt;";
  escapes['"'] = "&quot;";
  escapes['\t'] = "&#x9;";
  escapes['\n'] = "&#xA;";
  escapes['\r'] = "&#xD;";
  return escapes;
}

constexpr Escapes kTextEscapes = MakeTextEscapes();
constexpr Escapes kAttributeEscapes = MakeAttributeEscapes();

}  // namespace

void XmlTextSink::PutBeyondBuffer(std::string_view bytes) {
  Flush();
  if (bytes.size() > _buffer.size()) {
    _writer->Write(bytes.data(), bytes.size());
    return;
  }
  Put(bytes);
}

template <typename Escapes>
void XmlTextSink::PutEscaped(std::string_view text, const Escapes& escapes) {
  const char* start = text.data();
  const char* const end = start + text.size();
  for (const char* at = start; at != end; ++at) {
    const char* const escape = escapes[static_cast<unsigned char>(*at)];
    if (escape != nullptr) {
      Put(std::string_view(start, static_cast<std::size_t>(at - start)));
      Put(escape);
      start = at + 1;
    }
  }
  Put(std::string_view(start, static_cast<std::size_t>(end - start)));
}

void XmlTextSink::PutText(std::string_view text) {
  PutEscaped(text, kTextEscapes);
}

void XmlTextSink::PutAttributeValue(std::string_view value) {
  PutEscaped(value, kAttributeEscapes);
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
