// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A tree of a token that edits are made in: plain values, written as text without the platform's help, and
// compared without its canonicaliser.

#ifndef QUORLIN_FUZZ_TOKENTREE_H
#define QUORLIN_FUZZ_TOKENTREE_H

#include <algorithm>
#include <cstddef>
#include <map>
#include <string>
#include <tuple>
#include <utility>
#include <vector>

namespace TokenFuzz {

enum class Kind { DOCUMENT, ELEMENT, TEXT, CDATA, COMMENT, INSTRUCTION };

/// A node; the children of a document are one element and what may stand around it.
struct TreeNode {
  Kind kind = Kind::ELEMENT;
  std::string name;  ///< Of an element, as written; of an instruction, its target.
  std::string text;  ///< Of all that is neither element nor document.
  std::vector<std::pair<std::string, std::string>> attributes;  ///< Declarations too, as written.
  std::vector<TreeNode> children;
};

inline TreeNode MakeText(const std::string& text) {
  return TreeNode{Kind::TEXT, "", text, {}, {}};
}

inline TreeNode MakeElement(const std::string& name,
                            std::vector<std::pair<std::string, std::string>> attributes,
                            std::vector<TreeNode> children = {}) {
  return TreeNode{Kind::ELEMENT, name, "", std::move(attributes), std::move(children)};
}

inline TreeNode MakeTextElement(const std::string& name,
                                std::vector<std::pair<std::string, std::string>> attributes,
                                const std::string& text) {
  return MakeElement(name, std::move(attributes), {MakeText(text)});
}

inline bool IsText(const TreeNode& node) {
  return node.kind == Kind::TEXT || node.kind == Kind::CDATA;
}

inline const std::string* FindAttribute(const TreeNode& element, const std::string& name) {
  for (const auto& attribute : element.attributes) {
    if (attribute.first == name) {
      return &attribute.second;
    }
  }
  return nullptr;
}

inline void SetAttribute(TreeNode& element, const std::string& name, const std::string& value) {
  for (auto& attribute : element.attributes) {
    if (attribute.first == name) {
      attribute.second = value;
      return;
    }
  }
  element.attributes.emplace_back(name, value);
}

inline std::size_t CountNodes(const TreeNode& node) {
  std::size_t count = 1;
  for (const TreeNode& child : node.children) {
    count += CountNodes(child);
  }
  return count;
}

// --- Names ---

/// Prefixes, the empty one too, and what they stand for; "" is no namespace.
using Scope = std::map<std::string, std::string>;

inline std::string PrefixOf(const std::string& name) {
  const std::size_t colon = name.find(':');
  return colon == std::string::npos ? std::string() : name.substr(0, colon);
}

inline std::string LocalOf(const std::string& name) {
  const std::size_t colon = name.find(':');
  return colon == std::string::npos ? name : name.substr(colon + 1);
}

inline bool IsDeclaration(const std::string& attribute) {
  return attribute == "xmlns" || PrefixOf(attribute) == "xmlns";
}

inline Scope OuterScope() {
  return {{"", ""}, {"xml", "http://www.w3.org/XML/1998/namespace"}};
}

inline Scope ScopeWithin(const TreeNode& element, Scope scope) {
  for (const auto& attribute : element.attributes) {
    if (IsDeclaration(attribute.first)) {
      scope[attribute.first == "xmlns" ? "" : LocalOf(attribute.first)] = attribute.second;
    }
  }
  return scope;
}

/// The namespace of a prefix; "?" when it is not declared.
inline std::string Resolve(const std::string& prefix, const Scope& scope) {
  const auto found = scope.find(prefix);
  return found == scope.end() ? "?" : found->second;
}

/// Every prefix is declared and no attribute stands twice under different names: what a namespace-aware
/// reader has no doubt about.
inline bool IsWellFormed(const TreeNode& node, const Scope& around) {
  if (node.kind != Kind::ELEMENT && node.kind != Kind::DOCUMENT) {
    return true;
  }
  const Scope scope = ScopeWithin(node, around);
  bool isFine = node.kind == Kind::DOCUMENT || scope.count(PrefixOf(node.name)) != 0;
  std::vector<std::pair<std::string, std::string>> seen;
  for (const auto& attribute : node.attributes) {
    const std::string prefix = PrefixOf(attribute.first);
    if (prefix.empty() || prefix == "xmlns") {
      continue;
    }
    seen.emplace_back(Resolve(prefix, scope), LocalOf(attribute.first));
    isFine = isFine && scope.count(prefix) != 0 && std::count(seen.begin(), seen.end(), seen.back()) == 1;
  }
  return isFine && std::all_of(node.children.begin(), node.children.end(),
                               [&scope](const TreeNode& child) { return IsWellFormed(child, scope); });
}

// --- Text ---

inline std::string Escape(const std::string& text) {
  std::string escaped;
  for (const char c : text) {
    switch (c) {
      case '&':
        escaped += "&amp;";
        break;
      case '<':
        escaped += "&lt;";
        break;
      case '>':
        escaped += "&gt;";
        break;
      case '"':
        escaped += "&quot;";
        break;
      case '\t':
        escaped += "&#9;";
        break;
      case '\n':
        escaped += "&#10;";
        break;
      case '\r':
        escaped += "&#13;";
        break;
      default:
        escaped += c;
    }
  }
  return escaped;
}

inline void Write(const TreeNode& node, std::string& text) {
  switch (node.kind) {
    case Kind::TEXT:
      text += Escape(node.text);
      return;
    case Kind::CDATA:
      text += "<![CDATA[" + node.text + "]]>";
      return;
    case Kind::COMMENT:
      text += "<!--" + node.text + "-->";
      return;
    case Kind::INSTRUCTION:
      text += "<?" + node.name + " " + node.text + "?>";
      return;
    case Kind::DOCUMENT:
    case Kind::ELEMENT:
      break;
  }
  const bool isElement = node.kind == Kind::ELEMENT;
  text += isElement ? "<" + node.name : std::string();
  for (const auto& attribute : node.attributes) {
    text += " " + attribute.first + "=\"" + Escape(attribute.second) + "\"";
  }
  text += isElement ? ">" : "";
  for (const TreeNode& child : node.children) {
    Write(child, text);
  }
  text += isElement ? "</" + node.name + ">" : std::string();
}

inline std::string Write(const TreeNode& node) {
  std::string text;
  Write(node, text);
  return text;
}

// --- What is signed ---

/// How much of a tree a comparison looks at. SIGNED is what any accepted canonicalisation keeps: names with
/// their prefixes and namespaces, attributes, texts, instructions. STRICT adds all declarations in scope,
/// which inclusive canonicalisation keeps too. Comments and the order of attributes count in neither.
enum class Look { SIGNED, STRICT };

inline void Describe(const TreeNode& node, const Scope& around, const TreeNode* omitted, Look look,
                     std::string& text) {
  if (&node == omitted || node.kind == Kind::COMMENT) {
    return;
  }
  if (IsText(node)) {
    text += Escape(node.text);  // Two texts without an element between them are one.
    return;
  }
  if (node.kind == Kind::INSTRUCTION) {
    text += "<?" + node.name + " " + node.text + "?>";
    return;
  }
  const Scope scope = ScopeWithin(node, around);
  text += "<" + node.name + "|" + Escape(Resolve(PrefixOf(node.name), scope));
  std::vector<std::tuple<std::string, std::string, std::string>> attributes;
  for (const auto& attribute : node.attributes) {
    if (!IsDeclaration(attribute.first)) {
      const std::string prefix = PrefixOf(attribute.first);
      attributes.emplace_back(prefix.empty() ? "" : Resolve(prefix, scope), attribute.first,
                              attribute.second);
    }
  }
  std::sort(attributes.begin(), attributes.end());
  for (const auto& attribute : attributes) {
    text += " " + Escape(std::get<0>(attribute)) + "|" + std::get<1>(attribute) + "=\"" +
            Escape(std::get<2>(attribute)) + "\"";
  }
  if (look == Look::STRICT) {
    for (const auto& binding : scope) {
      text += " @" + binding.first + "=\"" + Escape(binding.second) + "\"";
    }
  }
  text += ">";
  for (const TreeNode& child : node.children) {
    Describe(child, scope, omitted, look, text);
  }
  text += "</>";
}

inline std::string Describe(const TreeNode& node, const Scope& around, const TreeNode* omitted, Look look) {
  std::string text;
  Describe(node, around, omitted, look, text);
  return text;
}

// --- Places ---

/// A node's place: `parent->children[index]`.
struct Place {
  TreeNode* parent;
  std::size_t index;
  TreeNode& Get() const { return parent->children[index]; }
};

/// The places, in document order, of all nodes below `node` for which `predicate` holds.
template <typename Predicate>
void FindPlaces(TreeNode& node, Predicate predicate, std::vector<Place>& places) {
  for (std::size_t i = 0; i < node.children.size(); ++i) {
    if (predicate(node.children[i])) {
      places.push_back(Place{&node, i});
    }
    FindPlaces(node.children[i], predicate, places);
  }
}

template <typename Predicate>
std::vector<Place> FindPlaces(TreeNode& node, Predicate predicate) {
  std::vector<Place> places;
  FindPlaces(node, predicate, places);
  return places;
}

inline bool IsElement(const TreeNode& node) {
  return node.kind == Kind::ELEMENT;
}

}  // namespace TokenFuzz

#endif  // QUORLIN_FUZZ_TOKENTREE_H
