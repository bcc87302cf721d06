// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "support/RandomXml.h"

#include <algorithm>
#include <set>
#include <utility>

namespace TestSupport {

namespace {

const std::size_t kMaxDepth = 5;

// None is relative, which canonical XML forbids, and none holds "&": libxml2 (2.9) takes "&amp;" in a
// namespace URI for "&#38;".
const std::vector<std::string> kUris = {
    "urn:one",  "urn:two", "http://example.org/ns", "http://example.org/ns#", "http://example.org/?a=1;b=2",
    "ftp://a/B"};

const std::vector<std::string> kNames = {
    "a", "b", "e", "Z", "item", "long-name.with_all-1", "\xC3\xA9t\xC3\xA9", "\xE5\xAD\x97"};

const std::vector<std::string> kXmlAttributes = {"xml:lang", "xml:base", "xml:other"};

// What may stand in text and in attribute values alike.
const std::vector<std::string> kPieces = {"x",
                                          "Word",
                                          " ",
                                          "  ",
                                          "\t",
                                          "\n",
                                          "\r\n",
                                          "\r",
                                          "&amp;",
                                          "&lt;",
                                          "&gt;",
                                          "&quot;",
                                          "&apos;",
                                          ">",
                                          "&#9;",
                                          "&#10;",
                                          "&#13;",
                                          "&#xD;&#xA;",
                                          "&#38;lt;",
                                          "\x7F",
                                          "\xC2\x85",
                                          "\xC3\xBC",
                                          "\xE2\x82\xAC",
                                          "\xE2\x80\xA8",
                                          "\xEF\xBF\xBD",
                                          "\xF0\x90\x80\x80",
                                          "&#x10FFFF;",
                                          "]]",
                                          "--",
                                          "?",
                                          "/",
                                          "=",
                                          "&#x20AC;"};

const std::vector<std::string> kTextPieces = {
    "\"", "'", "<![CDATA[]]>", "<![CDATA[<a>&amp;\r\n]] >]]>", "]]&gt;", "<![CDATA[ ]]>"};

const std::vector<std::string> kMisc = {"<!---->", "<!-- c -->",  "<!--a\r\nb <x> & \xE2\x82\xAC-->",
                                        "<?pi?>",  "<?pi data?>", "<?p.i   more\tdata ? > & \r\n?>"};

}  // namespace

const std::vector<std::string>& RandomXml::GetPrefixes() {
  static const std::vector<std::string> prefixes = {"#default", "a", "b", "c", "p.1", "\xC3\xA9"};
  return prefixes;
}

std::string RandomXml::MakeDocument() {
  std::string text;
  if (OneIn(4)) {
    text += OneIn(2) ? "<?xml version=\"1.0\" encoding=\"utf-8\"?>" : "<?xml version='1.0'?>\n";
  }
  AppendAround(text);
  AppendElement(0, Scope(), text);
  AppendAround(text);
  return text;
}

void RandomXml::AppendAround(std::string& text) {
  for (std::size_t i = Below(3); i > 0; --i) {
    if (OneIn(2)) {
      text += OneIn(2) ? "\n" : " \r\n";
    }
    AppendMisc(text);
  }
}

void RandomXml::AppendMisc(std::string& text) {
  text += Pick(kMisc);
}

void RandomXml::AppendElement(std::size_t depth, const Scope& outer, std::string& text) {
  Scope scope = outer;
  std::vector<std::string> attributes = MakeDeclarations(scope);
  const std::string prefix = PickPrefix(scope, false);
  const std::string name = (prefix.empty() ? "" : prefix + ":") + Pick(kNames);
  for (std::string& attribute : MakeAttributes(scope)) {
    attributes.push_back(std::move(attribute));
  }
  for (std::size_t i = attributes.size(); i > 1; --i) {
    std::swap(attributes[i - 1], attributes[Below(i)]);
  }

  text += "<" + name;
  for (const std::string& attribute : attributes) {
    text += (OneIn(8) ? "\n\t" : " ") + attribute;
  }
  if (OneIn(6)) {
    text += OneIn(2) ? "/>" : " />";
    return;
  }
  text += ">";
  AppendContent(depth, scope, text);
  text += "</" + name + (OneIn(8) ? " >" : ">");
}

void RandomXml::AppendContent(std::size_t depth, const Scope& scope, std::string& text) {
  for (std::size_t i = Below(5); i > 0; --i) {
    switch (Below(5)) {
      case 0:
        AppendMisc(text);
        break;
      case 1:
      case 2:
        AppendText(text);
        break;
      default:
        if (depth < kMaxDepth) {
          AppendElement(depth + 1, scope, text);
        }
    }
  }
}

std::vector<std::string> RandomXml::MakeDeclarations(Scope& scope) {
  std::vector<std::string> declarations;
  std::set<std::string> declared;
  for (std::size_t i = Below(4); i > 0; --i) {
    const std::string picked = Pick(GetPrefixes());
    const std::string prefix = picked == "#default" ? "" : picked;
    if (!declared.insert(prefix).second) {
      continue;
    }
    const std::string name = prefix.empty() ? "xmlns" : "xmlns:" + prefix;
    if (prefix.empty() && OneIn(3)) {
      scope.erase(prefix);
      declarations.push_back(name + "=" + Quoted(""));
      continue;
    }
    scope[prefix] = Pick(kUris);
    declarations.push_back(name + "=" + Quoted(scope[prefix]));
  }
  if (OneIn(40)) {
    declarations.push_back("xmlns:xml=\"http://www.w3.org/XML/1998/namespace\"");
  }
  return declarations;
}

std::vector<std::string> RandomXml::MakeAttributes(const Scope& scope) {
  std::vector<std::string> attributes;
  std::set<std::string> expandedNames;
  for (std::size_t i = Below(5); i > 0; --i) {
    if (OneIn(5)) {
      const std::string& name = Pick(kXmlAttributes);
      if (expandedNames.insert(name).second) {
        attributes.push_back(name + "=" + Quoted(MakeValue()));
      }
      continue;
    }
    const std::string prefix = PickPrefix(scope, true);
    const std::string& localName = Pick(kNames);
    const std::string uri = prefix.empty() ? "" : scope.at(prefix);
    if (expandedNames.insert("{" + uri + "}" + localName).second) {
      attributes.push_back((prefix.empty() ? "" : prefix + ":") + localName + "=" + Quoted(MakeValue()));
    }
  }
  return attributes;
}

// For an attribute the empty prefix means no namespace, for an element the default one, declared or not:
// always possible.
std::string RandomXml::PickPrefix(const Scope& scope, bool forAttribute) {
  if (OneIn(forAttribute ? 2 : 3)) {
    return "";
  }
  const std::string picked = Pick(GetPrefixes());
  return scope.count(picked) > 0 ? picked : "";
}

std::string RandomXml::Quoted(const std::string& escapedValue) {
  const char quote = OneIn(2) ? '"' : '\'';
  return quote + escapedValue + quote;
}

std::string RandomXml::MakeValue() {
  std::string value;
  for (std::size_t i = Below(5); i > 0; --i) {
    value += Pick(kPieces);
  }
  return value;
}

// "]]>" must not come together from two pieces.
void RandomXml::AppendText(std::string& text) {
  for (std::size_t i = Below(6); i > 0; --i) {
    const std::string& piece = OneIn(4) ? Pick(kTextPieces) : Pick(kPieces);
    if (piece != ">" || text.compare(text.size() - 2, 2, "]]") != 0) {
      text += piece;
    }
  }
}

}  // namespace TestSupport
