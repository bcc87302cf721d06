// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Reading a token out of libxml2's tree.

#ifndef QUORLIN_BENCH_PEERS_LIBXMLTREE_H
#define QUORLIN_BENCH_PEERS_LIBXMLTREE_H

#include "PeerLoop.h"

#include <libxml/parser.h>
#include <libxml/tree.h>

#include <cstring>
#include <memory>
#include <string>

namespace Peers {

struct LibxmlDeleter {
  void operator()(xmlDoc* document) const noexcept { xmlFreeDoc(document); }
  void operator()(xmlChar* text) const noexcept { xmlFree(text); }
};

using DocumentPointer = std::unique_ptr<xmlDoc, LibxmlDeleter>;
using TextPointer = std::unique_ptr<xmlChar, LibxmlDeleter>;

constexpr const char* kSaml = "urn:oasis:names:tc:SAML:2.0:assertion";

inline bool IsNamed(const xmlNode* node, const char* name) {
  return node->type == XML_ELEMENT_NODE && node->ns != nullptr &&
         xmlStrEqual(node->ns->href, BAD_CAST kSaml) != 0 && xmlStrEqual(node->name, BAD_CAST name) != 0;
}

/// The first SAML child of that name, or null.
inline xmlNode* FindChild(const xmlNode* parent, const char* name) {
  for (xmlNode* node = parent == nullptr ? nullptr : parent->children; node != nullptr; node = node->next) {
    if (IsNamed(node, name)) {
      return node;
    }
  }
  return nullptr;
}

inline std::string ToString(const TextPointer& text) {
  return text ? reinterpret_cast<const char*>(text.get()) : "";
}

inline std::string GetContent(const xmlNode* node) {
  return ToString(TextPointer(xmlNodeGetContent(node)));
}

inline std::string GetAttribute(const xmlNode* node, const char* name) {
  return ToString(TextPointer(xmlGetNoNsProp(node, BAD_CAST name)));
}

/// The subject's name and the values of the attribute `groupAttribute`.
inline Findings ReadFindings(const xmlNode* assertion, const std::string& groupAttribute) {
  const xmlNode* const name = FindChild(FindChild(assertion, "Subject"), "NameID");
  Require(name != nullptr, "no subject");
  Findings findings;
  findings.subject = GetContent(name);
  const xmlNode* const statement = FindChild(assertion, "AttributeStatement");
  Require(statement != nullptr, "no attributes");
  for (const xmlNode* node = statement->children; node != nullptr; node = node->next) {
    if (!IsNamed(node, "Attribute") || GetAttribute(node, "Name") != groupAttribute) {
      continue;
    }
    for (const xmlNode* value = node->children; value != nullptr; value = value->next) {
      if (IsNamed(value, "AttributeValue")) {
        findings.groups.push_back(GetContent(value));
      }
    }
  }
  return findings;
}

}  // namespace Peers

#endif  // QUORLIN_BENCH_PEERS_LIBXMLTREE_H
