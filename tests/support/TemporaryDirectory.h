// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A directory that goes away with its owner.

#ifndef QUORLIN_TESTS_SUPPORT_TEMPORARYDIRECTORY_H
#define QUORLIN_TESTS_SUPPORT_TEMPORARYDIRECTORY_H

#include <string>

namespace TestSupport {

/// A fresh directory that only this user may enter. It is deleted with all in it when the object ends.
class TemporaryDirectory final {
 public:
  /// Throws std::system_error.
  TemporaryDirectory();
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;
  ~TemporaryDirectory();

  const std::string& GetPath() const { return _path; }
  /// The path of `name` in the directory.
  std::string GetPath(const std::string& name) const { return _path + "/" + name; }
  /// Writes a file and returns its path. Throws std::runtime_error.
  std::string WriteFile(const std::string& name, const std::string& content) const;
  /// Throws std::runtime_error.
  std::string ReadFile(const std::string& name) const;

 private:
  std::string _path;
};

}  // namespace TestSupport

#endif  // QUORLIN_TESTS_SUPPORT_TEMPORARYDIRECTORY_H
