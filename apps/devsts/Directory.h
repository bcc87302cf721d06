// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The users the service knows.

#ifndef QUORLIN_DEVSTS_DIRECTORY_H
#define QUORLIN_DEVSTS_DIRECTORY_H

#include <stdexcept>
#include <string>
#include <vector>

namespace DevSts {

/// How a group is written into a token.
enum class GroupForm {
  BACKSLASH,  ///< domain\name
  SLASH       ///< name/domain
};

struct Group {
  std::string name;
  std::string domain;
  GroupForm form = GroupForm::BACKSLASH;
};

struct User {
  std::string name;
  std::string domain;
  /// Empty: the user cannot log in by password.
  std::string password;
  std::string givenName;
  std::string surname;
  std::vector<Group> groups;
  /// A service account rather than a person.
  bool solution = false;
  /// SHA-256 of the DER encodings, in lower-case hexadecimal, of the certificates the user may act with.
  std::vector<std::string> certificates;

  std::string GetUpn() const { return name + "@" + domain; }
};

/// A directory file that cannot be used. The message says where and why, never with a password in it.
class DirectoryException final : public std::runtime_error {
 public:
  explicit DirectoryException(const std::string& message) : std::runtime_error(message) {}
};

/// An immutable set of users; may be shared between threads.
class Directory final {
 public:
  /// Reads a JSON text:
  ///   {"users": [{"name": "alice", "domain": "example.com", "password": "...", "givenName": "...",
  ///   "surname": "...",
  ///               "groups": [{"name": "...", "domain": "...", "form": "backslash"|"slash"}],
  ///               "solution": false, "certificates": ["<sha256 of the DER as hex>"]}]}
  /// Name and domain are required, all else may be left out; unknown members are refused. Throws
  /// DirectoryException.
  static Directory FromJson(const std::string& json);

  /// Alice (alice@example.com, password "secret"), Bob and a service account, for a service started without a
  /// file.
  static Directory MakeSample();
  /// The same, to be changed.
  static std::vector<User> MakeSampleUsers();

  /// Throws DirectoryException for two users of one name, and for names that cannot stand in a token.
  explicit Directory(std::vector<User> users);

  /// The user called name@domain or domain\name, or by a bare name that only one user has. The case of ASCII
  /// letters does not matter. Null when there is none.
  const User* FindByName(const std::string& name) const;

  /// The user who may act with the certificate of this SHA-256; null when there is none.
  const User* FindByCertificate(const std::string& sha256Hex) const;

  /// The user with this name and password. Null otherwise: unknown users and wrong passwords take the same
  /// way and the same time.
  const User* Authenticate(const std::string& name, const std::string& password) const;

 private:
  std::vector<User> _users;
};

}  // namespace DevSts

#endif  // QUORLIN_DEVSTS_DIRECTORY_H
