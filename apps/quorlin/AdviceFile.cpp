// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/AdviceFile.h"

#include "quorlin/Failure.h"
#include "quorlin/Files.h"

#include <nlohmann/json.hpp>

namespace Cli {

namespace {

using Json = nlohmann::json;

[[noreturn]] void Refuse(const std::string& where, const char* what) {
  throw UsageException(where + " " + what);
}

std::string ReadText(const Json& value, const std::string& where) {
  if (!value.is_string()) {
    Refuse(where, "must be a string");
  }
  return value.get<std::string>();
}

/// Two members and no other.
void RequireMembers(const Json& value, const std::string& where, const char* first, const char* second) {
  if (!value.is_object() || value.size() != 2 || !value.contains(first) || !value.contains(second)) {
    throw UsageException(where + " must be an object of \"" + first + "\" and \"" + second + "\"");
  }
}

template <typename Item, typename Read>
std::vector<Item> ReadArray(const Json& value, const std::string& where, const Read& read) {
  if (!value.is_array()) {
    Refuse(where, "must be an array");
  }
  std::vector<Item> items;
  for (std::size_t i = 0; i < value.size(); ++i) {
    items.push_back(read(value[i], where + "[" + std::to_string(i) + "]"));
  }
  return items;
}

Quorlin::AdviceAttribute ReadAttribute(const Json& value, const std::string& where) {
  RequireMembers(value, where, "name", "values");
  return {ReadText(value["name"], where + ".name"),
          ReadArray<std::string>(value["values"], where + ".values", ReadText)};
}

Quorlin::Advice ReadOneAdvice(const Json& value, const std::string& where) {
  RequireMembers(value, where, "source", "attributes");
  return {ReadText(value["source"], where + ".source"),
          ReadArray<Quorlin::AdviceAttribute>(value["attributes"], where + ".attributes", ReadAttribute)};
}

}  // namespace

std::vector<Quorlin::Advice> ReadAdvice(const std::string& path) {
  try {
    return ReadArray<Quorlin::Advice>(Json::parse(ReadFile(path)), path + ": advice", ReadOneAdvice);
  } catch (const Json::parse_error& e) {
    throw UsageException(path + " is not JSON: see byte " + std::to_string(e.byte));
  }
}

}  // namespace Cli
