// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/TokenCacheFile.h"

#include "quorlin/Failure.h"
#include "quorlin/Files.h"

#include <pelmar/xml/Parser.h>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>

namespace Cli {

namespace {

constexpr const char* kTrailerStart = "\n<!-- quorlin get-token ";
constexpr const char* kTrailerEnd = " -->\n";
constexpr std::size_t kPurposeDigits = 64;
constexpr mode_t kOwnerOnly = S_IRUSR | S_IWUSR;
constexpr mode_t kAllModes = 07777;

[[noreturn]] void Refuse(const std::string& path, const std::string& reason) {
  throw UsageException("cannot use " + path + ": " + reason);
}

[[noreturn]] void RefuseForError(const std::string& path) {
  Refuse(path, errno == ELOOP ? std::string("it is a symbolic link") : std::string(std::strerror(errno)));
}

/// What is checked is the open file: nobody can exchange it afterwards.
void RequirePrivate(int descriptor, const std::string& path) {
  struct stat status;
  if (fstat(descriptor, &status) != 0) {
    RefuseForError(path);
  }
  if (!S_ISREG(status.st_mode)) {
    Refuse(path, "it is no regular file");
  }
  if (status.st_uid != geteuid()) {
    Refuse(path, "it belongs to another user");
  }
  if ((status.st_mode & kAllModes & ~kOwnerOnly) != 0) {
    Refuse(path, "others may use it; chmod 600 makes it yours alone");
  }
}

std::string ReadAll(int descriptor, const std::string& path, std::size_t maxBytes) {
  std::string text;
  std::array<char, 65536> buffer;
  for (;;) {
    const ssize_t count = read(descriptor, buffer.data(), buffer.size());
    if (count < 0 && errno != EINTR) {
      RefuseForError(path);
    }
    if (count == 0) {
      return text;
    }
    text.append(buffer.data(), count > 0 ? static_cast<std::size_t>(count) : 0);
    if (text.size() > maxBytes) {
      Refuse(path, "it is no token cache");
    }
  }
}

std::string MakeTrailer(const std::string& purpose) {
  return kTrailerStart + purpose + kTrailerEnd;
}

CachedToken Split(const std::string& text, const std::string& path) {
  const std::size_t trailerSize = MakeTrailer(std::string(kPurposeDigits, '0')).size();
  if (text.size() <= trailerSize) {
    Refuse(path, "it is no token cache");
  }
  const std::size_t xmlSize = text.size() - trailerSize;
  const CachedToken token = {text.substr(0, xmlSize),
                             text.substr(xmlSize + std::strlen(kTrailerStart), kPurposeDigits)};
  if (text.substr(xmlSize) != MakeTrailer(token.purpose) ||
      token.purpose.find_first_not_of("0123456789abcdef") != std::string::npos) {
    Refuse(path, "it is no token cache");
  }
  return token;
}

/// Without it a crash of the machine could undo the renaming.
void SyncDirectoryOf(const std::string& path) {
  const std::string parent = std::filesystem::path(path).parent_path().string();
  const std::string directory = parent.empty() ? "." : parent;
  const Descriptor opened(open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (opened.Get() < 0 || fsync(opened.Get()) != 0) {
    RefuseForError(directory);
  }
}

}  // namespace

TokenCacheFile::TokenCacheFile(const std::string& path, const Watcher& watch)
    : _path(path), _newPath(path + ".new"), _watch(watch) {}

void TokenCacheFile::Lock() {
  const std::string path = _path + ".lock";
  auto file = std::make_unique<Descriptor>(
      open(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, kOwnerOnly));
  if (file->Get() < 0) {
    RefuseForError(path);
  }
  RequirePrivate(file->Get(), path);
  while (flock(file->Get(), LOCK_EX) != 0) {
    if (errno != EINTR) {
      RefuseForError(path);
    }
  }
  _lock = std::move(file);
}

std::optional<CachedToken> TokenCacheFile::Read() const {
  // O_NONBLOCK: opening a pipe would wait for its writer.
  const Descriptor file(open(_path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  if (file.Get() < 0 && errno == ENOENT) {
    return std::nullopt;
  }
  if (file.Get() < 0) {
    RefuseForError(_path);
  }
  RequirePrivate(file.Get(), _path);
  return Split(ReadAll(file.Get(), _path, 2 * Pelmar::Xml::kMaxDocumentBytes), _path);
}

void TokenCacheFile::Replace(const CachedToken& token) const {
  try {
    WriteNew(token.xml + MakeTrailer(token.purpose));
    if (std::rename(_newPath.c_str(), _path.c_str()) != 0) {
      RefuseForError(_path);
    }
  } catch (const UsageException&) {
    unlink(_newPath.c_str());
    throw;
  }
  _watch(Step::RENAMED);
  SyncDirectoryOf(_path);
  _watch(Step::DIRECTORY_SYNCED);
}

void TokenCacheFile::WriteNew(const std::string& text) const {
  // What a run that was killed has left. Nobody else writes it: we hold the lock.
  unlink(_newPath.c_str());
  const Descriptor file(
      open(_newPath.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, kOwnerOnly));
  if (file.Get() < 0) {
    RefuseForError(_newPath);
  }
  _watch(Step::CREATED);
  WriteAll(file.Get(), text.substr(0, text.size() / 2), _newPath);
  _watch(Step::HALF_WRITTEN);
  WriteAll(file.Get(), text.substr(text.size() / 2), _newPath);
  _watch(Step::WRITTEN);
  if (fsync(file.Get()) != 0) {
    RefuseForError(_newPath);
  }
  _watch(Step::SYNCED);
}

}  // namespace Cli
