// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A directory that goes away again.

#ifndef QUORLIN_CLI_TEMPORARYDIRECTORY_H
#define QUORLIN_CLI_TEMPORARYDIRECTORY_H

#include <string>

namespace Cli {

/// A fresh directory that only this user may enter, deleted with all in it when the object ends.
class TemporaryDirectory final {
 public:
  /// Throws UsageException when there is no place for it.
  TemporaryDirectory();
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;
  ~TemporaryDirectory();

  const std::string& GetPath() const { return _path; }
  /// Deletes it now. May be called from another thread.
  void Remove() const noexcept;

 private:
  std::string _path;
};

}  // namespace Cli

#endif  // QUORLIN_CLI_TEMPORARYDIRECTORY_H
