// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/inspect/ClaimsText.h"

#include "quorlin/Terminal.h"

#include <algorithm>

namespace Cli {
namespace Inspect {

namespace {

/// "notOnOrAfter" as "not on or after".
std::string ToLabel(const std::string& key) {
  std::string label;
  for (const char c : key) {
    const bool isUpper = c >= 'A' && c <= 'Z';
    label += isUpper ? std::string(" ") + static_cast<char>(c - 'A' + 'a') : std::string(1, c);
  }
  return label;
}

/// Where the values of an object stand, counted from its labels.
std::size_t GetValueColumn(const Json& object) {
  std::size_t longest = 0;
  for (const auto& member : object.items()) {
    longest = std::max(longest, member.value().is_array() ? 0 : ToLabel(member.key()).size());
  }
  return longest + 2;
}

class Printer final {
 public:
  explicit Printer(const Pelmar::System::DateTime& now) : _now(now.GetUtcTime()) {}

  void PrintMembers(const Json& object, std::size_t indent, bool isListEntry) {
    std::string start(indent, ' ');
    if (isListEntry) {
      start.replace(indent - 2, 2, "- ");
    }
    const std::size_t column = indent + GetValueColumn(object);
    for (const auto& member : object.items()) {
      start += ToLabel(member.key());
      if (member.value().is_array()) {
        _text += start + "\n";
        PrintEntries(member.value(), indent);
      } else {
        _text += start + std::string(column - start.size(), ' ') + ToText(member.value()) + "\n";
      }
      start.assign(indent, ' ');
    }
    if (object.empty()) {
      _text += start + "(nothing)\n";
    }
  }

  const std::string& GetText() const { return _text; }

 private:
  void PrintEntries(const Json& value, std::size_t indent) {
    for (const Json& entry : value) {
      if (entry.is_object()) {
        PrintMembers(entry, indent + 4, true);
      } else {
        _text += std::string(indent + 2, ' ') + "- " + ToText(entry) + "\n";
      }
    }
  }

  std::string ToText(const Json& value) const {
    if (!value.is_string()) {
      return value.dump();
    }
    const std::string text = value.get<std::string>();
    return text.empty() ? "(empty)" : MakePrintable(text) + DescribeDistance(text);
  }

  /// Nothing for what is no date.
  std::string DescribeDistance(const std::string& text) const {
    try {
      const long long time = Pelmar::System::DateTime(text).GetUtcTime();
      return time > _now ? " (in " + DescribeSpan(time - _now) + ")"
                         : " (" + DescribeSpan(_now - time) + " ago)";
    } catch (const Pelmar::System::DateFormatException&) {
      return "";
    }
  }

  const long long _now;
  std::string _text;
};

}  // namespace

std::string PrintClaims(const Json& claims, const Pelmar::System::DateTime& now) {
  Printer printer(now);
  printer.PrintMembers(claims, 2, false);
  return printer.GetText();
}

}  // namespace Inspect
}  // namespace Cli
