// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "devsts/Directory.h"

#include <pelmar/StringUtil.h>
#include <pelmar/crypto/Digest.h>

#include <openssl/crypto.h>

#include <algorithm>
#include <set>
#include <utility>

namespace DevSts {

namespace {

using Pelmar::StringUtil::ToLower;

/// Compares digests, which have one length, so that neither content nor length of the password shows in the
/// time it takes.
bool IsSamePassword(const std::string& a, const std::string& b) {
  using Pelmar::Crypto::ComputeDigest;
  const std::vector<unsigned char> first = ComputeDigest(Pelmar::Crypto::DIGEST_SHA256, a.data(), a.size());
  const std::vector<unsigned char> second = ComputeDigest(Pelmar::Crypto::DIGEST_SHA256, b.data(), b.size());
  return CRYPTO_memcmp(first.data(), second.data(), first.size()) == 0;
}

/// These separate names from domains in tokens.
void RequireName(const std::string& text, const std::string& what) {
  if (text.empty()) {
    throw DirectoryException(what + " is empty");
  }
  if (text.find_first_of("@\\/") != std::string::npos) {
    throw DirectoryException(what + " holds one of the characters @ \\ /");
  }
  if (!Pelmar::StringUtil::IsXmlText(text)) {
    throw DirectoryException(what + " holds characters that XML cannot carry");
  }
}

void RequireUser(const User& user) {
  RequireName(user.name, "a user's name");
  RequireName(user.domain, "the domain of user " + user.name);
  for (const Group& group : user.groups) {
    RequireName(group.name, "the name of a group of user " + user.name);
    RequireName(group.domain, "the domain of a group of user " + user.name);
  }
  if (!Pelmar::StringUtil::IsXmlText(user.givenName + user.surname)) {
    throw DirectoryException("the full name of user " + user.name +
                             " holds characters that XML cannot carry");
  }
}

}  // namespace

Directory::Directory(std::vector<User> users) : _users(std::move(users)) {
  std::set<std::string> names;
  std::set<std::string> certificates;
  for (const User& user : _users) {
    RequireUser(user);
    if (!names.insert(ToLower(user.GetUpn())).second) {
      throw DirectoryException("user " + user.GetUpn() + " is there twice");
    }
    for (const std::string& certificate : user.certificates) {
      if (!certificates.insert(certificate).second) {
        throw DirectoryException("a certificate of user " + user.GetUpn() + " is there twice");
      }
    }
  }
}

const User* Directory::FindByName(const std::string& name) const {
  const std::string wanted = ToLower(name);
  const bool isBare = wanted.find_first_of("@\\") == std::string::npos;
  const User* found = nullptr;
  for (const User& user : _users) {
    const std::string userName = ToLower(user.name);
    const std::string domain = ToLower(user.domain);
    if (wanted != (isBare ? userName : userName + "@" + domain) && wanted != domain + "\\" + userName) {
      continue;
    }
    if (found != nullptr) {
      return nullptr;
    }
    found = &user;
  }
  return found;
}

const User* Directory::FindByCertificate(const std::string& sha256Hex) const {
  for (const User& user : _users) {
    if (std::find(user.certificates.begin(), user.certificates.end(), sha256Hex) != user.certificates.end()) {
      return &user;
    }
  }
  return nullptr;
}

const User* Directory::Authenticate(const std::string& name, const std::string& password) const {
  const User* const user = FindByName(name);
  const bool isRight = IsSamePassword(user != nullptr ? user->password : std::string(), password);
  return user != nullptr && !user->password.empty() && isRight ? user : nullptr;
}

Directory Directory::MakeSample() {
  return Directory(MakeSampleUsers());
}

std::vector<User> Directory::MakeSampleUsers() {
  User alice;
  alice.name = "alice";
  alice.domain = "example.com";
  alice.password = "secret";
  alice.givenName = "Alice";
  alice.surname = "Example";
  alice.groups = {{"Administrators", "example.com", GroupForm::BACKSLASH},
                  {"Staff", "example.com", GroupForm::SLASH}};

  User bob;
  bob.name = "bob";
  bob.domain = "example.com";
  bob.password = "builder";
  bob.givenName = "Bob";
  bob.surname = "Example";
  bob.groups = {{"Staff", "example.com", GroupForm::SLASH}};

  User backup;
  backup.name = "backup-service";
  backup.domain = "example.com";
  backup.password = "tape";
  backup.solution = true;

  return {alice, bob, backup};
}

}  // namespace DevSts
