// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The directory's file format.

#include "devsts/Directory.h"

#include <nlohmann/json.hpp>

#include <algorithm>
#include <initializer_list>

namespace DevSts {

namespace {

using Json = nlohmann::json;

[[noreturn]] void Refuse(const std::string& where, const std::string& what) {
  throw DirectoryException(where + " " + what);
}

/// A closed list: a misspelt member would otherwise be silently without effect.
void RequireMembers(const Json& object, const std::string& where, std::initializer_list<const char*> names) {
  if (!object.is_object()) {
    Refuse(where, "must be an object");
  }
  for (const auto& item : object.items()) {
    if (std::find(names.begin(), names.end(), item.key()) == names.end()) {
      Refuse(where, "has an unknown member \"" + item.key() + "\"");
    }
  }
}

std::string ReadText(const Json& object, const std::string& where, const char* name) {
  const auto member = object.find(name);
  if (member == object.end()) {
    return "";
  }
  if (!member->is_string()) {
    Refuse(where + "." + name, "must be a string");
  }
  return member->get<std::string>();
}

std::string ReadRequiredText(const Json& object, const std::string& where, const char* name) {
  if (!object.contains(name)) {
    Refuse(where + "." + name, "is missing");
  }
  return ReadText(object, where, name);
}

/// Calls `read(element, where)` for each element of an array that may be missing.
template <typename Read>
void ForEach(const Json& object, const std::string& where, const char* name, const Read& read) {
  const auto member = object.find(name);
  if (member == object.end()) {
    return;
  }
  const std::string path = (where.empty() ? "" : where + ".") + name;
  if (!member->is_array()) {
    Refuse(path, "must be an array");
  }
  for (std::size_t i = 0; i < member->size(); ++i) {
    read((*member)[i], path + "[" + std::to_string(i) + "]");
  }
}

GroupForm ReadGroupForm(const Json& object, const std::string& where) {
  const std::string form = ReadText(object, where, "form");
  if (form.empty() || form == "backslash") {
    return GroupForm::BACKSLASH;
  }
  if (form == "slash") {
    return GroupForm::SLASH;
  }
  Refuse(where + ".form", "must be \"backslash\" or \"slash\"");
}

Group ReadGroup(const Json& object, const std::string& where) {
  RequireMembers(object, where, {"name", "domain", "form"});
  return {ReadRequiredText(object, where, "name"), ReadRequiredText(object, where, "domain"),
          ReadGroupForm(object, where)};
}

std::string ReadFingerprint(const Json& value, const std::string& where) {
  const bool isHex =
      value.is_string() && value.get_ref<const std::string&>().size() == 64 &&
      value.get_ref<const std::string&>().find_first_not_of("0123456789abcdef") == std::string::npos;
  if (!isHex) {
    Refuse(where, "must be a SHA-256 as 64 lower-case hexadecimal digits");
  }
  return value.get<std::string>();
}

bool ReadFlag(const Json& object, const std::string& where, const char* name) {
  const auto member = object.find(name);
  if (member == object.end()) {
    return false;
  }
  if (!member->is_boolean()) {
    Refuse(where + "." + name, "must be true or false");
  }
  return member->get<bool>();
}

User ReadUser(const Json& object, const std::string& where) {
  RequireMembers(
      object, where,
      {"name", "domain", "password", "givenName", "surname", "groups", "solution", "certificates"});
  User user;
  user.name = ReadRequiredText(object, where, "name");
  user.domain = ReadRequiredText(object, where, "domain");
  user.password = ReadText(object, where, "password");
  user.givenName = ReadText(object, where, "givenName");
  user.surname = ReadText(object, where, "surname");
  user.solution = ReadFlag(object, where, "solution");
  ForEach(object, where, "groups",
          [&](const Json& value, const std::string& path) { user.groups.push_back(ReadGroup(value, path)); });
  ForEach(object, where, "certificates", [&](const Json& value, const std::string& path) {
    user.certificates.push_back(ReadFingerprint(value, path));
  });
  return user;
}

/// The library's own message would quote the file around the error, passwords included.
Json ParseJson(const std::string& text) {
  try {
    return Json::parse(text);
  } catch (const Json::parse_error& e) {
    const std::size_t end = std::min(e.byte, text.size());
    const auto line = 1 + std::count(text.begin(), text.begin() + static_cast<std::ptrdiff_t>(end), '\n');
    throw DirectoryException("the directory is not JSON: see line " + std::to_string(line));
  }
}

}  // namespace

Directory Directory::FromJson(const std::string& json) {
  const Json root = ParseJson(json);
  RequireMembers(root, "the directory", {"users"});
  if (!root.contains("users")) {
    Refuse("the directory's member \"users\"", "is missing");
  }
  std::vector<User> users;
  ForEach(root, "", "users",
          [&](const Json& value, const std::string& path) { users.push_back(ReadUser(value, path)); });
  return Directory(std::move(users));
}

}  // namespace DevSts
