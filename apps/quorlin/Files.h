// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Reading and writing files.

#ifndef QUORLIN_CLI_FILES_H
#define QUORLIN_CLI_FILES_H

#include <pelmar/Ref.h>
#include <pelmar/Writer.h>
#include <pelmar/crypto/Certificate.h>

#include <cstddef>
#include <list>
#include <string>
#include <vector>

namespace Cli {

/// No certificate, key or directory file is larger.
constexpr std::size_t kMaxFileBytes = 4 * 1024 * 1024;

/// The file's bytes; "-" is standard input. Throws UsageException when it cannot be read or is larger than
/// `maxBytes`.
std::string ReadFile(const std::string& path, std::size_t maxBytes = kMaxFileBytes);

/// Hands the first `maxBytes` bytes of the file to `writer`, or fewer when it is shorter, and keeps none of
/// them. Throws UsageException when it cannot be read.
void ReadFileInto(const std::string& path, std::size_t maxBytes, Pelmar::Writer& writer);

/// Throws the UsageException of a file that is larger than `maxBytes`.
void RequireSize(const std::string& path, std::size_t size, std::size_t maxBytes);

/// The first `maxBytes` bytes of the file, or fewer when it is shorter. Throws UsageException when it cannot
/// be read.
std::string ReadFileUpTo(const std::string& path, std::size_t maxBytes);

/// Writes all of `content` to `descriptor`. Throws UsageException, naming `path`.
void WriteAll(int descriptor, const std::string& content, const std::string& path);

/// All certificates of all the files, each of which must hold one at least. Throws UsageException, naming the
/// file.
std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> ReadCertificates(
    const std::vector<std::string>& paths);

/// Who may read a new file.
enum class Readers { OWNER, EVERYBODY };

/// A file that appears whole or not at all.
///
/// The text is collected in a new file beside the wanted one, which takes the wanted name on Commit. Whoever
/// reads the wanted name sees the old content or the new. Something that is no regular file (a pipe, a
/// terminal) is written to directly.
class OutputFile final {
 public:
  /// Prepares writing, so that a path that cannot be written is known before there is something to lose.
  /// Throws UsageException.
  OutputFile(const std::string& path, Readers readers);
  OutputFile(const OutputFile&) = delete;
  OutputFile& operator=(const OutputFile&) = delete;
  /// Without Commit nothing remains.
  ~OutputFile();

  /// Writes `content` and makes it appear. Throws UsageException when that fails.
  void Commit(const std::string& content);

 private:
  void Discard();

  std::string _path;
  std::string _temporaryPath;  ///< Empty: written directly.
  int _descriptor;
};

/// Writes a file whole or not at all. Throws UsageException.
void WriteFile(const std::string& path, const std::string& content, Readers readers);

}  // namespace Cli

#endif  // QUORLIN_CLI_FILES_H
