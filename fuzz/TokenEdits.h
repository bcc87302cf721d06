// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Reads a fuzz input as a token to begin with and a list of edits to it. Each edit takes kEditBytes: what to
// do, and five numbers that choose where and with what.

#ifndef QUORLIN_FUZZ_TOKENEDITS_H
#define QUORLIN_FUZZ_TOKENEDITS_H

#include "TokenProfile.h"
#include "TokenSigner.h"
#include "TokenTree.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace TokenFuzz {

constexpr std::size_t kEditBytes = 6;
constexpr std::size_t kMaxEdits = 24;
/// Larger trees would only cost time; the limits of the platform are other targets' affair.
constexpr std::size_t kMaxTreeNodes = 400;

using Edit = std::array<std::uint8_t, kEditBytes>;

// --- Material ---

template <typename T, std::size_t size>
const T& Pick(const T (&table)[size], std::uint8_t number) {
  return table[number % size];
}

constexpr const char* kValues[] = {"alice@example.com",
                                   "bob@example.org",
                                   "bob",
                                   "a@b@c",
                                   "@",
                                   "",
                                   " ",
                                   "admins/example.com",
                                   "example.com\\admins",
                                   "a/b/c",
                                   "a\\b/c",
                                   "true",
                                   "TRUE",
                                   "false",
                                   "0",
                                   "1",
                                   "-1",
                                   "+2",
                                   "2.0",
                                   "2.1",
                                   "_1",
                                   "_2",
                                   "x1",
                                   "<&>\"",
                                   kBearer,
                                   kHolderOfKey,
                                   kUpn,
                                   kGroups,
                                   kSolution,
                                   kGivenName,
                                   kSurname,
                                   "urn:audience:1",
                                   "saml:KeyInfoConfirmationDataType",
                                   "del:DelegationRestrictionType",
                                   "ext:RenewRestrictionType",
                                   "KeyInfoConfirmationDataType",
                                   "p:RenewRestrictionType",
                                   "2001-01-01T00:00:00Z",
                                   "2020-01-01T00:00:00Z",
                                   "2020-06-01T12:00:00.25+02:00",
                                   "9000-01-01T00:00:00Z",
                                   "9999-12-31T23:59:59Z"};

constexpr const char* kElementNames[] = {
    "saml:Assertion", "saml:Issuer",     "saml:NameID",    "saml:Subject",
    "saml:Advice",    "saml:Audience",   "saml:Attribute", "saml:AttributeValue",
    "saml:Condition", "saml:Conditions", "ds:Signature",   "ds:Object",
    "ds:KeyInfo",     "ext:RSAAdvice",   "del:Delegate",   "saml:AttributeStatement",
    "Assertion",      "p:Assertion",     "soap:Envelope",  "saml:SubjectConfirmationData",
    "ds:Reference",   "saml:Subject.",   "saml:Extensions"};

constexpr const char* kAttributeNames[] = {
    "ID",     "Id",        "id",           "xml:id",       "wsu:Id",   "Version", "Format",
    "Method", "Name",      "NotBefore",    "NotOnOrAfter", "xsi:type", "type",    "Count",
    "URI",    "Algorithm", "AdviceSource", "NameFormat",   "saml:ID",  "xml:lang"};

constexpr const char* kPrefixes[] = {"", "saml", "ds", "del", "ext", "xsi", "p"};
constexpr const char* kUris[] = {kSamlUri, kDsUri, kDelegationUri, kExtensionUri, kInstanceUri, "urn:p"};

inline std::vector<std::pair<std::string, std::string>> Declarations() {
  return {{"xmlns:saml", kSamlUri},
          {"xmlns:xsi", kInstanceUri},
          {"xmlns:del", kDelegationUri},
          {"xmlns:ext", kExtensionUri}};
}

inline TreeNode NameId(const std::string& name) {
  return MakeTextElement("saml:NameID", {{"Format", kUpn}}, name);
}

inline TreeNode AttributeWith(const std::string& name, const std::vector<std::string>& values) {
  TreeNode attribute = MakeElement("saml:Attribute", {{"Name", name}});
  for (const std::string& value : values) {
    attribute.children.push_back(MakeTextElement("saml:AttributeValue", {}, value));
  }
  return attribute;
}

inline TreeNode DelegateOf(const std::string& name) {
  return MakeElement("del:Delegate", {{"DelegationInstant", kDates[1].written}}, {NameId(name)});
}

inline TreeNode DelegationOf(const std::vector<std::string>& names) {
  TreeNode condition = MakeElement("saml:Condition", {{"xsi:type", "del:DelegationRestrictionType"}});
  for (const std::string& name : names) {
    condition.children.push_back(DelegateOf(name));
  }
  return condition;
}

inline TreeNode HolderData() {
  return MakeElement(
      "saml:SubjectConfirmationData",
      {{"xsi:type", "saml:KeyInfoConfirmationDataType"}, {"NotOnOrAfter", kDates[4].written}},
      {MakeElement("ds:KeyInfo", {{"xmlns:ds", kDsUri}},
                   {MakeElement("ds:X509Data", {},
                                {MakeTextElement("ds:X509Certificate", {},
                                                 SignerDetail::CertificateText(kLeafCertificatePem))})})});
}

inline TreeNode BearerData() {
  return MakeElement("saml:SubjectConfirmationData", {{"NotOnOrAfter", kDates[4].written}});
}

inline TreeNode AudienceOf(const std::string& uri) {
  return MakeElement("saml:AudienceRestriction", {}, {MakeTextElement("saml:Audience", {}, uri)});
}

inline TreeNode AdviceOf(const std::string& source) {
  return MakeElement("saml:Advice", {},
                     {MakeElement("ext:RSAAdvice", {{"AdviceSource", source}},
                                  {AttributeWith("urn:fact", {"one", "two"})})});
}

/// Whole elements that a token may hold, in their place or out of it.
inline TreeNode MakeBlock(std::uint8_t number) {
  switch (number % 14) {
    case 0:
      return NameId("carol@example.net");
    case 1:
      return AttributeWith(kGroups, {"admins/example.com"});
    case 2:
      return AttributeWith(kSolution, {"true"});
    case 3:
      return AttributeWith(kGivenName, {"Carol"});
    case 4:
      return DelegationOf({"carol@example.net"});
    case 5:
      return MakeElement("saml:ProxyRestriction", {{"Count", "3"}});
    case 6:
      return MakeElement("saml:Condition", {{"xsi:type", "ext:RenewRestrictionType"}, {"Count", "1"}});
    case 7:
      return AudienceOf("urn:audience:2");
    case 8:
      return AdviceOf("urn:source");
    case 9:
      return HolderData();
    case 10:
      return BearerData();
    case 11:
      return DelegateOf("dave@example.net");
    case 12:
      return MakeTextElement("saml:Audience", {}, "urn:audience:3");
    default:
      return MakeElement("saml:AttributeStatement", {}, {AttributeWith("urn:any", {})});
  }
}

constexpr unsigned kAssertionKinds = 4;

/// Assertions to begin with, kAssertionKinds of them: without a signature, of the accepted profile.
inline TreeNode MakeAssertion(std::uint8_t number) {
  const bool isDelegated = number % kAssertionKinds == 1;
  const bool isKeyHeld = number % kAssertionKinds == 2;
  const bool isRich = number % kAssertionKinds == 3;
  TreeNode confirmation =
      MakeElement("saml:SubjectConfirmation", {{"Method", isKeyHeld ? kHolderOfKey : kBearer}});
  TreeNode conditions =
      MakeElement("saml:Conditions", {{"NotBefore", kDates[1].written}, {"NotOnOrAfter", kDates[4].written}});
  if (isDelegated) {
    confirmation.children.push_back(NameId("proxy@example.com"));
    conditions.children.push_back(DelegationOf({"bob@example.com", "proxy@example.com"}));
  }
  if (isRich) {
    conditions.children.push_back(AudienceOf("urn:audience:1"));
    conditions.children.push_back(MakeBlock(5));
    conditions.children.push_back(MakeBlock(6));
  }
  confirmation.children.push_back(isKeyHeld ? HolderData() : BearerData());
  auto attributes = Declarations();
  attributes.insert(attributes.end(),
                    {{"Version", "2.0"}, {"ID", "_1"}, {"IssueInstant", kDates[1].written}});
  TreeNode assertion =
      MakeElement("saml:Assertion", attributes,
                  {MakeTextElement("saml:Issuer", {{"Format", "urn:format"}}, "https://sts.example/"),
                   MakeElement("saml:Subject", {}, {NameId("alice@example.com"), confirmation}), conditions});
  if (isRich) {
    assertion.children.push_back(AdviceOf("urn:source"));
  }
  assertion.children.push_back(
      MakeElement("saml:AuthnStatement", {{"AuthnInstant", kDates[1].written}},
                  {MakeElement("saml:AuthnContext", {},
                               {MakeTextElement("saml:AuthnContextClassRef", {}, "urn:class")})}));
  if (isRich) {
    assertion.children.push_back(
        MakeElement("saml:AttributeStatement", {},
                    {AttributeWith(kGroups, {"example.com\\admins", "users/example.com"}),
                     AttributeWith(kGivenName, {"Alice"}), AttributeWith(kSurname, {})}));
  }
  return assertion;
}

// --- Edits ---

enum class Act : std::uint8_t {
  SET_TEXT,
  TAMPER_TEXT,
  SPLIT_TEXT,
  INSERT_TEXT,
  INSERT_COMMENT,
  INSERT_INSTRUCTION,
  INSERT_BLOCK,
  INSERT_ORIGINAL,
  DROP,
  COPY,
  MOVE,
  SWAP,
  WRAP,
  UNWRAP,
  RENAME,
  REPREFIX,
  SET_ATTRIBUTE,
  DROP_ATTRIBUTE,
  TURN_ATTRIBUTES,
  DECLARE,
  SIGN,
  COUNT
};

/// Carries edits out on a document. `original` is what may be copied into it: a validly signed assertion.
class Editor final {
 public:
  Editor(TreeNode& document, const TreeNode& original) : _document(document), _original(original) {}

  /// Everything but SIGN.
  void Apply(Act act, const Edit& edit) {
    switch (act) {
      case Act::SET_TEXT:
        return WithText(edit[1], [&edit](TreeNode& node) { node.text = Value(edit[2]); });
      case Act::TAMPER_TEXT:
        return WithText(edit[1], [&edit](TreeNode& node) { Tamper(node, edit); });
      case Act::SPLIT_TEXT:
        return SplitText(edit);
      case Act::INSERT_TEXT:
        return Insert(edit[1], edit[2],
                      TreeNode{edit[4] % 2 == 0 ? Kind::TEXT : Kind::CDATA, "", Value(edit[3]), {}, {}});
      case Act::INSERT_COMMENT:
        return Insert(edit[1], edit[2], TreeNode{Kind::COMMENT, "", Value(edit[3]), {}, {}},
                      edit[4] % 8 == 0);
      case Act::INSERT_INSTRUCTION:
        return Insert(edit[1], edit[2], TreeNode{Kind::INSTRUCTION, "pi", "x", {}, {}}, edit[4] % 8 == 0);
      case Act::INSERT_BLOCK:
        return Insert(edit[1], edit[2], MakeBlock(edit[3]));
      case Act::INSERT_ORIGINAL:
        return Insert(edit[1], edit[2], _original);
      case Act::DROP:
        return Drop(edit[1]);
      case Act::COPY:
        return Transfer(edit, true);
      case Act::MOVE:
        return Transfer(edit, false);
      case Act::SWAP:
        return Swap(edit[1]);
      case Act::WRAP:
        return Wrap(edit);
      case Act::UNWRAP:
        return Unwrap(edit[1]);
      case Act::RENAME:
        return WithElement(edit[1], [&edit](TreeNode& node) { node.name = Pick(kElementNames, edit[2]); });
      case Act::REPREFIX:
        return WithElement(edit[1], [this, &edit](TreeNode& node) { Reprefix(node, edit); });
      case Act::SET_ATTRIBUTE:
        return WithElement(edit[1], [&edit](TreeNode& node) {
          SetAttribute(node, Pick(kAttributeNames, edit[2]), Value(edit[3]));
        });
      case Act::DROP_ATTRIBUTE:
        return WithElement(edit[1], [&edit](TreeNode& node) {
          if (!node.attributes.empty()) {
            node.attributes.erase(node.attributes.begin() +
                                  static_cast<std::ptrdiff_t>(edit[2] % node.attributes.size()));
          }
        });
      case Act::TURN_ATTRIBUTES:
        return WithElement(
            edit[1], [](TreeNode& node) { std::reverse(node.attributes.begin(), node.attributes.end()); });
      case Act::DECLARE:
        return WithElement(edit[1], [&edit](TreeNode& node) { Declare(node, edit); });
      case Act::SIGN:
      case Act::COUNT:
        return;
    }
  }

 private:
  static std::string Value(std::uint8_t number) { return Pick(kValues, number); }

  std::vector<Place> Elements() { return FindPlaces(_document, IsElement); }

  template <typename Work>
  void WithElement(std::uint8_t number, Work work) {
    const std::vector<Place> places = Elements();
    work(places[number % places.size()].Get());
  }

  template <typename Work>
  void WithText(std::uint8_t number, Work work) {
    const std::vector<Place> places = FindPlaces(_document, IsText);
    if (!places.empty()) {
      work(places[number % places.size()].Get());
    }
  }

  static void Tamper(TreeNode& node, const Edit& edit) {
    if (node.text.empty()) {
      return;
    }
    const std::size_t at = (edit[2] * 256u + edit[3]) % node.text.size();
    switch (edit[4] % 4) {
      case 0:
        node.text[at] = node.text[at] == 'A' ? 'B' : 'A';
        return;
      case 1:
        node.text.erase(at, 1);
        return;
      case 2:
        node.text.insert(at, " ");
        return;
      default:
        node.text.insert(at, "=");
    }
  }

  void SplitText(const Edit& edit) {
    const std::vector<Place> places = FindPlaces(_document, IsText);
    if (places.empty()) {
      return;
    }
    const Place place = places[edit[1] % places.size()];
    const std::string text = place.Get().text;
    const std::size_t at = edit[2] % (text.size() + 1);
    static const TreeNode kBetween[] = {TreeNode{Kind::COMMENT, "", "c", {}, {}},
                                        TreeNode{Kind::INSTRUCTION, "pi", "x", {}, {}},
                                        TreeNode{Kind::CDATA, "", "", {}, {}}};
    const std::vector<TreeNode> parts = {
        MakeText(text.substr(0, at)), Pick(kBetween, edit[3]),
        TreeNode{edit[4] % 2 == 0 ? Kind::TEXT : Kind::CDATA, "", text.substr(at), {}, {}}};
    std::vector<TreeNode>& siblings = place.parent->children;
    siblings.erase(siblings.begin() + static_cast<std::ptrdiff_t>(place.index));
    siblings.insert(siblings.begin() + static_cast<std::ptrdiff_t>(place.index), parts.begin(), parts.end());
  }

  void Insert(std::uint8_t number, std::uint8_t index, const TreeNode& node, bool beside = false) {
    const std::vector<Place> places = Elements();
    TreeNode& parent = beside ? _document : places[number % places.size()].Get();
    const std::size_t at = index % (parent.children.size() + 1);
    const TreeNode copy = node;
    parent.children.insert(parent.children.begin() + static_cast<std::ptrdiff_t>(at), copy);
  }

  /// A node other than the document element; null when there is no such.
  bool FindMovable(std::uint8_t number, Place& found) {
    const std::vector<Place> places = FindPlaces(_document, [](const TreeNode&) { return true; });
    found = places[number % places.size()];
    return found.parent != &_document || found.Get().kind != Kind::ELEMENT;
  }

  void Drop(std::uint8_t number) {
    Place place{};
    if (FindMovable(number, place)) {
      place.parent->children.erase(place.parent->children.begin() + static_cast<std::ptrdiff_t>(place.index));
    }
  }

  void Transfer(const Edit& edit, bool keep) {
    Place place{};
    if (!FindMovable(edit[1], place)) {
      return;
    }
    const TreeNode node = place.Get();
    if (!keep) {
      Drop(edit[1]);
    }
    Insert(edit[2], edit[3], node);
  }

  void Swap(std::uint8_t number) {
    Place place{};
    if (FindMovable(number, place) && place.index + 1 < place.parent->children.size()) {
      std::swap(place.Get(), place.parent->children[place.index + 1]);
    }
  }

  void Wrap(const Edit& edit) {
    const std::vector<Place> places = Elements();
    const Place place = places[edit[1] % places.size()];
    auto attributes = Declarations();
    attributes.insert(attributes.end(), {{"xmlns:ds", kDsUri}, {"xmlns:soap", "urn:soap"}});
    TreeNode wrapper =
        MakeElement(Pick(kElementNames, edit[2]), edit[3] % 2 == 0 ? attributes : decltype(attributes)());
    wrapper.children.push_back(place.Get());
    place.Get() = wrapper;
  }

  void Unwrap(std::uint8_t number) {
    Place place{};
    if (!FindMovable(number, place)) {
      return;
    }
    const std::vector<TreeNode> inner = place.Get().children;
    std::vector<TreeNode>& siblings = place.parent->children;
    siblings.erase(siblings.begin() + static_cast<std::ptrdiff_t>(place.index));
    siblings.insert(siblings.begin() + static_cast<std::ptrdiff_t>(place.index), inner.begin(), inner.end());
  }

  /// Another prefix for the same namespace, on this element or on all below it.
  void Reprefix(TreeNode& node, const Edit& edit) {
    static const std::map<std::string, std::string> kUsual = {
        {"saml", kSamlUri}, {"ds", kDsUri}, {"del", kDelegationUri}, {"ext", kExtensionUri}};
    const std::string from = PrefixOf(node.name);
    const std::string to = Pick(kPrefixes, edit[2]);
    const auto uri = kUsual.find(from);
    if (uri == kUsual.end()) {
      return;
    }
    SetAttribute(node, to.empty() ? "xmlns" : "xmlns:" + to, uri->second);
    RenamePrefix(node, from, to, edit[3] % 2 == 0);
  }

  static void RenamePrefix(TreeNode& node, const std::string& from, const std::string& to, bool all) {
    if (node.kind == Kind::ELEMENT && PrefixOf(node.name) == from) {
      node.name = (to.empty() ? "" : to + ":") + LocalOf(node.name);
    }
    for (TreeNode& child : node.children) {
      if (all) {
        RenamePrefix(child, from, to, all);
      }
    }
  }

  static void Declare(TreeNode& node, const Edit& edit) {
    const std::string prefix = Pick(kPrefixes, edit[2]);
    const bool isNone = prefix.empty() && edit[4] % 4 == 0;
    SetAttribute(node, prefix.empty() ? "xmlns" : "xmlns:" + prefix, isNone ? "" : Pick(kUris, edit[3]));
  }

  TreeNode& _document;
  const TreeNode _original;
};

/// What a SIGN edit says.
inline Signing ReadSigning(const Edit& edit) {
  Signing signing;
  signing.signer = edit[2] % Signers().size();
  signing.method = (edit[3] % 16) % std::size(kSignatureMethods);
  signing.digest = (edit[3] / 16) % std::size(kDigestMethods);
  signing.infoForm = edit[4] % std::size(kCanonicalMethods);
  signing.referenceForm = (edit[4] / 16) % std::size(kCanonicalMethods);
  signing.cover = static_cast<Cover>(edit[5] % 4);
  signing.namesKey = (edit[5] & 4) != 0;
  return signing;
}

}  // namespace TokenFuzz

#endif  // QUORLIN_FUZZ_TOKENEDITS_H
