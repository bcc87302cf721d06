// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Random documents that use every corner of XML and its namespaces.

#ifndef QUORLIN_TESTS_SUPPORT_RANDOMXML_H
#define QUORLIN_TESTS_SUPPORT_RANDOMXML_H

#include <cstddef>
#include <cstdint>
#include <map>
#include <random>
#include <string>
#include <vector>

namespace TestSupport {

/// Makes documents that are well-formed, namespaces included: declarations are made, repeated, shadowed and
/// taken back; attributes are in no, one and the xml namespace; values and text hold references, CDATA
/// sections, line ends of all kinds and characters of one to four bytes; comments and processing instructions
/// stand everywhere. The same seed gives the same documents on every machine.
class RandomXml final {
 public:
  explicit RandomXml(std::uint32_t seed) : _engine(seed) {}

  std::string MakeDocument();
  /// Evenly from 0 to `limit` - 1.
  std::size_t Below(std::size_t limit) { return _engine() % limit; }
  /// True once in `n` times.
  bool OneIn(std::size_t n) { return Below(n) == 0; }
  /// The prefixes that documents use; "#default" stands for the empty one.
  static const std::vector<std::string>& GetPrefixes();

 private:
  using Scope = std::map<std::string, std::string>;  // Prefix to URI; never an empty URI.

  const std::string& Pick(const std::vector<std::string>& choices) { return choices[Below(choices.size())]; }
  void AppendElement(std::size_t depth, const Scope& outer, std::string& text);
  void AppendContent(std::size_t depth, const Scope& scope, std::string& text);
  void AppendAround(std::string& text);
  void AppendMisc(std::string& text);
  void AppendText(std::string& text);
  std::vector<std::string> MakeDeclarations(Scope& scope);
  std::vector<std::string> MakeAttributes(const Scope& scope);
  std::string PickPrefix(const Scope& scope, bool forAttribute);
  std::string Quoted(const std::string& escapedValue);
  std::string MakeValue();

  std::mt19937 _engine;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_RANDOMXML_H
