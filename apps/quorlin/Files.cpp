// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Files.h"

#include "quorlin/Descriptor.h"
#include "quorlin/Failure.h"

#include <pelmar/SecretText.h>
#include <pelmar/crypto/CryptoException.h>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <utility>

namespace Cli {

namespace {

[[noreturn]] void Refuse(const std::string& what, const std::string& path, int error) {
  throw UsageException("cannot " + what + " " + path + ": " + std::strerror(error));
}

/// What a file is read into. It may be a key.
struct FileBlock {
  ~FileBlock() { Pelmar::Wipe(bytes.data(), bytes.size()); }
  std::array<char, 65536> bytes;
};

int OpenForReading(const std::string& path) {
  return path == "-" ? STDIN_FILENO : open(path.c_str(), O_RDONLY | O_CLOEXEC);
}

mode_t GetMode(Readers readers) {
  return readers == Readers::OWNER ? S_IRUSR | S_IWUSR : S_IRUSR | S_IWUSR | S_IRGRP | S_IROTH;
}

bool IsSpecialFile(const std::string& path) {
  struct stat status;
  return stat(path.c_str(), &status) == 0 && !S_ISREG(status.st_mode);
}

/// What the file seems to be instead of certificates; empty when that cannot be told.
std::string GuessWhatElse(const std::string& content) {
  constexpr char kDerSequence = 0x30;
  if (content.empty()) {
    return "the file is empty";
  }
  if (content.front() == kDerSequence && content.find('\0') != std::string::npos) {
    return "that looks like DER; PEM is what \"openssl x509 -inform der\" makes of it";
  }
  if (content.find("PRIVATE KEY-----") != std::string::npos) {
    return "there is a private key in it, which is not needed here";
  }
  return "";
}

[[noreturn]] void RefuseCertificates(const std::string& path, const std::string& content,
                                     const char* reason) {
  const std::string guess = GuessWhatElse(content);
  throw UsageException("cannot use the certificates in " + path + ": " + reason +
                       (guess.empty() ? "" : " (" + guess + ")"));
}

}  // namespace

void WriteAll(int descriptor, const std::string& content, const std::string& path) {
  std::size_t written = 0;
  while (written < content.size()) {
    const ssize_t count = write(descriptor, content.data() + written, content.size() - written);
    if (count < 0 && errno != EINTR) {
      Refuse("write", path, errno);
    }
    written += count > 0 ? static_cast<std::size_t>(count) : 0;
  }
}

void ReadFileInto(const std::string& path, std::size_t maxBytes, Pelmar::Writer& writer) {
  const Descriptor file(OpenForReading(path));
  if (file.Get() < 0) {
    Refuse("read", path, errno);
  }
  FileBlock block;
  for (std::size_t left = maxBytes; left > 0;) {
    const ssize_t count = read(file.Get(), block.bytes.data(), std::min(block.bytes.size(), left));
    if (count < 0 && errno != EINTR) {
      Refuse("read", path, errno);
    }
    if (count == 0) {
      break;
    }
    const std::size_t size = count > 0 ? static_cast<std::size_t>(count) : 0;
    writer.Write(block.bytes.data(), size);
    left -= size;
  }
}

void RequireSize(const std::string& path, std::size_t size, std::size_t maxBytes) {
  if (size > maxBytes) {
    throw UsageException(path + " is larger than " + std::to_string(maxBytes) + " bytes");
  }
}

std::string ReadFileUpTo(const std::string& path, std::size_t maxBytes) {
  const Pelmar::Ref<Pelmar::StringWriter> content = Pelmar::CreateStringWriter();
  ReadFileInto(path, maxBytes, *content);
  return content->GetText();
}

std::string ReadFile(const std::string& path, std::size_t maxBytes) {
  std::string content = ReadFileUpTo(path, maxBytes + 1);
  RequireSize(path, content.size(), maxBytes);
  return content;
}

std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> ReadCertificates(
    const std::vector<std::string>& paths) {
  std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> certificates;
  for (const std::string& path : paths) {
    const std::string content = ReadFile(path);
    try {
      certificates.splice(certificates.end(), Pelmar::Crypto::CreateCertificatesFromPem(content));
    } catch (const Pelmar::Crypto::CryptoException& e) {
      RefuseCertificates(path, content, e.what());
    }
  }
  return certificates;
}

OutputFile::OutputFile(const std::string& path, Readers readers) : _path(path), _descriptor(-1) {
  if (IsSpecialFile(path)) {
    _descriptor = open(path.c_str(), O_WRONLY | O_CLOEXEC);
  } else {
    std::string pattern = path + ".XXXXXX";
    _descriptor = mkostemp(pattern.data(), O_CLOEXEC);
    _temporaryPath = pattern;
  }
  const bool isOpen =
      _descriptor >= 0 && (_temporaryPath.empty() || fchmod(_descriptor, GetMode(readers)) == 0);
  if (!isOpen) {
    const int error = errno;
    Discard();
    Refuse("write", path, error);
  }
}

OutputFile::~OutputFile() {
  Discard();
}

void OutputFile::Discard() {
  if (_descriptor >= 0) {
    close(_descriptor);
    if (!_temporaryPath.empty()) {
      unlink(_temporaryPath.c_str());
    }
  }
}

void OutputFile::Commit(const std::string& content) {
  WriteAll(_descriptor, content, _path);
  if (_temporaryPath.empty()) {
    return;
  }
  // Without this a crash of the machine could leave the new name on an empty file.
  if (fsync(_descriptor) != 0 || std::rename(_temporaryPath.c_str(), _path.c_str()) != 0) {
    Refuse("write", _path, errno);
  }
  close(std::exchange(_descriptor, -1));
}

void WriteFile(const std::string& path, const std::string& content, Readers readers) {
  OutputFile(path, readers).Commit(content);
}

}  // namespace Cli
