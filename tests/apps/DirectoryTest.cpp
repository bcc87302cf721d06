// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The development token service's users.

#include "devsts/Directory.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using DevSts::Directory;
using DevSts::DirectoryException;
using DevSts::User;

/// The user's principal name, or "none".
std::string Name(const User* user) {
  return user == nullptr ? "none" : user->GetUpn();
}

User MakeUser(const std::string& name, const std::string& domain, const std::string& password) {
  User user;
  user.name = name;
  user.domain = domain;
  user.password = password;
  return user;
}

const Directory& TwoDomains() {
  static const Directory directory({MakeUser("ann", "one.example", "a"), MakeUser("ann", "two.example", "b"),
                                    MakeUser("ben", "two.example", "")});
  return directory;
}

TEST(Directory, FindsUsersByTheFormsOfTheirNames) {
  EXPECT_EQ(Name(TwoDomains().FindByName("ann@one.example")), "ann@one.example");
  EXPECT_EQ(Name(TwoDomains().FindByName("ANN@Two.Example")), "ann@two.example");
  EXPECT_EQ(Name(TwoDomains().FindByName("two.example\\ann")), "ann@two.example");
  EXPECT_EQ(Name(TwoDomains().FindByName("ben")), "ben@two.example");
}

TEST(Directory, FindsNobodyByAnAmbiguousOrUnknownName) {
  for (const char* const name :
       {"ann", "", "@", "carl", "ann@three.example", "ann\\one.example", "one.example/ann"}) {
    EXPECT_EQ(Name(TwoDomains().FindByName(name)), "none") << name;
  }
}

TEST(Directory, AuthenticatesByTheWholePasswordOnly) {
  EXPECT_EQ(Name(TwoDomains().Authenticate("ann@one.example", "a")), "ann@one.example");
  for (const char* const password : {"", "A", "a ", "aa", "b"}) {
    EXPECT_EQ(Name(TwoDomains().Authenticate("ann@one.example", password)), "none") << password;
  }
}

TEST(Directory, NeverAuthenticatesAUserWithoutPassword) {
  EXPECT_EQ(Name(TwoDomains().Authenticate("ben@two.example", "")), "none");
}

TEST(Directory, NeverAuthenticatesAnUnknownUser) {
  EXPECT_EQ(Name(TwoDomains().Authenticate("carl@two.example", "")), "none");
}

TEST(Directory, ReadsEverythingFromJson) {
  const Directory directory = Directory::FromJson(R"({"users": [{
      "name": "ann", "domain": "one.example", "password": "a", "givenName": "Ann", "surname": "Other",
      "groups": [{"name": "g", "domain": "d"}, {"name": "h", "domain": "e", "form": "slash"}],
      "solution": true,
      "certificates": ["00000000000000000000000000000000000000000000000000000000000000ff"]}]})");
  const User* const user =
      directory.FindByCertificate("00000000000000000000000000000000000000000000000000000000000000ff");
  ASSERT_NE(user, nullptr);
  EXPECT_EQ(user->GetUpn(), "ann@one.example");
  EXPECT_EQ(user->password, "a");
  EXPECT_EQ(user->givenName, "Ann");
  EXPECT_EQ(user->surname, "Other");
  EXPECT_TRUE(user->solution);
  ASSERT_EQ(user->groups.size(), 2U);
  EXPECT_EQ(user->groups[0].name, "g");
  EXPECT_EQ(user->groups[0].domain, "d");
  EXPECT_EQ(user->groups[0].form, DevSts::GroupForm::BACKSLASH);
  EXPECT_EQ(user->groups[1].name, "h");
  EXPECT_EQ(user->groups[1].form, DevSts::GroupForm::SLASH);
}

TEST(Directory, FindsNobodyByAnUnknownCertificate) {
  EXPECT_EQ(Directory::MakeSample().FindByCertificate(""), nullptr);
}

struct BadFile {
  const char* name;
  const char* json;
  const char* message;
};

class DirectoryRefuses : public testing::TestWithParam<BadFile> {};

TEST_P(DirectoryRefuses, AndSaysWhere) {
  try {
    Directory::FromJson(GetParam().json);
    FAIL() << "accepted";
  } catch (const DirectoryException& e) {
    EXPECT_STREQ(e.what(), GetParam().message);
  }
}

const BadFile kBadFiles[] = {
    {"BrokenJson", "{\n\"users\": [\n{\"name\": \"a\", \"password\": \"topsecret\" oops}]}",
     "the directory is not JSON: see line 3"},
    {"Empty", "", "the directory is not JSON: see line 1"},
    {"NoObject", "[]", "the directory must be an object"},
    {"NoUsers", "{}", "the directory's member \"users\" is missing"},
    {"UnknownMember", R"({"users": [], "groups": []})", "the directory has an unknown member \"groups\""},
    {"UsersNoArray", R"({"users": {}})", "users must be an array"},
    {"UserNoObject", R"({"users": [1]})", "users[0] must be an object"},
    {"NameMissing", R"({"users": [{"domain": "d"}]})", "users[0].name is missing"},
    {"DomainMissing", R"({"users": [{"name": "n"}]})", "users[0].domain is missing"},
    {"PasswordNoString", R"({"users": [{"name": "n", "domain": "d", "password": 123456}]})",
     "users[0].password must be a string"},
    {"MisspeltMember", R"({"users": [{"name": "n", "domain": "d", "pasword": "p"}]})",
     "users[0] has an unknown member \"pasword\""},
    {"SolutionNoBoolean", R"({"users": [{"name": "n", "domain": "d", "solution": "yes"}]})",
     "users[0].solution must be true or false"},
    {"GroupWithoutDomain", R"({"users": [{"name": "n", "domain": "d", "groups": [{"name": "g"}]}]})",
     "users[0].groups[0].domain is missing"},
    {"GroupForm",
     R"({"users": [{"name": "n", "domain": "d", "groups": [{"name": "g", "domain": "d", "form": "x"}]}]})",
     "users[0].groups[0].form must be \"backslash\" or \"slash\""},
    {"CertificateNoFingerprint", R"({"users": [{"name": "n", "domain": "d", "certificates": ["AB"]}]})",
     "users[0].certificates[0] must be a SHA-256 as 64 lower-case hexadecimal digits"},
    {"NameWithSeparator", R"({"users": [{"name": "n@m", "domain": "d"}]})",
     "a user's name holds one of the characters @ \\ /"},
    {"EmptyName", R"({"users": [{"name": "", "domain": "d"}]})", "a user's name is empty"},
    {"NameThatXmlCannotCarry", "{\"users\": [{\"name\": \"n\\u0001\", \"domain\": \"d\"}]}",
     "a user's name holds characters that XML cannot carry"},
    {"SameUserTwice", R"({"users": [{"name": "n", "domain": "d"}, {"name": "N", "domain": "D"}]})",
     "user N@D is there twice"},
};

INSTANTIATE_TEST_SUITE_P(Table, DirectoryRefuses, testing::ValuesIn(kBadFiles),
                         [](const auto& test) { return std::string(test.param.name); });

}  // namespace
