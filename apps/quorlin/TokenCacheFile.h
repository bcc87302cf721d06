// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A file that keeps a token between runs of the program.

#ifndef QUORLIN_CLI_TOKENCACHEFILE_H
#define QUORLIN_CLI_TOKENCACHEFILE_H

#include "quorlin/Descriptor.h"

#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace Cli {

/// A token and what it was asked for with.
struct CachedToken {
  std::string xml;
  /// 64 hexadecimal digits: a token is only good for a run that would ask for the same.
  std::string purpose;
};

/// The file is the token's XML and a comment with its purpose, so that any reader of XML can use it. It is
/// never there in part: a new one is written beside it, brought to the disk, and renamed. Beside FILE there
/// are FILE.lock, which stays, and for a moment FILE.new.
///
/// A file that is a symbolic link, belongs to another user, or grants anybody else anything is refused, as is
/// one that is no cache: it may be something dear, named by mistake.
class TokenCacheFile final {
 public:
  /// What has just been done.
  enum class Step { CREATED, HALF_WRITTEN, WRITTEN, SYNCED, RENAMED, DIRECTORY_SYNCED };
  using Watcher = std::function<void(Step)>;

  /// Nothing is opened yet. `watch` is told each step of `Replace`: for tests of what an end there leaves.
  explicit TokenCacheFile(
      const std::string& path, const Watcher& watch = [](Step) {});

  /// Waits until no other run holds the lock, and holds it from then on. Throws UsageException.
  void Lock();
  /// What is there; nothing when there is no file. Throws UsageException.
  std::optional<CachedToken> Read() const;
  /// Puts `token` in its place. Needs the lock. Throws UsageException; the old file is then still there.
  void Replace(const CachedToken& token) const;

 private:
  void WriteNew(const std::string& text) const;

  const std::string _path;
  const std::string _newPath;
  const Watcher _watch;
  std::unique_ptr<Descriptor> _lock;
};

}  // namespace Cli

#endif  // QUORLIN_CLI_TOKENCACHEFILE_H
