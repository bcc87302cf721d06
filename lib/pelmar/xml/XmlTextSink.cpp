// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "pelmar/xml/XmlTextSink.h"

#include <pelmar/SecretText.h>

#include <algorithm>
#include <array>

namespace Pelmar {
namespace Xml {

namespace {

// For each byte 0 or 1.
using Marks = std::array<unsigned char, 256>;

// What stands for a byte. Those that stand for themselves have no text, and no mark.
struct Escapes {
  std::array<std::string_view, 256> texts = {};
  Marks marks = {};

  constexpr void Add(char byte, std::string_view text) noexcept {
    texts[static_cast<unsigned char>(byte)] = text;
    marks[static_cast<unsigned char>(byte)] = 1;
  }
};

// Beyond the characters that would be read as markup these are the white space that a parser would otherwise
// normalise away.
constexpr Escapes MakeTextEscapes() noexcept {
  Escapes escapes;
  escapes.Add('&', "&amp;");
  escapes.Add('<', "&lt;");
  escapes.Add('>', "&gt;");
  escapes.Add('\r', "&#xD;");
  return escapes;
}

constexpr Escapes MakeAttributeEscapes() noexcept {
  Escapes escapes;
  escapes.Add('&', "&amp;");
  escapes.Add('<', "&lt;");
  escapes.Add('"', "&quot;");
  escapes.Add('\t', "&#x9;");
  escapes.Add('\n', "&#xA;");
  escapes.Add('\r', "&#xD;");
  return escapes;
}

constexpr Escapes kTextEscapes = MakeTextEscapes();
constexpr Escapes kAttributeEscapes = MakeAttributeEscapes();

// The number of bytes before the first one that is escaped. All text that is written or digested passes here,
// so it goes by fours, with one jump for four bytes, and by look-up only: which bytes are letters and which
// are not, no processor can predict.
std::size_t CountPlain(std::string_view text, const Marks& marks) noexcept {
  const auto* const bytes = reinterpret_cast<const unsigned char*>(text.data());
  std::size_t count = 0;
  for (; text.size() - count >= 4; count += 4) {
    const unsigned char* const four = bytes + count;
    if ((marks[four[0]] | marks[four[1]] | marks[four[2]] | marks[four[3]]) != 0) {
      break;
    }
  }
  while (count < text.size() && marks[bytes[count]] == 0) {
    ++count;
  }
  return count;
}

}  // namespace

XmlTextSink::~XmlTextSink() {
  Wipe(_buffer.data(), std::max(_mostUsed, _used));
}

void XmlTextSink::PutBeyondBuffer(std::string_view bytes) {
  Flush();
  if (bytes.size() > _buffer.size()) {
    _writer->Write(bytes.data(), bytes.size());
    _flushed += bytes.size();
    return;
  }
  Put(bytes);
}

template <typename Escapes>
void XmlTextSink::PutEscaped(std::string_view text, const Escapes& escapes) {
  for (;;) {
    const std::size_t plain = CountPlain(text, escapes.marks);
    Put(text.substr(0, plain));
    if (plain == text.size()) {
      return;
    }
    Put(escapes.texts[static_cast<unsigned char>(text[plain])]);
    text.remove_prefix(plain + 1);
  }
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
  Put(element->GetQualifiedName());
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
    _mostUsed = std::max(_mostUsed, _used);
    _flushed += _used;
    _used = 0;
  }
}

}  // namespace Xml
}  // namespace Pelmar
