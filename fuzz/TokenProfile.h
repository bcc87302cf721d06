// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The accepted assertion once more, as a table: which elements, which attributes, which children, and what
// the token then means. Written apart from the library's reader, so that the two check each other.

#ifndef QUORLIN_FUZZ_TOKENPROFILE_H
#define QUORLIN_FUZZ_TOKENPROFILE_H

#include "TokenTree.h"

#include <array>
#include <optional>
#include <set>
#include <sstream>
#include <string>
#include <vector>

namespace TokenFuzz {

constexpr const char* kSamlUri = "urn:oasis:names:tc:SAML:2.0:assertion";
constexpr const char* kDelegationUri = "urn:oasis:names:tc:SAML:2.0:conditions:delegation";
constexpr const char* kExtensionUri = QUORLIN_VENDOR_URI_BASE "/names/2009/12/std-ext/SAML2.0";
constexpr const char* kInstanceUri = "http://www.w3.org/2001/XMLSchema-instance";
constexpr const char* kDsUri = "http://www.w3.org/2000/09/xmldsig#";
constexpr const char* kBearer = "urn:oasis:names:tc:SAML:2.0:cm:bearer";
constexpr const char* kHolderOfKey = "urn:oasis:names:tc:SAML:2.0:cm:holder-of-key";
constexpr const char* kUpn = "http://schemas.xmlsoap.org/claims/UPN";
constexpr const char* kGroups = QUORLIN_VENDOR_URI_BASE "/schemas/attr-names/2009/01/GroupIdentity";
constexpr const char* kSolution = QUORLIN_VENDOR_URI_BASE "/schemas/attr-names/2011/07/isSolution";
constexpr const char* kGivenName = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/givenname";
constexpr const char* kSurname = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/surname";

/// The dates that edits use, in order, and how they print. "Now" lies between PRESENT and FUTURE.
struct DateRow {
  const char* written;
  const char* printed;
};
constexpr DateRow kDates[] = {{"2001-01-01T00:00:00Z", "2001-01-01T00:00:00Z"},
                              {"2020-01-01T00:00:00Z", "2020-01-01T00:00:00Z"},
                              {"2020-06-01T12:00:00.25+02:00", "2020-06-01T10:00:00.25Z"},
                              {"9000-01-01T00:00:00Z", "9000-01-01T00:00:00Z"},
                              {"9999-12-31T23:59:59Z", "9999-12-31T23:59:59Z"}};
constexpr std::size_t kFirstFutureDate = 3;

/// A certificate that a token may name as its holder's.
struct Holder {
  std::string base64;
  std::string sha256;
};

/// What the profile says of an element: `meaning` as TestSupport::MeaningOf words it, or none when it is
/// refused. Some little is not decided here (`isCertain` false): base64 with white space in it.
struct Judgement {
  std::optional<std::string> meaning;
  bool isCertain = true;
};

struct ElementRule {
  const char* name;
  const char* required;  ///< Attributes; "*": they do not matter.
  const char* allowed;
  /// Names in order, each with ? * or +; or #text, #empty, #any. "#each" starts a list in any order, each at
  /// most once.
  const char* content;
};

constexpr ElementRule kRules[] = {
    {"saml:Assertion", "Version ID IssueInstant", "",
     "saml:Issuer ds:Signature saml:Subject saml:Conditions saml:Advice? saml:AuthnStatement "
     "saml:AttributeStatement?"},
    {"saml:Issuer", "Format", "", "#text"},
    {"saml:NameID", "Format", "", "#text"},
    {"ds:Signature", "*", "", "#any"},  // Judged by what was signed.
    {"saml:Subject", "", "", "saml:NameID saml:SubjectConfirmation"},
    {"saml:SubjectConfirmation", "Method", "", "saml:NameID? saml:SubjectConfirmationData"},
    {"saml:SubjectConfirmationData[bearer]", "NotOnOrAfter", "", "#empty"},
    {"saml:SubjectConfirmationData[key]", "xsi:type", "NotOnOrAfter", "ds:KeyInfo"},
    {"ds:KeyInfo", "", "", "ds:X509Data"},
    {"ds:X509Data", "", "", "ds:X509Certificate"},
    {"ds:X509Certificate", "", "", "#text"},
    {"saml:Conditions", "NotBefore NotOnOrAfter", "",
     "#each saml:AudienceRestriction saml:ProxyRestriction saml:Condition[renew] "
     "saml:Condition[delegation]"},
    {"saml:AudienceRestriction", "*", "", "saml:Audience+"},
    {"saml:Audience", "*", "", "#text"},
    {"saml:ProxyRestriction", "", "Count", "#empty"},
    {"saml:Condition[renew]", "xsi:type", "Count Postdatable RenewExpired", "#empty"},
    {"saml:Condition[delegation]", "xsi:type", "", "del:Delegate+"},
    {"del:Delegate", "DelegationInstant", "", "saml:NameID"},
    {"saml:Advice", "", "", "ext:RSAAdvice+"},
    {"ext:RSAAdvice", "AdviceSource", "", "saml:Attribute+"},
    {"saml:AuthnStatement", "AuthnInstant", "", "saml:AuthnContext"},
    {"saml:AuthnContext", "", "", "saml:AuthnContextClassRef"},
    {"saml:AuthnContextClassRef", "*", "", "#text"},
    {"saml:AttributeStatement", "", "", "saml:Attribute+"},
    {"saml:Attribute", "Name", "NameFormat FriendlyName", "saml:AttributeValue*"},
    {"saml:AttributeValue", "*", "", "#text"},
};

/// An element with its namespaces resolved and all that does not count left out. `rule` is its name with the
/// short prefixes of the table, and the variant in brackets where there are several.
struct Reading {
  std::string rule;
  std::vector<std::pair<std::string, std::string>> attributes;
  std::vector<Reading> children;  ///< Texts are "#text" with their text, instructions "#instruction".
  std::string text;

  const std::string& operator[](const char* attribute) const {
    static const std::string none;
    for (const auto& one : attributes) {
      if (one.first == attribute) {
        return one.second;
      }
    }
    return none;
  }
  const Reading* Find(const std::string& name) const {
    for (const Reading& child : children) {
      if (child.rule == name) {
        return &child;
      }
    }
    return nullptr;
  }
  /// The child of a tree that fits the table.
  const Reading& Child(const std::string& name) const { return *Find(name); }
  /// The text of an element whose content is one.
  const std::string& Text() const { return children.front().text; }
};

namespace ProfileDetail {

inline std::string ShortPrefix(const std::string& uri) {
  static const std::map<std::string, std::string> known = {
      {kSamlUri, "saml:"}, {kDsUri, "ds:"}, {kDelegationUri, "del:"}, {kExtensionUri, "ext:"}, {"", ""}};
  const auto found = known.find(uri);
  return found == known.end() ? "other:" : found->second;
}

/// A name in the value of xsi:type.
inline std::string ShortType(const std::string& value, const Scope& scope) {
  return ShortPrefix(Resolve(PrefixOf(value), scope)) + LocalOf(value);
}

inline std::string Variant(const std::string& rule, const Reading& reading, const TreeNode* parent,
                           const Scope& scope) {
  const std::string type = ShortType(reading["xsi:type"], scope);
  if (rule == "saml:Condition") {
    return type == "ext:RenewRestrictionType"        ? "[renew]"
           : type == "del:DelegationRestrictionType" ? "[delegation]"
                                                     : "[unknown]";
  }
  if (rule == "saml:SubjectConfirmationData") {
    const std::string* const method = parent == nullptr ? nullptr : FindAttribute(*parent, "Method");
    if (method != nullptr && *method == kBearer) {
      return "[bearer]";
    }
    return method != nullptr && *method == kHolderOfKey && type == "saml:KeyInfoConfirmationDataType"
               ? "[key]"
               : "[unknown]";
  }
  return "";
}

inline bool IsBlank(const std::string& text) {
  return text.find_first_not_of(" \t\r\n") == std::string::npos;
}

inline Reading Read(const TreeNode& element, const TreeNode* parent, const Scope& around) {
  const Scope scope = ScopeWithin(element, around);
  Reading reading;
  for (const auto& attribute : element.attributes) {
    if (IsDeclaration(attribute.first)) {
      continue;
    }
    const std::string prefix = PrefixOf(attribute.first);
    const bool isInstance = !prefix.empty() && Resolve(prefix, scope) == kInstanceUri;
    reading.attributes.emplace_back(isInstance ? "xsi:" + LocalOf(attribute.first) : attribute.first,
                                    attribute.second);
  }
  const std::string name = ShortPrefix(Resolve(PrefixOf(element.name), scope)) + LocalOf(element.name);
  reading.rule = name + Variant(name, reading, parent, scope);
  // Neighbouring texts are one for a parser, unless a comment stands between them.
  Reading pending{"#text", {}, {}, ""};
  const auto flush = [&reading, &pending] {
    if (!IsBlank(pending.text)) {
      reading.children.push_back(pending);
    }
    pending.text.clear();
  };
  for (const TreeNode& child : element.children) {
    if (IsText(child)) {
      pending.text += child.text;
      continue;
    }
    flush();
    if (child.kind == Kind::INSTRUCTION) {
      reading.children.push_back(Reading{"#instruction", {}, {}, ""});
    } else if (child.kind == Kind::ELEMENT) {
      reading.children.push_back(Read(child, &element, scope));
    }
  }
  flush();
  return reading;
}

inline std::vector<std::string> Words(const char* list) {
  std::istringstream stream(list);
  std::vector<std::string> words;
  for (std::string word; stream >> word;) {
    words.push_back(word);
  }
  return words;
}

/// The rule with its lists split.
struct Rule {
  bool anyAttributes;
  std::vector<std::string> required;
  std::vector<std::string> allowed;
  std::vector<std::string> content;
};

inline const Rule* FindRule(const std::string& name) {
  static const std::map<std::string, Rule> rules = [] {
    std::map<std::string, Rule> all;
    for (const ElementRule& row : kRules) {
      all[row.name] =
          Rule{std::string(row.required) == "*", Words(row.required), Words(row.allowed), Words(row.content)};
    }
    return all;
  }();
  const auto found = rules.find(name);
  return found == rules.end() ? nullptr : &found->second;
}

inline bool Holds(const std::vector<std::string>& list, const std::string& word) {
  return std::find(list.begin(), list.end(), word) != list.end();
}

inline bool FitAttributes(const Reading& element, const Rule& rule) {
  std::size_t found = 0;
  for (const auto& attribute : element.attributes) {
    if (Holds(rule.required, attribute.first)) {
      ++found;
    } else if (!Holds(rule.allowed, attribute.first)) {
      return false;
    }
  }
  return found == rule.required.size();
}

inline bool Fits(const Reading& element);

inline bool FitEach(const Reading& element, const std::vector<std::string>& names) {
  std::set<std::string> seen;
  for (const Reading& child : element.children) {
    if (!Holds(names, child.rule) || !seen.insert(child.rule).second || !Fits(child)) {
      return false;
    }
  }
  return true;
}

inline bool FitSequence(const Reading& element, const std::vector<std::string>& names) {
  std::size_t at = 0;
  for (std::string name : names) {
    const char last = name.back();
    const bool mayMiss = last == '?' || last == '*';
    const bool mayRepeat = last == '+' || last == '*';
    if (mayMiss || mayRepeat) {
      name.pop_back();
    }
    // The variant of an element that has some is part of its reading, not of its parent's rule.
    const auto isNext = [&] {
      const bool isThere = at < element.children.size();
      const std::string rule = isThere ? element.children[at].rule : "";
      return isThere && (rule == name || rule.compare(0, name.size() + 1, name + "[") == 0);
    };
    std::size_t count = 0;
    while (isNext() && (mayRepeat || count == 0)) {
      if (!Fits(element.children[at])) {
        return false;
      }
      ++at;
      ++count;
    }
    if (count == 0 && !mayMiss) {
      return false;
    }
  }
  return at == element.children.size();
}

inline bool Fits(const Reading& element) {
  const Rule* const rule = FindRule(element.rule);
  if (rule == nullptr || (!rule->anyAttributes && !FitAttributes(element, *rule))) {
    return false;
  }
  const std::string& first = rule->content.front();
  if (first == "#any") {
    return true;
  }
  if (first == "#empty") {
    return element.children.empty();
  }
  if (first == "#text") {
    return element.children.size() == 1 && element.children.front().rule == "#text";
  }
  return first == "#each" ? FitEach(element, rule->content) : FitSequence(element, rule->content);
}

// --- Values ---

inline const DateRow* FindDate(const std::string& text) {
  for (const DateRow& row : kDates) {
    if (text == row.written) {
      return &row;
    }
  }
  return nullptr;
}

/// Where the date stands in the list; its end when it is none.
inline std::size_t DateRank(const std::string& text) {
  const DateRow* const row = FindDate(text);
  return row == nullptr ? std::size(kDates) : static_cast<std::size_t>(row - kDates);
}

inline bool IsCount(const Reading& element) {
  for (const auto& attribute : element.attributes) {
    if (attribute.first == "Count") {
      const std::string digits = attribute.second.substr(attribute.second.compare(0, 1, "+") == 0 ? 1 : 0);
      return !digits.empty() && digits.size() < 19 &&
             digits.find_first_not_of("0123456789") == std::string::npos;
    }
  }
  return true;
}

inline bool Permits(const Reading* restriction) {
  if (restriction == nullptr) {
    return false;
  }
  const std::string& count = (*restriction)["Count"];
  return count.find_first_of("123456789") != std::string::npos;
}

/// "{name}{domain}" of two parts; none when there are more, or one is empty.
inline std::optional<std::string> Split(const std::string& text, char separator, bool domainFirst) {
  const std::size_t at = text.find(separator);
  if (at == std::string::npos || at == 0 || at + 1 == text.size() || text.rfind(separator) != at) {
    return std::nullopt;
  }
  const std::string left = "{" + text.substr(0, at) + "}";
  const std::string right = "{" + text.substr(at + 1) + "}";
  return domainFirst ? right + left : left + right;
}

inline std::optional<std::string> Principal(const Reading& nameId) {
  return nameId["Format"] == kUpn ? Split(nameId.Text(), '@', false) : std::nullopt;
}

inline std::optional<std::string> Group(const std::string& text) {
  return text.find('\\') != std::string::npos ? Split(text, '\\', true) : Split(text, '/', false);
}

// --- Meaning ---

class Refusal final {};

inline void Demand(bool holds) {
  if (!holds) {
    throw Refusal();
  }
}

template <typename T>
const T& Demand(const std::optional<T>& value) {
  Demand(value.has_value());
  return *value;
}

inline void CheckPeriod(const Reading& assertion) {
  const Reading& conditions = assertion.Child("saml:Conditions");
  const std::size_t start = DateRank(conditions["NotBefore"]);
  const std::size_t end = DateRank(conditions["NotOnOrAfter"]);
  Demand(end < std::size(kDates) && start < end && start < kFirstFutureDate && end >= kFirstFutureDate);
  Demand(FindDate(assertion["IssueInstant"]) != nullptr);
  Demand(FindDate(assertion.Child("saml:AuthnStatement")["AuthnInstant"]) != nullptr);
  const Reading& confirmation = assertion.Child("saml:Subject").Child("saml:SubjectConfirmation");
  if (const Reading* const data = confirmation.Find("saml:SubjectConfirmationData[bearer]")) {
    const std::size_t confirmed = DateRank((*data)["NotOnOrAfter"]);
    Demand(confirmed < std::size(kDates) && confirmed >= end);
  }
}

inline std::string Delegates(const Reading& assertion) {
  const Reading& confirmation = assertion.Child("saml:Subject").Child("saml:SubjectConfirmation");
  const Reading* const id = confirmation.Find("saml:NameID");
  const Reading* const restriction = assertion.Child("saml:Conditions").Find("saml:Condition[delegation]");
  Demand((id == nullptr) == (restriction == nullptr));
  if (id == nullptr) {
    return "";
  }
  const Reading& last = restriction->children.back().Child("saml:NameID");
  Demand((*id)["Format"] == last["Format"] && id->Text() == last.Text());
  std::string lines;
  for (const Reading& delegate : restriction->children) {
    const DateRow* const date = FindDate(delegate["DelegationInstant"]);
    Demand(date != nullptr);
    lines += "delegate " + Demand(Principal(delegate.Child("saml:NameID"))) + " " + date->printed + "\n";
  }
  return lines;
}

/// What attributes say.
struct Facts {
  std::string given;
  std::string surname;
  std::string groups;
  bool isSolution = false;
};

inline std::string ToLower(std::string text) {
  std::transform(text.begin(), text.end(), text.begin(),
                 [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; });
  return text;
}

inline void TakeAttribute(const Reading& attribute, Facts& facts) {
  const std::string& name = attribute["Name"];
  const std::string first = attribute.children.empty() ? "" : attribute.children.front().Text();
  if (name == kGroups) {
    for (const Reading& value : attribute.children) {
      facts.groups += "group " + Demand(Group(value.Text())) + "\n";
    }
  } else if (name == kSolution) {
    Demand(attribute.children.size() == 1);
    facts.isSolution = ToLower(first) == "true";
  } else if (name == kGivenName) {
    facts.given = first;
  } else if (name == kSurname) {
    facts.surname = first;
  }
}

inline Facts ReadFacts(const Reading& assertion) {
  Facts facts;
  if (const Reading* const statement = assertion.Find("saml:AttributeStatement")) {
    for (const Reading& attribute : statement->children) {
      TakeAttribute(attribute, facts);
    }
  }
  return facts;
}

inline std::string Audience(const Reading& conditions) {
  std::set<std::string> audience;
  if (const Reading* const restriction = conditions.Find("saml:AudienceRestriction")) {
    for (const Reading& one : restriction->children) {
      audience.insert(one.Text());
    }
  }
  std::string lines;
  for (const std::string& uri : audience) {
    lines += "audience {" + uri + "}\n";
  }
  return lines;
}

inline std::string AdviceLines(const Reading& assertion) {
  std::string lines;
  if (const Reading* const advice = assertion.Find("saml:Advice")) {
    for (const Reading& one : advice->children) {
      lines += "advice {" + one["AdviceSource"] + "}";
      for (const Reading& attribute : one.children) {
        lines += " {" + attribute["Name"] + "}:";
        for (const Reading& value : attribute.children) {
          lines += "{" + value.Text() + "}";
        }
      }
      lines += "\n";
    }
  }
  return lines;
}

inline std::string HolderLine(const Reading& confirmation, const std::vector<Holder>& holders,
                              bool& isCertain) {
  const Reading* const data = confirmation.Find("saml:SubjectConfirmationData[key]");
  if (data == nullptr) {
    return "none";
  }
  std::string text = data->Child("ds:KeyInfo").Child("ds:X509Data").Child("ds:X509Certificate").Text();
  for (const Holder& holder : holders) {
    if (text == holder.base64) {
      return holder.sha256;
    }
  }
  // A bit of the last character may be free, white space may stand anywhere: left to the codec's own tests.
  isCertain = text.size() < 100;
  throw Refusal();
}

inline std::string Meaning(const Reading& assertion, const std::vector<Holder>& holders, bool& isCertain) {
  Demand(assertion["Version"] == "2.0" && assertion["ID"].compare(0, 1, "_") == 0);
  CheckPeriod(assertion);
  const Reading& subject = assertion.Child("saml:Subject");
  const Reading& confirmation = subject.Child("saml:SubjectConfirmation");
  const Reading& conditions = assertion.Child("saml:Conditions");
  const std::string delegates = Delegates(assertion);
  const Facts facts = ReadFacts(assertion);
  const Reading* const proxy = conditions.Find("saml:ProxyRestriction");
  const Reading* const renew = conditions.Find("saml:Condition[renew]");
  Demand((proxy == nullptr || IsCount(*proxy)) && (renew == nullptr || IsCount(*renew)));
  return "id {" + assertion["ID"] + "}\nfrom " + FindDate(conditions["NotBefore"])->printed + " until " +
         FindDate(conditions["NotOnOrAfter"])->printed + "\nsubject " +
         Demand(Principal(subject.Child("saml:NameID"))) + "\nname {" + facts.given + "}{" + facts.surname +
         "}\n" + facts.groups + delegates + "renewable " + (Permits(renew) ? "1" : "0") + ", delegable " +
         (Permits(proxy) ? "1" : "0") + ", solution " + (facts.isSolution ? "1" : "0") + ", confirmation " +
         (confirmation["Method"] == kBearer ? "0" : "1") + "\n" + Audience(conditions) +
         AdviceLines(assertion) + "certificate " + HolderLine(confirmation, holders, isCertain) + "\n";
}

}  // namespace ProfileDetail

/// Judges an element that is well-formed where it stands.
inline Judgement JudgeByProfile(const TreeNode& element, const Scope& around,
                                const std::vector<Holder>& holders) {
  using namespace ProfileDetail;
  Judgement judgement;
  const Reading reading = Read(element, nullptr, around);
  if (reading.rule != "saml:Assertion" || !Fits(reading)) {
    return judgement;
  }
  try {
    judgement.meaning = Meaning(reading, holders, judgement.isCertain);
  } catch (const Refusal&) {
  }
  return judgement;
}

}  // namespace TokenFuzz

#endif  // QUORLIN_FUZZ_TOKENPROFILE_H
