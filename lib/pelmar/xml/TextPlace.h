// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Line and column of places in a text that is read from front to back.

#ifndef PELMAR_XML_TEXTPLACE_H
#define PELMAR_XML_TEXTPLACE_H

namespace Pelmar {
namespace Xml {

/// Counts lines and columns as expat does, but several times as fast: for every element of a document that is a fifth of
/// expat's own work. Lines end with a line feed, a carriage return, or both (XML 1.0, section 2.11); a column is a character.
class TextPlace final {
 public:
  /// At line 1, column 1.
  explicit TextPlace(const char* text) noexcept : _at(text) {}

  /// Goes on to `place`, which is not before the present one and not between a carriage return and its line feed.
  void AdvanceTo(const char* place) noexcept;

  unsigned long GetLine() const noexcept { return _line; }
  unsigned long GetColumn() const noexcept { return _column; }

 private:
  void AdvanceOverLines(const char* place) noexcept;

  const char* _at;
  unsigned long _line = 1;
  unsigned long _column = 1;
};

}  // namespace Xml
}  // namespace Pelmar

#endif  // PELMAR_XML_TEXTPLACE_H
