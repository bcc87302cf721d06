// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Collects XML text in pieces and hands it to a Writer in larger ones.

#ifndef PELMAR_XML_XMLTEXTSINK_H
#define PELMAR_XML_XMLTEXTSINK_H

#include <pelmar/Writer.h>
#include <pelmar/xml/Node.h>

#include <array>
#include <cstddef>
#include <cstring>
#include <string_view>

namespace Pelmar {
namespace Xml {

/// A small buffer before a `Writer`, which must outlive it. What was put reaches the writer at the latest
/// with `Flush`; the destructor does not flush, because a walk that failed has nothing worth writing.
class XmlTextSink final {
 public:
  explicit XmlTextSink(Writer* writer) noexcept : _writer(writer) {}
  XmlTextSink(const XmlTextSink&) = delete;
  XmlTextSink& operator=(const XmlTextSink&) = delete;
  /// Wipes the buffer: a request passes through it with its password.
  ~XmlTextSink();

  /// Markup and names: bytes that go out as they are.
  void Put(std::string_view bytes) {
    // An empty view may have no address, which memcpy does not allow.
    if (bytes.empty()) {
      return;
    }
    if (bytes.size() > _buffer.size() - _used) {
      PutBeyondBuffer(bytes);
      return;
    }
    std::memcpy(_buffer.data() + _used, bytes.data(), bytes.size());
    _used += bytes.size();
  }
  void Put(char byte) {
    if (_used == _buffer.size()) {
      Flush();
    }
    _buffer[_used++] = byte;
  }
  /// Character data, escaped as Canonical XML 1.0, section 2.3, "Text Nodes" says.
  void PutText(std::string_view text);
  /// An attribute's value without its quotes, escaped as Canonical XML 1.0, section 2.3, "Attribute Nodes"
  /// says.
  void PutAttributeValue(std::string_view value);
  /// A blank, the name, "=" and the quoted value.
  void PutAttribute(std::string_view name, std::string_view value);
  void PutQualifiedName(const ElementNode* element);
  void PutComment(const CommentNode* comment);
  void PutProcessingInstruction(const ProcessingInstructionNode* instruction);

  void Flush();

  /// How many bytes were put so far.
  std::size_t GetCount() const noexcept { return _flushed + _used; }
  /// What was put since there were `count` bytes; empty when a part of it has left the buffer. Valid until
  /// more is put.
  std::string_view GetSince(std::size_t count) const noexcept {
    return count < _flushed ? std::string_view()
                            : std::string_view(_buffer.data() + (count - _flushed), GetCount() - count);
  }

 private:
  void PutBeyondBuffer(std::string_view bytes);
  template <typename Escapes>
  void PutEscaped(std::string_view text, const Escapes& escapes);

  Writer* _writer;
  std::size_t _flushed = 0;
  std::size_t _used = 0;
  std::size_t _mostUsed = 0;
  std::array<char, 4096> _buffer;
};

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_XMLTEXTSINK_H
