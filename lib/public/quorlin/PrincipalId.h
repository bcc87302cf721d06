// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The identity of a user or a group.

#ifndef QUORLIN_PRINCIPALID_H
#define QUORLIN_PRINCIPALID_H

#include <quorlin/Export.h>

#include <string>

namespace Quorlin {

/// A user's or group's account name and the domain (realm) it belongs to. A plain value.
struct QUORLIN_API PrincipalId {
  /// Neither may be empty: that is a programming error and aborts the process.
  PrincipalId(const std::string& name, const std::string& domain);
  /// The same, taking the texts over.
  PrincipalId(std::string&& name, std::string&& domain);

  /// "{Name: alice; Domain:example.com}", the form used in log lines.
  std::string ToString() const;

  std::string name;
  std::string domain;
};

/// Whether both name the same principal. The case of the 26 ASCII letters does not matter in either part.
QUORLIN_API bool operator==(const PrincipalId& a, const PrincipalId& b);
QUORLIN_API bool operator!=(const PrincipalId& a, const PrincipalId& b);

}  // namespace Quorlin

#endif  // QUORLIN_PRINCIPALID_H
